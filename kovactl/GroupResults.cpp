#include "kovactl/GroupResults.h"

#include <map>
#include <ostream>
#include <set>

#include "host/FaultWords.h"
#include "kovactl/DiskGroups.h"
#include "kovactl/FaultAdvice.h"
#include "kovactl/Table.h"
#include "kovactl/Words.h"
#include "nox/Faults.h"
#include "orbis/Engine.h"
#include "orbis/TypeDescriptor.h"
#include "tessa/text/Escape.h"

namespace Kovactl {
namespace {

using Nox::Host::ScsiDisk;
using Nox::Kova::Host::DiskMapResult;
using Nox::Kova::Host::DiskResult;
using Orbis::MethodFault;

// What the host says of each disk of one group.
class DiskStates {
 public:
  explicit DiskStates(const DiskMapResult& group) {
    if (group.GetDiskResult()) {
      for (const DiskResult* result : *group.GetDiskResult()) {
        _results.emplace(NameOf(*result->GetDisk()), result);
      }
    }
  }
  std::string StateOf(const std::string& disk) const {
    const auto found = _results.find(disk);
    return found == _results.end() ? "" : Kovactl::StateOf(*found->second);
  }
  std::string ReasonOf(const std::string& disk) const {
    const auto found = _results.find(disk);
    return found == _results.end() ? "" : Kovactl::ReasonOf(*found->second);
  }

 private:
  std::map<std::string, const DiskResult*> _results;  // by canonical name
};

void AddDisk(Table& table, const std::string& outcome, const std::string& role, const ScsiDisk& disk,
             const DiskStates& states) {
  const std::string name = NameOf(disk);
  table.AddRow({outcome, role, name, states.StateOf(name), states.ReasonOf(name)});
}

void AddGroup(Table& table, const DiskMapResult& group, const std::string& participle) {
  const DiskStates states(group);
  const auto& mapping = group.GetMapping();
  std::string outcome = group.GetError() ? "failed" : participle;
  if (mapping->GetSsd()) {
    AddDisk(table, outcome, "cache", *mapping->GetSsd(), states);
    outcome.clear();
  }
  if (mapping->GetNonSsd()) {
    for (const ScsiDisk* disk : *mapping->GetNonSsd()) {
      AddDisk(table, outcome, "capacity", *disk, states);
      outcome.clear();
    }
  }
}

// Prints faults, and advice that was not given yet.
class Explainer {
 public:
  explicit Explainer(std::ostream& err) : _err(err) {}
  void Tell(const std::string& subject, const MethodFault& fault) {
    _err << "kovactl: " << Tessa::Escape(subject + Host::Explain(fault)) << "\n";
    const std::string advice = Advise(fault);
    if (!advice.empty() && _given.insert(advice).second) {
      _err << "  " << advice << "\n";
    }
  }

 private:
  std::ostream& _err;
  std::set<std::string> _given;
};

// Whether the overall fault says nothing beyond the groups' own.
bool IsSumOf(const MethodFault& overall, const std::vector<const MethodFault*>& own) {
  if (own.size() > 1 && &overall.GetType() == &Nox::Fault::KovaFault::StaticType()) {
    return true;
  }
  for (const MethodFault* fault : own) {
    if (Orbis::Equal(fault, &overall)) {
      return true;
    }
  }
  return false;
}

}  // namespace

void PrintGroupResults(const GroupResults& results, const std::string& participle, std::ostream& out) {
  if (results.IsEmpty()) {
    return;
  }
  Table table({{"OUTCOME"}, {"ROLE"}, {"DISK"}, {"STATE"}, {"WHY"}});
  std::size_t failed = 0;
  for (const DiskMapResult* group : results) {
    AddGroup(table, *group, participle);
    failed += group->GetError() ? 1 : 0;
  }
  table.Print(out);
  const std::size_t done = results.Size() - failed;
  out << "\n" << results.Size() << (results.Size() == 1 ? " disk group: " : " disk groups: ");
  if (done > 0) {
    out << done << " " << participle << (failed > 0 ? ", " : "");
  }
  if (failed > 0) {
    out << failed << " failed";
  }
  out << "\n";
}

void PrintGroupFaults(const GroupResults* results, const MethodFault* overall, std::ostream& err) {
  Explainer explainer(err);
  std::vector<const MethodFault*> own;
  if (results != nullptr) {
    for (const DiskMapResult* group : *results) {
      if (group->GetError()) {
        own.push_back(group->GetError().Get());
        explainer.Tell("disk group of " + CacheDiskOf(*group->GetMapping()) + ": ", *own.back());
      }
    }
  }
  if (overall != nullptr && !IsSumOf(*overall, own)) {
    explainer.Tell("", *overall);
  }
}

}  // namespace Kovactl
