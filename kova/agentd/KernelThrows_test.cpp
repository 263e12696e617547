// Every call of the kernel, and what becomes of what it throws.
//
// A refusal has two texts, what it describes itself as and what() says, which are the same for the kernel's
// own exceptions; here they differ. Exceptions of other families are never taken for a refusal.

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <ostream>
#include <string>
#include <vector>

#include "kova/agentd/KovaManagerImpl.h"
#include "kova/agentd/include/HostCtlException.h"
#include "kova/agentd/marshal/ExceptionMarshal.h"
#include "nox/Kova.h"
#include "tests/support/OperationFixture.h"

namespace Kovasvc {
namespace {

using HostCtl::Lib::HostCtlException;
using Orbis::MethodFault;
using Tessa::MakeRef;
using Tessa::NotInitializedException;
using Tessa::Ref;
using Tessa::Service::LogLevel;
using testing::AllOf;
using testing::Contains;
using testing::ElementsAre;
using testing::ElementsAreArray;
using testing::Field;
using testing::IsEmpty;
using testing::StrEq;
using testing::ThrowsMessage;
using TestSupport::AMapping;
using TestSupport::Hdd;
using TestSupport::IsSystemError;
using TestSupport::NamesDevice;
using TestSupport::SoapText;
using TestSupport::Ssd;

constexpr const char* described = "as it describes itself";
constexpr const char* whatItSays = "as what() says";

// A refusal whose two texts differ.
template <class Base>
class TwoTexts final : public Base {
 public:
  using Base::Base;
  std::string Describe() const override { return described; }
  const char* what() const noexcept override { return whatItSays; }
};

TwoTexts<HostCtlException> Refusal() {
  return TwoTexts<HostCtlException>("the message");
}

const std::string lost = "kova:52e7b2b4-0a7c-3a1c-9d3e-2f4a5b6c7d8e";

Ref<Nox::Kova::Host::DiskMapping> Group(const std::string& ssd = "s") {
  return AMapping(Ssd(ssd), {Hdd("a")});
}

// One call of the kernel: how it is reached, and the line that tells a refusal.
struct KernelWay {
  const char* title;
  const char* operation;
  void (*call)(KovaManagerImpl& manager, std::string& fault, std::string& result);
  const char* format;
  std::vector<std::string> arguments = {described};
  LogLevel level = LogLevel::Warning;
  bool letsRefusalsOut = false;
  bool swallowsStandardExceptions = false;
};
void PrintTo(const KernelWay& way, std::ostream* out) {
  *out << way.title;
}

// clang-format off
#define CALL(...) [](KovaManagerImpl& manager, [[maybe_unused]] std::string& fault, \
                     [[maybe_unused]] std::string& result) __VA_ARGS__
// clang-format on

constexpr const char* refreshFailed = "Failed to refresh KOVA disk cache %1";
constexpr const char* groupsFailed = "Error retrieving disk mappings: %1";
constexpr const char* storageFailed = "Error retrieving storage info: %1";
constexpr const char* clusterFailed = "Error getting cluster info: %1";

const KernelWay ways[] = {
    {"TheRefreshOfTheView", "RefreshKovaInfo", CALL({ manager.RefreshKovaDiskCache(); }), refreshFailed},
    {"TheRefreshOfTheRecords", "QueryDisks", CALL({ manager.RefreshKovaDiskCache(); }), refreshFailed},
    {"AQuery", "QueryDisks", CALL({
       KovaManagerImpl::Texts names;
       manager.QueryDisksForKova(names, fault, result);
     }),
     refreshFailed},
    {"StorageRefresh", "RefreshKovaInfo", CALL({ manager.GetStorageInfo(result); }), storageFailed},
    {"StorageAutoMode", "IsAutoModeEnabled", CALL({ manager.GetStorageInfo(result); }), storageFailed},
    {"StorageGroups", "GetDiskMappings", CALL({ manager.GetStorageInfo(result); }), storageFailed},
    {.title = "StorageMounted",
     .operation = "QueryDisks",
     .call = CALL({ manager.GetStorageInfo(result); }),
     .format = "Error when querying disks for KOVA: %2",
     .arguments = {whatItSays},
     .level = LogLevel::Info,
     .swallowsStandardExceptions = true},
    {"ConfigRefresh", "RefreshKovaInfo", CALL({ manager.GetConfigInfo(result); }), clusterFailed},
    {"ConfigCluster", "GetClusterInfoDetailed", CALL({ manager.GetConfigInfo(result); }), clusterFailed},
    {"ConfigNetwork", "GetKovaOtxNicConfigs", CALL({ manager.GetConfigInfo(result); }),
     "Error getting network info: %1"},
    {"ConfigFaultDomain",
     "GetFaultDomainName",
     CALL({ manager.GetConfigInfo(result); }),
     "%1: Error retrieving host fault domain info: %2",
     {"MarshalFaultDomainInfo", described}},
    {"AGroupThatMayExist", "GetDiskMappings", CALL({ manager.DiskMappingExists(Group()); }),
     "Failed to validate disk mapping: %1"},
    {"AnAddition", "GetDiskMappings", CALL({
       manager.AddDisks({SoapText(*Ssd("s")), SoapText(*Hdd("a"))}, "", fault, result);
     }),
     groupsFailed},
    {"AnAdditionOfAll", "GetDiskMappings", CALL({ manager.AddAllEligibleDisks("", fault, result); }),
     groupsFailed},
    {"AnInitialization", "FormatDiskMapping",
     CALL({ manager.InitializeDisks({SoapText(*Group())}, "", fault, result); }),
     "Error formatting KOVA disks: %1"},
    {"ARemoval", "RemoveDisk", CALL({ manager.RemoveDisk("a", "", "", 0, 0, fault); }),
     "Error removing KOVA disks: %1"},
    {"ARemovalByUuid", "RemoveDiskByUuid", CALL({ manager.RemoveDisk(lost, "", "", 0, 0, fault); }),
     "Error removing KOVA disks: %1"},
    {"ARemovalOfAGroup", "RemoveDiskMapping",
     CALL({ manager.RemoveDiskMapping(SoapText(*Group()), "", "", 0, 0, fault); }),
     "Error removing KOVA disk mapping: %1"},
    {"ARemovalOfAGroupByUuid", "RemoveDiskByUuid",
     CALL({ manager.RemoveDiskMapping(SoapText(*Group(lost)), "", "", 0, 0, fault); }),
     "Error removing PDL'd KOVA disk mapping: %1"},
    {.title = "ARestampByUuid",
     .operation = "RestampDiskMappingByUuid",
     .call = CALL({
       KovaManagerImpl::Texts names;
       manager.RestampDiskMapping(lost, names);
     }),
     .format = "Error restamping PDL'd KOVA disk mapping: %1",
     .letsRefusalsOut = true},
    {"AnUnmount", "UnmountDiskMapping",
     CALL({ manager.UnmountDiskMapping({SoapText(*Group())}, "", fault, result); }),
     "Error unmounting KOVA disk mapping: %1"},
    {"AClaim", "ClaimUnmountedDiskgroups", CALL({ manager.ClaimUnmountedDiskgroup(); }),
     "Mount diskgroup failed with exception %1 "},
};
#undef CALL

class KernelThrows : public TestSupport::OperationFixture, public testing::WithParamInterface<KernelWay> {
 protected:
  KernelThrows() {
    using TestSupport::ARecord;
    SetHost({Ssd("s"), Hdd("a")}, {ARecord("s").Ssd(), ARecord("a")});
    _kernel.groups = {TestSupport::AGroup("s", {"a"})};
  }

  void Call() { GetParam().call(*_manager, _faultText, _resultText); }
};

INSTANTIATE_TEST_SUITE_P(In, KernelThrows, testing::ValuesIn(ways),
                         [](const auto& test) { return std::string(test.param.title); });

TEST_P(KernelThrows, ARefusalThatIsToldAsItDescribesItself) {
  _kernel.Fail(GetParam().operation, Refusal());
  if (GetParam().letsRefusalsOut) {
    EXPECT_THROW(Call(), HostCtlException);
  } else {
    EXPECT_NO_THROW(Call());
  }
  EXPECT_THAT(
      _logger->Lines(GetParam().level),
      Contains(AllOf(Field(&TestSupport::LogLine::format, GetParam().format),
                     Field(&TestSupport::LogLine::arguments, ElementsAreArray(GetParam().arguments)))));
}

TEST_P(KernelThrows, AnIntThatPassesWithTheLocksReleasedAndNoAnswer) {
  _kernel.Fail(GetParam().operation, 4711);
  EXPECT_THROW(Call(), int);
  EXPECT_THAT(_locks.HeldHere(), IsEmpty());
  EXPECT_THAT(_logger->Lines(LogLevel::Warning), IsEmpty());
  ExpectTextsUntouched();
}

TEST_P(KernelThrows, AnExceptionOfTheRuntimeThatIsNoRefusal) {
  _kernel.Fail(GetParam().operation, NotInitializedException("Not initialized"));
  if (GetParam().swallowsStandardExceptions) {
    EXPECT_NO_THROW(Call());
    EXPECT_THAT(_logger->Lines(GetParam().level),
                ElementsAre(TestSupport::LogLineIs(GetParam().level, GetParam().format, "Not initialized")));
    return;
  }
  EXPECT_THAT([this] { Call(); }, ThrowsMessage<NotInitializedException>(StrEq("Not initialized")));
  EXPECT_THAT(_locks.HeldHere(), IsEmpty());
  EXPECT_THAT(_logger->Lines(LogLevel::Warning), IsEmpty());
  ExpectTextsUntouched();
}

// ---- the fault of a refusal

TEST(KernelRefusal, IsAFaultWithTheTextThatItDescribesItselfBy) {
  using namespace HostCtl::Lib;
  Ref<MethodFault> fault;
  MarshalHostCtlException(Refusal(), fault);
  EXPECT_THAT(fault, IsSystemError(described));
  MarshalHostCtlException(TwoTexts<KovaStorageException>("the message", "naa.1"), fault);
  EXPECT_THAT(fault, IsSystemError(described));
  MarshalHostCtlException(TwoTexts<KovaExceptionIncompatibleDiskMapping>("the message"), fault);
  EXPECT_THAT(fault, IsSystemError(described));
  MarshalHostCtlException(TwoTexts<KovaExceptionRescanError>("the message", "naa.1"), fault);
  EXPECT_THAT(fault, NamesDevice("KovaDiskFault", described));
  MarshalHostCtlException(TwoTexts<KovaExceptionRemoveMappingAutoModeEnabled>("the message", "naa.1"), fault);
  EXPECT_THAT(fault, NamesDevice("KovaDiskFault", described));
  MarshalHostCtlException(TwoTexts<KovaExceptionRemoveDiskAutoModeEnabled>("the message", "naa.1"), fault);
  EXPECT_THAT(fault, NamesDevice("KovaDiskFault", described));
}

}  // namespace
}  // namespace Kovasvc
