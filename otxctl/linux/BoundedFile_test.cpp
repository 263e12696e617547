#include "otxctl/linux/BoundedFile.h"

#include <gtest/gtest.h>

#include <cstddef>
#include <optional>
#include <string>

#include "otxctl/linux/testing/SystemTree.h"

namespace OtxCtl::Linux {
namespace {

class BoundedFile : public testing::Test {
 protected:
  Disks::Fact<std::optional<std::string>> ReadFileOf(std::size_t size, std::size_t most) {
    _content = std::string(size, 'x');
    for (std::size_t i = 0; i < size; i += 7) {
      _content[i] = static_cast<char>('a' + i % 26);
    }
    _tree.Write("proc/file", _content);
    return ReadWhole(_tree.Full("proc/file").string(), most);
  }

  SystemTree _tree;
  std::string _content;
};

class BoundedFileOfSize : public BoundedFile, public testing::WithParamInterface<std::size_t> {};

TEST_P(BoundedFileOfSize, IsReadWholeIfItIsAllowedToBeThatLong) {
  for (const std::size_t most : {GetParam(), GetParam() + 1, GetParam() + 100'000}) {
    const auto read = ReadFileOf(GetParam(), most);
    ASSERT_TRUE(read.IsKnown()) << read.WhyUnknown();
    EXPECT_TRUE(read.Get() == _content) << "allowed: " << most;
  }
}

TEST_P(BoundedFileOfSize, IsUnknownIfItIsLongerThanAllowed) {
  const auto read = ReadFileOf(GetParam(), GetParam() - 1);
  ASSERT_FALSE(read.IsKnown());
  EXPECT_NE(read.WhyUnknown().find("longer than " + std::to_string(GetParam() - 1) + " bytes"),
            std::string::npos);
}

INSTANTIATE_TEST_SUITE_P(AroundTheStepsOfTheRoom, BoundedFileOfSize,
                         testing::Values(1, 4096, 4097, 4098, 8193, 8194, 8195, 100'000));

TEST_F(BoundedFile, TakesMemoryByItsOwnSizeAndNotByWhatIsAllowed) {
  const auto read = ReadFileOf(5000, std::size_t{64} << 20U);
  ASSERT_TRUE(read.IsKnown());
  EXPECT_LT(read.Get()->capacity(), std::size_t{64} << 10U);
}

TEST_F(BoundedFile, IsEmptyIfItHasNoBytes) {
  const auto read = ReadFileOf(0, 0);
  ASSERT_TRUE(read.IsKnown());
  EXPECT_EQ(read.Get(), "");
}

TEST_F(BoundedFile, IsNothingIfThereIsNone) {
  const auto read = ReadWhole(_tree.Full("proc/none").string(), 10);
  ASSERT_TRUE(read.IsKnown());
  EXPECT_FALSE(read.Get().has_value());
}

}  // namespace
}  // namespace OtxCtl::Linux
