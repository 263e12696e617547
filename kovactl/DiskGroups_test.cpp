#include "kovactl/DiskGroups.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "kovactl/ExitStatus.h"
#include "kovactl/testing/Objects.h"

namespace Kovactl {
namespace {

using Testing::AGroup;
using testing::ElementsAre;
using testing::HasSubstr;

TEST(DiskGroups, AreFoundByTheirCacheDisk) {
  const DiskGroups groups(Testing::WithGroups({AGroup("naa.1", {"naa.2"}), AGroup("naa.3", {"naa.4"})}));
  ASSERT_NE(groups.Find("naa.3"), nullptr);
  EXPECT_THAT(DisksOf(*groups.Find("naa.3")->GetMapping()), ElementsAre("naa.3", "naa.4"));
  EXPECT_EQ(groups.Find("naa.2"), nullptr) << "a capacity disk heads no group";
}

TEST(DiskGroups, RefuseOneThatTheHostDoesNotHave) {
  const DiskGroups groups(Testing::WithGroups({AGroup("naa.1", {"naa.2"})}));
  EXPECT_NO_THROW(groups.Require("naa.1"));
  try {
    groups.Require("naa.\x1b");
    FAIL() << "it was found";
  } catch (const BadInput& refused) {
    EXPECT_THAT(refused.what(), HasSubstr("no disk group with the cache disk 'naa.\\x1b'"));
  }
}

TEST(DiskGroups, OfAHostThatCannotTellAreNone) {
  const DiskGroups failed(Host::FailedWith("no host"));
  EXPECT_TRUE(failed.All().IsEmpty());
  EXPECT_EQ(failed.Info(), nullptr);
  EXPECT_TRUE(failed.Fault());
}

TEST(DiskGroups, OfAHostThatAnswersNothingAreAFault) {
  EXPECT_TRUE(DiskGroups(Host::Answer()).Fault());
}

TEST(DiskGroups, MayLackTheirCacheDisk) {
  const auto mapping = Testing::AMapping("naa.1", {"naa.2"});
  mapping->SetSsd(nullptr);
  EXPECT_EQ(CacheDiskOf(*mapping), "");
  EXPECT_THAT(DisksOf(*mapping), ElementsAre("naa.2"));
}

}  // namespace
}  // namespace Kovactl
