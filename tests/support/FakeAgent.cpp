#include "tests/support/FakeAgent.h"

#include <utility>

namespace TestSupport {

using Nox::Host::ScsiDisk;
using Nox::Host::ScsiLun;
using Nox::Host::StorageDeviceInfo;
using Tessa::MakeRef;
using Tessa::Ref;

FakeStorageSystem::FakeStorageSystem(Timeline& timeline) : _timeline(timeline) {
  SetUnits({});
}
FakeStorageSystem::~FakeStorageSystem() = default;

void FakeStorageSystem::SetUnits(std::vector<Ref<ScsiLun>> units) {
  const auto list = MakeRef<Orbis::DataArray<ScsiLun>>();
  for (const Ref<ScsiLun>& unit : units) {
    list->Append(unit);
  }
  _info = MakeRef<StorageDeviceInfo>();
  _info->SetScsiLun(list);
}

void FakeStorageSystem::SetDisks(const std::vector<Ref<ScsiDisk>>& disks) {
  SetUnits({disks.begin(), disks.end()});
}

void FakeStorageSystem::SetInfo(Ref<StorageDeviceInfo> info) {
  _info = std::move(info);
}
void FakeStorageSystem::SetObserver(std::function<void()> observer) {
  _observer = std::move(observer);
}

void FakeStorageSystem::GetStorageDeviceInfo(Ref<StorageDeviceInfo>& info) {
  _timeline.Note("GetStorageDeviceInfo");
  if (const auto observer = _observer) {  // a copy: an observer may replace itself
    observer();
  }
  info = _info;
}

FakeApp::FakeApp(Timeline& timeline) : _timeline(timeline) {}
FakeApp::~FakeApp() = default;

void FakeApp::SetObject(const std::string& name, Ref<Tessa::Object> object) {
  _objects[name] = std::move(object);
}

Ref<Tessa::Object> FakeApp::LookupObject(const std::string& name) const {
  const auto found = _objects.find(name);
  return found == _objects.end() ? Ref<Tessa::Object>() : found->second;
}

void FakeApp::RegisterSession(const Ref<Tessa::Session>& session) {
  _timeline.Note("RegisterSession");
  _sessions.push_back(session);
}

FakeAuthorization::FakeAuthorization(Timeline& timeline) : _timeline(timeline) {}
FakeAuthorization::~FakeAuthorization() = default;

void FakeAuthorization::AddConnection(const Ref<Tessa::Session>& session, const std::string& user,
                                      const Ref<Tessa::System::AuthTokenHelper>& token, bool system) {
  _timeline.Note("AddConnection");
  if (_failure) {
    _failure();
  }
  _connections.push_back({session, user, static_cast<bool>(token), system});
}

}  // namespace TestSupport
