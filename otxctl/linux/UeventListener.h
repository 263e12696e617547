// Tells when disks have come, gone or changed, by what the kernel says.
//
// The kernel sends many messages for one disk; those of one burst are told once, as soon as nothing has come
// for a while, but at the latest some time after the first of them. Messages that got lost count as a change.
//
// What happened before it was made is not told: look at the disks after making one.
//
// Threads: has one of its own, on which it calls; never two calls at a time. The destructor waits for a call
// that is under way, so it must not run on that thread. What is called must not throw. Errors: without a
// socket the constructor throws std::system_error; when the socket fails later, that is told as one last
// change, and IsDeaf is true.
#pragma once

#include <atomic>
#include <chrono>
#include <functional>
#include <thread>

#include "otxctl/linux/FileDescriptor.h"

namespace OtxCtl::Linux {

struct UeventTimes {
  std::chrono::milliseconds silence{200};
  std::chrono::milliseconds longest{2000};
};

class UeventListener {
 public:
  using OnChange = std::function<void()>;

  explicit UeventListener(OnChange onChange);
  // Listens to `socket`, of which each datagram is a message; from whom it comes is looked at if it tells.
  UeventListener(FileDescriptor socket, OnChange onChange, UeventTimes times);
  ~UeventListener();
  UeventListener(const UeventListener&) = delete;
  UeventListener& operator=(const UeventListener&) = delete;

  // Whether it will never tell of a change again.
  bool IsDeaf() const noexcept { return _isDeaf; }

 private:
  using Clock = std::chrono::steady_clock;
  enum class Woken { ByMessage, ByTime, ToStop };

  void Run();
  Woken Wait();
  bool ReadAll();
  void Note();

  const FileDescriptor _socket;
  const FileDescriptor _stop;
  const OnChange _onChange;
  const UeventTimes _times;
  // Of the burst that is not told yet: when it is to be. The thread's own.
  bool _isPending = false;
  Clock::time_point _first;
  Clock::time_point _last;
  std::atomic<bool> _isDeaf = false;
  std::thread _thread;
};

}  // namespace OtxCtl::Linux
