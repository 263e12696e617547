#include "kovactl/replay/ReplayRequest.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "nox/Host.h"
#include "nox/Kova.h"
#include "nox/Operations.h"
#include "orbis/ParseException.h"

namespace Kovactl {
namespace {

using Nox::Host::ScsiDisk;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;

namespace Op = Nox::Operation;

template <class Request>
const Request& Parameters(const ReplayRequest& request) {
  return dynamic_cast<const Request&>(*request.parameters);
}

bool IsByName(const ScsiDisk* disk) {
  return dynamic_cast<const NamedDisk*>(disk) != nullptr;
}

struct Hooked {
  const char* operation;
  const char* hook;
};

class EveryOperation : public testing::TestWithParam<Hooked> {};

TEST_P(EveryOperation, HasItsHookAndEmptyArgumentsWhereNoneAreGiven) {
  const auto request = ParseReplayRequest(R"({"operation": ")" + std::string(GetParam().operation) + R"("})");
  EXPECT_EQ(request.operation, GetParam().operation);
  EXPECT_EQ(request.hook == nullptr ? "" : request.hook->hook, GetParam().hook);
  const HookArguments& arguments = request.arguments;
  EXPECT_THAT(arguments.names, IsEmpty());
  EXPECT_THAT(arguments.texts, IsEmpty());
  EXPECT_EQ(arguments.disk + arguments.requestTag + arguments.passThrough + arguments.optionText, "");
  EXPECT_EQ(arguments.optionFirst, 0);
  EXPECT_EQ(arguments.optionSecond, 0);
  EXPECT_TRUE(request.hostSet.is_null());
  EXPECT_TRUE(request.hostDisk.is_null());
}

INSTANTIATE_TEST_SUITE_P(Operations, EveryOperation,
                         testing::Values(Hooked{"QueryDisksForKova", "QueryDisksForKovaHookFn"},
                                         Hooked{"AddDisks", "AddDisksHookFn"},
                                         Hooked{"InitializeDisks", "InitializeDisksHookFn"},
                                         Hooked{"RemoveDisk", "RemoveDisksHookFn"},
                                         Hooked{"RemoveDiskMapping", "RemoveDiskMappingHookFn"},
                                         Hooked{"UnmountDiskMapping", "UnmountDiskMappingHookFn"},
                                         Hooked{"AddAllEligibleDisks", "AddAllEligibleDisksHookFn"},
                                         Hooked{"GetStorageInfo", "GetStorageInfoHookFn"},
                                         Hooked{"GetConfigInfo", "GetConfigInfoHookFn"},
                                         Hooked{"ClaimUnmountedDiskgroup", "ClaimUnmountedDiskgroupHookFn"},
                                         Hooked{"host", ""}),
                         [](const auto& tested) { return std::string(tested.param.operation); });

TEST(EveryHook, CarriesOutAnOperationOfTheApi) {
  for (const HookCall& call : HookCalls()) {
    EXPECT_NE(Nox::FindOperation(call.operation), nullptr) << call.operation;
  }
}

TEST(ReplayRequest, ReadsNames) {
  const auto request = ParseReplayRequest(R"({"operation": "QueryDisksForKova", "names": ["naa.1", ""]})");
  EXPECT_THAT(request.arguments.names, ElementsAre("naa.1", ""));
}

TEST(ReplayRequest, ReadsDisksByNameAndInFull) {
  const auto request = ParseReplayRequest(
      R"({"operation": "AddDisks", "requestTag": "t1",
          "disks": ["naa.1", {"@type": "HostScsiDisk", "canonicalName": "naa.2", "ssd": true}, {}]})");
  EXPECT_EQ(request.arguments.requestTag, "t1");
  const auto& disks = *Parameters<Op::AddDisks>(request).GetDisks();
  ASSERT_EQ(disks.Size(), 3u);
  EXPECT_TRUE(IsByName(disks[0]));
  EXPECT_EQ(disks[0]->GetCanonicalName(), "naa.1");
  EXPECT_FALSE(IsByName(disks[1])) << "an object is taken as it is";
  EXPECT_EQ(disks[1]->GetCanonicalName(), "naa.2");
  EXPECT_TRUE(disks[1]->GetSsd());
  EXPECT_EQ(disks[1]->GetUuid(), "") << "a required field that is missing has its default";
  EXPECT_EQ(disks[1]->GetCapacity()->GetBlock(), 0);
  EXPECT_FALSE(disks[2]->HasCanonicalName());
}

TEST(ReplayRequest, ReadsMappings) {
  const auto request = ParseReplayRequest(
      R"({"operation": "InitializeDisks", "requestTag": "t2", "mappings": [
          {"ssd": "naa.1", "nonSsd": ["naa.2", {"canonicalName": "naa.3"}]},
          {"@type": "KovaHostDiskMapping", "ssd": {"ssd": true}}, {}]})");
  const auto& mappings = *Parameters<Op::InitializeDisks>(request).GetMappings();
  ASSERT_EQ(mappings.Size(), 3u);
  EXPECT_TRUE(IsByName(mappings[0]->GetSsd().Get()));
  ASSERT_EQ(mappings[0]->GetNonSsd()->Size(), 2u);
  EXPECT_TRUE(IsByName((*mappings[0]->GetNonSsd())[0]));
  EXPECT_EQ((*mappings[0]->GetNonSsd())[1]->GetCanonicalName(), "naa.3");
  EXPECT_TRUE(mappings[1]->GetSsd()->GetSsd());
  EXPECT_FALSE(mappings[1]->GetNonSsd());
  EXPECT_FALSE(mappings[2]->GetSsd()->HasCanonicalName());
}

TEST(ReplayRequest, ReadsTheMappingsOfAnUnmount) {
  const auto request = ParseReplayRequest(
      R"({"operation": "UnmountDiskMapping", "mappings": [{"ssd": "naa.1"}], "requestTag": "t3"})");
  EXPECT_EQ(Parameters<Op::UnmountDiskMapping>(request).GetMappings()->Size(), 1u);
  EXPECT_EQ(request.arguments.requestTag, "t3");
}

TEST(ReplayRequest, ReadsARemovalOfADiskWithItsOptions) {
  const auto request = ParseReplayRequest(
      R"({"operation": "RemoveDisk", "disk": "naa.2", "passThrough": "p", "optionText": "o",
          "optionFirst": 2147483647, "optionSecond": -2147483648})");
  const HookArguments& arguments = request.arguments;
  EXPECT_EQ(arguments.disk, "naa.2");
  EXPECT_EQ(arguments.passThrough, "p");
  EXPECT_EQ(arguments.optionText, "o");
  EXPECT_EQ(arguments.optionFirst, 2147483647);
  EXPECT_EQ(arguments.optionSecond, -2147483647 - 1);
}

TEST(ReplayRequest, ReadsARemovalOfAMapping) {
  const auto request = ParseReplayRequest(
      R"({"operation": "RemoveDiskMapping", "mapping": {"ssd": "naa.1", "nonSsd": []}, "passThrough": "p",
          "optionText": "o", "optionFirst": 1, "optionSecond": 2})");
  EXPECT_TRUE(IsByName(Parameters<Op::RemoveDiskMapping>(request).GetMapping()->GetSsd().Get()));
  EXPECT_EQ(request.arguments.passThrough, "p");
  EXPECT_EQ(request.arguments.optionSecond, 2);
}

TEST(ReplayRequest, OfARemovalWithoutAMappingHasNone) {
  const auto request = ParseReplayRequest(R"({"operation": "RemoveDiskMapping"})");
  EXPECT_FALSE(Parameters<Op::RemoveDiskMapping>(request).GetMapping());
}

TEST(ReplayRequest, ReadsARequestTagOfTheRequestThatHasNothingElse) {
  const auto request = ParseReplayRequest(R"({"operation": "AddAllEligibleDisks", "requestTag": "t4"})");
  EXPECT_EQ(request.arguments.requestTag, "t4");
}

TEST(ReplayRequest, LeavesRawTextsUntouched) {
  const auto request = ParseReplayRequest(
      R"({"operation": "raw", "hook": "AddDisksHookFn", "texts": ["<any text/>", "", "\u0000\n"], "requestTag": "t"})");
  EXPECT_EQ(request.operation, "raw");
  EXPECT_EQ(request.hook->hook, "AddDisksHookFn");
  EXPECT_THAT(request.arguments.texts, ElementsAre("<any text/>", "", std::string("\0\n", 2)));
  EXPECT_EQ(request.arguments.requestTag, "t");
}

TEST(ReplayRequest, ReadsTheOtherArgumentsOfARawRequest) {
  EXPECT_THAT(
      ParseReplayRequest(R"({"operation": "raw", "hook": "QueryDisksForKovaHookFn", "names": ["\n"]})")
          .arguments.names,
      ElementsAre("\n"));
  const auto removal = ParseReplayRequest(
      R"({"operation": "raw", "hook": "RemoveDisksHookFn", "disk": "", "passThrough": "p", "optionText": "o",
          "optionFirst": 1, "optionSecond": 2})");
  EXPECT_EQ(removal.arguments.disk, "");
  EXPECT_EQ(removal.arguments.optionFirst, 1);
}

TEST(ReplayRequest, ReadsAChangeOfTheHost) {
  const auto request = ParseReplayRequest(
      R"({"operation": "host", "set": {"autoMode": true}, "disk": {"name": "naa.2", "absent": true}})");
  EXPECT_EQ(request.hostSet, nlohmann::json::parse(R"({"autoMode": true})"));
  EXPECT_EQ(request.hostDisk, nlohmann::json::parse(R"({"name": "naa.2", "absent": true})"));
}

struct Refused {
  const char* line;
  const char* path;
};

class RefusedLine : public testing::TestWithParam<Refused> {};

TEST_P(RefusedLine, NamesThePlace) {
  try {
    ParseReplayRequest(GetParam().line);
    FAIL() << "it was taken";
  } catch (const Orbis::ParseException& refused) {
    EXPECT_EQ(refused.GetPath(), GetParam().path);
    EXPECT_NE(refused.GetReason(), "");
  }
}

INSTANTIATE_TEST_SUITE_P(
    Lines, RefusedLine,
    testing::Values(
        Refused{"[]", "(root)"}, Refused{"null", "(root)"}, Refused{"{}", "operation"},
        Refused{R"({"operation": 1})", "operation"}, Refused{R"({"operation": "Fly"})", "operation"},
        Refused{R"({"operation": "queryDisksForKova"})", "operation"},
        Refused{R"({"operation": "GetStorageInfo", "names": []})", "names"},
        Refused{R"({"operation": "GetDiskGroups"})", "operation"},
        Refused{R"({"operation": "AddDisks", "label": "a"})", "label"},
        Refused{R"({"operation": "AddDisks", "wait": true})", "wait"},
        Refused{R"({"operation": "AddDisks", "texts": []})", "texts"},
        Refused{R"({"operation": "QueryDisksForKova", "requestTag": "t"})", "requestTag"},
        Refused{R"({"operation": "QueryDisksForKova", "names": "naa.1"})", "names"},
        Refused{R"({"operation": "QueryDisksForKova", "names": ["a", null]})", "names[1]"},
        Refused{R"({"operation": "AddDisks", "disks": {}})", "disks"},
        Refused{R"({"operation": "AddDisks", "disks": [1]})", "disks[0]"},
        Refused{R"({"operation": "AddDisks", "disks": [{"sdd": true}]})", "disks[0].sdd"},
        Refused{R"({"operation": "AddDisks", "disks": [{"ssd": 1}]})", "disks[0].ssd"},
        Refused{R"({"operation": "AddDisks", "disks": [{"@type": "HostScsiLun"}]})", "disks[0].@type"},
        Refused{R"({"operation": "AddDisks", "requestTag": null})", "requestTag"},
        Refused{R"({"operation": "InitializeDisks", "mappings": ["naa.1"]})", "mappings[0]"},
        Refused{R"({"operation": "InitializeDisks", "mappings": [{"ssd": null}]})", "mappings[0].ssd"},
        Refused{R"({"operation": "InitializeDisks", "mappings": [{"hdd": []}]})", "mappings[0].hdd"},
        Refused{R"({"operation": "InitializeDisks", "mappings": [{"nonSsd": "a"}]})", "mappings[0].nonSsd"},
        Refused{R"({"operation": "InitializeDisks", "mappings": [{"nonSsd": [1]}]})",
                "mappings[0].nonSsd[0]"},
        Refused{R"({"operation": "InitializeDisks", "mappings": [{"@type": "HostScsiDisk"}]})",
                "mappings[0].@type"},
        Refused{R"({"operation": "RemoveDiskMapping", "mapping": []})", "mapping"},
        Refused{R"({"operation": "RemoveDisk", "disk": {"canonicalName": "a"}})", "disk"},
        Refused{R"({"operation": "RemoveDisk", "optionFirst": "1"})", "optionFirst"},
        Refused{R"({"operation": "RemoveDisk", "optionFirst": 1.5})", "optionFirst"},
        Refused{R"({"operation": "RemoveDisk", "optionSecond": 2147483648})", "optionSecond"},
        Refused{R"({"operation": "RemoveDisk", "optionSecond": -2147483649})", "optionSecond"},
        Refused{R"({"operation": "RemoveDisk", "passThrough": 1})", "passThrough"},
        Refused{R"({"operation": "raw"})", "hook"},
        Refused{R"({"operation": "raw", "hook": "InitKovaPlugin"})", "hook"},
        Refused{R"({"operation": "raw", "hook": ""})", "hook"},
        Refused{R"({"operation": "raw", "hook": "AddDisksHookFn", "texts": "a"})", "texts"},
        Refused{R"({"operation": "raw", "hook": "AddDisksHookFn", "disks": []})", "disks"},
        Refused{R"({"operation": "AddDisks", "hook": "AddDisksHookFn"})", "hook"},
        Refused{R"({"operation": "host", "set": []})", "set"},
        Refused{R"({"operation": "host", "disk": "naa.1"})", "disk"}));

class BrokenLine : public testing::TestWithParam<const char*> {};

TEST_P(BrokenLine, IsRefused) {
  EXPECT_THROW(ParseReplayRequest(GetParam()), Orbis::ParseException);
}

INSTANTIATE_TEST_SUITE_P(
    Lines, BrokenLine,
    testing::Values("", "{", "rubbish", R"({"operation": "GetConfigInfo"} {})",
                    R"({"operation": "host", "operation": "host"})",
                    R"({"operation": "host", "set": {"autoMode": true, "autoMode": false}})",
                    "{\"operation\": \"GetConfigInfo\xff\"}"));

}  // namespace
}  // namespace Kovactl
