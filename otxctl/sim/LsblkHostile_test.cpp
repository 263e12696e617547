// Captures that nobody's lsblk wrote: refused with a word on where, in bounded time.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <string>

#include "otxctl/sim/HostDescriptionError.h"
#include "otxctl/sim/LsblkImport.h"
#include "otxctl/sim/SimRules.h"

namespace OtxCtl::Sim {
namespace {

using testing::AllOf;
using testing::HasSubstr;
using testing::StartsWith;

constexpr const char* columns =
    R"("size": 4294967296, "rota": true, "ro": false, "rm": false, "hotplug": false, "state": "running",
    "tran": "sas", "model": "M", "fstype": null, "label": null, "uuid": null, "pttype": null, "ptuuid": null,
    "zoned": "none", "subsystems": "block:scsi:pci", "mountpoints": [null])";

// `more` begins with a comma, or is empty.
std::string Device(const std::string& name, const std::string& type, const std::string& more = "") {
  return R"({"name": ")" + name + R"(", "kname": ")" + name + R"(", "wwn": "0x)" + name +
         R"(", "serial": "S)" + name + R"(", "type": ")" + type + "\"," + columns + more + "}";
}

std::string Disk(const std::string& name, const std::string& more = "") {
  return Device(name, "disk", more);
}

// Of few columns: what stands on disks needs no more.
std::string Above(const std::string& name, const std::string& type, const std::string& parent) {
  return R"({"name":")" + name + R"(","type":")" + type + R"(","pkname":")" + parent + R"("})";
}

std::string Capture(const std::string& devices) {
  return R"({"blockdevices": [)" + devices + "]}";
}

std::string ErrorOf(const std::string& text) {
  try {
    ImportLsblk(text);
  } catch (const HostDescriptionError& error) {
    return error.what();
  }
  return "accepted";
}

bool IsOffered(const LsblkImport& import, std::size_t disk) {
  return VerdictOn(import.host, import.host.disks.at(disk), nullptr).state == 1;
}

TEST(LsblkHostile, WhatStandsOnItselfIsRefused) {
  EXPECT_THAT(ErrorOf(Capture(Disk("sda", R"(, "pkname": "sda")") + "," + Disk("sdb"))),
              AllOf(StartsWith("blockdevices[0]: sda stands on itself"), HasSubstr("run: lsblk")));
  EXPECT_THAT(ErrorOf(Capture(Disk("sdc") + "," + Disk("sda", R"(, "pkname": "sdb")") + "," +
                              Disk("sdb", R"(, "pkname": "sda")"))),
              StartsWith("blockdevices[1]: sda stands on itself"));
}

TEST(LsblkHostile, ACircleAboveADiskIsUseOfIt) {
  const LsblkImport import = ImportLsblk(Capture(
      Disk("sda", R"(, "children": [)" + Above("a", "lvm", "b") + "," + Above("b", "lvm", "a") + "]")));
  EXPECT_FALSE(IsOffered(import, 0));
}

TEST(LsblkHostile, WhatIsNestedInOneAndNamesAnotherStandsOnBoth) {
  const LsblkImport import = ImportLsblk(
      Capture(Disk("sda", R"(, "children": [)" + Above("dm-0", "crypt", "sdb") + "]") + "," + Disk("sdb")));
  EXPECT_FALSE(IsOffered(import, 0));
  EXPECT_FALSE(IsOffered(import, 1));
}

TEST(LsblkHostile, ADiskThatStandsOnAnotherDeviceIsLeftOutAndTold) {
  const LsblkImport import =
      ImportLsblk(Capture(Disk("sda") + "," + Disk("bcache0", R"(, "pkname": "sda")")));
  ASSERT_EQ(import.leftOut.size(), 1U);
  EXPECT_EQ(import.leftOut[0].name, "bcache0");
  EXPECT_EQ(import.leftOut[0].why, "stands on sda");
}

TEST(LsblkHostile, TooDeepDoubledOrOfAnotherKindIsRefused) {
  std::string deep = "[";
  for (int level = 0; level < 100'000; ++level) {
    deep += R"({"children":[)";
  }
  EXPECT_THAT(ErrorOf(R"({"blockdevices": )" + deep), HasSubstr("deep"));
  EXPECT_THAT(ErrorOf(Capture(Disk("sda", R"(, "fstype": "ext4")"))), HasSubstr("fstype"));
  for (const char* const children : {"{}", "1", "\"sda1\"", "[[]]", "[null]", "[true]"}) {
    EXPECT_THAT(ErrorOf(Capture(Disk("sda", std::string(R"(, "children": )") + children))),
                StartsWith("blockdevices[0].children"))
        << children;
  }
}

TEST(LsblkHostile, VeryManyDevicesOnOneDiskTakeLinearTime) {
  std::string devices = Disk("sda");
  for (int number = 0; number < 20'000; ++number) {
    devices += "," + Above("d" + std::to_string(number), "lvm", "sda");
  }
  const LsblkImport import = ImportLsblk(Capture(devices));
  EXPECT_FALSE(IsOffered(import, 0));
  EXPECT_THAT(import.host.disks.at(0).detail, HasSubstr("d7 (lvm), held by 19992 more"));
}

TEST(LsblkHostile, OneDeviceOnVeryManyDisksTakesLinearTime) {
  std::string devices;
  for (int number = 0; number < 3'000; ++number) {
    const std::string name = "s" + std::to_string(number);
    devices += (number == 0 ? "" : ",") + Disk(name) + "," + Above("md0", "raid0", name);
  }
  for (int number = 0; number < 3'000; ++number) {
    devices += "," + Above("d" + std::to_string(number), "lvm", "md0");
  }
  const LsblkImport import = ImportLsblk(Capture(devices));
  ASSERT_EQ(import.host.disks.size(), 3'000U);
  EXPECT_FALSE(IsOffered(import, 2'999));
}

TEST(LsblkHostile, VeryManyPathsAndMultipathDevicesTakeLinearTime) {
  std::string devices;
  for (int path = 0; path < 60; ++path) {
    devices += (path == 0 ? "" : ",") + Disk("s" + std::to_string(path));
  }
  for (int map = 0; map < 60; ++map) {
    for (int path = 0; path < 60; ++path) {
      const std::string name = "m" + std::to_string(map);
      devices += "," + (path == 0 ? Device(name, "mpath", R"(, "pkname": "s0")")
                                  : Device(name, "mpath", R"(, "pkname": "s)" + std::to_string(path) + "\""));
    }
  }
  const LsblkImport import = ImportLsblk(Capture(devices));
  ASSERT_EQ(import.host.disks.size(), 60U);
  EXPECT_FALSE(IsOffered(import, 0));
}

TEST(LsblkHostile, VeryManyMountsOfOneDiskTakeLinearTime) {
  std::string mounts = R"(, "fstype": "ext4", "mountpoints": ["/0")";
  for (int number = 1; number < 50'000; ++number) {
    mounts += ",\"/" + std::to_string(number) + "\"";
  }
  std::string disk = Disk("sda", mounts + "]");
  for (const char* const twice : {R"("fstype": null, )", R"(, "mountpoints": [null])"}) {
    disk.erase(disk.find(twice), std::string(twice).size());
  }
  const LsblkImport import = ImportLsblk(Capture(disk));
  EXPECT_FALSE(IsOffered(import, 0));
  EXPECT_LT(import.host.disks.at(0).detail.size(), 1000U);
}

}  // namespace
}  // namespace OtxCtl::Sim
