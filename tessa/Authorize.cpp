#include "tessa/Authorize.h"

#include <mutex>
#include <utility>

namespace Tessa::System {
AuthTokenHelper::~AuthTokenHelper() = default;
}

namespace Tessa::Authorize {
namespace {

struct Instance {
  std::mutex mutex;
  Ref<AuthorizeManager> manager;
};

// Never destroyed, like every singleton of the runtime.
Instance& TheInstance() {
  static Instance* const instance = new Instance;
  return *instance;
}

}  // namespace

AuthorizeManager::~AuthorizeManager() = default;

Ref<AuthorizeManager> AuthorizeManager::GetInstance() {
  Instance& instance = TheInstance();
  const std::lock_guard guard(instance.mutex);
  return instance.manager;
}

void AuthorizeManager::SetInstance(Ref<AuthorizeManager> manager) {
  Instance& instance = TheInstance();
  const std::lock_guard guard(instance.mutex);
  std::swap(instance.manager, manager);
}

}  // namespace Tessa::Authorize
