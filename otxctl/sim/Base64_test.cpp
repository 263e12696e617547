#include "otxctl/sim/Base64.h"

#include <gtest/gtest.h>

namespace OtxCtl::Sim {
namespace {

TEST(Base64, ReadsWhatItWrites) {
  std::vector<std::uint8_t> bytes;
  for (int size = 0; size < 70; ++size) {
    const auto decoded = DecodeBase64(EncodeBase64(bytes));
    ASSERT_TRUE(decoded) << size;
    EXPECT_EQ(*decoded, bytes);
    bytes.push_back(static_cast<std::uint8_t>(size * 37));
  }
}

TEST(Base64, KnowsTheUsualExamples) {
  EXPECT_EQ(EncodeBase64({'f'}), "Zg==");
  EXPECT_EQ(EncodeBase64({'f', 'o'}), "Zm8=");
  EXPECT_EQ(EncodeBase64({'f', 'o', 'o', 'b', 'a', 'r'}), "Zm9vYmFy");
}

TEST(Base64, RefusesWhatItWouldNotWrite) {
  for (const char* const text :
       {"Zg=", "Zg", "Zg= =", "Z===", "====", "Zh==", "Zm9=", "Zm 9", "Zg==Zg==", "Zm9-"}) {
    EXPECT_FALSE(DecodeBase64(text)) << text;
  }
}

}  // namespace
}  // namespace OtxCtl::Sim
