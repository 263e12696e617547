#include "host/AgentApp.h"

#include <utility>

#include "orbis/Types.h"

namespace Host {

using Tessa::Ref;

Ref<Tessa::Object> AgentApp::LookupObject(const std::string& name) const {
  const std::lock_guard guard(_mutex);
  const auto found = _objects.find(name);
  return found == _objects.end() ? nullptr : found->second;
}

void AgentApp::RegisterSession(const Ref<Tessa::Session>& session) {
  const std::lock_guard guard(_mutex);
  _sessions.push_back(session);
}

void AgentApp::SetObject(const std::string& name, Ref<Tessa::Object> object) {
  Ref<Tessa::Object> replaced;  // released outside the lock
  const std::lock_guard guard(_mutex);
  replaced = std::exchange(_objects[name], std::move(object));
  if (!_objects[name]) {
    _objects.erase(name);
  }
}

std::vector<Ref<Tessa::Session>> AgentApp::Sessions() const {
  const std::lock_guard guard(_mutex);
  return _sessions;
}

void LocalAuthorization::AddConnection(const Ref<Tessa::Session>& session, const std::string& user,
                                       const Ref<Tessa::System::AuthTokenHelper>& token, bool) {
  using Orbis::Fault::SystemError;
  if (token) {
    throw SystemError::Exception(
        Tessa::MakeRef<SystemError>("No tokens are known here; user " + user + " was given one."));
  }
  session->SetUserBinding(user);
}

}  // namespace Host
