// What a program is told about an addition, against what the operation then does, on random hosts.

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <random>
#include <string>
#include <vector>

#include "kova/agentd/KovaManagerImpl.h"
#include "kova/agentd/planning/pure/AddPlan.h"
#include "nox/Kova.h"
#include "tests/support/Groups.h"
#include "tests/support/PluginFixture.h"
#include "tests/support/Seed.h"

namespace Kovasvc {
namespace {

using HostCtl::Kova::DiskReason;
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

// A host of disks "d0", "d1", .. and groups with the cache disks "g0", "g1", ..
struct Sample {
  std::vector<Planning::OfferedDisk> disks;
  std::vector<Planning::HostGroup> groups;
};

class AddPlanOfRandomHosts : public TestSupport::PluginFixture {
 protected:
  AddPlanOfRandomHosts() {
    _logger->SetLevel(Tessa::Service::LogLevel::None);
    Ref<Tessa::Service::Logger> logger = _logger;
    _manager = MakeRef<PlanningManager>(logger);
  }

  unsigned Below(unsigned limit) { return static_cast<unsigned>(_random() % limit); }
  bool Chance(unsigned oneIn) { return Below(oneIn) == 0; }

  Sample Draw() {
    Sample sample;
    const unsigned flashIn = 2 + Below(12);
    for (unsigned count = Below(45); count > 0; --count) {
      const bool ssd = Chance(flashIn);
      sample.disks.push_back(
          {.eligible = !Chance(5), .isSsd = ssd, .capacityFlash = ssd ? Chance(2) : Chance(9)});
    }
    for (unsigned count = Below(7); count > 0; --count) {
      sample.groups.push_back({.group = {.allFlash = Chance(3), .heldBack = Chance(5)},
                               .capacityDisks = Below(8),
                               .cacheListed = !Chance(6)});
    }
    return sample;
  }

  void Install(const Sample& sample) {
    Disks inventory;
    std::vector<HostCtl::Kova::DiskResult> records;
    for (std::size_t i = 0; i < sample.disks.size(); ++i) {
      const std::string name = "d" + std::to_string(i);
      inventory.push_back(sample.disks[i].isSsd ? TestSupport::Ssd(name) : TestSupport::Hdd(name));
      ARecord record(name);
      record.Ssd(sample.disks[i].isSsd);
      if (sample.disks[i].capacityFlash) {
        record.CapacityFlash();
      }
      if (!sample.disks[i].eligible) {
        record.Ineligible(DiskReason::Usb);
      }
      records.push_back(record);
    }
    _kernel.groups.clear();
    for (std::size_t i = 0; i < sample.groups.size(); ++i) {
      const std::string name = "g" + std::to_string(i);
      const Planning::HostGroup& group = sample.groups[i];
      AGroup kernelGroup(name, TestSupport::Numbered(name + "-", static_cast<int>(group.capacityDisks)));
      if (group.group.allFlash) {
        kernelGroup.AllFlash();
      }
      if (group.group.heldBack) {
        kernelGroup.ThirdFlag();
      }
      _kernel.groups.push_back(kernelGroup);
      if (group.cacheListed) {
        inventory.push_back(TestSupport::Ssd(name));
      }
    }
    SetHost(inventory, records);
  }

  Texts Planned() {
    std::string fault;
    std::string result;
    _manager->planned.clear();
    _manager->AddAllEligibleDisks("", fault, result);
    EXPECT_EQ(fault, "");
    _timeline.Take();
    _kernel.ForgetCalls();
    return _manager->planned;
  }

  const TestSupport::Seed _seed;
  std::mt19937 _random{_seed.Value()};
  Ref<PlanningManager> _manager;
};

// As the manager's groups are told.
Texts Told(const Planning::AddPlan& plan) {
  Texts texts;
  for (const Planning::AddPlan::Group& group : plan.groups) {
    std::string text = (group.isNew ? "d" : "g") + std::to_string(group.cache) + ":";
    for (const std::size_t disk : group.capacity) {
      text += " d" + std::to_string(disk);
    }
    texts.push_back(text);
  }
  return texts;
}

// Each disk stands in a group or has a reason, never both.
void ExpectEachDiskToldOnce(const Sample& sample, const Planning::AddPlan& plan) {
  std::vector<int> used(sample.disks.size(), 0);
  for (const Planning::AddPlan::Group& group : plan.groups) {
    if (group.isNew) {
      ++used[group.cache];
    }
    for (const std::size_t disk : group.capacity) {
      ++used[disk];
    }
  }
  for (std::size_t disk = 0; disk < used.size(); ++disk) {
    ASSERT_EQ(used[disk], plan.leftOver[disk] ? 0 : 1) << "disk " << disk;
    ASSERT_EQ(!sample.disks[disk].eligible, plan.leftOver[disk] == Planning::LeftOver::NotEligible);
  }
}

TEST_F(AddPlanOfRandomHosts, TellsTheGroupsThatTheOperationMakes) {
  int grown = 0;
  int made = 0;
  for (int round = 0; round < 2000; ++round) {
    SCOPED_TRACE("round " + std::to_string(round));
    const Sample sample = Draw();
    Install(sample);
    const Planning::AddPlan plan = Planning::PlanAddition(sample.disks, sample.groups);
    ASSERT_EQ(Told(plan), Planned());
    ASSERT_NO_FATAL_FAILURE(ExpectEachDiskToldOnce(sample, plan));
    for (const Planning::AddPlan::Group& group : plan.groups) {
      ++(group.isNew ? made : grown);
    }
  }
  EXPECT_GT(made, 200) << "the hosts are not worth the test";
  EXPECT_GT(grown, 200) << "the hosts are not worth the test";
}

}  // namespace
}  // namespace Kovasvc
