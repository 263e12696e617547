#include "kovactl/Words.h"

#include <gtest/gtest.h>

#include "nox/Faults.h"
#include "nox/Kova.h"

namespace Kovactl {
namespace {

using Nox::Host::ScsiDisk;
using Nox::Kova::Host::DiskResult;
using Tessa::MakeRef;
using Tessa::Ref;

TEST(Words, ForTheKindOfADisk) {
  ScsiDisk disk;
  EXPECT_EQ(KindOf(disk), "unknown");
  disk.SetSsd(true);
  EXPECT_EQ(KindOf(disk), "flash");
  disk.SetSsd(false);
  EXPECT_EQ(KindOf(disk), "hard disk");
}

TEST(Words, ForSizesChangeTheUnitWhereTheNextOneIsReached) {
  const std::pair<std::uint64_t, const char*> rows[] = {
      {0, "0 B"},
      {1, "1 B"},
      {1023, "1023 B"},
      {1024, "1.0 KiB"},
      {1536, "1.5 KiB"},
      {(1u << 20) - 1, "1.0 MiB"},
      {1u << 20, "1.0 MiB"},
      {std::uint64_t{64} << 20, "64.0 MiB"},
      {(std::uint64_t{1} << 30) - (1u << 20), "1023.0 MiB"},
      {std::uint64_t{1} << 30, "1.0 GiB"},
      {std::uint64_t{500107862016}, "465.8 GiB"},
      {std::uint64_t{4000787030016}, "3.6 TiB"},
      {std::uint64_t{1} << 50, "1.0 PiB"},
      {std::uint64_t{1} << 60, "1.0 EiB"},
      {~std::uint64_t{0}, "16.0 EiB"},
  };
  for (const auto& [bytes, words] : rows) {
    EXPECT_EQ(HumanSize(bytes), words) << bytes;
  }
}

TEST(Words, ForTheSizeOfADiskNeedASize) {
  ScsiDisk disk;
  EXPECT_EQ(SizeOf(disk), "-");
  disk.GetCapacity()->SetBlockSize(4096);
  EXPECT_EQ(SizeOf(disk), "-");
  disk.GetCapacity()->SetBlock(256);
  EXPECT_EQ(SizeOf(disk), "1.0 MiB");
  disk.GetCapacity()->SetBlock(-1);
  EXPECT_EQ(SizeOf(disk), "-");
}

Ref<DiskResult> ADisk(const std::string& state, const std::vector<std::string>& operationalStates = {}) {
  const auto result = MakeRef<DiskResult>();
  result->SetState(state);
  result->GetDisk()->SetOperationalState(MakeRef<Orbis::TextList>(operationalStates));
  return result;
}

TEST(Words, KnowADiskThatHasLeft) {
  EXPECT_TRUE(HasLeft(*ADisk("inUse", {"error"})->GetDisk()));
  EXPECT_FALSE(HasLeft(*ADisk("inUse", {"ok"})->GetDisk()));
  EXPECT_FALSE(HasLeft(ScsiDisk()));
}

TEST(Words, AreEmptyForADiskWithoutName) {
  ScsiDisk disk;
  EXPECT_EQ(NameOf(disk), "");
  disk.SetCanonicalName("naa.1");
  EXPECT_EQ(NameOf(disk), "naa.1");
}

TEST(Words, ForTheStateOfADisk) {
  EXPECT_EQ(StateOf(*ADisk("inUse")), "in use");
  EXPECT_EQ(StateOf(*ADisk("eligible")), "eligible");
  EXPECT_EQ(StateOf(*ADisk("ineligible")), "ineligible");
  EXPECT_EQ(StateOf(*ADisk("something new")), "something new");
}

TEST(Words, ForTheReasonAreEmptyWhereNoneIsNeeded) {
  EXPECT_EQ(ReasonOf(*ADisk("eligible", {"ok"})), "");
  EXPECT_EQ(ReasonOf(*ADisk("inUse", {"ok"})), "");
}

TEST(Words, ForTheReasonFollowTheFaultThenTheDisksState) {
  const auto disk = ADisk("ineligible", {"error"});
  EXPECT_EQ(ReasonOf(*disk), "has left the host");
  disk->SetError(MakeRef<Nox::Fault::DiskIsUSB>("naa.1"));
  EXPECT_EQ(ReasonOf(*disk), "attached by USB");
  EXPECT_EQ(ReasonOf(*ADisk("inUse", {"error"})), "has left the host");
  EXPECT_EQ(ReasonOf(*ADisk("ineligible", {"off"})), "its disk group is not mounted");
  EXPECT_EQ(ReasonOf(*ADisk("ineligible", {"ok"})), "the kernel gives no reason");
}

TEST(Words, WhatWasFoundOnADiskSaysMoreThanItsFault) {
  const auto disk = ADisk("ineligible", {"ok"});
  disk->SetError(MakeRef<Nox::Fault::DiskHasPartitions>("naa.1"));
  disk->GetDisk()->SetDetail("ext4 file system, mounted at /data");
  EXPECT_EQ(ReasonOf(*disk), "ext4 file system, mounted at /data");
  disk->SetState("eligible");
  disk->SetError(nullptr);
  EXPECT_EQ(ReasonOf(*disk), "");
}

}  // namespace
}  // namespace Kovactl
