// The plug-in on a simulated host, and requests for it: what the tests of whole runs share.
//
// A HostedPlugin installs every seam of the process and takes it away again, so only one may live at a time.
// Locks, log lines and kernel calls are recorded. Run may be called from several threads.
#pragma once

#include <functional>
#include <map>
#include <memory>
#include <mutex>
#include <ostream>
#include <string>
#include <vector>

#include "host/AgentApp.h"
#include "host/Inventory.h"
#include "nox/Kova.h"
#include "orbis/Types.h"
#include "otxctl/fault/CallRecorder.h"
#include "otxctl/sim/SimHost.h"
#include "tessa/Panic.h"
#include "tests/support/RecordingLockFactory.h"
#include "tests/support/RecordingLogger.h"
#include "tests/support/Timeline.h"

namespace Integration {

enum class Operation {
  AddDisks,
  AddAllEligibleDisks,
  InitializeDisks,
  RemoveDisk,
  RemoveDiskMapping,
  UnmountDiskMapping,
  ClaimUnmountedDiskgroup,
  QueryDisksForKova,
  GetStorageInfo,
  GetConfigInfo,
};

// A group of a request, by the names of its disks.
struct NamedGroup {
  std::string ssd;
  std::vector<std::string> capacity;

  friend bool operator==(const NamedGroup&, const NamedGroup&) = default;
};

struct Request {
  Operation operation = Operation::AddAllEligibleDisks;
  std::vector<std::string> disks;  // of additions and queries; of a removal the first
  std::vector<NamedGroup> groups;  // of what works on groups; of a removal the first
};

std::ostream& operator<<(std::ostream& out, const NamedGroup& group);
std::ostream& operator<<(std::ostream& out, const Request& request);

// What came back, as texts that a test can write down:
//   a fault     "DiskIsUSB naa.1", "SystemError: reason", "KovaFault [key]"
//   a result    "s1: a b", then "!" and its fault, if any, then the states of its disks: "| s1 inUse, a
//   inUse"
// Null where nothing was appended.
struct Answer {
  std::string ended;  // the text of a panic; empty for an answer
  bool hasResult = false;
  std::vector<std::string> results;
  std::string fault;  // empty: none

  friend bool operator==(const Answer&, const Answer&) = default;
};
std::ostream& operator<<(std::ostream& out, const Answer& answer);

// What no host may ever look like: a disk in two groups, or twice in one; a group of no disks, or of too
// many. Empty when nothing is wrong.
std::string WrongGroups(const OtxCtl::Sim::HostDescription& host);

class HostedPlugin {
 public:
  explicit HostedPlugin(const OtxCtl::Sim::HostDescription& description);
  ~HostedPlugin();
  HostedPlugin(const HostedPlugin&) = delete;
  HostedPlugin& operator=(const HostedPlugin&) = delete;

  OtxCtl::Sim::SimHost& Host() { return *_host; }
  OtxCtl::Fault::CallRecorder& Calls() { return *_calls; }
  TestSupport::RecordingLogger& Log() { return *_logger; }
  TestSupport::RecordingLockFactory& Locks() { return _locks; }
  // Forgets what locks and calls have left behind, for long runs.
  void ForgetCalls();
  // From now on, the call-th call of the kernel's operation throws, until faults are cleared.
  void FailCall(const std::string& operation, int call, std::string_view exception);

  // Changes the host from outside, and tells the plug-in as an agent does.
  void ChangeHost(const std::function<void(OtxCtl::Sim::HostDescription&)>& edit);

  // Hands the request to the plug-in's hook. A disk that the inventory knows is the inventory's; another is
  // one that has nothing but its name, and is a flash disk where it heads a group.
  Answer Run(const Request& request);

 private:
  Tessa::Ref<Nox::Host::ScsiDisk> Disk(const std::string& name, bool ssd) const;
  std::vector<std::string> DiskTexts(const std::vector<std::string>& names) const;
  std::string GroupText(const NamedGroup& group) const;
  std::vector<std::string> GroupTexts(const std::vector<NamedGroup>& groups) const;
  void CallHook(const Request& request, std::string& fault, std::string& result) const;
  void PublishInventory();

  TestSupport::Timeline _timeline;
  TestSupport::RecordingLockFactory _locks{_timeline};
  Tessa::Ref<TestSupport::RecordingLogger> _logger;
  const std::shared_ptr<OtxCtl::Sim::SimHost> _host;
  const std::shared_ptr<OtxCtl::Fault::CallRecorder> _calls;
  Host::AgentApp _app;
  const Tessa::Ref<Host::Inventory> _inventory;
  std::map<std::string, int> _callsSoFar;  // those that are forgotten
  std::mutex _publishing;  // one after the other, so that the newest host is the last published
  Tessa::System::SystemFactory* _factoryBefore = nullptr;
  Tessa::Ref<Tessa::Service::Logger> _loggerBefore;
  Tessa::Service::App* _appBefore = nullptr;
  Tessa::PanicHandler _panicHandlerBefore = nullptr;
};

}  // namespace Integration
