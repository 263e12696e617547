#include "host/Inventory.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <string>
#include <thread>
#include <vector>

#include "nox/Host.h"

namespace Host {
namespace {

using Nox::Host::ScsiLun;
using Nox::Host::StorageDeviceInfo;
using Tessa::MakeRef;
using Tessa::Ref;
using testing::ElementsAre;

Ref<StorageDeviceInfo> ADisk(const std::string& name) {
  const auto disk = MakeRef<Nox::Host::ScsiDisk>();
  disk->SetCanonicalName(name);
  const auto units = MakeRef<Orbis::DataArray<ScsiLun>>();
  units->Append(disk);
  const auto info = MakeRef<StorageDeviceInfo>();
  info->SetScsiLun(units);
  return info;
}

std::vector<std::string> NamesOf(const StorageDeviceInfo& info) {
  std::vector<std::string> names;
  for (const ScsiLun* unit : *info.GetScsiLun()) {
    names.push_back(unit->GetCanonicalName());
  }
  return names;
}

TEST(Inventory, GivesNothingBeforeItIsFilledAndThenWhatItHoldsNow) {
  Inventory inventory;
  Ref<StorageDeviceInfo> seen = MakeRef<StorageDeviceInfo>();
  inventory.GetStorageDeviceInfo(seen);
  EXPECT_FALSE(seen);

  inventory.Replace(ADisk("naa.1"));
  inventory.GetStorageDeviceInfo(seen);
  const Ref<StorageDeviceInfo> before = seen;
  inventory.Replace(ADisk("naa.2"));
  inventory.GetStorageDeviceInfo(seen);
  EXPECT_THAT(NamesOf(*seen), ElementsAre("naa.2"));
  EXPECT_THAT(NamesOf(*before), ElementsAre("naa.1")) << "what was handed out stays as it was";
}

TEST(Inventory, IsReadWhileItIsReplaced) {
  Inventory inventory;
  inventory.Replace(ADisk("naa.0"));
  std::thread writer([&inventory] {
    for (int i = 1; i <= 500; ++i) {
      inventory.Replace(ADisk("naa." + std::to_string(i)));
    }
  });
  for (int i = 0; i < 500; ++i) {
    Ref<StorageDeviceInfo> seen;
    inventory.GetStorageDeviceInfo(seen);
    EXPECT_EQ(NamesOf(*seen).size(), 1u);
  }
  writer.join();
  Ref<StorageDeviceInfo> last;
  inventory.GetStorageDeviceInfo(last);
  EXPECT_THAT(NamesOf(*last), ElementsAre("naa.500"));
}

}  // namespace
}  // namespace Host
