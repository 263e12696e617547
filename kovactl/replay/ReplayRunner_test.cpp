// Replays through the real plug-in. There is one plug-in in a process, so every replay has a process of its
// own.

#include "kovactl/replay/ReplayRunner.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <unistd.h>

#include <cstdio>
#include <fstream>
#include <nlohmann/json.hpp>
#include <sstream>

#include "host/testing/OwnProcess.h"
#include "otxctl/sim/HostBuilder.h"

namespace Kovactl {
namespace {

using Host::Testing::InOwnProcess;
using nlohmann::json;
using OtxCtl::Sim::AHost;
using OtxCtl::Sim::HostBuilder;
using OtxCtl::Sim::HostDescription;
using Tessa::Service::LogLevel;
using testing::AllOf;
using testing::HasSubstr;

constexpr const char* query = R"({"operation": "QueryDisksForKova"})";
constexpr int panicStatus = 70;

class ReplayRunner : public testing::Test {
 protected:
  ReplayRunner() { SetHost(AHost().WithSsd("naa.1").WithHdd("naa.2")); }
  ~ReplayRunner() override {
    std::remove(_hostFile.c_str());
    std::remove(_requestFile.c_str());
  }

  void SetHost(const HostBuilder& host) const {
    std::ofstream(_hostFile) << WriteHostDescription(host.Build());
  }
  // The n-th call of QueryDisks throws.
  void SetHostThatThrows(const std::string& exception, int call) const {
    SetHost(AHost().WithSsd("naa.1").Edit([&](HostDescription& host) {
      host.faults = {
          {.operation = "QueryDisks", .call = call, .exception = exception, .message = "boom", .disk = {}}};
    }));
  }

  Machines::MachineOptions Machine() const { return {.host = _hostFile}; }
  static Host::RuntimeOptions Runtime() {
    Host::RuntimeOptions options;
    options.pluginFile = KOVA_PLUGIN;
    return options;
  }

  // The answers to the lines.
  std::vector<json> Run(const std::string& lines, LogLevel level = LogLevel::Trivia) const {
    std::istringstream in(lines);
    std::ostringstream out;
    EXPECT_EQ(RunReplay(Machine(), Runtime(), "-", level, in, out), ExitStatus::Done);
    std::vector<json> answers;
    std::istringstream answered(out.str());
    for (std::string line; std::getline(answered, line);) {
      answers.push_back(json::parse(line));
    }
    return answers;
  }

  std::string WhyNot(const std::string& lines, std::string* answered = nullptr) const {
    std::istringstream in(lines);
    std::ostringstream out;
    try {
      RunReplay(Machine(), Runtime(), "-", LogLevel::Trivia, in, out);
      return "it ran";
    } catch (const BadInput& refused) {
      if (answered != nullptr) {
        *answered = out.str();
      }
      return refused.what();
    }
  }

  const std::string _hostFile = testing::TempDir() + "kova-replay-" + std::to_string(getpid()) + ".json";
  const std::string _requestFile = _hostFile + "l";
};

json AnswerOf(const std::string& operation) {
  return {{"operation", operation}, {"fault", nullptr},     {"result", nullptr},
          {"ended", nullptr},       {"log", json::array()}, {"calls", json::array()}};
}

std::vector<std::string> NamesOf(const json& answer) {
  std::vector<std::string> names;
  for (const json& disk : answer["result"]) {
    names.push_back(disk["disk"]["canonicalName"].get<std::string>());
  }
  return names;
}

TEST_F(ReplayRunner, AnswersAQueryWithResultLogAndCalls) {
  InOwnProcess([this] {
    const auto answers = Run(query);
    ASSERT_EQ(answers.size(), 1u);
    const json& answer = answers[0];
    EXPECT_EQ(answer["operation"], "QueryDisksForKova");
    EXPECT_EQ(answer["fault"], nullptr);
    EXPECT_EQ(answer["ended"], nullptr);
    EXPECT_THAT(NamesOf(answer), testing::ElementsAre("naa.1", "naa.2"));
    EXPECT_EQ(answer["result"][0]["@type"], "KovaHostDiskResult");
    EXPECT_EQ(answer["log"], json::parse(R"([
        {"level": 16, "format": "No fault. Operation completed successfully", "arguments": []}])"));
    EXPECT_EQ(answer["calls"], json::parse(R"([
        {"operation": "RefreshKovaInfo", "arguments": [], "outcome": "ok"},
        {"operation": "QueryDisks", "arguments": [[], true], "outcome": "ok"}])"));
    EXPECT_EQ(answer.size(), 6u);
  });
}

TEST_F(ReplayRunner, RunsLinesInOrderInOneProcess) {
  InOwnProcess([this] {
    const auto answers = Run(std::string(query) + "\n\n  \t\r\n" +
                             R"({"operation": "QueryDisksForKova", "names": ["naa.2"]})" + "\r\n");
    ASSERT_EQ(answers.size(), 2u);
    EXPECT_THAT(NamesOf(answers[1]), testing::ElementsAre("naa.2"));
    EXPECT_EQ(answers[1]["calls"], json::array()) << "the disk cache of the first line is still good";
  });
}

TEST_F(ReplayRunner, ShowsTheLogUpToItsLevel) {
  InOwnProcess([this] { EXPECT_EQ(Run(query, LogLevel::Info)[0]["log"], json::array()); });
}

TEST_F(ReplayRunner, HandsNamesDownThatTheGateWouldRefuse) {
  InOwnProcess([this] {
    const auto answers = Run(R"({"operation": "QueryDisksForKova", "names": ["", "\n"]})");
    EXPECT_EQ(answers[0]["result"], json::array()) << "replay is the plug-in, bare";
  });
}

TEST_F(ReplayRunner, ShowsAnEmptyResultApartFromNone) {
  SetHost(AHost().WithSsd("naa.1").Edit(
      [](HostDescription& host) { host.storageSystem = OtxCtl::Sim::StorageSystem::Missing; }));
  InOwnProcess([this] {
    const json answer = Run(query)[0];
    EXPECT_EQ(answer["result"], nullptr);
    EXPECT_EQ(answer["fault"], nullptr);
    EXPECT_EQ(answer["log"].back(),
              json::parse(R"({"level": 8, "format": "Cannot marshal DiskResult due to %1",
                              "arguments": ["Failed to lookup STORAGE_SYSTEM_MO."]})"));
  });
}

TEST_F(ReplayRunner, ShowsAProviderThatFailed) {
  SetHostThatThrows("KovaExceptionRescanError", 1);
  InOwnProcess([this] {
    const auto answers = Run(std::string(query) + "\n" + query);
    EXPECT_EQ(answers[0]["calls"][1]["outcome"], "KovaExceptionRescanError: boom");
    EXPECT_EQ(answers[0]["result"], json::array());
    EXPECT_THAT(NamesOf(answers[1]), testing::ElementsAre("naa.1"));
  });
}

TEST_F(ReplayRunner, EveryOperationReachesItsHook) {
  InOwnProcess([this] {
    const auto answers = Run(R"({"operation": "AddDisks", "disks": ["naa.1", "naa.2"], "requestTag": "t1"}
{"operation": "InitializeDisks", "mappings": [{"ssd": "naa.1", "nonSsd": ["naa.2"]}], "requestTag": "t2"}
{"operation": "RemoveDisk", "disk": "naa.2"}
{"operation": "RemoveDiskMapping", "mapping": {"ssd": "naa.1", "nonSsd": ["naa.2"]}}
{"operation": "UnmountDiskMapping", "mappings": [{"ssd": "naa.1", "nonSsd": ["naa.2"]}], "requestTag": "t3"}
{"operation": "AddAllEligibleDisks", "requestTag": "t4"}
{"operation": "GetStorageInfo"}
{"operation": "GetConfigInfo"}
{"operation": "ClaimUnmountedDiskgroup"})");
    const char* const operations[] = {"AddDisks",          "InitializeDisks",    "RemoveDisk",
                                      "RemoveDiskMapping", "UnmountDiskMapping", "AddAllEligibleDisks",
                                      "GetStorageInfo",    "GetConfigInfo",      "ClaimUnmountedDiskgroup"};
    ASSERT_EQ(answers.size(), std::size(operations));
    for (std::size_t i = 0; i < answers.size(); ++i) {
      EXPECT_EQ(answers[i]["operation"], operations[i]);
      EXPECT_EQ(answers[i]["ended"], nullptr) << answers[i];
      const bool silent = answers[i]["log"].empty() && answers[i]["calls"].empty() &&
                          answers[i]["fault"].is_null() && answers[i]["result"].is_null();
      EXPECT_FALSE(silent) << operations[i];
    }
  });
}

TEST_F(ReplayRunner, ARawRequestIsAnsweredAsRaw) {
  InOwnProcess([this] {
    const json answer =
        Run(R"({"operation": "raw", "hook": "QueryDisksForKovaHookFn", "names": ["naa.1"]})")[0];
    EXPECT_EQ(answer["operation"], "raw");
    EXPECT_THAT(NamesOf(answer), testing::ElementsAre("naa.1"));
  });
}

TEST_F(ReplayRunner, AChangeOfTheHostHasAnEmptyAnswer) {
  InOwnProcess([this] {
    const auto answers =
        Run(R"({"operation": "host", "set": {"autoMode": true}, "disk": {"name": "naa.2", "absent": true}})");
    EXPECT_EQ(answers[0], AnswerOf("host"));
  });
}

TEST_F(ReplayRunner, AChangeOfTheHostIsSeenByTheFirstQueryButNotBehindAValidCache) {
  InOwnProcess([this] {
    const std::string partitioned = R"({"operation": "host", "disk": {"name": "naa.2", "partitions": 1}})";
    const std::string clean = R"({"operation": "host", "disk": {"name": "naa.2", "partitions": 0}})";
    const auto answers = Run(partitioned + "\n" + query + "\n" + clean + "\n" + query);
    EXPECT_EQ(answers[1]["result"][1]["state"], "ineligible");
    EXPECT_EQ(answers[3]["result"][1]["state"], "ineligible")
        << "nothing has invalidated the plug-in's cache";
    EXPECT_EQ(answers[3]["calls"], json::array());
  });
}

TEST_F(ReplayRunner, ADiskThatLeftTheInventoryIsSeenAtOnceForTheInventoryHasNoCache) {
  InOwnProcess([this] {
    const auto answers =
        Run(std::string(query) + "\n" +
            R"({"operation": "host", "disk": {"name": "naa.2", "inInventory": false}})" + "\n" + query);
    EXPECT_EQ(answers[0]["result"].size(), 2u);
    EXPECT_NE(answers[2]["result"], answers[0]["result"]);
  });
}

TEST_F(ReplayRunner, APanicIsTheLastAnswerAndEndsTheProcess) {
  SetHostThatThrows("std::runtime_error", 1);
  std::ofstream(_requestFile) << query << "\n" << query << "\n";
  const std::string answerFile = _requestFile + ".out";
  InOwnProcess(
      [&] {
        std::ofstream out(answerFile);
        std::istringstream none;
        RunReplay(Machine(), Runtime(), _requestFile, LogLevel::Trivia, none, out);
      },
      panicStatus, "panicked: boom");
  std::ifstream answered(answerFile);
  std::string line;
  ASSERT_TRUE(std::getline(answered, line));
  const json answer = json::parse(line);
  EXPECT_EQ(answer["ended"], "panic: boom");
  EXPECT_EQ(answer["operation"], "QueryDisksForKova");
  EXPECT_EQ(answer["calls"][1]["outcome"], "std::runtime_error: boom");
  EXPECT_FALSE(std::getline(answered, line)) << "the second request never ran";
  std::remove(answerFile.c_str());
}

TEST_F(ReplayRunner, ReadsAFile) {
  std::ofstream(_requestFile) << query;
  InOwnProcess([this] {
    std::istringstream none;
    std::ostringstream out;
    EXPECT_EQ(RunReplay(Machine(), Runtime(), _requestFile, LogLevel::Trivia, none, out), ExitStatus::Done);
    EXPECT_THAT(out.str(), testing::StartsWith(R"({"operation":"QueryDisksForKova")"));
  });
}

TEST_F(ReplayRunner, AnEmptyFileHasNoAnswers) {
  InOwnProcess([this] { EXPECT_TRUE(Run("").empty()); });
}

TEST_F(ReplayRunner, AMistakeAnywhereInTheFileStopsItBeforeTheFirstLineRuns) {
  InOwnProcess([this] {
    std::string answered;
    EXPECT_THAT(
        WhyNot(std::string(query) + "\n\n" + R"({"operation": "RemoveDisk", "optionFirst": "x"})", &answered),
        AllOf(HasSubstr("-, line 3: "), HasSubstr("optionFirst")));
    EXPECT_EQ(answered, "");
  });
}

TEST_F(ReplayRunner, AHostThatCannotBeNamesTheLineAfterTheAnswersBefore) {
  InOwnProcess([this] {
    std::string answered;
    EXPECT_THAT(
        WhyNot(std::string(query) + "\n" + R"({"operation": "host", "disk": {"name": "naa.9"}})", &answered),
        HasSubstr("line 2: "));
    EXPECT_EQ(std::count(answered.begin(), answered.end(), '\n'), 1);
  });
}

TEST_F(ReplayRunner, NamesAFileThatCannotBeRead) {
  InOwnProcess([this] {
    for (const char* file : {"/no/such/file.jsonl", "/"}) {
      std::istringstream none;
      std::ostringstream out;
      try {
        RunReplay(Machine(), Runtime(), file, LogLevel::Trivia, none, out);
        ADD_FAILURE() << "it ran";
      } catch (const BadInput& refused) {
        EXPECT_THAT(refused.what(), HasSubstr(file));
      }
    }
  });
}

TEST_F(ReplayRunner, NeedsAHost) {
  InOwnProcess([] {
    std::istringstream none;
    std::ostringstream out;
    EXPECT_THROW(RunReplay({}, {}, "-", LogLevel::Trivia, none, out), BadInput);
  });
}

}  // namespace
}  // namespace Kovactl
