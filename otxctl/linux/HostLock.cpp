#include "otxctl/linux/HostLock.h"

#include <fcntl.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <cstring>
#include <stdexcept>

namespace OtxCtl::Linux {
namespace {

[[noreturn]] void Fail(const std::string& file, const std::string& why) {
  throw std::runtime_error(file + ": " + why);
}

void CheckFolder(const std::string& folder) {
  if (mkdir(folder.c_str(), 0755) != 0 && errno != EEXIST) {
    Fail(folder, std::string("cannot be made: ") + std::strerror(errno));
  }
  struct stat status = {};
  if (lstat(folder.c_str(), &status) != 0 || !S_ISDIR(status.st_mode)) {
    Fail(folder, "is no folder");
  }
  if (status.st_uid != 0 && status.st_uid != geteuid()) {
    Fail(folder, "belongs to another user; it must be root's");
  }
  if ((status.st_mode & (S_IWGRP | S_IWOTH)) != 0) {
    Fail(folder, "group or others may write it; take that away with chmod go-w");
  }
}

std::string HolderOf(const FileDescriptor& file) {
  std::array<char, 32> text{};
  const ssize_t count = pread(file.Get(), text.data(), text.size() - 1, 0);
  const std::string process(text.data(), count > 0 ? static_cast<std::size_t>(count) : 0);
  const bool isNumber = !process.empty() && process.find_first_not_of("0123456789") == std::string::npos;
  return isNumber ? "process " + process : "another program";
}

}  // namespace

void HostLock::Take() {
  const std::lock_guard guard(_mutex);
  if (_file.empty() || _held.IsOpen()) {
    return;
  }
  CheckFolder(_file.substr(0, _file.rfind('/')));
  FileDescriptor file(open(_file.c_str(), O_RDWR | O_CREAT | O_CLOEXEC | O_NOFOLLOW, 0600));
  if (!file.IsOpen()) {
    Fail(_file, std::string("cannot be opened: ") + std::strerror(errno));
  }
  if (flock(file.Get(), LOCK_EX | LOCK_NB) != 0) {
    Fail(_file, HolderOf(file) + " changes the disks of this host already");
  }
  const std::string process = std::to_string(getpid());
  if (ftruncate(file.Get(), 0) != 0 ||
      pwrite(file.Get(), process.data(), process.size(), 0) != static_cast<ssize_t>(process.size())) {
    Fail(_file, std::string("cannot be written: ") + std::strerror(errno));
  }
  _held = std::move(file);
}

}  // namespace OtxCtl::Linux
