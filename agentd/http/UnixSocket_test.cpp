#include "agentd/http/UnixSocket.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/un.h>
#include <unistd.h>

#include <cstring>
#include <filesystem>
#include <fstream>
#include <stdexcept>
#include <thread>

#include "agentd/testing/RawClient.h"
#include "agentd/testing/RunningServer.h"

namespace Agentd {
namespace {

namespace fs = std::filesystem;
using testing::AllOf;
using testing::HasSubstr;

class UnixSocket : public testing::Test {
 protected:
  UnixSocket() {
    fs::remove_all(_folder);
    fs::create_directory(_folder);
  }
  ~UnixSocket() override { fs::remove_all(_folder); }

  // Leaves the file of a socket of that kind behind.
  void LeaveSocket(int kind = SOCK_STREAM) const {
    const int left = socket(AF_UNIX, kind, 0);
    sockaddr_un address{};
    address.sun_family = AF_UNIX;
    std::memcpy(address.sun_path, _path.data(), _path.size());
    ASSERT_EQ(bind(left, reinterpret_cast<const sockaddr*>(&address), sizeof address), 0);
    close(left);
  }

  static std::string WhyNot(const std::string& path) {
    try {
      const SocketPlace place(path);
      return "it is free";
    } catch (const std::runtime_error& refused) {
      return refused.what();
    }
  }

  static unsigned ModeOf(const std::string& path) {
    struct stat status {};
    return stat(path.c_str(), &status) == 0 ? status.st_mode & 07777u : 0u;
  }

  const std::string _folder = testing::TempDir() + "kova-place-" + std::to_string(getpid());
  const std::string _path = _folder + "/agentd.sock";
};

TEST_F(UnixSocket, APlaceWhereNothingStandsIsFree) {
  EXPECT_EQ(WhyNot(_path), "it is free");
  EXPECT_FALSE(fs::exists(_path));
}

TEST_F(UnixSocket, AMissingFolderIsMadeForOwnerAndGroup) {
  EXPECT_EQ(WhyNot(_folder + "/run/agentd.sock"), "it is free");
  EXPECT_EQ(ModeOf(_folder + "/run"), 0750u);
}

TEST_F(UnixSocket, AFolderThatIsThereKeepsItsMode) {
  fs::permissions(_folder, fs::perms(0711));
  EXPECT_EQ(WhyNot(_path), "it is free");
  EXPECT_EQ(ModeOf(_folder), 0711u);
}

TEST_F(UnixSocket, AStaleSocketIsRemoved) {
  LeaveSocket();
  EXPECT_EQ(WhyNot(_path), "it is free");
  EXPECT_FALSE(fs::exists(_path));
}

TEST_F(UnixSocket, ASocketThatSomebodyAnswersOnStays) {
  const HttpServer other(Testing::OnSocket(_path), &Testing::Echo);
  EXPECT_THAT(WhyNot(_path), AllOf(HasSubstr("another agent"), HasSubstr(_path)));
  EXPECT_TRUE(fs::exists(_path));
}

TEST_F(UnixSocket, AFileThatIsNoSocketStays) {
  std::ofstream(_path) << "precious";
  EXPECT_THAT(WhyNot(_path), AllOf(HasSubstr(_path), HasSubstr("not a socket")));
  EXPECT_EQ(fs::file_size(_path), 8u);
}

TEST_F(UnixSocket, ALinkToASocketIsNoSocket) {
  LeaveSocket();
  fs::create_symlink(_path, _folder + "/link");
  EXPECT_THAT(WhyNot(_folder + "/link"), HasSubstr("not a socket"));
  EXPECT_TRUE(fs::exists(_path));
}

TEST_F(UnixSocket, ASocketOfAnotherKindThatIsInUseStays) {
  const int other = socket(AF_UNIX, SOCK_DGRAM, 0);
  sockaddr_un address{};
  address.sun_family = AF_UNIX;
  std::memcpy(address.sun_path, _path.data(), _path.size());
  ASSERT_EQ(bind(other, reinterpret_cast<const sockaddr*>(&address), sizeof address), 0);
  EXPECT_THAT(WhyNot(_path), AllOf(HasSubstr("cannot tell"), HasSubstr(_path)));
  EXPECT_TRUE(fs::exists(_path));
  close(other);
}

TEST_F(UnixSocket, TheLongestPathIsTakenAndNoLongerOne) {
  const std::size_t longest = sizeof(sockaddr_un::sun_path) - 1;
  const std::string path = _path + std::string(longest - _path.size(), 'x');
  EXPECT_EQ(WhyNot(path), "it is free");
  EXPECT_THAT(WhyNot(path + "x"), AllOf(HasSubstr(path + "x"), HasSubstr("1 to 107 bytes")));
  EXPECT_THAT(WhyNot(""), HasSubstr("1 to 107 bytes"));
}

TEST_F(UnixSocket, AFolderThatCannotBeMadeIsNamed) {
  std::ofstream(_folder + "/file") << "x";
  EXPECT_THAT(WhyNot(_folder + "/file/agentd.sock"), HasSubstr(_folder + "/file"));
}

TEST_F(UnixSocket, OfAServerIsForOwnerAndGroupWhateverTheMask) {
  const mode_t before = umask(0);
  const HttpServer server(Testing::OnSocket(_path), &Testing::Echo);
  EXPECT_EQ(umask(before), 0u) << "the mask is put back";
  EXPECT_EQ(ModeOf(_path), 0660u);
}

TEST_F(UnixSocket, TellsWhoIsAtItsOtherEndWithAllTheirGroups) {
  int ends[2];
  ASSERT_EQ(socketpair(AF_UNIX, SOCK_STREAM, 0, ends), 0);
  const ProcessCredentials self = CredentialsOf(ends[0]);
  EXPECT_EQ(self.uid, geteuid());
  std::vector<gid_t> groups(static_cast<std::size_t>(getgroups(0, nullptr)));
  ASSERT_GE(getgroups(static_cast<int>(groups.size()), groups.data()), 0);
  groups.push_back(getegid());
  EXPECT_THAT(self.groups, testing::UnorderedElementsAreArray(groups));
  close(ends[0]);
  close(ends[1]);
  EXPECT_THROW(CredentialsOf(-1), std::runtime_error);
}

TEST_F(UnixSocket, OfManyServersThatStartTogetherExactlyOneGetsThePlace) {
  std::vector<std::future<bool>> starts;
  std::promise<void> finished;
  const std::shared_future<void> allDone = finished.get_future().share();
  std::atomic<int> tried{0};
  LeaveSocket();
  constexpr int count = 8;
  for (int i = 0; i < count; ++i) {
    starts.push_back(std::async(std::launch::async, [&] {
      std::unique_ptr<HttpServer> server;
      try {
        server = std::make_unique<HttpServer>(Testing::OnSocket(_path), &Testing::Echo);
      } catch (const std::runtime_error&) {
      }
      if (++tried == count) {
        finished.set_value();
      }
      allDone.wait();  // nobody leaves before everybody has tried
      return server != nullptr;
    }));
  }
  int served = 0;
  for (auto& start : starts) {
    served += start.get() ? 1 : 0;
  }
  EXPECT_EQ(served, 1);
}

}  // namespace
}  // namespace Agentd
