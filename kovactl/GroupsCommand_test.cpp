#include "kovactl/GroupsCommand.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <sstream>

#include "kovactl/DiskGroups.h"
#include "kovactl/testing/FakeHost.h"
#include "kovactl/testing/Objects.h"
#include "nox/Kova.h"
#include "orbis/Engine.h"
#include "orbis/Json.h"

namespace Kovactl {
namespace {

using Nox::Host::ScsiDisk;
using Nox::Kova::Host::DiskMapInfo;
using Orbis::DataArray;
using Tessa::MakeRef;
using Tessa::Ref;
using Testing::AGroup;

class GroupsCommand : public testing::Test {
 protected:
  GroupsCommand() : _info(MakeRef<StorageInfo>()) { _host.answer.result = _info; }

  ExitStatus Run(const std::string& output = "table") { return RunGroups(_host, output, _out, _err); }

  Testing::FakeHost _host;
  Ref<StorageInfo> _info;
  std::ostringstream _out;
  std::ostringstream _err;
};

TEST_F(GroupsCommand, PrintsEachGroupWithItsDisks) {
  const auto groups = MakeRef<DataArray<DiskMapInfo>>();
  groups->Append(AGroup("naa.1", {"naa.2", "naa.3"}, true));
  groups->Append(AGroup("naa.4", {"naa.5"}, false));
  _info->SetDiskMapInfo(groups);
  _info->SetAutoClaim(false);
  EXPECT_EQ(Run(), ExitStatus::Done);
  EXPECT_EQ(_out.str(),
            "GROUP  ROLE      DISK   KIND          SIZE  STATE\n"
            "    1  cache     naa.1  flash      1.0 GiB  mounted\n"
            "       capacity  naa.2  hard disk  1.0 GiB\n"
            "       capacity  naa.3  hard disk  1.0 GiB\n"
            "    2  cache     naa.4  flash      1.0 GiB  not mounted\n"
            "       capacity  naa.5  hard disk  1.0 GiB\n"
            "\n"
            "2 disk groups; the host waits to be told which disks to claim\n");
}

TEST_F(GroupsCommand, MarksDisksThatHaveLeft) {
  const auto group = AGroup("kova:1", {"naa.2", "kova:3"}, true);
  const auto left = MakeRef<Orbis::TextList>(std::vector<std::string>{ScsiDisk::STATE_ERROR});
  group->GetMapping()->GetSsd()->SetOperationalState(left);
  (*group->GetMapping()->GetNonSsd())[1]->SetOperationalState(left);
  _info->SetDiskMapInfo(MakeRef<DataArray<DiskMapInfo>>());
  _info->GetDiskMapInfo()->Append(group);
  EXPECT_EQ(Run(), ExitStatus::Done);
  EXPECT_EQ(_out.str(),
            "GROUP  ROLE      DISK    KIND          SIZE  STATE\n"
            "    1  cache     kova:1  flash      1.0 GiB  mounted, has left the host\n"
            "       capacity  naa.2   hard disk  1.0 GiB\n"
            "       capacity  kova:3  hard disk  1.0 GiB  has left the host\n"
            "\n"
            "1 disk group\n");
}

Ref<Nox::Kova::Host::DataVolume> AVolume(const std::string& disk, const std::string& path,
                                         const std::string& cacheState) {
  const auto volume = MakeRef<Nox::Kova::Host::DataVolume>();
  volume->SetDisk(disk);
  volume->SetPath(path);
  volume->SetBytes(std::int64_t{3} << 30);
  volume->SetCacheState(cacheState);
  return volume;
}

TEST_F(GroupsCommand, ShowsTheDataVolumesOfCapacityDisks) {
  const auto groups = MakeRef<DataArray<DiskMapInfo>>();
  groups->Append(AGroup("naa.1", {"naa.2", "naa.3"}, true));
  groups->Append(AGroup("naa.4", {"naa.5"}, false));
  const auto volumes = MakeRef<DataArray<Nox::Kova::Host::DataVolume>>();
  volumes->Append(AVolume("naa.2", "/dev/g/d2", "cached, 37% used"));
  volumes->Append(AVolume("naa.3", "/dev/g/d3", ""));
  (*groups)[0]->SetVolume(volumes);
  _info->SetDiskMapInfo(groups);
  EXPECT_EQ(Run(), ExitStatus::Done);
  EXPECT_EQ(
      _out.str(),
      "GROUP  ROLE      DISK   KIND          SIZE  STATE        VOLUME     VOLUME SIZE  CACHE\n"
      "    1  cache     naa.1  flash      1.0 GiB  mounted\n"
      "       capacity  naa.2  hard disk  1.0 GiB               /dev/g/d2      3.0 GiB  cached, 37% used\n"
      "       capacity  naa.3  hard disk  1.0 GiB               /dev/g/d3      3.0 GiB\n"
      "    2  cache     naa.4  flash      1.0 GiB  not mounted\n"
      "       capacity  naa.5  hard disk  1.0 GiB\n"
      "\n"
      "2 disk groups\n");
}

TEST_F(GroupsCommand, SaysThatThereAreNone) {
  _info->SetAutoClaim(true);
  EXPECT_EQ(Run(), ExitStatus::Done);
  EXPECT_EQ(_out.str(), "0 disk groups; the host claims disks on its own\n");
}

TEST_F(GroupsCommand, LeavesOutWhatTheHostDidNotSay) {
  EXPECT_EQ(Run(), ExitStatus::Done);
  EXPECT_EQ(_out.str(), "0 disk groups\n");
}

TEST_F(GroupsCommand, PrintsTheObjectForScripts) {
  _info->SetAutoClaim(true);
  EXPECT_EQ(Run("json"), ExitStatus::Done);
  const auto read = Orbis::ReadJson(_out.str(), Orbis::Limits::OwnOutput(), &StorageInfo::StaticType());
  EXPECT_TRUE(Orbis::Equal(read.Get(), _info.Get()));
}

TEST_F(GroupsCommand, ExplainsAFault) {
  _host.answer = Host::FailedWith("no host");
  EXPECT_EQ(Run(), ExitStatus::Fault);
  EXPECT_EQ(_out.str(), "");
  EXPECT_THAT(_err.str(), testing::HasSubstr("no host"));
}

}  // namespace
}  // namespace Kovactl
