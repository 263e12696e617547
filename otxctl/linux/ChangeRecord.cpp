#include "otxctl/linux/ChangeRecord.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstdio>
#include <cstring>
#include <sstream>
#include <stdexcept>

#include "otxctl/linux/BoundedFile.h"
#include "otxctl/linux/FileDescriptor.h"

namespace OtxCtl::Linux {
namespace {

using Names = ChangeRecord::Names;

constexpr std::size_t longestRecord = std::size_t{1} << 20;

[[noreturn]] void Fail(const std::string& file, const char* what) {
  throw std::runtime_error(file + ": cannot be " + what + ": " + std::strerror(errno));
}

// Names of folders too, from the root on; they are root's alone.
void MakeFolder(const std::string& folder) {
  for (std::size_t end = folder.find('/', 1);; end = folder.find('/', end + 1)) {
    const std::string part = folder.substr(0, end);
    if (mkdir(part.c_str(), 0700) != 0 && errno != EEXIST) {
      Fail(part, "made");
    }
    if (end == std::string::npos) {
      return;
    }
  }
}

void WriteAll(const FileDescriptor& file, const std::string& name, const std::string& text) {
  std::size_t done = 0;
  while (done < text.size()) {
    const ssize_t count =
        Uninterrupted([&] { return write(file.Get(), text.data() + done, text.size() - done); });
    if (count < 0) {
      Fail(name, "written");
    }
    done += static_cast<std::size_t>(count);
  }
  if (fsync(file.Get()) != 0) {
    Fail(name, "written");
  }
}

FileDescriptor Open(const std::string& name, int flags) {
  FileDescriptor file(
      Uninterrupted([&] { return open(name.c_str(), flags | O_CLOEXEC | O_NOFOLLOW, 0600); }));
  if (!file.IsOpen()) {
    Fail(name, "opened");
  }
  return file;
}

}  // namespace

Names ChangeRecord::Read() const {
  if (_folder.empty()) {
    return {};
  }
  const auto text = ReadWhole(_folder + "/under-change", longestRecord);
  if (!text.IsKnown()) {
    throw std::runtime_error(text.WhyUnknown());
  }
  Names disks;
  std::istringstream lines(text.Get().value_or(""));
  for (std::string line; std::getline(lines, line);) {
    disks.push_back(line);
  }
  return disks;
}

void ChangeRecord::Add(const Names& disks) const {
  Names all = Read();
  for (const std::string& disk : disks) {
    if (std::find(all.begin(), all.end(), disk) == all.end()) {
      all.push_back(disk);
    }
  }
  Write(all);
}

void ChangeRecord::Remove(const Names& disks) const {
  Names left = Read();
  left.erase(std::remove_if(left.begin(), left.end(),
                            [&disks](const std::string& disk) {
                              return std::find(disks.begin(), disks.end(), disk) != disks.end();
                            }),
             left.end());
  Write(left);
}

void ChangeRecord::Write(const Names& disks) const {
  if (_folder.empty()) {
    return;
  }
  std::string text;
  for (const std::string& disk : disks) {
    text += disk + "\n";
  }
  MakeFolder(_folder);
  const std::string name = _folder + "/under-change";
  const std::string next = name + ".new";
  WriteAll(Open(next, O_WRONLY | O_CREAT | O_TRUNC), next, text);
  if (rename(next.c_str(), name.c_str()) != 0) {
    Fail(name, "replaced");
  }
  if (fsync(Open(_folder, O_RDONLY | O_DIRECTORY).Get()) != 0) {
    Fail(_folder, "written");
  }
}

}  // namespace OtxCtl::Linux
