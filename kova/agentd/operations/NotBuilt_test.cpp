#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <ostream>
#include <string>
#include <vector>

#include "kova/agentd/KovaManagerImpl.h"
#include "nox/Kova.h"
#include "tests/support/Matchers.h"
#include "tests/support/PluginFixture.h"

namespace Kovasvc {
namespace {

using Orbis::Fault::SystemError;
using Tessa::Ref;
using Tessa::Service::LogLevel;
using testing::ElementsAre;
using testing::IsEmpty;
using TestSupport::CarriesSystemError;
using TestSupport::IsSystemError;
using TestSupport::LogLineIs;

// What an operation is given, and what it may answer in.
struct Desk {
  KovaManagerImpl::Texts texts;
  std::string text;
  std::string fault;
  std::string result;
  Ref<KovaManagerImpl::Mapping> mapping;
  Ref<KovaManagerImpl::MapResult> mapResult;
  Ref<Orbis::Any> resultObject;
  Ref<Orbis::MethodFault> faultObject;
};

struct Operation {
  const char* name;
  void (*call)(KovaManagerImpl& manager, Desk& desk);
};

std::ostream& operator<<(std::ostream& out, const Operation& operation) {
  return out << operation.name;
}

std::string Saying(const Operation& operation) {
  return std::string("The operation ") + operation.name + " is not built yet.";
}

class NotBuilt : public TestSupport::PluginFixture, public testing::WithParamInterface<Operation> {
 protected:
  NotBuilt() : _manager(MakeManager()) {}
  ~NotBuilt() override { EXPECT_THAT(_kernel.Calls(), IsEmpty()) << "the kernel was asked all the same"; }

  void Call() { GetParam().call(*_manager, _desk); }

  Ref<KovaManagerImpl> _manager;
  Desk _desk;
};

std::string NameOf(const testing::TestParamInfo<Operation>& test) {
  return test.param.name;
}

class AnswersWithAFaultText : public NotBuilt {};

INSTANTIATE_TEST_SUITE_P(
    Operations, AnswersWithAFaultText,
    testing::Values(
        Operation{"AddDisks",
                  [](KovaManagerImpl& m, Desk& d) { m.AddDisks(d.texts, d.text, d.fault, d.result); }},
        Operation{"InitializeDisks",
                  [](KovaManagerImpl& m, Desk& d) { m.InitializeDisks(d.texts, d.text, d.fault, d.result); }},
        Operation{"RemoveDisk",
                  [](KovaManagerImpl& m, Desk& d) { m.RemoveDisk(d.text, d.text, d.text, 1, 2, d.fault); }},
        Operation{
            "RemoveDiskMapping",
            [](KovaManagerImpl& m, Desk& d) { m.RemoveDiskMapping(d.text, d.text, d.text, 1, 2, d.fault); }},
        Operation{"AddAllEligibleDisks",
                  [](KovaManagerImpl& m, Desk& d) { m.AddAllEligibleDisks(d.text, d.fault, d.result); }},
        Operation{
            "UnmountDiskMapping",
            [](KovaManagerImpl& m, Desk& d) { m.UnmountDiskMapping(d.texts, d.text, d.fault, d.result); }}),
    NameOf);

TEST_P(AnswersWithAFaultText, ThatNamesTheOperationBehindWhatTheTextHolds) {
  _desk.fault = "fault before";
  _desk.result = "result before";
  Call();
  EXPECT_EQ(_desk.result, "result before");
  ASSERT_EQ(_desk.fault.substr(0, 12), "fault before");
  EXPECT_THAT(TestSupport::ReadAnswer<SystemError>(_desk.fault.substr(12)),
              IsSystemError(Saying(GetParam())));
}

class WritesAnErrorLine : public NotBuilt {};

INSTANTIATE_TEST_SUITE_P(Operations, WritesAnErrorLine,
                         testing::Values(Operation{
                             "ClaimUnmountedDiskgroup",
                             [](KovaManagerImpl& m, Desk&) { m.ClaimUnmountedDiskgroup(); }}),
                         NameOf);

TEST_P(WritesAnErrorLine, ThatNamesTheOperationAndAnswersNothing) {
  _desk.result = "result before";
  Call();
  EXPECT_EQ(_desk.result, "result before");
  EXPECT_THAT(_logger->Lines(),
              ElementsAre(LogLineIs(LogLevel::Error, "The operation %1 is not built yet.", GetParam().name)));
}

class FillsInAFault : public NotBuilt {};

INSTANTIATE_TEST_SUITE_P(Operations, FillsInAFault,
                         testing::Values(Operation{"InitializeDisksInt",
                                                   [](KovaManagerImpl& m, Desk& d) {
                                                     m.InitializeDisksInt(nullptr, d.text, d.resultObject,
                                                                          d.faultObject);
                                                   }},
                                         Operation{"UnmountDiskMappingInt",
                                                   [](KovaManagerImpl& m, Desk& d) {
                                                     m.UnmountDiskMappingInt(d.mapping, d.text,
                                                                             d.faultObject);
                                                   }}),
                         NameOf);

TEST_P(FillsInAFault, ThatNamesTheOperation) {
  Call();
  EXPECT_FALSE(_desk.resultObject);
  EXPECT_THAT(_desk.faultObject, IsSystemError(Saying(GetParam())));
}

class ThrowsAFault : public NotBuilt {};

INSTANTIATE_TEST_SUITE_P(
    Operations, ThrowsAFault,
    testing::Values(Operation{"FormatDiskMapping",
                              [](KovaManagerImpl& m, Desk& d) {
                                m.FormatDiskMapping(d.text, d.texts, d.text, 1, 0);
                              }},
                    Operation{"RestampDiskMapping",
                              [](KovaManagerImpl& m, Desk& d) { m.RestampDiskMapping(d.text, d.texts); }},
                    Operation{"InitializeMapping",
                              [](KovaManagerImpl& m, Desk& d) {
                                m.InitializeMapping(d.mapping, d.text, 1, 0, d.mapResult);
                              }}),
    NameOf);

TEST_P(ThrowsAFault, ThatNamesTheOperation) {
  EXPECT_THAT([this] { Call(); },
              testing::Throws<SystemError::Exception>(CarriesSystemError(Saying(GetParam()))));
  EXPECT_FALSE(_desk.mapResult);
}

}  // namespace
}  // namespace Kovasvc
