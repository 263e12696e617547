#include "host/KovaService.h"

#include <exception>
#include <memory>
#include <utility>

#include "host/Gate.h"
#include "host/HostError.h"
#include "host/KnownDisks.h"
#include "host/RequestTexts.h"
#include "host/UnmountedGroups.h"
#include "host/UnusableDisks.h"
#include "kova/agentd/include/HostCtlException.h"
#include "kova/agentd/include/KovaInfo.h"
#include "kova/agentd/include/KovaPlugin.h"
#include "nox/Faults.h"
#include "nox/Kova.h"
#include "otxctl/TaskScope.h"
#include "otxctl/sim/SimHost.h"

namespace Host {

using Nox::Kova::Host::DiskMapping;
using OtxCtl::Sim::HostDescription;
using StorageInfo = Nox::Kova::Host::ConfigInfo::StorageInfo;
using Tessa::Ref;

namespace {

// Calls a hook with empty texts and reads what it appended.
template <class Call>
Answer Ask(Call call) {
  std::string faultText;
  std::string resultText;
  call(faultText, resultText);
  return ReadAnswer(faultText, resultText);
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

std::vector<std::string> NamesOf(const DiskList& disks) {
  std::vector<std::string> names;
  for (const Nox::Host::ScsiDisk* disk : disks) {
    names.push_back(disk->GetCanonicalName());
  }
  return names;
}

std::string RequestTag() {
  const OtxCtl::TaskScope* const task = OtxCtl::TaskScope::Current();
  return task == nullptr ? std::string() : task->GetId();
}

std::unique_ptr<HostCtl::Kova::KovaInfo> Kernel() {
  return std::unique_ptr<HostCtl::Kova::KovaInfo>(OtxCtl::Kova::KovaPluginImpl().GetKovaInfo());
}

}  // namespace

Answer KovaService::QueryDisksForKova(const std::vector<std::string>& names) const {
  return Read(QueryDisksWritten(names));
}

WrittenAnswer KovaService::QueryDisksWritten(const std::vector<std::string>& names) const {
  WrittenAnswer written;
  const Answer rest = Guarded([&] {
    Gate::CheckNames("names", names);
    std::vector<std::string> wanted = names;
    std::string faultText;
    std::string resultText;
    _hooks.queryDisksForKova(wanted, faultText, resultText);
    const Answer read = ReadAnswer(faultText, "");
    written.result = std::move(resultText);
    return written.result.empty()
               ? OrFailed(read, "The disks of the host could not be read; the agent's log says why.")
               : read;
  });
  written.fault = rest.fault;
  return written;
}

Answer KovaService::GetStorageInfo() const {
  return Guarded([&] {
    return OrFailed(Ask([&](std::string&, std::string& resultText) { _hooks.getStorageInfo(resultText); }),
                    "The disk groups of the host could not be read; the agent's log says why.");
  });
}

Answer KovaService::GetDiskGroups() const {
  Answer answer = GetStorageInfo();
  auto* const info = dynamic_cast<StorageInfo*>(answer.result.Get());
  if (info == nullptr) {
    return answer;
  }
  const Answer more = Guarded([&] {
    AppendUnlisted(GroupsOf(*Kernel()), KnownDisks::Now(), *info);
    return Answer();
  });
  answer.fault = more.fault;  // beside the groups that could be read
  return answer;
}

Answer KovaService::GetConfigInfo() const {
  return Guarded([&] {
    return OrFailed(Ask([&](std::string&, std::string& resultText) { _hooks.getConfigInfo(resultText); }),
                    "The configuration of the host could not be read; the agent's log says why.");
  });
}

Answer KovaService::AddDisks(const DiskList& disks) const {
  return Guarded([&] {
    const KnownDisks known = KnownDisks::Now();
    const Ref<DiskList> admitted = Gate::AdmitDisks(disks, known);
    Gate::DemandWholeGroups(*admitted, known, *Kernel());
    const Kovasvc::Texts texts = ToTexts(*admitted);
    Answer answer = Ask([&](std::string& faultText, std::string& resultText) {
      _hooks.addDisks(texts, RequestTag(), faultText, resultText);
    });
    if (dynamic_cast<const Nox::Fault::InsufficientDisks*>(answer.fault.Get()) != nullptr) {
      NameUnusableDisks(QueryDisksForKova(NamesOf(*admitted)), *answer.fault);
    }
    return answer;
  });
}

Answer KovaService::AddAllEligibleDisks() const {
  return Guarded([&] {
    return Ask([&](std::string& faultText, std::string& resultText) {
      _hooks.addAllEligibleDisks(RequestTag(), faultText, resultText);
    });
  });
}

Answer KovaService::InitializeDisks(const MappingList& mappings) const {
  return Guarded([&] {
    const Kovasvc::Texts texts = ToTexts(*Gate::AdmitNewGroups(mappings, KnownDisks::Now()));
    Gate::DemandAnswers(*Kernel());
    return Ask([&](std::string& faultText, std::string& resultText) {
      _hooks.initializeDisks(texts, RequestTag(), faultText, resultText);
    });
  });
}

Answer KovaService::UnmountDiskMapping(const MappingList& mappings) const {
  return Guarded([&] {
    const Kovasvc::Texts texts = ToTexts(*Gate::AdmitGroups(mappings, KnownDisks::Now()));
    return Ask([&](std::string& faultText, std::string& resultText) {
      _hooks.unmountDiskMapping(texts, RequestTag(), faultText, resultText);
    });
  });
}

Answer KovaService::RemoveDisk(const std::string& disk, const RemovalArguments& arguments) const {
  return Guarded([&] {
    Gate::CheckRemoval(disk, arguments);
    Gate::DemandOneIfAbsent("disk", disk, *Kernel());
    return Ask([&](std::string& faultText, std::string&) {
      _hooks.removeDisks(disk, arguments.passThrough, arguments.optionText, arguments.optionFirst,
                         arguments.optionSecond, faultText);
    });
  });
}

Answer KovaService::RemoveDiskMapping(const DiskMapping& mapping, const RemovalArguments& arguments) const {
  return Guarded([&] {
    Gate::CheckRemovalArguments(arguments);
    const Ref<DiskMapping> admitted = Gate::AdmitGroup(mapping, KnownDisks::Now());
    const auto kernel = Kernel();
    Gate::DemandGroupIfAbsent(*admitted, *kernel);
    Gate::DemandOneIfAbsent("mapping.ssd", admitted->GetSsd()->GetCanonicalName(), *kernel);
    const std::string text = ToText(*admitted);
    return Ask([&](std::string& faultText, std::string&) {
      _hooks.removeDiskMapping(text, arguments.passThrough, arguments.optionText, arguments.optionFirst,
                               arguments.optionSecond, faultText);
    });
  });
}

Answer KovaService::ClaimUnmountedDiskgroup() const {
  return Guarded([&] {
    _hooks.claimUnmountedDiskgroup();
    return Answer();
  });
}

OtxCtl::Sim::SimHost& KovaService::SimulatedHost() const {
  if (_simulated == nullptr) {
    throw HostError("this is no simulated host: there is no description of it");
  }
  return *_simulated;
}

std::string KovaService::DescribeHost() const {
  return WriteHostDescription(SimulatedHost().Snapshot());
}

Answer KovaService::ChangeHost(const std::string& change) const {
  OtxCtl::Sim::SimHost& host = SimulatedHost();
  return Guarded([&] {
    try {
      host.Change([&change](HostDescription& described) { ApplyChange(described, change); });
    } catch (const OtxCtl::Sim::HostDescriptionError& refused) {
      Gate::RefuseChange(refused.what());
    }
    // The plug-in's cache of the disks must not be older than the host. This is done out here and not by the
    // host's listener, which may run inside a hook that holds the plug-in's locks.
    std::string dropped;
    _hooks.getStorageInfo(dropped);
    return Answer();
  });
}

}  // namespace Host
