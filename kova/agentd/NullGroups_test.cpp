// A null group in a list or a reference is treated like a null disk: reading it throws "Not initialized".

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <functional>
#include <string>
#include <vector>

#include "kova/agentd/disks/DiskMappings.h"
#include "tests/support/InitializeFixture.h"
#include "tests/support/SpyManager.h"

namespace Kovasvc {
namespace {

using Nox::Kova::Host::DiskMapResult;
using Tessa::MakeRef;
using Tessa::NotInitializedException;
using Tessa::Ref;
using Tessa::Service::LogLevel;
using testing::ElementsAre;
using testing::IsEmpty;
using testing::StrEq;
using testing::ThrowsMessage;
using TestSupport::LogLineIs;
using TestSupport::Mappings;
using TestSupport::SpyManager;

const auto isNotInitialized = ThrowsMessage<NotInitializedException>(StrEq("Not initialized"));

// The group that is not there.
const Ref<KovaManagerImpl::Mapping> noGroup;

TEST(NullGroup, HasNoNamesToRead) {
  std::vector<std::string> names = {"before"};
  EXPECT_THAT([] { Existing(nullptr); }, isNotInitialized);
  EXPECT_THAT([] { SsdNameOf(nullptr); }, isNotInitialized);
  EXPECT_THAT([] { CapacityNamesOf(nullptr); }, isNotInitialized);
  EXPECT_THAT([&] { DiskMappingToDeviceNames(noGroup, names); }, isNotInitialized);
  EXPECT_THAT(names, ElementsAre("before"));
}

TEST(NullGroup, EndsTheLogOfAListBehindTheGroupsBefore) {
  const auto logger = MakeRef<TestSupport::RecordingLogger>(LogLevel::Verbose);
  const auto list = Mappings({TestSupport::AMapping(TestSupport::Ssd("s1"), {}), noGroup});
  EXPECT_THAT([&] { LogDiskMappings(*logger, list.Get()); }, isNotInitialized);
  EXPECT_THAT(logger->Lines(), ElementsAre(LogLineIs(LogLevel::Verbose, TestSupport::groupLine,
                                                     "LogDiskMappings", "0", "s1", "")));
  EXPECT_THAT([&] { LogOneDiskMapping(*logger, noGroup); }, isNotInitialized);
}

class NullGroupInAnOperation : public TestSupport::InitializeFixture {
 protected:
  const std::function<void()> _initialize = [this] {
    Ref<Orbis::Any> result;
    Ref<Orbis::MethodFault> fault;
    _manager->InitializeDisksInt(Mappings({_first, noGroup, _third}).Get(), "tag", result, fault);
  };
};

TEST_F(NullGroupInAnOperation, IsMetByTheCheckOfTheRequest) {
  EXPECT_THAT(
      [this] {
        _manager->ValidateDiskMappings(Mappings({_first, noGroup}).Get());
      },
      isNotInitialized);
  EXPECT_THAT(_initialize, isNotInitialized);
  EXPECT_THAT(_timeline.Events(), IsEmpty());
  EXPECT_THAT(_logger->Lines(), IsEmpty());
}

TEST_F(NullGroupInAnOperation, IsMetByTheCheckOfTheGroupWhichLeavesTheResultAlone) {
  auto result = MakeRef<DiskMapResult>();
  result->SetMapping(_first);
  EXPECT_THAT([&] { _manager->ValidateDiskMapping(noGroup, result); }, isNotInitialized);
  EXPECT_THAT([&] { _manager->InitializeMapping(noGroup, "tag", 1, 0, result); }, isNotInitialized);
  EXPECT_EQ(result->GetMapping(), _first);
  EXPECT_THAT(_timeline.Events(), IsEmpty());
}

TEST_F(NullGroupInAnOperation, IsMetWhenItIsMadeWhateverTheChecksOfADerivedManagerSaid) {
  const auto spy = UseManager<SpyManager>();
  spy->validateDiskMappings = [] {};
  spy->validateDiskMapping = [](const auto&, auto&) {};
  EXPECT_THAT(_initialize, isNotInitialized);
  EXPECT_THAT(Formats(), ElementsAre("FormatDiskMapping(s1, [a], {tag, 3, 0})"))
      << "those before it are made";
}

TEST_F(NullGroupInAnOperation, CannotExist) {
  EXPECT_THAT([this] { _manager->DiskMappingExists(noGroup); }, isNotInitialized);
  EXPECT_THAT(_kernel.Calls(), IsEmpty());
}

TEST_F(NullGroupInAnOperation, CannotBeUnmountedAndReleasesTheLock) {
  Ref<KovaManagerImpl::Mapping> mapping;
  Ref<Orbis::MethodFault> fault;
  EXPECT_THAT([&] { _manager->UnmountDiskMappingInt(mapping, "tag", fault); }, isNotInitialized);
  EXPECT_THAT(_timeline.Events(), ElementsAre(TestSupport::takeOperation, TestSupport::releaseOperation));
  EXPECT_FALSE(fault);
}

TEST_F(NullGroupInAnOperation, IsNoGroupAtAllWhenTheListIsNull) {
  UseManager<SpyManager>()->validateDiskMappings = [] {};
  Ref<Orbis::Any> result;
  Ref<Orbis::MethodFault> fault;
  _manager->InitializeDisksInt(nullptr, "tag", result, fault);
  EXPECT_TRUE(dynamic_cast<const MapResults&>(*result).IsEmpty());
  EXPECT_FALSE(fault);
}

}  // namespace
}  // namespace Kovasvc
