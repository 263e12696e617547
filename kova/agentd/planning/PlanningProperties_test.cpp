// Planning, validation and look-up of groups on random hosts, against the plain rules.
//
// A failing case is cut down as long as it fails, and printed with its seed.

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <map>
#include <random>
#include <string>
#include <vector>

#include "kova/agentd/KovaManagerImpl.h"
#include "kova/agentd/include/HostCtlException.h"
#include "nox/Faults.h"
#include "nox/Kova.h"
#include "tests/support/PlainRules.h"
#include "tests/support/PluginFixture.h"
#include "tests/support/RandomHosts.h"
#include "tests/support/Seed.h"

namespace Kovasvc {
namespace {

using Nox::Host::ScsiDisk;
using Nox::Kova::Host::DiskMapping;
using Orbis::DataArray;
using Tessa::MakeRef;
using Tessa::NotInitializedException;
using Tessa::Ref;
using TestSupport::AnInventory;
using TestSupport::AScsiDisk;
using TestSupport::Disks;
using TestSupport::PlainRules;
using TestSupport::RandomHost;
using KernelGroup = HostCtl::Kova::DiskMapping;

// ---- both, side by side

// What an operation gave, as a text; an exception as its text.
template <class Run>
std::string Outcome(Run run) {
  try {
    return run();
  } catch (const NotInitializedException& exception) {
    return std::string("throws ") + exception.what();
  }
}

std::string Text(const std::vector<std::string>& parts) {
  std::string text;
  for (const std::string& part : parts) {
    text += "[" + part + "]";
  }
  return text;
}
Disks DisksOf(const DataArray<ScsiDisk>& list) {
  Disks disks;
  for (ScsiDisk* disk : list) {
    disks.emplace_back(disk);
  }
  return disks;
}
// The disks as objects, by their positions in the pool.
std::string Text(const Disks& disks, const RandomHost& host) {
  std::string text;
  for (const Ref<ScsiDisk>& disk : disks) {
    text += " " + std::to_string(std::find(host.pool.begin(), host.pool.end(), disk) - host.pool.begin());
  }
  return text;
}

class Planning : public TestSupport::PluginFixture {
 protected:
  struct Comparison {
    std::string actual;
    std::string expected;
  };

  Planning() {
    _logger->SetLevel(Tessa::Service::LogLevel::None);
    _manager = MakeManager();
  }

  void Install(const RandomHost& host) {
    _kernel.Heal("GetDiskMappings");
    _kernel.records = host.records;
    _kernel.groups = host.mounted;
    _kernel.unmountedGroups = host.unmounted;
    _storage->SetDisks(host.Inventory());
    _manager->InvalidateKovaDiskCache();
    _manager->RefreshKovaDiskCache();
    if (host.kernelFails) {
      _kernel.Fail("GetDiskMappings", HostCtl::Lib::HostCtlException("away"));
    }
  }

  // Compares on many hosts; a host on which the two differ is cut down first. The outcomes that tell
  // something hold the mark; too few of them, and the hosts are not worth the test.
  template <class Compare>
  void CheckOnRandomHosts(const std::string& mark, Compare compare) {
    const TestSupport::Seed seed;
    TestSupport::HostDraw draw(seed.Value());
    int throwing = 0;
    int telling = 0;
    for (int round = 0; round < 3000; ++round) {
      RandomHost host = draw.Next();
      Comparison comparison = compare(host);
      throwing += comparison.expected.starts_with("throws") ? 1 : 0;
      telling += comparison.expected.find(mark) != std::string::npos ? 1 : 0;
      if (comparison.actual != comparison.expected) {
        host = TestSupport::Shortest(host, [&](const RandomHost& smaller) {
          const Comparison smallerComparison = compare(smaller);
          return smallerComparison.actual != smallerComparison.expected;
        });
        comparison = compare(host);
        FAIL() << "round " << round << "\n"
               << host << "\nactual   " << comparison.actual << "\nexpected " << comparison.expected;
      }
      _timeline.Take();
      _kernel.ForgetCalls();
    }
    EXPECT_GT(throwing, 20);
    EXPECT_GT(telling, 150);
  }

  Ref<KovaManagerImpl> _manager;
};

TEST_F(Planning, OfHybridGroupsFollowsThePlainRules) {
  CheckOnRandomHosts("[", [this](const RandomHost& host) {
    Install(host);
    const PlainRules rules(host);
    return Comparison{Outcome([&] {
                        Ref<DataArray<DiskMapping>> mappings;
                        bool limitReached = false;
                        _manager->ComputeDiskMappings(AnInventory(host.Candidates()).Get(), host.allFlash,
                                                      mappings, limitReached);
                        return Text(TestSupport::GroupTexts(*mappings)) + (limitReached ? " limit" : "");
                      }),
                      Outcome([&] {
                        bool limitReached = false;
                        const auto plan = rules.Hybrid(host.Candidates(), host.allFlash, limitReached);
                        return Text(plan) + (limitReached ? " limit" : "");
                      })};
  });
}

TEST_F(Planning, OfAllFlashGroupsFollowsThePlainRules) {
  CheckOnRandomHosts("[n", [this](const RandomHost& host) {
    Install(host);
    const PlainRules rules(host);
    return Comparison{Outcome([&] {
                        Ref<DataArray<DiskMapping>> mappings;
                        std::vector<std::string> taken;
                        bool limitReached = false;
                        _manager->ComputeAllFlashDiskMappings(AnInventory(host.Candidates()).Get(), mappings,
                                                              taken, limitReached);
                        return (mappings ? Text(TestSupport::GroupTexts(*mappings)) : std::string()) +
                               " takes " + Text(taken) + (limitReached ? " limit" : "");
                      }),
                      Outcome([&] {
                        std::vector<std::string> taken;
                        bool limitReached = false;
                        const auto plan = rules.AllFlash(taken, limitReached);
                        return Text(plan) + " takes " + Text(taken) + (limitReached ? " limit" : "");
                      })};
  });
}

TEST_F(Planning, HandsBackWhatThePlainRulesLeave) {
  CheckOnRandomHosts(" ", [this](const RandomHost& host) {
    Install(host);
    const PlainRules rules(host);
    return Comparison{Outcome([&] {
                        Ref<DataArray<DiskMapping>> mappings;
                        Ref<DataArray<ScsiDisk>> remaining;
                        bool limitReached = false;
                        _manager->AllFlashDiskMappingSwitch(AnInventory(host.Candidates()).Get(), mappings,
                                                            remaining, limitReached);
                        return Text(DisksOf(*remaining), host);
                      }),
                      Outcome([&] {
                        std::vector<std::string> taken;
                        bool limitReached = false;
                        rules.AllFlash(taken, limitReached);
                        return Text(rules.Remaining(taken), host);
                      })};
  });
}

TEST_F(Planning, OfUnmountedGroupsFollowsThePlainRules) {
  CheckOnRandomHosts("[", [this](const RandomHost& host) {
    Install(host);
    const PlainRules rules(host);
    return Comparison{Outcome([&] {
                        auto mappings = MakeRef<DataArray<DiskMapping>>();
                        _manager->ComputeNotMountedDiskMappings(AnInventory(host.Candidates()).Get(),
                                                                mappings);
                        return Text(TestSupport::GroupTexts(*mappings));
                      }),
                      Outcome([&] { return Text(rules.NotMounted()); })};
  });
}

// A request for one of the kernel's groups, more or less.
Ref<DiskMapping> ARequest(const RandomHost& host) {
  Disks disks = host.Candidates();
  if (!host.mounted.empty() && host.candidates.size() % 2 == 0) {
    const KernelGroup& group = host.mounted[host.candidates.size() % host.mounted.size()];
    disks = {AScsiDisk(group.ssd.deviceName)};
    for (const HostCtl::Kova::DiskName& disk : group.capacityDisks) {
      disks.push_back(AScsiDisk(disk.deviceName.empty() ? "kova:" + disk.kovaUuid : disk.deviceName));
    }
    std::reverse(disks.begin() + 1, disks.end());
  }
  const Ref<ScsiDisk> ssd = disks.empty() ? Ref<ScsiDisk>() : disks.front();
  return TestSupport::AMapping(ssd, {disks.begin() + (disks.empty() ? 0 : 1), disks.end()});
}

TEST_F(Planning, FindsTheGroupsThatThePlainRulesFind) {
  CheckOnRandomHosts("yes", [this](const RandomHost& host) {
    Install(host);
    const Ref<DiskMapping> request = ARequest(host);
    return Comparison{
        Outcome([&] { return std::string(_manager->DiskMappingExists(request) ? "yes" : "no"); }),
        Outcome([&] { return std::string(PlainRules(host).Exists(*request) ? "yes" : "no"); })};
  });
}

TEST_F(Planning, ChecksRequestsByThePlainRules) {
  CheckOnRandomHosts("twice", [this](const RandomHost& host) {
    // The candidates by threes.
    const Disks disks = host.Candidates();
    std::vector<Ref<DiskMapping>> mappings;
    for (std::size_t index = 0; index < disks.size(); index += 3) {
      const std::size_t end = std::min(index + 3, disks.size());
      mappings.push_back(TestSupport::AMapping(
          disks[index],
          Disks(disks.begin() + static_cast<int>(index) + 1, disks.begin() + static_cast<int>(end))));
    }
    return Comparison{Outcome([&]() -> std::string {
                        try {
                          _manager->ValidateDiskMappings(TestSupport::Mappings(mappings).Get());
                          return "passes";
                        } catch (const Nox::Fault::InsufficientDisks::Exception&) {
                          return "too few";
                        } catch (const Nox::Fault::DuplicateDisks::Exception& exception) {
                          return "twice " +
                                 dynamic_cast<Nox::Fault::DuplicateDisks&>(*exception.GetFault()).GetDevice();
                        }
                      }),
                      Outcome([&] { return PlainRules::Validate(mappings); })};
  });
}

// ---- what holds for every plan

// New groups and extensions of a host whose disks are all different.
TEST_F(Planning, UsesNoDiskTwiceKeepsTheLimitsAndStaysLevel) {
  const TestSupport::Seed seed;
  std::mt19937 random(seed.Value());
  for (int round = 0; round < 2000; ++round) {
    SCOPED_TRACE("round " + std::to_string(round));
    Disks candidates = TestSupport::operator+(TestSupport::Ssds("s", static_cast<int>(random() % 8)),
                                              TestSupport::Hdds("c", static_cast<int>(random() % 50)));
    std::shuffle(candidates.begin(), candidates.end(), random);
    std::map<std::string, std::size_t> existing;
    RandomHost host;
    for (unsigned group = 0, groups = random() % 6; group < groups; ++group) {
      const std::string name = "g" + std::to_string(group);
      existing[name] = random() % 8;
      host.mounted.push_back(
          TestSupport::AGroup(name, TestSupport::Numbered(name + "-", static_cast<int>(existing[name]))));
      host.inventory.push_back(static_cast<int>(host.pool.size()));
      host.pool.push_back(TestSupport::Ssd(name));
    }
    Install(host);
    const auto list = AnInventory(candidates);
    Ref<DataArray<DiskMapping>> mappings;
    bool limitReached = false;
    _manager->ComputeDiskMappings(list.Get(), false, mappings, limitReached);

    std::vector<const ScsiDisk*> used;
    std::size_t fewest = 7;
    std::size_t most = 0;
    std::size_t newGroups = 0;
    for (const DiskMapping* mapping : *mappings) {
      const auto before = existing.find(mapping->GetSsd()->GetCanonicalName());
      const std::size_t count = mapping->GetNonSsd()->Size();
      ASSERT_GT(count, 0U);
      ASSERT_LE(count + (before == existing.end() ? 0 : before->second), 7U);
      used.push_back(mapping->GetSsd().Get());
      for (const ScsiDisk* disk : *mapping->GetNonSsd()) {
        used.push_back(disk);
      }
      if (before == existing.end()) {
        ++newGroups;
        fewest = std::min(fewest, count);
        most = std::max(most, count);
      }
    }
    ASSERT_LE(newGroups == 0 ? 0 : newGroups + existing.size(), 5U);
    ASSERT_TRUE(newGroups == 0 || most - fewest <= 1) << "from " << fewest << " to " << most;
    std::sort(used.begin(), used.end());
    ASSERT_EQ(std::adjacent_find(used.begin(), used.end()), used.end());
    ASSERT_TRUE(!limitReached || mappings->IsEmpty());

    Ref<DataArray<DiskMapping>> again;
    _manager->ComputeDiskMappings(list.Get(), false, again, limitReached);
    ASSERT_EQ(TestSupport::GroupTexts(*again), TestSupport::GroupTexts(*mappings));
    _timeline.Take();
    _kernel.ForgetCalls();
  }
}

}  // namespace
}  // namespace Kovasvc
