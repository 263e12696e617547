// Memory that is refused by an exception of the kernel: for guards round code that asks for nothing but
// memory.
//
// A program that uses this has allocation functions of its own; they are the plain ones as long as none
// lives.
#pragma once

namespace TestSupport {

// The next request of memory on this thread throws an exception that is a std::bad_alloc and a
// HostCtl::Lib::HostCtlException at once, with two texts that differ.
class RefusedMemory {
 public:
  static constexpr const char* described = "the kernel is away";

  RefusedMemory() noexcept;
  ~RefusedMemory();
  RefusedMemory(const RefusedMemory&) = delete;
  RefusedMemory& operator=(const RefusedMemory&) = delete;
};

}  // namespace TestSupport
