#include "otxctl/linux/Commands.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

namespace OtxCtl::Linux {
namespace {

using testing::HasSubstr;

std::string WhyNotRun(SystemCommands& commands, const std::vector<std::string>& command) {
  try {
    commands.Run(command);
    return "";
  } catch (const CommandFailed& failed) {
    return failed.what();
  }
}

TEST(SystemCommands, TellStatusAndBothOutputsApart) {
  const CommandResult result = SystemCommands().Run({"/bin/sh", "-c", "echo out; echo err >&2; exit 7"});
  EXPECT_EQ(result.status, 7);
  EXPECT_EQ(result.output, "out\n");
  EXPECT_EQ(result.errors, "err\n");
}

TEST(SystemCommands, HaveACleanEnvironmentAndNothingToRead) {
  setenv("KOVA_SECRET", "x", 1);
  EXPECT_EQ(SystemCommands().Run({"/usr/bin/env"}).output.find("KOVA_SECRET"), std::string::npos);
  EXPECT_THAT(SystemCommands().Run({"/usr/bin/env"}).output, HasSubstr("LC_ALL=C\n"));
  EXPECT_EQ(SystemCommands().Run({"/bin/cat"}).output, "");
  unsetenv("KOVA_SECRET");
}

TEST(SystemCommands, ArgumentsAreNeverReadByAShell) {
  EXPECT_EQ(SystemCommands().Run({"/bin/echo", "$(id); 'a' \"b\" *"}).output, "$(id); 'a' \"b\" *\n");
}

TEST(SystemCommands, LongOutputsOnBothSidesComeWhole) {
  const CommandResult result = SystemCommands().Run(
      {"/bin/sh", "-c", "head -c 300000 /dev/zero; head -c 300000 /dev/zero >&2; head -c 300000 /dev/zero"});
  EXPECT_EQ(result.output.size(), 600000U);
  EXPECT_EQ(result.errors.size(), 300000U);
}

TEST(SystemCommands, ASignalCountsAsAStatus) {
  EXPECT_EQ(SystemCommands().Run({"/bin/sh", "-c", "kill -9 $$"}).status, 137);
}

TEST(SystemCommands, AProgramThatIsNotThereIsAnError) {
  SystemCommands commands;
  EXPECT_FALSE(commands.Has("/no/such/program"));
  EXPECT_TRUE(commands.Has("/bin/sh"));
  EXPECT_EQ(WhyNotRun(commands, {"/no/such/program"}),
            "/no/such/program cannot be run: No such file or directory");
}

TEST(SystemCommands, AProgramThatDoesNotEndIsAskedToAndNotWaitedFor) {
  SystemCommands commands{std::chrono::milliseconds(50)};
  EXPECT_THAT(WhyNotRun(commands, {"/bin/sleep", "600"}), HasSubstr("has not ended in time"));
  // One that has closed its outputs, but goes on.
  EXPECT_THAT(WhyNotRun(commands, {"/bin/sh", "-c", "exec sleep 600 >&- 2>&-"}),
              HasSubstr("has not ended in time"));
}

}  // namespace
}  // namespace OtxCtl::Linux
