#include "agentd/http/RefusalTally.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <vector>

namespace Agentd {
namespace {

using namespace std::chrono_literals;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;

class RefusalTallyTest : public testing::Test {
 protected:
  void Count(HttpRefusal refusal, int times = 1) {
    for (int i = 0; i < times; ++i) {
      _tally.Count(refusal, "10.0.0.5:1", _now);
    }
  }
  // What has been said since the last time.
  std::vector<std::string> Said() { return std::exchange(_lines, {}); }

  RefusalTally::Time _now{1h};
  std::vector<std::string> _lines;
  RefusalTally _tally{[this](const std::string& line) { _lines.push_back(line); }};
};

TEST_F(RefusalTallyTest, TheFirstOfAKindIsSaidAtOnceWithWhoItWas) {
  Count(HttpRefusal::Connections);
  EXPECT_THAT(Said(), ElementsAre("Refused 10.0.0.5:1: too many connections to this address of the agent"));
  Count(HttpRefusal::Bodies);
  EXPECT_THAT(Said(), ElementsAre(HasSubstr("too much is being sent")));
}

TEST_F(RefusalTallyTest, ThoseThatFollowAreSaidInOneLineWhenTheSilenceIsOver) {
  Count(HttpRefusal::Handshake, 1000);
  EXPECT_THAT(Said(), testing::SizeIs(1));
  _now += RefusalTally::silence - 1ms;
  _tally.CatchUp(_now);
  EXPECT_THAT(Said(), IsEmpty());
  EXPECT_TRUE(_tally.IsBehind());
  _now += 1ms;
  _tally.CatchUp(_now);
  EXPECT_THAT(Said(), ElementsAre("Refused 999 more: TLS came to nothing"));
  EXPECT_FALSE(_tally.IsBehind());
}

TEST_F(RefusalTallyTest, TheSilenceBeginsAnewWithEveryLine) {
  Count(HttpRefusal::Slow, 2);
  Said();
  _now += RefusalTally::silence;
  Count(HttpRefusal::Slow);
  EXPECT_THAT(Said(), ElementsAre("Refused 1 more: the request took too long"));
  Count(HttpRefusal::Slow);
  EXPECT_THAT(Said(), IsEmpty());
  _now += RefusalTally::silence;
  _tally.CatchUp(_now);
  EXPECT_THAT(Said(), ElementsAre(HasSubstr("2 more")));
}

TEST_F(RefusalTallyTest, CountsEachKind) {
  Count(HttpRefusal::Connections, 3);
  Count(HttpRefusal::Bodies, 2);
  EXPECT_THAT(_tally.Counts(), ElementsAre(3u, 0u, 0u, 0u, 0u, 2u));
}

}  // namespace
}  // namespace Agentd
