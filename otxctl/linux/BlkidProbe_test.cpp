#include "otxctl/linux/BlkidProbe.h"

#include <fcntl.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <linux/loop.h>
#include <sys/ioctl.h>
#include <sys/stat.h>
#include <sys/sysmacros.h>

#include <cerrno>
#include <string>
#include <system_error>
#include <utility>

#include "otxctl/linux/FileDescriptor.h"
#include "otxctl/linux/testing/Images.h"
#include "otxctl/linux/testing/SystemTree.h"

namespace OtxCtl::Linux {
namespace {

using testing::EndsWith;
using testing::HasSubstr;

ProbeResult Probe(const std::string& node, const std::string& number) {
  return BlkidProbe().Probe(node, number);
}

TEST(BlkidProbe, WhatIsNoBlockDeviceIsNotRead) {
  SystemTree tree;
  tree.Write("dev/sda", Image().Bytes());
  const ProbeResult result = Probe(tree.Paths().dev + "/sda", "8:0");
  EXPECT_THAT(result.signatures.WhyUnknown(), EndsWith("/dev/sda: not a block device"));
  EXPECT_FALSE(result.partitionTable.IsKnown());
  EXPECT_FALSE(result.isBusy.IsKnown());
  EXPECT_FALSE(result.isGone);
  EXPECT_FALSE(Probe("/dev/null", "1:3").signatures.IsKnown());
}

TEST(BlkidProbe, ANodeThatIsMissingDoesNotMeanThatTheDiskIs) {
  const ProbeResult result = Probe("/no/such\nnode", "8:0");
  EXPECT_EQ(result.signatures.WhyUnknown(), "/no/such\\x0anode: No such file or directory");
  EXPECT_FALSE(result.isGone);
}

TEST(BlkidProbe, APipeIsNotWaitedFor) {
  SystemTree tree;
  ASSERT_EQ(mkfifo(tree.Full("dev/sda").c_str(), 0600), 0);
  EXPECT_FALSE(Probe(tree.Paths().dev + "/sda", "8:0").signatures.IsKnown());
}

// A file as a block device, if the machine lets this user make one.
class LoopDevice : public testing::Test {
 protected:
  void SetUp() override {
    if (!Attach(Image().PutExt2("DATA").PutRaid())) {
      GTEST_SKIP() << "no loop device can be made here: " << std::system_category().message(errno);
    }
  }
  void TearDown() override {
    if (_device.IsOpen()) {
      ioctl(_device.Get(), LOOP_CLR_FD);
    }
  }

  std::string _node;
  std::string _number;

 private:
  bool Attach(const Image& image) {
    _tree.Write("image", image.Bytes());
    const FileDescriptor file(open(_tree.Full("image").c_str(), O_RDWR | O_CLOEXEC));
    const FileDescriptor control(open("/dev/loop-control", O_RDWR | O_CLOEXEC));
    // Until nobody else was quicker to take the one that was free.
    for (int attempt = 0; attempt < 100 && control.IsOpen(); ++attempt) {
      const int free = ioctl(control.Get(), LOOP_CTL_GET_FREE);
      _node = "/dev/loop" + std::to_string(free);
      FileDescriptor device(free < 0 ? -1 : open(_node.c_str(), O_RDWR | O_CLOEXEC));
      struct stat status = {};
      if (!device.IsOpen() || fstat(device.Get(), &status) != 0) {
        return false;
      }
      if (ioctl(device.Get(), LOOP_SET_FD, file.Get()) == 0) {
        _number = std::to_string(major(status.st_rdev)) + ":" + std::to_string(minor(status.st_rdev));
        _device = std::move(device);
        return true;
      }
      if (errno != EBUSY) {
        return false;
      }
    }
    return false;
  }

  SystemTree _tree;
  FileDescriptor _device;
};

TEST_F(LoopDevice, IsReadAsADisk) {
  const ProbeResult result = Probe(_node, _number);
  EXPECT_THAT(result.signatures.Get(),
              testing::UnorderedElementsAre("ext2 file system \"DATA\"",
                                            "member of a RAID array (linux_raid_member)"));
  EXPECT_TRUE(result.partitionTable.Is(""));
  EXPECT_TRUE(result.isBusy.Is(false));
}

TEST_F(LoopDevice, ThatSomebodyHasClaimedIsBusyAndReadNevertheless) {
  const FileDescriptor claim(open(_node.c_str(), O_RDONLY | O_EXCL | O_CLOEXEC));
  ASSERT_TRUE(claim.IsOpen());
  const ProbeResult result = Probe(_node, _number);
  EXPECT_TRUE(result.isBusy.Is(true));
  EXPECT_EQ(result.signatures.Get().size(), 2U);
}

TEST_F(LoopDevice, OfAnotherNumberIsNotTheDiskThatWasAskedFor) {
  const ProbeResult result = Probe(_node, "8:0");
  EXPECT_THAT(result.signatures.WhyUnknown(),
              HasSubstr(_node + ": is device " + _number + " instead of 8:0"));
  EXPECT_FALSE(result.isBusy.IsKnown());
}

}  // namespace
}  // namespace OtxCtl::Linux
