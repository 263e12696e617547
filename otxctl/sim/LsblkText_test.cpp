#include "otxctl/sim/LsblkText.h"

#include <gtest/gtest.h>

namespace OtxCtl::Sim {
namespace {

TEST(LsblkText, EscapedBytesOfOldVersionsAreReadAndCleaned) {
  EXPECT_EQ(CleanLsblkText("LAB\\x20HDD\\x20\\x20"), "LAB HDD");
  EXPECT_EQ(CleanLsblkText("caf\\xc3\\xA9"), "caf\xC3\xA9");
  EXPECT_EQ(CleanLsblkText("a\\x1b[31mb\\x00"), "a[31mb");
  EXPECT_EQ(CleanLsblkText("a\\x4"), "a\\x4");
  EXPECT_EQ(CleanLsblkText("a\\xg0"), "a\\xg0");
  EXPECT_EQ(CleanLsblkText("\\"), "\\");
  EXPECT_EQ(CleanLsblkText(""), "");
}

TEST(LsblkText, EscapesThatJsonLacksBecomeOnesItHas) {
  EXPECT_EQ(WithSoundEscapes(R"("a\x20b")"), R"("a\\x20b")");
  EXPECT_EQ(WithSoundEscapes(R"("a\\x20b")"), R"("a\\x20b")") << "an escaped backslash is sound";
  EXPECT_EQ(WithSoundEscapes(R"("a\\\x20b")"), R"("a\\\\x20b")");
  EXPECT_EQ(WithSoundEscapes(R"("\n\u0041\x4")"), R"("\n\u0041\x4")") << "anything else stays as it is";
  EXPECT_EQ(WithSoundEscapes("\\"), "\\");
}

TEST(LsblkText, NamesComeWithAndWithoutFolder) {
  EXPECT_EQ(WithoutFolder("sda"), "sda");
  EXPECT_EQ(WithoutFolder("/dev/sda"), "sda");
  EXPECT_EQ(WithoutFolder("/dev/mapper/vg-root"), "vg-root");
  EXPECT_EQ(WithoutFolder("/dev/cciss/c0d0"), "cciss/c0d0");
  EXPECT_EQ(WithoutFolder("cciss!c0d0"), "cciss/c0d0");
  EXPECT_EQ(WithoutFolder("/dev/"), "/dev/");
}

}  // namespace
}  // namespace OtxCtl::Sim
