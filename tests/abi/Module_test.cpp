// The built module in a process that opens it as a host program does.

#include <dlfcn.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <stdexcept>
#include <string>
#include <vector>

#include "kova/agentd/include/HostCtlException.h"
#include "kova/agentd/include/KovaHooks.h"
#include "nox/Kova.h"
#include "tests/support/Builders.h"
#include "tests/support/HostFixture.h"
#include "tests/support/Matchers.h"

namespace {

using Tessa::Service::LogLevel;
using testing::ElementsAre;
using testing::ExitedWithCode;
using testing::HasSubstr;
using TestSupport::ARecord;
using TestSupport::AScsiDisk;
using TestSupport::LogLineIs;
using TestSupport::panicStatus;
using Results = Orbis::DataArray<Nox::Kova::Host::DiskResult>;

// The module, open for as long as this lives, and unloaded then.
class Module {
 public:
  Module() : _handle(dlopen(KOVA_MODULE, RTLD_NOW | RTLD_LOCAL)) {
    if (_handle == nullptr) {
      throw std::runtime_error(dlerror());
    }
  }
  ~Module() { dlclose(_handle); }
  Module(const Module&) = delete;
  Module& operator=(const Module&) = delete;

  // The entry point of that name, or null.
  template <class T>
  T* Find(const char* name) const {
    return reinterpret_cast<T*>(dlsym(_handle, name));
  }

  int Init() const { return Find<Kovasvc::InitKovaPluginFn>("InitKovaPlugin")(); }

 private:
  void* const _handle;
};

bool IsLoaded() {
  void* const handle = dlopen(KOVA_MODULE, RTLD_NOW | RTLD_NOLOAD);
  if (handle != nullptr) {
    dlclose(handle);  // asking counts as opening
  }
  return handle != nullptr;
}

class ModuleTest : public TestSupport::HostFixture {};
using ModuleDeathTest = ModuleTest;

TEST_F(ModuleTest, HasEveryEntryPoint) {
  const Module module;
  for (const char* name : {"InitKovaPlugin", "AddDisksHookFn", "InitializeDisksHookFn", "RemoveDisksHookFn",
                           "RemoveDiskMappingHookFn", "QueryDisksForKovaHookFn", "AddAllEligibleDisksHookFn",
                           "UnmountDiskMappingHookFn", "GetStorageInfoHookFn", "GetConfigInfoHookFn",
                           "ClaimUnmountedDiskgroupHookFn", "OTX_ReturnStatusToString", "returnStatusStrs"}) {
    EXPECT_NE(module.Find<char>(name), nullptr) << name;
  }
}

TEST_F(ModuleTest, GivesStatusTextsByCallAndByTable) {
  const Module module;
  auto* const toText = module.Find<const char*(int)>("OTX_ReturnStatusToString");
  const auto* const table = module.Find<const char* const>("returnStatusStrs");
  EXPECT_STREQ(toText(0), "Success");
  EXPECT_STREQ(toText(0x0BAD0003), "Not found");
  EXPECT_STREQ(toText(-1), "Unknown status");
  EXPECT_STREQ(table[0], "Success");
  EXPECT_STREQ(table[341], "Generic service console error");
}

TEST_F(ModuleTest, StartsWithTheHostsLoggerLocksAndProvider) {
  const Module module;
  EXPECT_EQ(module.Init(), 1);
  EXPECT_THAT(_logger->ChildNames(), ElementsAre("KovaPluginMgr"));
  EXPECT_THAT(_timeline.Events(), ElementsAre("make KovaManager", "GetKovaInfo", "make KovaManager.operation",
                                              "make KovaManager.diskCache"));
}

TEST_F(ModuleTest, AnswersAQueryWithObjectsThatTheHostUnderstands) {
  const Module module;
  ASSERT_EQ(module.Init(), 1);
  _storage->SetDisks({AScsiDisk("naa.1")});
  _kernel.records = {ARecord("naa.1")};
  Kovasvc::Texts names;
  std::string fault;
  std::string result;
  module.Find<Kovasvc::QueryDisksForKovaFn>("QueryDisksForKovaHookFn")(names, fault, result);
  EXPECT_EQ(fault, "");
  const auto answer = TestSupport::ReadAnswer<Results>(result);
  ASSERT_EQ(answer->Size(), 1U);
  EXPECT_EQ((*answer)[0]->GetDisk()->GetCanonicalName(), "naa.1");
}

// One type information for each thrown class in the whole process.
TEST_F(ModuleTest, CatchesTheExceptionsOfTheHostsProvider) {
  const Module module;
  ASSERT_EQ(module.Init(), 1);
  _logger->Clear();
  _kernel.Fail("QueryDisks", HostCtl::Lib::KovaExceptionRescanError("rescan failed", "naa.1"));
  Kovasvc::Texts names;
  std::string fault;
  std::string result;
  module.Find<Kovasvc::QueryDisksForKovaFn>("QueryDisksForKovaHookFn")(names, fault, result);
  EXPECT_THAT(
      _logger->Lines(LogLevel::Warning),
      ElementsAre(LogLineIs(LogLevel::Warning, "Failed to refresh KOVA disk cache %1", "rescan failed")));
}

TEST_F(ModuleDeathTest, PanicsThroughTheHostsHandler) {
  const auto query = [this] {
    const Module module;
    module.Init();
    _storage->SetDisks({AScsiDisk("x").Unnamed()});
    _kernel.records = {ARecord("naa.1")};
    Kovasvc::Texts names;
    std::string fault;
    std::string result;
    module.Find<Kovasvc::QueryDisksForKovaFn>("QueryDisksForKovaHookFn")(names, fault, result);
  };
  EXPECT_EXIT(query(), ExitedWithCode(panicStatus), HasSubstr("panic: Not initialized\n"));
}

TEST_F(ModuleTest, IsReallyUnloadedWhenItIsClosed) {
  {
    const Module module;
    ASSERT_EQ(module.Init(), 1);
    EXPECT_TRUE(IsLoaded());
  }
  EXPECT_FALSE(IsLoaded());
}

TEST_F(ModuleTest, MayBeLoadedAndStartedAgainAfterItWasUnloaded) {
  for (int round = 0; round < 2; ++round) {
    const Module module;
    EXPECT_EQ(module.Init(), 1) << "round " << round;
  }
}

TEST_F(ModuleTest, TakesItsManagerDownPieceByPieceWhenItIsUnloaded) {
  _logger->SetEndObserver([this](const std::string& name) { _timeline.Note("destroy logger " + name); });
  {
    const Module module;
    ASSERT_EQ(module.Init(), 1);
    _timeline.Take();
  }
  EXPECT_THAT(_timeline.Events(),
              ElementsAre("delete provider", "destroy KovaManager.diskCache", "destroy KovaManager.operation",
                          "destroy logger KovaPluginMgr", "destroy KovaManager"));
  _logger->SetEndObserver({});
}

TEST_F(ModuleTest, LeavesNothingBehindWhenItWasNeverStarted) {
  { const Module module; }
  EXPECT_FALSE(IsLoaded());
  EXPECT_THAT(_timeline.Events(), testing::IsEmpty());
}

}  // namespace
