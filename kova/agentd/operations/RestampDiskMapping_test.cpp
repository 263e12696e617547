// New identity stamps for a group that is there but off-line.

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <stdexcept>
#include <string>
#include <vector>

#include "kova/agentd/KovaManagerImpl.h"
#include "kova/agentd/include/HostCtlException.h"
#include "nox/Faults.h"
#include "tests/support/OperationFixture.h"

namespace Kovasvc {
namespace {

using HostCtl::Lib::HostCtlException;
using HostCtl::Lib::KovaExceptionHasPartition;
using HostCtl::Lib::KovaStorageException;
using Tessa::Service::LogLevel;
using testing::ElementsAre;
using testing::IsEmpty;
using TestSupport::LogLineIs;
using TestSupport::operationLock;
using TestSupport::releaseOperation;
using TestSupport::takeOperation;

constexpr const char* restamping = "Restamping disks %1";
constexpr const char* uuidInput = "UUID input %1";
constexpr const char* givenUuid = "Given PDL'd disk input (KOVA UUID: '%1')";
constexpr const char* restampFailed = "Error restamping PDL'd KOVA disk mapping: %1";
constexpr const char* restamped = "Done restamping disks";
const std::string uuid = "52e7b2b4-0a7c-3a1c-9d3e-2f4a5b6c7d8e";

class Restamp : public TestSupport::OperationFixture {
 protected:
  void Run(const std::string& ssd) { _manager->RestampDiskMapping(ssd, _capacity); }

  std::vector<std::string> _capacity = {"b", "a"};
};

TEST_F(Restamp, StampsAndThenMountsUnderTheOperationLock) {
  Run("s");
  EXPECT_THAT(_timeline.Events(), ElementsAre(takeOperation, "RestampDiskMapping(s, [b, a])",
                                              "MountDiskMapping(s, false)", releaseOperation));
  EXPECT_THAT(_kernel.Calls().at(0).locksHeld, ElementsAre(operationLock));
  EXPECT_THAT(_kernel.Calls().at(1).locksHeld, ElementsAre(operationLock));
  EXPECT_THAT(_capacity, ElementsAre("b", "a"));
}

TEST_F(Restamp, SaysSoBeforeAndAfterOutsideOfTheLock) {
  LogIntoTimeline();
  Run("s");
  EXPECT_THAT(_timeline.Events(), ElementsAre("log verbose: Restamping disks s", takeOperation,
                                              "RestampDiskMapping(s, [b, a])", "MountDiskMapping(s, false)",
                                              releaseOperation, "log verbose: Done restamping disks"));
}

TEST_F(Restamp, StampsAGroupWithoutItsSsdByUuidAndDoesNotMountIt) {
  Run("kova:" + uuid);
  EXPECT_THAT(_timeline.Events(),
              ElementsAre(takeOperation, "RestampDiskMappingByUuid(" + uuid + ")", releaseOperation));
  EXPECT_THAT(_kernel.Calls().at(0).locksHeld, ElementsAre(operationLock));
  EXPECT_THAT(_logger->Lines(), ElementsAre(LogLineIs(LogLevel::Verbose, restamping, "kova:" + uuid),
                                            LogLineIs(LogLevel::Verbose, uuidInput, "kova:" + uuid),
                                            LogLineIs(LogLevel::Verbose, givenUuid, uuid),
                                            LogLineIs(LogLevel::Verbose, restamped)));
}

TEST_F(Restamp, TakesAMarkedNameThatHoldsNoUuidForAnEmptyOne) {
  Run("kova:");
  EXPECT_THAT(_kernel.CallTexts(), ElementsAre("RestampDiskMappingByUuid()"));
}

TEST_F(Restamp, WarnsOfARefusalByUuidAndLetsTheSameExceptionOut) {
  _kernel.Fail("RestampDiskMappingByUuid", KovaExceptionHasPartition("no", "a"));
  try {
    Run("kova:" + uuid);
    ADD_FAILURE() << "nothing was thrown";
  } catch (const HostCtlException& exception) {
    EXPECT_EQ(typeid(exception), typeid(KovaExceptionHasPartition)) << "not sliced";
    EXPECT_EQ(exception.Describe(), "no");
  }
  EXPECT_EQ(_timeline.Events().back(), releaseOperation);
  EXPECT_THAT(_logger->Lines(), ElementsAre(LogLineIs(LogLevel::Verbose, restamping, "kova:" + uuid),
                                            LogLineIs(LogLevel::Verbose, uuidInput, "kova:" + uuid),
                                            LogLineIs(LogLevel::Verbose, givenUuid, uuid),
                                            LogLineIs(LogLevel::Warning, restampFailed, "no")));
}

TEST_F(Restamp, LetsARefusalByNameOutWithoutAWord) {
  _kernel.Fail("RestampDiskMapping", KovaStorageException("no", "s"));
  EXPECT_THROW(Run("s"), KovaStorageException);
  EXPECT_THAT(_timeline.Events(),
              ElementsAre(takeOperation, "RestampDiskMapping(s, [b, a])", releaseOperation))
      << "what is not stamped is not mounted";
  EXPECT_THAT(_logger->Lines(), ElementsAre(LogLineIs(LogLevel::Verbose, restamping, "s")));
}

TEST_F(Restamp, LetsARefusedMountOutWithoutAWord) {
  _kernel.Fail("MountDiskMapping", KovaStorageException("no", "s"));
  EXPECT_THROW(Run("s"), KovaStorageException);
  EXPECT_EQ(_timeline.Events().back(), releaseOperation);
  EXPECT_THAT(_logger->Lines(), ElementsAre(LogLineIs(LogLevel::Verbose, restamping, "s")));
}

TEST_F(Restamp, LetsOtherExceptionsOutWithoutAWarningAndWithTheLockReleased) {
  for (const std::string operation : {"RestampDiskMapping", "MountDiskMapping", "RestampDiskMappingByUuid"}) {
    _kernel.Fail(operation, std::runtime_error("not the kernel's"));
    EXPECT_THROW(Run(operation == "RestampDiskMappingByUuid" ? "kova:" + uuid : "s"), std::runtime_error);
    EXPECT_EQ(_timeline.Events().back(), releaseOperation);
    _kernel.Heal(operation);
  }
  EXPECT_THAT(_logger->Lines(LogLevel::Warning), IsEmpty());
}

TEST_F(Restamp, NeitherReadsNorForgetsTheCache) {
  _manager->RefreshKovaDiskCache();
  Run("s");
  EXPECT_TRUE(IsCacheValid());
}

}  // namespace
}  // namespace Kovasvc
