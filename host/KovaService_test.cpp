#include "host/KovaService.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <stdexcept>

#include "nox/Kova.h"
#include "orbis/Soap.h"

namespace Host {
namespace {

using Nox::Kova::Host::DiskResult;
using Orbis::DataArray;
using Orbis::Fault::InvalidArgument;
using Orbis::Fault::SystemError;
using testing::ElementsAre;
using testing::HasSubstr;
using Names = std::vector<std::string>;

// Hooks are plain functions, so what they see and say stands beside them.
Names seenNames;
std::string saidFault;
std::string saidResult;
int calls = 0;

template <class Value>
std::string Soap(const Value& value) {
  std::string text;
  Orbis::SerializeObjectToSoap(value, nullptr, text);
  return text;
}

void Speak(Names& names, std::string& fault, std::string& result) {
  ++calls;
  seenNames = names;
  names.clear();  // a hook may do with its list what it likes
  fault += saidFault;
  result += saidResult;
}

// A service whose plug-in answers a query with these texts.
class KovaServiceTest : public testing::Test {
 protected:
  KovaServiceTest() {
    seenNames.clear();
    saidFault.clear();
    saidResult.clear();
    calls = 0;
  }

  static Answer Query(const Names& names, Kovasvc::QueryDisksForKovaFn* hook = &Speak) {
    PluginHooks hooks{};
    hooks.queryDisksForKova = hook;
    return KovaService(hooks).QueryDisksForKova(names);
  }
};

std::string ReasonOf(const Answer& answer) {
  const auto* const error = dynamic_cast<const SystemError*>(answer.fault.Get());
  return error == nullptr ? "no SystemError" : error->GetReason();
}

TEST_F(KovaServiceTest, HandsNamesDownAndTheResultUp) {
  saidResult = Soap(DataArray<DiskResult>());
  const Answer answer = Query({"naa.2", "naa.1"});
  EXPECT_THAT(seenNames, ElementsAre("naa.2", "naa.1"));
  EXPECT_NE(dynamic_cast<const DataArray<DiskResult>*>(answer.result.Get()), nullptr);
  EXPECT_FALSE(answer.fault);
}

TEST_F(KovaServiceTest, HandsUpAFaultBesideAResult) {
  saidResult = Soap(DataArray<DiskResult>());
  saidFault = Soap(SystemError("half of it failed"));
  const Answer answer = Query({});
  EXPECT_TRUE(answer.result);
  EXPECT_EQ(ReasonOf(answer), "half of it failed");
}

TEST_F(KovaServiceTest, AnswersAQueryWithoutAnyTextByASystemError) {
  EXPECT_THAT(ReasonOf(Query({})), HasSubstr("could not be read"));
  EXPECT_EQ(calls, 1);
}

TEST_F(KovaServiceTest, CallsNoHookForARequestThatTheGateRefuses) {
  const Answer answer = Query({"naa.1", ""});
  EXPECT_EQ(calls, 0);
  EXPECT_FALSE(answer.result);
  EXPECT_EQ(dynamic_cast<const InvalidArgument&>(*answer.fault).GetArgument(), "names[1]");
}

TEST_F(KovaServiceTest, AnswersAnExceptionOfAHookByASystemErrorWithItsText) {
  const Answer answer =
      Query({}, [](Names&, std::string&, std::string&) { throw std::runtime_error("the kernel is gone"); });
  EXPECT_FALSE(answer.result);
  EXPECT_EQ(ReasonOf(answer), "the kernel is gone");
}

TEST_F(KovaServiceTest, AnswersWhatCannotBeReadByASystemError) {
  saidResult = "<object";
  const Answer answer = Query({});
  EXPECT_FALSE(answer.result);
  EXPECT_THAT(ReasonOf(answer), testing::Not(testing::AnyOf("no SystemError", "")));
}

}  // namespace
}  // namespace Host
