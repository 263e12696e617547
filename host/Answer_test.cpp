#include "host/Answer.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "nox/Kova.h"
#include "orbis/Engine.h"
#include "orbis/ParseException.h"
#include "orbis/Soap.h"

namespace Host {
namespace {

using Nox::Kova::Host::DiskResult;
using Orbis::DataArray;
using Orbis::Fault::SystemError;
using Tessa::MakeRef;
using Tessa::Ref;

std::string Soap(const Orbis::Any& value) {
  std::string text;
  Orbis::SerializeObjectToSoap(value, nullptr, text);
  return text;
}

Ref<DataArray<DiskResult>> OneDisk() {
  const auto disk = MakeRef<DiskResult>();
  disk->GetDisk()->SetCanonicalName("naa.1");
  disk->SetState(DiskResult::STATE_ELIGIBLE);
  const auto disks = MakeRef<DataArray<DiskResult>>();
  disks->Append(disk);
  return disks;
}

const Orbis::TypeDescriptor* DisksType() {
  return &DataArray<DiskResult>::StaticType();
}

std::string Json(const Answer& answer) {
  std::string text;
  WriteJsonAnswer(answer, text);
  return text;
}

TEST(Answer, IsTheSameWrittenAndRead) {
  const auto fault = MakeRef<SystemError>("r");
  for (const Answer& answer :
       {Answer{.result = OneDisk(), .fault = fault}, Answer{.result = OneDisk(), .fault = nullptr},
        Answer{.result = nullptr, .fault = fault}, Answer()}) {
    EXPECT_EQ(Json(Read(Written(answer))), Json(answer));
  }
}

TEST(Answer, OfATextThatCannotBeReadIsASystemErrorAlone) {
  const Answer answer = Read({.result = "<object", .fault = nullptr});
  EXPECT_FALSE(answer.result);
  EXPECT_NE(dynamic_cast<const SystemError*>(answer.fault.Get()), nullptr);
}

TEST(Answer, OfTwoEmptyTextsIsNothing) {
  const Answer answer = ReadAnswer("", "");
  EXPECT_FALSE(answer.result);
  EXPECT_FALSE(answer.fault);
}

TEST(Answer, ReadsWhatAHookAppended) {
  const auto disks = OneDisk();
  const Answer answer = ReadAnswer(Soap(SystemError("no luck")), Soap(*disks));
  EXPECT_TRUE(Orbis::Equal(answer.result.Get(), disks.Get()));
  EXPECT_EQ(dynamic_cast<const SystemError&>(*answer.fault).GetReason(), "no luck");
}

TEST(Answer, ReadsAFaultAlone) {
  const Answer answer = ReadAnswer(Soap(SystemError("no luck")), "");
  EXPECT_FALSE(answer.result);
  EXPECT_TRUE(answer.fault);
}

TEST(Answer, RefusesAFaultThatIsNone) {
  EXPECT_THROW(ReadAnswer(Soap(DiskResult()), ""), Orbis::ParseException);
}

TEST(Answer, RefusesTextsThatHoldNoObject) {
  EXPECT_THROW(ReadAnswer("", "rubbish"), Orbis::ParseException);
  EXPECT_THROW(ReadAnswer("<object", ""), Orbis::ParseException);
}

TEST(Answer, IsTheSameAfterAJourneyAsJson) {
  const auto disks = OneDisk();
  const Answer sent{.result = disks, .fault = MakeRef<SystemError>("half of it \"failed\"")};
  const Answer received = ReadJsonAnswer(Json(sent), DisksType());
  EXPECT_TRUE(Orbis::Equal(received.result.Get(), sent.result.Get()));
  EXPECT_TRUE(Orbis::Equal(received.fault.Get(), sent.fault.Get()));
}

TEST(Answer, KeepsAnEmptyListApartFromNoResult) {
  const Answer sent{.result = MakeRef<DataArray<DiskResult>>(), .fault = nullptr};
  EXPECT_EQ(Json(sent), R"({"result":[],"fault":null})");
  EXPECT_TRUE(ReadJsonAnswer(Json(sent), DisksType()).result);
  EXPECT_EQ(Json(Answer{}), R"({"result":null,"fault":null})");
  EXPECT_FALSE(ReadJsonAnswer(Json(Answer{}), DisksType()).result);
}

TEST(Answer, IsWrittenBehindWhatStandsThere) {
  std::string text = "before ";
  WriteJsonAnswer(Answer{}, text);
  EXPECT_EQ(text, R"(before {"result":null,"fault":null})");
}

class BrokenJsonAnswer : public testing::TestWithParam<const char*> {};

TEST_P(BrokenJsonAnswer, IsRefused) {
  EXPECT_THROW(ReadJsonAnswer(GetParam(), DisksType()), Orbis::ParseException);
}

INSTANTIATE_TEST_SUITE_P(Texts, BrokenJsonAnswer,
                         testing::Values("", "rubbish", "[]", "null", "{}", R"({"result":[]})",
                                         R"({"fault":null})", R"({"result":{},"fault":null})",
                                         R"({"result":[{}],"fault":null})",
                                         R"({"result":[null],"fault":null})",
                                         R"({"result":null,"fault":"no"})",
                                         R"({"result":null,"fault":{"@type":"KovaHostDiskResult"}})",
                                         R"({"result":null,"fault":{"@type":"NoSuchFault"}})",
                                         R"({"result":null,"fault":null} rest)"));

TEST(Answer, ThatFailedIsASystemErrorWithTheReason) {
  const Answer answer = FailedWith("the cable is out");
  EXPECT_FALSE(answer.result);
  EXPECT_EQ(dynamic_cast<const SystemError&>(*answer.fault).GetReason(), "the cable is out");
}

// A disk group of a request, and whether it failed.
Ref<DataArray<Nox::Kova::Host::DiskMapResult>> Groups(const std::vector<bool>& failed) {
  const auto groups = MakeRef<DataArray<Nox::Kova::Host::DiskMapResult>>();
  for (const bool hasFailed : failed) {
    const auto group = MakeRef<Nox::Kova::Host::DiskMapResult>();
    if (hasFailed) {
      group->SetError(MakeRef<SystemError>("no"));
    }
    groups->Append(group);
  }
  return groups;
}

TEST(Outcome, IsFailedWithAFaultAlone) {
  const auto fault = MakeRef<SystemError>("no");
  for (const Answer& answer :
       {Answer{.result = nullptr, .fault = fault}, Answer{.result = Groups({}), .fault = fault}}) {
    EXPECT_TRUE(IsFaultAlone(answer));
    EXPECT_EQ(OutcomeOf(answer), Outcome::Failed);
  }
}

TEST(Outcome, IsPartlyWithAFaultBesideAResult) {
  const Answer answer{.result = OneDisk(), .fault = MakeRef<SystemError>("no")};
  EXPECT_FALSE(IsFaultAlone(answer));
  EXPECT_EQ(OutcomeOf(answer), Outcome::Partly);
  EXPECT_EQ(OutcomeOf({.result = Groups({false}), .fault = answer.fault}), Outcome::Partly);
}

TEST(Outcome, GoesByTheGroupsOfAChange) {
  EXPECT_EQ(OutcomeOf({.result = Groups({false, false}), .fault = nullptr}), Outcome::Done);
  EXPECT_EQ(OutcomeOf({.result = Groups({true, false}), .fault = nullptr}), Outcome::Partly);
  EXPECT_EQ(OutcomeOf({.result = Groups({true, true}), .fault = nullptr}), Outcome::Failed);
  EXPECT_EQ(OutcomeOf({.result = Groups({true}), .fault = MakeRef<SystemError>("no")}), Outcome::Failed);
}

TEST(Outcome, IsDoneWithoutAFault) {
  for (const Answer& answer : {Answer{}, Answer{.result = OneDisk(), .fault = nullptr},
                               Answer{.result = Groups({}), .fault = nullptr}}) {
    EXPECT_FALSE(IsFaultAlone(answer));
    EXPECT_EQ(OutcomeOf(answer), Outcome::Done);
  }
}

TEST(Outcome, HasAName) {
  EXPECT_EQ(NameOf(Outcome::Done), "done");
  EXPECT_EQ(NameOf(Outcome::Partly), "partly");
  EXPECT_EQ(NameOf(Outcome::Failed), "failed");
}

}  // namespace
}  // namespace Host
