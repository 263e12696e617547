#include "tessa/App.h"

#include <atomic>

namespace Tessa::Service {
namespace {
std::atomic<App*> installedApp{nullptr};
}

App::~App() = default;
App* GetApp() noexcept {
  return installedApp.load();
}
App* SetApp(App* app) noexcept {
  return installedApp.exchange(app);
}

}  // namespace Tessa::Service
