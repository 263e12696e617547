#include "otxctl/disks/DiskNames.h"

#include <gtest/gtest.h>

#include <string>

namespace OtxCtl::Disks {
namespace {

TEST(DiskNames, WorldWideNamesHaveTheirKindInFront) {
  EXPECT_EQ(WorldWideName("0x5000C50000000201"), "naa.5000c50000000201");
  EXPECT_EQ(WorldWideName("0X5000c50000000201"), "naa.5000c50000000201");
  EXPECT_EQ(WorldWideName("naa.5000C50000000201"), "naa.5000c50000000201");
  EXPECT_EQ(WorldWideName("eui.0025385B71B00600"), "eui.0025385b71b00600");
  EXPECT_EQ(WorldWideName("t10.ATA     LAB HDD   S/1  "), "t10.ata_lab_hdd_s_1");
  EXPECT_EQ(WorldWideName(""), "");
  EXPECT_EQ(WorldWideName("0x"), "");
  EXPECT_EQ(WorldWideName("\n;$"), "");
}

TEST(DiskNames, TheMostTellingNameIsTaken) {
  EXPECT_EQ(CanonicalName({"naa.1", "LAB", "HDD", "S1"}, "sda"), "naa.1");
  EXPECT_EQ(CanonicalName({"", "LAB", "HDD 4G", "a/b\n c;$(d)"}, "sda"), "t10.LAB_HDD_4G_a_b_c_d");
  EXPECT_EQ(CanonicalName({"", "", "HDD", "S1"}, "sda"), "t10.HDD_S1");
  EXPECT_EQ(CanonicalName({"", "LAB", "HDD", ""}, "pci-0000:00:05.0"), "path.pci-0000:00:05.0");
  EXPECT_EQ(CanonicalName({}, "\xC3\xA9"), "path.disk");
}

TEST(DiskNames, ALongNameIsCut) {
  EXPECT_EQ(CanonicalName({"", "", "", std::string(1000, 's')}, "").size(), 200U);
  EXPECT_EQ(WorldWideName("0x" + std::string(1000, 'f')).size(), 204U);
}

TEST(DiskNames, AreHandedOutOnce) {
  UniqueNames names;
  EXPECT_EQ(names.Take("naa.1"), "naa.1");
  EXPECT_EQ(names.Take("naa.1"), "naa.1.2");
  EXPECT_EQ(names.Take("naa.1.2"), "naa.1.2.2");
  EXPECT_EQ(names.Take("naa.1"), "naa.1.3");
  EXPECT_EQ(names.Take("naa.2"), "naa.2");
}

TEST(DiskNames, PeopleReadMakerModelAndKernelName) {
  EXPECT_EQ(DisplayName({"", "LAB", "HDD 4G", ""}, "sda"), "LAB HDD 4G (sda)");
  EXPECT_EQ(DisplayName({"", "", "HDD", ""}, "sda"), "HDD (sda)");
  EXPECT_EQ(DisplayName({}, "vdb"), "Disk (vdb)");
}

}  // namespace
}  // namespace OtxCtl::Disks
