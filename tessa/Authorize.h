// Who may do what: the authorization manager of the host program.
#pragma once

#include <string>

#include "tessa/Object.h"
#include "tessa/Ref.h"

namespace Tessa {
class Session;
}

namespace Tessa::System {

// Proves to the authorization manager who a caller is, where a password or ticket is involved.
class TESSA_API AuthTokenHelper : public ObjectImpl {
 public:
  virtual std::string GetToken() const = 0;

 protected:
  ~AuthTokenHelper() override;
};

}  // namespace Tessa::System

namespace Tessa::Authorize {

// Threads: every operation is safe from any thread.
class TESSA_API AuthorizeManager : public ObjectImpl {
 public:
  // The manager of this process, or null.
  static Ref<AuthorizeManager> GetInstance();
  static void SetInstance(Ref<AuthorizeManager> manager);

  // Lets the session act as the user. `token` may be null for built-in users. `system` marks a
  // connection of the host's own components, which no idle time closes.
  virtual void AddConnection(const Ref<Session>& session, const std::string& user,
                             const Ref<System::AuthTokenHelper>& token, bool system) = 0;

 protected:
  ~AuthorizeManager() override;
};

}  // namespace Tessa::Authorize
