#include "otxctl/linux/UeventListener.h"

#include <linux/netlink.h>
#include <poll.h>
#include <sys/eventfd.h>
#include <sys/socket.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <cstdint>
#include <cstring>
#include <system_error>
#include <utility>

#include "otxctl/linux/Uevents.h"

namespace OtxCtl::Linux {
namespace {

constexpr unsigned kernelGroup = 1;  // what the kernel sends; services send to others
constexpr std::size_t longestMessage = 8192;
constexpr int receiveBuffer = 1 << 20;

[[noreturn]] void Fail(const char* what) {
  throw std::system_error(errno, std::system_category(), what);
}

FileDescriptor OpenSocket() {
  FileDescriptor socket(
      ::socket(AF_NETLINK, SOCK_DGRAM | SOCK_CLOEXEC | SOCK_NONBLOCK, NETLINK_KOBJECT_UEVENT));
  if (!socket.IsOpen()) {
    Fail("socket for the kernel's events");
  }
  // More than it gets, perhaps: then messages are lost earlier, which is noticed.
  setsockopt(socket.Get(), SOL_SOCKET, SO_RCVBUF, &receiveBuffer, sizeof receiveBuffer);
  sockaddr_nl address = {};
  address.nl_family = AF_NETLINK;
  address.nl_groups = kernelGroup;
  if (bind(socket.Get(), reinterpret_cast<const sockaddr*>(&address), sizeof address) != 0) {
    Fail("listening to the kernel's events");
  }
  return socket;
}

FileDescriptor OpenStop() {
  FileDescriptor stop(eventfd(0, EFD_CLOEXEC | EFD_NONBLOCK));
  if (!stop.IsOpen()) {
    Fail("event to stop by");
  }
  return stop;
}

// Any program may send to this socket; the kernel's own number is zero. A socket of another kind knows
// nobody.
bool IsFromKernel(const sockaddr_storage& sender, socklen_t size) {
  sockaddr_nl address = {};
  if (size < sizeof address || sender.ss_family != AF_NETLINK) {
    return true;
  }
  std::memcpy(&address, &sender, sizeof address);
  return address.nl_pid == 0;
}

}  // namespace

UeventListener::UeventListener(OnChange onChange) : UeventListener(OpenSocket(), std::move(onChange), {}) {}

UeventListener::UeventListener(FileDescriptor socket, OnChange onChange, UeventTimes times)
    : _socket(std::move(socket)), _stop(OpenStop()), _onChange(std::move(onChange)), _times(times) {
  _thread = std::thread([this] { Run(); });
}

UeventListener::~UeventListener() {
  const std::uint64_t one = 1;
  // Cannot fail: nobody else counts it up.
  [[maybe_unused]] const ssize_t written = write(_stop.Get(), &one, sizeof one);
  _thread.join();
}

void UeventListener::Run() {
  bool isListening = true;
  while (isListening) {
    switch (Wait()) {
      case Woken::ToStop:
        return;
      case Woken::ByMessage:
        isListening = ReadAll();
        break;
      case Woken::ByTime:
        break;
    }
    const bool isDue = Clock::now() >= std::min(_last + _times.silence, _first + _times.longest);
    if (_isPending && (isDue || !isListening)) {
      _isPending = false;
      _onChange();
    }
  }
}

UeventListener::Woken UeventListener::Wait() {
  int milliseconds = -1;
  if (_isPending) {
    const auto due = std::min(_last + _times.silence, _first + _times.longest);
    const auto left = std::chrono::ceil<std::chrono::milliseconds>(due - Clock::now());
    milliseconds = static_cast<int>(std::max<std::int64_t>(0, left.count()));
  }
  std::array<pollfd, 2> watched = {{{_stop.Get(), POLLIN, 0}, {_socket.Get(), POLLIN, 0}}};
  const int ready = Uninterrupted([&] { return poll(watched.data(), watched.size(), milliseconds); });
  if (watched[0].revents != 0) {
    return Woken::ToStop;
  }
  return ready != 0 ? Woken::ByMessage : Woken::ByTime;
}

void UeventListener::Note() {
  _last = Clock::now();
  if (!_isPending) {
    _first = _last;
    _isPending = true;
  }
}

// False once nothing will come any more.
bool UeventListener::ReadAll() {
  constexpr int mostAtOnce = 256;  // who never stops talking must not keep the listener from being told
  std::array<char, longestMessage> message = {};
  for (int i = 0; i < mostAtOnce; ++i) {
    sockaddr_storage sender = {};
    socklen_t size = sizeof sender;
    const ssize_t count = Uninterrupted([&] {
      return recvfrom(_socket.Get(), message.data(), message.size(), MSG_DONTWAIT | MSG_TRUNC,
                      reinterpret_cast<sockaddr*>(&sender), &size);
    });
    if (count < 0 && (errno == EAGAIN || errno == EWOULDBLOCK)) {
      return true;
    }
    if (count < 0 && errno == ENOBUFS) {
      Note();
      continue;
    }
    const bool isEnd = count == 0 && size == 0;  // an empty message has a sender
    if (count < 0 || isEnd) {
      _isDeaf = true;
      Note();
      return false;
    }
    const auto length = static_cast<std::size_t>(count);
    const bool isWhole = length <= message.size();
    if (IsFromKernel(sender, size) && (!isWhole || IsDiskEvent({message.data(), length}))) {
      Note();
    }
  }
  return true;
}

}  // namespace OtxCtl::Linux
