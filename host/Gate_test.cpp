#include "host/Gate.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <functional>

#include "host/KnownDisks.h"
#include "host/testing/Requests.h"
#include "machines/SimulatedInventory.h"
#include "machines/SimulatedMachine.h"
#include "otxctl/sim/HostBuilder.h"
#include "otxctl/sim/SimHost.h"

namespace Host::Gate {
namespace {

using OtxCtl::Sim::AHost;
using OtxCtl::Sim::HostBuilder;
using OtxCtl::Sim::HostDescription;
using OtxCtl::Sim::SimHost;
using Tessa::Ref;
using testing::AllOf;
using testing::HasSubstr;
using testing::StartsWith;
using namespace Host::Testing;
using Names = std::vector<std::string>;

const std::string absentName = "kova:01234567-89ab-cdef-0123-456789abcdef";

// "let in", or what the refusal tells.
std::string VerdictOn(const std::function<void()>& check) {
  try {
    check();
    return "let in";
  } catch (const Orbis::MethodFault::Exception& refused) {
    return OutcomeText(refused.GetFault().Get());
  }
}

std::string Verdict(const Names& names) {
  return VerdictOn([&names] { CheckNames("names", names); });
}

TEST(Gate, LetsInWhatCanBeANameOfADisk) {
  EXPECT_EQ(Verdict({}), "let in");
  EXPECT_EQ(Verdict({"naa.5000c50000000100", "t10.VENDOR  Größe", "kova:0123", "a"}), "let in");
}

TEST(Gate, LetsInTheSameNameTwice) {
  EXPECT_EQ(Verdict({"naa.1", "naa.1"}), "let in");
}

TEST(Gate, RefusesAnEmptyNameAndSaysWhich) {
  EXPECT_THAT(Verdict({"naa.1", ""}), AllOf(HasSubstr("names[1] | names[1]: "), HasSubstr("empty")));
}

TEST(Gate, LetsInTheLongestNameAndNoLongerOne) {
  EXPECT_EQ(Verdict({std::string(longestName, 'n')}), "let in");
  EXPECT_THAT(Verdict({std::string(longestName + 1, 'n')}),
              AllOf(HasSubstr("names[0] | "), HasSubstr("1024 bytes")));
}

TEST(Gate, LetsInTheMostNamesAndNoMore) {
  EXPECT_EQ(Verdict(Names(mostNames, "naa.1")), "let in");
  EXPECT_THAT(Verdict(Names(mostNames + 1, "naa.1")),
              AllOf(HasSubstr("names | "), HasSubstr("100000 names")));
}

TEST(Gate, RefusesControlCharactersAndShowsThemHarmlessly) {
  EXPECT_THAT(Verdict({"naa\n1"}), AllOf(HasSubstr("names[0] | "), HasSubstr("'naa\\x0a1'")));
  EXPECT_THAT(Verdict({std::string("naa\0", 4)}), HasSubstr("'naa\\x00'"));
  EXPECT_THAT(Verdict({"\x7f"}), HasSubstr("'\\x7f'"));
  EXPECT_THAT(Verdict({"\xC2\x85"}), HasSubstr("'\\xc2\\x85'"));
}

TEST(Gate, RefusesWhatIsNotUtf8) {
  EXPECT_THAT(Verdict({"naa.\xFF"}), HasSubstr("'naa.\\xff'"));
  EXPECT_THAT(Verdict({"\xED\xA0\x80"}), HasSubstr("names[0] | "));
}

TEST(Gate, NamesTheFirstOfSeveralMistakes) {
  EXPECT_THAT(Verdict({"a", "", "\n"}), HasSubstr("names[1] | "));
}

TEST(Gate, NamesTheParameterThatTheCallerNames) {
  EXPECT_THAT(VerdictOn([] { CheckNames("disks", {""}); }), StartsWith("disks[0] | "));
}

TEST(GateForRemovals, LetsInADiskThatIsThereOrAbsentAndTextsOfTheirLimit) {
  EXPECT_EQ(VerdictOn([] { CheckName("disk", "naa.1"); }), "let in");
  EXPECT_EQ(VerdictOn([] { CheckName("disk", absentName); }), "let in");
  EXPECT_EQ(VerdictOn([] { CheckOption("passThrough", std::string(longestOption, 'o')); }), "let in");
}

TEST(GateForRemovals, RefusesAnUnfitNameOrText) {
  EXPECT_THAT(VerdictOn([] { CheckName("disk", ""); }), StartsWith("disk | "));
  EXPECT_THAT(VerdictOn([] { CheckName("disk", "a\n"); }), StartsWith("disk | "));
  EXPECT_THAT(VerdictOn([] { CheckOption("passThrough", "\x01"); }), StartsWith("passThrough | "));
  EXPECT_THAT(VerdictOn([] { CheckOption("optionText", "\xFF"); }), StartsWith("optionText | "));
  EXPECT_THAT(VerdictOn([] { CheckOption("optionText", std::string(longestOption + 1, 'o')); }),
              AllOf(StartsWith("optionText | "), HasSubstr("4096 bytes")));
}

// A host and its inventory, and a request to it.
class GateWithHost : public testing::Test {
 protected:
  void Serve(const HostBuilder& host) { _host = std::make_unique<SimHost>(host.Build()); }
  KnownDisks Known() const { return KnownDisks(Machines::DescribeInventory(_host->Snapshot())); }

  std::string VerdictOnDisks(const Ref<DiskList>& disks) const {
    return VerdictOn([&] { AdmitDisks(*disks, Known()); });
  }
  std::string VerdictOnNewGroups(const std::vector<MappingRef>& mappings) const {
    return VerdictOn([&] { AdmitNewGroups(*Mappings(mappings), Known()); });
  }
  std::string VerdictOnWholeGroups(const Names& names) {
    return VerdictOn([&] {
      const KnownDisks known = Known();
      const Ref<DiskList> disks = DisksNamed(names);
      AdmitDisks(*disks, known);
      RequireWholeGroups(*disks, known, *_host);
    });
  }

  std::unique_ptr<SimHost> _host =
      std::make_unique<SimHost>(AHost().WithSsd("naa.1").WithHdds({"naa.2", "naa.3"}).Build());
};

TEST_F(GateWithHost, PutsTheInventorysDiskInThePlaceOfTheClients) {
  const auto claimed = ADisk("naa.2", true);  // a hard disk that calls itself flash
  claimed->SetVendor("ACME");
  const KnownDisks known = Known();
  const Ref<DiskList> disks = Disks({ADisk("naa.1"), claimed});
  AdmitDisks(*disks, known);
  ASSERT_EQ(disks->Size(), 2u);
  EXPECT_EQ((*disks)[0], known.Find("naa.1").Get());
  EXPECT_EQ((*disks)[1], known.Find("naa.2").Get());
  EXPECT_FALSE((*disks)[1]->GetSsd());
}

TEST_F(GateWithHost, RefusesAnUnknownDiskWhateverFlagItBrings) {
  EXPECT_EQ(VerdictOnDisks(DisksNamed({"naa.1", "naa.x"})),
            "disks[1] | disks[1]: this host has no disk 'naa.x'");
  EXPECT_EQ(VerdictOnDisks(Disks({ADisk("naa.x", true)})),
            "disks[0] | disks[0]: this host has no disk 'naa.x'");
  EXPECT_THAT(VerdictOnDisks(Disks({ADisk(absentName, false)})), HasSubstr("this host has no disk 'kova:"));
  EXPECT_THAT(VerdictOnNewGroups({AMapping(ADisk("naa.x", true), DisksNamed({"naa.2"}))}),
              StartsWith("mappings[0].ssd | "));
  EXPECT_THAT(VerdictOnNewGroups({AMapping(ADisk("naa.1"), Disks({ADisk("naa.x", false)}))}),
              StartsWith("mappings[0].nonSsd[0] | "));
}

TEST_F(GateWithHost, CannotTellWithoutAnInventory) {
  const KnownDisks none(nullptr);
  const auto group = Mappings({MappingOf("naa.1", {"naa.2"})});
  EXPECT_THAT(VerdictOn([&] { AdmitDisks(*DisksNamed({"naa.1"}), none); }),
              StartsWith("The disks of the host"));
  EXPECT_THAT(VerdictOn([&] { AdmitNewGroups(*group, none); }), StartsWith("The disks of the host"));
  EXPECT_EQ(VerdictOn([&] { AdmitGroups(*group, none); }), "let in");
  const KnownDisks empty(Tessa::MakeRef<Nox::Host::StorageDeviceInfo>());
  EXPECT_THAT(VerdictOn([&] { AdmitDisks(*DisksNamed({"naa.1"}), empty); }),
              HasSubstr("this host has no disk 'naa.1'"));
}

TEST_F(GateWithHost, RefusesWhatIsNoDisk) {
  EXPECT_EQ(VerdictOnDisks(Disks({ADisk("naa.1"), nullptr})), "disks[1] | disks[1]: there is no disk");
  EXPECT_THAT(VerdictOnDisks(Disks({Tessa::MakeRef<Nox::Host::ScsiDisk>()})),
              HasSubstr("disks[0]: the disk has no canonical name"));
  EXPECT_THAT(VerdictOnDisks(DisksNamed({""})), StartsWith("disks[0] | "));
  EXPECT_THAT(VerdictOnDisks(DisksNamed({"a\nb"})), HasSubstr("'a\\x0ab'"));
  EXPECT_EQ(VerdictOnDisks(DisksNamed({})), "let in");
}

TEST_F(GateWithHost, LetsInTheMostDisksAndNoMore) {
  EXPECT_EQ(VerdictOnDisks(DisksNamed(Names(mostNames, "naa.1"))), "let in");
  EXPECT_THAT(VerdictOnDisks(DisksNamed(Names(mostNames + 1, "naa.1"))), HasSubstr("100000 disks"));
}

TEST_F(GateWithHost, PutsTheInventorysDisksInNewGroups) {
  const KnownDisks known = Known();
  const auto groups = Mappings({MappingOf("naa.1", {"naa.2", "naa.3"})});
  AdmitNewGroups(*groups, known);
  ASSERT_EQ(groups->Size(), 1u);
  EXPECT_EQ((*groups)[0]->GetSsd(), known.Find("naa.1").Get());
  EXPECT_EQ((*(*groups)[0]->GetNonSsd())[1], known.Find("naa.3").Get());
}

TEST_F(GateWithHost, GivesAbsentDisksOfNewGroupsTheFlagOfTheirPlace) {
  const auto groups = Mappings({MappingOf(absentName, {"naa.2", absentName})});
  AdmitNewGroups(*groups, Known());
  EXPECT_EQ((*groups)[0]->GetSsd()->GetCanonicalName(), absentName);
  EXPECT_TRUE((*groups)[0]->GetSsd()->GetSsd());
  EXPECT_FALSE((*(*groups)[0]->GetNonSsd())[1]->GetSsd());
}

TEST_F(GateWithHost, RefusesUnknownDisksOfNewGroupsAndSaysWhere) {
  EXPECT_EQ(VerdictOnNewGroups({MappingOf("naa.1", {"naa.2"}), MappingOf("naa.x", {"naa.3"})}),
            "mappings[1].ssd | mappings[1].ssd: this host has no disk 'naa.x'");
  EXPECT_THAT(VerdictOnNewGroups({MappingOf("naa.1", {"naa.2", "naa.x"})}),
              StartsWith("mappings[0].nonSsd[1] | "));
  EXPECT_THAT(VerdictOnNewGroups({MappingOf("naa.1", {"KOVA:" + absentName.substr(5)})}),
              StartsWith("mappings[0].nonSsd[0] | "));
  EXPECT_THAT(VerdictOnNewGroups({MappingOf("naa.1", {absentName + "0"})}),
              StartsWith("mappings[0].nonSsd[0] | "));
}

TEST_F(GateWithHost, RefusesGroupsThatLackAPart) {
  EXPECT_EQ(VerdictOnNewGroups({nullptr}), "mappings[0] | mappings[0]: there is no disk group");
  EXPECT_THAT(VerdictOnNewGroups({AMapping(nullptr, DisksNamed({"naa.2"}))}), StartsWith("mappings[0].ssd"));
  EXPECT_THAT(VerdictOnNewGroups({AMapping(ADisk("naa.1"), Disks({nullptr}))}),
              StartsWith("mappings[0].nonSsd[0] | "));
  EXPECT_EQ(VerdictOnNewGroups({AMapping(ADisk("naa.1"), nullptr)}), "let in");
}

TEST_F(GateWithHost, LetsInTheMostGroupsAndNoMore) {
  const MappingRef mapping = MappingOf("naa.1", {});
  EXPECT_EQ(VerdictOnNewGroups(std::vector<MappingRef>(mostMappings, mapping)), "let in");
  EXPECT_THAT(VerdictOnNewGroups(std::vector<MappingRef>(mostMappings + 1, mapping)),
              HasSubstr("10000 disk groups"));
  const MappingRef large = MappingOf("naa.1", Names(mostDisksOfGroup, "naa.2"));
  EXPECT_THAT(VerdictOnNewGroups(std::vector<MappingRef>(mostNames / mostDisksOfGroup, large)),
              HasSubstr("100000 disks"));
}

TEST_F(GateWithHost, LetsInTheMostDisksOfAGroupAndNoMore) {
  const MappingRef largest = MappingOf("naa.1", Names(mostDisksOfGroup, "naa.2"));
  const MappingRef larger = MappingOf("naa.1", Names(mostDisksOfGroup + 1, "naa.2"));
  EXPECT_EQ(VerdictOnNewGroups({largest}), "let in");
  EXPECT_THAT(VerdictOnNewGroups({largest, larger}),
              AllOf(StartsWith("mappings[1].nonSsd | "), HasSubstr("more than 1000 disks")));
  EXPECT_THAT(VerdictOn([&] { AdmitGroup(larger.Get(), Known()); }), StartsWith("mapping.nonSsd | "));
}

TEST_F(GateWithHost, LetsGroupsThatAreThereNameDisksThatTheInventoryLacks) {
  const MappingRef group = MappingOf("naa.x", {"naa.2", "naa.y"});
  AdmitGroup(group.Get(), Known());
  EXPECT_TRUE(group->GetSsd()->GetSsd());
  EXPECT_FALSE((*group->GetNonSsd())[1]->GetSsd());
  EXPECT_EQ(VerdictOn([&] { AdmitGroup(MappingOf("", {}).Get(), Known()); }),
            "mapping.ssd | mapping.ssd: the name of a disk is empty");
  EXPECT_EQ(VerdictOn([&] { AdmitGroups(*Mappings({MappingOf("naa.x", {"naa.y"})}), Known()); }), "let in");
}

TEST_F(GateWithHost, LetsInACacheDiskOfAnUnmountedGroupThatIsWhole) {
  Serve(AHost().WithSsd("naa.1").WithHdd("naa.2").WithUnmountedGroup("naa.1", {"naa.2"}));
  EXPECT_EQ(VerdictOnWholeGroups({"naa.1"}), "let in");
}

TEST_F(GateWithHost, RefusesACacheDiskOfAnUnmountedGroupWhoseMemberHasLeft) {
  Serve(AHost()
            .WithSsd("naa.1")
            .WithHdds({"naa.2", "naa.3", "naa.4"})
            .WithUnmountedGroup("naa.1", {"naa.2", "naa.3"})
            .Without("naa.3"));
  EXPECT_THAT(VerdictOnWholeGroups({"naa.4", "naa.1"}),
              AllOf(StartsWith("disks[1] | "), HasSubstr("'naa.1'"), HasSubstr("'kova:uuid-of-naa.3'")));
  EXPECT_EQ(VerdictOnWholeGroups({"naa.2", "naa.4"}), "let in")
      << "only the cache disk brings the group along";
}

TEST_F(GateWithHost, RefusesACacheDiskOfAnUnmountedGroupWithAMemberThatTheInventoryLacks) {
  Serve(AHost()
            .WithSsd("naa.1")
            .WithDisk("naa.2", false, [](OtxCtl::Sim::HostDisk& disk) { disk.inInventory = false; })
            .WithUnmountedGroup("naa.1", {"naa.2"}));
  EXPECT_THAT(VerdictOnWholeGroups({"naa.1"}), HasSubstr("'naa.2'"));
}

TEST_F(GateWithHost, RefusesAFlaggedCacheDiskThatTheInventoryLacksItself) {
  Serve(AHost()
            .WithDisk("naa.1", true, [](OtxCtl::Sim::HostDisk& disk) { disk.inInventory = false; })
            .WithHdd("naa.2")
            .WithUnmountedGroup("naa.1", {"naa.2"}));
  EXPECT_THAT(VerdictOn([&] { RequireWholeGroups(*Disks({ADisk("naa.1", true)}), Known(), *_host); }),
              HasSubstr("'naa.1'"));
}

TEST_F(GateWithHost, LetsInTheCacheDiskOfAMountedGroupWhoseMemberHasLeft) {
  Serve(AHost().WithSsd("naa.1").WithHdd("naa.2").WithGroup("naa.1", {"naa.2"}).Without("naa.2"));
  EXPECT_EQ(VerdictOnWholeGroups({"naa.1"}), "let in");
}

TEST_F(GateWithHost, TakesTheKernelsWordForWhatIsNotMounted) {
  Serve(AHost()
            .WithSsd("naa.1")
            .WithHdd("naa.2")
            .WithGroup("naa.1", {"naa.2"})
            .Without("naa.2")
            .Edit([](HostDescription& host) { host.disks[0].verdict = {.state = 2, .reason = 6}; }));
  EXPECT_THAT(VerdictOnWholeGroups({"naa.1"}), StartsWith("disks[0] | "));
}

TEST_F(GateWithHost, AsksTheKernelOnlyAboutFlash) {
  Serve(AHost().WithHdd("naa.2").Edit([](HostDescription& host) {
    host.faults = {
        {.operation = "QueryDisks", .exception = "HostCtlException", .message = "asked", .disk = {}}};
  }));
  EXPECT_EQ(VerdictOnWholeGroups({"naa.2"}), "let in");
}

TEST_F(GateWithHost, RefusesWhatItCannotFindOut) {
  for (const char* operation : {"QueryDisks", "GetDiskMappings"}) {
    Serve(AHost()
              .WithSsd("naa.1")
              .WithHdd("naa.2")
              .WithUnmountedGroup("naa.1", {"naa.2"})
              .Edit([operation](HostDescription& host) {
                host.faults = {{.operation = operation,
                                .exception = "HostCtlException",
                                .message = "the kernel is busy",
                                .disk = {}}};
              }));
    EXPECT_THAT(VerdictOnWholeGroups({"naa.1"}), HasSubstr("the kernel is busy")) << operation;
  }
}

TEST(GateForChanges, RefusesATextThatIsNoChangeWhateverTheHost) {
  const Machines::SimulatedMachine machine(Machines::MachineOptions{});
  EXPECT_EQ(VerdictOn([&] { CheckHostChange(machine, R"({"disk": {"name": "nobody"}})"); }), "let in");
  EXPECT_EQ(VerdictOn([&] { CheckHostChange(machine, "[]"); }), "document | document: must be an object");
}

TEST(GateForChanges, NamesThePathThatTheErrorBeginsWith) {
  EXPECT_EQ(VerdictOn([] { RefuseChange("disks[1].ssd: must be true or false"); }),
            "disks[1].ssd | disks[1].ssd: must be true or false");
  EXPECT_EQ(VerdictOn([] { RefuseChange("no path"); }), "no path | no path");
}

}  // namespace
}  // namespace Host::Gate
