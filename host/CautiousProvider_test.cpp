#include "host/CautiousProvider.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <memory>

#include "kova/agentd/include/HostCtlException.h"
#include "otxctl/sim/HostBuilder.h"
#include "otxctl/sim/SimProvider.h"

namespace Host {
namespace {

using HostCtl::Lib::HostCtlException;
using OtxCtl::Sim::HostDescription;
using OtxCtl::Sim::SimHost;
using testing::HasSubstr;
using testing::ThrowsMessage;

class CautiousProviderTest : public testing::Test {
 protected:
  void Fail(const char* operation) {
    _host->Change([operation](HostDescription& host) {
      host.faults = {
          {.operation = operation, .exception = "std::runtime_error", .message = "busy", .disk = {}}};
    });
  }
  void Recover() {
    _host->Change([](HostDescription& host) { host.faults.clear(); });
  }

  // As the plug-in learns about the disks.
  void Learn(const std::vector<std::string>& names = {}) {
    std::vector<HostCtl::Kova::DiskResult> records;
    _provider.RefreshKovaInfo();
    _provider.QueryDisks(names, records, true);
  }
  void Format() { _provider.FormatDiskMapping("naa.1", {"naa.2"}, {}); }

  void ExpectRefusal() {
    EXPECT_THAT([this] { Format(); }, ThrowsMessage<HostCtlException>(HasSubstr("could not tell")));
    EXPECT_TRUE(_host->Snapshot().groups.empty());
  }
  void ExpectFormat() {
    Format();
    EXPECT_EQ(_host->Snapshot().groups.size(), 1u);
  }

  std::shared_ptr<SimHost> _host =
      std::make_shared<SimHost>(OtxCtl::Sim::AHost().WithSsd("naa.1").WithHdd("naa.2").Build());
  CautiousProvider _provider{std::make_unique<OtxCtl::Sim::SimProvider>(_host)};
};

TEST_F(CautiousProviderTest, FormatsOnceTheKernelHasToldAboutItsDisks) {
  Learn();
  ExpectFormat();
}

TEST_F(CautiousProviderTest, FormatsNothingBeforeTheKernelWasAsked) {
  ExpectRefusal();
}

TEST_F(CautiousProviderTest, FormatsNothingWhenTheKernelCouldNotBeAskedAgain) {
  for (const char* operation : {"RefreshKovaInfo", "QueryDisks"}) {
    Learn();
    Fail(operation);
    EXPECT_THROW(Learn(), HostCtlException) << "which makes it a strict provider, too";
    ExpectRefusal();
    Recover();
    ExpectRefusal();
  }
  Learn();
  ExpectFormat();
}

TEST_F(CautiousProviderTest, IsNotStoppedByOtherQuestions) {
  Learn();
  _provider.RefreshKovaInfo();
  Fail("GetDiskMappings");
  std::vector<HostCtl::Kova::DiskMapping> groups;
  EXPECT_THROW(_provider.GetDiskMappings(groups, true), HostCtlException);
  ExpectFormat();
}

TEST_F(CautiousProviderTest, DoesNotTakeSomeDisksForAll) {
  Learn({"naa.1"});
  ExpectRefusal();
}

}  // namespace
}  // namespace Host
