#include "otxctl/sim/HostDescription.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <random>

#include "otxctl/sim/HostBuilder.h"
#include "tessa/text/Escape.h"
#include "tests/support/Seed.h"

namespace OtxCtl::Sim {
namespace {

using testing::StartsWith;

std::string ErrorOf(std::string_view text) {
  try {
    ParseHostDescription(text);
  } catch (const HostDescriptionError& error) {
    EXPECT_TRUE(Tessa::IsPrintable(error.what())) << error.what();
    return error.what();
  }
  return "accepted";
}

// A description in which every key has a value that is not its default.
const char* const everything = R"({
  "name": "host-a", "autoMode": true, "minimumDiskBytes": 1073741824, "storageSystem": "missing",
  "cluster": {"enabled": true, "clusterUuid": "c", "nodeUuid": "n"},
  "faultDomain": "rack-1",
  "networks": [{"interface": "otx1", "masterMulticastGroup": "224.1.2.3",
                "agentMulticastGroup": "FF19:0:0:0:0:2:3:4"}],
  "disks": [
    {"name": "naa.1", "ssd": true, "capacityFlash": true, "bytes": 4000787030016, "blockSize": 4096,
     "transport": "sas", "local": false, "partitions": 3, "vendor": "LAB", "model": "M", "serial": "S",
     "displayName": "D", "durableName": {"authority": "a", "identifier": "i"},
     "alternateName": [{"authority": "b", "identifier": "j"}, {}], "standardInquiry": "AAEC",
     "kovaUuid": "u", "formatVersion": 255, "absent": true, "inInventory": false, "inKernel": false,
     "verdict": {"state": -2147483648, "reason": 2147483647}},
    {"name": "naa.2", "ssd": false, "bytes": 0}],
  "otherLuns": ["tape", null, "enclosure"],
  "groups": [{"ssd": "naa.1", "capacity": ["naa.2"], "allFlash": true, "mounted": false, "formatVersion": 5,
              "busy": true}],
  "faults": [{"operation": "FormatDiskMapping", "call": 2, "exception": "KovaExceptionHasPartition",
              "message": "text", "disk": "naa.x", "delayMs": 7}]
})";

TEST(HostDescription, ReadsEveryKey) {
  const HostDescription host = ParseHostDescription(everything);
  EXPECT_EQ(host.name, "host-a");
  EXPECT_TRUE(host.autoMode);
  EXPECT_EQ(host.minimumDiskBytes, 1073741824);
  EXPECT_EQ(host.storageSystem, StorageSystem::Missing);
  EXPECT_EQ(host.cluster, (HostCluster{true, "c", "n"}));
  EXPECT_EQ(host.faultDomain, "rack-1");
  EXPECT_EQ(host.networks, (std::vector<HostNetwork>{{"otx1", "224.1.2.3", "FF19:0:0:0:0:2:3:4"}}));
  EXPECT_EQ(host.otherLuns, (std::vector<std::optional<std::string>>{"tape", std::nullopt, "enclosure"}));
  EXPECT_EQ(host.groups, (std::vector<HostGroup>{{"naa.1", {"naa.2"}, true, false, 5, true}}));
  EXPECT_EQ(host.faults, (std::vector<Fault::FaultRule>{
                             {"FormatDiskMapping", 2, "KovaExceptionHasPartition", "text", "naa.x", 7}}));
}

TEST(HostDescription, ReadsEveryKeyOfADisk) {
  const HostDisk disk = ParseHostDescription(everything).disks.at(0);
  EXPECT_EQ(disk.name, "naa.1");
  EXPECT_TRUE(disk.ssd);
  EXPECT_TRUE(disk.capacityFlash);
  EXPECT_EQ(disk.bytes, 4000787030016);
  EXPECT_EQ(disk.blockSize, 4096);
  EXPECT_EQ(disk.transport, "sas");
  EXPECT_FALSE(disk.local);
  EXPECT_EQ(disk.partitions, 3);
  EXPECT_EQ(disk.vendor + disk.model + disk.serial + disk.displayName, "LABMSD");
  EXPECT_EQ(disk.durableName, (DurableName{"a", "i"}));
  EXPECT_EQ(disk.alternateName, (std::vector<DurableName>{{"b", "j"}, {"", ""}}));
  EXPECT_EQ(disk.standardInquiry, (std::vector<std::uint8_t>{0, 1, 2}));
  EXPECT_EQ(disk.kovaUuid, "u");
  EXPECT_EQ(disk.formatVersion, 255);
  EXPECT_TRUE(disk.absent);
  EXPECT_FALSE(disk.inInventory);
  EXPECT_FALSE(disk.inKernel);
  EXPECT_EQ(disk.verdict, (HostVerdict{INT32_MIN, INT32_MAX}));
}

TEST(HostDescription, HasTheDocumentedDefaults) {
  const HostDescription host = ParseHostDescription(
      R"({"disks": [{"name": "naa.1", "ssd": false, "bytes": 1}], "groups": [{"ssd": "naa.1"}],
          "faults": [{"operation": "QueryDisks"}]})");
  EXPECT_EQ(host.name, "");
  EXPECT_FALSE(host.autoMode);
  EXPECT_EQ(host.minimumDiskBytes, 0);
  EXPECT_EQ(host.storageSystem, StorageSystem::Present);
  EXPECT_EQ(host.cluster, (HostCluster{false, "", ""}));
  const HostDisk& disk = host.disks.at(0);
  EXPECT_EQ(disk.blockSize, 512);
  EXPECT_FALSE(disk.transport);
  EXPECT_TRUE(disk.local && disk.inInventory && disk.inKernel);
  EXPECT_FALSE(disk.absent || disk.capacityFlash || disk.verdict || disk.durableName || disk.standardInquiry);
  EXPECT_EQ(disk.kovaUuid, "");
  EXPECT_EQ(disk.formatVersion, 0);
  EXPECT_EQ(host.groups.at(0), (HostGroup{"naa.1", {}, false, true, 3, false}));
  EXPECT_EQ(host.faults.at(0), (Fault::FaultRule{"QueryDisks", 0, "", "", "", 0}));
}

TEST(HostDescription, AnEmptyObjectIsAHostWithoutAnything) {
  EXPECT_EQ(ParseHostDescription("{}"), HostDescription());
}

TEST(HostDescription, WrittenAndReadAgainIsTheSame) {
  const HostDescription host = ParseHostDescription(everything);
  EXPECT_EQ(ParseHostDescription(WriteHostDescription(host)), host);
  EXPECT_EQ(ParseHostDescription(WriteHostDescription(HostDescription())), HostDescription());
}

TEST(HostDescription, AnEmptyValueIsNotAnUnsetOne) {
  const HostDescription host = ParseHostDescription(
      R"({"disks": [{"name": "naa.1", "ssd": false, "bytes": 1, "transport": "", "standardInquiry": "",
                     "durableName": {}}]})");
  EXPECT_EQ(host.disks[0].transport, "");
  EXPECT_TRUE(host.disks[0].standardInquiry && host.disks[0].durableName);
  EXPECT_EQ(ParseHostDescription(WriteHostDescription(host)), host);
}

TEST(HostDescription, NothingIsWrittenThatIsNoUtf8) {
  HostDescription host;
  host.name = "\xFF";
  EXPECT_THROW(WriteHostDescription(host), HostDescriptionError);
}

// Random hosts, so that no key is forgotten by one of the two directions.
TEST(HostDescription, RandomHostsSurviveTheRoundTrip) {
  const TestSupport::Seed seed;
  std::mt19937 random(seed.Value());
  const auto pick = [&random](int limit) { return std::uniform_int_distribution<int>(0, limit)(random); };
  for (int round = 0; round < 100; ++round) {
    HostBuilder builder;
    const int count = 1 + pick(12);
    for (int number = 0; number < count; ++number) {
      builder.WithDisk("naa." + std::to_string(number), pick(1) == 1, [&](HostDisk& disk) {
        disk.bytes = pick(1000000);
        disk.local = pick(1) == 1;
        disk.partitions = pick(3);
        disk.formatVersion = static_cast<std::uint8_t>(pick(255));
        disk.serial = std::string(static_cast<std::size_t>(pick(5)), 'S');
        if (pick(2) == 0) {
          disk.verdict = HostVerdict{pick(5) - 2, pick(9)};
        }
        if (pick(2) == 0) {
          disk.standardInquiry.emplace(static_cast<std::size_t>(pick(40)),
                                       static_cast<std::uint8_t>(pick(255)));
        }
      });
    }
    if (count > 2) {
      builder.WithGroup("naa.0", {"naa.2", "naa.1"}, [&](HostGroup& group) { group.mounted = pick(1) == 1; });
    }
    const HostDescription host = builder.Build();
    ASSERT_EQ(ParseHostDescription(WriteHostDescription(host)), host) << "round " << round;
  }
}

struct BadRow {
  const char* title;
  std::string text;
  const char* start;
};

void PrintTo(const BadRow& row, std::ostream* out) {
  *out << row.title;
}

std::string DiskWith(const std::string& keys) {
  return R"({"disks": [{"name": "naa.0", "ssd": true, "bytes": 1}, {"name": "naa.1", "ssd": true, "bytes": 1, )" +
         keys + "}]}";
}

std::string GroupsOf(const std::string& groups) {
  return R"({"disks": [{"name": "a", "ssd": true, "bytes": 1}, {"name": "b", "ssd": false, "bytes": 1},
             {"name": "c", "ssd": false, "bytes": 1}], "groups": [)" +
         groups + "]}";
}

std::string FaultOf(const std::string& keys) {
  return R"({"faults": [{)" + keys + "}]}";
}

// Two faults of one operation.
std::string FaultsOf(int oneDelay, int otherDelay) {
  return R"({"faults": [{"operation": "QueryDisks", "call": 1, "delayMs": )" + std::to_string(oneDelay) +
         R"(}, {"operation": "QueryDisks", "delayMs": )" + std::to_string(otherDelay) + "}]}";
}

class BadHostDescription : public testing::TestWithParam<BadRow> {};

TEST_P(BadHostDescription, IsRefusedWithItsPath) {
  EXPECT_THAT(ErrorOf(GetParam().text), StartsWith(std::string(GetParam().start) + ": "));
}

const BadRow badRows[] = {
    {"NotAnObject", "[]", "document"},
    {"EmptyText", "", "line 1, column 1"},
    {"CutOff", R"({"name": "a)", "line 1, column 12"},
    {"UnknownKey", R"({"colour": 1})", "colour"},
    {"EmptyKey", R"({"": 1})", "\"\""},
    {"DuplicateKey", R"({"name": "a", "name": "a"})", "name"},
    {"DuplicateKeyOfADisk", DiskWith(R"("ssd": true)"), "disks[1].ssd"},
    {"WrongTypeOfName", R"({"name": 3})", "name"},
    {"WrongTypeOfAutoMode", R"({"autoMode": 1})", "autoMode"},
    {"NegativeMinimum", R"({"minimumDiskBytes": -1})", "minimumDiskBytes"},
    {"BrokenMinimum", R"({"minimumDiskBytes": 1.5})", "minimumDiskBytes"},
    {"WholeNumberWithPoint", R"({"minimumDiskBytes": 1.0})", "minimumDiskBytes"},
    {"HugeMinimum", R"({"minimumDiskBytes": 9223372036854775808})", "minimumDiskBytes"},
    {"WrongStorageSystem", R"({"storageSystem": "gone"})", "storageSystem"},
    {"ClusterNoObject", R"({"cluster": []})", "cluster"},
    {"UnknownClusterKey", R"({"cluster": {"uuid": ""}})", "cluster.uuid"},
    {"ControlCharacter", R"({"faultDomain": "a\nb"})", "faultDomain"},
    {"EscapeCharacter", R"({"faultDomain": "\u001b"})", "faultDomain"},
    {"NulCharacter", R"({"faultDomain": "\u0000"})", "faultDomain"},
    {"InvalidUtf8", "{\"faultDomain\": \"\xFF\"}", "line 1, column 18"},
    {"NetworksNoList", R"({"networks": {}})", "networks"},
    {"WrongAddress", R"({"networks": [{"interface": "o", "masterMulticastGroup": 1}]})",
     "networks[0].masterMulticastGroup"},
    {"DisksNull", R"({"disks": null})", "disks"},
    {"DiskNoObject", R"({"disks": ["naa.1"]})", "disks[0]"},
    {"DiskWithoutName", R"({"disks": [{"ssd": true, "bytes": 1}]})", "disks[0].name"},
    {"DiskWithoutSsd", R"({"disks": [{"name": "a", "bytes": 1}]})", "disks[0].ssd"},
    {"DiskWithoutBytes", R"({"disks": [{"name": "a", "ssd": true}]})", "disks[0].bytes"},
    {"DiskWithEmptyName", R"({"disks": [{"name": "", "ssd": true, "bytes": 1}]})", "disks[0].name"},
    {"DiskWithNegativeBytes", R"({"disks": [{"name": "a", "ssd": true, "bytes": -1}]})", "disks[0].bytes"},
    {"DiskWithTextForSsd", R"({"disks": [{"name": "a", "ssd": "true", "bytes": 1}]})", "disks[0].ssd"},
    {"DuplicateDiskName",
     R"({"disks": [{"name": "a", "ssd": true, "bytes": 1}, {"name": "a", "ssd": true, "bytes": 1}]})",
     "disks[1].name"},
    {"ZeroBlockSize", DiskWith(R"("blockSize": 0)"), "disks[1].blockSize"},
    {"HugeBlockSize", DiskWith(R"("blockSize": 2147483648)"), "disks[1].blockSize"},
    {"NegativePartitions", DiskWith(R"("partitions": -1)"), "disks[1].partitions"},
    {"NullTransport", DiskWith(R"("transport": null)"), "disks[1].transport"},
    {"LargeFormatVersion", DiskWith(R"("formatVersion": 256)"), "disks[1].formatVersion"},
    {"NegativeFormatVersion", DiskWith(R"("formatVersion": -1)"), "disks[1].formatVersion"},
    {"LargeVerdict", DiskWith(R"("verdict": {"state": 2147483648})"), "disks[1].verdict.state"},
    {"SmallVerdict", DiskWith(R"("verdict": {"reason": -2147483649})"), "disks[1].verdict.reason"},
    {"VerdictNoObject", DiskWith(R"("verdict": 1)"), "disks[1].verdict"},
    {"UnknownVerdictKey", DiskWith(R"("verdict": {"why": 1})"), "disks[1].verdict.why"},
    {"DurableNameNoObject", DiskWith(R"("durableName": "a")"), "disks[1].durableName"},
    {"DurableNameNull", DiskWith(R"("durableName": null)"), "disks[1].durableName"},
    {"UnknownDurableNameKey", DiskWith(R"("durableName": {"id": "a"})"), "disks[1].durableName.id"},
    {"AlternateNameNoList", DiskWith(R"("alternateName": {})"), "disks[1].alternateName"},
    {"AlternateNameOfTexts", DiskWith(R"("alternateName": [{}, "a"])"), "disks[1].alternateName[1]"},
    {"InquiryNoBase64", DiskWith(R"("standardInquiry": "AAE")"), "disks[1].standardInquiry"},
    {"InquiryNoText", DiskWith(R"("standardInquiry": [0])"), "disks[1].standardInquiry"},
    {"UnknownLun", R"({"otherLuns": ["tape", "toaster"]})", "otherLuns[1]"},
    {"EmptyLun", R"({"otherLuns": [""]})", "otherLuns[0]"},
    {"NumberForLun", R"({"otherLuns": [null, 1]})", "otherLuns[1]"},
    {"GroupWithoutSsd", GroupsOf("{}"), "groups[0].ssd"},
    {"GroupWithEmptySsd", GroupsOf(R"({"ssd": ""})"), "groups[0].ssd"},
    {"GroupWithEmptyMember", GroupsOf(R"({"ssd": "a", "capacity": [""]})"), "groups[0].capacity[0]"},
    {"GroupOfUnknownSsd", GroupsOf(R"({"ssd": "x"})"), "groups[0].ssd"},
    {"GroupOfUnknownMember", GroupsOf(R"({"ssd": "a", "capacity": ["b", "x"]})"), "groups[0].capacity[1]"},
    {"MemberTwice", GroupsOf(R"({"ssd": "a", "capacity": ["b", "b"]})"), "groups[0].capacity[1]"},
    {"SsdAsMember", GroupsOf(R"({"ssd": "a", "capacity": ["a"]})"), "groups[0].capacity[0]"},
    {"MemberOfTwoGroups", GroupsOf(R"({"ssd": "a", "capacity": ["b"]}, {"ssd": "c", "capacity": ["b"]})"),
     "groups[1].capacity[0]"},
    {"SsdOfTwoGroups", GroupsOf(R"({"ssd": "a"}, {"ssd": "a"})"), "groups[1].ssd"},
    {"LargeGroupFormat", GroupsOf(R"({"ssd": "a", "formatVersion": 256})"), "groups[0].formatVersion"},
    {"FaultWithoutOperation", FaultOf(R"("call": 1)"), "faults[0].operation"},
    {"FaultOfUnknownOperation", FaultOf(R"("operation": "Format")"), "faults[0].operation"},
    {"FaultOfUnknownException", FaultOf(R"("operation": "QueryDisks", "exception": "Oops")"),
     "faults[0].exception"},
    {"NegativeCall", FaultOf(R"("operation": "QueryDisks", "call": -1)"), "faults[0].call"},
    {"NegativeDelay", FaultOf(R"("operation": "QueryDisks", "delayMs": -1)"), "faults[0].delayMs"},
    {"EndlessDelay", FaultOf(R"("operation": "QueryDisks", "delayMs": 600001)"), "faults[0].delayMs"},
    {"EndlessDelays", FaultsOf(300'000, 300'001), "faults[1].delayMs"},
    {"DeepNesting", std::string(100000, '['), "[0][0][0][0][0][0][0][0][0][0][0][0][0][0][0][0]"},
};

INSTANTIATE_TEST_SUITE_P(Each, BadHostDescription, testing::ValuesIn(badRows),
                         [](const auto& row) { return std::string(row.param.title); });

TEST(HostDescription, ADiskNameThatIsTakenNamesBothDisks) {
  EXPECT_EQ(
      ErrorOf(
          R"({"disks": [{"name": "a", "ssd": true, "bytes": 1}, {"name": "a", "ssd": true, "bytes": 1}]})"),
      "disks[1].name: \"a\" is the name of disks[0] already");
}

TEST(HostDescription, ADiskInTwoGroupsNamesBothPlaces) {
  EXPECT_EQ(ErrorOf(GroupsOf(R"({"ssd": "a", "capacity": ["b"]}, {"ssd": "b"})")),
            "groups[1].ssd: \"b\" is in use already by groups[0].capacity[0]");
}

TEST(HostDescription, EveryBoundHasAValidNeighbour) {
  for (const std::string& text : {
           DiskWith(
               R"("blockSize": 1, "formatVersion": 255, "verdict": {"state": 2147483647, "reason": -1})"),
           DiskWith(R"("blockSize": 2147483647, "partitions": 0, "verdict": null)"),
           std::string(R"({"minimumDiskBytes": 9223372036854775807, "otherLuns": []})"),
           FaultOf(R"("operation": "QueryDisks", "delayMs": 600000, "exception": "std::runtime_error")"),
           FaultsOf(300'000, 300'000),
           std::string(R"({"faults": [{"operation": "QueryDisks", "delayMs": 600000},
                                      {"operation": "RemoveDisk", "delayMs": 600000}]})"),
           GroupsOf(R"({"ssd": "c", "capacity": ["b", "a"], "formatVersion": 0})"),
       }) {
    EXPECT_EQ(ErrorOf(text), "accepted") << text;
  }
}

TEST(HostDescription, LongTextsAreBounded) {
  const std::string fits(64 * 1024, 'x');
  EXPECT_EQ(ErrorOf(R"({"name": ")" + fits + R"("})"), "accepted");
  EXPECT_THAT(ErrorOf(R"({"name": ")" + fits + R"(x"})"), StartsWith("name: "));
}

TEST(HostDescription, AFileCutOffAnywhereIsRefused) {
  const std::string whole = everything;
  for (std::size_t length = 0; length < whole.size(); ++length) {
    ASSERT_NE(ErrorOf(std::string_view(whole).substr(0, length)), "accepted") << length;
  }
}

TEST(HostDescription, AFileWithOneByteChangedNeverDoesWorseThanAnError) {
  const std::string whole = everything;
  for (std::size_t position = 0; position < whole.size(); ++position) {
    for (const char byte : {'\0', '"', '{', ']', '\xFF', '9'}) {
      std::string changed = whole;
      changed[position] = byte;
      ErrorOf(changed);
    }
  }
}

TEST(HostDescription, LoadsAHundredThousandDisks) {
  HostBuilder builder;
  for (int number = 0; number < 100'000; ++number) {
    builder.WithHdd("naa." + std::to_string(number));
  }
  const HostDescription host = builder.Build();
  EXPECT_EQ(ParseHostDescription(WriteHostDescription(host)).disks.size(), 100'000U);
}

}  // namespace
}  // namespace OtxCtl::Sim
