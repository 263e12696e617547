#include "kova/agentd/disks/DiskQuery.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <new>
#include <random>
#include <string>
#include <vector>

#include "kova/agentd/include/HostCtlException.h"
#include "tests/support/Builders.h"
#include "tests/support/Matchers.h"
#include "tests/support/RecordingLogger.h"
#include "tests/support/RefusedMemory.h"
#include "tests/support/Seed.h"

namespace Kovasvc {
namespace {

using HostCtl::Kova::DiskReason;
using HostCtl::Kova::DiskState;
using Tessa::MakeRef;
using Tessa::Ref;
using Tessa::Service::LogLevel;
using testing::ElementsAre;
using testing::IsEmpty;
using TestSupport::ARecord;
using TestSupport::LogLineIs;
using TestSupport::RecordingLogger;
using Records = std::vector<HostCtl::Kova::DiskResult>;
using Names = std::vector<std::string>;

class DiskFilter : public testing::Test {
 protected:
  Names Filter(const Names& names, const DiskQueryLimit& limit) {
    Records passed;
    LimitQueryDisksForKova(*_logger, names, limit, _records, passed);
    Names found;
    for (const HostCtl::Kova::DiskResult& record : passed) {
      found.push_back(record.name);
    }
    return found;
  }

  Ref<RecordingLogger> _logger = MakeRef<RecordingLogger>();
  Records _records = {ARecord("naa.3"), ARecord("naa.1").Ineligible(DiskReason::Usb),
                      ARecord("naa.2").InUse("uuid"), ARecord("naa.4").Reason(DiskReason::Usb)};
};

TEST_F(DiskFilter, StartsFromLettingEveryDiskThrough) {
  const DiskQueryLimit limit;
  EXPECT_FALSE(limit.byState);
  EXPECT_EQ(limit.state, DiskState::Eligible);
  EXPECT_FALSE(limit.byReason);
  EXPECT_EQ(limit.reason, DiskReason::None);
  EXPECT_TRUE(limit.fifthFlag);
  EXPECT_THAT(Filter({}, limit), ElementsAre("naa.3", "naa.1", "naa.2", "naa.4"));
}

TEST_F(DiskFilter, KeepsTheNamedOnesInTheOrderOfTheRecords) {
  EXPECT_THAT(Filter({"naa.2", "naa.3"}, {}), ElementsAre("naa.3", "naa.2"));
}

TEST_F(DiskFilter, DoesNotDoubleARecordThatIsNamedTwice) {
  EXPECT_THAT(Filter({"naa.2", "naa.2"}, {}), ElementsAre("naa.2"));
}

TEST_F(DiskFilter, GivesEveryRecordOfANameThatTheKernelHasTwice) {
  _records.push_back(ARecord("naa.2"));
  EXPECT_THAT(Filter({"naa.2"}, {}), ElementsAre("naa.2", "naa.2"));
}

TEST_F(DiskFilter, PassesOverANameThatMatchesNothingWithoutALine) {
  EXPECT_THAT(Filter({"naa.9"}, {}), IsEmpty());
  EXPECT_THAT(Filter({"naa.9", "naa.1"}, {}), ElementsAre("naa.1"));
  EXPECT_THAT(_logger->Lines(), IsEmpty());
}

TEST_F(DiskFilter, ComparesNamesExactly) {
  EXPECT_THAT(Filter({"NAA.1", "naa.", "naa.11", " naa.1", ""}, {}), IsEmpty());
}

TEST_F(DiskFilter, TakesAnEmptyNameForAName) {
  _records.push_back(ARecord("").Absent());
  EXPECT_THAT(Filter({""}, {}), ElementsAre(""));
}

TEST_F(DiskFilter, KeepsTheWantedStateOnly) {
  EXPECT_THAT(Filter({}, {.byState = true}), ElementsAre("naa.3", "naa.4"));
  EXPECT_THAT(Filter({}, {.byState = true, .state = DiskState::InUse}), ElementsAre("naa.2"));
}

TEST_F(DiskFilter, KeepsTheWantedReasonOnly) {
  EXPECT_THAT(Filter({}, {.byReason = true}), ElementsAre("naa.3", "naa.2"));
  EXPECT_THAT(Filter({}, {.byReason = true, .reason = DiskReason::Usb}), ElementsAre("naa.1", "naa.4"));
}

TEST_F(DiskFilter, KeepsWhatFitsNameStateAndReasonAtOnce) {
  const DiskQueryLimit limit = {.byState = true, .byReason = true};
  EXPECT_THAT(Filter({}, limit), ElementsAre("naa.3"));
  EXPECT_THAT(Filter({"naa.4", "naa.1"}, limit), IsEmpty());
}

TEST_F(DiskFilter, IgnoresStateAndReasonUnlessToldToLook) {
  EXPECT_THAT(Filter({}, {.state = DiskState::Ineligible, .reason = DiskReason::TooSmall}),
              ElementsAre("naa.3", "naa.1", "naa.2", "naa.4"));
}

TEST_F(DiskFilter, NeverReadsTheFifthFlag) {
  EXPECT_EQ(Filter({}, {.byState = true, .fifthFlag = false}),
            Filter({}, {.byState = true, .fifthFlag = true}));
}

TEST_F(DiskFilter, AppendsWholeRecordsBehindWhatTheListHolds) {
  HostCtl::Kova::DiskResult whole = ARecord("naa.1").InUse("uuid", 7).Ssd().CapacityFlash().Absent();
  whole.reason = DiskReason::GroupNotMounted;
  whole.thirdFlag = true;
  Records passed = {ARecord("naa.before")};
  LimitQueryDisksForKova(*_logger, {}, {}, {whole}, passed);
  EXPECT_THAT(passed, ElementsAre(HostCtl::Kova::DiskResult(ARecord("naa.before")), whole));
}

TEST_F(DiskFilter, LeavesTheListAloneWithoutRecords) {
  Records passed = {ARecord("naa.before")};
  LimitQueryDisksForKova(*_logger, {"naa.1"}, {}, {}, passed);
  EXPECT_EQ(passed.size(), 1U);
}

TEST_F(DiskFilter, EndsWithAWarningAtAKernelExceptionAndKeepsWhatPassedBefore) {
  const std::string longName(100, 'n');  // whose copy asks for memory
  const Records records = {ARecord("naa.3"), ARecord(longName), ARecord("naa.4")};
  Records passed;
  passed.reserve(records.size());
  {
    const TestSupport::RefusedMemory refused;
    LimitQueryDisksForKova(*_logger, {}, {}, records, passed);
  }
  EXPECT_THAT(passed, ElementsAre(records[0]));
  EXPECT_THAT(_logger->Lines(),
              ElementsAre(LogLineIs(LogLevel::Warning, "%1: Error querying disks for KOVA: %2",
                                    "LimitQueryDisksForKova", TestSupport::RefusedMemory::described)));
}

TEST_F(DiskFilter, LetsOutThatThereIsNoMemory) {
  const Records records = {ARecord(std::string(100, 'n'))};
  Records passed;
  passed.reserve(records.size());
  const auto filter = [&] {
    const TestSupport::RefusedMemory refused(TestSupport::RefusedMemory::By::System);
    LimitQueryDisksForKova(*_logger, {}, {}, records, passed);
  };
  EXPECT_THROW(filter(), std::bad_alloc);
  EXPECT_THAT(_logger->Lines(), IsEmpty());
}

// The filter, written down once more as plain walks and apart from the product's.
Records PlainFilter(const Names& names, const DiskQueryLimit& limit, const Records& records) {
  Records passed;
  for (const HostCtl::Kova::DiskResult& record : records) {
    if (!names.empty() && std::find(names.begin(), names.end(), record.name) == names.end()) {
      continue;
    }
    if (limit.byState && record.state != limit.state) {
      continue;
    }
    if (limit.byReason && record.reason != limit.reason) {
      continue;
    }
    passed.push_back(record);
  }
  return passed;
}

std::string RandomName(std::mt19937& random) {
  const unsigned kind = random() % 9;
  return kind == 0 ? "" : "naa." + std::to_string(kind);
}

Records RandomRecords(std::mt19937& random) {
  Records records(random() % 12);
  for (HostCtl::Kova::DiskResult& record : records) {
    record.name = RandomName(random);
    record.state = static_cast<DiskState>(random() % 4);
    record.reason = static_cast<DiskReason>(random() % 8);
    record.capacityFlash = random() % 2 != 0;
  }
  return records;
}

TEST(DiskFilterProperty, AgreesWithPlainWalksForAnyNamesLimitsAndRecords) {
  const TestSupport::Seed seed;
  std::mt19937 random(seed.Value());
  const auto logger = MakeRef<RecordingLogger>();
  for (int round = 0; round < 5000; ++round) {
    Names names(random() % 5);
    std::generate(names.begin(), names.end(), [&] { return RandomName(random); });
    const DiskQueryLimit limit = {.byState = random() % 2 != 0,
                                  .state = static_cast<DiskState>(random() % 4),
                                  .byReason = random() % 2 != 0,
                                  .reason = static_cast<DiskReason>(random() % 8),
                                  .fifthFlag = random() % 2 != 0};
    const Records records = RandomRecords(random);
    Records passed;
    LimitQueryDisksForKova(*logger, names, limit, records, passed);
    ASSERT_EQ(passed, PlainFilter(names, limit, records)) << "round " << round;
  }
}

}  // namespace
}  // namespace Kovasvc
