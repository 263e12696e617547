#include "otxctl/linux/SysfsReader.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/stat.h>

#include "otxctl/linux/testing/SystemTree.h"

namespace OtxCtl::Linux {
namespace {

using testing::ElementsAre;
using testing::EndsWith;
using testing::HasSubstr;

class SysfsReaderTest : public testing::Test {
 protected:
  SysfsReader Reader() const { return SysfsReader(_tree.Paths().sys); }

  SystemTree _tree;
};

TEST_F(SysfsReaderTest, AnAttributeIsReadTrimmedAndCleaned) {
  _tree.Write("sys/a", "  LAB\x1B[31m \xFFHDD\t\n");
  EXPECT_EQ(Reader().Text("/a").Get(), "LAB[31m \xEF\xBF\xBDHDD");
  EXPECT_EQ(Reader().Bytes("/a").Get(), "  LAB\x1B[31m \xFFHDD\t\n");
}

TEST_F(SysfsReaderTest, WhatDoesNotExistIsKnownNotToBeThere) {
  EXPECT_EQ(Reader().Text("/none").Get(), std::nullopt);
  EXPECT_EQ(Reader().Folder("/none").Get(), std::nullopt);
  EXPECT_EQ(Reader().LinkName("/none").Get(), std::nullopt);
  EXPECT_EQ(Reader().RealPath("/none").Get(), std::nullopt);
  EXPECT_TRUE(Reader().Exists("/none").Is(false));
  EXPECT_THAT(Reader().RequiredText("/none").WhyUnknown(), EndsWith("/sys/none: does not exist"));
}

TEST_F(SysfsReaderTest, WhatCannotBeReadIsUnknownAndTellsWhy) {
  _tree.MakeFolder("sys/folder");
  _tree.Write("sys/long", std::string(4097, 'x'));
  _tree.Write("sys/page", std::string(4096, 'x'));
  EXPECT_THAT(Reader().Text("/folder").WhyUnknown(), EndsWith("/sys/folder: Is a directory"));
  EXPECT_THAT(Reader().Text("/long").WhyUnknown(), EndsWith("/sys/long: longer than 4096 bytes"));
  EXPECT_EQ(Reader().Text("/page").Get(), std::string(4096, 'x'));
  EXPECT_THAT(Reader().Folder("/page").WhyUnknown(), HasSubstr("Not a directory"));
  EXPECT_THAT(Reader().Text("/page/below").WhyUnknown(), HasSubstr("Not a directory"));
  EXPECT_THAT(Reader().LinkName("/page").WhyUnknown(), EndsWith("/sys/page: Invalid argument"));
}

TEST_F(SysfsReaderTest, APipeIsNotWaitedFor) {
  ASSERT_EQ(mkfifo(_tree.Full("sys/pipe").c_str(), 0600), 0);
  EXPECT_EQ(Reader().Text("/pipe").Get(), "");
}

TEST_F(SysfsReaderTest, ARefusalMayMeanThatTheDeviceHasNoSuchThing) {
  // Refuses as drivers do, EINVAL, to be read by other numbers of bytes than of multiples of eight.
  _tree.Link("sys/refuses", "/proc/self/pagemap");
  EXPECT_THAT(Reader().Text("/refuses").WhyUnknown(), EndsWith("/sys/refuses: Invalid argument"));
  EXPECT_EQ(Reader().Text("/refuses", Refusal::MeansNone).Get(), std::nullopt);
  // Nothing is at the beginning of a process' memory: EIO, which is a failure.
  _tree.Link("sys/fails", "/proc/self/mem");
  EXPECT_THAT(Reader().Text("/fails", Refusal::MeansNone).WhyUnknown(), HasSubstr("Input/output error"));
}

TEST_F(SysfsReaderTest, NumbersAndFlagsAreStrict) {
  _tree.Write("sys/number", "8388608\n");
  EXPECT_TRUE(Reader().RequiredNumber("/number").Is(8388608));
  EXPECT_FALSE(Reader().RequiredFlag("/number").IsKnown());
  for (const char* const text : {"", "-1", "1x", "0x10", "99999999999999999999", "1 2"}) {
    _tree.Write("sys/number", text);
    EXPECT_THAT(Reader().RequiredNumber("/number").WhyUnknown(), HasSubstr("/sys/number: not a number: "))
        << text;
  }
  _tree.Write("sys/flag", "1\n");
  EXPECT_TRUE(Reader().RequiredFlag("/flag").Is(true));
  EXPECT_TRUE(Reader().FlagOr(false, "/flag").Is(true));
  EXPECT_TRUE(Reader().FlagOr(false, "/none").Is(false));
  _tree.Write("sys/flag", "yes\n\x1B");
  EXPECT_THAT(Reader().FlagOr(false, "/flag").WhyUnknown(), EndsWith("/sys/flag: neither 0 nor 1: \"yes\""));
}

TEST_F(SysfsReaderTest, LinksAreFollowedInsideOfTheTreeOnly) {
  _tree.MakeFolder("sys/devices/disk");
  _tree.Link("sys/class/block/sda", "../../devices/disk");
  _tree.Link("sys/dangling", "nowhere");
  _tree.Link("sys/out", "/tmp");
  _tree.Link("sys/round", "round");
  EXPECT_EQ(Reader().RealPath("/class/block/sda").Get(), "/devices/disk");
  EXPECT_EQ(Reader().LinkName("/dangling").Get(), "nowhere");
  EXPECT_THAT(Reader().RealPath("/dangling").WhyUnknown(),
              EndsWith("/sys/dangling: No such file or directory"));
  EXPECT_THAT(Reader().RealPath("/out").WhyUnknown(), HasSubstr("/sys/out: leads out of "));
  EXPECT_FALSE(Reader().RealPath("/round").IsKnown());
}

TEST_F(SysfsReaderTest, AFolderListsItsNamesInOrder) {
  _tree.MakeFolder("sys/folder/b");
  _tree.Write("sys/folder/a", "");
  _tree.Write("sys/folder/c\n\xFF", "");
  EXPECT_THAT(*Reader().Folder("/folder").Get(), ElementsAre("a", "b", "c\n\xFF"));
}

TEST_F(SysfsReaderTest, ATreeThatIsNotThereHasNothing) {
  const SysfsReader reader("/no/such/folder\n");
  EXPECT_EQ(reader.Text("/a").Get(), std::nullopt);
  EXPECT_EQ(reader.RealPath("/a").Get(), std::nullopt);
  EXPECT_EQ(reader.RequiredText("/a").WhyUnknown(), "/no/such/folder\\x0a/a: does not exist");
}

TEST(ParseNumber, TakesDigitsAlone) {
  EXPECT_EQ(ParseNumber("9223372036854775807"), INT64_MAX);
  EXPECT_EQ(ParseNumber("9223372036854775808"), std::nullopt);
  EXPECT_EQ(ParseNumber("-0"), std::nullopt);
  EXPECT_EQ(ParseNumber("+1"), std::nullopt);
  EXPECT_EQ(ParseNumber({}), std::nullopt);
}

TEST(LastName, AndTheRestOfAPath) {
  EXPECT_EQ(LastName("/a/b"), "b");
  EXPECT_EQ(LastName("b"), "b");
  EXPECT_EQ(ParentPath("/a/b"), "/a");
  EXPECT_EQ(ParentPath("b"), "");
}

}  // namespace
}  // namespace OtxCtl::Linux
