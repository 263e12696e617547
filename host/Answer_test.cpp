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

TEST(Result, OfATextIsReadWhenSomebodyLooks) {
  const auto disks = OneDisk();
  const Result result = Result::OfText(Soap(*disks));
  EXPECT_TRUE(result);
  EXPECT_EQ(*result.GetText(), Soap(*disks));
  EXPECT_EQ(result.TextSize(), Soap(*disks).size());
  EXPECT_TRUE(Orbis::Equal(result.Get(), disks.Get()));
  EXPECT_EQ(result.Get(), result.Get()) << "once";
}

TEST(Result, OfATextThatCannotBeReadIsThereAndThrows) {
  const Result result = Result::OfText("<object");
  EXPECT_TRUE(result);
  EXPECT_THROW(result.Get(), Orbis::ParseException);
}

TEST(Result, OfAnEmptyTextOrOfNullIsNone) {
  for (const Result& none : {Result(), Result::OfText(""), Result(nullptr), Result(Ref<SystemError>())}) {
    EXPECT_FALSE(none);
    EXPECT_EQ(none.Get(), nullptr);
    EXPECT_EQ(none.GetText(), nullptr);
    EXPECT_EQ(none.TextSize(), 0u);
  }
}

TEST(Result, ThatWasReadInACopyIsATextStill) {
  const Result result = Result::OfText(Soap(*OneDisk()));
  const Result copy = result;
  EXPECT_EQ(result.GetText(), copy.GetText()) << "the text is shared";
  EXPECT_NE(copy.Get(), result.Get()) << "the object is not";
}

TEST(Answer, IsTheSameInJsonFromATextAsFromAnObject) {
  const auto fault = MakeRef<SystemError>("r");
  for (const auto& said : {fault, Ref<SystemError>()}) {
    EXPECT_EQ(Json({.result = Result::OfText(Soap(*OneDisk())), .fault = said}),
              Json({.result = OneDisk(), .fault = said}));
  }
}

TEST(Answer, OfATextThatThePluginDidNotWriteIsReadForItsJson) {
  std::string text = Soap(*OneDisk());
  text.insert(text.find("?>") + 2, "\n<!-- by hand -->\n");
  EXPECT_EQ(Json({.result = Result::OfText(text), .fault = nullptr}),
            Json({.result = OneDisk(), .fault = nullptr}));
}

TEST(Answer, OfTwoEmptyTextsIsNothing) {
  const Answer answer = AnswerOf("", "");
  EXPECT_FALSE(answer.result);
  EXPECT_FALSE(answer.fault);
}

TEST(Answer, ReadsWhatAHookAppended) {
  const auto disks = OneDisk();
  const Answer answer = AnswerOf(Soap(SystemError("no luck")), Soap(*disks));
  EXPECT_TRUE(Orbis::Equal(answer.result.Get(), disks.Get()));
  EXPECT_EQ(dynamic_cast<const SystemError&>(*answer.fault).GetReason(), "no luck");
}

TEST(Answer, ReadsAFaultAlone) {
  const Answer answer = AnswerOf(Soap(SystemError("no luck")), "");
  EXPECT_FALSE(answer.result);
  EXPECT_TRUE(answer.fault);
}

TEST(Answer, RefusesAFaultThatIsNone) {
  EXPECT_THROW(AnswerOf(Soap(DiskResult()), ""), Orbis::ParseException);
}

TEST(Answer, RefusesTextsThatHoldNoObject) {
  EXPECT_THROW(AnswerOf("", "rubbish").result.Get(), Orbis::ParseException);
  EXPECT_THROW(AnswerOf("<object", ""), Orbis::ParseException);
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

TEST(Outcome, IsTheSameOfATextAsOfAnObject) {
  for (const auto& failed :
       std::vector<std::vector<bool>>{{}, {false}, {true}, {true, false}, {true, true}}) {
    for (const auto& fault : {Ref<SystemError>(), MakeRef<SystemError>("no")}) {
      const Answer object{.result = Groups(failed), .fault = fault};
      const Answer text{.result = Result::OfText(Soap(*Groups(failed))), .fault = fault};
      EXPECT_EQ(OutcomeOf(text), OutcomeOf(object)) << failed.size();
      EXPECT_EQ(IsFaultAlone(text), IsFaultAlone(object)) << failed.size();
    }
  }
}

TEST(Outcome, OfATextThatThePluginDidNotWriteIsThatOfItsObject) {
  std::string text = Soap(*Groups({true, false}));
  text.insert(text.find("?>") + 2, "\n<!-- by hand -->\n");
  EXPECT_EQ(OutcomeOf({.result = Result::OfText(text), .fault = nullptr}), Outcome::Partly);
}

TEST(Outcome, OfAQueryIsKnownWithoutALookIntoItsResult) {
  const Result unreadable = Result::OfText("<object");
  const auto fault = MakeRef<SystemError>("no");
  EXPECT_EQ(OutcomeOfQuery({.result = unreadable, .fault = nullptr}), Outcome::Done);
  EXPECT_EQ(OutcomeOfQuery({.result = OneDisk(), .fault = fault}), Outcome::Partly);
  EXPECT_EQ(OutcomeOfQuery({.result = nullptr, .fault = fault}), Outcome::Failed);
}

TEST(Outcome, HasAName) {
  EXPECT_EQ(NameOf(Outcome::Done), "done");
  EXPECT_EQ(NameOf(Outcome::Partly), "partly");
  EXPECT_EQ(NameOf(Outcome::Failed), "failed");
}

}  // namespace
}  // namespace Host
