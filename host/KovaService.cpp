#include "host/KovaService.h"

#include <exception>
#include <memory>
#include <string>
#include <utility>
#include <vector>

#include "host/DataVolumes.h"
#include "host/Gate.h"
#include "host/HostError.h"
#include "host/KnownDisks.h"
#include "host/Machine.h"
#include "host/Refusal.h"
#include "host/RequestTexts.h"
#include "host/Simulation.h"
#include "host/UnmountedGroups.h"
#include "host/UnusableDisks.h"
#include "kova/agentd/include/HostCtlException.h"
#include "kova/agentd/include/KovaInfo.h"
#include "kova/agentd/include/KovaPlugin.h"
#include "nox/Faults.h"
#include "nox/Kova.h"
#include "nox/Operations.h"
#include "nox/Tasks.h"
#include "orbis/TypeDescriptor.h"
#include "otxctl/TaskScope.h"
#include "tessa/text/Escape.h"

namespace Host {

namespace Op = Nox::Operation;
using Nox::Kova::Host::DiskMapping;
using StorageInfo = Nox::Kova::Host::ConfigInfo::StorageInfo;
using Tessa::MakeRef;
using Tessa::Ref;

namespace {

// Who answers requests: the plug-in, and the machine behind it, or null.
struct Served : PluginHooks {
  Machine* machine;
};

// Calls a hook with empty texts; what it appended is the answer.
template <class Call>
Answer Ask(Call call) {
  std::string faultText;
  std::string resultText;
  call(faultText, resultText);
  return AnswerOf(faultText, std::move(resultText));
}

// The work's answer; what the gate refuses, and any exception, become a fault.
template <class Work>
Answer Guarded(Work work) {
  try {
    return work();
  } catch (const Orbis::MethodFault::Exception& refused) {
    return {.result = nullptr, .fault = refused.GetFault()};
  } catch (const HostCtl::Lib::HostCtlException& failed) {
    return FailedWith(failed.Describe());
  } catch (const std::exception& exception) {
    return FailedWith(exception.what());
  }
}

// A query that was answered with nothing at all has failed.
Answer OrFailed(Answer answer, const char* reason) {
  return answer.result || answer.fault ? answer : FailedWith(reason);
}

// A list that a request may leave out.
template <class List>
Ref<List> OrEmpty(const Ref<List>& list) {
  return list ? list : MakeRef<List>();
}

std::vector<std::string> NamesOf(const DiskList& disks) {
  std::vector<std::string> names;
  for (const Nox::Host::ScsiDisk* disk : disks) {
    names.push_back(disk->GetCanonicalName());
  }
  return names;
}

// What a removal hands to the kernel as it is.
struct Removal {
  template <class Request>
  explicit Removal(const Request& request)
      : passThrough(request.HasPassThrough() ? request.GetPassThrough() : ""),
        optionText(request.HasOptionText() ? request.GetOptionText() : ""),
        optionFirst(request.HasOptionFirst() ? request.GetOptionFirst() : 0),
        optionSecond(request.HasOptionSecond() ? request.GetOptionSecond() : 0) {
    Gate::CheckOption("passThrough", passThrough);
    Gate::CheckOption("optionText", optionText);
  }

  std::string passThrough;
  std::string optionText;
  int optionFirst;
  int optionSecond;
};

std::string RequestTag() {
  const OtxCtl::TaskScope* const task = OtxCtl::TaskScope::Current();
  return task == nullptr ? std::string() : task->GetId();
}

std::unique_ptr<HostCtl::Kova::KovaInfo> Kernel() {
  return std::unique_ptr<HostCtl::Kova::KovaInfo>(OtxCtl::Kova::KovaPluginImpl().GetKovaInfo());
}

Answer QueryDisks(const PluginHooks& hooks, const std::vector<std::string>& names) {
  std::vector<std::string> wanted = names;
  return OrFailed(Ask([&](std::string& faultText, std::string& resultText) {
                    hooks.queryDisksForKova(wanted, faultText, resultText);
                  }),
                  "The disks of the host could not be read; the agent's log says why.");
}

Answer QueryDisksForKova(const PluginHooks& hooks, const Op::QueryDisksForKova& request) {
  const std::vector<std::string> names =
      request.GetNames() ? request.GetNames()->Items() : std::vector<std::string>();
  Gate::CheckNames("names", names);
  return QueryDisks(hooks, names);
}

Answer GetStorageInfo(const PluginHooks& hooks, const Op::GetStorageInfo&) {
  return OrFailed(Ask([&](std::string&, std::string& resultText) { hooks.getStorageInfo(resultText); }),
                  "The disk groups of the host could not be read; the agent's log says why.");
}

// The mounted groups as the plug-in tells them, and behind them the others that the kernel has; each with the
// data volumes that the machine knows.
Answer GetDiskGroups(const Served& served, const Op::GetDiskGroups&) {
  const std::shared_ptr<void> look = served.machine == nullptr ? nullptr : served.machine->HoldLook();
  Answer answer = GetStorageInfo(served, Op::GetStorageInfo());
  auto* const info = dynamic_cast<StorageInfo*>(answer.result.Get());
  if (info == nullptr) {
    return answer;
  }
  const Answer more = Guarded([&] {
    AppendUnlisted(GroupsOf(*Kernel()), KnownDisks::Now(), *info);
    if (served.machine != nullptr) {
      AddDataVolumes(served.machine->GetDataVolumes(), *info);
    }
    return Answer();
  });
  return {.result = Ref<StorageInfo>(info), .fault = more.fault};  // beside the groups that could be read
}

Answer GetConfigInfo(const PluginHooks& hooks, const Op::GetConfigInfo&) {
  return OrFailed(Ask([&](std::string&, std::string& resultText) { hooks.getConfigInfo(resultText); }),
                  "The configuration of the host could not be read; the agent's log says why.");
}

Answer GetTwin(const Served& served, const Op::GetTwin&) {
  if (served.machine == nullptr) {
    throw HostError("nobody knows the machine of this host: it cannot be described");
  }
  Twin taken = served.machine->TakeTwin();
  const auto twin = MakeRef<Nox::Kova::Host::Twin>();
  twin->SetGeneration(std::move(taken.generation));
  twin->SetDescription(std::move(taken.description));
  return {.result = twin, .fault = nullptr};
}

Answer AddDisks(const PluginHooks& hooks, const Op::AddDisks& request) {
  const KnownDisks known = KnownDisks::Now();
  const Ref<DiskList> disks = OrEmpty(request.GetDisks());
  Gate::AdmitDisks(*disks, known);
  Gate::RequireWholeGroups(*disks, known, *Kernel());
  const Kovasvc::Texts texts = ToTexts(*disks);
  Answer answer = Ask([&](std::string& faultText, std::string& resultText) {
    hooks.addDisks(texts, RequestTag(), faultText, resultText);
  });
  if (dynamic_cast<const Nox::Fault::InsufficientDisks*>(answer.fault.Get()) != nullptr) {
    NameUnusableDisks(Guarded([&] { return QueryDisks(hooks, NamesOf(*disks)); }), *answer.fault);
  }
  return answer;
}

Answer AddAllEligibleDisks(const PluginHooks& hooks, const Op::AddAllEligibleDisks&) {
  return Ask([&](std::string& faultText, std::string& resultText) {
    hooks.addAllEligibleDisks(RequestTag(), faultText, resultText);
  });
}

Answer InitializeDisks(const PluginHooks& hooks, const Op::InitializeDisks& request) {
  const Ref<MappingList> mappings = OrEmpty(request.GetMappings());
  Gate::AdmitNewGroups(*mappings, KnownDisks::Now());
  const Kovasvc::Texts texts = ToTexts(*mappings);
  Gate::RequireAnswers(*Kernel());
  return Ask([&](std::string& faultText, std::string& resultText) {
    hooks.initializeDisks(texts, RequestTag(), faultText, resultText);
  });
}

Answer UnmountDiskMapping(const PluginHooks& hooks, const Op::UnmountDiskMapping& request) {
  const Ref<MappingList> mappings = OrEmpty(request.GetMappings());
  Gate::AdmitGroups(*mappings, KnownDisks::Now());
  const Kovasvc::Texts texts = ToTexts(*mappings);
  return Ask([&](std::string& faultText, std::string& resultText) {
    hooks.unmountDiskMapping(texts, RequestTag(), faultText, resultText);
  });
}

Answer RemoveDisk(const PluginHooks& hooks, const Op::RemoveDisk& request) {
  const std::string& disk = request.GetDisk();
  Gate::CheckName("disk", disk);
  const Removal removal(request);
  Gate::RequireOneIfAbsent("disk", disk, *Kernel());
  return Ask([&](std::string& faultText, std::string&) {
    hooks.removeDisks(disk, removal.passThrough, removal.optionText, removal.optionFirst,
                      removal.optionSecond, faultText);
  });
}

Answer RemoveDiskMapping(const PluginHooks& hooks, const Op::RemoveDiskMapping& request) {
  const Removal removal(request);
  const Ref<DiskMapping>& mapping = request.GetMapping();
  Gate::AdmitGroup(mapping.Get(), KnownDisks::Now());
  const auto kernel = Kernel();
  Gate::RequireGroupIfAbsent(*mapping, *kernel);
  Gate::RequireOneIfAbsent("mapping.ssd", mapping->GetSsd()->GetCanonicalName(), *kernel);
  const std::string text = ToText(*mapping);
  return Ask([&](std::string& faultText, std::string&) {
    hooks.removeDiskMapping(text, removal.passThrough, removal.optionText, removal.optionFirst,
                            removal.optionSecond, faultText);
  });
}

Answer ClaimUnmountedDiskgroup(const PluginHooks& hooks, const Op::ClaimUnmountedDiskgroup&) {
  hooks.claimUnmountedDiskgroup();
  return {};
}

// A host by itself remembers no changes: its agent does.
Answer GetTasks(const PluginHooks&, const Op::GetTasks&) {
  return {.result = MakeRef<Orbis::DataArray<Nox::Task>>(), .fault = nullptr};
}

Answer GetTask(const PluginHooks&, const Op::GetTask& request) {
  Refuse("id", "there is no task '" + Tessa::Escape(request.GetId()) + "'");
}

// Which function answers which request.
struct Row {
  const Orbis::TypeDescriptor& (*request)();
  Answer (*answer)(const Served& served, const Orbis::DataObject& request);
};

template <class Request, auto function>
constexpr Row rowOf = {&Request::StaticType, [](const Served& served, const Orbis::DataObject& request) {
                         return function(served, static_cast<const Request&>(request));
                       }};

constexpr Row rows[] = {
    rowOf<Op::QueryDisksForKova, &QueryDisksForKova>,
    rowOf<Op::GetStorageInfo, &GetStorageInfo>,
    rowOf<Op::GetDiskGroups, &GetDiskGroups>,
    rowOf<Op::GetConfigInfo, &GetConfigInfo>,
    rowOf<Op::GetTwin, &GetTwin>,
    rowOf<Op::GetTasks, &GetTasks>,
    rowOf<Op::GetTask, &GetTask>,
    rowOf<Op::AddDisks, &AddDisks>,
    rowOf<Op::AddAllEligibleDisks, &AddAllEligibleDisks>,
    rowOf<Op::InitializeDisks, &InitializeDisks>,
    rowOf<Op::UnmountDiskMapping, &UnmountDiskMapping>,
    rowOf<Op::RemoveDisk, &RemoveDisk>,
    rowOf<Op::RemoveDiskMapping, &RemoveDiskMapping>,
    rowOf<Op::ClaimUnmountedDiskgroup, &ClaimUnmountedDiskgroup>,
};

Answer AnswerTo(const Orbis::DataObject& request, const Served& served) {
  for (const Row& row : rows) {
    if (&row.request() == &request.GetType()) {
      return Guarded([&] { return row.answer(served, request); });
    }
  }
  return FailedWith("this host does not serve " + request.GetType().name);
}

}  // namespace

KovaService::KovaService(const PluginHooks& hooks, Machine* machine)
    : _hooks(hooks),
      _machine(machine),
      _simulation(machine == nullptr ? nullptr : machine->GetSimulation()) {}

// To read the storage is what makes the plug-in ask the kernel for the disks again.
void KovaService::DropDiskCache() const {
  std::string dropped;
  _hooks.getStorageInfo(dropped);
}

Answer KovaService::Query(const Op::Query& request) const {
  const bool isOfDisks = &request.GetType() == &Op::QueryDisksForKova::StaticType();
  if (!isOfDisks || !ChangesByItself()) {
    return AnswerTo(request, {_hooks, _machine});
  }
  return Guarded([&] {
    const std::shared_ptr<void> look = _machine->HoldLook();
    DropDiskCache();
    return AnswerTo(request, {_hooks, _machine});
  });
}

Answer KovaService::Change(Op::Change&& request) const {
  return Guarded([&] {
    if (ChangesByItself()) {
      DropDiskCache();
    }
    return AnswerTo(request, {_hooks, _machine});
  });
}

Simulation& KovaService::Simulated() const {
  if (_simulation == nullptr) {
    throw HostError("this is no simulated host: there is no description of it");
  }
  return *_simulation;
}

std::string KovaService::DescribeHost() const {
  return Simulated().Describe();
}

void KovaService::CheckHostChange(std::string_view change) const {
  if (_simulation != nullptr) {
    Gate::CheckHostChange(*_simulation, change);
  }
}

Answer KovaService::ChangeHost(const std::string& change) const {
  Simulation& simulation = Simulated();
  return Guarded([&] {
    try {
      simulation.Change(change);
    } catch (const ChangeRefused& refused) {
      Gate::RefuseChange(refused.what());
    }
    // The plug-in's cache of the disks must not be older than the host. This is done out here and not by the
    // machine's listener, which may run inside a hook that holds the plug-in's locks.
    DropDiskCache();
    return Answer();
  });
}

}  // namespace Host
