#include "kova/agentd/KovaLibManager.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cstdlib>
#include <functional>
#include <new>
#include <stdexcept>
#include <string>
#include <utility>

#include "kova/agentd/include/HostCtlException.h"
#include "kova/agentd/include/KovaConstants.h"
#include "otxctl/ProviderFactory.h"
#include "tests/support/Matchers.h"
#include "tests/support/PluginFixture.h"

namespace Kovasvc {
namespace {

using Tessa::MakeRef;
using Tessa::Ref;
using Tessa::Service::LogLevel;
using testing::ElementsAre;
using testing::ExitedWithCode;
using testing::HasSubstr;
using testing::IsEmpty;
using TestSupport::LogLineIs;
using TestSupport::panicStatus;

constexpr const char* beforeProvider = "CreateKovaManagerImpl instantiating ostrax provider.";
constexpr const char* afterProvider = "CreateKovaManagerImpl instantiated ostrax provider.";

class InitPlugin : public TestSupport::PluginFixture {};
using InitPluginDeathTest = InitPlugin;

TEST_F(InitPlugin, MakesTheManagerWithTheChildLogger) {
  ASSERT_EQ(InitKovaPlugin(), 1);
  ASSERT_TRUE(_kovaManagerImpl);
  EXPECT_EQ(_kovaManagerImpl->GetRefCount(), 1);
  EXPECT_THAT(_logger->ChildNames(), ElementsAre("KovaPluginMgr"));
  EXPECT_THAT(_logger->Lines(), ElementsAre(LogLineIs(LogLevel::Verbose, beforeProvider),
                                            LogLineIs(LogLevel::Verbose, afterProvider)));
  EXPECT_EQ(_logger->Lines().front().logger, "KovaPluginMgr");
}

TEST_F(InitPlugin, LeavesTheChildLoggerToTheManagerAndItsHelper) {
  ASSERT_EQ(InitKovaPlugin(), 1);
  EXPECT_EQ(Util::KovaUtil::_logger->GetRefCount(), 2);
}

TEST_F(InitPlugin, SaysNothingBelowVerbose) {
  _logger->SetLevel(LogLevel::Info);
  ASSERT_EQ(InitKovaPlugin(), 1);
  EXPECT_THAT(_logger->Lines(), IsEmpty());
}

TEST_F(InitPlugin, LogsBetweenItsTwoLinesThatTheProviderIsMade) {
  std::size_t linesBefore = 99;
  OtxCtl::Kova::SetProviderFactory([&] {
    linesBefore = _logger->Lines().size();
    return _kernel.MakeProvider();
  });
  ASSERT_EQ(InitKovaPlugin(), 1);
  EXPECT_EQ(linesBefore, 1U);
}

TEST_F(InitPlugin, SwallowsAFailureOfTheChildLogger) {
  for (const std::function<void()>& failure :
       {std::function<void()>([] { throw std::bad_alloc(); }), std::function<void()>([] { throw 5; })}) {
    _logger->SetChildFailure(failure);
    EXPECT_EQ(InitKovaPlugin(), 0);
    EXPECT_FALSE(_kovaManagerImpl);
    EXPECT_THAT(_logger->Lines(), IsEmpty());
  }
}

// A logger that cannot be let go of once the manager is made.
class ClingingLogger final : public Tessa::Service::Logger {
 public:
  LogLevel GetLevel() const noexcept override { return LogLevel::Verbose; }
  void CreateChild(const std::string&, Ref<Logger>& child) override { child = Ref<Logger>(this); }
  void Write(LogLevel, std::string_view format, std::span<const Tessa::Service::LogArgument>) override {
    _clings = format == afterProvider;
  }
  void DecRef() const override {
    const bool clings = std::exchange(_clings, false);
    Logger::DecRef();  // may delete the logger
    if (clings) {
      throw std::runtime_error("the release of a logger failed");
    }
  }

 private:
  mutable bool _clings = false;
};

TEST_F(InitPlugin, SwallowsAFailureToReleaseTheChildLogger) {
  Tessa::Service::SetDefaultLogger(MakeRef<ClingingLogger>());
  EXPECT_EQ(InitKovaPlugin(), 0);
  EXPECT_TRUE(_kovaManagerImpl) << "the manager was made before the release";
}

TEST_F(InitPlugin, SwallowsAFailureOfTheProviderWithoutALine) {
  OtxCtl::Kova::SetProviderFactory({});
  EXPECT_EQ(InitKovaPlugin(), 0);
  EXPECT_FALSE(_kovaManagerImpl);
  EXPECT_THAT(_logger->Lines(), ElementsAre(LogLineIs(LogLevel::Verbose, beforeProvider)));
}

TEST_F(InitPlugin, SwallowsAFailureOfTheLocksWhateverIsThrown) {
  _locks.SetFailure(TestSupport::operationLock, [] { throw 5; });
  EXPECT_EQ(InitKovaPlugin(), 0);
  EXPECT_FALSE(_kovaManagerImpl);
}

TEST_F(InitPlugin, MayBeTriedAgainAfterAFailure) {
  _locks.SetFailure(TestSupport::operationLock, [] { throw 5; });
  ASSERT_EQ(InitKovaPlugin(), 0);
  _locks.SetFailure("", {});
  EXPECT_EQ(InitKovaPlugin(), 1);
  EXPECT_TRUE(_kovaManagerImpl);
}

TEST_F(InitPlugin, LetsTheMakingOfTheManagerFailLoudlyInside) {
  OtxCtl::Kova::SetProviderFactory({});
  Ref<Tessa::Service::Logger> logger = _logger;
  EXPECT_THROW(CreateKovaManager(logger), HostCtl::Lib::HostCtlException);
  EXPECT_FALSE(_kovaManagerImpl);
  EXPECT_EQ(logger->GetRefCount(), 3) << "the test's two and the process's default";
}

TEST_F(InitPluginDeathTest, PanicsWithoutADefaultLogger) {
  Tessa::Service::SetDefaultLogger(nullptr);
  EXPECT_EXIT(InitKovaPlugin(), ExitedWithCode(panicStatus),
              HasSubstr("panic: appLogger != __null at kova/agentd/KovaLibManager:3330\n"));
}

TEST_F(InitPluginDeathTest, PanicsTheSecondTimeAfterItsFirstLine) {
  ASSERT_EQ(InitKovaPlugin(), 1);
  _logger->Clear();
  EXPECT_EXIT(InitKovaPlugin(), ExitedWithCode(panicStatus),
              "^log .verbose. CreateKovaManagerImpl instantiating ostrax provider\\.\n"
              "panic: _kovaManagerImpl == __null at kova/agentd/KovaLibManager:231\n$");
}

class Statics : public TestSupport::PluginFixture {};
using StaticsDeathTest = Statics;

TEST_F(Statics, StartWithoutManagerLoggerAndSession) {
  EXPECT_FALSE(_kovaManagerImpl);
  EXPECT_FALSE(Util::KovaUtil::_logger);
  EXPECT_FALSE(Util::KovaUtil::_session);
}

TEST_F(Statics, HoldTheTextsThatTheServicesPartsAgreeOn) {
  EXPECT_EQ(masterGroupIpv4, "224.1.2.3");
  EXPECT_EQ(masterGroupIpv6, "FF19:0:0:0:0:1:2:3");
  EXPECT_EQ(agentGroupIpv4, "224.2.3.4");
  EXPECT_EQ(agentGroupIpv6, "FF19:0:0:0:0:2:3:4");
  EXPECT_EQ(lastHddText, "Can not remove last HDD");
  EXPECT_EQ(witnessName, "witness");
  EXPECT_EQ(serviceName, "kova");
  EXPECT_EQ(allName, "all");
  EXPECT_THAT(tcpStates, ElementsAre("down", "listen", "advertise", "both"));
  EXPECT_EQ(anyIpv6Address, "::");
  EXPECT_EQ(keyExchangeFolder, "/etc/nimbra/ike");
  EXPECT_EQ(congestionControl, "newreno");
}

// The process ends in the middle of a test, so that the plug-in's statics go down before the doubles.
TEST_F(StaticsDeathTest, TakeTheManagerDownPieceByPieceAndThenTheSession) {
  const auto endWithManagerAndSession = [this] {
    auto own = MakeRef<TestSupport::RecordingLogger>();
    own->SetEndObserver([this](const std::string&) { _timeline.Note("destroy logger"); });
    Ref<Tessa::Service::Logger> logger = own;
    CreateKovaManager(logger);
    Util::KovaUtil::_session = MakeRef<Util::SessionImpl>();
    logger.Reset();
    own.Reset();
    _timeline.EchoToStandardError();
    std::exit(0);
  };
  EXPECT_EXIT(endWithManagerAndSession(), ExitedWithCode(0),
              "^delete provider\n"
              "destroy KovaManager.diskCache\n"
              "destroy KovaManager.operation\n"
              "destroy logger\n"
              "destroy KovaManager\n"
              "destroy KovaSession\n$");
}

TEST_F(StaticsDeathTest, TakeTheSessionDownBeforeTheLogger) {
  const auto endWithSessionAndLogger = [this] {
    Util::KovaUtil::_session = MakeRef<Util::SessionImpl>();
    auto logger = MakeRef<TestSupport::RecordingLogger>();
    logger->SetEndObserver([this](const std::string&) { _timeline.Note("destroy logger"); });
    Util::KovaUtil::_logger = logger;
    logger.Reset();
    _timeline.EchoToStandardError();
    std::exit(0);
  };
  EXPECT_EXIT(endWithSessionAndLogger(), ExitedWithCode(0), "^destroy KovaSession\ndestroy logger\n$");
}

}  // namespace
}  // namespace Kovasvc
