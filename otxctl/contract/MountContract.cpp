#include "otxctl/contract/ProviderContract.h"

namespace OtxCtl::Contract {
namespace {

using HostCtl::Kova::DiskReason;
using HostCtl::Kova::DiskState;
using HostCtl::Lib::KovaStorageException;
using Sim::AHost;
using Sim::HostBuilder;
using testing::ElementsAre;
using testing::IsEmpty;

HostBuilder TwoCacheDisksAndTwoOthers() {
  return AHost().WithSsd("naa.1").WithSsd("naa.2").WithHdds({"naa.3", "naa.4"});
}

TEST_P(ProviderContract, AnUnmountedGroupIsListedOnlyOnRequestAndCannotBeExtended) {
  Start(TwoCacheDisksAndTwoOthers());
  Format("naa.1", {"naa.3"});
  Format("naa.2", {"naa.4"});
  Provider().UnmountDiskMapping("naa.1");
  const auto mounted = Groups(false);
  ASSERT_EQ(mounted.size(), 1U);
  EXPECT_THAT(NamesOf(mounted[0]), ElementsAre("naa.2", "naa.4"));
  const auto all = Groups(true);
  ASSERT_EQ(all.size(), 2U);
  EXPECT_THAT(NamesOf(all[0]), ElementsAre("naa.1", "naa.3"));
  EXPECT_TRUE(all[0].thirdFlag);
  EXPECT_FALSE(all[1].thirdFlag);
}

TEST_P(ProviderContract, DisksOfAnUnmountedGroupSaySoAndKeepTheirIdentity) {
  Start(TwoCacheDisksAndTwoOthers());
  Format("naa.1", {"naa.3"});
  const std::string identity = RecordOf("naa.3").kovaUuid;
  Provider().UnmountDiskMapping("naa.1");
  for (const std::string name : {"naa.1", "naa.3"}) {
    EXPECT_EQ(RecordOf(name).state, DiskState::Ineligible) << name;
    EXPECT_EQ(RecordOf(name).reason, DiskReason::GroupNotMounted) << name;
  }
  EXPECT_EQ(RecordOf("naa.3").kovaUuid, identity);
}

TEST_P(ProviderContract, UnmountingTwiceIsNoError) {
  Start(TwoCacheDisksAndTwoOthers());
  Format("naa.1", {"naa.3"});
  Provider().UnmountDiskMapping("naa.1");
  const HostState once = State();
  EXPECT_NO_THROW(Provider().UnmountDiskMapping("naa.1"));
  EXPECT_EQ(State(), once);
}

TEST_P(ProviderContract, RestampingChangesNothingThatShowsAndDoesNotMount) {
  Start(TwoCacheDisksAndTwoOthers());
  Format("naa.1", {"naa.3"});
  Provider().UnmountDiskMapping("naa.1");
  const auto before = Groups();
  Provider().RestampDiskMapping("naa.1", {"naa.3"});
  EXPECT_THAT(Groups(false), IsEmpty());
  ASSERT_EQ(Groups().size(), 1U);
  EXPECT_EQ(NamesOf(Groups()[0]), NamesOf(before[0]));
}

TEST_P(ProviderContract, MountingBringsARestampedGroupBackAsItWas) {
  Start(TwoCacheDisksAndTwoOthers());
  Format("naa.1", {"naa.3"});
  Provider().UnmountDiskMapping("naa.1");
  Provider().RestampDiskMapping("naa.1", {"naa.3"});
  Provider().MountDiskMapping("naa.1", false);
  const auto groups = Groups(false);
  ASSERT_EQ(groups.size(), 1U);
  EXPECT_THAT(NamesOf(groups[0]), ElementsAre("naa.1", "naa.3"));
  EXPECT_FALSE(groups[0].thirdFlag);
  EXPECT_EQ(RecordOf("naa.3").state, DiskState::InUse);
}

TEST_P(ProviderContract, MountingAMountedGroupIsNoError) {
  Start(TwoCacheDisksAndTwoOthers());
  Format("naa.1", {"naa.3"});
  const HostState before = State();
  EXPECT_NO_THROW(Provider().MountDiskMapping("naa.1", true));
  EXPECT_EQ(State(), before);
}

TEST_P(ProviderContract, RestampingAMountedGroupChangesNothingThatShows) {
  Start(TwoCacheDisksAndTwoOthers());
  Format("naa.1", {"naa.3"});
  const HostState before = State();
  Provider().RestampDiskMapping("naa.1", {"naa.3"});
  EXPECT_EQ(State(), before);
}

TEST_P(ProviderContract, AGroupIsNamedByItsCacheDiskAlone) {
  Start(TwoCacheDisksAndTwoOthers());
  Format("naa.1", {"naa.3"});
  for (const std::string name : {"naa.3", "naa.2", "naa.nowhere", ""}) {
    SCOPED_TRACE(name);
    const auto isOffender = [&name](const KovaStorageException& refusal) {
      return refusal.GetDiskName() == name;
    };
    EXPECT_TRUE(isOffender(Refused<KovaStorageException>([&] { Provider().UnmountDiskMapping(name); })));
    EXPECT_TRUE(isOffender(Refused<KovaStorageException>([&] { Provider().MountDiskMapping(name, false); })));
    EXPECT_TRUE(
        isOffender(Refused<KovaStorageException>([&] { Provider().RestampDiskMapping(name, {"naa.3"}); })));
  }
}

TEST_P(ProviderContract, RestampsAGroupByTheIdentityOfItsAbsentCacheDisk) {
  if (!Can().absentDisks || !Can().groupsFromStart) {
    GTEST_SKIP() << "disks of this host cannot leave";
  }
  Start(TwoCacheDisksAndTwoOthers().WithUnmountedGroup("naa.1", {"naa.3"}).Without("naa.1"));
  const HostState before = State();
  EXPECT_NO_THROW(Provider().RestampDiskMappingByUuid("uuid-of-naa.1"));
  EXPECT_EQ(State(), before);
  for (const std::string uuid : {"uuid-of-naa.3", "uuid-of-nobody", ""}) {
    const auto refusal = Refused<KovaStorageException>([&] { Provider().RestampDiskMappingByUuid(uuid); });
    EXPECT_EQ(refusal.GetDiskName(), uuid);
  }
}

TEST_P(ProviderContract, ClaimingMountsEveryGroup) {
  Start(TwoCacheDisksAndTwoOthers());
  Format("naa.1", {"naa.3"});
  Format("naa.2", {"naa.4"});
  Provider().UnmountDiskMapping("naa.1");
  Provider().UnmountDiskMapping("naa.2");
  Provider().ClaimUnmountedDiskgroups();
  EXPECT_EQ(Groups(false).size(), 2U);
  const HostState claimed = State();
  EXPECT_NO_THROW(Provider().ClaimUnmountedDiskgroups());
  EXPECT_EQ(State(), claimed) << "mounted groups stay as they are";
}

TEST_P(ProviderContract, ClaimingOnAHostWithNothingToClaimIsNoError) {
  Start(TwoCacheDisksAndTwoOthers());
  EXPECT_NO_THROW(Provider().ClaimUnmountedDiskgroups());
  EXPECT_THAT(Groups(), IsEmpty());
}

}  // namespace
}  // namespace OtxCtl::Contract
