// How the manager puts results and faults into the caller's texts.

#include "kova/agentd/KovaManagerImpl.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <string>

#include "nox/Faults.h"
#include "nox/Kova.h"
#include "orbis/TypeDescriptor.h"
#include "orbis/Version.h"
#include "tests/support/Matchers.h"
#include "tests/support/PluginFixture.h"

namespace Kovasvc {
namespace {

using Tessa::MakeRef;
using Tessa::Ref;
using Tessa::Service::LogLevel;
using testing::ElementsAre;
using testing::IsEmpty;
using testing::StartsWith;
using TestSupport::LogLineIs;
using TestSupport::ReadAnswer;
using Results = Orbis::DataArray<Nox::Kova::Host::DiskResult>;

class Answers : public TestSupport::PluginFixture {
 protected:
  Answers() : _manager(MakeManager()) {}

  void Serialize() { _manager->SerializeKovaResultAndFault(_resultText, _faultText, _result, _fault); }

  Ref<KovaManagerImpl> _manager;
  std::string _resultText = "result before";
  std::string _faultText = "fault before";
  Ref<Orbis::Any> _result;
  Ref<Orbis::MethodFault> _fault;
};

constexpr const char* noResult = "No result. Operation failed.";
constexpr const char* noFault = "No fault. Operation completed successfully";

TEST_F(Answers, AppendTheResultAlone) {
  _result = MakeRef<Results>();
  Serialize();
  ASSERT_THAT(_resultText, StartsWith("result before<?xml"));
  EXPECT_TRUE(ReadAnswer<Results>(_resultText.substr(13))->IsEmpty());
  EXPECT_EQ(_faultText, "fault before");
  EXPECT_THAT(_logger->Lines(), ElementsAre(LogLineIs(LogLevel::Verbose, noFault)));
}

TEST_F(Answers, AppendTheFaultAlone) {
  _fault = MakeRef<Nox::Fault::DiskIsUSB>("naa.1");
  Serialize();
  EXPECT_EQ(_resultText, "result before");
  ASSERT_THAT(_faultText, StartsWith("fault before<?xml"));
  EXPECT_EQ(ReadAnswer<Nox::Fault::DiskIsUSB>(_faultText.substr(12))->GetDevice(), "naa.1");
  EXPECT_THAT(_logger->Lines(), ElementsAre(LogLineIs(LogLevel::Verbose, noResult)));
}

TEST_F(Answers, AppendBothEachToItsOwnText) {
  _result = MakeRef<Results>();
  _fault = MakeRef<Nox::Fault::DiskIsUSB>("naa.1");
  Serialize();
  EXPECT_NO_THROW(ReadAnswer<Results>(_resultText.substr(13)));
  EXPECT_NO_THROW(ReadAnswer<Nox::Fault::DiskIsUSB>(_faultText.substr(12)));
  EXPECT_THAT(_logger->Lines(), IsEmpty());
}

TEST_F(Answers, LeaveBothTextsAloneWhenThereIsNothingAndSaySoResultFirst) {
  Serialize();
  EXPECT_EQ(_resultText, "result before");
  EXPECT_EQ(_faultText, "fault before");
  EXPECT_THAT(_logger->Lines(),
              ElementsAre(LogLineIs(LogLevel::Verbose, noResult), LogLineIs(LogLevel::Verbose, noFault)));
}

TEST_F(Answers, SayNothingBelowVerbose) {
  _logger->SetLevel(LogLevel::Info);
  Serialize();
  EXPECT_THAT(_logger->Lines(), IsEmpty());
}

TEST_F(Answers, OnlyReadTheResultAndTheFault) {
  _result = MakeRef<Results>();
  _fault = MakeRef<Nox::Fault::DiskIsUSB>("naa.1");
  const auto result = _result;
  const auto fault = _fault;
  Serialize();
  EXPECT_EQ(_result, result);
  EXPECT_EQ(_fault, fault);
  EXPECT_EQ(result->GetRefCount(), 2);
  EXPECT_EQ(fault->GetRefCount(), 2);
}

// Counts, while it is written, who refers to the version of the API that everything is written in.
class WatchingFault final : public Nox::Fault::DiskIsUSB {
 public:
  const Orbis::TypeDescriptor& GetType() const override {
    references = Orbis::FindVersionByTyrlName("nox.version.unstable")->GetRefCount();
    return DiskIsUSB::GetType();
  }
  mutable int references = 0;
};

TEST_F(Answers, AreWrittenInTheVersionThatHasEverything) {
  const auto fault = MakeRef<WatchingFault>();
  fault->GetType();
  const int idle = fault->references;
  _fault = fault;
  Serialize();
  EXPECT_EQ(fault->references, idle + 1) << "held as long as it is written in";
  fault->GetType();
  EXPECT_EQ(fault->references, idle) << "and not longer";
}

TEST_F(Answers, TakeNoLock) {
  _result = MakeRef<Results>();
  Serialize();
  EXPECT_THAT(_timeline.Events(), IsEmpty());
}

// A list with a hole cannot be written.
TEST_F(Answers, CutTheResultTextBackWhenItCannotBeWrittenAndLetTheExceptionPass) {
  const auto holed = MakeRef<Results>();
  holed->Append(nullptr);
  _result = holed;
  _fault = MakeRef<Nox::Fault::DiskIsUSB>("naa.1");
  EXPECT_THROW(Serialize(), Tessa::NotInitializedException);
  EXPECT_EQ(_resultText, "result before");
  EXPECT_EQ(_faultText, "fault before");
}

TEST_F(Answers, CutTheFaultTextBackWhenItCannotBeWrittenAndKeepTheResult) {
  _result = MakeRef<Results>();
  _fault = MakeRef<Nox::Fault::DiskIsUSB>("naa.1");
  _fault->GetFaultMessage()->Append(nullptr);
  EXPECT_THROW(Serialize(), Tessa::NotInitializedException);
  EXPECT_THAT(_resultText, StartsWith("result before<?xml"));
  EXPECT_EQ(_faultText, "fault before");
}

}  // namespace
}  // namespace Kovasvc
