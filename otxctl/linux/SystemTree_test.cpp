#include "otxctl/linux/testing/SystemTree.h"

#include <gtest/gtest.h>

#include <fstream>
#include <sstream>
#include <stdexcept>

namespace OtxCtl::Linux {
namespace {

std::string Content(const std::filesystem::path& path) {
  std::stringstream text;
  text << std::ifstream(path).rdbuf();
  return text.str();
}

TEST(SystemTree, ARecordingIsLoadedToTheByte) {
  SystemTree tree;
  tree.Write("recording",
             "# a comment\n"
             "dir sys/devices/empty\n"
             "file sys/devices/disk/model A \\\\B\\n\\x00\\xff\\x20\n"
             "file sys/devices/disk/none\n"
             "link sys/class/block/sda ../../devices/disk\n");
  tree.Load(tree.Full("recording"));
  EXPECT_TRUE(std::filesystem::is_directory(tree.Full("sys/devices/empty")));
  EXPECT_EQ(Content(tree.Full("sys/class/block/sda/model")), std::string("A \\B\n\0\xFF ", 8));
  EXPECT_TRUE(std::filesystem::is_empty(tree.Full("sys/devices/disk/none")));
}

TEST(SystemTree, ARecordingThatIsNoneIsRefused) {
  SystemTree tree;
  EXPECT_THROW(tree.Load("/no/such/recording"), std::runtime_error);
  tree.Write("recording", "what is this\n");
  EXPECT_THROW(tree.Load(tree.Full("recording")), std::runtime_error);
}

}  // namespace
}  // namespace OtxCtl::Linux
