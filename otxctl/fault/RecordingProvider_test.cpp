#include "otxctl/fault/RecordingProvider.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <thread>

#include "kova/agentd/include/HostCtlException.h"
#include "otxctl/provider/OperationNames.h"
#include "otxctl/provider/testing/Operations.h"

namespace OtxCtl::Fault {
namespace {

using HostCtl::Lib::KovaExceptionHasPartition;
using nlohmann::json;
using testing::_;
using testing::ElementsAre;
using testing::Field;
using testing::Return;
using testing::Throw;

// What is not mocked answers nothing.
class MockProvider : public Provider::ForwardingProvider {
 public:
  MOCK_METHOD(void, QueryDisks,
              (const std::vector<std::string>&, std::vector<HostCtl::Kova::DiskResult>&, bool), (override));
  MOCK_METHOD(void, FormatDiskMapping,
              (const std::string&, const std::vector<std::string>&, const HostCtl::Kova::FormatContext&),
              (override));
  MOCK_METHOD(void, MountDiskMapping, (const std::string&, bool), (override));
  MOCK_METHOD(bool, IsAutoModeEnabled, (), (override));
  MOCK_METHOD(std::string, GetFaultDomainName, (), (override));
  MOCK_METHOD(void, ClaimUnmountedDiskgroups, (), (override));
  MOCK_METHOD(void, RefreshKovaInfo, (), (override));
};

class RecordingProviderTest : public testing::Test {
 protected:
  RecordingProviderTest() {
    auto target = std::make_unique<testing::NiceMock<MockProvider>>();
    _target = target.get();
    _provider = std::make_unique<RecordingProvider>(std::move(target), _recorder);
  }

  void Format() { _provider->FormatDiskMapping("naa.1", {"naa.2", "naa.3"}, {"t1", 2, 1}); }

  std::vector<std::string> Outcomes() const {
    std::vector<std::string> outcomes;
    for (const RecordedCall& call : _recorder->Calls()) {
      outcomes.push_back(call.outcome);
    }
    return outcomes;
  }

  std::shared_ptr<CallRecorder> _recorder = std::make_shared<CallRecorder>();
  testing::NiceMock<MockProvider>* _target;
  std::unique_ptr<RecordingProvider> _provider;
};

TEST_F(RecordingProviderTest, WritesTheInputsOfEveryOperationAsAList) {
  for (const Provider::Operation& operation : Provider::AllOperations()) {
    operation.call(*_provider);
  }
  const std::vector<json> arguments = {
      json::parse(R"([["naa.1", "naa.2"], true])"),
      json::parse(R"([true])"),
      json::parse(R"(["naa.1", ["naa.2"], ["t1", 1, 0]])"),
      json::parse(R"(["naa.1", ["naa.2"]])"),
      json::parse(R"(["naa.1", true])"),
      json::parse(R"(["uuid"])"),
      json::parse(R"(["naa.2", "pass", ["text", 1, 2]])"),
      json::parse(R"(["naa.1", "", ["", 0, -1]])"),
      json::parse(R"(["naa.1"])"),
      json::parse(R"(["uuid", "pass"])"),
      json::array(),
      json::array(),
      json::array(),
      json::array(),
      json::array(),
      json::array(),
  };
  const std::vector<RecordedCall> calls = _recorder->Calls();
  ASSERT_EQ(calls.size(), Provider::operationNames.size());
  for (std::size_t index = 0; index < calls.size(); ++index) {
    EXPECT_EQ(calls[index].operation, Provider::operationNames[index]);
    EXPECT_EQ(calls[index].arguments, arguments[index]) << calls[index].operation;
    EXPECT_EQ(calls[index].outcome, "ok") << calls[index].operation;
  }
}

TEST_F(RecordingProviderTest, HandsEverythingThroughBothWays) {
  EXPECT_CALL(*_target, QueryDisks(ElementsAre("naa.1"), _, true))
      .WillOnce([](const auto&, auto& records, bool) { records.resize(3); });
  EXPECT_CALL(*_target, IsAutoModeEnabled()).WillOnce(Return(true));
  EXPECT_CALL(*_target, GetFaultDomainName()).WillOnce(Return("rack-1"));
  EXPECT_CALL(*_target, MountDiskMapping("naa.1", true));
  std::vector<HostCtl::Kova::DiskResult> records;
  _provider->QueryDisks({"naa.1"}, records, true);
  EXPECT_EQ(records.size(), 3U);
  EXPECT_TRUE(_provider->IsAutoModeEnabled());
  EXPECT_EQ(_provider->GetFaultDomainName(), "rack-1");
  _provider->MountDiskMapping("naa.1", true);
}

TEST_F(RecordingProviderTest, WritesTheClassAndTextOfAnExceptionAndLetsItPass) {
  EXPECT_CALL(*_target, FormatDiskMapping).WillOnce(Throw(KovaExceptionHasPartition("no room", "naa.2")));
  EXPECT_THROW(Format(), KovaExceptionHasPartition);
  EXPECT_THAT(Outcomes(), ElementsAre("KovaExceptionHasPartition: no room"));
}

TEST_F(RecordingProviderTest, AnInjectedExceptionKeepsTheCallFromTheProvider) {
  _recorder->Inject({"FormatDiskMapping", 2, "std::runtime_error", "boom", "", 0});
  EXPECT_CALL(*_target, FormatDiskMapping).Times(2);
  Format();
  EXPECT_THROW(Format(), std::runtime_error);
  Format();
  EXPECT_THAT(Outcomes(), ElementsAre("ok", "std::runtime_error: boom", "ok"));
}

TEST_F(RecordingProviderTest, ADelayAloneLetsTheCallThrough) {
  _recorder->Inject({"FormatDiskMapping", 0, "", "", "", 1});
  EXPECT_CALL(*_target, FormatDiskMapping).Times(1);
  Format();
  EXPECT_THAT(Outcomes(), ElementsAre("ok"));
}

TEST_F(RecordingProviderTest, ClearedFaultsAreGoneButCountingGoesOn) {
  _recorder->Inject({"FormatDiskMapping", 0, "HostCtlException", "always", "", 0});
  EXPECT_ANY_THROW(Format());
  _recorder->ClearFaults();
  Format();
  _recorder->Inject({"FormatDiskMapping", 3, "HostCtlException", "third", "", 0});
  EXPECT_ANY_THROW(Format());
}

TEST_F(RecordingProviderTest, TheStartObserverSeesACallBeforeTheProviderDoes) {
  std::vector<std::string> order;
  _recorder->SetStartObserver([&order](const RecordedCall& call) {
    EXPECT_EQ(call.outcome, "");
    order.push_back("observer " + call.operation);
  });
  EXPECT_CALL(*_target, RefreshKovaInfo()).WillOnce([&order] { order.emplace_back("provider"); });
  _provider->RefreshKovaInfo();
  EXPECT_THAT(order, ElementsAre("observer RefreshKovaInfo", "provider"));
}

TEST_F(RecordingProviderTest, TheEndObserverSeesTheOutcome) {
  std::vector<std::string> lines;
  _recorder->SetEndObserver([&lines](const RecordedCall& call) { lines.push_back(ToJsonLine(call)); });
  _provider->MountDiskMapping("naa.\xFF", false);
  EXPECT_THAT(lines,
              ElementsAre("{\"operation\":\"MountDiskMapping\",\"arguments\":[\"naa.\xEF\xBF\xBD\",false],"
                          "\"outcome\":\"ok\"}"));
}

TEST_F(RecordingProviderTest, TakingTheEndedCallsLeavesTheOneUnderWay) {
  _provider->RefreshKovaInfo();
  EXPECT_CALL(*_target, ClaimUnmountedDiskgroups()).WillOnce([this] {
    EXPECT_THAT(_recorder->TakeEnded(), ElementsAre(Field(&RecordedCall::operation, "RefreshKovaInfo")));
  });
  _provider->ClaimUnmountedDiskgroups();
  EXPECT_THAT(_recorder->TakeEnded(),
              ElementsAre(Field(&RecordedCall::operation, "ClaimUnmountedDiskgroups")));
  EXPECT_TRUE(_recorder->Calls().empty());
}

TEST_F(RecordingProviderTest, TheRecorderOutlivesItsProvider) {
  _provider->RefreshKovaInfo();
  _provider.reset();
  EXPECT_EQ(_recorder->Calls().size(), 1U);
}

TEST_F(RecordingProviderTest, RecordsCallsOfManyThreadsWithoutLosingOne) {
  _recorder->Inject({"RefreshKovaInfo", 7, "HostCtlException", "seventh", "", 0});
  std::vector<std::thread> callers;
  for (int caller = 0; caller < 4; ++caller) {
    callers.emplace_back([this] {
      for (int round = 0; round < 50; ++round) {
        try {
          _provider->RefreshKovaInfo();
        } catch (const HostCtl::Lib::HostCtlException&) {
          // Counted below.
        }
      }
    });
  }
  for (std::thread& caller : callers) {
    caller.join();
  }
  const std::vector<std::string> outcomes = Outcomes();
  EXPECT_EQ(outcomes.size(), 200U);
  EXPECT_EQ(std::count(outcomes.begin(), outcomes.end(), "HostCtlException: seventh"), 1);
  EXPECT_EQ(std::count(outcomes.begin(), outcomes.end(), "ok"), 199);
}

}  // namespace
}  // namespace OtxCtl::Fault
