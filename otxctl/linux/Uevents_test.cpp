#include "otxctl/linux/Uevents.h"

#include <gtest/gtest.h>

#include <string>

namespace OtxCtl::Linux {
namespace {

std::string Message(const std::string& action, const std::string& subsystem) {
  std::string text =
      action + "@/devices/x|ACTION=" + action + "|DEVPATH=/devices/x|SUBSYSTEM=" + subsystem + "|SEQNUM=7|";
  for (char& character : text) {
    character = character == '|' ? '\0' : character;
  }
  return text;
}

TEST(Uevents, DisksComeGoAndChange) {
  for (const char* const action : {"add", "remove", "change", "move"}) {
    EXPECT_TRUE(IsDiskEvent(Message(action, "block"))) << action;
    EXPECT_FALSE(IsDiskEvent(Message(action, "net"))) << action;
    EXPECT_FALSE(IsDiskEvent(Message(action, "blocks"))) << action;
  }
  EXPECT_FALSE(IsDiskEvent(Message("bind", "block")));
}

TEST(Uevents, WhatCannotBeToldMayBeADisk) {
  EXPECT_TRUE(IsDiskEvent({}));
  EXPECT_TRUE(IsDiskEvent(std::string(100, '\0')));
  EXPECT_TRUE(IsDiskEvent("ACTION=add"));
  EXPECT_TRUE(IsDiskEvent("SUBSYSTEM=net"));
  EXPECT_TRUE(IsDiskEvent("add@/devices/x\n\xFF"));
  const std::string message = Message("add", "block");
  EXPECT_TRUE(IsDiskEvent(message.substr(0, message.size() - 1))) << "without a byte at the end";
}

}  // namespace
}  // namespace OtxCtl::Linux
