#include "kovactl/TasksCommand.h"

#include <gtest/gtest.h>

#include <sstream>

#include "orbis/ParseException.h"

namespace Kovactl {
namespace {

std::string Printed(const std::string& tasks, const std::string& output = "table") {
  std::ostringstream out;
  EXPECT_EQ(PrintTasks(tasks, output, out), ExitStatus::Done);
  return out.str();
}

TEST(TasksCommand, PrintsEachTaskWithWhatBecameOfIt) {
  EXPECT_EQ(
      Printed(R"({"tasks": [
    {"id": "t-1", "label": "mine", "operation": "AddDisks", "state": "failed", "created": "2023-11-14T22:13:20Z",
     "started": "2023-11-14T22:13:20Z", "ended": "2023-11-14T22:13:21Z", "percent": 0, "step": "",
     "fault": {"@type": "DiskIsUSB", "device": "naa.1"}},
    {"id": "t-2", "label": "", "operation": "RemoveDisk", "state": "running", "created": "2023-11-14T22:13:22Z",
     "started": "2023-11-14T22:13:22Z", "percent": 40, "step": "moving"},
    {"id": "t-3", "label": "", "operation": "RemoveDisk", "state": "waiting", "created": "2023-11-14T22:13:23Z",
     "percent": 0, "step": ""}]})"),
      "TASK  OPERATION   LABEL  STATE    CREATED               ENDED                 REMARK\n"
      "t-1   AddDisks    mine   failed   2023-11-14T22:13:20Z  2023-11-14T22:13:21Z  attached by USB: naa.1\n"
      "t-2   RemoveDisk         running  2023-11-14T22:13:22Z                        40 %: moving\n"
      "t-3   RemoveDisk         waiting  2023-11-14T22:13:23Z\n"
      "\n"
      "3 tasks: 1 failed, 1 running, 1 waiting\n");
}

TEST(TasksCommand, SaysThatThereAreNone) {
  EXPECT_EQ(Printed(R"({"tasks": []})"), "0 tasks\n");
}

TEST(TasksCommand, PrintsTheAgentsAnswerForScripts) {
  EXPECT_EQ(Printed("{\"tasks\":[]}\n", "json"), "{\"tasks\":[]}\n");
}

TEST(TasksCommand, RefusesAnAnswerThatIsNone) {
  std::ostringstream out;
  for (const char* text : {"{}", "{\"tasks\": 1}", "[]", "rubbish"}) {
    EXPECT_THROW(PrintTasks(text, "table", out), Orbis::ParseException) << text;
  }
  EXPECT_EQ(out.str(), "");
}

TEST(TasksCommand, LetsNoLabelPlayWithTheTerminal) {
  EXPECT_EQ(Printed(R"({"tasks": [{"id": "t-1", "label": "\u001b[2J", "state": "\u001b[1m"}]})"),
            "TASK  LABEL    STATE\n"
            "t-1   \\x1b[2J  \\x1b[1m\n"
            "\n"
            "1 task: 1 \\x1b[1m\n");
}

}  // namespace
}  // namespace Kovactl
