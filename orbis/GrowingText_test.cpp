#include "orbis/GrowingText.h"

#include <gtest/gtest.h>

#include <string>

namespace Orbis {
namespace {

TEST(GrowingText, LeavesWhatTheStringHeldAndThePartsInTheirOrder) {
  std::string out = "before ";
  {
    GrowingText text(out, 100);
    text.Append("a", std::string("bc"), "", std::string_view(), std::string_view("d"));
    text.Append("e");
  }
  EXPECT_EQ(out, "before abcde");
}

TEST(GrowingText, TakesMoreThanWasExpected) {
  std::string out;
  std::string wanted;
  {
    GrowingText text(out, 0);
    for (int size = 0; size < 300; ++size) {
      const std::string part(static_cast<std::size_t>(size), static_cast<char>('a' + size % 26));
      text.Append(part, ",");
      wanted += part + ",";
    }
  }
  EXPECT_EQ(out, wanted);
}

TEST(GrowingText, AddsNothingOfItsOwn) {
  std::string out = "as it was";
  { const GrowingText text(out, 1000); }
  EXPECT_EQ(out, "as it was");
}

}  // namespace
}  // namespace Orbis
