// The running application: its managed objects by name, and its sessions.
#pragma once

#include <string>

#include "tessa/Object.h"
#include "tessa/Ref.h"
#include "tessa/Throwable.h"
#include "tessa/TypeName.h"

namespace Tessa {
class Session;
}

namespace Tessa::Service {

// Threads: every operation is safe from any thread.
class TESSA_API App {
 public:
  virtual ~App();

  // The managed object of that name, or null.
  virtual Ref<Object> LookupObject(const std::string& name) const = 0;

  // Takes the session into the application's session registry.
  virtual void RegisterSession(const Ref<Session>& session) = 0;
};

// The application of this process; null before the host program has installed it.
TESSA_API App* GetApp() noexcept;

// The caller keeps `app` alive until it is taken away again with null. Returns the one before.
TESSA_API App* SetApp(App* app) noexcept;

// Fills `object` with the managed object of that name, or with null when there is none (or no
// application). Throws TypeMismatchException when it is of another type; `object` is then unchanged.
template <class T>
void TryLookupObject(const std::string& name, Ref<T>& object) {
  const App* app = GetApp();
  const Ref<Object> found = app == nullptr ? Ref<Object>() : app->LookupObject(name);
  T* const typed = dynamic_cast<T*>(found.Get());
  if (found && typed == nullptr) {
    TypeMismatchException::Throw(TypeName(typeid(T)), found->ToString());
  }
  object = Ref<T>(typed);
}

}  // namespace Tessa::Service
