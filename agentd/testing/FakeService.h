// A service for tests of what stands before it: its plug-in answers with what the test says.
#pragma once

#include <string>
#include <vector>

#include "host/KovaService.h"
#include "nox/Kova.h"
#include "orbis/Soap.h"

namespace Agentd::Testing {

// Hooks are plain functions, so what they see and say stands beside them. One test at a time.
struct FakeHooks {
  static inline std::vector<std::string> names;  // of the last query
  static inline int calls = 0;
  static inline std::string faultText;
  static inline std::string resultText;

  static void Reset() {
    names.clear();
    calls = 0;
    faultText.clear();
    resultText.clear();
  }

  static void QueryDisks(std::vector<std::string>& wanted, std::string& fault, std::string& result) {
    ++calls;
    names = wanted;
    fault += faultText;
    result += resultText;
  }

  static void Report(std::string& result) {
    ++calls;
    result += resultText;
  }

  // One eligible disk of that name.
  static void AnswerWithDisk(const std::string& name) {
    Orbis::DataArray<Nox::Kova::Host::DiskResult> disks;
    const auto disk = Tessa::MakeRef<Nox::Kova::Host::DiskResult>();
    disk->GetDisk()->SetCanonicalName(name);
    disk->SetState(Nox::Kova::Host::DiskResult::STATE_ELIGIBLE);
    disks.Append(disk);
    Orbis::SerializeObjectToSoap(disks, nullptr, resultText);
  }

  static void AnswerWithFault(const Orbis::MethodFault& fault) {
    Orbis::SerializeObjectToSoap(fault, nullptr, faultText);
  }
};

inline Host::KovaService AFakeService() {
  FakeHooks::Reset();
  Host::PluginHooks hooks{};
  hooks.queryDisksForKova = &FakeHooks::QueryDisks;
  hooks.getStorageInfo = &FakeHooks::Report;
  hooks.getConfigInfo = &FakeHooks::Report;
  return Host::KovaService(hooks);
}

}  // namespace Agentd::Testing
