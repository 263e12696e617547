#include "otxctl/linux/LvmReport.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <fstream>
#include <sstream>

namespace OtxCtl::Linux {
namespace {

using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;

std::string Recorded(const std::string& name) {
  std::ifstream file(std::string(KOVA_RECORDED_TREES) + "/" + name);
  EXPECT_TRUE(file) << name;
  std::ostringstream text;
  text << file.rdbuf();
  return text.str();
}

std::string ErrorOf(std::string_view report) {
  try {
    ReadPhysicalVolumes(report);
    return "";
  } catch (const BadReport& bad) {
    return bad.what();
  }
}

TEST(LvmReport, TellsVolumesWithTheirTags) {
  const auto volumes = ReadPhysicalVolumes(Recorded("lvm-tagged-pvs.json"));
  ASSERT_EQ(volumes.size(), 3U);
  for (const PhysicalVolume& volume : volumes) {
    EXPECT_EQ(volume.groupName, "lab");
    EXPECT_EQ(volume.groupUuid, volumes[0].groupUuid);
    EXPECT_THAT(volume.groupTags, ElementsAre("kova", "kova.state=ready"));
    EXPECT_THAT(volume.tags, ElementsAre(HasSubstr("kova.disk=")));
    EXPECT_THAT(volume.deviceNumber, testing::StartsWith("8:"));
  }
}

TEST(LvmReport, AMissingMemberKeepsItsTagsAndHasNoDevice) {
  const auto volumes = ReadPhysicalVolumes(Recorded("lvm-missing-pvs.json"));
  ASSERT_EQ(volumes.size(), 3U);
  int missing = 0;
  for (const PhysicalVolume& volume : volumes) {
    missing += volume.deviceNumber.empty() ? 1 : 0;
    EXPECT_THAT(volume.tags, ElementsAre(HasSubstr("kova.disk=")));
  }
  EXPECT_EQ(missing, 1);
}

TEST(LvmReport, AMemberThatItsGroupHasLostIsNotReported) {
  EXPECT_EQ(ReadPhysicalVolumes(Recorded("lvm-outdated-pvs.json")).size(), 2U);
}

TEST(LvmReport, AVolumeInNoGroupHasNone) {
  const auto volumes = ReadPhysicalVolumes(Recorded("lvm-updated-pvs.json"));
  const auto isFree = [](const PhysicalVolume& volume) { return volume.groupUuid.empty(); };
  EXPECT_EQ(std::count_if(volumes.begin(), volumes.end(), isFree), 1);
}

TEST(LvmReport, WordsAroundTheReportArePassedOver) {
  const std::string report = Recorded("lvm-missing-pvs.stderr") + Recorded("lvm-missing-pvs.json") +
                             Recorded("lvm-missing-pvs.stderr");
  EXPECT_EQ(ReadPhysicalVolumes(report).size(), 3U);
}

TEST(LvmReport, TellsWhetherVolumesAreActive) {
  const auto volumes = ReadLogicalVolumes(Recorded("lvm-tagged-lvs.json"));
  ASSERT_EQ(volumes.size(), 2U);
  EXPECT_TRUE(volumes[0].isActive);
  EXPECT_EQ(volumes[0].kind, "cache");
  EXPECT_EQ(volumes[0].cacheMode, "writethrough");
  EXPECT_GT(volumes[0].cacheBlocks, 0);
}

std::string Row(const std::string& name, const std::string& open, const std::string& used) {
  return R"({"vg_uuid":"u","lv_name":")" + name +
         R"(","lv_path":"/dev/v/n","lv_size":"8192","lv_tags":"a,b",)" +
         R"("segtype":"linear","lv_active":"","lv_device_open":")" + open +
         R"(","cache_mode":"","cache_used_blocks":")" + used + R"(","cache_total_blocks":"9"})";
}

TEST(LvmReport, TellsWhatAVolumeIs) {
  const auto volumes = ReadLogicalVolumes(R"({"report":[{"lv":[)" + Row("n", "open", "7") + "," +
                                          Row("n", "open", "7") + "," + Row("o", "unknown", "") + "]}]}");
  ASSERT_EQ(volumes.size(), 2U) << "a volume of two segments has two rows";
  EXPECT_EQ(volumes[0].groupUuid, "u");
  EXPECT_EQ(volumes[0].name, "n");
  EXPECT_EQ(volumes[0].path, "/dev/v/n");
  EXPECT_EQ(volumes[0].bytes, 8192);
  EXPECT_THAT(volumes[0].tags, ElementsAre("a", "b"));
  EXPECT_EQ(volumes[0].kind, "linear");
  EXPECT_FALSE(volumes[0].isActive);
  EXPECT_TRUE(volumes[0].isOpen);
  EXPECT_EQ(volumes[0].usedBlocks, 7);
  EXPECT_EQ(volumes[0].cacheBlocks, 9);
  EXPECT_FALSE(volumes[1].isOpen);
  EXPECT_EQ(volumes[1].usedBlocks, 0);
}

TEST(LvmReport, ANumberThatIsNoneIsRefused) {
  EXPECT_THROW(ReadLogicalVolumes(R"({"report":[{"lv":[)" + Row("n", "", "x") + "]}]}"), BadReport);
}

TEST(LvmReport, AMemberThatIsBackAfterItsGroupHasChangedIsLeftBehind) {
  const std::string rows =
      R"({"report":[{"pv":[{"pv_name":"/dev/sda","pv_major":"8","pv_minor":"0","pv_missing":"missing",
          "pv_pe_count":"511","pv_tags":"","vg_name":"v","vg_uuid":"u","vg_tags":""}]}]})";
  const auto volumes = ReadPhysicalVolumes(rows);
  EXPECT_EQ(volumes.at(0).deviceNumber, "8:0");
  EXPECT_TRUE(volumes[0].isLeftBehind);
  EXPECT_EQ(volumes[0].extents, 511);
}

TEST(LvmReport, NothingToTellIsAReport) {
  EXPECT_THAT(ReadPhysicalVolumes(R"({"report":[{"pv":[]}]})"), IsEmpty());
}

TEST(LvmReport, WhatIsNoReportIsRefused) {
  EXPECT_EQ(ErrorOf(""), "the volume manager gave no report");
  EXPECT_EQ(ErrorOf("WARNING: nothing"), "the volume manager gave no report");
  EXPECT_EQ(ErrorOf("}{"), "the volume manager gave no report");
  EXPECT_EQ(ErrorOf(R"({"report":[)"
                    "}"),
            "the volume manager's report is no JSON");
  EXPECT_EQ(ErrorOf("{}"), "the volume manager's report has no part \"report\"");
  EXPECT_EQ(ErrorOf(R"({"report":[{"vg":[]}]})"), "the volume manager's report has no part \"pv\"");
  EXPECT_EQ(ErrorOf(R"({"report":[1]})"), "the volume manager's report has no part \"pv\"");
  EXPECT_EQ(ErrorOf(R"({"report":[{"pv":[1]}]})"), "the volume manager's report has a row that is none");
  EXPECT_EQ(ErrorOf(R"({"report":[{"pv":[{}]}]})"), "the volume manager's report has no column pv_name");
  EXPECT_EQ(ErrorOf(R"({"report":[{"pv":[{"pv_name":1}]}]})"),
            "the volume manager's report has no column pv_name");
}

TEST(LvmReport, CutOffAnywhereItIsRefused) {
  const std::string whole = Recorded("lvm-missing-pvs.json");
  const std::size_t last = whole.rfind('}');
  for (std::size_t length = 0; length <= last; length += 7) {
    EXPECT_NE(ErrorOf(std::string_view(whole).substr(0, length)), "") << length;
  }
}

TEST(LvmReport, HostileTextsAreCleaned) {
  const auto volumes = ReadPhysicalVolumes(
      R"({"report":[{"pv":[{"pv_name":"/dev/sda","pv_major":"8","pv_minor":"0","pv_missing":"",
          "pv_pe_count":"5","pv_tags":",a,,b,","vg_name":"\u001b[31mX","vg_uuid":"u","vg_tags":""}]}]})");
  EXPECT_EQ(volumes.at(0).groupName, "[31mX");
  EXPECT_THAT(volumes.at(0).tags, ElementsAre("a", "b"));
  EXPECT_THAT(volumes.at(0).groupTags, IsEmpty());
}

}  // namespace
}  // namespace OtxCtl::Linux
