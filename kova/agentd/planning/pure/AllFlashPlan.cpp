#include "kova/agentd/planning/pure/AllFlashPlan.h"

namespace Kovasvc::Planning {

bool IsFlash(bool isSsd, bool capacityFlash) {
  return isSsd || capacityFlash;
}

std::vector<std::size_t> TakenForCapacity(const std::vector<bool>& flashIsCache) {
  std::vector<std::size_t> taken;
  for (std::size_t i = 0; i < flashIsCache.size(); ++i) {
    if (!flashIsCache[i]) {
      taken.push_back(i);
    }
  }
  return taken;
}

}  // namespace Kovasvc::Planning
