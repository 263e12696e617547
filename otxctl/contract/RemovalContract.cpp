#include <cstdint>

#include "otxctl/contract/ProviderContract.h"

namespace OtxCtl::Contract {
namespace {

using HostCtl::Kova::DiskState;
using HostCtl::Kova::RemovalOptions;
using HostCtl::Lib::KovaExceptionLastRemainingHDD;
using HostCtl::Lib::KovaExceptionRemoveDiskAutoModeEnabled;
using HostCtl::Lib::KovaExceptionRemoveMappingAutoModeEnabled;
using HostCtl::Lib::KovaStorageException;
using Sim::AHost;
using Sim::HostBuilder;
using Sim::HostDescription;
using testing::ElementsAre;
using testing::IsEmpty;

const RemovalOptions removalOptions = {"option", 1, 2};

HostBuilder ThreeDisks() {
  return AHost().WithSsd("naa.1").WithHdds({"naa.2", "naa.3"});
}

TEST_P(ProviderContract, ARemovedCapacityDiskLeavesItsGroupAndIsFreeAgain) {
  Start(ThreeDisks());
  Format("naa.1", {"naa.2", "naa.3"});
  Provider().RemoveDisk("naa.2", "pass", removalOptions);
  ASSERT_EQ(Groups().size(), 1U);
  EXPECT_THAT(NamesOf(Groups()[0]), ElementsAre("naa.1", "naa.3"));
  EXPECT_EQ(RecordOf("naa.2").state, DiskState::Eligible);
  EXPECT_EQ(RecordOf("naa.2").kovaUuid, "");
  EXPECT_EQ(RecordOf("naa.2").formatVersion, 0);
}

TEST_P(ProviderContract, ARemovedDiskCanBeUsedAgain) {
  Start(ThreeDisks());
  Format("naa.1", {"naa.2", "naa.3"});
  Provider().RemoveDisk("naa.2", "", removalOptions);
  Format("naa.1", {"naa.2"});
  EXPECT_THAT(NamesOf(Groups().at(0)), ElementsAre("naa.1", "naa.3", "naa.2"));
}

TEST_P(ProviderContract, RemovingTheCacheDiskRemovesItsGroup) {
  Start(ThreeDisks());
  Format("naa.1", {"naa.2", "naa.3"});
  Provider().RemoveDisk("naa.1", "", removalOptions);
  EXPECT_THAT(Groups(), IsEmpty());
  for (const std::string name : {"naa.1", "naa.2", "naa.3"}) {
    EXPECT_EQ(RecordOf(name).state, DiskState::Eligible) << name;
    EXPECT_EQ(RecordOf(name).kovaUuid, "") << name;
  }
}

TEST_P(ProviderContract, RemovingAMappingRemovesTheGroupAndLeavesTheOthersInOrder) {
  Start(AHost().WithSsd("naa.1").WithSsd("naa.2").WithSsd("naa.3").WithHdds({"naa.4", "naa.5", "naa.6"}));
  Format("naa.1", {"naa.4"});
  Format("naa.2", {"naa.5"});
  Format("naa.3", {"naa.6"});
  Provider().RemoveDiskMapping("naa.2", "", removalOptions);
  ASSERT_EQ(Groups().size(), 2U);
  EXPECT_THAT(NamesOf(Groups()[0]), ElementsAre("naa.1", "naa.4"));
  EXPECT_THAT(NamesOf(Groups()[1]), ElementsAre("naa.3", "naa.6"));
  EXPECT_EQ(RecordOf("naa.5").state, DiskState::Eligible);
  EXPECT_EQ(RecordOf("naa.6").state, DiskState::InUse);
}

TEST_P(ProviderContract, TheLastCapacityDiskCannotBeRemovedAlone) {
  Start(ThreeDisks());
  Format("naa.1", {"naa.2"});
  const auto refusal =
      Refused<KovaExceptionLastRemainingHDD>([&] { Provider().RemoveDisk("naa.2", "", removalOptions); });
  EXPECT_EQ(refusal.GetDiskName(), "naa.2");
}

TEST_P(ProviderContract, OnlyDisksOfGroupsCanBeRemoved) {
  Start(ThreeDisks());
  Format("naa.1", {"naa.2"});
  for (const std::string name : {"naa.3", "naa.nowhere", ""}) {
    SCOPED_TRACE(name);
    const auto refusal =
        Refused<KovaStorageException>([&] { Provider().RemoveDisk(name, "", removalOptions); });
    EXPECT_EQ(refusal.GetDiskName(), name);
  }
}

TEST_P(ProviderContract, WhatARemovalBringsAlongChangesNothingOfIt) {
  for (const RemovalOptions& options :
       {RemovalOptions{}, {std::string(4096, 'x'), INT32_MAX, INT32_MIN}, {"\xFF", -1, 1}}) {
    Start(ThreeDisks());
    Format("naa.1", {"naa.2", "naa.3"});
    Provider().RemoveDisk("naa.2", options.text, options);
    EXPECT_THAT(NamesOf(Groups().at(0)), ElementsAre("naa.1", "naa.3"));
    Provider().RemoveDiskMapping("naa.1", options.text, options);
    EXPECT_THAT(Groups(), IsEmpty());
  }
}

TEST_P(ProviderContract, AnAbsentDiskIsNotRemovedByItsOldName) {
  if (!Can().absentDisks || !Can().groupsFromStart) {
    GTEST_SKIP() << "disks of this host cannot leave";
  }
  Start(ThreeDisks().WithGroup("naa.1", {"naa.2", "naa.3"}).Without("naa.2"));
  Refused<KovaStorageException>([&] { Provider().RemoveDisk("naa.2", "", removalOptions); });
}

TEST_P(ProviderContract, OnlyTheCacheDiskOfAGroupNamesAMappingToRemove) {
  Start(ThreeDisks());
  Format("naa.1", {"naa.2"});
  for (const std::string name : {"naa.2", "naa.3", "naa.nowhere", ""}) {
    SCOPED_TRACE(name);
    const auto refusal =
        Refused<KovaStorageException>([&] { Provider().RemoveDiskMapping(name, "", removalOptions); });
    EXPECT_EQ(refusal.GetDiskName(), name);
  }
}

TEST_P(ProviderContract, RemovalWorksOnUnmountedGroupsToo) {
  Start(AHost().WithSsd("naa.1").WithSsd("naa.2").WithHdds({"naa.3", "naa.4", "naa.5"}));
  Format("naa.1", {"naa.3", "naa.4"});
  Format("naa.2", {"naa.5"});
  Provider().UnmountDiskMapping("naa.1");
  Provider().UnmountDiskMapping("naa.2");
  Provider().RemoveDisk("naa.3", "", removalOptions);
  Provider().RemoveDiskMapping("naa.2", "", removalOptions);
  ASSERT_EQ(Groups().size(), 1U);
  EXPECT_THAT(NamesOf(Groups()[0]), ElementsAre("naa.1", "naa.4"));
  EXPECT_THAT(Groups(false), IsEmpty());
}

TEST_P(ProviderContract, NothingIsRemovedWhileDisksAreClaimedAutomatically) {
  if (!Can().automaticMode || !Can().groupsFromStart) {
    GTEST_SKIP() << "this host never claims disks automatically";
  }
  Start(ThreeDisks().WithGroup("naa.1", {"naa.2", "naa.3"}).Edit([](HostDescription& host) {
    host.autoMode = true;
  }));
  EXPECT_TRUE(Provider().IsAutoModeEnabled());
  for (const std::string name : {"naa.2", "naa.1", "naa.nowhere"}) {
    SCOPED_TRACE(name);
    const auto disk = Refused<KovaExceptionRemoveDiskAutoModeEnabled>(
        [&] { Provider().RemoveDisk(name, "", removalOptions); });
    EXPECT_EQ(disk.GetDiskName(), name);
    const auto mapping = Refused<KovaExceptionRemoveMappingAutoModeEnabled>(
        [&] { Provider().RemoveDiskMapping(name, "", removalOptions); });
    EXPECT_EQ(mapping.GetDiskName(), name);
  }
}

TEST_P(ProviderContract, AnAbsentDiskIsRemovedByItsIdentityWhateverTheAutomaticMode) {
  if (!Can().absentDisks || !Can().groupsFromStart) {
    GTEST_SKIP() << "disks of this host cannot leave";
  }
  for (const bool isAutomatic : {false, true}) {
    if (isAutomatic && !Can().automaticMode) {
      continue;
    }
    Start(ThreeDisks()
              .WithGroup("naa.1", {"naa.2", "naa.3"})
              .Without("naa.2")
              .Edit([isAutomatic](HostDescription& host) { host.autoMode = isAutomatic; }));
    Provider().RemoveDiskByUuid("uuid-of-naa.2", "pass");
    EXPECT_THAT(NamesOf(Groups().at(0)), ElementsAre("naa.1", "naa.3"));
  }
}

TEST_P(ProviderContract, AnAbsentCacheDiskTakesItsGroupAlong) {
  if (!Can().absentDisks || !Can().groupsFromStart) {
    GTEST_SKIP() << "disks of this host cannot leave";
  }
  Start(ThreeDisks().WithGroup("naa.1", {"naa.2", "naa.3"}).Without("naa.1"));
  Provider().RemoveDiskByUuid("uuid-of-naa.1", "");
  EXPECT_THAT(Groups(), IsEmpty());
  EXPECT_EQ(RecordOf("naa.2").state, DiskState::Eligible);
}

TEST_P(ProviderContract, TheLastCapacityDiskStaysEvenWhenItIsAbsent) {
  if (!Can().absentDisks || !Can().groupsFromStart) {
    GTEST_SKIP() << "disks of this host cannot leave";
  }
  Start(ThreeDisks().WithGroup("naa.1", {"naa.2"}).Without("naa.2"));
  const auto refusal =
      Refused<KovaExceptionLastRemainingHDD>([&] { Provider().RemoveDiskByUuid("uuid-of-naa.2", ""); });
  EXPECT_EQ(refusal.GetDiskName(), "uuid-of-naa.2");
}

TEST_P(ProviderContract, OnlyAbsentDisksAreRemovedByIdentity) {
  if (!Can().absentDisks || !Can().groupsFromStart) {
    GTEST_SKIP() << "disks of this host cannot leave";
  }
  Start(ThreeDisks().WithGroup("naa.1", {"naa.2", "naa.3"}).Without("naa.2"));
  for (const std::string uuid : {"uuid-of-naa.3", "uuid-of-naa.1", "uuid-of-nobody", ""}) {
    SCOPED_TRACE(uuid);
    const auto refusal = Refused<KovaStorageException>([&] { Provider().RemoveDiskByUuid(uuid, ""); });
    EXPECT_EQ(refusal.GetDiskName(), uuid);
  }
}

}  // namespace
}  // namespace OtxCtl::Contract
