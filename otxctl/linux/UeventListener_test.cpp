#include "otxctl/linux/UeventListener.h"

#include <gtest/gtest.h>
#include <linux/netlink.h>
#include <poll.h>
#include <sys/socket.h>

#include <array>
#include <atomic>
#include <cerrno>
#include <memory>
#include <semaphore>
#include <string_view>

namespace OtxCtl::Linux {
namespace {

using std::chrono::hours;
using std::chrono::milliseconds;

constexpr std::string_view diskCame("ACTION=add\0SUBSYSTEM=block", 26);
constexpr std::string_view cardCame("ACTION=add\0SUBSYSTEM=net", 24);

class UeventListenerTest : public testing::Test {
 protected:
  UeventListenerTest() {
    std::array<int, 2> pair = {};
    EXPECT_EQ(socketpair(AF_UNIX, SOCK_SEQPACKET | SOCK_CLOEXEC, 0, pair.data()), 0);
    _kernel = FileDescriptor(pair[0]);
    _socket = FileDescriptor(pair[1]);
    _watched = FileDescriptor(dup(pair[1]));
  }

  void Send(std::string_view message) {
    EXPECT_EQ(send(_kernel.Get(), message.data(), message.size(), 0), static_cast<ssize_t>(message.size()));
  }
  void Listen(UeventTimes times) {
    _listener = std::make_unique<UeventListener>(
        std::move(_socket),
        [this] {
          ++_calls;
          _called.release();
        },
        times);
  }
  // Until the listener has taken all messages. What they come to is then told before it waits again.
  void WaitUntilTaken() const {
    pollfd watched = {_watched.Get(), POLLIN, 0};
    while (poll(&watched, 1, 0) > 0) {
      std::this_thread::yield();
    }
  }

  FileDescriptor _kernel;
  FileDescriptor _socket;
  FileDescriptor _watched;
  std::atomic<int> _calls = 0;
  std::counting_semaphore<> _called{0};
  std::unique_ptr<UeventListener> _listener;  // goes first
};

TEST_F(UeventListenerTest, ABurstIsToldOnce) {
  for (int i = 0; i < 5; ++i) {
    Send(diskCame);
  }
  Listen({milliseconds(1), hours(1)});
  _called.acquire();
  _listener.reset();
  EXPECT_EQ(_calls, 1);
}

TEST_F(UeventListenerTest, ABurstWithoutAnEndIsToldInTime) {
  Send(diskCame);
  Listen({hours(1), milliseconds(1)});
  _called.acquire();
}

TEST_F(UeventListenerTest, EveryBurstIsTold) {
  Listen({milliseconds(0), hours(1)});
  for (int i = 1; i <= 3; ++i) {
    Send(diskCame);
    _called.acquire();
    EXPECT_EQ(_calls, i);
  }
}

TEST_F(UeventListenerTest, WhatIsNotAboutDisksIsNotTold) {
  Send(cardCame);
  Listen({milliseconds(0), milliseconds(0)});
  WaitUntilTaken();
  _listener.reset();
  EXPECT_EQ(_calls, 0);
}

TEST_F(UeventListenerTest, AMessageTooLongToBeReadIsAChange) {
  Send(std::string(cardCame) + std::string(10000, 'x'));
  Listen({milliseconds(0), milliseconds(0)});
  _called.acquire();
}

TEST_F(UeventListenerTest, StopsWhileNothingOrSomethingIsPending) {
  Listen({hours(1), hours(1)});
  _listener.reset();
  SUCCEED() << "without a message";
}

TEST_F(UeventListenerTest, WhatIsPendingAtTheEndIsNotTold) {
  Send(diskCame);
  Listen({hours(1), hours(1)});
  WaitUntilTaken();
  _listener.reset();
  EXPECT_EQ(_calls, 0);
}

TEST_F(UeventListenerTest, ASocketThatEndsIsTheLastChange) {
  Listen({hours(1), hours(1)});
  EXPECT_FALSE(_listener->IsDeaf());
  _kernel = FileDescriptor();
  _called.acquire();
  EXPECT_TRUE(_listener->IsDeaf());
  _listener.reset();
  EXPECT_EQ(_calls, 1);
}

// Sockets of netlink on which programs talk to each other as the kernel does to them.
class NetlinkListener : public UeventListenerTest {
 protected:
  void SetUp() override {
    _kernel = Bound();
    _socket = Bound();
    _watched = FileDescriptor(dup(_socket.Get()));
    Broadcast(diskCame);
    std::array<char, 64> bytes = {};
    if (recv(_socket.Get(), bytes.data(), bytes.size(), MSG_DONTWAIT) !=
        static_cast<ssize_t>(diskCame.size())) {
      GTEST_SKIP() << "programs may not send to each other here";
    }
  }
  static FileDescriptor Bound() {
    FileDescriptor socket(::socket(AF_NETLINK, SOCK_DGRAM | SOCK_CLOEXEC, NETLINK_USERSOCK));
    sockaddr_nl address = {};
    address.nl_family = AF_NETLINK;
    address.nl_groups = 1;
    const bool isBound = socket.IsOpen() &&
                         bind(socket.Get(), reinterpret_cast<const sockaddr*>(&address), sizeof address) == 0;
    return isBound ? std::move(socket) : FileDescriptor();
  }
  // That the kernel itself does not listen is told as an error, after all others were served.
  void Broadcast(std::string_view message) {
    sockaddr_nl address = {};
    address.nl_family = AF_NETLINK;
    address.nl_groups = 1;
    sendto(_kernel.Get(), message.data(), message.size(), 0, reinterpret_cast<const sockaddr*>(&address),
           sizeof address);
  }
};

TEST_F(NetlinkListener, OnlyTheKernelIsBelieved) {
  Broadcast(diskCame);
  Listen({milliseconds(0), milliseconds(0)});
  WaitUntilTaken();
  _listener.reset();
  EXPECT_EQ(_calls, 0);
}

TEST_F(NetlinkListener, LostMessagesAreAChange) {
  const int least = 1;
  ASSERT_EQ(setsockopt(_socket.Get(), SOL_SOCKET, SO_RCVBUF, &least, sizeof least), 0);
  for (int i = 0; i < 1000; ++i) {
    Broadcast(cardCame);
  }
  Listen({milliseconds(0), milliseconds(0)});
  _called.acquire();
  EXPECT_FALSE(_listener->IsDeaf());
}

TEST(UeventListener, ListensToThisKernel) {
  try {
    const UeventListener listener([] {});
    EXPECT_FALSE(listener.IsDeaf());
  } catch (const std::system_error& error) {
    GTEST_SKIP() << "this machine's kernel is not to be heard: " << error.what();
  }
}

}  // namespace
}  // namespace OtxCtl::Linux
