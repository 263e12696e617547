#include "kovactl/DisksCommand.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <sstream>

#include "kovactl/testing/FakeHost.h"
#include "nox/Faults.h"
#include "nox/Kova.h"
#include "orbis/Engine.h"
#include "orbis/Json.h"
#include "orbis/Soap.h"

namespace Kovactl {
namespace {

using Nox::Kova::Host::DiskResult;
using DiskResults = Orbis::DataArray<DiskResult>;
using Orbis::Fault::SystemError;
using Tessa::MakeRef;
using Tessa::Ref;
using testing::ElementsAre;
using Testing::FakeHost;

Ref<DiskResult> ADisk(const std::string& name, bool ssd, std::int64_t bytes, const std::string& state) {
  const auto result = MakeRef<DiskResult>();
  result->GetDisk()->SetCanonicalName(name);
  result->GetDisk()->SetSsd(ssd);
  result->GetDisk()->GetCapacity()->SetBlockSize(512);
  result->GetDisk()->GetCapacity()->SetBlock(bytes / 512);
  result->SetState(state);
  return result;
}

class DisksCommand : public testing::Test {
 protected:
  DisksCommand() : _disks(MakeRef<DiskResults>()) { _host.answer.result = _disks; }

  ExitStatus Run(const std::vector<std::string>& names = {}, const std::string& output = "table") {
    _out.str("");
    _err.str("");
    return RunDisks(_host, names, output, _out, _err);
  }

  void AddTwoDisks() {
    _disks->Append(ADisk("naa.1", true, std::int64_t{1} << 30, "eligible"));
    const auto stick = ADisk("naa.22", false, 64 << 20, "ineligible");
    stick->GetDisk()->SetDisplayName("Stick");
    stick->SetError(MakeRef<Nox::Fault::DiskIsUSB>("naa.22"));
    _disks->Append(stick);
  }

  FakeHost _host;
  Ref<DiskResults> _disks;
  std::ostringstream _out;
  std::ostringstream _err;
};

TEST_F(DisksCommand, PrintsATableAndASummary) {
  AddTwoDisks();
  EXPECT_EQ(Run(), ExitStatus::Done);
  EXPECT_EQ(_out.str(),
            "DISK    KIND           SIZE  STATE       WHY NOT          DESCRIPTION\n"
            "naa.1   flash       1.0 GiB  eligible\n"
            "naa.22  hard disk  64.0 MiB  ineligible  attached by USB  Stick\n"
            "\n"
            "2 disks: 1 eligible, 1 ineligible\n");
  EXPECT_EQ(_err.str(), "");
}

TEST_F(DisksCommand, PrintsOnlyASummaryOfNoDisks) {
  EXPECT_EQ(Run(), ExitStatus::Done);
  EXPECT_EQ(_out.str(), "0 disks\n");
}

TEST_F(DisksCommand, AsksForTheNamesItIsGiven) {
  AddTwoDisks();
  EXPECT_EQ(Run({"naa.22", "naa.1"}), ExitStatus::Done);
  EXPECT_THAT(_host.asked, ElementsAre("naa.22", "naa.1"));
}

TEST_F(DisksCommand, PrintsJsonThatReadsBackAsTheAnswer) {
  AddTwoDisks();
  EXPECT_EQ(Run({}, "json"), ExitStatus::Done);
  const auto back = Orbis::ReadJson(_out.str(), Orbis::Limits::Untrusted(), &DiskResults::StaticType());
  EXPECT_TRUE(Orbis::Equal(back.Get(), _disks.Get()));
}

TEST_F(DisksCommand, PrintsSoapThatReadsBackAsTheAnswer) {
  AddTwoDisks();
  EXPECT_EQ(Run({}, "soap"), ExitStatus::Done);
  Ref<Orbis::Any> back;
  Orbis::DeserializeSoapToObject(_out.str(), back);
  EXPECT_TRUE(Orbis::Equal(back.Get(), _disks.Get()));
}

TEST_F(DisksCommand, NamesDisksThatTheHostDoesNotHaveAfterThoseItHas) {
  AddTwoDisks();
  EXPECT_EQ(Run({"naa.9", "naa.1", "naa.\x1b"}), ExitStatus::BadInput);
  EXPECT_THAT(_out.str(), testing::HasSubstr("naa.1 "));
  EXPECT_EQ(_err.str(),
            "kovactl: this host has no disk 'naa.\\x1b'\n"
            "kovactl: this host has no disk 'naa.9'\n");
}

TEST_F(DisksCommand, ExplainsAFaultWithoutAResult) {
  _host.answer = {.result = nullptr, .fault = MakeRef<SystemError>("no\nluck")};
  EXPECT_EQ(Run(), ExitStatus::Fault);
  EXPECT_EQ(_out.str(), "");
  EXPECT_THAT(_err.str(),
              testing::StartsWith("kovactl: something in the host failed: no\\x0aluck\n  See how"));
}

TEST_F(DisksCommand, PrintsAResultBesideItsFault) {
  AddTwoDisks();
  _host.answer.fault = MakeRef<SystemError>("half of it");
  EXPECT_EQ(Run(), ExitStatus::Fault);
  EXPECT_THAT(_out.str(), testing::HasSubstr("2 disks"));
  EXPECT_THAT(_err.str(), testing::HasSubstr("half of it"));
}

TEST_F(DisksCommand, LetsNoTextOfAHostPlayWithTheTerminal) {
  const auto disk = ADisk("naa.\x1b[31m", true, 512, "odd\x1b[2J");
  disk->GetDisk()->SetDisplayName("a\nb");
  _disks->Append(disk);
  EXPECT_EQ(Run(), ExitStatus::Done);
  EXPECT_THAT(_out.str(), testing::Not(testing::HasSubstr("\x1b")));
  EXPECT_THAT(_out.str(), testing::HasSubstr("a\\x0ab"));
}

TEST_F(DisksCommand, ShowsADiskWithoutNameOrSize) {
  const auto disk = MakeRef<DiskResult>();
  disk->SetState("inUse");
  _disks->Append(disk);
  EXPECT_EQ(Run(), ExitStatus::Done);
  EXPECT_EQ(_out.str(), "KIND     SIZE  STATE\nunknown     -  in use\n\n1 disk: 1 in use\n");
}

}  // namespace
}  // namespace Kovactl
