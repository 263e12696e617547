// A host description in a file: read, saved whole or not at all, and kept from a second writer.
//
// Threads: one thread at a time. Every error is a HostFileError whose text names the file.
#pragma once

#include <unistd.h>

#include <optional>
#include <stdexcept>
#include <string>
#include <string_view>

#include "otxctl/sim/HostDescription.h"

namespace OtxCtl::Sim {

class HostFileError : public std::runtime_error {
 public:
  using std::runtime_error::runtime_error;
};

// An open file, closed at the end.
class FileDescriptor {
 public:
  FileDescriptor() = default;
  explicit FileDescriptor(int number) : _number(number) {}
  ~FileDescriptor();
  FileDescriptor(FileDescriptor&& other) noexcept;
  FileDescriptor& operator=(FileDescriptor&& other) noexcept;

  int Get() const noexcept { return _number; }
  bool IsOpen() const noexcept { return _number >= 0; }
  // Closes now; false where the system reports that writing had failed.
  bool Close() noexcept;

 private:
  int _number = -1;
};

// The whole of a regular file, at most `mostBytes` of it; more is an error.
std::string ReadTextFile(const std::string& path, std::size_t mostBytes);

// Reads and checks a host description. Takes no lock.
HostDescription LoadHostFile(const std::string& path);

// The right to write one file. While it lives, no other HostFileWriter, of this process or another, can be
// made for that file.
class HostFileWriter {
 public:
  // Makes the entries of an open folder last, as fsync does and tells it.
  using FolderSync = int (*)(int folder);

  // Locks PATH.lock beside the file, which need not exist yet. A link is followed: what it points to is
  // locked and saved.
  explicit HostFileWriter(const std::string& path, FolderSync syncFolder = &fsync);

  // Replaces the file: written beside it, made durable, then renamed over it. If that fails, the old file
  // stands as it was and nothing is left behind.
  //
  // From the renaming on, the new file is the host, for every program that reads it. A folder that then fails
  // to make the new name last takes nothing of that back, so it is no error: the warning that is returned
  // says that a power cut may bring the old file back. The next save that has none covers this one as well.
  [[nodiscard]] std::optional<std::string> Save(const HostDescription& host) const;
  // The same with a text that is no host description, but lies in a file like one.
  [[nodiscard]] std::optional<std::string> SaveText(std::string_view text) const;

 private:
  std::string _path;
  FolderSync _syncFolder;
  FileDescriptor _lock;
};

}  // namespace OtxCtl::Sim
