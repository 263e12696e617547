#include "machines/HostSettingsFile.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include <filesystem>
#include <fstream>
#include <sstream>

#include "host/HostError.h"

namespace Machines {
namespace {

using OtxCtl::Linux::HostSettings;
using testing::ElementsAre;
using testing::HasSubstr;

class HostSettingsFile : public testing::Test {
 protected:
  HostSettingsFile() { std::filesystem::create_directory(_folder); }
  ~HostSettingsFile() override { std::filesystem::remove_all(_folder); }

  void Write(const std::string& text) const {
    std::ofstream(_file) << text;
    chmod(_file.c_str(), 0644);
  }

  std::string Text() const {
    std::ostringstream text;
    text << std::ifstream(_file).rdbuf();
    return text.str();
  }

  std::string ErrorOf(const std::string& text) const {
    Write(text);
    return WhyRefused();
  }

  std::string WhyRefused() const {
    try {
      ReadHostSettings(_file);
      return "";
    } catch (const Host::HostError& refused) {
      return refused.what();
    }
  }

  const std::string _folder = testing::TempDir() + "kova-settings-" + std::to_string(getpid());
  const std::string _file = _folder + "/host.json";
};

TEST_F(HostSettingsFile, SaysWhatNoKernelKnows) {
  Write(R"({"cluster": {"enabled": true, "clusterUuid": "c", "nodeUuid": "n"}, "faultDomain": "rack-1",
            "networks": [{"interface": "otx1", "masterMulticastGroup": "224.1.2.3",
                          "agentMulticastGroup": "FF19::1"}],
            "autoMode": true, "minimumDiskBytes": 5, "capacityFlash": ["naa.2", "naa.1"]})");
  const HostSettings settings = ReadHostSettings(_file);
  EXPECT_TRUE(settings.isAutoMode);
  EXPECT_TRUE(settings.isInCluster);
  EXPECT_EQ(settings.clusterUuid, "c");
  EXPECT_EQ(settings.nodeUuid, "n");
  EXPECT_EQ(settings.faultDomain, "rack-1");
  ASSERT_EQ(settings.nics.size(), 1U);
  EXPECT_EQ(settings.nics[0].interface, "otx1");
  EXPECT_EQ(settings.nics[0].masterGroup, "224.1.2.3");
  EXPECT_EQ(settings.nics[0].agentGroup, "FF19::1");
  EXPECT_EQ(settings.minimumDiskBytes, 5);
  EXPECT_THAT(settings.capacityFlash, ElementsAre("naa.1", "naa.2"));
}

TEST_F(HostSettingsFile, WithoutOneEverythingHasItsDefault) {
  const HostSettings settings = ReadHostSettings(_file);
  EXPECT_FALSE(settings.isInCluster);
  EXPECT_EQ(settings.minimumDiskBytes, std::int64_t{1} << 30);
  Write("{}");
  EXPECT_EQ(ReadHostSettings(_file).minimumDiskBytes, std::int64_t{1} << 30);
}

TEST_F(HostSettingsFile, AMistakeIsToldWithFileAndPath) {
  for (const auto& [text, path] : std::vector<std::pair<const char*, const char*>>{
           {"", "line 1, column 1: "},
           {"[]", "must be an object"},
           {R"({"cluster": {"enabled": "yes"}})", "cluster.enabled: "},
           {R"({"minimumDiskBytes": -1})", "minimumDiskBytes: "},
           {R"({"networks": [{"interface": 1}]})", "networks[0].interface: "},
           {R"({"capacityFlash": "naa.1"})", "capacityFlash: must be a list"},
           {R"({"capacityFlash": ["naa.1", ""]})", "capacityFlash[1]: must be a disk's canonical name"},
           {R"({"capacityFlash": [1]})", "capacityFlash[0]: must be a disk's canonical name"},
           {R"({"disks": []})", "disks: is no known key"},
           {R"({"faults": []})", "faults: is no known key"},
           {R"({"\u001b": 1})", ": is no known key"}}) {
    EXPECT_THAT(ErrorOf(text), testing::AllOf(testing::StartsWith(_file + ": "), HasSubstr(path)));
  }
}

TEST_F(HostSettingsFile, OneThatOthersMayWriteIsRefused) {
  Write("{}");
  for (const mode_t mode : {0664U, 0646U, 0666U}) {
    chmod(_file.c_str(), mode);
    EXPECT_EQ(WhyRefused(), _file + ": group or others may write it; take that away with chmod go-w");
  }
  chmod(_file.c_str(), 0600);
  EXPECT_EQ(WhyRefused(), "");
}

TEST_F(HostSettingsFile, OneOfAnotherUserIsRefused) {
  if (geteuid() != 0) {
    GTEST_SKIP() << "only root can give a file away";
  }
  Write("{}");
  ASSERT_EQ(chown(_file.c_str(), 12345, 12345), 0);
  EXPECT_EQ(WhyRefused(), _file + ": belongs to another user; it must be root's");
}

TEST_F(HostSettingsFile, WhatIsNoFileIsRefused) {
  std::filesystem::create_directory(_file);
  EXPECT_THAT(WhyRefused(), HasSubstr(_file));
}

TEST_F(HostSettingsFile, MarksAreSetAndClearedAndTheRestStays) {
  Write(R"({"faultDomain": "rack-1", "capacityFlash": ["naa.2"]})");
  EXPECT_TRUE(MarkCapacityFlash(_file, "naa.1", true));
  EXPECT_FALSE(MarkCapacityFlash(_file, "naa.1", true));
  EXPECT_THAT(ReadHostSettings(_file).capacityFlash, ElementsAre("naa.1", "naa.2"));
  EXPECT_EQ(ReadHostSettings(_file).faultDomain, "rack-1");
  EXPECT_TRUE(MarkCapacityFlash(_file, "naa.2", false));
  EXPECT_FALSE(MarkCapacityFlash(_file, "naa.2", false));
  EXPECT_THAT(ReadHostSettings(_file).capacityFlash, ElementsAre("naa.1"));
}

TEST_F(HostSettingsFile, TheFirstMarkMakesTheFile) {
  EXPECT_TRUE(MarkCapacityFlash(_file, "naa.1", true));
  EXPECT_EQ(WhyRefused(), "");
  EXPECT_THAT(ReadHostSettings(_file).capacityFlash, ElementsAre("naa.1"));
}

TEST_F(HostSettingsFile, NoMarkIsMadeInAFileWithAMistake) {
  const std::string mistake = R"({"faultDomain": 1})";
  Write(mistake);
  EXPECT_THROW(MarkCapacityFlash(_file, "naa.1", true), Host::HostError);
  EXPECT_EQ(Text(), mistake);
  EXPECT_THROW(MarkCapacityFlash(_folder + "/none/host.json", "naa.1", true), Host::HostError);
}

}  // namespace
}  // namespace Machines
