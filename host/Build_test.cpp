#include "host/Build.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "orbis/Version.h"

namespace Host {
namespace {

TEST(Build, HasAVersionOfThreeNumbers) {
  EXPECT_THAT(std::string(Version()), testing::MatchesRegex("[0-9]+\\.[0-9]+\\.[0-9]+"));
}

TEST(Build, IsOfACommitOrOfNoneThatIsKnown) {
  EXPECT_THAT(std::string(BuildId()), testing::MatchesRegex("[0-9a-f]{12}(-dirty)?|unknown"));
}

TEST(Build, SpeaksAVersionOfTheApiThatThereIs) {
  EXPECT_TRUE(Orbis::FindVersionByTyrlName(ApiVersion()));
}

TEST(Build, IsToldInALine) {
  EXPECT_EQ(VersionLine(), std::string(Version()) + " (build " + std::string(BuildId()) + ", API " +
                               std::string(ApiVersion()) + ")");
}

}  // namespace
}  // namespace Host
