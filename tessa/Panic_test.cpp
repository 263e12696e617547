#include "tessa/Panic.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <unistd.h>

#include <csignal>
#include <cstring>
#include <stdexcept>
#include <string>

#include "tessa/Throwable.h"

namespace Tessa {
namespace {

using ::testing::Eq;
using ::testing::ExitedWithCode;
using ::testing::KilledBySignal;

// A host program's handler: writes the text down and ends the process its own way.
void WriteAndExit(const char* text) {
  const std::string line = std::string("[") + text + "]";
  _exit(write(STDERR_FILENO, line.data(), line.size()) > 0 ? 70 : 71);
}

void WriteAndReturn(const char* text) {
  if (write(STDERR_FILENO, text, std::strlen(text)) > 0) {
    return;
  }
}

[[noreturn]] void PanicUnder(PanicHandler handler, const char* text) {
  SetPanicHandler(handler);
  PanicExit(text);
}

[[noreturn]] void VerifyUnderHandler() {
  SetPanicHandler(&WriteAndExit);
  PanicVerify("disk != nullptr", "kova/agentd/KovaLibManager", 12);
}

[[noreturn]] void NotReachedUnderHandler() {
  SetPanicHandler(&WriteAndExit);
  Panic("NOT_REACHED %s:%d\n", "kova/agentd/KovaLibManager", 1908);
}

[[noreturn]] void ExceptionUnderHandler() {
  SetPanicHandler(&WriteAndExit);
  PanicExit(TypeMismatchException("expected a disk, found a lamp"));
}

[[noreturn]] void EndlessTextUnderHandler() {
  SetPanicHandler(&WriteAndExit);
  const std::string text(100'000, 'x');
  Panic("%s", text.c_str());
}

TEST(PanicDeathTest, SaysWhichConditionFailedWhere) {
  EXPECT_EXIT(PanicVerify("disk != nullptr", "kova/agentd/KovaLibManager", 12), KilledBySignal(SIGABRT),
              Eq("panic: disk != nullptr at kova/agentd/KovaLibManager:12\n"));
  EXPECT_EXIT(VerifyUnderHandler(), ExitedWithCode(70),
              Eq("[disk != nullptr at kova/agentd/KovaLibManager:12]"));
}

TEST(PanicDeathTest, PrintsItsFormatWithoutTheLineFeedAtTheEnd) {
  EXPECT_EXIT(NotReachedUnderHandler(), ExitedWithCode(70),
              Eq("[NOT_REACHED kova/agentd/KovaLibManager:1908]"));
  EXPECT_EXIT(Panic("NOT_REACHED %s:%d\n", "kova/agentd/KovaLibManager", 1908), KilledBySignal(SIGABRT),
              Eq("panic: NOT_REACHED kova/agentd/KovaLibManager:1908\n"));
}

TEST(PanicDeathTest, CutsATextThatIsTooLong) {
  EXPECT_EXIT(EndlessTextUnderHandler(), ExitedWithCode(70), Eq("[" + std::string(4095, 'x') + "]"));
}

TEST(PanicDeathTest, RepeatsTheTextOfAnException) {
  EXPECT_EXIT(PanicExit(std::runtime_error("out of paper")), KilledBySignal(SIGABRT),
              Eq("panic: out of paper\n"));
  EXPECT_EXIT(ExceptionUnderHandler(), ExitedWithCode(70), Eq("[expected a disk, found a lamp]"));
}

TEST(PanicDeathTest, EndsTheProcessEvenWhenTheHandlerReturns) {
  EXPECT_EXIT(PanicUnder(&WriteAndReturn, "once|"), KilledBySignal(SIGABRT), Eq("once|panic: once|\n"));
}

TEST(PanicHandler, IsGivenBackWhenAnotherIsInstalled) {
  EXPECT_EQ(SetPanicHandler(&WriteAndExit), nullptr);
  EXPECT_EQ(SetPanicHandler(&WriteAndReturn), &WriteAndExit);
  EXPECT_EQ(SetPanicHandler(nullptr), &WriteAndReturn);
}

TEST(Throwable, SaysItsTextAndItsCopiesDoToo) {
  const TypeMismatchException original("expected this");
  const Throwable copy = original;
  EXPECT_STREQ(copy.what(), "expected this");
  EXPECT_STREQ(static_cast<const std::exception&>(original).what(), "expected this");
}

}  // namespace
}  // namespace Tessa
