#include "kovactl/plan/PlanCommand.h"

#include <map>
#include <nlohmann/json.hpp>
#include <ostream>
#include <set>

#include "kovactl/GroupResults.h"
#include "kovactl/Table.h"
#include "kovactl/Words.h"
#include "kovactl/plan/LeftOvers.h"
#include "orbis/Json.h"
#include "tessa/text/Escape.h"

namespace Kovactl {
namespace {

using Json = nlohmann::ordered_json;
using OtxCtl::Sim::HostDescription;
using Fate = PlannedGroup::Fate;

HostDescription Describe(const Host::ManagementApi& host) {
  return OtxCtl::Sim::ParseHostDescription(host.DescribeHost());
}

std::set<std::string> DisksIn(const std::vector<PlannedGroup>& groups) {
  std::set<std::string> names;
  for (const PlannedGroup& group : groups) {
    names.insert(group.ssd);
    names.insert(group.capacity.begin(), group.capacity.end());
  }
  return names;
}

Json ToJson(const Tessa::Ref<Orbis::MethodFault>& fault) {
  if (!fault) {
    return nullptr;
  }
  std::string text;
  Orbis::WriteJson(*fault, text);
  return Json::parse(text);
}

Json ToJson(const PlannedGroup& group) {
  Json json = {{"change", WordFor(group.fate)}, {"ssd", group.ssd}, {"capacity", group.capacity}};
  if (group.fate == Fate::Failed) {
    json["fault"] = ToJson(group.fault);
  } else {
    json["allFlash"] = group.allFlash;
  }
  return json;
}

Json ToJson(const Plan& plan, const std::string& generation) {
  Json json = {{"generation", generation},
               {"groups", Json::array()},
               {"leftOver", Json::array()},
               {"fault", ToJson(plan.answer.fault)}};
  for (const PlannedGroup& group : plan.groups) {
    json["groups"].push_back(ToJson(group));
  }
  for (const LeftOverDisk& disk : plan.leftOver) {
    json["leftOver"].push_back({{"disk", disk.disk}, {"reason", disk.reason}, {"text", disk.text}});
  }
  return json;
}

void AddGroup(Table& table, const PlannedGroup& group) {
  const std::string kind = group.fate == Fate::Failed ? "" : group.allFlash ? "all-flash" : "hybrid";
  table.AddRow({WordFor(group.fate), kind, "cache", group.ssd});
  for (const std::string& disk : group.capacity) {
    table.AddRow({"", "", "capacity", disk});
  }
}

// Of a large host they would fill many screens, so they are named for who asks for that.
void PrintLeftOvers(const std::vector<LeftOverDisk>& disks, bool named, std::ostream& out) {
  if (disks.empty()) {
    return;
  }
  PrintLeftOverCounts(disks, out);
  out << "\n";
  if (named) {
    PrintLeftOverNames(disks, out);
    out << "\n";
  } else {
    out << disks.size() << (disks.size() == 1 ? " disk is" : " disks are") << " left over; --all-disks names "
        << (disks.size() == 1 ? "it" : "them") << ".\n";
  }
}

void PrintPlan(const Plan& plan, const PlanOptions& options, std::ostream& out) {
  Table table({{"CHANGE"}, {"GROUP"}, {"ROLE"}, {"DISK"}});
  for (const PlannedGroup& group : plan.groups) {
    AddGroup(table, group);
  }
  if (!plan.groups.empty()) {
    table.Print(out);
    out << "\n";
  }
  PrintLeftOvers(plan.leftOver, options.allDisks, out);
  out << (plan.groups.empty() ? "Nothing would change." : "This is a plan: nothing was changed.") << "\n"
      << "Planned on generation " << Tessa::Escape(options.generation) << ".\n";
}

}  // namespace

Plan MakePlan(const Host::ManagementApi& copy, Change& change) {
  Plan plan;
  plan.answer.fault = change.LookAt(copy);
  if (plan.answer.fault) {
    return plan;
  }
  const HostDescription before = Describe(copy);
  plan.answer = change.Make(copy);
  plan.groups = CompareGroups(before, Describe(copy));
  const std::vector<PlannedGroup> failed = FailedGroups(plan.answer);
  plan.groups.insert(plan.groups.end(), failed.begin(), failed.end());
  if (const std::optional<Texts> offered = change.OfferedDisks()) {
    plan.leftOver = FindLeftOvers(copy, before, *offered, DisksIn(plan.groups));
  }
  return plan;
}

ExitStatus RunPlan(const Host::ManagementApi& copy, Change& change, const PlanOptions& options,
                   std::ostream& out, std::ostream& err) {
  const Plan plan = MakePlan(copy, change);
  if (options.output == "json") {
    out << ToJson(plan, options.generation).dump(2) << "\n";
  } else {
    PrintPlan(plan, options, out);
  }
  PrintGroupFaults(dynamic_cast<const GroupResults*>(plan.answer.result.Get()), plan.answer.fault.Get(), err);
  return plan.answer.fault ? ExitStatus::Fault : ExitStatus::Done;
}

}  // namespace Kovactl
