#include "kova/agentd/include/KovaPlugin.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <atomic>
#include <stdexcept>
#include <thread>
#include <vector>

#include "kova/agentd/include/HostCtlException.h"
#include "kova/agentd/include/KovaInfo.h"
#include "otxctl/ProviderFactory.h"
#include "otxctl/provider/ForwardingProvider.h"

namespace OtxCtl::Kova {
namespace {

using HostCtl::Kova::KovaInfo;
using HostCtl::Lib::HostCtlException;
using testing::HasSubstr;
using testing::Property;
using testing::ThrowsMessage;

// A provider that says which factory made it.
class NamedProvider : public Provider::ForwardingProvider {
 public:
  explicit NamedProvider(std::string name) : _name(std::move(name)) {}
  std::string GetFaultDomainName() override { return _name; }

 private:
  std::string _name;
};

class ProviderFactoryTest : public testing::Test {
 protected:
  ~ProviderFactoryTest() override { SetProviderFactory({}); }

  static std::unique_ptr<KovaInfo> Get() { return std::unique_ptr<KovaInfo>(KovaPluginImpl().GetKovaInfo()); }
};

TEST_F(ProviderFactoryTest, WithoutAFactoryTheErrorSaysWhatToCall) {
  EXPECT_THAT([] { Get(); }, ThrowsMessage<HostCtlException>(HasSubstr("SetProviderFactory")));
}

TEST_F(ProviderFactoryTest, TheLastInstalledFactoryCounts) {
  SetProviderFactory([] { return std::make_unique<NamedProvider>("first"); });
  SetProviderFactory([] { return std::make_unique<NamedProvider>("second"); });
  EXPECT_EQ(Get()->GetFaultDomainName(), "second");
}

TEST_F(ProviderFactoryTest, EveryCallMakesAProviderOfItsOwn) {
  SetProviderFactory([] { return std::make_unique<NamedProvider>("one"); });
  const auto first = Get();
  const auto second = Get();
  EXPECT_NE(first.get(), second.get());
}

TEST_F(ProviderFactoryTest, AnEmptyFactoryTakesTheOneBeforeAway) {
  SetProviderFactory([] { return std::make_unique<NamedProvider>("one"); });
  SetProviderFactory({});
  EXPECT_THROW(Get(), HostCtlException);
}

TEST_F(ProviderFactoryTest, AFactoryThatReturnsNothingIsAnError) {
  SetProviderFactory([] { return std::unique_ptr<KovaInfo>(); });
  EXPECT_THAT([] { Get(); }, ThrowsMessage<HostCtlException>(HasSubstr("returned none")));
}

TEST_F(ProviderFactoryTest, OtherExceptionsOfAFactoryBecomeTheOneFamily) {
  SetProviderFactory([]() -> std::unique_ptr<KovaInfo> { throw std::runtime_error("no such host"); });
  EXPECT_THAT([] { Get(); }, ThrowsMessage<HostCtlException>(HasSubstr("no such host")));
}

TEST_F(ProviderFactoryTest, ItsOwnExceptionsPassUnchanged) {
  SetProviderFactory(
      []() -> std::unique_ptr<KovaInfo> { throw HostCtl::Lib::KovaStorageException("gone", "naa.1"); });
  EXPECT_THROW(Get(), HostCtl::Lib::KovaStorageException);
}

TEST_F(ProviderFactoryTest, MayBeReplacedWhileOthersAskForProviders) {
  SetProviderFactory([] { return std::make_unique<NamedProvider>("a"); });
  std::atomic<int> strange = 0;
  std::vector<std::thread> askers;
  for (int asker = 0; asker < 4; ++asker) {
    askers.emplace_back([&strange] {
      for (int round = 0; round < 200; ++round) {
        const std::string name = Get()->GetFaultDomainName();
        strange += name == "a" || name == "b" ? 0 : 1;
      }
    });
  }
  for (int round = 0; round < 200; ++round) {
    SetProviderFactory([] { return std::make_unique<NamedProvider>("b"); });
  }
  for (std::thread& asker : askers) {
    asker.join();
  }
  EXPECT_EQ(strange, 0);
  EXPECT_EQ(Get()->GetFaultDomainName(), "b");
}

}  // namespace
}  // namespace OtxCtl::Kova
