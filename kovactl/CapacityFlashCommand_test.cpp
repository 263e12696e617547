#include "kovactl/CapacityFlashCommand.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <unistd.h>

#include <filesystem>
#include <sstream>

#include "host/HostError.h"
#include "kovactl/testing/FakeHost.h"
#include "kovactl/testing/Objects.h"
#include "machines/HostSettingsFile.h"
#include "nox/Faults.h"

namespace Kovactl {
namespace {

using Testing::ADisk;
using testing::ElementsAre;
using Testing::FakeHost;
using testing::HasSubstr;

class CapacityFlashCommand : public testing::Test {
 protected:
  CapacityFlashCommand() {
    std::filesystem::create_directory(_folder);
    AnswerWith(true);
  }
  ~CapacityFlashCommand() override { std::filesystem::remove_all(_folder); }

  void AnswerWith(bool isFlash) {
    const auto result = Tessa::MakeRef<Nox::Kova::Host::DiskResult>();
    result->SetDisk(ADisk("naa.1", isFlash));
    _host.answer = Testing::WithList<Nox::Kova::Host::DiskResult>({result});
  }

  std::string Run(bool isMarked, const std::string& output = "table") {
    std::ostringstream out;
    EXPECT_EQ(RunCapacityFlash(_host, {"naa.1", isMarked, _file, output}, out), ExitStatus::Done);
    return out.str();
  }

  std::string WhyNot(bool isMarked = true) {
    std::ostringstream out;
    try {
      RunCapacityFlash(_host, {"naa.1", isMarked, _file}, out);
      return "";
    } catch (const BadInput& refused) {
      EXPECT_FALSE(std::filesystem::exists(_file));
      return refused.what();
    }
  }

  FakeHost _host;
  const std::string _folder = testing::TempDir() + "kova-capacity-flash-" + std::to_string(getpid());
  const std::string _file = _folder + "/host.json";
};

TEST_F(CapacityFlashCommand, MarksAFlashDiskAndTakesTheMarkAway) {
  EXPECT_EQ(Run(true), "naa.1 is for the capacity tier.\n");
  EXPECT_THAT(_host.asked, ElementsAre("naa.1"));
  EXPECT_THAT(Machines::ReadHostSettings(_file).capacityFlash, ElementsAre("naa.1"));
  EXPECT_EQ(Run(true), "naa.1 is for the capacity tier, as before.\n");
  EXPECT_EQ(Run(false), "naa.1 is for the cache tier.\n");
  EXPECT_THAT(Machines::ReadHostSettings(_file).capacityFlash, ElementsAre());
  EXPECT_EQ(Run(true, "json"), "{\"disk\":\"naa.1\",\"capacityFlash\":true,\"changed\":true}\n");
}

TEST_F(CapacityFlashCommand, OnlyAFlashDiskOfTheHostIsMarked) {
  AnswerWith(false);
  EXPECT_EQ(WhyNot(), "naa.1 is no flash disk, but: hard disk");
  _host.answer = Testing::WithList<Nox::Kova::Host::DiskResult>({});
  EXPECT_EQ(WhyNot(), "this host has no disk 'naa.1'");
  _host.answer = {.result = nullptr, .fault = Tessa::MakeRef<Orbis::Fault::SystemError>("broken")};
  EXPECT_THAT(WhyNot(), HasSubstr("cannot be asked about its disks: "));
}

TEST_F(CapacityFlashCommand, AMarkIsTakenFromADiskThatIsNotThereAnyMore) {
  Run(true);
  _host.answer = Testing::WithList<Nox::Kova::Host::DiskResult>({});
  EXPECT_EQ(Run(false), "naa.1 is for the cache tier.\n");
}

TEST_F(CapacityFlashCommand, ASimulatedHostIsChangedOtherwise) {
  _host.descriptions = {"{}"};
  EXPECT_EQ(WhyNot(), "this is a simulated host; mark its disk with: kovactl sim set naa.1 --capacity-flash");
}

}  // namespace
}  // namespace Kovactl
