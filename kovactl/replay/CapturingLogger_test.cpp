#include "kovactl/replay/CapturingLogger.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

namespace Kovactl {
namespace {

using Tessa::MakeRef;
using Tessa::Ref;
using Tessa::Service::Logger;
using Tessa::Service::LogInternal;
using Tessa::Service::LogLevel;
using testing::ElementsAre;

std::vector<std::string> FormatsOf(CapturingLogger& logger) {
  std::vector<std::string> formats;
  for (const CapturedLine& line : logger.Take()) {
    formats.push_back(line.format);
  }
  return formats;
}

TEST(CapturingLogger, KeepsLevelFormatAndPrintedArguments) {
  const auto logger = MakeRef<CapturingLogger>(LogLevel::Trivia);
  LogInternal(*logger, LogLevel::Verbose, "Found %1 of %2", 3, "disks");
  const auto lines = logger->Take();
  ASSERT_EQ(lines.size(), 1u);
  EXPECT_EQ(lines[0].level, LogLevel::Verbose);
  EXPECT_EQ(lines[0].format, "Found %1 of %2");
  EXPECT_THAT(lines[0].arguments, ElementsAre("3", "disks"));
}

TEST(CapturingLogger, ForgetsWhatItHandedOver) {
  const auto logger = MakeRef<CapturingLogger>(LogLevel::Trivia);
  LogInternal(*logger, LogLevel::Info, "once");
  EXPECT_THAT(FormatsOf(*logger), ElementsAre("once"));
  EXPECT_THAT(FormatsOf(*logger), ElementsAre());
}

TEST(CapturingLogger, KeepsNothingBeyondItsLevel) {
  const auto logger = MakeRef<CapturingLogger>(LogLevel::Warning);
  LogInternal(*logger, LogLevel::Info, "quiet");
  LogInternal(*logger, LogLevel::Warning, "loud");
  EXPECT_THAT(FormatsOf(*logger), ElementsAre("loud"));
}

TEST(CapturingLogger, KeepsTheLinesOfItsChildren) {
  const auto logger = MakeRef<CapturingLogger>(LogLevel::Trivia);
  Ref<Logger> child;
  logger->CreateChild("x", child);
  LogInternal(child, LogLevel::Info, "from the child");
  EXPECT_THAT(FormatsOf(*logger), ElementsAre("from the child"));
}

TEST(CapturingLogger, OfTheChildrenOfADefaultLoggerKeepsThemApartFromItsOwnLines) {
  const auto own = MakeRef<CapturingLogger>(LogLevel::Error);
  const auto children = MakeRef<CapturingLogger>(LogLevel::Trivia);
  const Ref<Logger> logger = WithChild(own, children);
  EXPECT_EQ(logger->GetLevel(), LogLevel::Error);
  LogInternal(logger, LogLevel::Error, "of the program");
  Ref<Logger> child;
  logger->CreateChild("KovaPluginMgr", child);
  LogInternal(child, LogLevel::Trivia, "of the plug-in");
  EXPECT_THAT(FormatsOf(*own), ElementsAre("of the program"));
  EXPECT_THAT(FormatsOf(*children), ElementsAre("of the plug-in"));
}

}  // namespace
}  // namespace Kovactl
