#include "otxctl/linux/ChangeRecord.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/stat.h>

#include <fstream>
#include <stdexcept>

#include "otxctl/linux/HostLock.h"
#include "otxctl/linux/testing/SystemTree.h"

namespace OtxCtl::Linux {
namespace {

using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;

template <typename Action>
std::string ErrorOf(Action action) {
  try {
    action();
    return "";
  } catch (const std::runtime_error& failed) {
    return failed.what();
  }
}

TEST(ChangeRecord, KeepsNamesUntilTheyAreTakenAway) {
  SystemTree tree;
  const std::string folder = tree.Full("var/lib/kova").string();
  EXPECT_THAT(ChangeRecord(folder).Read(), IsEmpty());
  ChangeRecord(folder).Add({"naa.1", "naa.2"});
  ChangeRecord(folder).Add({"naa.2", "naa.3"});
  EXPECT_THAT(ChangeRecord(folder).Read(), ElementsAre("naa.1", "naa.2", "naa.3"));
  ChangeRecord(folder).Remove({"naa.2", "naa.9"});
  EXPECT_THAT(ChangeRecord(folder).Read(), ElementsAre("naa.1", "naa.3"));
}

TEST(ChangeRecord, IsItsOwnersAlone) {
  SystemTree tree;
  const std::string folder = tree.Full("var/kova").string();
  ChangeRecord(folder).Add({"naa.1"});
  struct stat status = {};
  ASSERT_EQ(stat((folder + "/under-change").c_str(), &status), 0);
  EXPECT_EQ(status.st_mode & 0777U, 0600U);
  ASSERT_EQ(stat(folder.c_str(), &status), 0);
  EXPECT_EQ(status.st_mode & 0777U, 0700U);
}

TEST(ChangeRecord, WithoutAFolderNothingIsKept) {
  ChangeRecord("").Add({"naa.1"});
  EXPECT_THAT(ChangeRecord("").Read(), IsEmpty());
}

TEST(ChangeRecord, OneThatCannotBeWrittenOrReadIsTold) {
  SystemTree tree;
  tree.Write("var", "a file");
  EXPECT_THAT(ErrorOf([&] { ChangeRecord(tree.Full("var/kova").string()).Add({"naa.1"}); }),
              HasSubstr("var"));
  tree.MakeFolder("state/under-change");
  EXPECT_THAT(ErrorOf([&] { ChangeRecord(tree.Full("state").string()).Read(); }), HasSubstr("under-change"));
}

TEST(HostLock, IsHeldByOneAtATime) {
  SystemTree tree;
  tree.MakeFolder("run");
  const std::string file = tree.Full("run/disks.lock").string();
  {
    HostLock one(file);
    one.Take();
    HostLock other(file);
    EXPECT_THAT(ErrorOf([&] { other.Take(); }), HasSubstr("process " + std::to_string(getpid())));
  }
  HostLock next(file);
  EXPECT_EQ(ErrorOf([&] { next.Take(); }), "") << "it goes with its object";
}

TEST(HostLock, TrustsNoFolderThatOthersMayWrite) {
  SystemTree tree;
  tree.MakeFolder("run");
  chmod(tree.Full("run").c_str(), 0777);
  HostLock lock(tree.Full("run/disks.lock").string());
  EXPECT_THAT(ErrorOf([&] { lock.Take(); }), HasSubstr("chmod go-w"));
  EXPECT_FALSE(std::ifstream(tree.Full("run/disks.lock")).good());
}

TEST(HostLock, FollowsNoLink) {
  SystemTree tree;
  tree.MakeFolder("run");
  tree.Write("secret", "keep");
  tree.Link("run/disks.lock", tree.Full("secret").string());
  HostLock lock(tree.Full("run/disks.lock").string());
  EXPECT_NE(ErrorOf([&] { lock.Take(); }), "");
}

}  // namespace
}  // namespace OtxCtl::Linux
