#include "tessa/Session.h"

#include <random>
#include <string_view>
#include <utility>

namespace Tessa {
namespace {

// 128 random bits as 32 hexadecimal digits.
std::string RandomText() {
  constexpr std::string_view digits = "0123456789abcdef";
  std::random_device device;
  std::string text;
  for (int word = 0; word < 4; ++word) {
    unsigned bits = device();
    for (int digit = 0; digit < 8; ++digit, bits >>= 4) {
      text.push_back(digits[bits & 15]);
    }
  }
  return text;
}

}  // namespace

Session::~Session() = default;

SessionMixin::SessionMixin() : SessionMixin(Lifetime{}) {}
SessionMixin::SessionMixin(Lifetime lifetime)
    : _id(RandomText()),
      _nonce(RandomText()),
      _lifetime(lifetime),
      _loginTime(std::chrono::system_clock::now()),
      _lastActive(std::chrono::steady_clock::now()),
      _lastActiveUtc(_loginTime) {}
SessionMixin::~SessionMixin() = default;

bool SessionMixin::HasExpired() const {
  const std::lock_guard guard(_mutex);
  if (_closed || (_lifetime.until && std::chrono::system_clock::now() >= *_lifetime.until)) {
    return true;
  }
  return _lifetime.idle && _leases.empty() &&
         std::chrono::steady_clock::now() - _lastActive >= *_lifetime.idle;
}

Ref<Object> SessionMixin::GetAuthData() const {
  const std::lock_guard guard(_mutex);
  return _authData;
}

void SessionMixin::SetAuthData(Ref<Object> data) {
  const std::lock_guard guard(_mutex);
  std::swap(_authData, data);
}

void SessionMixin::RemoveLease(const std::string& name) {
  const std::lock_guard guard(_mutex);
  _leases.erase(name);
}

void SessionMixin::AddLease(const std::string& name) {
  const std::lock_guard guard(_mutex);
  _leases.insert(name);
}

bool SessionMixin::HasLease() const {
  const std::lock_guard guard(_mutex);
  return !_leases.empty();
}

void SessionMixin::CloseSession() {
  std::map<std::string, Ref<Object>> released;  // outside the lock: a destructor may call back
  const std::lock_guard guard(_mutex);
  _closed = true;
  _leases.clear();
  released.swap(_objects);
}

bool SessionMixin::IsClosed() const {
  const std::lock_guard guard(_mutex);
  return _closed;
}

std::string SessionMixin::GetUserAgent() const {
  const std::lock_guard guard(_mutex);
  return _userAgent;
}

void SessionMixin::SetUserAgent(const std::string& agent) {
  const std::lock_guard guard(_mutex);
  _userAgent = agent;
}

Ref<Object> SessionMixin::LookupObject(const std::string& name) const {
  const std::lock_guard guard(_mutex);
  const auto found = _objects.find(name);
  return found == _objects.end() ? nullptr : found->second;
}

void SessionMixin::SetObject(const std::string& name, Ref<Object> object) {
  Ref<Object> replaced;  // released outside the lock
  const std::lock_guard guard(_mutex);
  if (!object) {
    if (const auto found = _objects.find(name); found != _objects.end()) {
      replaced = std::move(found->second);
      _objects.erase(found);
    }
    return;
  }
  replaced = std::exchange(_objects[name], std::move(object));
}

std::string SessionMixin::GetBindingInfo() const {
  return {};
}

std::string SessionMixin::GetUserBinding() const {
  const std::lock_guard guard(_mutex);
  return _user;
}

void SessionMixin::SetUserBinding(const std::string& user) {
  const std::lock_guard guard(_mutex);
  _user = user;
}

bool SessionMixin::IsAuthenticated() const {
  const std::lock_guard guard(_mutex);
  return !_user.empty();
}

Session::UtcTime SessionMixin::LastLoginTimeUtc() const {
  return _loginTime;
}

Session::MonotonicTime SessionMixin::LastActiveTime() const {
  const std::lock_guard guard(_mutex);
  return _lastActive;
}

Session::UtcTime SessionMixin::LastActiveTimeUtc() const {
  const std::lock_guard guard(_mutex);
  return _lastActiveUtc;
}

void SessionMixin::UpdateLastActive() {
  const std::lock_guard guard(_mutex);
  _lastActive = std::chrono::steady_clock::now();
  _lastActiveUtc = std::chrono::system_clock::now();
  ++_updates;
}

std::optional<Session::UtcTime> SessionMixin::GetExpirationDate() const {
  return _lifetime.until;
}
std::optional<std::chrono::seconds> SessionMixin::GetConfiguredIdleTimeout() const {
  return _lifetime.idle;
}
std::string SessionMixin::GetId() const {
  return _id;
}

std::string SessionMixin::GetLocale() const {
  const std::lock_guard guard(_mutex);
  return _locale;
}

void SessionMixin::SetLocale(const std::string& locale) {
  const std::lock_guard guard(_mutex);
  _locale = locale;
}

Session::Stats SessionMixin::GetStats() const {
  const std::lock_guard guard(_mutex);
  return {.leases = static_cast<int>(_leases.size()),
          .objects = static_cast<int>(_objects.size()),
          .updates = _updates};
}

std::string SessionMixin::GetSessionNonce() const {
  return _nonce;
}

}  // namespace Tessa
