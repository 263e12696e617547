// What every hook does with its arguments, and with the exceptions that an operation lets out.

#include "kova/agentd/KovaLibManager.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <functional>
#include <ostream>
#include <stdexcept>
#include <string>
#include <utility>
#include <vector>

#include "kova/agentd/include/HostCtlException.h"
#include "tests/support/PluginFixture.h"

namespace Kovasvc {
namespace {

using Tessa::MakeRef;
using Tessa::Ref;
using Tessa::Service::LogLevel;
using testing::AllOf;
using testing::ElementsAre;
using testing::EndsWith;
using testing::ExitedWithCode;
using testing::HasSubstr;
using testing::IsEmpty;
using testing::Not;
using testing::StartsWith;
using TestSupport::panicStatus;

// What a hook is called with. Each argument differs from every other, so that a mix-up shows.
struct HookArguments {
  Texts texts = {"first text", "second text"};
  std::string first = "first";
  std::string second = "second";
  std::string third = "third";
  std::string fault = "fault before;";
  std::string result = "result before;";
};
constexpr int firstOption = 11;
constexpr int secondOption = 22;

// Says which operation was called with which arguments, by identity, and behaves as it is told.
class ScriptedManager final : public KovaManagerImpl {
 public:
  using KovaManagerImpl::KovaManagerImpl;

  std::string operation;
  std::vector<const void*> addresses;
  std::vector<int> options;
  std::function<void()> behaviour;

  void AddDisks(const Texts& disks, const std::string& tag, std::string& fault,
                std::string& result) override {
    Called("AddDisks", {&disks, &tag, &fault, &result}, &fault, &result);
  }
  void InitializeDisks(const Texts& mappings, const std::string& tag, std::string& fault,
                       std::string& result) override {
    Called("InitializeDisks", {&mappings, &tag, &fault, &result}, &fault, &result);
  }
  void RemoveDisk(const std::string& disk, const std::string& pass, const std::string& text, int one, int two,
                  std::string& fault) override {
    options = {one, two};
    Called("RemoveDisk", {&disk, &pass, &text, &fault}, &fault, nullptr);
  }
  void RemoveDiskMapping(const std::string& mapping, const std::string& pass, const std::string& text,
                         int one, int two, std::string& fault) override {
    options = {one, two};
    Called("RemoveDiskMapping", {&mapping, &pass, &text, &fault}, &fault, nullptr);
  }
  void QueryDisksForKova(Texts& names, std::string& fault, std::string& result) override {
    Called("QueryDisksForKova", {&names, &fault, &result}, &fault, &result);
  }
  void AddAllEligibleDisks(const std::string& tag, std::string& fault, std::string& result) override {
    Called("AddAllEligibleDisks", {&tag, &fault, &result}, &fault, &result);
  }
  void UnmountDiskMapping(const Texts& mappings, const std::string& tag, std::string& fault,
                          std::string& result) override {
    Called("UnmountDiskMapping", {&mappings, &tag, &fault, &result}, &fault, &result);
  }
  void GetStorageInfo(std::string& result) override { Called("GetStorageInfo", {&result}, nullptr, &result); }
  void GetConfigInfo(std::string& result) override { Called("GetConfigInfo", {&result}, nullptr, &result); }
  void ClaimUnmountedDiskgroup() override { Called("ClaimUnmountedDiskgroup", {}, nullptr, nullptr); }

 private:
  void Called(const char* name, std::vector<const void*> arguments, std::string* fault, std::string* result) {
    operation = name;
    addresses = std::move(arguments);
    if (fault != nullptr) {
      *fault += "F";
    }
    if (result != nullptr) {
      *result += "R";
    }
    if (behaviour) {
      behaviour();
    }
  }
};

struct Hook {
  const char* name;
  const char* operation;
  bool throwablesOnly;  // catches the runtime's own exceptions only
  bool hasFault;
  bool hasResult;
  void (*call)(HookArguments& with);
  std::vector<const void*> (*addresses)(const HookArguments& of);
};

std::ostream& operator<<(std::ostream& out, const Hook& hook) {
  return out << hook.name;
}

const Hook hooks[] = {
    {"AddDisksHookFn", "AddDisks", true, true, true,
     [](HookArguments& with) { AddDisksHookFn(with.texts, with.first, with.fault, with.result); },
     [](const HookArguments& of) {
       return std::vector<const void*>{&of.texts, &of.first, &of.fault, &of.result};
     }},
    {"InitializeDisksHookFn", "InitializeDisks", true, true, true,
     [](HookArguments& with) { InitializeDisksHookFn(with.texts, with.first, with.fault, with.result); },
     [](const HookArguments& of) {
       return std::vector<const void*>{&of.texts, &of.first, &of.fault, &of.result};
     }},
    {"RemoveDisksHookFn", "RemoveDisk", false, true, false,
     [](HookArguments& with) {
       RemoveDisksHookFn(with.first, with.second, with.third, firstOption, secondOption, with.fault);
     },
     [](const HookArguments& of) {
       return std::vector<const void*>{&of.first, &of.second, &of.third, &of.fault};
     }},
    {"RemoveDiskMappingHookFn", "RemoveDiskMapping", false, true, false,
     [](HookArguments& with) {
       RemoveDiskMappingHookFn(with.first, with.second, with.third, firstOption, secondOption, with.fault);
     },
     [](const HookArguments& of) {
       return std::vector<const void*>{&of.first, &of.second, &of.third, &of.fault};
     }},
    {"QueryDisksForKovaHookFn", "QueryDisksForKova", false, true, true,
     [](HookArguments& with) { QueryDisksForKovaHookFn(with.texts, with.fault, with.result); },
     [](const HookArguments& of) {
       return std::vector<const void*>{&of.texts, &of.fault, &of.result};
     }},
    {"AddAllEligibleDisksHookFn", "AddAllEligibleDisks", false, true, true,
     [](HookArguments& with) { AddAllEligibleDisksHookFn(with.first, with.fault, with.result); },
     [](const HookArguments& of) {
       return std::vector<const void*>{&of.first, &of.fault, &of.result};
     }},
    {"UnmountDiskMappingHookFn", "UnmountDiskMapping", false, true, true,
     [](HookArguments& with) { UnmountDiskMappingHookFn(with.texts, with.first, with.fault, with.result); },
     [](const HookArguments& of) {
       return std::vector<const void*>{&of.texts, &of.first, &of.fault, &of.result};
     }},
    {"GetStorageInfoHookFn", "GetStorageInfo", false, false, true,
     [](HookArguments& with) { GetStorageInfoHookFn(with.result); },
     [](const HookArguments& of) { return std::vector<const void*>{&of.result}; }},
    {"GetConfigInfoHookFn", "GetConfigInfo", false, false, true,
     [](HookArguments& with) { GetConfigInfoHookFn(with.result); },
     [](const HookArguments& of) { return std::vector<const void*>{&of.result}; }},
    {"ClaimUnmountedDiskgroupHookFn", "ClaimUnmountedDiskgroup", false, false, false,
     [](HookArguments&) { ClaimUnmountedDiskgroupHookFn(); },
     [](const HookArguments&) { return std::vector<const void*>(); }},
};

class EveryHook : public TestSupport::PluginFixture, public testing::WithParamInterface<Hook> {
 protected:
  EveryHook() {
    Ref<Tessa::Service::Logger> logger = _logger;
    _manager = MakeRef<ScriptedManager>(logger);
    _kovaManagerImpl = _manager;
    _logger->Clear();
  }

  // Calls the hook of this test while its operation throws a copy of the exception.
  template <class Exception>
  void CallWith(const Exception& exception) {
    _manager->behaviour = [exception] { throw exception; };
    GetParam().call(_arguments);
  }

  HookArguments _arguments;
  Ref<ScriptedManager> _manager;
};
using EveryHookDeathTest = EveryHook;

INSTANTIATE_TEST_SUITE_P(Hooks, EveryHook, testing::ValuesIn(hooks),
                         [](const auto& test) { return std::string(test.param.name); });

TEST_P(EveryHook, ForwardsItsArgumentsUnchangedAndInOrder) {
  const HookArguments before = _arguments;
  GetParam().call(_arguments);
  EXPECT_EQ(_manager->operation, GetParam().operation);
  EXPECT_EQ(_manager->addresses, GetParam().addresses(_arguments));
  if (!_manager->options.empty()) {
    EXPECT_THAT(_manager->options, ElementsAre(firstOption, secondOption));
  }
  EXPECT_EQ(_arguments.texts, before.texts);
  EXPECT_EQ(_arguments.first, before.first);
  EXPECT_EQ(_arguments.second, before.second);
  EXPECT_EQ(_arguments.third, before.third);
}

TEST_P(EveryHook, GivesTheFaultStringFirstAndTheResultStringSecond) {
  GetParam().call(_arguments);
  EXPECT_EQ(_arguments.fault, GetParam().hasFault ? "fault before;F" : "fault before;");
  EXPECT_EQ(_arguments.result, GetParam().hasResult ? "result before;R" : "result before;");
}

TEST_P(EveryHook, LogsNothingWhenTheOperationReturns) {
  GetParam().call(_arguments);
  EXPECT_THAT(_logger->Lines(), IsEmpty());
}

TEST_P(EveryHook, LetsWhatIsNoStandardExceptionThrough) {
  EXPECT_THROW(CallWith(4711), int);
  EXPECT_THAT(_logger->Lines(), IsEmpty());
}

TEST_P(EveryHook, KeepsWhatTheOperationWroteBeforeItThrew) {
  EXPECT_THROW(CallWith(4711), int);
  EXPECT_EQ(_arguments.fault, GetParam().hasFault ? "fault before;F" : "fault before;");
}

INSTANTIATE_TEST_SUITE_P(Hooks, EveryHookDeathTest, testing::ValuesIn(hooks),
                         [](const auto& test) { return std::string(test.param.name); });

TEST_P(EveryHookDeathTest, PanicsWithTheTextOfAnExceptionOfTheRuntime) {
  EXPECT_EXIT(CallWith(Tessa::NotInitializedException("Not initialized")), ExitedWithCode(panicStatus),
              AllOf(HasSubstr("panic: Not initialized\n"), Not(HasSubstr("log "))));
}

TEST_P(EveryHookDeathTest, LogsAManagementFaultAndPanics) {
  const Orbis::Fault::SystemError::Exception exception(MakeRef<Orbis::Fault::SystemError>("no such host"));
  EXPECT_EXIT(CallWith(exception), ExitedWithCode(panicStatus),
              AllOf(HasSubstr("log [error] Fault: %1 | <?xml"), HasSubstr("<reason>no such host</reason>"),
                    EndsWith("panic: SystemError: no such host\n")));
}

TEST_P(EveryHookDeathTest, PanicsOverOtherStandardExceptionsUnlessItIsOfTheFirstTwo) {
  const std::runtime_error exception("out of luck");
  if (GetParam().throwablesOnly) {
    EXPECT_THROW(CallWith(exception), std::runtime_error);
  } else {
    EXPECT_EXIT(CallWith(exception), ExitedWithCode(panicStatus),
                AllOf(HasSubstr("panic: out of luck\n"), Not(HasSubstr("log "))));
  }
}

TEST_P(EveryHookDeathTest, CountsTheKernelsExceptionsAmongTheOtherStandardOnes) {
  const HostCtl::Lib::KovaStorageException exception("kernel says no", "naa.1");
  if (GetParam().throwablesOnly) {
    EXPECT_THROW(CallWith(exception), HostCtl::Lib::KovaStorageException);
  } else {
    EXPECT_EXIT(CallWith(exception), ExitedWithCode(panicStatus), HasSubstr("panic: kernel says no\n"));
  }
}

class PanicOverFaultDeathTest : public TestSupport::PluginFixture {
 protected:
  PanicOverFaultDeathTest() {
    Ref<Tessa::Service::Logger> logger = _logger;
    const auto manager = MakeRef<ScriptedManager>(logger);
    manager->behaviour = [] {
      throw Orbis::Fault::SystemError::Exception(MakeRef<Orbis::Fault::SystemError>("no such host"));
    };
    _kovaManagerImpl = manager;
    _logger->Clear();
  }
};

TEST_F(PanicOverFaultDeathTest, LogsTheFaultAtLevelError) {
  _logger->SetLevel(LogLevel::Error);
  EXPECT_EXIT(ClaimUnmountedDiskgroupHookFn(), ExitedWithCode(panicStatus),
              StartsWith("log [error] Fault: %1 | "));
}

TEST_F(PanicOverFaultDeathTest, DoesNotLogTheFaultBelowLevelError) {
  _logger->SetLevel(LogLevel::None);
  EXPECT_EXIT(ClaimUnmountedDiskgroupHookFn(), ExitedWithCode(panicStatus),
              "^panic: SystemError: no such host\n$");
}

TEST_F(PanicOverFaultDeathTest, GoesOnWithoutADefaultLogger) {
  Tessa::Service::SetDefaultLogger(nullptr);
  EXPECT_EXIT(ClaimUnmountedDiskgroupHookFn(), ExitedWithCode(panicStatus),
              "^panic: SystemError: no such host\n$");
}

TEST_F(PanicOverFaultDeathTest, LogsWithTheDefaultLoggerAndNotThePluginsOwn) {
  const auto other = MakeRef<TestSupport::RecordingLogger>();
  Tessa::Service::SetDefaultLogger(other);
  EXPECT_EXIT(ClaimUnmountedDiskgroupHookFn(), ExitedWithCode(panicStatus), "^panic: [^\n]*\n$");
}

}  // namespace
}  // namespace Kovasvc
