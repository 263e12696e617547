// What a host must look like after a request, and what the answer must be, worked out in the plainest way.
//
// The model keeps a description, changes it by rules of its own, and shares nothing with the plug-in or the
// simulated kernel but the plain values and the way in which disks get their UUIDs. It goes through a request
// call by call, so that it knows what a call that fails leaves undone.
//
// Reasons that the kernel gives in its own words are written "SystemError: (kernel)" and the like.
#pragma once

#include <functional>
#include <map>
#include <optional>
#include <string>
#include <vector>

#include "kova/agentd/include/KovaRecords.h"
#include "otxctl/sim/HostDescription.h"
#include "tests/integration/HostedPlugin.h"
#include "tests/integration/KernelExceptions.h"
#include "tests/support/RandomHosts.h"

namespace Integration {

// The call-th call, from 1, of the kernel's operation within one request throws.
struct InjectedFault {
  std::string operation;
  int call = 1;
  KernelException exception = kernelExceptions[0];
};

// What stands for the kernel's own words.
inline constexpr const char* kernelWords = "(kernel)";

// The kernel says no; the fault by which that is told.
struct KernelRefusal {
  std::string fault;
};

// An answer in which the kernel's own words are left out.
Answer WithoutTheKernelsWords(Answer answer);

class HostModel {
 public:
  explicit HostModel(OtxCtl::Sim::HostDescription host) : _host(std::move(host)) {}

  const OtxCtl::Sim::HostDescription& Host() const { return _host; }
  // How requests name the disk: an absent one by its UUID.
  std::string RequestName(const std::string& disk) const;

  // A change from outside, of which the plug-in was told.
  void Change(const std::function<void(OtxCtl::Sim::HostDescription&)>& edit);
  Answer Run(const Request& request, const std::optional<InjectedFault>& fault);

 private:
  using Names = std::vector<std::string>;
  using Disk = OtxCtl::Sim::HostDisk;
  using Group = OtxCtl::Sim::HostGroup;
  using Records = std::vector<HostCtl::Kova::DiskResult>;

  Answer Add(const Names& names);
  Answer AddAll();
  Answer Initialize(const std::vector<NamedGroup>& groups);
  Answer Remove(const std::string& disk);
  Answer RemoveGroup(const NamedGroup& group);
  Answer Unmount(const std::vector<NamedGroup>& groups);
  Answer Claim();
  Answer Query(const Names& names);

  // One group of a request: its result. The fault, if any, is appended to the others.
  std::string Make(const NamedGroup& group, Names& faults);
  std::string CheckGroup(const NamedGroup& group, bool& isRead) const;
  void MakeOrRestamp(const NamedGroup& group);
  std::string States(const NamedGroup& group) const;

  // Planning, by the plain rules. Groups as "ssd: disk disk"; "null" for a disk that nobody lists.
  TestSupport::RandomHost PlanningHost(const TestSupport::Disks& candidates) const;
  Names PlanAllFlash(TestSupport::RandomHost& planning, Names& taken, bool& limitReached);
  Names PlanHybrid(TestSupport::RandomHost& planning, const TestSupport::Disks& disks, bool& limitReached);
  Names PlanNotMounted(TestSupport::RandomHost& planning);
  TestSupport::Disks Candidates(const Names& names) const;
  // The disks of the records, as planning sees them, of these names only unless told otherwise.
  TestSupport::Disks Offered(const std::optional<Names>& names, bool withoutReason) const;

  // The plug-in's knowledge of the kernel's records.
  void Refresh();
  void Forget() { _isKnown = false; }
  // What the kernel would say now.
  Records KernelRecords() const;
  HostCtl::Kova::DiskResult RecordOf(const Disk& disk) const;

  // The kernel's calls. Throw KernelRefusal.
  void RemoveHeadedGroup(const std::string& ssd);
  bool IsInjected(const std::string& operation);
  void Enter(const std::string& operation);
  void Format(const NamedGroup& group);
  void Restamp(const std::string& ssd);
  void Mount(const std::string& ssd);
  void RestampByUuid(const std::string& uuid);
  void TakeOut(const std::string& disk);
  void TakeOutByUuid(const std::string& uuid);
  void TakeOutMember(Disk& disk, const std::string& named);
  void EraseGroup(Group& group);
  bool Exists(const NamedGroup& group);

  Disk* Find(const std::string& name);
  const Disk* Find(const std::string& name) const;
  Disk* FindPresent(const std::string& name);
  bool IsListed(const std::string& name) const;
  Group* GroupOf(const std::string& disk);
  const Group* GroupOf(const std::string& disk) const;

  OtxCtl::Sim::HostDescription _host;
  Records _records;  // as the plug-in has them
  bool _isKnown = false;
  std::optional<InjectedFault> _fault;
  std::map<std::string, int> _calls;
};

}  // namespace Integration
