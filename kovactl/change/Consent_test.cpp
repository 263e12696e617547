#include "kovactl/change/Consent.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <sstream>

#include "kovactl/ExitStatus.h"

namespace Kovactl {
namespace {

using testing::HasSubstr;
using testing::Not;

bool Asked(const std::string& reply, std::string* question = nullptr) {
  std::istringstream in(reply);
  std::ostringstream err;
  const bool agreed = Consent::AskedFor(in, err).AskFor({"naa.1", "naa.\x1b[2J"});
  if (question != nullptr) {
    *question = err.str();
  }
  return agreed;
}

TEST(Consent, IsGivenByYesAlone) {
  for (const char* reply : {"y\n", "Y\n", "yes\n", "y"}) {
    EXPECT_TRUE(Asked(reply)) << reply;
  }
  for (const char* reply : {"", "\n", "n\n", "no\n", "yep\n", " y\n", "naa.1\n"}) {
    EXPECT_FALSE(Asked(reply)) << reply;
  }
}

TEST(Consent, IsAskedForWithTheNamesOfTheDisks) {
  std::string question;
  Asked("y\n", &question);
  EXPECT_EQ(question,
            "What is on these disks may be lost:\n"
            "  naa.1\n"
            "  naa.\\x1b[2J\n"
            "Go on? [y/N] ");
}

TEST(Consent, GivenBeforehandIsNotAskedFor) {
  EXPECT_NO_THROW(Consent::Given().Require());
  EXPECT_TRUE(Consent::Given().AskFor({"naa.1"}));
}

TEST(Consent, OfNobodyIsRefusedWithTheWayToGiveIt) {
  try {
    Consent::OfNobody().Require();
    FAIL() << "nobody agreed";
  } catch (const BadInput& refused) {
    EXPECT_THAT(refused.what(), HasSubstr("--yes"));
  }
  EXPECT_THROW(Consent::OfNobody().AskFor({"naa.1"}), BadInput);
}

}  // namespace
}  // namespace Kovactl
