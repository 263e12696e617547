#include "tests/support/RefusedMemory.h"

#include <cstdlib>
#include <new>
#include <optional>
#include <string>
#include <utility>

#include "kova/agentd/include/HostCtlException.h"

namespace TestSupport {
namespace {

thread_local std::optional<RefusedMemory::By> refuser;

// The allocation functions may throw what derives from std::bad_alloc, so this may leave them.
class Refusal final : public std::bad_alloc, public HostCtl::Lib::HostCtlException {
 public:
  Refusal() : HostCtlException("no memory") {}
  std::string Describe() const override { return RefusedMemory::described; }
  const char* what() const noexcept override { return "no memory"; }
};

}  // namespace

RefusedMemory::RefusedMemory(By by) noexcept {
  refuser = by;
}
RefusedMemory::~RefusedMemory() {
  refuser.reset();
}

}  // namespace TestSupport

void* operator new(std::size_t size) {
  if (const auto by = std::exchange(TestSupport::refuser, std::nullopt)) {
    if (*by == TestSupport::RefusedMemory::By::Kernel) {
      throw TestSupport::Refusal();
    }
    throw std::bad_alloc();
  }
  if (void* const memory = std::malloc(size != 0 ? size : 1)) {
    return memory;
  }
  throw std::bad_alloc();
}
// What a sanitizer would otherwise bring of its own, to whose memory the deletion below would not fit.
void* operator new(std::size_t size, const std::nothrow_t&) noexcept {
  try {
    return operator new(size);
  } catch (...) {
    return nullptr;
  }
}
void operator delete(void* memory) noexcept {
  std::free(memory);
}
void operator delete(void* memory, const std::nothrow_t&) noexcept {
  std::free(memory);
}
void operator delete(void* memory, std::size_t) noexcept {
  std::free(memory);
}
