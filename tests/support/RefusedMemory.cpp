#include "tests/support/RefusedMemory.h"

#include <cstdlib>
#include <new>
#include <string>
#include <utility>

#include "kova/agentd/include/HostCtlException.h"

namespace TestSupport {
namespace {

thread_local bool refuseNext = false;

// The allocation functions may throw what derives from std::bad_alloc, so this may leave them.
class Refusal final : public std::bad_alloc, public HostCtl::Lib::HostCtlException {
 public:
  Refusal() : HostCtlException("no memory") {}
  std::string Describe() const override { return RefusedMemory::described; }
  const char* what() const noexcept override { return "no memory"; }
};

}  // namespace

RefusedMemory::RefusedMemory() noexcept {
  refuseNext = true;
}
RefusedMemory::~RefusedMemory() {
  refuseNext = false;
}

}  // namespace TestSupport

void* operator new(std::size_t size) {
  if (std::exchange(TestSupport::refuseNext, false)) {
    throw TestSupport::Refusal();
  }
  if (void* const memory = std::malloc(size != 0 ? size : 1)) {
    return memory;
  }
  throw std::bad_alloc();
}
void operator delete(void* memory) noexcept {
  std::free(memory);
}
void operator delete(void* memory, std::size_t) noexcept {
  std::free(memory);
}
