// An open file that is closed with its owner, and system calls that a signal interrupted.
#pragma once

#include <unistd.h>

#include <cerrno>
#include <utility>

namespace OtxCtl::Linux {

class FileDescriptor {
 public:
  FileDescriptor() = default;
  explicit FileDescriptor(int descriptor) : _descriptor(descriptor) {}
  FileDescriptor(FileDescriptor&& other) noexcept : _descriptor(std::exchange(other._descriptor, -1)) {}
  FileDescriptor& operator=(FileDescriptor&& other) noexcept {
    std::swap(_descriptor, other._descriptor);
    return *this;
  }
  ~FileDescriptor() {
    if (IsOpen()) {
      close(_descriptor);
    }
  }

  bool IsOpen() const noexcept { return _descriptor >= 0; }
  int Get() const noexcept { return _descriptor; }

 private:
  int _descriptor = -1;
};

// Repeats a system call that a signal interrupted.
template <typename Call>
auto Uninterrupted(Call call) {
  auto result = call();
  while (result < 0 && errno == EINTR) {
    result = call();
  }
  return result;
}

}  // namespace OtxCtl::Linux
