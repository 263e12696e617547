#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <nlohmann/json.hpp>

#include "otxctl/sim/HostBuilder.h"
#include "otxctl/sim/HostDescription.h"

namespace OtxCtl::Sim {
namespace {

using nlohmann::json;
using testing::StartsWith;

HostDescription ThreeDisks() {
  return AHost().WithSsd("naa.1").WithHdds({"naa.2", "naa.3"}).WithGroup("naa.1", {"naa.2"}).Build();
}

HostDescription Changed(const char* set, const char* disk) {
  HostDescription host = ThreeDisks();
  ApplyChange(host, json::parse(set), json::parse(disk));
  return host;
}

// The error, after making sure that the host was left alone.
std::string ErrorOf(const char* set, const char* disk) {
  HostDescription host = ThreeDisks();
  try {
    ApplyChange(host, json::parse(set), json::parse(disk));
  } catch (const HostDescriptionError& error) {
    EXPECT_EQ(host, ThreeDisks());
    return error.what();
  }
  return "accepted";
}

TEST(HostChange, NothingGivenChangesNothing) {
  EXPECT_EQ(Changed("null", "null"), ThreeDisks());
  EXPECT_EQ(Changed("{}", "null"), ThreeDisks());
  EXPECT_EQ(Changed("null", R"({"name": "naa.2"})"), ThreeDisks());
}

TEST(HostChange, SetReplacesWholeTopLevelKeys) {
  HostDescription expected = ThreeDisks();
  expected.autoMode = true;
  expected.cluster.nodeUuid = "n";
  expected.groups.clear();
  HostDescription host = ThreeDisks();
  host.cluster.enabled = true;
  ApplyChange(host, json::parse(R"({"autoMode": true, "cluster": {"nodeUuid": "n"}, "groups": []})"),
              nullptr);
  EXPECT_EQ(host, expected);
}

TEST(HostChange, ADiskKeepsTheKeysThatAreNotNamed) {
  HostDescription expected = ThreeDisks();
  expected.disks[1].absent = true;
  expected.disks[1].partitions = 2;
  EXPECT_EQ(Changed("null", R"({"name": "naa.2", "absent": true, "partitions": 2})"), expected);
}

TEST(HostChange, AVerdictComesAndGoes) {
  HostDescription host = ThreeDisks();
  ApplyChange(host, nullptr, json::parse(R"({"name": "naa.3", "verdict": {"state": 2, "reason": 4}})"));
  EXPECT_EQ(host.disks[2].verdict, (HostVerdict{2, 4}));
  ApplyChange(host, nullptr, json::parse(R"({"name": "naa.3", "verdict": null})"));
  EXPECT_EQ(host, ThreeDisks());
}

TEST(HostChange, SetComesBeforeTheDisk) {
  const HostDescription host =
      Changed(R"({"disks": [{"name": "naa.9", "ssd": true, "bytes": 5}], "groups": []})",
              R"({"name": "naa.9", "absent": true})");
  ASSERT_EQ(host.disks.size(), 1U);
  EXPECT_TRUE(host.disks[0].absent);
}

TEST(HostChange, AWrongChangeIsRefusedLikeAFileAndChangesNothing) {
  EXPECT_THAT(ErrorOf(R"({"colour": 1})", "null"), StartsWith("colour: "));
  EXPECT_THAT(ErrorOf(R"({"autoMode": 1})", "null"), StartsWith("autoMode: "));
  EXPECT_THAT(ErrorOf(R"({"autoMode": true})", R"({"name": "naa.2", "ssd": 1})"),
              StartsWith("disks[1].ssd: "));
  EXPECT_THAT(ErrorOf(R"({"autoMode": true})", R"({"name": "naa.2", "colour": 1})"),
              StartsWith("disks[1].colour: "));
  EXPECT_THAT(ErrorOf("null", R"({"name": "naa.2", "transport": null})"), StartsWith("disks[1].transport: "));
  EXPECT_THAT(ErrorOf("null", R"({"name": "naa.9", "absent": true})"), StartsWith("disk.name: "));
  EXPECT_THAT(ErrorOf("null", R"({"absent": true})"), StartsWith("disk.name: "));
  EXPECT_THAT(ErrorOf("null", R"({"name": 1})"), StartsWith("disk.name: "));
  EXPECT_THAT(ErrorOf("[]", "null"), StartsWith("set: "));
  EXPECT_THAT(ErrorOf("null", "1"), StartsWith("disk: "));
  EXPECT_THAT(ErrorOf(R"({"disks": []})", "null"), StartsWith("groups[0].ssd: "));
  EXPECT_THAT(ErrorOf(R"({"disks": 1})", R"({"name": "naa.1"})"), StartsWith("disk.name: "));
}

TEST(HostChange, AWholeChangeIsOneText) {
  HostDescription host = ThreeDisks();
  ApplyChange(host, R"({"disk": {"name": "naa.2", "absent": true}, "set": {"autoMode": true}})");
  EXPECT_TRUE(host.autoMode);
  EXPECT_TRUE(host.disks[1].absent);
  const HostDescription changed = host;
  ApplyChange(host, "{}");
  ApplyChange(host, R"({"set": null, "disk": null})");
  EXPECT_EQ(host, changed);
}

TEST(HostChange, ATextThatIsNoChangeIsRefusedAndChangesNothing) {
  const auto errorOf = [](std::string_view change) -> std::string {
    HostDescription host = ThreeDisks();
    try {
      ApplyChange(host, change);
    } catch (const HostDescriptionError& error) {
      EXPECT_EQ(host, ThreeDisks());
      return error.what();
    }
    return "accepted";
  };
  EXPECT_THAT(errorOf("{"), StartsWith("line 1"));
  EXPECT_THAT(errorOf("[]"), StartsWith("document: "));
  EXPECT_THAT(errorOf(R"({"autoMode": true})"), StartsWith("autoMode: is no known key"));
  EXPECT_THAT(errorOf(R"({"set": {"autoMode": true}, "disk": {"name": "naa.9"}})"),
              StartsWith("disk.name: "));
  EXPECT_THAT(errorOf(R"({"set": {}, "set": {}})"), testing::HasSubstr("set"));
}

TEST(HostChange, ATextIsAChangeOrNotWhateverTheHost) {
  const auto errorOf = [](std::string_view change) -> std::string {
    try {
      CheckChange(change);
    } catch (const HostDescriptionError& error) {
      return error.what();
    }
    return "a change";
  };
  EXPECT_EQ(errorOf("{}"), "a change");
  EXPECT_EQ(errorOf(R"({"set": null, "disk": null})"), "a change");
  EXPECT_EQ(errorOf(R"({"set": {"no": 1}, "disk": {"name": "naa.9", "no": 1}})"), "a change");
  EXPECT_THAT(errorOf("{"), StartsWith("line 1"));
  EXPECT_THAT(errorOf("[]"), StartsWith("document: "));
  EXPECT_THAT(errorOf(R"({"": 1})"), StartsWith("'': is no known key"));
  EXPECT_THAT(errorOf(R"({"set": []})"), StartsWith("set: "));
  EXPECT_THAT(errorOf(R"({"disk": 1})"), StartsWith("disk: "));
  EXPECT_THAT(errorOf(R"({"disk": {}})"), StartsWith("disk.name: "));
  EXPECT_THAT(errorOf(R"({"disk": {"name": 1}})"), StartsWith("disk.name: "));
}

TEST(HostChange, TextsThatDidNotComeFromAFileAreCheckedToo) {
  HostDescription host = ThreeDisks();
  EXPECT_THROW(ApplyChange(host, json{{"faultDomain", "\xFF"}}, nullptr), HostDescriptionError);
  EXPECT_THROW(ApplyChange(host, json{{"faultDomain", "a\nb"}}, nullptr), HostDescriptionError);
  EXPECT_EQ(host, ThreeDisks());
}

}  // namespace
}  // namespace OtxCtl::Sim
