#include "host/KovaService.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <stdexcept>
#include <utility>

#include "host/testing/Requests.h"
#include "nox/Kova.h"
#include "orbis/Soap.h"
#include "orbis/TypeDescriptor.h"

namespace Host {
namespace {

namespace Op = Nox::Operation;
using Nox::Kova::Host::DiskResult;
using Orbis::DataArray;
using Orbis::Fault::InvalidArgument;
using Orbis::Fault::SystemError;
using testing::ElementsAre;
using testing::HasSubstr;

// Hooks are plain functions, so what they see and say stands beside them.
std::vector<std::string> seenNames;
std::string saidFault;
std::string saidResult;
int calls = 0;

template <class Value>
std::string Soap(const Value& value) {
  std::string text;
  Orbis::SerializeObjectToSoap(value, nullptr, text);
  return text;
}

void Speak(std::vector<std::string>& names, std::string& fault, std::string& result) {
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

  static Answer Query(const std::vector<std::string>& names, Kovasvc::QueryDisksForKovaFn* hook = &Speak) {
    PluginHooks hooks{};
    hooks.queryDisksForKova = hook;
    return KovaService(hooks).Query(Op::QueryDisksForKova(Testing::Names(names)));
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
  const Answer answer = Query({}, [](std::vector<std::string>&, std::string&, std::string&) {
    throw std::runtime_error("the kernel is gone");
  });
  EXPECT_FALSE(answer.result);
  EXPECT_EQ(ReasonOf(answer), "the kernel is gone");
}

TEST_F(KovaServiceTest, HandsTheTextOfAResultOnUnread) {
  saidResult = "<object";
  EXPECT_EQ(*Query({}).result.GetText(), "<object");
}

// A plug-in with every hook, each of which answers with a fault that it was called.
PluginHooks EveryHook() {
  using Text = std::string;
  using Texts = Kovasvc::Texts;
  static const auto call = [](Text& fault) { fault += Soap(SystemError("called")); };
  PluginHooks hooks{};
  hooks.addDisks = [](const Texts&, const Text&, Text& fault, Text&) { call(fault); };
  hooks.initializeDisks = [](const Texts&, const Text&, Text& fault, Text&) { call(fault); };
  hooks.removeDisks = [](const Text&, const Text&, const Text&, int, int, Text& fault) { call(fault); };
  hooks.removeDiskMapping = [](const Text&, const Text&, const Text&, int, int, Text& fault) { call(fault); };
  hooks.queryDisksForKova = [](Texts&, Text& fault, Text&) { call(fault); };
  hooks.addAllEligibleDisks = [](const Text&, Text& fault, Text&) { call(fault); };
  hooks.unmountDiskMapping = [](const Texts&, const Text&, Text& fault, Text&) { call(fault); };
  hooks.getStorageInfo = [](Text&) {};
  hooks.getConfigInfo = [](Text&) {};
  hooks.claimUnmountedDiskgroup = [] {};
  return hooks;
}

TEST_F(KovaServiceTest, ServesEveryOperation) {
  const KovaService service(EveryHook());
  for (const Nox::OperationDescriptor& operation : Nox::Operations()) {
    const auto request = operation.request.create();
    const Answer answer = operation.changes ? service.Change(std::move(dynamic_cast<Op::Change&>(*request)))
                                            : service.Query(dynamic_cast<const Op::Query&>(*request));
    EXPECT_THAT(ReasonOf(answer), testing::Not(HasSubstr("does not serve"))) << operation.name;
  }
}

TEST_F(KovaServiceTest, AnswersAFaultThatCannotBeReadByASystemError) {
  saidFault = "<object";
  const Answer answer = Query({});
  EXPECT_FALSE(answer.result);
  EXPECT_THAT(ReasonOf(answer), testing::Not(testing::AnyOf("no SystemError", "")));
}

}  // namespace
}  // namespace Host
