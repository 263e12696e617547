// How groups are planned, found and checked, in the plainest way: lists, and a walk from the front for every
// name. Tests hold the plug-in against it; it shares no code with what it is held against.
//
// Everything throws Tessa::NotInitializedException where a disk lacks what is read. Groups are texts as in
// "ssd: disk disk".
#pragma once

#include <string>
#include <vector>

#include "tests/support/RandomHosts.h"

namespace TestSupport {

class PlainRules {
 public:
  // The host outlives the rules.
  explicit PlainRules(const RandomHost& host) : _host(host) {}

  // Groups from these disks, and whether a limit was the cause of none.
  std::vector<std::string> Hybrid(const Disks& candidates, bool allFlash, bool& limitReached) const;
  // Groups from the eligible flash disks among the candidates; appends the names that it takes.
  std::vector<std::string> AllFlash(std::vector<std::string>& taken, bool& limitReached) const;
  // The candidates whose names are not taken.
  Disks Remaining(const std::vector<std::string>& taken) const;
  // The groups that are not mounted and whose SSD is a candidate.
  std::vector<std::string> NotMounted() const;
  // Whether the kernel has that group.
  bool Exists(const Nox::Kova::Host::DiskMapping& mapping) const;
  // "passes", "too few" or "twice NAME".
  static std::string Validate(const std::vector<Tessa::Ref<Nox::Kova::Host::DiskMapping>>& mappings);

 private:
  std::vector<HostCtl::Kova::DiskMapping> AllGroups() const;
  // The walk for one name.
  Tessa::Ref<Nox::Host::ScsiDisk> Find(const std::string& name) const;

  const RandomHost& _host;
};

}  // namespace TestSupport
