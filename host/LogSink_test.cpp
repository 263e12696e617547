#include "host/LogSink.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

namespace Host {
namespace {

using Tessa::Ref;
using Tessa::Service::LogArgument;
using Tessa::Service::Logger;
using Tessa::Service::LogInternal;
using Tessa::Service::LogLevel;
using testing::MatchesRegex;

// What the statements leave on standard error.
template <class Body>
std::string LoggedBy(Body body) {
  testing::internal::CaptureStderr();
  body();
  FlushLogs();
  return testing::internal::GetCapturedStderr();
}

// A whole line of that level, name and message.
auto Line(const std::string& levelNameMessage) {
  const std::string time = "[0-9]+-[0-9]+-[0-9]+T[0-9]+:[0-9]+:[0-9]+[.][0-9]+ ";
  return MatchesRegex(time + levelNameMessage + "\n");
}

TEST(LogSink, WritesTimeLevelNameAndMessage) {
  const auto logger = MakeConsoleLogger(LogLevel::Trivia);
  EXPECT_THAT(LoggedBy([&] { LogInternal(logger, LogLevel::Info, "Found %1 of %2", 3, "disks"); }),
              Line("info  kova: Found 3 of disks"));
}

TEST(LogSink, NamesEveryLevel) {
  const auto logger = MakeConsoleLogger(LogLevel::Trivia);
  const std::pair<LogLevel, const char*> rows[] = {{LogLevel::Error, "error"},
                                                   {LogLevel::Warning, "warning"},
                                                   {LogLevel::Info, "info "},
                                                   {LogLevel::Verbose, "debug"},
                                                   {LogLevel::Trivia, "trace"}};
  for (const auto& [level, name] : rows) {
    EXPECT_THAT(LoggedBy([&, at = level] { LogInternal(logger, at, "x"); }),
                Line(std::string(name) + " kova: x"));
  }
}

TEST(LogSink, WritesNothingBeyondItsLevel) {
  const auto logger = MakeConsoleLogger(LogLevel::Warning);
  EXPECT_EQ(logger->GetLevel(), LogLevel::Warning);
  EXPECT_EQ(LoggedBy([&] { LogInternal(logger, LogLevel::Info, "quiet"); }), "");
  EXPECT_THAT(LoggedBy([&] { LogInternal(logger, LogLevel::Warning, "loud"); }), Line("warning kova: loud"));
}

TEST(LogSink, ChildrenWriteUnderTheirOwnNamesAtTheSameLevel) {
  const auto logger = MakeConsoleLogger(LogLevel::Error);
  Ref<Logger> child;
  logger->CreateChild("KovaPluginMgr", child);
  EXPECT_EQ(child->GetLevel(), LogLevel::Error);
  EXPECT_THAT(LoggedBy([&] { LogInternal(child, LogLevel::Error, "broken"); }),
              Line("error KovaPluginMgr: broken"));
}

TEST(LogSink, AnArgumentCannotForgeALine) {
  const auto logger = MakeConsoleLogger(LogLevel::Info);
  const std::string name = "naa.1\n2026-01-01T00:00:00.000 error kova: \x1b[31mforged\xff";
  const std::string logged = LoggedBy([&] { LogInternal(logger, LogLevel::Info, "Disk %1", name); });
  EXPECT_THAT(logged,
              testing::EndsWith("Disk naa.1\\x0a2026-01-01T00:00:00.000 error kova: \\x1b[31mforged\\xff\n"));
  EXPECT_EQ(std::count(logged.begin(), logged.end(), '\n'), 1);
}

TEST(LogSink, TakesBracesAndPercentSignsForWhatTheyAre) {
  const auto logger = MakeConsoleLogger(LogLevel::Info);
  EXPECT_THAT(LoggedBy([&] { LogInternal(logger, LogLevel::Info, "%1 {} %9 %s", "{0} %1"); }),
              testing::EndsWith("kova: {0} %1 {} %9 %s\n"));
}

}  // namespace
}  // namespace Host
