// What the operations have in common: reading requests, and turning exceptions into faults.

#include "kova/agentd/operations/OperationSteps.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <stdexcept>
#include <string>
#include <vector>

#include "nox/Faults.h"
#include "nox/Kova.h"
#include "orbis/ParseException.h"
#include "tests/support/OperationFixture.h"

namespace Kovasvc {
namespace {

using HostCtl::Lib::HostCtlException;
using HostCtl::Lib::KovaExceptionHasPartition;
using Nox::Fault::DiskIsUSB;
using Nox::Host::ScsiDisk;
using Nox::Host::ScsiLun;
using Nox::Kova::Host::DiskMapping;
using Orbis::MethodFault;
using Orbis::Fault::SystemError;
using Tessa::MakeRef;
using Tessa::Ref;
using Tessa::Service::LogLevel;
using testing::ElementsAre;
using testing::ExitedWithCode;
using testing::IsEmpty;
using TestSupport::Hdd;
using TestSupport::IsSystemError;
using TestSupport::LogLineIs;
using TestSupport::NamesDevice;
using TestSupport::panicStatus;
using TestSupport::SoapText;

constexpr WrongTypeLine anyLine = WrongTypeLine::AddDisks;

class OperationSteps : public TestSupport::HostFixture {
 protected:
  Ref<MethodFault> _fault = MakeRef<DiskIsUSB>("before");
};
using OperationStepsDeathTest = OperationSteps;

// ---- reading a request

TEST_F(OperationSteps, ReadObjectsInOrder) {
  const auto disks =
      ReadObjects<ScsiDisk>({SoapText(*Hdd("b")), SoapText(*Hdd("a")), SoapText(*Hdd("b"))}, anyLine);
  EXPECT_THAT(TestSupport::DiskTexts(*disks), ElementsAre("b", "a", "b"));
  EXPECT_TRUE(ReadObjects<ScsiDisk>({}, anyLine)->IsEmpty());
}

TEST_F(OperationSteps, ReadAnObjectOfADerivedType) {
  EXPECT_EQ(ReadObject<ScsiLun>(SoapText(*Hdd("a")), anyLine)->GetCanonicalName(), "a");
}

TEST_F(OperationSteps, LetOutWhatTheDecoderSays) {
  EXPECT_THROW(ReadObject<ScsiDisk>("", anyLine), Orbis::ParseException);
  EXPECT_THROW(ReadObjects<ScsiDisk>({SoapText(*Hdd("a")), "<a/>"}, anyLine), Orbis::ParseException);
}

TEST_F(OperationStepsDeathTest, EndTheProcessOverAnotherTypeAndNameTheLine) {
  EXPECT_EXIT(ReadObject<ScsiDisk>(SoapText(*MakeRef<ScsiLun>()), static_cast<WrongTypeLine>(4711)),
              ExitedWithCode(panicStatus), "^panic: NOT_REACHED kova/agentd/KovaLibManager:4711\n$");
  EXPECT_EXIT(ReadObjects<DiskMapping>({SoapText(*Hdd("a"))}, WrongTypeLine::InitializeDisks),
              ExitedWithCode(panicStatus), "^panic: NOT_REACHED kova/agentd/KovaLibManager:2070\n$");
  EXPECT_EXIT(PanicOverWrongType(WrongTypeLine::UnmountDiskMapping), ExitedWithCode(panicStatus),
              "^panic: NOT_REACHED kova/agentd/KovaLibManager:2549\n$");
}

// ---- faults that are thrown

TEST_F(OperationSteps, TellWhenNothingWasThrownAndLeaveTheFault) {
  const Ref<MethodFault> before = _fault;
  EXPECT_TRUE(RunIntoFault(*_logger, _fault, [] {}));
  EXPECT_EQ(_fault, before);
  EXPECT_THAT(_logger->Lines(), IsEmpty());
}

TEST_F(OperationSteps, TakeAThrownFaultInThePlaceOfTheOneBefore) {
  const auto thrown = MakeRef<SystemError>("broken");
  EXPECT_FALSE(RunIntoFault(*_logger, _fault, [&] { throw SystemError::Exception(thrown); }));
  EXPECT_EQ(_fault, thrown) << "the very object";
  EXPECT_THAT(_logger->Lines(),
              ElementsAre(LogLineIs(LogLevel::Verbose, TestSupport::gotFaultLine, "SystemError: broken")));
}

TEST_F(OperationSteps, TellTheKeysOfAThrownFaultsMessages) {
  RunIntoFault(*_logger, _fault, [] {
    throw DiskIsUSB::Exception(TestSupport::WithMessages(MakeRef<DiskIsUSB>("a"), {"one", "two"}));
  });
  EXPECT_THAT(_logger->Lines(),
              ElementsAre(LogLineIs(LogLevel::Verbose, TestSupport::gotFaultLine, "DiskIsUSB: one, two")));
}

TEST_F(OperationSteps, LetWhatIsNoFaultThrough) {
  const Ref<MethodFault> before = _fault;
  EXPECT_THROW(RunIntoFault(*_logger, _fault, [] { throw HostCtlException("kernel"); }), HostCtlException);
  EXPECT_THROW(RunIntoFault(*_logger, _fault, [] { throw Tessa::NotInitializedException("x"); }),
               Tessa::NotInitializedException);
  EXPECT_EQ(_fault, before);
  EXPECT_THAT(_logger->Lines(), IsEmpty());
}

// ---- the kernel's refusals

TEST_F(OperationSteps, LeaveTheFaultWhenTheKernelDoesAsAsked) {
  const Ref<MethodFault> before = _fault;
  AskKernel(*_logger, "warning %1", _fault, [] {});
  EXPECT_EQ(_fault, before);
  EXPECT_THAT(_logger->Lines(), IsEmpty());
}

TEST_F(OperationSteps, WarnOfARefusalAndMakeItTheFault) {
  AskKernel(*_logger, "warning %1", _fault, [] { throw KovaExceptionHasPartition("parts", "a"); });
  EXPECT_THAT(_fault, NamesDevice("DiskHasPartitions", "a"));
  EXPECT_THAT(_logger->Lines(), ElementsAre(LogLineIs(LogLevel::Warning, "warning %1", "parts")));
}

TEST_F(OperationSteps, WarnOfARefusalFromLevelWarningOn) {
  _logger->SetLevel(LogLevel::Error);
  AskKernel(*_logger, "warning %1", _fault, [] { throw HostCtlException("no"); });
  EXPECT_THAT(_fault, IsSystemError("no"));
  EXPECT_THAT(_logger->Lines(), IsEmpty());
}

TEST_F(OperationSteps, LetWhatIsNoRefusalThrough) {
  const Ref<MethodFault> before = _fault;
  EXPECT_THROW(AskKernel(*_logger, "", _fault, [] { throw std::runtime_error("x"); }), std::runtime_error);
  EXPECT_THROW(
      AskKernel(*_logger, "", _fault, [] { throw SystemError::Exception(MakeRef<SystemError>("x")); }),
      SystemError::Exception);
  EXPECT_EQ(_fault, before);
  EXPECT_THAT(_logger->Lines(), IsEmpty());
}

}  // namespace
}  // namespace Kovasvc
