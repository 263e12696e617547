#include "kova/agentd/marshal/StatusTexts.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <cstdint>
#include <cstring>
#include <iterator>
#include <limits>
#include <string>
#include <type_traits>

namespace Kovasvc {
namespace {

constexpr OTX_ReturnStatus base = 0x0BAD0000;
constexpr OTX_ReturnStatus firstOpaque = 0x2BAD0000;
constexpr const char* unknown = "Unknown status";
constexpr const char* opaque = "Opaque service console status";

struct Case {
  OTX_ReturnStatus status;
  const char* text;
};

class StatusText : public testing::TestWithParam<Case> {};

INSTANTIATE_TEST_SUITE_P(
    Borders, StatusText,
    testing::Values(Case{0, "Success"}, Case{1, "Failure"}, Case{base + 1, "Failure"},
                    Case{base + 2, "Would block"}, Case{341, "Generic service console error"},
                    Case{base + 341, "Generic service console error"}, Case{342, unknown},
                    Case{base + 342, unknown}, Case{base, unknown}, Case{base - 1, unknown},
                    Case{firstOpaque - 1, unknown}, Case{firstOpaque, opaque},
                    Case{std::numeric_limits<OTX_ReturnStatus>::max(), opaque}, Case{-1, unknown},
                    Case{std::numeric_limits<OTX_ReturnStatus>::min(), unknown}));

TEST_P(StatusText, IsThatOfItsRow) {
  EXPECT_STREQ(OTX_ReturnStatusToString(GetParam().status), GetParam().text);
}

TEST(StatusTexts, HaveARowForEveryNumberAndEveryCode) {
  ASSERT_EQ(std::size(returnStatusStrs), 342U);
  EXPECT_EQ(OTX_ReturnStatusToString(0), returnStatusStrs[0]);
  for (OTX_ReturnStatus row = 1; row < 342; ++row) {
    ASSERT_NE(returnStatusStrs[row], nullptr) << row;
    EXPECT_STRNE(returnStatusStrs[row], "") << row;
    EXPECT_EQ(OTX_ReturnStatusToString(row), returnStatusStrs[row]) << row;
    EXPECT_EQ(OTX_ReturnStatusToString(base + row), returnStatusStrs[row]) << row;
  }
}

// A row left out or doubled moves all that follow; these stand far apart.
TEST(StatusTexts, StandInTheirRows) {
  EXPECT_STREQ(returnStatusStrs[3], "Not found");
  EXPECT_STREQ(returnStatusStrs[50], "Wait interrupted");
  EXPECT_STREQ(returnStatusStrs[100], "Cross-device link");
  EXPECT_STREQ(returnStatusStrs[150], "Invalid transaction");
  EXPECT_STREQ(returnStatusStrs[196], "Invalid mmap protection flags");
  EXPECT_STREQ(returnStatusStrs[197], "Invalid chunk size for contiguous mmap ");
  EXPECT_STREQ(returnStatusStrs[198], "Invalid MPN max for contiguous mmap ");
  EXPECT_STREQ(returnStatusStrs[199], "Invalid mmap flag on contiguous mmap ");
  EXPECT_STREQ(returnStatusStrs[200], "Unexpected fault on pre-faulted memory region");
  EXPECT_STREQ(returnStatusStrs[232], "No fcntl lock holder slot left");
  EXPECT_STREQ(returnStatusStrs[234], "Ostrax module necessary for this qsi call not loaded");
  EXPECT_STREQ(returnStatusStrs[250], "Invalid attribute specifier in EVT format string");
  EXPECT_STREQ(returnStatusStrs[294], "FT vm is not enabled");
  EXPECT_STREQ(returnStatusStrs[296], "ELF file contains invalid relocation types");
  EXPECT_STREQ(returnStatusStrs[303], "Re-issue IO at a later time");
  EXPECT_STREQ(returnStatusStrs[306], "Device is permanently unavailable");
  EXPECT_STREQ(returnStatusStrs[320], "Corrupt response from replication server");
  EXPECT_STREQ(returnStatusStrs[340], "Lock held by a transaction in progress");
}

constexpr int rowsWithoutACause[] = {233, 295, 304, 305};

TEST(StatusTexts, NameNoCauseWhereNobodyHasSaidOne) {
  for (const int row : rowsWithoutACause) {
    EXPECT_EQ(returnStatusStrs[row], "Status " + std::to_string(row));
  }
}

// Every other text, byte by byte: a 64-bit FNV-1a sum over them, each followed by a line feed.
TEST(StatusTexts, AreWordForWordTheKnownOnes) {
  std::uint64_t sum = 0xcbf29ce484222325;
  for (int row = 0; row < 342; ++row) {
    if (std::count(std::begin(rowsWithoutACause), std::end(rowsWithoutACause), row) != 0) {
      continue;
    }
    for (const char byte : std::string(returnStatusStrs[row]) + '\n') {
      sum = (sum ^ static_cast<unsigned char>(byte)) * 0x100000001b3;
    }
  }
  EXPECT_EQ(sum, 0xd86039d31cf77632U);
}

TEST(StatusTexts, KeepTheBlanksAtTheirEnds) {
  for (int row = 0; row < 342; ++row) {
    const char* text = returnStatusStrs[row];
    const bool blank = text[std::strlen(text) - 1] == ' ';
    EXPECT_EQ(blank, row >= 197 && row <= 199) << row << ": " << text;
  }
}

TEST(StatusTexts, AreReadOnlyAndOwnedByThePlugin) {
  static_assert(std::is_same_v<decltype(returnStatusStrs), const char* const[342]>);
  EXPECT_EQ(OTX_ReturnStatusToString(-1), OTX_ReturnStatusToString(-2));
}

}  // namespace
}  // namespace Kovasvc
