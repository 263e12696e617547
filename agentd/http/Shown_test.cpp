#include "agentd/http/Shown.h"

#include <gtest/gtest.h>

namespace Agentd {
namespace {

TEST(Shown, LeavesNamesAsTheyAre) {
  EXPECT_EQ(Shown("naa.5000 [x]/y:z=1?"), "naa.5000 [x]/y:z=1?");
  EXPECT_EQ(Shown(""), "");
}

TEST(Shown, EscapesWhatCouldBeReadAsSomethingElse) {
  EXPECT_EQ(Shown("<b>"), "\\x3cb\\x3e");
  EXPECT_EQ(Shown("'\"&`\\"), "\\x27\\x22\\x26\\x60\\x5c");
  EXPECT_EQ(Shown(std::string_view("\r\n\0\x1b\x7f\xc3", 6)), "\\x0d\\x0a\\x00\\x1b\\x7f\\xc3");
}

TEST(Shown, CutsOffWhatIsLong) {
  EXPECT_EQ(Shown(std::string(64, 'a')), std::string(64, 'a'));
  EXPECT_EQ(Shown(std::string(65, 'a')), std::string(64, 'a') + "..");
}

}  // namespace
}  // namespace Agentd
