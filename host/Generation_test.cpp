#include "host/Generation.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <functional>
#include <set>

#include "host/HostState.h"
#include "nox/Host.h"
#include "orbis/Engine.h"

namespace Host {
namespace {

using HostCtl::Kova::DiskReason;
using HostCtl::Kova::DiskState;
using Nox::Host::ScsiDisk;
using Tessa::MakeRef;

Tessa::Ref<Nox::Host::StorageDeviceInfo> AnInventory(const std::function<void(ScsiDisk&)>& edit = {}) {
  const auto units = MakeRef<Orbis::DataArray<Nox::Host::ScsiLun>>();
  for (const char* const name : {"naa.1", "naa.2"}) {
    const auto disk = MakeRef<ScsiDisk>();
    disk->SetCanonicalName(name);
    disk->SetSsd(false);
    units->Append(disk);
  }
  if (edit) {
    edit(dynamic_cast<ScsiDisk&>(*(*units)[1]));
  }
  auto info = MakeRef<Nox::Host::StorageDeviceInfo>();
  info->SetScsiLun(units);
  return info;
}

// With one of everything, and no two values alike.
HostState AState() {
  HostState state;
  state.disks.push_back({.name = "naa.1", .kovaUuid = "u1", .state = DiskState::InUse});
  state.disks.push_back(
      {.name = "naa.2", .kovaUuid = "", .state = DiskState::Ineligible, .reason = DiskReason::Usb});
  KernelGroup& group = state.groups.emplace_back();
  group.disks.ssd = {.deviceName = "naa.1", .kovaUuid = "u1"};
  group.disks.capacityDisks = {{.deviceName = "naa.3", .kovaUuid = "u3"},
                               {.deviceName = "", .kovaUuid = "u4"}};
  group.mounted = true;
  state.cluster.clusterUuid = "c";
  state.cluster.pairs = {{"key", "value"}};
  state.faultDomain = "rack";
  state.nics = {{.interface = "otx1", .masterGroup = "224.1.2.3", .agentGroup = "FF19::1"}};
  state.inventory = AnInventory();
  return state;
}

using Edit = std::function<void(HostState&)>;

HostState Edited(const Edit& edit) {
  HostState state = AState();
  edit(state);
  return state;
}

// Each changes one value.
std::vector<Edit> EditsOfDisks() {
  return {
      [](HostState& state) { state.disks[0].name = "naa.0"; },
      [](HostState& state) { state.disks[0].kovaUuid = "u0"; },
      [](HostState& state) { state.disks[0].state = DiskState::Eligible; },
      [](HostState& state) { state.disks[1].reason = DiskReason::TooSmall; },
      [](HostState& state) { state.disks[0].isSsd = true; },
      [](HostState& state) { state.disks[0].isPdl = true; },
      [](HostState& state) { state.disks[0].thirdFlag = true; },
      [](HostState& state) { state.disks[0].capacityFlash = true; },
      [](HostState& state) { state.disks[0].formatVersion = 1; },
      [](HostState& state) { state.disks.pop_back(); },
      [](HostState& state) { std::swap(state.disks[0], state.disks[1]); },
      [](HostState& state) { state.inventory = nullptr; },
      [](HostState& state) { state.inventory = MakeRef<Nox::Host::StorageDeviceInfo>(); },
      [](HostState& state) { state.inventory->GetScsiLun()->Append(nullptr); },
      [](HostState& state) { state.inventory = AnInventory([](ScsiDisk& disk) { disk.SetSsd(true); }); },
      [](HostState& state) {
        state.inventory = AnInventory([](ScsiDisk& disk) { disk.SetDetail("ext4 file system"); });
      },
      [](HostState& state) {
        state.inventory = AnInventory([](ScsiDisk& disk) { disk.GetCapacity()->SetBlock(7); });
      },
  };
}

std::vector<Edit> EditsOfGroups() {
  return {
      [](HostState& state) { state.groups[0].disks.ssd.deviceName = ""; },
      [](HostState& state) { state.groups[0].disks.ssd.kovaUuid = "u0"; },
      [](HostState& state) { state.groups[0].disks.capacityDisks.pop_back(); },
      [](HostState& state) { state.groups[0].disks.capacityDisks[0].deviceName = "naa.4"; },
      [](HostState& state) { state.groups[0].disks.formatVersion = 1; },
      [](HostState& state) { state.groups[0].disks.allFlash = true; },
      [](HostState& state) { state.groups[0].disks.thirdFlag = true; },
      [](HostState& state) { state.groups[0].mounted = false; },
      [](HostState& state) { state.groups.clear(); },
  };
}

std::vector<Edit> EditsOfConfiguration() {
  return {
      [](HostState& state) { state.autoMode = true; },
      [](HostState& state) { state.cluster.enabled = true; },
      [](HostState& state) { state.cluster.clusterUuid = ""; },
      [](HostState& state) { state.cluster.nodeUuid = "n"; },
      [](HostState& state) { state.cluster.pairs[0].second = "other"; },
      [](HostState& state) { state.cluster.text1 = "t"; },
      [](HostState& state) { state.cluster.text2 = "t"; },
      [](HostState& state) { state.cluster.text3 = "t"; },
      [](HostState& state) { state.cluster.text4 = "t"; },
      [](HostState& state) { state.cluster.text5 = "t"; },
      [](HostState& state) { state.faultDomain = "rac"; },
      [](HostState& state) { state.nics.clear(); },
      [](HostState& state) { state.nics[0].interface = "otx2"; },
      [](HostState& state) { state.nics[0].masterGroup = "224.1.2.4"; },
      [](HostState& state) { state.nics[0].agentGroup = ""; },
  };
}

TEST(Generation, IsAShortText) {
  for (const HostState& state : {HostState(), AState()}) {
    EXPECT_THAT(GenerationOf(state), testing::MatchesRegex("[0-9a-f]{16}"));
  }
}

TEST(Generation, IsAnotherOneForEachValueThatDiffers) {
  std::set<std::string> seen = {GenerationOf(AState())};
  for (const auto& edits : {EditsOfDisks(), EditsOfGroups(), EditsOfConfiguration()}) {
    for (std::size_t index = 0; index < edits.size(); ++index) {
      EXPECT_TRUE(seen.insert(GenerationOf(Edited(edits[index]))).second) << "edit " << index;
    }
  }
}

TEST(Generation, IsAnotherOneWhereTextsOnlyMeetElsewhere) {
  const auto named = [](const char* name, const char* uuid) {
    HostState state;
    state.disks.push_back({.name = name, .kovaUuid = uuid});
    return GenerationOf(state);
  };
  EXPECT_NE(named("naa.12", "3"), named("naa.1", "23"));
  EXPECT_NE(named("", "naa.1"), named("naa.1", ""));
}

TEST(Generation, IsTheSameOfTheSameValuesElsewhereInMemory) {
  const HostState state = AState();
  HostState copy = state;
  copy.inventory = Orbis::Clone(state.inventory);
  copy.disks.reserve(1000);
  EXPECT_EQ(GenerationOf(copy), GenerationOf(state));
  EXPECT_EQ(GenerationOf(AState()), GenerationOf(state));
}

// It is handed to clients, who bring it back to an agent that may have been started anew meanwhile.
TEST(Generation, IsTheSameInEveryProcess) {
  HostState state;
  state.faultDomain = "rack";
  EXPECT_EQ(GenerationOf(state), "8b6602a05e282faf");
}

}  // namespace
}  // namespace Host
