#include "otxctl/sim/HostFile.h"

#include <fcntl.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <cstdlib>
#include <filesystem>
#include <system_error>
#include <utility>

#include "otxctl/sim/JsonText.h"

namespace OtxCtl::Sim {
namespace {

constexpr mode_t newFileMode = 0644;

std::string ErrorText(const std::string& path, const std::string& what, int error) {
  return path + ": " + what + ": " + std::system_category().message(error);
}

[[noreturn]] void Fail(const std::string& path, const std::string& what, int error) {
  throw HostFileError(ErrorText(path, what, error));
}

// Repeats a system call that a signal interrupted.
template <typename Call>
auto Uninterrupted(Call call) {
  auto result = call();
  while (result < 0 && errno == EINTR) {
    result = call();
  }
  return result;
}

FileDescriptor Open(const std::string& path, int flags, mode_t mode, const char* what) {
  FileDescriptor file(Uninterrupted([&] { return open(path.c_str(), flags | O_CLOEXEC, mode); }));
  if (!file.IsOpen()) {
    Fail(path, what, errno);
  }
  return file;
}

std::string FolderOf(const std::string& path) {
  const std::filesystem::path folder = std::filesystem::path(path).parent_path();
  return folder.empty() ? "." : folder.string();
}

// Saving renames over the file, which would replace a link rather than what it points to.
std::string WithoutLinks(const std::string& path) {
  std::error_code error;
  const std::filesystem::path real = std::filesystem::weakly_canonical(path, error);
  if (error) {
    throw HostFileError(path + ": cannot be found: " + error.message());
  }
  return real.string();
}

// A file beside the one to save that is gone again unless it was put in its place. One that a killed process
// left there is replaced: nobody else writes while this process holds the lock.
class NewFile {
 public:
  explicit NewFile(const std::string& target) : _target(target), _name(target + ".new") {
    unlink(_name.c_str());
    _file = FileDescriptor(open(_name.c_str(), O_WRONLY | O_CREAT | O_EXCL | O_NOFOLLOW | O_CLOEXEC, 0600));
    if (!_file.IsOpen()) {
      Fail(_target, "cannot be saved, no new file in its folder", errno);
    }
  }
  ~NewFile() {
    if (!_isPlaced) {
      unlink(_name.c_str());
    }
  }
  NewFile(const NewFile&) = delete;
  NewFile& operator=(const NewFile&) = delete;

  void Write(std::string_view text) const {
    while (!text.empty()) {
      const ssize_t written = Uninterrupted([&] { return write(_file.Get(), text.data(), text.size()); });
      if (written < 0) {
        Fail(_target, "cannot be saved", errno);
      }
      text.remove_prefix(static_cast<std::size_t>(written));
    }
  }

  void Place() {
    struct stat old {};
    const mode_t mode = stat(_target.c_str(), &old) == 0 ? old.st_mode & 07777U : newFileMode;
    const bool isDurable = fchmod(_file.Get(), mode) == 0 && fsync(_file.Get()) == 0 && _file.Close();
    if (!isDurable || rename(_name.c_str(), _target.c_str()) != 0) {
      Fail(_target, "cannot be saved", errno);
    }
    _isPlaced = true;
  }

 private:
  std::string _target;
  std::string _name;
  FileDescriptor _file;
  bool _isPlaced = false;
};

}  // namespace

FileDescriptor::~FileDescriptor() {
  Close();
}

FileDescriptor::FileDescriptor(FileDescriptor&& other) noexcept : _number(std::exchange(other._number, -1)) {}

FileDescriptor& FileDescriptor::operator=(FileDescriptor&& other) noexcept {
  if (this != &other) {
    Close();
    _number = std::exchange(other._number, -1);
  }
  return *this;
}

bool FileDescriptor::Close() noexcept {
  const int number = std::exchange(_number, -1);
  return number < 0 || close(number) == 0;
}

std::string ReadTextFile(const std::string& path, std::size_t mostBytes) {
  // Not blocking: a pipe of that name must not hold the program up.
  const FileDescriptor file = Open(path, O_RDONLY | O_NONBLOCK, 0, "cannot be opened");
  struct stat status {};
  if (fstat(file.Get(), &status) != 0) {
    Fail(path, "cannot be read", errno);
  }
  if (!S_ISREG(status.st_mode)) {
    throw HostFileError(path + ": is no regular file");
  }
  std::string text;
  std::array<char, 64 * 1024> chunk{};
  while (true) {
    const ssize_t count = Uninterrupted([&] { return read(file.Get(), chunk.data(), chunk.size()); });
    if (count < 0) {
      Fail(path, "cannot be read", errno);
    }
    if (count == 0) {
      return text;
    }
    text.append(chunk.data(), static_cast<std::size_t>(count));
    if (text.size() > mostBytes) {
      throw HostFileError(path + ": is larger than " + std::to_string(mostBytes) + " bytes");
    }
  }
}

HostDescription LoadHostFile(const std::string& path) {
  const std::string text = ReadTextFile(path, JsonLimits{}.bytes);
  try {
    return ParseHostDescription(text);
  } catch (const HostDescriptionError& error) {
    throw HostFileError(path + ": " + error.what());
  }
}

HostFileWriter::HostFileWriter(const std::string& path, FolderSync syncFolder)
    : _path(WithoutLinks(path)), _syncFolder(syncFolder) {
  // A lock on the file itself would go with the old file at the first save.
  const std::string lockPath = _path + ".lock";
  _lock = Open(lockPath, O_RDWR | O_CREAT | O_NOFOLLOW, newFileMode, "cannot be opened");
  if (Uninterrupted([&] { return flock(_lock.Get(), LOCK_EX | LOCK_NB); }) == 0) {
    return;
  }
  if (errno == EWOULDBLOCK) {
    throw HostFileError(path + ": another program saves this host already (it holds " + lockPath + ")");
  }
  Fail(lockPath, "cannot be locked", errno);
}

std::optional<std::string> HostFileWriter::Save(const HostDescription& host) const {
  try {
    return SaveText(WriteHostDescription(host));
  } catch (const HostDescriptionError& error) {
    throw HostFileError(_path + ": " + error.what());
  }
}

std::optional<std::string> HostFileWriter::SaveText(std::string_view text) const {
  // Before anything is done: behind the renaming nothing may fail.
  const FileDescriptor folder = Open(FolderOf(_path), O_RDONLY | O_DIRECTORY, 0, "cannot be opened");
  NewFile file(_path);
  file.Write(text);
  file.Place();
  if (Uninterrupted([&] { return _syncFolder(folder.Get()); }) != 0) {
    return ErrorText(_path, "was saved, but may not last a power cut", errno);
  }
  return std::nullopt;
}

}  // namespace OtxCtl::Sim
