#include "kova/agentd/disks/DiskInventory.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <random>
#include <string>
#include <vector>

#include "kova/agentd/disks/NameList.h"
#include "nox/Host.h"
#include "tests/support/Builders.h"
#include "tests/support/Seed.h"

namespace Kovasvc {
namespace {

using Nox::Host::ScsiDisk;
using Orbis::DataArray;
using Tessa::MakeRef;
using Tessa::NotInitializedException;
using Tessa::Ref;
using testing::ThrowsMessage;
using TestSupport::AnInventory;
using TestSupport::AScsiDisk;

// Both kinds of inventory, which must always agree: of the whole list, and for the look-up of one name.
enum class Way { OfAll, OfThatName };

class DiskLookUp : public testing::TestWithParam<Way> {
 protected:
  static void Find(const std::string& name, const Ref<DataArray<ScsiDisk>>& disks, Ref<ScsiDisk>& disk) {
    if (GetParam() == Way::OfAll) {
      GetScsiDiskFromArray(name, DiskInventory(disks), disk);
    } else {
      NameList wanted(std::vector<std::string_view>{name});
      GetScsiDiskFromArray(name, DiskInventory(disks, wanted), disk);
    }
  }

  const Ref<ScsiDisk> _old = MakeRef<ScsiDisk>();
  Ref<ScsiDisk> _disk = _old;
};

INSTANTIATE_TEST_SUITE_P(Ways, DiskLookUp, testing::Values(Way::OfAll, Way::OfThatName),
                         [](const auto& test) {
                           return std::string(test.param == Way::OfAll ? "OfAll" : "OfThatName");
                         });

TEST_P(DiskLookUp, GivesTheVeryDiskOfThatName) {
  const Ref<ScsiDisk> wanted = AScsiDisk("naa.2");
  const auto disks = AnInventory({AScsiDisk("naa.1"), wanted, AScsiDisk("naa.3")});
  Find("naa.2", disks, _disk);
  EXPECT_EQ(_disk, wanted);
  EXPECT_EQ(_old->GetRefCount(), 1);
  EXPECT_EQ(wanted->GetRefCount(), 3) << "the test, the list and the answer";
}

TEST_P(DiskLookUp, LeavesTheReferenceAloneWhenNothingMatches) {
  Find("naa.9", AnInventory({AScsiDisk("naa.1")}), _disk);
  EXPECT_EQ(_disk, _old);
}

TEST_P(DiskLookUp, FindsNothingInAnEmptyListOrInNone) {
  Find("naa.1", AnInventory({}), _disk);
  EXPECT_EQ(_disk, _old);
  Find("naa.1", nullptr, _disk);
  EXPECT_EQ(_disk, _old);
}

TEST_P(DiskLookUp, ComparesLengthAndEveryByte) {
  const auto disks = AnInventory(
      {AScsiDisk("naa.1"), AScsiDisk("naa.12"), AScsiDisk("NAA.2"), AScsiDisk(std::string("a\0b", 3))});
  Find("naa.", disks, _disk);
  Find("naa.2", disks, _disk);
  Find("naa.123", disks, _disk);
  Find("a", disks, _disk);
  Find("", disks, _disk);
  EXPECT_EQ(_disk, _old);
  Find(std::string("a\0b", 3), disks, _disk);
  EXPECT_NE(_disk, _old);
}

TEST_P(DiskLookUp, TakesTheFirstOfTwoWithOneName) {
  const Ref<ScsiDisk> first = AScsiDisk("naa.1");
  Find("naa.1", AnInventory({first, AScsiDisk("naa.1")}), _disk);
  EXPECT_EQ(_disk, first);
}

TEST_P(DiskLookUp, StopsAtADiskWithoutANameThatStandsBeforeTheMatch) {
  const auto disks = AnInventory({AScsiDisk("naa.1"), AScsiDisk("x").Unnamed(), AScsiDisk("naa.2")});
  EXPECT_THAT([&] { Find("naa.2", disks, _disk); },
              ThrowsMessage<NotInitializedException>(testing::StrEq("Not initialized")));
  EXPECT_EQ(_disk, _old);
}

TEST_P(DiskLookUp, DoesNotMeetADiskWithoutANameThatStandsBehindTheMatch) {
  const Ref<ScsiDisk> wanted = AScsiDisk("naa.1");
  Find("naa.1", AnInventory({wanted, AScsiDisk("x").Unnamed()}), _disk);
  EXPECT_EQ(_disk, wanted);
}

TEST_P(DiskLookUp, TreatsANullLikeADiskWithoutAName) {
  const auto disks = AnInventory({nullptr, AScsiDisk("naa.1")});
  EXPECT_THAT([&] { Find("naa.1", disks, _disk); },
              ThrowsMessage<NotInitializedException>(testing::StrEq("Not initialized")));
}

TEST(DiskInventory, IsMadeOfAListWithUnnamedDisksWithoutComplaint) {
  EXPECT_NO_THROW(DiskInventory(AnInventory({nullptr, AScsiDisk("x").Unnamed()})));
}

// ---- an inventory for some names only

class InventoryOfSomeNames : public testing::Test {
 protected:
  // The disk that an inventory for `names` finds; the old one where it finds none.
  Ref<ScsiDisk> Find(const std::string& name, const std::vector<Ref<ScsiDisk>>& disks,
                     const std::vector<std::string>& names) {
    NameList wanted(names);
    Ref<ScsiDisk> disk = _old;
    GetScsiDiskFromArray(name, DiskInventory(AnInventory(disks), wanted), disk);
    return disk;
  }

  const Ref<ScsiDisk> _old = MakeRef<ScsiDisk>();
  const Ref<ScsiDisk> _first = AScsiDisk("naa.1");
  const Ref<ScsiDisk> _second = AScsiDisk("naa.2");
};

TEST_F(InventoryOfSomeNames, FindsTheNamedOnesInAnyOrder) {
  EXPECT_EQ(Find("naa.1", {_first, _second}, {"naa.2", "naa.1"}), _first);
  EXPECT_EQ(Find("naa.2", {_first, _second}, {"naa.2", "naa.1"}), _second);
  EXPECT_EQ(Find("naa.2", {_first, _second}, {"naa.2", "naa.2"}), _second) << "named twice";
}

TEST_F(InventoryOfSomeNames, TakesTheFirstOfTwoWithOneName) {
  EXPECT_EQ(Find("naa.1", {_first, AScsiDisk("naa.1")}, {"naa.1"}), _first);
}

TEST_F(InventoryOfSomeNames, FindsNothingBeyondTheNames) {
  EXPECT_EQ(Find("naa.1", {_first, _second}, {"naa.2"}), _old);
  EXPECT_EQ(Find("naa.1", {_first}, {}), _old);
  EXPECT_EQ(Find("naa.3", {_first, _second}, {"naa.3"}), _old) << "which the inventory lacks";
}

TEST_F(InventoryOfSomeNames, FindsNothingInNoList) {
  std::vector<std::string> names = {"naa.1"};
  NameList wanted(names);
  Ref<ScsiDisk> disk = _old;
  GetScsiDiskFromArray("naa.1", DiskInventory(nullptr, wanted), disk);
  EXPECT_EQ(disk, _old);
}

TEST_F(InventoryOfSomeNames, StopsAtADiskWithoutANameAsTheWalkDoes) {
  const std::vector<Ref<ScsiDisk>> disks = {_first, AScsiDisk("x").Unnamed(), _second};
  EXPECT_EQ(Find("naa.1", disks, {"naa.1", "naa.2"}), _first);
  EXPECT_THROW(Find("naa.2", disks, {"naa.1", "naa.2"}), NotInitializedException);
  EXPECT_THROW(Find("naa.1", {nullptr, _first}, {"naa.1"}), NotInitializedException);
}

// The plain walk.
enum class Outcome { Found, Nothing, Unnamed };
struct Answer {
  Outcome outcome;
  const ScsiDisk* disk;
  friend bool operator==(const Answer&, const Answer&) = default;
};

Answer Walk(const std::vector<Ref<ScsiDisk>>& disks, const std::string& name) {
  for (const Ref<ScsiDisk>& disk : disks) {
    if (!disk || !disk->HasCanonicalName()) {
      return {Outcome::Unnamed, nullptr};
    }
    if (disk->GetCanonicalName() == name) {
      return {Outcome::Found, disk.Get()};
    }
  }
  return {Outcome::Nothing, nullptr};
}

template <class Look>
Answer AnswerOf(Look look) {
  Ref<ScsiDisk> disk;
  try {
    look(disk);
  } catch (const NotInitializedException&) {
    return {Outcome::Unnamed, nullptr};
  }
  return {disk ? Outcome::Found : Outcome::Nothing, disk.Get()};
}

// Few names, so that duplicates are common; a null or an unnamed disk here and there.
std::vector<Ref<ScsiDisk>> RandomDisks(std::mt19937& random) {
  std::vector<Ref<ScsiDisk>> disks(random() % 12);
  for (Ref<ScsiDisk>& disk : disks) {
    const unsigned kind = random() % 16;
    if (kind == 1) {
      disk = AScsiDisk("x").Unnamed();
    } else if (kind != 0) {
      disk = AScsiDisk("naa." + std::to_string(random() % 8));
    }
  }
  return disks;
}

// Some of the names that are looked up, in any order, perhaps twice.
std::vector<std::string> RandomNames(std::mt19937& random) {
  std::vector<std::string> names(random() % 6);
  for (std::string& name : names) {
    name = "naa." + std::to_string(random() % 8);
  }
  return names;
}

TEST(DiskInventory, AnswersLikeThePlainWalkForAnyDisksAndNames) {
  const TestSupport::Seed seed;
  std::mt19937 random(seed.Value());
  for (int round = 0; round < 2000; ++round) {
    const std::vector<Ref<ScsiDisk>> disks = RandomDisks(random);
    const auto list = AnInventory(disks);
    const DiskInventory inventory(list);
    const std::vector<std::string> some = RandomNames(random);
    NameList wanted(some);
    const DiskInventory ofSome(list, wanted);
    for (int index = 0; index < 9; ++index) {
      const std::string name = index == 8 ? "" : "naa." + std::to_string(index);
      const Answer expected = Walk(disks, name);
      ASSERT_EQ(AnswerOf([&](Ref<ScsiDisk>& disk) { GetScsiDiskFromArray(name, inventory, disk); }), expected)
          << "round " << round << ", name " << name << ", " << disks.size() << " disks";
      if (std::find(some.begin(), some.end(), name) != some.end()) {
        ASSERT_EQ(AnswerOf([&](Ref<ScsiDisk>& disk) { GetScsiDiskFromArray(name, ofSome, disk); }), expected)
            << "round " << round << ", name " << name << " of " << some.size();
      }
    }
  }
}

}  // namespace
}  // namespace Kovasvc
