#include "otxctl/linux/NaturalOrder.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <string>
#include <vector>

namespace OtxCtl::Linux {
namespace {

TEST(NaturalOrder, NamesStandAsPeopleCountThem) {
  const std::vector<std::string> inOrder = {"dm-2",     "dm-10",      "md9",  "md10", "nvme0n1", "nvme2n1",
                                            "nvme10n1", "nvme10n1p2", "sda",  "sda1", "sda2",    "sda10",
                                            "sdb",      "sdz",        "sdaa", "sdab", "vda"};
  std::vector<std::string> names(inOrder.rbegin(), inOrder.rend());
  std::sort(names.begin(), names.end(), IsNaturallyBefore);
  EXPECT_EQ(names, inOrder);
}

TEST(NaturalOrder, IsStrictForAnyTwoNames) {
  const std::vector<std::string> names = {"",     "0",   "00",  "1",   "01",
                                          "a",    "a0",  "a00", "a0b", "b",
                                          "aa",   "aab", "b0",  "bb",  "99999999999999999999999",
                                          "\xFF", "a\n"};
  for (const std::string& name : names) {
    EXPECT_FALSE(IsNaturallyBefore(name, name)) << name;
    for (const std::string& other : names) {
      if (name != other) {
        EXPECT_NE(IsNaturallyBefore(name, other), IsNaturallyBefore(other, name)) << name << " " << other;
      }
    }
  }
}

}  // namespace
}  // namespace OtxCtl::Linux
