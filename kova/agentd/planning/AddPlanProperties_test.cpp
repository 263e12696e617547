// What a program is told about an addition, against what the operation then does, on random hosts.

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <array>
#include <random>
#include <set>
#include <string>
#include <string_view>
#include <vector>

#include "kova/agentd/KovaManagerImpl.h"
#include "kova/agentd/planning/pure/AddPlan.h"
#include "nox/Faults.h"
#include "nox/Kova.h"
#include "tests/support/Groups.h"
#include "tests/support/OperationFixture.h"
#include "tests/support/PluginFixture.h"
#include "tests/support/Seed.h"

namespace Kovasvc {
namespace {

using HostCtl::Kova::DiskReason;
using Planning::AddPlan;
using Tessa::MakeRef;
using Tessa::Ref;
using TestSupport::AGroup;
using TestSupport::ARecord;
using TestSupport::Disks;
using Texts = std::vector<std::string>;

// Keeps the groups that it is to make, and makes none.
class PlanningManager final : public KovaManagerImpl {
 public:
  using KovaManagerImpl::KovaManagerImpl;
  void InitializeDisksInt(Orbis::DataArray<Mapping>* mappings, const std::string&, Ref<Orbis::Any>&,
                          Ref<Orbis::MethodFault>&) override {
    planned = TestSupport::GroupTexts(*mappings);
  }

  Texts planned;
};

// Records and groups refer to their names; these stay for good.
std::string_view Name(const std::string& prefix, std::size_t number) {
  static std::set<std::string> names;
  return *names.insert(prefix + std::to_string(number)).first;
}

// A host of disks "d0", "d1", .. and groups with the cache disks "g0", "g1", .. Those of groups that are not
// mounted are among the disks.
struct Sample {
  std::vector<Planning::OfferedDisk> disks;
  std::vector<Planning::HostGroup> groups;
  std::vector<Texts> capacity;  // of each group
};

class HostDraw {
 public:
  explicit HostDraw(std::mt19937& random) : _random(random) {}

  Sample Next() {
    Sample sample;
    const unsigned flashIn = 2 + Below(12);
    _isCrowded = Chance(8);
    for (unsigned count = Below(_isCrowded ? 4 : 45); count > 0; --count) {
      const bool ssd = Chance(flashIn);
      sample.disks.push_back({.name = Name("d", sample.disks.size()),
                              .eligible = !Chance(5),
                              .isSsd = ssd,
                              .capacityFlash = ssd ? Chance(2) : Chance(9)});
    }
    for (unsigned count = Below(7); count > 0; --count) {
      AddGroup(sample);
    }
    std::shuffle(sample.disks.begin(), sample.disks.end(), _random);
    return sample;
  }

  // The names of some disks in any order, now and then with repeats and a stranger.
  std::vector<std::string_view> Request(const Sample& sample) {
    std::vector<std::string_view> names;
    for (const Planning::OfferedDisk& disk : sample.disks) {
      if (!Chance(4)) {
        names.push_back(disk.name);
      }
    }
    if (Chance(2)) {
      std::shuffle(names.begin(), names.end(), _random);
    }
    if (Chance(5)) {
      names.push_back("stranger");
    }
    for (unsigned count = Chance(2) ? Below(4) : 0; count > 0 && !names.empty(); --count) {
      const std::string_view name = names[Below(static_cast<unsigned>(names.size()))];
      names.insert(Chance(2) ? names.end() : std::find(names.begin(), names.end(), name), name);
    }
    return names;
  }

 private:
  unsigned Below(unsigned limit) { return static_cast<unsigned>(_random() % limit); }
  bool Chance(unsigned oneIn) { return Below(oneIn) == 0; }

  // Now and then the kernel has two groups of one cache disk.
  void AddGroup(Sample& sample) {
    const std::size_t number = sample.groups.size();
    Planning::HostGroup group = {.allFlash = Chance(3),
                                 .heldBack = Chance(5),
                                 .capacityDisks = _isCrowded ? 7 : Below(8),
                                 .cacheDisk = Name("g", number),
                                 .cacheListed = !Chance(6)};
    if (number > 0 && Chance(6)) {
      const Planning::HostGroup& other = sample.groups[Below(static_cast<unsigned>(number))];
      group.cacheDisk = other.cacheDisk;
      group.cacheListed = other.cacheListed;
    } else if (Chance(3)) {
      group.cacheListed = true;
      sample.disks.push_back({.name = group.cacheDisk, .isSsd = true, .unmounted = true, .group = number});
      for (std::size_t i = 0; i < group.capacityDisks; ++i) {
        sample.disks.push_back({.name = Name(std::string(group.cacheDisk) + "-", i + 1),
                                .isSsd = group.allFlash,
                                .capacityFlash = group.allFlash,
                                .unmounted = true,
                                .group = number});
      }
    }
    sample.groups.push_back(group);
    sample.capacity.push_back(
        TestSupport::Numbered(std::string(group.cacheDisk) + "-", static_cast<int>(group.capacityDisks)));
  }

  std::mt19937& _random;
  bool _isCrowded = false;  // groups are full, and few disks are there
};

class AddPlanOfRandomHosts : public TestSupport::PluginFixture {
 protected:
  AddPlanOfRandomHosts() {
    _logger->SetLevel(Tessa::Service::LogLevel::None);
    Ref<Tessa::Service::Logger> logger = _logger;
    _manager = MakeRef<PlanningManager>(logger);
  }

  static Ref<Nox::Host::ScsiDisk> DiskOf(const Planning::OfferedDisk& disk) {
    return disk.isSsd ? TestSupport::Ssd(std::string(disk.name)) : TestSupport::Hdd(std::string(disk.name));
  }

  static HostCtl::Kova::DiskResult RecordOf(const Planning::OfferedDisk& disk) {
    ARecord record{std::string(disk.name)};
    record.Ssd(disk.isSsd);
    if (disk.capacityFlash) {
      record.CapacityFlash();
    }
    if (!disk.eligible) {
      record.Ineligible(disk.unmounted ? DiskReason::GroupNotMounted : DiskReason::Usb);
    }
    return record;
  }

  void Install(const Sample& sample) {
    Disks inventory;
    std::vector<HostCtl::Kova::DiskResult> records;
    std::set<std::string_view> listed;
    for (const Planning::OfferedDisk& disk : sample.disks) {
      inventory.push_back(DiskOf(disk));
      records.push_back(RecordOf(disk));
      listed.insert(disk.name);
    }
    _kernel.groups.clear();
    for (std::size_t i = 0; i < sample.groups.size(); ++i) {
      const Planning::HostGroup& group = sample.groups[i];
      AGroup kernelGroup{std::string(group.cacheDisk), sample.capacity[i]};
      if (group.allFlash) {
        kernelGroup.AllFlash();
      }
      if (group.heldBack) {
        kernelGroup.ThirdFlag();
      }
      _kernel.groups.push_back(kernelGroup);
      if (group.cacheListed && listed.insert(group.cacheDisk).second) {
        inventory.push_back(TestSupport::Ssd(std::string(group.cacheDisk)));
      }
      for (const std::string& disk : sample.capacity[i]) {
        if (listed.insert(disk).second) {
          inventory.push_back(TestSupport::Hdd(disk));
        }
      }
    }
    SetHost(inventory, records);
    _manager->InvalidateKovaDiskCache();
  }

  // Runs the operation. The groups that it would make, or its fault.
  template <class Operation>
  Texts Outcome(Operation operation) {
    std::string fault;
    std::string result;
    _manager->planned.clear();
    operation(fault, result);
    _timeline.Take();
    _kernel.ForgetCalls();
    return fault.empty() ? _manager->planned : Texts{FaultText(fault)};
  }

  static std::string FaultText(const std::string& text) {
    const auto fault = TestSupport::ReadAnswer<Orbis::MethodFault>(text);
    const auto* const ofDisk = dynamic_cast<const Nox::Fault::DuplicateDisks*>(fault.Get());
    return ofDisk != nullptr ? "repeats " + ofDisk->GetDevice() : (*fault->GetFaultMessage())[0]->GetKey();
  }

  const TestSupport::Seed _seed;
  std::mt19937 _random{_seed.Value()};
  HostDraw _draw{_random};
  Ref<PlanningManager> _manager;
};

// As the operation tells it, of disks that may be fewer than the host's.
Texts Told(const AddPlan& plan, const std::vector<Planning::OfferedDisk>& disks, const Sample& sample) {
  if (plan.repeated) {
    return {"repeats " + *plan.repeated};
  }
  Texts texts;
  for (const AddPlan::Group& group : plan.groups) {
    const bool isMade = group.way == AddPlan::Way::Made;
    std::string text(isMade ? disks[group.cache].name : sample.groups[group.cache].cacheDisk);
    text += ":";
    if (group.way == AddPlan::Way::Mounted) {
      for (const std::string& disk : sample.capacity[group.cache]) {
        text += " " + disk;
      }
    } else {
      for (const std::size_t disk : group.capacity) {
        text.append(" ").append(disks[disk].name);
      }
    }
    texts.push_back(text);
  }
  return texts;
}

// Each disk stands in a group or has a reason, never both.
void ExpectEachDiskToldOnce(const std::vector<Planning::OfferedDisk>& disks, const Sample& sample,
                            const AddPlan& plan) {
  std::vector<int> used(disks.size(), 0);
  for (const AddPlan::Group& group : plan.groups) {
    for (const std::size_t disk : group.capacity) {
      ++used[disk];
    }
    if (group.way == AddPlan::Way::Made) {
      ++used[group.cache];
    }
    for (std::size_t disk = 0; disk < disks.size() && group.way == AddPlan::Way::Mounted; ++disk) {
      used[disk] +=
          disks[disk].group == group.cache && disks[disk].name == sample.groups[group.cache].cacheDisk;
    }
  }
  for (std::size_t disk = 0; disk < used.size(); ++disk) {
    ASSERT_EQ(used[disk], plan.leftOver[disk] ? 0 : 1) << disks[disk].name;
    ASSERT_EQ(!disks[disk].eligible && used[disk] == 0,
              plan.leftOver[disk] == Planning::LeftOver::NotEligible);
  }
}

// How often each way was taken; hosts on which one is rare are not worth the test.
class Ways {
 public:
  void Count(const AddPlan& plan) {
    for (const AddPlan::Group& group : plan.groups) {
      ++_counts[static_cast<std::size_t>(group.way)];
    }
    _repeated += plan.repeated ? 1 : 0;
    _stopped += !plan.repeated && plan.StopsAtLimit() ? 1 : 0;
  }
  int Of(AddPlan::Way way) const { return _counts[static_cast<std::size_t>(way)]; }
  int Repeated() const { return _repeated; }
  int Stopped() const { return _stopped; }

 private:
  std::array<int, 3> _counts = {};
  int _repeated = 0;
  int _stopped = 0;
};

TEST_F(AddPlanOfRandomHosts, TellsTheGroupsThatTheOperationMakes) {
  Ways ways;
  for (int round = 0; round < 2000; ++round) {
    SCOPED_TRACE("round " + std::to_string(round));
    const Sample sample = _draw.Next();
    Install(sample);
    const AddPlan plan = Planning::PlanAddition(sample.disks, sample.groups);
    ASSERT_EQ(Told(plan, sample.disks, sample), Outcome([&](std::string& fault, std::string& result) {
                _manager->AddAllEligibleDisks("", fault, result);
              }));
    ASSERT_NO_FATAL_FAILURE(ExpectEachDiskToldOnce(sample.disks, sample, plan));
    ways.Count(plan);
  }
  EXPECT_GT(ways.Of(AddPlan::Way::Made), 200);
  EXPECT_GT(ways.Of(AddPlan::Way::Extended), 200);
  EXPECT_EQ(ways.Of(AddPlan::Way::Mounted), 0);
}

TEST_F(AddPlanOfRandomHosts, TellsTheGroupsAndTheRefusalsOfNamedDisks) {
  Ways ways;
  for (int round = 0; round < 2000; ++round) {
    SCOPED_TRACE("round " + std::to_string(round));
    const Sample sample = _draw.Next();
    Install(sample);
    const std::vector<std::string_view> names = _draw.Request(sample);
    Disks request;
    for (const std::string_view name : names) {
      const auto known = std::find_if(sample.disks.begin(), sample.disks.end(),
                                      [&](const Planning::OfferedDisk& disk) { return disk.name == name; });
      request.push_back(known == sample.disks.end() ? TestSupport::Ssd(std::string(name)) : DiskOf(*known));
    }
    std::vector<Planning::OfferedDisk> disks = sample.disks;
    std::erase_if(disks, [&](const Planning::OfferedDisk& disk) {
      return std::find(names.begin(), names.end(), disk.name) == names.end();
    });
    const AddPlan plan = Planning::PlanNamedAddition(disks, sample.groups, names);
    Texts told = Told(plan, disks, sample);
    if (!plan.repeated && plan.StopsAtLimit()) {
      told = {plan.allFlashLimit ? "nox.agentd.kovaDiskOperation.allFlashExceed"
                                 : "nox.agentd.kovaDiskOperation.hybridExceed"};
    }
    ASSERT_EQ(told, Outcome([&](std::string& fault, std::string& result) {
                _manager->AddDisks(TestSupport::SoapTexts(request), "", fault, result);
              }));
    if (!plan.repeated) {
      ASSERT_NO_FATAL_FAILURE(ExpectEachDiskToldOnce(disks, sample, plan));
    }
    ways.Count(plan);
  }
  EXPECT_GT(ways.Of(AddPlan::Way::Made), 200);
  EXPECT_GT(ways.Of(AddPlan::Way::Extended), 200);
  EXPECT_GT(ways.Of(AddPlan::Way::Mounted), 200);
  EXPECT_GT(ways.Repeated(), 100);
  EXPECT_GT(ways.Stopped(), 20);
}

}  // namespace
}  // namespace Kovasvc
