#include "otxctl/fault/StrictProvider.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <functional>
#include <ostream>

#include "kova/agentd/include/HostCtlException.h"
#include "otxctl/fault/RecordingProvider.h"
#include "otxctl/sim/HostBuilder.h"
#include "otxctl/sim/SimProvider.h"

namespace OtxCtl::Fault {
namespace {

using HostCtl::Kova::KovaInfo;
using HostCtl::Lib::HostCtlException;
using HostCtl::Lib::KovaExceptionHasPartition;

struct Operation {
  const char* name;
  std::function<void(KovaInfo&)> call;
};

std::ostream& operator<<(std::ostream& out, const Operation& operation) {
  return out << operation.name;
}

const Operation operations[] = {
    {"QueryDisks",
     [](KovaInfo& kernel) {
       std::vector<HostCtl::Kova::DiskResult> results;
       kernel.QueryDisks({}, results, true);
     }},
    {"GetDiskMappings",
     [](KovaInfo& kernel) {
       std::vector<HostCtl::Kova::DiskMapping> groups;
       kernel.GetDiskMappings(groups, true);
     }},
    {"FormatDiskMapping", [](KovaInfo& kernel) { kernel.FormatDiskMapping("a", {"b"}, {}); }},
    {"RestampDiskMapping", [](KovaInfo& kernel) { kernel.RestampDiskMapping("a", {"b"}); }},
    {"MountDiskMapping", [](KovaInfo& kernel) { kernel.MountDiskMapping("a", false); }},
    {"RestampDiskMappingByUuid", [](KovaInfo& kernel) { kernel.RestampDiskMappingByUuid("u"); }},
    {"RemoveDisk", [](KovaInfo& kernel) { kernel.RemoveDisk("a", "", {}); }},
    {"RemoveDiskMapping", [](KovaInfo& kernel) { kernel.RemoveDiskMapping("a", "", {}); }},
    {"UnmountDiskMapping", [](KovaInfo& kernel) { kernel.UnmountDiskMapping("a"); }},
    {"RemoveDiskByUuid", [](KovaInfo& kernel) { kernel.RemoveDiskByUuid("u", ""); }},
    {"IsAutoModeEnabled", [](KovaInfo& kernel) { kernel.IsAutoModeEnabled(); }},
    {"GetKovaOtxNicConfigs", [](KovaInfo& kernel) { kernel.GetKovaOtxNicConfigs(); }},
    {"GetClusterInfoDetailed",
     [](KovaInfo& kernel) {
       HostCtl::Kova::KovaClusterInfoDetailed info;
       kernel.GetClusterInfoDetailed(info);
     }},
    {"GetFaultDomainName", [](KovaInfo& kernel) { kernel.GetFaultDomainName(); }},
    {"ClaimUnmountedDiskgroups", [](KovaInfo& kernel) { kernel.ClaimUnmountedDiskgroups(); }},
    {"RefreshKovaInfo", [](KovaInfo& kernel) { kernel.RefreshKovaInfo(); }},
};

class StrictProviders : public testing::TestWithParam<Operation> {
 protected:
  // The operation on a provider that throws this.
  void CallOneThatThrows(const char* exception) {
    const auto recorder = std::make_shared<CallRecorder>();
    recorder->Inject({GetParam().name, 0, exception, "boom", "naa.1", 0});
    const auto host = std::make_shared<Sim::SimHost>(Sim::AHost().WithSsd("naa.1").Build());
    StrictProvider provider(
        std::make_unique<RecordingProvider>(std::make_unique<Sim::SimProvider>(host), recorder));
    GetParam().call(provider);
  }
};

TEST_P(StrictProviders, TurnWhatNoProviderMayThrowIntoWhatItMay) {
  try {
    CallOneThatThrows("std::runtime_error");
    FAIL() << "nothing was thrown";
  } catch (const HostCtlException& exception) {
    EXPECT_EQ(exception.Describe(), "boom");
  }
}

TEST_P(StrictProviders, LetTheKernelLibrarysExceptionsPass) {
  EXPECT_THROW(CallOneThatThrows("KovaExceptionHasPartition"), KovaExceptionHasPartition);
}

INSTANTIATE_TEST_SUITE_P(Operations, StrictProviders, testing::ValuesIn(operations),
                         [](const auto& row) { return std::string(row.param.name); });

}  // namespace
}  // namespace OtxCtl::Fault
