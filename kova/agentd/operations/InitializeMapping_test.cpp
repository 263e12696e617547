// Making one disk group: whether it is formatted or restamped, and what becomes of its result.

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <functional>
#include <ostream>
#include <stdexcept>
#include <string>
#include <vector>

#include "kova/agentd/KovaManagerImpl.h"
#include "kova/agentd/include/HostCtlException.h"
#include "nox/Faults.h"
#include "nox/Kova.h"
#include "orbis/ParseException.h"
#include "tessa/Formatter.h"
#include "tests/support/InitializeFixture.h"
#include "tests/support/SpyManager.h"

namespace Kovasvc {
namespace {

using HostCtl::Kova::DiskReason;
using HostCtl::Kova::DiskResult;
using HostCtl::Lib::HostCtlException;
using HostCtl::Lib::KovaExceptionHasPartition;
using Nox::Fault::DiskHasPartitions;
using Nox::Kova::Host::DiskMapping;
using Nox::Kova::Host::DiskMapResult;
using Orbis::Fault::SystemError;
using Tessa::MakeRef;
using Tessa::NotInitializedException;
using Tessa::Ref;
using Tessa::Service::LogLevel;
using testing::Contains;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;
using testing::Not;
using testing::StrEq;
using testing::ThrowsMessage;
using TestSupport::AMapping;
using TestSupport::ARecord;
using TestSupport::AScsiDisk;
using TestSupport::Hdd;
using TestSupport::LogLineIs;
using TestSupport::NamesDevice;
using TestSupport::releaseOperation;
using TestSupport::SpyManager;
using TestSupport::Ssd;
using TestSupport::takeOperation;

constexpr const char* formatting = "Formatting KOVA disks";
constexpr const char* formatted = "Done formatting KOVA disks";
constexpr const char* formatFailed = "Error formatting KOVA disks: %1";
constexpr const char* isInvalid = "Given mapping is invalid: %1";
const std::string uuid = "52e7b2b4-0a7c-3a1c-9d3e-2f4a5b6c7d8e";

SystemError::Exception AFault(const std::string& reason) {
  return SystemError::Exception(MakeRef<SystemError>(reason));
}

using InitializeMapping = TestSupport::InitializeFixture;

// ---- groups that are there but off-line

struct UnmountedCase {
  const char* name;
  std::string ssd;
  std::vector<DiskResult> records;
  bool restamped;
};
void PrintTo(const UnmountedCase& row, std::ostream* out) {
  *out << row.name;
}

class InitializeGroup : public InitializeMapping, public testing::WithParamInterface<UnmountedCase> {};

const DiskReason unmounted = DiskReason::GroupNotMounted;
INSTANTIATE_TEST_SUITE_P(
    Unmounted, InitializeGroup,
    testing::Values(
        UnmountedCase{"KnownAsUnmounted", "s1", {ARecord("s1").Ssd().Ineligible(unmounted)}, true},
        UnmountedCase{
            "KnownAsUnmountedWhateverTheState", "s1", {ARecord("s1").Ssd().Reason(unmounted)}, true},
        UnmountedCase{"KnownAsUnmountedWhateverTheKind", "s1", {ARecord("s1").Ineligible(unmounted)}, true},
        UnmountedCase{"LostDevice", "kova:" + uuid, {}, true},
        UnmountedCase{"LostDeviceThatTheKernelCallsEligible", "kova:x", {ARecord("kova:x")}, true},
        UnmountedCase{"TwoRecords",
                      "s1",
                      {ARecord("s1").Ssd().Ineligible(unmounted), ARecord("s1").Ssd().Ineligible(unmounted)},
                      false},
        UnmountedCase{"NoRecord", "s1", {}, false},
        UnmountedCase{"Eligible", "s1", {ARecord("s1").Ssd()}, false},
        UnmountedCase{
            "EligibleWithAnotherReason", "s1", {ARecord("s1").Ssd().Reason(DiskReason::TooSmall)}, false},
        UnmountedCase{"InUse", "s1", {ARecord("s1").Ssd().InUse(uuid)}, false},
        UnmountedCase{"ItsCapacityDiskIsUnmounted",
                      "s1",
                      {ARecord("s1").Ssd(), ARecord("a").Ineligible(unmounted)},
                      false},
        UnmountedCase{"NameLikeALostDevices", "KOVA:x", {}, false},
        UnmountedCase{"NameWithTheMarkInside", "xkova:", {}, false}),
    [](const auto& test) { return std::string(test.param.name); });

TEST_P(InitializeGroup, IsRestampedOrFormatted) {
  const UnmountedCase& row = GetParam();
  _kernel.records = row.records;
  const auto spy = UseManager<SpyManager>();
  Initialize({AMapping(Ssd(row.ssd), {Hdd("b"), Hdd("a")})});
  EXPECT_THAT(spy->calls,
              Contains("RestampDiskMapping(" + row.ssd + ", [b, a])").Times(row.restamped ? 1 : 0));
  EXPECT_THAT(spy->calls,
              Contains("FormatDiskMapping(" + row.ssd + ", [b, a], tag, 1, 0)").Times(row.restamped ? 0 : 1));
  EXPECT_EQ(Formats().empty(), row.restamped);
  EXPECT_FALSE(HasFault());
}

TEST_F(InitializeMapping, LooksUpTheSsdInWhatTheLastGroupLeftInTheCache) {
  WhenFormatting("s1", [this] { SetRecord(ARecord("s2").Ssd().Ineligible(unmounted)); });
  Initialize({_first, _second});
  EXPECT_THAT(Formats(), ElementsAre("FormatDiskMapping(s1, [a], {tag, 2, 0})"));
  EXPECT_THAT(Calls("RestampDiskMapping"), ElementsAre("RestampDiskMapping(s2, [b])"));
  EXPECT_THAT(Calls("MountDiskMapping"), ElementsAre("MountDiskMapping(s2, false)"));
}

// ---- one group

class InitializeOneGroup : public InitializeMapping {
 protected:
  InitializeOneGroup() { _manager->RefreshKovaDiskCache(); }

  void Run(const Ref<DiskMapping>& mapping) {
    Forget();
    _manager->InitializeMapping(mapping, "tag", 5, 4, _result);
  }

  Ref<DiskMapResult> _result = MakeRef<DiskMapResult>();
};

TEST_F(InitializeOneGroup, FillsTheResultItIsGiven) {
  const Ref<DiskMapResult> given = _result;
  Run(_first);
  EXPECT_EQ(_result, given);
  EXPECT_EQ(_result->GetMapping(), _first);
  EXPECT_FALSE(_result->GetError());
  EXPECT_THAT(DiskStates(*_result), ElementsAre("s1 eligible", "a eligible"));
  EXPECT_THAT(Formats(), ElementsAre("FormatDiskMapping(s1, [a], {tag, 5, 4})"));
}

TEST_F(InitializeOneGroup, LeavesTheDisksOfTheCheckWhenTheCheckFails) {
  SetRecord(ARecord("a").Ineligible(DiskReason::TooSmall));
  _manager->InvalidateKovaDiskCache();
  _manager->RefreshKovaDiskCache();
  Run(_first);
  EXPECT_THAT(_result->GetError(), NamesDevice("DiskTooSmall", "a"));
  EXPECT_THAT(DiskStates(*_result), ElementsAre("s1 eligible", "a ineligible"));
  EXPECT_THAT(_kernel.Calls(), IsEmpty());
}

TEST_F(InitializeOneGroup, AsksADerivedManagersCheckFirst) {
  const auto spy = UseManager<SpyManager>();
  spy->validateDiskMapping = [](const auto&, Ref<DiskMapResult>& result) {
    result->SetError(MakeRef<DiskHasPartitions>("a"));
  };
  Run(_first);
  EXPECT_THAT(spy->calls, ElementsAre("InitializeMapping(s1: a, tag, 5, 4)", "ValidateDiskMapping(s1: a)"));
  EXPECT_THAT(_timeline.Events(), IsEmpty());
  std::string printed;
  Tessa::PrintFormatter::FormatObject(_result->GetError()).PrintTo(printed);
  EXPECT_THAT(printed, Not(HasSubstr("<")));
  EXPECT_THAT(_logger->Lines(), ElementsAre(LogLineIs(LogLevel::Warning, isInvalid, printed)));
}

TEST_F(InitializeOneGroup, ReadsNamesAfterTheCheckAndLetsAMissingOneOut) {
  const auto spy = UseManager<SpyManager>();
  spy->validateDiskMapping = [](const auto&, auto&) {};
  for (const Ref<DiskMapping>& mapping :
       {AMapping(AScsiDisk("x").Unnamed(), {Hdd("a")}),
        AMapping(Ssd("s1"), {Hdd("a"), AScsiDisk("x").Unnamed()}), AMapping(Ssd("s1"), {nullptr})}) {
    EXPECT_THAT([&] { _manager->InitializeMapping(mapping, "tag", 1, 0, _result); },
                ThrowsMessage<NotInitializedException>(StrEq("Not initialized")));
  }
  EXPECT_THAT(_kernel.Calls(), IsEmpty());
}

TEST_F(InitializeOneGroup, TurnsTheExceptionOfADerivedManagersFormatIntoTheGroupsFault) {
  const auto spy = UseManager<SpyManager>();
  spy->formatDiskMapping = [] { throw KovaExceptionHasPartition("parts", "a"); };
  Run(_first);
  EXPECT_THAT(_result->GetError(), NamesDevice("DiskHasPartitions", "a"));
  EXPECT_THAT(_logger->Lines(LogLevel::Warning),
              ElementsAre(LogLineIs(LogLevel::Warning, formatFailed, "parts")));
}

TEST_F(InitializeOneGroup, KeepsTheKernelsRefusalWhenTheDisksCannotBeAskedForAfterwards) {
  _kernel.Fail("FormatDiskMapping", KovaExceptionHasPartition("parts", "a"));
  _kernel.Fail("RefreshKovaInfo", AFault("broken"));
  EXPECT_THROW(Run(_first), SystemError::Exception);
  EXPECT_THAT(_result->GetError(), NamesDevice("DiskHasPartitions", "a"));
}

TEST_F(InitializeOneGroup, LetsAFaultOfTheFormatOut) {
  const auto spy = UseManager<SpyManager>();
  spy->formatDiskMapping = [] { throw AFault("stop"); };
  EXPECT_THROW(Run(_first), SystemError::Exception);
}

// ---- the kernel's format

TEST_F(InitializeMapping, HandsTheFormatToTheKernelAsItStands) {
  std::vector<std::string> capacity = {"b", "", "a"};
  _manager->FormatDiskMapping("", capacity, "a tag", -1, 77);
  EXPECT_THAT(
      _timeline.Events(),
      ElementsAre(takeOperation, "FormatDiskMapping(, [b, \"\", a], {a tag, -1, 77})", releaseOperation));
  EXPECT_THAT(_logger->Lines(),
              ElementsAre(LogLineIs(LogLevel::Verbose, formatting), LogLineIs(LogLevel::Verbose, formatted)));
}

TEST_F(InitializeMapping, LetsTheKernelsExceptionsOutOfTheFormat) {
  std::vector<std::string> capacity = {"a"};
  _kernel.Fail("FormatDiskMapping", KovaExceptionHasPartition("parts", "a"));
  EXPECT_THROW(_manager->FormatDiskMapping("s1", capacity, "", 1, 0), KovaExceptionHasPartition);
  EXPECT_EQ(_timeline.Events().back(), releaseOperation);
  EXPECT_THAT(_logger->Lines(), ElementsAre(LogLineIs(LogLevel::Verbose, formatting)));
}

}  // namespace
}  // namespace Kovasvc
