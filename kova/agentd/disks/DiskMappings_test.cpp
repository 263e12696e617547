#include "kova/agentd/disks/DiskMappings.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "nox/Kova.h"
#include "tests/support/Groups.h"
#include "tests/support/Matchers.h"

namespace Kovasvc {
namespace {

using Nox::Kova::Host::DiskMapping;
using Orbis::DataArray;
using Tessa::MakeRef;
using Tessa::NotInitializedException;
using Tessa::Service::LogLevel;
using testing::ElementsAre;
using testing::IsEmpty;
using testing::StrEq;
using testing::ThrowsMessage;
using TestSupport::AMapping;
using TestSupport::AScsiDisk;
using TestSupport::LogLineIs;
using TestSupport::Mappings;
using TestSupport::RecordingLogger;

const auto isNotInitialized = ThrowsMessage<NotInitializedException>(StrEq("Not initialized"));

// ---- names of disks

TEST(NameOf, IsTheCanonicalNameAndNeedsOne) {
  EXPECT_EQ(NameOf(AScsiDisk("naa.1").Build().Get()), "naa.1");
  EXPECT_THAT([] { NameOf(AScsiDisk("x").Unnamed().Build().Get()); }, isNotInitialized);
  EXPECT_THAT([] { NameOf(nullptr); }, isNotInitialized);
}

TEST(IsSsd, IsTheFlagAndNeedsOne) {
  const auto isNotSet = ThrowsMessage<NotInitializedException>(StrEq("optional value not set"));
  EXPECT_TRUE(IsSsd(AScsiDisk("x").Ssd().Build().Get()));
  EXPECT_FALSE(IsSsd(AScsiDisk("x").Ssd(false).Build().Get()));
  EXPECT_THAT([] { IsSsd(AScsiDisk("x").Ssd(std::nullopt).Build().Get()); }, isNotSet);
  EXPECT_THAT([] { IsSsd(nullptr); }, isNotSet);
}

TEST(NameForLog, SaysWhenThereIsNoName) {
  EXPECT_EQ(NameForLog(AScsiDisk("naa.1").Build().Get()), "naa.1");
  EXPECT_EQ(NameForLog(AScsiDisk("").Build().Get()), "");
  EXPECT_EQ(NameForLog(AScsiDisk("x").Unnamed().Build().Get()), "<unset>");
  EXPECT_EQ(NameForLog(nullptr), "<unset>");
}

TEST(NamesOf, KeepsOrderDuplicatesAndEmptyNames) {
  EXPECT_THAT(NamesOf(TestSupport::AnInventory({AScsiDisk("b"), AScsiDisk(""), AScsiDisk("b")}).Get()),
              ElementsAre("b", "", "b"));
  EXPECT_THAT(NamesOf(nullptr), IsEmpty());
}

TEST(JoinNames, PutsSeparatorsBetweenAndNoneBehind) {
  EXPECT_EQ(JoinNames({}), "");
  EXPECT_EQ(JoinNames({"a"}), "a");
  EXPECT_EQ(JoinNames({"a", "", "a"}), "a, , a");
}

// ---- the device names of a group

TEST(DiskMappingToDeviceNames, SortsTheNamesAndLeavesEmptyOnesOut) {
  std::vector<std::string> names;
  DiskMappingToDeviceNames(AMapping(AScsiDisk("m"), {AScsiDisk("z"), AScsiDisk(""), AScsiDisk("a")}), names);
  EXPECT_THAT(names, ElementsAre("a", "m", "z"));
}

TEST(DiskMappingToDeviceNames, SortsWhatWasThereBeforeToo) {
  std::vector<std::string> names = {"y", "", "b"};
  DiskMappingToDeviceNames(AMapping(AScsiDisk(""), {AScsiDisk("x")}), names);
  EXPECT_THAT(names, ElementsAre("", "b", "x", "y"));
}

TEST(DiskMappingToDeviceNames, KeepsDuplicates) {
  std::vector<std::string> names = {"a"};
  DiskMappingToDeviceNames(AMapping(AScsiDisk("a"), {AScsiDisk("a")}), names);
  EXPECT_THAT(names, ElementsAre("a", "a", "a"));
}

TEST(DiskMappingToDeviceNames, ComparesPlainBytes) {
  std::vector<std::string> names;
  DiskMappingToDeviceNames(
      AMapping(AScsiDisk("naa.10"), {AScsiDisk("\xC3\xA4"), AScsiDisk("naa.9"), AScsiDisk("NAA.9")}), names);
  EXPECT_THAT(names, ElementsAre("NAA.9", "naa.10", "naa.9", "\xC3\xA4"));
}

TEST(DiskMappingToDeviceNames, TakesAGroupWithoutAListOfCapacityDisks) {
  std::vector<std::string> names;
  const auto mapping = MakeRef<DiskMapping>();
  mapping->SetSsd(AScsiDisk("a"));
  mapping->SetNonSsd(nullptr);
  DiskMappingToDeviceNames(mapping, names);
  EXPECT_THAT(names, ElementsAre("a"));
}

TEST(DiskMappingToDeviceNames, NeedsANameOfEveryDisk) {
  std::vector<std::string> names;
  const auto read = [&](const Tessa::Ref<DiskMapping>& mapping) {
    return [&names, mapping] { DiskMappingToDeviceNames(mapping, names); };
  };
  EXPECT_THAT(read(AMapping(AScsiDisk("x").Unnamed(), {AScsiDisk("a")})), isNotInitialized);
  EXPECT_THAT(read(AMapping(AScsiDisk("a"), {AScsiDisk("x").Unnamed()})), isNotInitialized);
  EXPECT_THAT(read(AMapping(nullptr, {AScsiDisk("a")})), isNotInitialized);
  EXPECT_THAT(read(AMapping(AScsiDisk("a"), {nullptr})), isNotInitialized);
}

TEST(AppendDeviceNames, KeepsTheOrderOfTheGroup) {
  std::vector<std::string_view> names = {"n"};
  const auto mapping = AMapping(AScsiDisk("m"), {AScsiDisk("z"), AScsiDisk(""), AScsiDisk("a")});
  AppendDeviceNames(mapping.Get(), names);
  EXPECT_THAT(names, ElementsAre("n", "m", "z", "a"));
}

// ---- groups in the log

class GroupLog : public testing::Test {
 protected:
  static constexpr const char* format = "%1: Mapping[%2]: { SSD: %3, MDs: %4 }";
  const Tessa::Ref<RecordingLogger> _logger = MakeRef<RecordingLogger>(LogLevel::Verbose);
};

TEST_F(GroupLog, HasALineForEachGroup) {
  const auto mappings = Mappings({AMapping(AScsiDisk("s1"), {AScsiDisk("a"), AScsiDisk("b"), AScsiDisk("c")}),
                                  AMapping(AScsiDisk("s2"), {AScsiDisk("d")})});
  LogDiskMappings(*_logger, mappings.Get());
  EXPECT_THAT(_logger->Lines(),
              ElementsAre(LogLineIs(LogLevel::Verbose, format, "LogDiskMappings", "0", "s1", "a, b, c"),
                          LogLineIs(LogLevel::Verbose, format, "LogDiskMappings", "1", "s2", "d")));
}

TEST_F(GroupLog, IsSilentOfNoGroups) {
  LogDiskMappings(*_logger, Mappings({}).Get());
  LogDiskMappings(*_logger, nullptr);
  EXPECT_THAT(_logger->Lines(), IsEmpty());
}

TEST_F(GroupLog, IsSilentBelowLevelVerbose) {
  _logger->SetLevel(LogLevel::Info);
  LogDiskMappings(*_logger, Mappings({AMapping(AScsiDisk("s1"), {AScsiDisk("a")})}).Get());
  EXPECT_THAT(_logger->Lines(), IsEmpty());
}

TEST_F(GroupLog, ReadsTheNamesWhateverTheLevel) {
  _logger->SetLevel(LogLevel::None);
  const auto log = [&](const Tessa::Ref<DiskMapping>& mapping) {
    return [this, mapping] { LogDiskMappings(*_logger, Mappings({mapping}).Get()); };
  };
  EXPECT_THAT(log(AMapping(AScsiDisk("x").Unnamed(), {})), isNotInitialized);
  EXPECT_THAT(log(AMapping(AScsiDisk("s"), {AScsiDisk("x").Unnamed()})), isNotInitialized);
  EXPECT_THAT(log(AMapping(nullptr, {})), isNotInitialized);
}

TEST_F(GroupLog, KeepsTheLinesBeforeAGroupThatItCannotPrint) {
  const auto mappings = Mappings({AMapping(AScsiDisk("s1"), {}), AMapping(AScsiDisk("x").Unnamed(), {})});
  EXPECT_THROW(LogDiskMappings(*_logger, mappings.Get()), NotInitializedException);
  EXPECT_THAT(_logger->Lines(),
              ElementsAre(LogLineIs(LogLevel::Verbose, format, "LogDiskMappings", "0", "s1", "")));
}

}  // namespace
}  // namespace Kovasvc
