// Sessions: on whose behalf somebody works.
//
// Session is the interface, SessionMixin its implementation in memory, for classes that are a session
// beside other things (it brings no reference count of its own).
//
// Threads: every operation of SessionMixin is safe from any thread.
#pragma once

#include <chrono>
#include <map>
#include <mutex>
#include <optional>
#include <set>
#include <string>

#include "tessa/Object.h"
#include "tessa/Ref.h"

namespace Tessa {

class TESSA_API Session : public virtual Object {
 public:
  using UtcTime = std::chrono::system_clock::time_point;
  using MonotonicTime = std::chrono::steady_clock::time_point;

  struct Stats {
    int leases = 0;
    int objects = 0;
    int updates = 0;  // how often UpdateLastActive was called
  };

  // Closed, or past its date, or idle for longer than the configured time without a lease.
  virtual bool HasExpired() const = 0;

  // What the authorization layer keeps with the session.
  virtual Ref<Object> GetAuthData() const = 0;
  virtual void SetAuthData(Ref<Object> data) = 0;

  // A lease keeps an idle session alive. Leases are named; one name counts once.
  virtual void RemoveLease(const std::string& name) = 0;
  virtual void AddLease(const std::string& name) = 0;
  virtual bool HasLease() const = 0;

  virtual void CloseSession() = 0;
  virtual bool IsClosed() const = 0;

  virtual std::string GetUserAgent() const = 0;
  virtual void SetUserAgent(const std::string& agent) = 0;

  // Objects kept for the session's user; null for an unknown name, and null takes a name away.
  virtual Ref<Object> LookupObject(const std::string& name) const = 0;
  virtual void SetObject(const std::string& name, Ref<Object> object) = 0;

  // Which transport the session came in by; empty for one made in the process.
  virtual std::string GetBindingInfo() const = 0;
  // Which user the session acts as; empty before it was authorized.
  virtual std::string GetUserBinding() const = 0;
  virtual void SetUserBinding(const std::string& user) = 0;
  virtual bool IsAuthenticated() const = 0;

  virtual UtcTime LastLoginTimeUtc() const = 0;
  virtual MonotonicTime LastActiveTime() const = 0;
  virtual UtcTime LastActiveTimeUtc() const = 0;
  virtual void UpdateLastActive() = 0;

  // Unset: never.
  virtual std::optional<UtcTime> GetExpirationDate() const = 0;
  virtual std::optional<std::chrono::seconds> GetConfiguredIdleTimeout() const = 0;

  virtual std::string GetId() const = 0;
  virtual std::string GetLocale() const = 0;
  virtual void SetLocale(const std::string& locale) = 0;
  virtual Stats GetStats() const = 0;
  // A random text, made with the session, that a client can be asked to repeat.
  virtual std::string GetSessionNonce() const = 0;

 protected:
  Session() = default;
  ~Session() override;
};

class TESSA_API SessionMixin : public virtual Session {
 public:
  bool HasExpired() const override;
  Ref<Object> GetAuthData() const override;
  void SetAuthData(Ref<Object> data) override;
  void RemoveLease(const std::string& name) override;
  void AddLease(const std::string& name) override;
  bool HasLease() const override;
  void CloseSession() override;
  bool IsClosed() const override;
  std::string GetUserAgent() const override;
  void SetUserAgent(const std::string& agent) override;
  Ref<Object> LookupObject(const std::string& name) const override;
  void SetObject(const std::string& name, Ref<Object> object) override;
  std::string GetBindingInfo() const override;
  std::string GetUserBinding() const override;
  void SetUserBinding(const std::string& user) override;
  bool IsAuthenticated() const override;
  UtcTime LastLoginTimeUtc() const override;
  MonotonicTime LastActiveTime() const override;
  UtcTime LastActiveTimeUtc() const override;
  void UpdateLastActive() override;
  std::optional<UtcTime> GetExpirationDate() const override;
  std::optional<std::chrono::seconds> GetConfiguredIdleTimeout() const override;
  std::string GetId() const override;
  std::string GetLocale() const override;
  void SetLocale(const std::string& locale) override;
  Stats GetStats() const override;
  std::string GetSessionNonce() const override;

 protected:
  // How long the session lives, idle and in all; unset: forever.
  struct Lifetime {
    std::optional<std::chrono::seconds> idle;
    std::optional<UtcTime> until;
  };

  SessionMixin();
  explicit SessionMixin(Lifetime lifetime);
  ~SessionMixin() override;

 private:
  const std::string _id;
  const std::string _nonce;
  const Lifetime _lifetime;
  const UtcTime _loginTime;

  mutable std::mutex _mutex;  // guards all below
  Ref<Object> _authData;
  std::set<std::string> _leases;
  std::map<std::string, Ref<Object>> _objects;
  std::string _userAgent;
  std::string _user;
  std::string _locale = "en";
  MonotonicTime _lastActive;
  UtcTime _lastActiveUtc;
  int _updates = 0;
  bool _closed = false;
};

}  // namespace Tessa
