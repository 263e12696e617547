// Locks on real device files need real disks (the lab has them); here: what is refused without one.
#include "otxctl/linux/DiskLocks.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "kova/agentd/include/HostCtlException.h"
#include "otxctl/linux/testing/SystemTree.h"
#include "otxctl/linux/testing/TestGroups.h"

namespace OtxCtl::Linux {
namespace {

using HostCtl::Lib::KovaStorageException;

TEST(DiskLocks, AFileThatIsNotTheDeviceIsRefusedByTheDisksName) {
  SystemTree tree;
  tree.Write("dev/sd1", "no device");
  DeviceFileLocks locks(tree.Paths());
  ScannedDisk disk = MemberDisk("1", false);
  for (const char* const node : {"dev/sd1", "dev/nothing"}) {
    disk.deviceNode = tree.Full(node).string();
    try {
      locks.Lock(disk, true);
      ADD_FAILURE() << node;
    } catch (const KovaStorageException& refused) {
      EXPECT_EQ(refused.GetDiskName(), "naa.1");
      EXPECT_THAT(refused.Describe(), testing::HasSubstr(disk.deviceNode));
    }
  }
}

}  // namespace
}  // namespace OtxCtl::Linux
