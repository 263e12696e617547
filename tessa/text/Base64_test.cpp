#include "tessa/text/Base64.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <random>

#include "tests/support/Seed.h"

namespace Tessa {
namespace {

using Bytes = std::vector<std::uint8_t>;

struct Pair {
  Bytes bytes;
  const char* text;

  friend std::ostream& operator<<(std::ostream& out, const Pair& pair) { return out << pair.text; }
};

class Base64 : public ::testing::TestWithParam<Pair> {};

TEST_P(Base64, WritesAndReads) {
  std::string text = "before:";
  AppendBase64(GetParam().bytes, text);
  EXPECT_EQ(text, "before:" + std::string(GetParam().text));
  Bytes bytes = {1, 2, 3};
  EXPECT_TRUE(ParseBase64(GetParam().text, bytes));
  EXPECT_EQ(bytes, GetParam().bytes);
}

INSTANTIATE_TEST_SUITE_P(Texts, Base64,
                         ::testing::Values(Pair{{}, ""}, Pair{{'f'}, "Zg=="}, Pair{{'f', 'o'}, "Zm8="},
                                           Pair{{'f', 'o', 'o'}, "Zm9v"},
                                           Pair{{'f', 'o', 'o', 'b'}, "Zm9vYg=="}, Pair{{0, 0, 0}, "AAAA"},
                                           Pair{{0xff, 0xff, 0xff}, "////"},
                                           Pair{{0xfb, 0xef, 0xbe}, "++++"}));

class BrokenBase64 : public ::testing::TestWithParam<std::string> {};

TEST_P(BrokenBase64, IsRefusedAndTheBytesStay) {
  Bytes bytes = {1, 2, 3};
  EXPECT_FALSE(ParseBase64(GetParam(), bytes));
  EXPECT_EQ(bytes, (Bytes{1, 2, 3}));
}

INSTANTIATE_TEST_SUITE_P(Texts, BrokenBase64,
                         ::testing::Values("Z", "Zg", "Zg=", "Zg= =", "Zg===", "=",
                                           "====", "Z===", "Zg==Zg==", "Zm=v", "Zm 9v", " Zm9v", "Zm9v\n",
                                           "Zm9*", "Zm9-", "Zm9_", "Zh==", "Zm9=", "Zm\xc3\xb6"));

TEST(Base64, ReadsBackAnyBytes) {
  const TestSupport::Seed seed;
  std::mt19937 random(seed.Value());
  for (std::size_t size = 0; size < 300; ++size) {
    Bytes bytes(size);
    for (std::uint8_t& byte : bytes) {
      byte = static_cast<std::uint8_t>(random());
    }
    std::string text;
    AppendBase64(bytes, text);
    EXPECT_EQ(text.size(), (size + 2) / 3 * 4);
    Bytes read;
    ASSERT_TRUE(ParseBase64(text, read)) << text;
    ASSERT_EQ(read, bytes);
  }
}

}  // namespace
}  // namespace Tessa
