// The records that cross to the kernel's library: their fields stand in this order, in these widths.

#include <gtest/gtest.h>

#include <algorithm>
#include <functional>
#include <type_traits>
#include <vector>

#include "kova/agentd/disks/DiskQuery.h"
#include "kova/agentd/include/HostCtlException.h"
#include "kova/agentd/include/KovaNetwork.h"
#include "kova/agentd/include/KovaRecords.h"
#include "kova/agentd/marshal/StatusTexts.h"

namespace HostCtl::Kova {
namespace {

static_assert(std::is_same_v<std::underlying_type_t<DiskState>, std::int32_t> && sizeof(DiskState) == 4);
static_assert(std::is_same_v<std::underlying_type_t<DiskReason>, std::int32_t> && sizeof(DiskReason) == 4);
static_assert(std::is_same_v<OTX_ReturnStatus, std::int32_t>);
static_assert(std::is_same_v<decltype(DiskMapping::formatVersion), std::uint8_t>);
static_assert(std::is_same_v<decltype(DiskResult::formatVersion), std::uint8_t>);
static_assert(std::is_same_v<decltype(FormatContext::mappingCount), std::int32_t>);
static_assert(std::is_same_v<decltype(FormatContext::mappingIndex), std::int32_t>);
static_assert(std::is_same_v<decltype(RemovalOptions::first), std::int32_t>);
static_assert(std::is_same_v<decltype(RemovalOptions::second), std::int32_t>);

// Whether the first of the fields begins the record, and the others follow in this order.
template <class Record, class... Fields>
bool BeginsWith(const Record& record, const Fields&... fields) {
  const std::vector<const void*> places = {&fields...};
  return places.front() == &record && std::is_sorted(places.begin(), places.end(), std::less<>());
}

TEST(KernelRecords, HaveTheirFieldsInTheKernelsOrder) {
  const DiskName name;
  EXPECT_TRUE(BeginsWith(name, name.deviceName, name.kovaUuid));
  const DiskMapping group;
  EXPECT_TRUE(BeginsWith(group, group.ssd, group.capacityDisks, group.formatVersion, group.allFlash,
                         group.thirdFlag));
  const DiskResult disk;
  EXPECT_TRUE(BeginsWith(disk, disk.name, disk.kovaUuid, disk.state, disk.reason, disk.isSsd, disk.isPdl,
                         disk.thirdFlag, disk.capacityFlash, disk.formatVersion));
  const FormatContext format;
  EXPECT_TRUE(BeginsWith(format, format.requestTag, format.mappingCount, format.mappingIndex));
  const RemovalOptions options;
  EXPECT_TRUE(BeginsWith(options, options.text, options.first, options.second));
  const KovaClusterInfoDetailed cluster;
  EXPECT_TRUE(BeginsWith(cluster, cluster.enabled, cluster.clusterUuid, cluster.pairs, cluster.nodeUuid,
                         cluster.text1, cluster.text2, cluster.text3, cluster.text4, cluster.text5));
  const KovaIpAddress address;
  EXPECT_TRUE(BeginsWith(address, address.isIpv6, address.ipv4, address.ipv6));
}

// Whoever fills a record leaves out what does not concern him.
TEST(KernelRecords, HoldNothingWhileNobodyFillsThem) {
  const DiskMapping group;
  EXPECT_EQ(group.formatVersion, 0);
  EXPECT_FALSE(group.allFlash || group.thirdFlag);
  const DiskResult disk;
  EXPECT_FALSE(disk.isSsd || disk.isPdl || disk.thirdFlag || disk.capacityFlash);
  EXPECT_EQ(disk.formatVersion, 0);
  const FormatContext format;
  EXPECT_EQ(format.mappingCount, 0);
  EXPECT_EQ(format.mappingIndex, 0);
  const RemovalOptions options;
  EXPECT_EQ(options.first, 0);
  EXPECT_EQ(options.second, 0);
  EXPECT_FALSE(KovaClusterInfoDetailed().enabled);
  EXPECT_FALSE(KovaIpAddress().isIpv6);
}

TEST(KernelExceptions, CarryADetailAndAnEventBesideTheMessage) {
  const HostCtl::Lib::EvtMessage event{.id = "event", .arguments = {"argument"}};
  const HostCtl::Lib::HostCtlException exception("message", "detail", event);
  EXPECT_EQ(exception.GetDetail(), "detail");
  EXPECT_EQ(exception.GetEvent().id, "event");
  EXPECT_EQ(exception.GetEvent().arguments, event.arguments);
}

TEST(KernelRecords, OfEligibleDisksAreAskedForWithoutTheFlagThatNobodyReads) {
  EXPECT_TRUE(Kovasvc::DiskQueryLimit().fifthFlag);
  EXPECT_FALSE(Kovasvc::eligibleDisks.fifthFlag);
}

TEST(KernelRecords, AreFilteredByALimitWhoseFieldsStandInOrder) {
  const Kovasvc::DiskQueryLimit limit;
  EXPECT_TRUE(BeginsWith(limit, limit.byState, limit.state, limit.byReason, limit.reason, limit.fifthFlag));
}

TEST(KernelRecords, NumberStatesAndReasonsAsTheKernelDoes) {
  EXPECT_EQ(static_cast<int>(DiskState::InUse), 0);
  EXPECT_EQ(static_cast<int>(DiskState::Eligible), 1);
  EXPECT_EQ(static_cast<int>(DiskState::Ineligible), 2);
  EXPECT_EQ(static_cast<int>(DiskReason::None), 0);
  EXPECT_EQ(static_cast<int>(DiskReason::NonLocal), 1);
  EXPECT_EQ(static_cast<int>(DiskReason::HasPartitions), 2);
  EXPECT_EQ(static_cast<int>(DiskReason::Usb), 3);
  EXPECT_EQ(static_cast<int>(DiskReason::HasForeignPartitions), 4);
  EXPECT_EQ(static_cast<int>(DiskReason::TooSmall), 5);
  EXPECT_EQ(static_cast<int>(DiskReason::GroupNotMounted), 6);
}

}  // namespace
}  // namespace HostCtl::Kova
