#include "nox/StorageSystem.h"

namespace Nox::Host {
StorageSystem::~StorageSystem() = default;
}  // namespace Nox::Host
