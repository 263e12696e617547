#include "agentd/routes/Operations.h"

#include <algorithm>

#include "host/Gate.h"
#include "host/RequestBounds.h"

namespace Agentd {
namespace {

using Host::Answer;
using Host::ManagementApi;

template <Answer (ManagementApi::*operation)() const>
Answer CallPlain(const ManagementApi& api, const Arguments&) {
  return (api.*operation)();
}

template <Answer (ManagementApi::*operation)(const Host::MappingList&) const>
Answer CallWithMappings(const ManagementApi& api, const Arguments& arguments) {
  return (api.*operation)(*arguments.mappings);
}

Answer QueryDisks(const ManagementApi& api, const Arguments& arguments) {
  return api.QueryDisksForKova(arguments.names);
}

Host::WrittenAnswer QueryDisksWritten(const ManagementApi& api, const Arguments& arguments) {
  return api.QueryDisksWritten(arguments.names);
}

Answer AddDisks(const ManagementApi& api, const Arguments& arguments) {
  return api.AddDisks(*arguments.disks);
}

Answer RemoveDisk(const ManagementApi& api, const Arguments& arguments) {
  return api.RemoveDisk(arguments.disk, arguments.removal);
}

Answer RemoveDiskMapping(const ManagementApi& api, const Arguments& arguments) {
  return api.RemoveDiskMapping(*arguments.mapping, arguments.removal);
}

// What is removed, and what goes with it to the kernel.
std::vector<Parameter> Removal(std::string_view subject) {
  return {{subject, true}, {"passThrough"}, {"optionText"}, {"optionFirst"}, {"optionSecond"}};
}

}  // namespace

const std::vector<Operation>& Operations() {
  using Api = ManagementApi;
  constexpr bool query = false;
  constexpr bool change = true;
  static const std::vector<Operation> operations = {
      {"QueryDisksForKova", query, {{"names"}}, &QueryDisks, &QueryDisksWritten},
      {"GetStorageInfo", query, {}, &CallPlain<&Api::GetStorageInfo>},
      {"GetDiskGroups", query, {}, &CallPlain<&Api::GetDiskGroups>},
      {"GetConfigInfo", query, {}, &CallPlain<&Api::GetConfigInfo>},
      {"AddDisks", change, {{"disks", true}}, &AddDisks},
      {"AddAllEligibleDisks", change, {}, &CallPlain<&Api::AddAllEligibleDisks>},
      {"InitializeDisks", change, {{"mappings", true}}, &CallWithMappings<&Api::InitializeDisks>},
      {"UnmountDiskMapping", change, {{"mappings", true}}, &CallWithMappings<&Api::UnmountDiskMapping>},
      {"RemoveDisk", change, Removal("disk"), &RemoveDisk},
      {"RemoveDiskMapping", change, Removal("mapping"), &RemoveDiskMapping},
      {"ClaimUnmountedDiskgroup", change, {}, &CallPlain<&Api::ClaimUnmountedDiskgroup>},
  };
  return operations;
}

const Operation* FindOperation(std::string_view name) {
  const std::vector<Operation>& all = Operations();
  const auto found = std::find_if(all.begin(), all.end(),
                                  [name](const Operation& operation) { return operation.name == name; });
  return found == all.end() ? nullptr : &*found;
}

void Bound(Arguments& arguments) {
  Host::Gate::CheckNames("names", arguments.names);
  Host::Gate::CheckLength("disk", arguments.disk);
  Host::Gate::CheckRemovalArguments(arguments.removal);
  arguments.disks = Host::Lean("disks", *arguments.disks);
  arguments.mappings = Host::Lean(*arguments.mappings);
  arguments.mapping = Host::Lean(*arguments.mapping);
}

std::size_t WeightOf(const Arguments& arguments) {
  return Host::WeightOf(*arguments.disks) + Host::WeightOf(*arguments.mappings) +
         Host::WeightOf(*arguments.mapping) + arguments.removal.passThrough.size() +
         arguments.removal.optionText.size();
}

}  // namespace Agentd
