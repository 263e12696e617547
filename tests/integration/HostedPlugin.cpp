#include "tests/integration/HostedPlugin.h"

#include <array>
#include <set>

#include "kova/agentd/KovaLibManager.h"
#include "kova/agentd/KovaManagerImpl.h"
#include "kova/agentd/util/KovaUtil.h"
#include "machines/SimulatedInventory.h"
#include "nox/Faults.h"
#include "nox/Host.h"
#include "orbis/Soap.h"
#include "orbis/TypeDescriptor.h"
#include "otxctl/ProviderFactory.h"
#include "otxctl/fault/RecordingProvider.h"
#include "otxctl/sim/SimProvider.h"
#include "tessa/Narrow.h"
#include "tests/support/Groups.h"
#include "tests/support/Matchers.h"

namespace Integration {

using Nox::Host::ScsiDisk;
using Nox::Kova::Host::DiskMapResult;
using Nox::Kova::Host::DiskResult;
using Orbis::DataArray;
using Orbis::MethodFault;
using OtxCtl::Sim::HostDescription;
using Tessa::MakeRef;
using Tessa::Ref;

namespace {

constexpr std::size_t mostCapacityDisks = 7;
constexpr std::array<const char*, 10> operationNames = {
    "AddDisks",          "AddAllEligibleDisks", "InitializeDisks",         "RemoveDisk",
    "RemoveDiskMapping", "UnmountDiskMapping",  "ClaimUnmountedDiskgroup", "QueryDisksForKova",
    "GetStorageInfo",    "GetConfigInfo"};

// A panic of the plug-in, on its way to whoever made the request. Derived from nothing, so that nobody in
// between takes it for an exception of his own.
struct Panicked {
  std::string text;
};
void ThrowPanic(const char* text) {
  throw Panicked{text};
}

std::string SoapText(const Orbis::Any& object) {
  std::string text;
  Orbis::SerializeObjectToSoap(object, nullptr, text);
  return text;
}

std::string FaultText(const MethodFault& fault) {
  std::string text = fault.GetType().name;
  if (const auto* system = dynamic_cast<const Orbis::Fault::SystemError*>(&fault)) {
    text += ": " + system->GetReason();
  }
  const auto* disk = dynamic_cast<const Nox::Fault::KovaDiskFault*>(&fault);
  if (disk != nullptr && disk->HasDevice()) {
    text += " " + disk->GetDevice();
  }
  for (const std::string& key : TestSupport::MessageKeys(fault)) {
    text += " [" + key + "]";
  }
  return text;
}

std::string StateText(const DiskResult& result) {
  return result.GetDisk()->GetCanonicalName() + " " + result.GetState();
}

std::string ResultText(const DiskMapResult& result) {
  std::string text = TestSupport::GroupText(*result.GetMapping());
  if (result.GetError()) {
    text += " !" + FaultText(*result.GetError());
  }
  const char* separator = " | ";
  if (result.GetDiskResult()) {
    for (const DiskResult* disk : *result.GetDiskResult()) {
      text += separator + StateText(*disk);
      separator = ", ";
    }
  }
  return text;
}

void ReadResults(const std::string& text, Answer& answer) {
  Ref<Orbis::Any> value;
  Orbis::DeserializeSoapToObject(text, value);
  answer.hasResult = true;
  if (const auto* groups = dynamic_cast<const DataArray<DiskMapResult>*>(value.Get())) {
    for (const DiskMapResult* result : *groups) {
      answer.results.push_back(ResultText(*result));
    }
  } else if (const auto* disks = dynamic_cast<const DataArray<DiskResult>*>(value.Get())) {
    for (const DiskResult* result : *disks) {
      answer.results.push_back(StateText(*result));
    }
  } else {
    answer.results.push_back(value->ToString());
  }
}

}  // namespace

std::ostream& operator<<(std::ostream& out, const NamedGroup& group) {
  out << group.ssd << ":";
  for (const std::string& disk : group.capacity) {
    out << " " << disk;
  }
  return out;
}

std::ostream& operator<<(std::ostream& out, const Request& request) {
  out << operationNames[static_cast<std::size_t>(request.operation)];
  for (const std::string& disk : request.disks) {
    out << " " << disk;
  }
  for (const NamedGroup& group : request.groups) {
    out << " {" << group << "}";
  }
  return out;
}

std::ostream& operator<<(std::ostream& out, const Answer& answer) {
  if (!answer.ended.empty()) {
    out << "panic: " << answer.ended << "; ";
  }
  out << (answer.hasResult ? "results:" : "no result");
  for (const std::string& result : answer.results) {
    out << " {" << result << "}";
  }
  return out << (answer.fault.empty() ? "; no fault" : "; fault: " + answer.fault);
}

std::string WrongGroups(const HostDescription& host) {
  std::set<std::string> members;
  for (const OtxCtl::Sim::HostGroup& group : host.groups) {
    if (group.capacity.empty() || group.capacity.size() > mostCapacityDisks) {
      return "the group of " + group.ssd + " has " + std::to_string(group.capacity.size()) +
             " capacity disks";
    }
    std::vector<std::string> all = group.capacity;
    all.push_back(group.ssd);
    for (const std::string& disk : all) {
      if (!members.insert(disk).second) {
        return disk + " is in a group twice";
      }
    }
  }
  return "";
}

HostedPlugin::HostedPlugin(const HostDescription& description)
    : _logger(MakeRef<TestSupport::RecordingLogger>()),
      _host(std::make_shared<OtxCtl::Sim::SimHost>(description)),
      _calls(std::make_shared<OtxCtl::Fault::CallRecorder>()),
      _inventory(MakeRef<Host::Inventory>()) {
  _factoryBefore = Tessa::System::SetSystemFactory(&_locks);
  _loggerBefore = Tessa::Service::GetDefaultLogger();
  Tessa::Service::SetDefaultLogger(_logger);
  _appBefore = Tessa::Service::SetApp(&_app);
  _panicHandlerBefore = Tessa::SetPanicHandler(&ThrowPanic);
  OtxCtl::Kova::SetProviderFactory([host = _host, calls = _calls] {
    return std::make_unique<OtxCtl::Fault::RecordingProvider>(
        std::make_unique<OtxCtl::Sim::SimProvider>(host), calls);
  });
  _host->SetListener([this] { PublishInventory(); });
  PublishInventory();
  Ref<Tessa::Service::Logger> logger = _logger;
  Kovasvc::_kovaManagerImpl = MakeRef<Kovasvc::KovaManagerImpl>(logger);
}

HostedPlugin::~HostedPlugin() {
  Kovasvc::_kovaManagerImpl.Reset();
  Kovasvc::Util::KovaUtil::_session.Reset();
  Kovasvc::Util::KovaUtil::_logger.Reset();
  _host->SetListener({});
  OtxCtl::Kova::SetProviderFactory({});
  Tessa::SetPanicHandler(_panicHandlerBefore);
  Tessa::Service::SetApp(_appBefore);
  Tessa::Service::SetDefaultLogger(_loggerBefore);
  Tessa::System::SetSystemFactory(_factoryBefore);
}

void HostedPlugin::PublishInventory() {
  const std::lock_guard guard(_publishing);
  const HostDescription host = _host->Snapshot();
  _inventory->Replace(Machines::DescribeInventory(host));
  const bool present = host.storageSystem == OtxCtl::Sim::StorageSystem::Present;
  _app.SetObject("storageSystem", present ? Ref<Tessa::Object>(_inventory) : nullptr);
}

void HostedPlugin::ForgetCalls() {
  _timeline.Take();
  for (const OtxCtl::Fault::RecordedCall& call : _calls->TakeEnded()) {
    ++_callsSoFar[call.operation];
  }
  _logger->Clear();
}

void HostedPlugin::FailCall(const std::string& operation, int call, std::string_view exception) {
  ForgetCalls();
  _calls->Inject(
      {operation, _callsSoFar[operation] + call, std::string(exception), "injected", "offender", 0});
}

void HostedPlugin::ChangeHost(const std::function<void(HostDescription&)>& edit) {
  _host->Change(edit);
  std::string dropped;
  GetStorageInfoHookFn(dropped);
}

Answer HostedPlugin::Run(const Request& request) {
  Answer answer;
  std::string fault;
  std::string result;
  try {
    CallHook(request, fault, result);
  } catch (const Panicked& panic) {
    answer.ended = panic.text;
  }
  if (!result.empty()) {
    ReadResults(result, answer);
  }
  if (!fault.empty()) {
    answer.fault = FaultText(*TestSupport::ReadAnswer<MethodFault>(fault));
  }
  return answer;
}

void HostedPlugin::CallHook(const Request& request, std::string& fault, std::string& result) const {
  switch (request.operation) {
    case Operation::AddDisks:
      return AddDisksHookFn(DiskTexts(request.disks), "tag", fault, result);
    case Operation::AddAllEligibleDisks:
      return AddAllEligibleDisksHookFn("tag", fault, result);
    case Operation::InitializeDisks:
      return InitializeDisksHookFn(GroupTexts(request.groups), "tag", fault, result);
    case Operation::RemoveDisk:
      return RemoveDisksHookFn(request.disks.at(0), "", "", 0, 0, fault);
    case Operation::RemoveDiskMapping:
      return RemoveDiskMappingHookFn(GroupText(request.groups.at(0)), "", "", 0, 0, fault);
    case Operation::UnmountDiskMapping:
      return UnmountDiskMappingHookFn(GroupTexts(request.groups), "tag", fault, result);
    case Operation::ClaimUnmountedDiskgroup:
      return ClaimUnmountedDiskgroupHookFn();
    case Operation::QueryDisksForKova: {
      std::vector<std::string> names = request.disks;
      return QueryDisksForKovaHookFn(names, fault, result);
    }
    case Operation::GetStorageInfo:
      return GetStorageInfoHookFn(result);
    case Operation::GetConfigInfo:
      return GetConfigInfoHookFn(result);
  }
}

Ref<ScsiDisk> HostedPlugin::Disk(const std::string& name, bool ssd) const {
  Ref<Nox::Host::StorageDeviceInfo> info;
  _inventory->GetStorageDeviceInfo(info);
  for (Nox::Host::ScsiLun* unit : *info->GetScsiLun()) {
    auto* const disk = dynamic_cast<ScsiDisk*>(unit);
    if (disk != nullptr && disk->GetCanonicalName() == name) {
      return Ref<ScsiDisk>(disk);
    }
  }
  const auto disk = MakeRef<ScsiDisk>();
  disk->SetCanonicalName(name);
  disk->SetSsd(ssd);
  return disk;
}

std::vector<std::string> HostedPlugin::DiskTexts(const std::vector<std::string>& names) const {
  std::vector<std::string> texts;
  for (const std::string& name : names) {
    texts.push_back(SoapText(*Disk(name, false)));
  }
  return texts;
}

std::string HostedPlugin::GroupText(const NamedGroup& group) const {
  const auto disks = MakeRef<DataArray<ScsiDisk>>();
  for (const std::string& name : group.capacity) {
    disks->Append(Disk(name, false));
  }
  const auto mapping = MakeRef<Nox::Kova::Host::DiskMapping>();
  mapping->SetSsd(Disk(group.ssd, true));
  mapping->SetNonSsd(disks);
  return SoapText(*mapping);
}

std::vector<std::string> HostedPlugin::GroupTexts(const std::vector<NamedGroup>& groups) const {
  std::vector<std::string> texts;
  for (const NamedGroup& group : groups) {
    texts.push_back(GroupText(group));
  }
  return texts;
}

}  // namespace Integration
