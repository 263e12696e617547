#include "otxctl/linux/Signatures.h"

#include <fcntl.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/mman.h>
#include <unistd.h>

#include <random>
#include <stdexcept>

#include "otxctl/linux/FileDescriptor.h"
#include "otxctl/linux/testing/Images.h"

namespace OtxCtl::Linux {
namespace {

using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;
using testing::UnorderedElementsAre;

// A disk in memory.
FileDescriptor Disk(const std::string& bytes) {
  FileDescriptor file(memfd_create("disk", MFD_CLOEXEC));
  if (!file.IsOpen() || write(file.Get(), bytes.data(), bytes.size()) != static_cast<ssize_t>(bytes.size())) {
    throw std::runtime_error("no disk for the test");
  }
  return file;
}

Signatures Read(const Image& image) {
  return ReadSignatures(Disk(image.Bytes()).Get(), "disk");
}

std::vector<std::string> FoundIn(const Image& image) {
  const Signatures found = Read(image);
  EXPECT_TRUE(found.partitionTable.Is("")) << "no table";
  return found.all.Get();
}

TEST(Signatures, AnEmptyDiskHasNone) {
  EXPECT_THAT(FoundIn(Image()), IsEmpty());
}

TEST(Signatures, EachIsToldInWordsOfItsKind) {
  EXPECT_THAT(FoundIn(Image().PutExt2("DATA")), ElementsAre("ext2 file system \"DATA\""));
  EXPECT_THAT(FoundIn(Image().PutExt2("")), ElementsAre("ext2 file system"));
  EXPECT_THAT(FoundIn(Image().PutSwap("")), ElementsAre("swap space"));
  EXPECT_THAT(FoundIn(Image().PutLuks()), ElementsAre("LUKS encrypted volume"));
  EXPECT_THAT(FoundIn(Image().PutRaid()), ElementsAre("member of a RAID array (linux_raid_member)"));
}

TEST(Signatures, ADamagedOneCounts) {
  EXPECT_THAT(FoundIn(Image().PutLvm()), ElementsAre("LVM physical volume"));
}

TEST(Signatures, AllOfThemAreFound) {
  EXPECT_THAT(FoundIn(Image().PutExt2("OLD").PutSwap("").PutLvm().PutRaid()),
              UnorderedElementsAre("ext2 file system \"OLD\"", "swap space", "LVM physical volume",
                                   "member of a RAID array (linux_raid_member)"));
}

TEST(Signatures, LabelsAreCleaned) {
  EXPECT_THAT(FoundIn(Image().PutExt2("a\n\x1B[2J\"\xFF\x7F")),
              ElementsAre("ext2 file system \"a[2J\"\xEF\xBF\xBD\""));
}

TEST(Signatures, TablesOfPartitionsAreTold) {
  const Signatures dos = Read(Image().PutDosTable());
  EXPECT_TRUE(dos.partitionTable.Is("dos")) << dos.partitionTable.WhyUnknown();
  EXPECT_THAT(dos.all.Get(), IsEmpty());
  EXPECT_TRUE(Read(Image().PutGpt()).partitionTable.Is("gpt"));
  EXPECT_TRUE(Read(Image().PutDosTable(0xEE).PutNumber(454, 1, 4)).partitionTable.Is("protective"));
}

TEST(Signatures, AFileSystemBesideATableIsFoundToo) {
  const Signatures both = Read(Image().PutExt2("OLD").PutDosTable().PutRaid());
  EXPECT_TRUE(both.partitionTable.Is("dos"));
  EXPECT_THAT(both.all.Get(),
              UnorderedElementsAre("ext2 file system \"OLD\"", "member of a RAID array (linux_raid_member)"));
}

TEST(Signatures, OfADamagedTableIsLeftWhatProtectedIt) {
  EXPECT_TRUE(Read(Image().PutGpt().PutNumber(600, 77, 1)).partitionTable.Is("protective"));
}

TEST(Signatures, WhatCannotBeReadIsUnknown) {
  const FileDescriptor file = Disk(Image().Bytes());
  const FileDescriptor unreadable(
      open(("/proc/self/fd/" + std::to_string(file.Get())).c_str(), O_WRONLY | O_CLOEXEC));
  ASSERT_TRUE(unreadable.IsOpen());
  const Signatures found = ReadSignatures(unreadable.Get(), "/dev/sda");
  EXPECT_EQ(found.all.WhyUnknown(), "/dev/sda: Bad file descriptor");
  EXPECT_FALSE(found.partitionTable.IsKnown());
  EXPECT_THAT(ReadSignatures(-1, "/dev/sda").all.WhyUnknown(), HasSubstr("/dev/sda"));
  const FileDescriptor folder(open("/", O_RDONLY | O_CLOEXEC));
  EXPECT_FALSE(ReadSignatures(folder.Get(), "/").all.IsKnown());
}

// Whatever stands on a disk, it is read to an end, and said in texts that may be shown.
TEST(Signatures, NoContentsAreTooMuch) {
  const unsigned seed = std::random_device()();
  RecordProperty("seed", std::to_string(seed));
  std::mt19937 random(seed);
  for (int i = 0; i < 30; ++i) {
    Image image(std::size_t{2} << 20U);
    image.PutExt2("x").PutSwap("y").PutLvm().PutRaid().PutGpt();
    for (int change = 0; change < 2000; ++change) {
      image.PutNumber(random() % (std::size_t{64} << 10U), random(), 1);
    }
    const Signatures found = Read(image);
    EXPECT_TRUE(found.all.IsKnown() || !found.all.WhyUnknown().empty()) << "seed " << seed;
  }
}

}  // namespace
}  // namespace OtxCtl::Linux
