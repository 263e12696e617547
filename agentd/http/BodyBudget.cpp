#include "agentd/http/BodyBudget.h"

namespace Agentd {

bool BodyBudget::Share::Hold(std::size_t bytes) {
  if (bytes <= _held) {
    return true;
  }
  const std::size_t more = bytes - _held;
  std::size_t before = _budget->_held;
  do {
    if (before > _most || more > _most - before) {
      return false;
    }
  } while (!_budget->_held.compare_exchange_weak(before, before + more));
  _held = bytes;
  return true;
}

}  // namespace Agentd
