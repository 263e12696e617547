// Memory that is refused: for guards round code that asks for nothing but memory.
//
// A program that uses this has allocation functions of its own; they are the plain ones as long as none
// lives.
#pragma once

namespace TestSupport {

// The next request of memory on this thread throws: an exception that is a std::bad_alloc and a
// HostCtl::Lib::HostCtlException at once, with two texts that differ, or a std::bad_alloc and no more.
class RefusedMemory {
 public:
  enum class By { Kernel, System };
  static constexpr const char* described = "the kernel is away";

  explicit RefusedMemory(By by = By::Kernel) noexcept;
  ~RefusedMemory();
  RefusedMemory(const RefusedMemory&) = delete;
  RefusedMemory& operator=(const RefusedMemory&) = delete;
};

}  // namespace TestSupport
