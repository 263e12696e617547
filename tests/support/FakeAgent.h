// The host agent as the plug-in sees it: a registry with a storage system in it, and an authorization
// manager. Set up before other threads use it.
#pragma once

#include <functional>
#include <initializer_list>
#include <map>
#include <string>
#include <vector>

#include "nox/Host.h"
#include "nox/StorageSystem.h"
#include "orbis/DataArray.h"
#include "tessa/App.h"
#include "tessa/Authorize.h"
#include "tessa/Session.h"
#include "tests/support/Timeline.h"

namespace TestSupport {

// Hands out one list of logical units. "GetStorageDeviceInfo" is noted for each reading.
class FakeStorageSystem final : public Nox::Host::StorageSystem {
 public:
  explicit FakeStorageSystem(Timeline& timeline);
  ~FakeStorageSystem() override;

  // The list of units; entries may be null.
  void SetUnits(std::vector<Tessa::Ref<Nox::Host::ScsiLun>> units);
  void SetDisks(const std::vector<Tessa::Ref<Nox::Host::ScsiDisk>>& disks);
  // Null: the host cannot say.
  void SetInfo(Tessa::Ref<Nox::Host::StorageDeviceInfo> info);
  // Called at the start of each reading, on the calling thread. May throw.
  void SetObserver(std::function<void()> observer);

  void GetStorageDeviceInfo(Tessa::Ref<Nox::Host::StorageDeviceInfo>& info) override;

 private:
  Timeline& _timeline;
  Tessa::Ref<Nox::Host::StorageDeviceInfo> _info;
  std::function<void()> _observer;
};

// Managed objects by name. "RegisterSession" is noted.
class FakeApp final : public Tessa::Service::App {
 public:
  explicit FakeApp(Timeline& timeline);
  ~FakeApp() override;

  void SetObject(const std::string& name, Tessa::Ref<Tessa::Object> object);
  const std::vector<Tessa::Ref<Tessa::Session>>& Sessions() const { return _sessions; }

  Tessa::Ref<Tessa::Object> LookupObject(const std::string& name) const override;
  void RegisterSession(const Tessa::Ref<Tessa::Session>& session) override;

 private:
  Timeline& _timeline;
  std::map<std::string, Tessa::Ref<Tessa::Object>> _objects;
  std::vector<Tessa::Ref<Tessa::Session>> _sessions;
};

// Lets every session act as whom it asks for. "AddConnection" is noted.
class FakeAuthorization final : public Tessa::Authorize::AuthorizeManager {
 public:
  struct Connection {
    Tessa::Ref<Tessa::Session> session;
    std::string user;
    bool hasToken = false;
    bool system = false;
  };

  explicit FakeAuthorization(Timeline& timeline);
  ~FakeAuthorization() override;

  // From now on AddConnection calls this, which should throw.
  void SetFailure(std::function<void()> failure) { _failure = std::move(failure); }
  const std::vector<Connection>& Connections() const { return _connections; }

  void AddConnection(const Tessa::Ref<Tessa::Session>& session, const std::string& user,
                     const Tessa::Ref<Tessa::System::AuthTokenHelper>& token, bool system) override;

 private:
  Timeline& _timeline;
  std::function<void()> _failure;
  std::vector<Connection> _connections;
};

}  // namespace TestSupport
