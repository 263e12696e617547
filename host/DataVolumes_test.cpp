#include "host/DataVolumes.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <string>

#include "nox/Host.h"
#include "orbis/DataArray.h"
#include "orbis/Json.h"

namespace Host {
namespace {

using Nox::Host::ScsiDisk;
using Nox::Kova::Host::DiskMapInfo;
using Nox::Kova::Host::DiskMapping;
using StorageInfo = Nox::Kova::Host::ConfigInfo::StorageInfo;
using Tessa::MakeRef;
using Tessa::Ref;
using testing::ElementsAre;

Ref<ScsiDisk> ADisk(const std::string& name) {
  auto disk = MakeRef<ScsiDisk>();
  disk->SetCanonicalName(name);
  return disk;
}

Ref<DiskMapInfo> AGroup(const std::string& ssd, const std::vector<std::string>& capacity) {
  const auto disks = MakeRef<Orbis::DataArray<ScsiDisk>>();
  for (const std::string& name : capacity) {
    disks->Append(ADisk(name));
  }
  const auto mapping = MakeRef<DiskMapping>();
  mapping->SetSsd(ADisk(ssd));
  mapping->SetNonSsd(disks);
  auto group = MakeRef<DiskMapInfo>();
  group->SetMapping(mapping);
  group->SetMounted(true);
  return group;
}

// A group of two capacity disks, and one of a disk that has left.
class DataVolumes : public testing::Test {
 protected:
  DataVolumes() {
    _info.SetDiskMapInfo(MakeRef<Orbis::DataArray<DiskMapInfo>>());
    _info.GetDiskMapInfo()->Append(AGroup("naa.1", {"naa.2", "naa.3"}));
    _info.GetDiskMapInfo()->Append(AGroup("naa.4", {"kova:u5"}));
  }

  std::string Text() const {
    std::string text;
    Orbis::WriteJson(_info, text);
    return text;
  }
  // "DISK PATH BYTES CACHESTATE", of one group.
  std::vector<std::string> Shown(std::size_t group) const {
    std::vector<std::string> lines;
    const auto& volumes = (*_info.GetDiskMapInfo())[group]->GetVolume();
    if (volumes) {
      for (const Nox::Kova::Host::DataVolume* volume : *volumes) {
        lines.push_back(volume->GetDisk() + " " + volume->GetPath() + " " +
                        std::to_string(volume->GetBytes()) + " " + volume->GetCacheState());
      }
    }
    return lines;
  }

  StorageInfo _info;
};

TEST_F(DataVolumes, AreShownWithTheirGroupInTheOrderOfItsDisks) {
  AddDataVolumes({{"kova:u5", "/dev/g2/d5", 3, "inactive"},
                  {"naa.3", "/dev/g1/d3", 2, "not cached"},
                  {"naa.2", "/dev/g1/d2", 1, "cached, 37% used"}},
                 _info);
  EXPECT_THAT(Shown(0), ElementsAre("naa.2 /dev/g1/d2 1 cached, 37% used", "naa.3 /dev/g1/d3 2 not cached"));
  EXPECT_THAT(Shown(1), ElementsAre("kova:u5 /dev/g2/d5 3 inactive"));
}

TEST_F(DataVolumes, AreOfCapacityDisksOfTheGroupsAlone) {
  const std::string before = Text();
  AddDataVolumes({{"naa.1", "/dev/g1/d1", 1, ""}, {"naa.9", "/dev/g9/d9", 1, ""}}, _info);
  EXPECT_EQ(Text(), before);
}

TEST_F(DataVolumes, WhereThereAreNoneLeaveTheAnswerAsItIs) {
  const std::string before = Text();
  AddDataVolumes({}, _info);
  EXPECT_EQ(Text(), before);
  StorageInfo nothing;
  AddDataVolumes({{"naa.2", "/dev/g1/d2", 1, ""}}, nothing);
  EXPECT_FALSE(nothing.GetDiskMapInfo());
}

TEST_F(DataVolumes, StandInAGroupOnlyIfItHasAny) {
  AddDataVolumes({{"naa.2", "/dev/g1/d2", 1, "not cached"}}, _info);
  EXPECT_THAT(Shown(0), ElementsAre("naa.2 /dev/g1/d2 1 not cached"));
  EXPECT_FALSE((*_info.GetDiskMapInfo())[1]->GetVolume());
}

}  // namespace
}  // namespace Host
