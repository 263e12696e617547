// One program at a time changes the disks of a host.
#pragma once

#include <mutex>
#include <string>

#include "otxctl/linux/FileDescriptor.h"

namespace OtxCtl::Linux {

// Threads: any.
class HostLock {
 public:
  // Locks nothing without a file. The file's folder is made when it is needed; it must be root's or the
  // caller's, and nobody else may write it.
  explicit HostLock(std::string file) : _file(std::move(file)) {}

  // Holds it from now on until the object goes; does nothing if it has it already. Throws std::runtime_error
  // if another program has it, whose process is named.
  void Take();

 private:
  const std::string _file;
  std::mutex _mutex;
  FileDescriptor _held;
};

}  // namespace OtxCtl::Linux
