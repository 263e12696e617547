#include "agentd/routes/RequestReader.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "host/testing/RequestInALine.h"
#include "orbis/ParseException.h"

namespace Agentd {
namespace {

using testing::AllOf;
using testing::HasSubstr;

// The operation that the body comes to, in a line.
std::string Asked(const std::string& operation, const std::string& body) {
  return Host::Testing::InALine(*ReadJsonRequest(*Nox::FindOperation(operation), body));
}

std::string WhyNot(const std::string& operation, const std::string& body) {
  try {
    ReadJsonRequest(*Nox::FindOperation(operation), body);
    return "read";
  } catch (const Orbis::ParseException& refused) {
    return refused.GetPath() + ": " + refused.GetReason();
  }
}

struct Row {
  const char* operation;
  const char* body;
  const char* asked;
};

class Requests : public testing::TestWithParam<Row> {};

TEST_P(Requests, ComeToTheirOperationWithAllTheirArguments) {
  EXPECT_EQ(Asked(GetParam().operation, GetParam().body), GetParam().asked);
}

INSTANTIATE_TEST_SUITE_P(
    Operations, Requests,
    testing::Values(
        Row{"QueryDisksForKova", R"({"names": ["naa.1", "naa.2"]})", "QueryDisksForKova naa.1 naa.2"},
        Row{"QueryDisksForKova", "{}", "QueryDisksForKova"}, Row{"GetStorageInfo", "{}", "GetStorageInfo"},
        Row{"GetDiskGroups", "{}", "GetDiskGroups"}, Row{"GetConfigInfo", "{}", "GetConfigInfo"},
        Row{"AddDisks",
            R"({"disks": ["naa.1", {"canonicalName": "naa.2", "ssd": true},
                          {"@type": "HostScsiDisk", "canonicalName": "naa.3"}]})",
            "AddDisks naa.1? naa.2! naa.3?"},
        Row{"AddDisks", R"({"disks": []})", "AddDisks"},
        Row{"AddAllEligibleDisks", "{}", "AddAllEligibleDisks"},
        Row{"InitializeDisks",
            R"({"mappings": [{"ssd": "naa.1", "nonSsd": ["naa.2", {"canonicalName": "naa.3", "ssd": false}]},
                             {"@type": "KovaHostDiskMapping", "nonSsd": [], "ssd": {"canonicalName": "naa.4"}},
                             {"ssd": "naa.5"}]})",
            "InitializeDisks naa.1? < naa.2? naa.3 > naa.4? < > naa.5? < >"},
        Row{"UnmountDiskMapping", R"({"mappings": [{"ssd": "naa.1", "nonSsd": ["naa.2"]}]})",
            "UnmountDiskMapping naa.1? < naa.2? >"},
        Row{"RemoveDisk",
            R"({"disk": "naa.1", "passThrough": "p", "optionText": "o", "optionFirst": -1, "optionSecond": 2})",
            "RemoveDisk naa.1 p o -1 2"},
        Row{"RemoveDisk", R"({"disk": "naa.1"})", "RemoveDisk naa.1   0 0"},
        Row{"RemoveDiskMapping",
            R"({"mapping": {"ssd": "naa.1", "nonSsd": ["naa.2"]}, "passThrough": "p", "optionFirst": 2147483647})",
            "RemoveDiskMapping naa.1? < naa.2? > p  2147483647 0"},
        Row{"ClaimUnmountedDiskgroup", "{}", "ClaimUnmountedDiskgroup"}),
    [](const auto& row) { return row.param.operation + std::to_string(row.index); });

TEST(Requests, OfEveryOperationCanBeRead) {
  for (const Nox::OperationDescriptor& operation : Nox::Operations()) {
    bool needsNothing = true;
    for (const Orbis::FieldDescriptor* parameter : operation.request.fields) {
      const bool isList = parameter->presence == Orbis::Presence::List;
      needsNothing = needsNothing &&
                     (parameter->presence == Orbis::Presence::Optional || (isList && !operation.changes));
      const std::string name(parameter->name);
      EXPECT_THAT(WhyNot(std::string(operation.name), "{\"" + name + "\": null}"),
                  testing::AnyOf(HasSubstr(name + ": wanted"), HasSubstr(": is missing")));
    }
    EXPECT_EQ(WhyNot(std::string(operation.name), "{}") == "read", needsNothing) << operation.name;
  }
}

TEST(Requests, ThatChangeDisksTakeALabelAndWhetherToWait) {
  for (const Nox::OperationDescriptor& operation : Nox::Operations()) {
    const std::string name(operation.name);
    for (const std::string key : {"label", "wait"}) {
      const std::string told = WhyNot(name, "{\"" + key + "\": null}");
      const std::string unknown = key + ": unknown parameter";
      EXPECT_EQ(told.rfind(unknown, 0) == 0, !operation.changes) << name << ": " << told;
    }
  }
  const RequestRef request =
      ReadJsonRequest(*Nox::FindOperation("AddAllEligibleDisks"), R"({"label": "rack 3", "wait": false})");
  const auto& change = dynamic_cast<const Nox::Operation::Change&>(*request);
  EXPECT_EQ(change.GetLabel(), "rack 3");
  EXPECT_FALSE(change.GetWait());
}

TEST(Requests, TakeTheLongestLabelAndNoLongerOne) {
  const auto labelled = [](const std::string& label) { return "{\"label\": \"" + label + "\"}"; };
  EXPECT_EQ(WhyNot("AddAllEligibleDisks", labelled(std::string(longestLabel, 'l'))), "read");
  EXPECT_THAT(WhyNot("AddAllEligibleDisks", labelled(std::string(longestLabel + 1, 'l'))),
              HasSubstr("label: a label of more than 256 bytes"));
  EXPECT_THAT(WhyNot("AddAllEligibleDisks", labelled("a\\nb")), HasSubstr("control characters"));
}

TEST(Requests, WithAnUnknownParameterAreToldTheKnownOnes) {
  EXPECT_EQ(WhyNot("RemoveDisk", R"({"disks": "naa.1"})"),
            "disks: unknown parameter; RemoveDisk takes disk, passThrough, optionText, optionFirst, "
            "optionSecond, label, wait");
  EXPECT_EQ(WhyNot("GetConfigInfo", R"({"names": []})"),
            "names: unknown parameter; GetConfigInfo takes no parameters");
}

struct Broken {
  const char* operation;
  std::string body;
  const char* told;
};

class BrokenRequests : public testing::TestWithParam<Broken> {};

TEST_P(BrokenRequests, AreRefusedAtTheirPlace) {
  EXPECT_THAT(WhyNot(GetParam().operation, GetParam().body), testing::StartsWith(GetParam().told));
}

INSTANTIATE_TEST_SUITE_P(
    Bodies, BrokenRequests,
    testing::Values(
        Broken{"AddDisks", "{}", "disks: is missing"}, Broken{"RemoveDisk", "{}", "disk: is missing"},
        Broken{"RemoveDiskMapping", "{}", "mapping: is missing"},
        Broken{"InitializeDisks", "{}", "mappings: is missing"},
        Broken{"AddDisks", "[]", "(root): wanted an object"},
        Broken{"AddDisks", R"({"disks": "naa.1"})", "disks: wanted an array"},
        Broken{"AddDisks", R"({"disks": ["naa.1", null]})", "disks[1]: wanted an object or its name"},
        Broken{"AddDisks", R"({"disks": [1]})", "disks[0]: wanted an object or its name"},
        Broken{"AddDisks", R"({"disks": [{"canonicalName": 1}]})", "disks[0].canonicalName: "},
        Broken{"AddDisks", R"({"disks": [{"colour": "red"}]})", "disks[0].colour: "},
        Broken{"AddDisks", R"({"disks": [{"@type": "KovaHostDiskMapping"}]})", "disks[0]"},
        Broken{"InitializeDisks", R"({"mappings": {}})", "mappings: wanted an array"},
        Broken{"InitializeDisks", R"({"mappings": ["naa.1"]})", "mappings[0]: wanted an object"},
        Broken{"InitializeDisks", R"({"mappings": [{"nonSsd": ["naa.1"]}]})",
               "mappings[0]: required field 'ssd' is missing"},
        Broken{"InitializeDisks", R"({"mappings": [{"ssd": ["naa.1"]}]})",
               "mappings[0].ssd: wanted an object or its name"},
        Broken{"InitializeDisks", R"({"mappings": [{"ssd": "a", "nonSsd": "b"}]})", "mappings[0].nonSsd: "},
        Broken{"InitializeDisks", R"({"mappings": [{"ssd": "a", "nonSsd": [[]]}]})",
               "mappings[0].nonSsd[0]: wanted an object or its name"},
        Broken{"InitializeDisks", R"({"mappings": [{"ssd": "a", "hdd": []}]})", "mappings[0].hdd: "},
        Broken{"InitializeDisks", R"({"mappings": [{"ssd": "a", "@type": "HostScsiDisk"}]})",
               "mappings[0].@type: "},
        Broken{"RemoveDisk", R"({"disk": {"canonicalName": "naa.1"}})", "disk: wanted "},
        Broken{"RemoveDisk", R"({"disk": "a", "optionFirst": 2147483648})", "optionFirst: wanted "},
        Broken{"RemoveDisk", R"({"disk": "a", "optionSecond": -2147483649})", "optionSecond: wanted "},
        Broken{"RemoveDisk", R"({"disk": "a", "optionFirst": 1.5})", "optionFirst: wanted "},
        Broken{"RemoveDisk", R"({"disk": "a", "optionText": 1})", "optionText: wanted "},
        Broken{"RemoveDisk", R"({"disk": "a", "wait": 1})", "wait: wanted "},
        Broken{"RemoveDisk", R"({"disk": "a", "label": 1})", "label: wanted "}));

}  // namespace
}  // namespace Agentd
