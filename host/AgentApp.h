// The application that the plug-in finds itself in: managed objects, sessions, authorization.
#pragma once

#include <map>
#include <mutex>
#include <string>
#include <vector>

#include "tessa/App.h"
#include "tessa/Authorize.h"
#include "tessa/Session.h"

namespace Host {

// Threads: safe from any thread.
class AgentApp final : public Tessa::Service::App {
 public:
  Tessa::Ref<Tessa::Object> LookupObject(const std::string& name) const override;
  void RegisterSession(const Tessa::Ref<Tessa::Session>& session) override;

  // Null takes the name away.
  void SetObject(const std::string& name, Tessa::Ref<Tessa::Object> object);
  std::vector<Tessa::Ref<Tessa::Session>> Sessions() const;

 private:
  mutable std::mutex _mutex;
  std::map<std::string, Tessa::Ref<Tessa::Object>> _objects;
  std::vector<Tessa::Ref<Tessa::Session>> _sessions;
};

// Lets the program's own components act as built-in users. It knows no passwords and no tokens: a
// connection with a token is refused by Orbis::Fault::SystemError::Exception.
class LocalAuthorization final : public Tessa::Authorize::AuthorizeManager {
 public:
  void AddConnection(const Tessa::Ref<Tessa::Session>& session, const std::string& user,
                     const Tessa::Ref<Tessa::System::AuthTokenHelper>& token, bool system) override;
};

}  // namespace Host
