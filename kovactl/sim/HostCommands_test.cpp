#include "kovactl/sim/HostCommands.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <unistd.h>

#include <cstdio>
#include <fstream>
#include <sstream>

#include "otxctl/sim/HostFile.h"

namespace Kovactl {
namespace {

using testing::AllOf;
using testing::HasSubstr;

std::string LsblkDevice(const std::string& name, const std::string& more) {
  return R"({"name": ")" + name + R"(", "kname": ")" + name +
         R"(", "ro": false, "rm": false, "hotplug": false,
    "state": null, "tran": "sas", "serial": ")" +
         name + R"(", "model": "HDD", "fstype": null, "label": null,
    "uuid": null, "pttype": null, "ptuuid": null, "zoned": "none", "subsystems": "block:scsi:pci",
    "mountpoints": [null], )" +
         more + "}";
}

const std::string twoDisks =
    R"({"blockdevices": [)" +
    LsblkDevice("sda",
                R"("type": "disk", "size": 4000787030016, "rota": true, "wwn": "0x5000c50000000001")") +
    "," +
    LsblkDevice("sdb", R"("type": "disk", "size": 1048576, "rota": false, "wwn": "0x5000c50000000002")") +
    "," + LsblkDevice("sr0", R"("type": "rom", "size": 1048576, "rota": true, "wwn": null)") + "]}";

constexpr const char* reportOfTwoDisks = R"(Took 2 disks, 1 of them eligible.
DISK                  DEVICE  STATE       WHY NOT
naa.5000c50000000001  sda     eligible
naa.5000c50000000002  sdb     ineligible  1 MiB, smaller than 1 GiB
Left out 1 device.
DEVICE  WHY
sr0     no disk, but of type rom
)";

class HostCommands : public testing::Test {
 protected:
  ~HostCommands() override {
    for (const char* ending : {"", ".lock"}) {
      std::remove((_file + ending).c_str());
    }
  }

  std::string Import(ImportOptions options, const std::string& input = twoDisks) {
    std::istringstream in(input);
    std::ostringstream out;
    std::ostringstream err;
    EXPECT_EQ(RunHostImport(options, in, out, err), ExitStatus::Done);
    _report = err.str();
    return out.str();
  }

  static std::string WhyNotImported(const ImportOptions& options, const std::string& input) {
    std::istringstream in(input);
    std::ostringstream out;
    try {
      RunHostImport(options, in, out, out);
      return "it was imported";
    } catch (const BadInput& refused) {
      EXPECT_EQ(out.str(), "");
      return refused.what();
    }
  }

  std::string Check(const std::string& description) const {
    std::ofstream(_file) << description;
    std::ostringstream out;
    try {
      EXPECT_EQ(RunHostCheck(_file, out), ExitStatus::Done);
      return out.str();
    } catch (const BadInput& refused) {
      EXPECT_EQ(out.str(), "");
      return std::string("refused: ") + refused.what();
    }
  }

  std::string _report;
  const std::string _file = testing::TempDir() + "kova-host-" + std::to_string(getpid()) + ".json";
};

TEST_F(HostCommands, ImportPrintsADescriptionThatIsSound) {
  const std::string text = Import({.file = "-"});
  const auto host = OtxCtl::Sim::ParseHostDescription(text);
  EXPECT_EQ(host.name, "imported");
  EXPECT_EQ(host.minimumDiskBytes, std::int64_t{1} << 30);
  ASSERT_EQ(host.disks.size(), 2u);
  EXPECT_FALSE(host.disks[0].ssd);
  EXPECT_TRUE(host.disks[1].ssd);
}

TEST_F(HostCommands, ImportReportsWhatItTookAndWhatItLeftOut) {
  Import({.file = "-"});
  EXPECT_EQ(_report, reportOfTwoDisks);
}

TEST_F(HostCommands, ImportTakesNameAndMinimumFromTheOptions) {
  const auto host =
      OtxCtl::Sim::ParseHostDescription(Import({.file = "-", .name = "lab", .minimumDiskBytes = 5}));
  EXPECT_EQ(host.name, "lab");
  EXPECT_EQ(host.minimumDiskBytes, 5);
}

TEST_F(HostCommands, ImportReadsAFile) {
  std::ofstream(_file) << twoDisks;
  EXPECT_EQ(Import({.file = _file}, ""), Import({.file = "-"}));
}

TEST_F(HostCommands, ImportWritesAFileAndSaysSo) {
  EXPECT_EQ(Import({.file = "-", .output = _file}), "Wrote " + _file + ": 2 disks.\n" + reportOfTwoDisks);
  EXPECT_EQ(_report, "");
  EXPECT_EQ(OtxCtl::Sim::LoadHostFile(_file).disks.size(), 2u);
}

TEST_F(HostCommands, ImportNamesTheFileAndThePlaceInIt) {
  const std::string broken = R"({"blockdevices": [{"name": "sda", "type": "disk", "size": "large"}]})";
  EXPECT_THAT(WhyNotImported({.file = "-"}, broken),
              AllOf(HasSubstr("standard input: "), HasSubstr("blockdevices[0].size")));
  std::ofstream(_file) << "rubbish";
  EXPECT_THAT(WhyNotImported({.file = _file}, ""), AllOf(HasSubstr(_file + ": "), HasSubstr("line 1")));
  EXPECT_THAT(WhyNotImported({.file = "/no/such/file"}, ""), HasSubstr("/no/such/file"));
}

TEST_F(HostCommands, ImportReadsStandardInputUpToItsLimit) {
  EXPECT_THAT(WhyNotImported({.file = "-"}, std::string((std::size_t{64} << 20) + 1, ' ')),
              HasSubstr("larger than"));
}

TEST_F(HostCommands, ImportLeavesAFileThatItCannotWrite) {
  EXPECT_THAT(WhyNotImported({.file = "-", .output = "/no/such/folder/host.json"}, twoDisks),
              HasSubstr("/no/such/folder/host.json"));
}

TEST_F(HostCommands, CheckSaysWhatASoundHostHolds) {
  EXPECT_EQ(Check(R"({"name": "a", "disks": [{"name": "naa.1", "ssd": true, "bytes": 1},
                      {"name": "naa.2", "ssd": false, "bytes": 1}],
                      "groups": [{"ssd": "naa.1", "capacity": ["naa.2"]}]})"),
            _file + ": host a, 2 disks, 1 disk group: sound\n");
  EXPECT_EQ(Check("{}"), _file + ": unnamed host, 0 disks, 0 disk groups: sound\n");
}

TEST_F(HostCommands, CheckNamesTheFileAndThePlaceOfAMistake) {
  EXPECT_THAT(Check(R"({"disks": [{"name": "naa.1", "ssd": "yes", "bytes": 1}]})"),
              AllOf(HasSubstr("refused: " + _file), HasSubstr("disks[0].ssd")));
  EXPECT_THAT(Check(R"({"disk": []})"), HasSubstr("disk"));
  EXPECT_THAT(Check("{"), HasSubstr("line 1"));
}

}  // namespace
}  // namespace Kovactl
