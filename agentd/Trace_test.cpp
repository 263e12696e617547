#include "agentd/Trace.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <unistd.h>

#include <cstdio>
#include <fstream>
#include <memory>
#include <nlohmann/json.hpp>
#include <stdexcept>
#include <thread>
#include <vector>

#include "otxctl/fault/CallRecorder.h"
#include "otxctl/fault/RecordingProvider.h"
#include "otxctl/sim/HostBuilder.h"
#include "otxctl/sim/SimHost.h"
#include "otxctl/sim/SimProvider.h"

namespace Agentd {
namespace {

using OtxCtl::Fault::RecordingProvider;
using OtxCtl::Sim::AHost;
using testing::ElementsAre;

class Trace : public testing::Test {
 protected:
  ~Trace() override { std::remove(_file.c_str()); }

  // A provider of a host with one group, whose calls the recorder sees.
  static std::unique_ptr<RecordingProvider> ProviderWith(
      const std::shared_ptr<OtxCtl::Fault::CallRecorder>& recorder) {
    const auto host =
        std::make_shared<OtxCtl::Sim::SimHost>(AHost().WithSsd("naa.1").WithHdd("naa.2").Build());
    return std::make_unique<RecordingProvider>(std::make_unique<OtxCtl::Sim::SimProvider>(host), recorder);
  }

  std::vector<std::string> Lines() const {
    std::vector<std::string> lines;
    std::ifstream file(_file);
    for (std::string line; std::getline(file, line);) {
      lines.push_back(line);
    }
    return lines;
  }

  const std::string _file = testing::TempDir() + "kova-trace-" + std::to_string(getpid());
};

TEST_F(Trace, HasALineForEachCallAsSoonAsItHasEnded) {
  const auto recorder = TraceTo(_file);
  const auto provider = ProviderWith(recorder);
  provider->RefreshKovaInfo();
  EXPECT_THAT(Lines(), ElementsAre(R"({"operation":"RefreshKovaInfo","arguments":[],"outcome":"ok"})"));
  std::vector<HostCtl::Kova::DiskMapping> mappings;
  provider->GetDiskMappings(mappings, true);
  EXPECT_EQ(Lines().back(), R"({"operation":"GetDiskMappings","arguments":[true],"outcome":"ok"})");
}

TEST_F(Trace, ShowsHowACallFailed) {
  const auto provider = ProviderWith(TraceTo(_file));
  EXPECT_ANY_THROW(provider->UnmountDiskMapping("naa.\n9"));
  ASSERT_EQ(Lines().size(), 1u);
  EXPECT_THAT(nlohmann::json::parse(Lines()[0])["outcome"].get<std::string>(),
              testing::StartsWith("KovaStorageException: "));
}

TEST_F(Trace, IsAppendedToWhatTheFileHolds) {
  std::ofstream(_file) << "before\n";
  ProviderWith(TraceTo(_file))->RefreshKovaInfo();
  EXPECT_THAT(Lines(), ElementsAre("before", testing::HasSubstr("RefreshKovaInfo")));
}

TEST_F(Trace, KeepsNoCallInMemory) {
  const auto recorder = TraceTo(_file);
  ProviderWith(recorder)->RefreshKovaInfo();
  EXPECT_THAT(recorder->Calls(), testing::IsEmpty());
}

TEST_F(Trace, HoldsWholeLinesHoweverManyThreadsCall) {
  const auto provider = ProviderWith(TraceTo(_file));
  std::vector<std::thread> threads;
  for (int i = 0; i < 4; ++i) {
    threads.emplace_back([&provider] {
      for (int round = 0; round < 50; ++round) {
        provider->RefreshKovaInfo();
      }
    });
  }
  for (std::thread& thread : threads) {
    thread.join();
  }
  EXPECT_THAT(
      Lines(),
      testing::AllOf(testing::SizeIs(200),
                     testing::Each(R"({"operation":"RefreshKovaInfo","arguments":[],"outcome":"ok"})")));
}

TEST_F(Trace, NamesAFileThatCannotBeWritten) {
  try {
    TraceTo("/no/such/folder/trace");
    FAIL() << "it was opened";
  } catch (const std::runtime_error& refused) {
    EXPECT_THAT(refused.what(), testing::HasSubstr("/no/such/folder/trace"));
  }
}

}  // namespace
}  // namespace Agentd
