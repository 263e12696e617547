#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <stdexcept>
#include <string>
#include <thread>
#include <vector>

#include "kova/agentd/KovaManagerImpl.h"
#include "kova/agentd/include/HostCtlException.h"
#include "nox/Faults.h"
#include "nox/Kova.h"
#include "tests/support/Builders.h"
#include "tests/support/Matchers.h"
#include "tests/support/PluginFixture.h"

namespace Kovasvc {
namespace {

using HostCtl::Kova::DiskReason;
using HostCtl::Lib::HostCtlException;
using Orbis::Fault::SystemError;
using Tessa::MakeRef;
using Tessa::Ref;
using Tessa::Service::LogLevel;
using testing::ElementsAre;
using testing::IsEmpty;
using testing::StartsWith;
using TestSupport::ARecord;
using TestSupport::AScsiDisk;
using TestSupport::LogLineIs;
using TestSupport::NamesDevice;
using Result = Nox::Kova::Host::DiskResult;
using Results = Orbis::DataArray<Result>;

constexpr const char* noFault = "No fault. Operation completed successfully";
constexpr const char* cannotMarshal = "Cannot marshal DiskResult due to %1";
const std::string uuid = "52e7b2b4-0a7c-3a1c-9d3e-2f4a5b6c7d8e";

class Query : public TestSupport::PluginFixture {
 protected:
  Query() : _manager(MakeManager()) {}

  // The answer's disks. The texts of before stay in front.
  Ref<Results> Ask(std::vector<std::string> names) {
    const std::size_t length = _result.size();
    _manager->QueryDisksForKova(names, _fault, _result);
    return TestSupport::ReadAnswer<Results>(_result.substr(length));
  }

  std::vector<std::string> AskForNames(const std::vector<std::string>& names) {
    std::vector<std::string> found;
    const Ref<Results> answer = Ask(names);
    for (const Result* result : *answer) {
      found.push_back(result->GetDisk()->GetCanonicalName());
    }
    return found;
  }

  Ref<KovaManagerImpl> _manager;
  std::string _fault;
  std::string _result;
};

TEST_F(Query, WithoutNamesGivesEveryDiskWhateverItsState) {
  SetHost({AScsiDisk("naa.1"), AScsiDisk("naa.2"), AScsiDisk("naa.3"), AScsiDisk("naa.4")},
          {ARecord("naa.3").InUse(uuid), ARecord("naa.1"), ARecord("naa.2").Ineligible(DiskReason::Usb)});
  const auto answer = Ask({});
  ASSERT_EQ(answer->Size(), 3U);
  EXPECT_EQ((*answer)[0]->GetState(), "inUse");
  EXPECT_EQ((*answer)[0]->GetDisk()->GetKovaDiskInfo()->GetKovaUuid(), uuid);
  EXPECT_EQ((*answer)[1]->GetState(), "eligible");
  EXPECT_FALSE((*answer)[1]->GetError());
  EXPECT_EQ((*answer)[2]->GetState(), "ineligible");
  EXPECT_THAT((*answer)[2]->GetError(), NamesDevice("DiskIsUSB", "naa.2"));
}

TEST_F(Query, KeepsTheKernelsOrderWhateverTheOrderOfTheNames) {
  SetHost({AScsiDisk("naa.1"), AScsiDisk("naa.2"), AScsiDisk("naa.3")},
          {ARecord("naa.3"), ARecord("naa.1"), ARecord("naa.2")});
  EXPECT_THAT(AskForNames({"naa.2", "naa.3"}), ElementsAre("naa.3", "naa.2"));
  EXPECT_THAT(AskForNames({"naa.3", "naa.2", "naa.2"}), ElementsAre("naa.3", "naa.2"));
}

TEST_F(Query, OfAnUnknownNameGivesAnEmptyListAsItsResult) {
  SetHost({AScsiDisk("naa.1")}, {ARecord("naa.1")});
  EXPECT_TRUE(Ask({"naa.9"})->IsEmpty());
  EXPECT_EQ(_fault, "");
}

TEST_F(Query, DoesItsStepsInOrderAndHoldsTheLockForTheCacheOnly) {
  SetHost({AScsiDisk("naa.1")}, {ARecord("naa.1")});
  Ask({});
  EXPECT_THAT(_timeline.Events(),
              ElementsAre("take KovaManager.diskCache", "RefreshKovaInfo()", "QueryDisks([], true)",
                          "release KovaManager.diskCache", "GetStorageDeviceInfo"));
}

TEST_F(Query, AsksTheKernelForAllDisksEvenWhenItNamesSome) {
  Ask({"naa.1"});
  EXPECT_THAT(_kernel.CallTexts(), ElementsAre("RefreshKovaInfo()", "QueryDisks([], true)"));
}

TEST_F(Query, AnswersASecondTimeFromTheCacheAndTheInventoryOfTheMoment) {
  SetHost({AScsiDisk("naa.1")}, {ARecord("naa.1")});
  Ask({});
  _timeline.Take();
  _logger->Clear();
  _storage->SetDisks({});
  EXPECT_TRUE(Ask({})->IsEmpty());
  EXPECT_THAT(_timeline.Events(), ElementsAre("take KovaManager.diskCache", "release KovaManager.diskCache",
                                              "GetStorageDeviceInfo"));
  EXPECT_THAT(_logger->Lines(),
              ElementsAre(LogLineIs(LogLevel::Verbose, "Disk cache is valid, no need to refresh."),
                          LogLineIs(LogLevel::Info, "%1: Failed to marshal disk: %2",
                                    "MarshalHostCtlDiskResults", "naa.1"),
                          LogLineIs(LogLevel::Verbose, noFault)));
}

TEST_F(Query, LeavesTheCacheWholeWhenItNamesSomeDisks) {
  SetHost({AScsiDisk("naa.1"), AScsiDisk("naa.2")}, {ARecord("naa.1"), ARecord("naa.2")});
  EXPECT_THAT(AskForNames({"naa.1"}), ElementsAre("naa.1"));
  EXPECT_THAT(AskForNames({}), ElementsAre("naa.1", "naa.2"));
}

TEST_F(Query, AppendsItsResultAndLeavesTheFaultTextAlone) {
  _fault = "fault before";
  _result = "result before";
  Ask({});
  EXPECT_EQ(_fault, "fault before");
  EXPECT_THAT(_result, StartsWith("result before<?xml"));
  EXPECT_THAT(_logger->Lines(), ElementsAre(LogLineIs(LogLevel::Verbose, noFault)));
}

TEST_F(Query, LeavesTheNamesAsTheyAre) {
  std::vector<std::string> names = {"naa.2", "naa.1", "naa.2"};
  _manager->QueryDisksForKova(names, _fault, _result);
  EXPECT_THAT(names, ElementsAre("naa.2", "naa.1", "naa.2"));
}

TEST_F(Query, DropsADiskThatTheAgentDoesNotKnow) {
  SetHost({AScsiDisk("naa.2")}, {ARecord("naa.1"), ARecord("naa.2")});
  EXPECT_THAT(AskForNames({}), ElementsAre("naa.2"));
  EXPECT_THAT(_logger->Lines(LogLevel::Info),
              ElementsAre(LogLineIs(LogLevel::Info, "%1: Failed to marshal disk: %2",
                                    "MarshalHostCtlDiskResults", "naa.1")));
}

TEST_F(Query, ShowsAStandInForAnAbsentDisk) {
  SetHost({}, {ARecord("").Absent().InUse(uuid)});
  EXPECT_THAT(AskForNames({}), ElementsAre("kova:" + uuid));
}

TEST_F(Query, KeepsTheSsdFlagOfFlashForTheCapacityTier) {
  SetHost({AScsiDisk("naa.1").Ssd()}, {ARecord("naa.1").CapacityFlash()});
  EXPECT_TRUE((*Ask({}))[0]->GetDisk()->GetSsd());
}

TEST_F(Query, WithoutAnInventoryHasNoAnswerAtAll) {
  _kernel.records = {ARecord("naa.1")};
  _app.SetObject("storageSystem", nullptr);
  _fault = "fault before";
  _result = "result before";
  std::vector<std::string> names;
  EXPECT_NO_THROW(_manager->QueryDisksForKova(names, _fault, _result));
  EXPECT_EQ(_fault, "fault before");
  EXPECT_EQ(_result, "result before");
  constexpr const char* reason = "Failed to lookup STORAGE_SYSTEM_MO.";
  EXPECT_THAT(_logger->Lines(), ElementsAre(LogLineIs(LogLevel::Warning, "GetDisksFromAgentd %1", reason),
                                            LogLineIs(LogLevel::Info, cannotMarshal, reason)));
}

TEST_F(Query, LetsOtherExceptionsOfTheInventoryThrough) {
  SetHost({AScsiDisk("x").Unnamed()}, {ARecord("naa.1")});
  std::vector<std::string> names;
  EXPECT_THROW(_manager->QueryDisksForKova(names, _fault, _result), Tessa::NotInitializedException);
  _app.SetObject("storageSystem", _logger);
  EXPECT_THROW(_manager->QueryDisksForKova(names, _fault, _result), Tessa::TypeMismatchException);
  EXPECT_EQ(_result, "");
  EXPECT_THAT(_logger->Lines(LogLevel::Info), IsEmpty());
}

TEST_F(Query, LetsAnotherFaultThanASystemErrorThrough) {
  _storage->SetObserver(
      [] { throw Nox::Fault::DiskIsUSB::Exception(MakeRef<Nox::Fault::DiskIsUSB>("naa.1")); });
  std::vector<std::string> names;
  EXPECT_THROW(_manager->QueryDisksForKova(names, _fault, _result), Nox::Fault::DiskIsUSB::Exception);
}

TEST_F(Query, OfAKernelThatFailsIsAWarningAndAnEmptyList) {
  SetHost({AScsiDisk("naa.1")}, {ARecord("naa.1")});
  _kernel.Fail("QueryDisks", HostCtlException("the kernel is away"));
  EXPECT_TRUE(Ask({})->IsEmpty());
  EXPECT_THAT(
      _logger->Lines(),
      ElementsAre(LogLineIs(LogLevel::Warning, "Failed to refresh KOVA disk cache %1", "the kernel is away"),
                  LogLineIs(LogLevel::Verbose, noFault)));
}

TEST_F(Query, ReleasesItsLockWhenAnotherExceptionLeavesTheKernel) {
  _kernel.Fail("QueryDisks", std::runtime_error("not the kernel's"));
  std::vector<std::string> names;
  EXPECT_THROW(_manager->QueryDisksForKova(names, _fault, _result), std::runtime_error);
  EXPECT_THAT(_locks.HeldHere(), IsEmpty());
  EXPECT_EQ(_timeline.Events().back(), "release KovaManager.diskCache");
  EXPECT_EQ(_result, "");
}

TEST_F(Query, FiltersTheCacheBeforeItReleasesTheLock) {
  SetHost({AScsiDisk("naa.1")}, {ARecord("naa.1")});
  _locks.SetReleaseObserver([this](const std::string&) {
    _locks.SetReleaseObserver({});
    _kernel.records.clear();
    _manager->InvalidateKovaDiskCache();
    _manager->RefreshKovaDiskCache();
  });
  EXPECT_THAT(AskForNames({}), ElementsAre("naa.1"));
}

TEST_F(Query, WorksOnItsOwnCopyWhileTheCacheChanges) {
  SetHost({AScsiDisk("naa.1")}, {ARecord("naa.1")});
  _storage->SetObserver([this] {
    _storage->SetObserver({});
    _kernel.records.clear();
    _manager->InvalidateKovaDiskCache();
    _manager->RefreshKovaDiskCache();
  });
  EXPECT_THAT(AskForNames({}), ElementsAre("naa.1"));
}

}  // namespace
}  // namespace Kovasvc
