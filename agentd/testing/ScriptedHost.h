// A host that tells of its disks and groups what a test has said.
#pragma once

#include <string>
#include <vector>

#include "agentd/testing/FakeApi.h"
#include "nox/Kova.h"
#include "orbis/Types.h"

namespace Agentd::Testing {

class ScriptedHost {
 public:
  ScriptedHost() {
    Tell({}, {});
    api.answerTo = [this](const std::string& asked) -> Host::Answer {
      const bool isDisks = asked.rfind("QueryDisksForKova", 0) == 0;
      return {.result = isDisks ? _disks : _groups, .fault = fault};
    };
  }

  // The state of each disk, and of each group whether it is mounted.
  void Tell(const std::vector<std::string>& disks, const std::vector<bool>& groups) {
    using namespace Nox::Kova::Host;
    const auto results = Tessa::MakeRef<Orbis::DataArray<DiskResult>>();
    for (const std::string& state : disks) {
      const auto result = Tessa::MakeRef<DiskResult>();
      result->SetState(state);
      results->Append(result);
    }
    const auto infos = Tessa::MakeRef<Orbis::DataArray<DiskMapInfo>>();
    for (const bool mounted : groups) {
      const auto info = Tessa::MakeRef<DiskMapInfo>();
      info->SetMounted(mounted);
      infos->Append(info);
    }
    const auto storage = Tessa::MakeRef<ConfigInfo::StorageInfo>();
    storage->SetDiskMapInfo(infos);
    _disks = results;
    _groups = storage;
  }

  FakeApi api;
  Tessa::Ref<Orbis::MethodFault> fault;  // beside every answer

 private:
  Tessa::Ref<Orbis::Any> _disks;
  Tessa::Ref<Orbis::Any> _groups;
};

}  // namespace Agentd::Testing
