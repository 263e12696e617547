// Requests of several threads at once, on one simulated host.

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <atomic>
#include <condition_variable>
#include <mutex>
#include <random>
#include <string>
#include <thread>
#include <vector>

#include "otxctl/sim/HostBuilder.h"
#include "tests/integration/HostedPlugin.h"
#include "tests/support/Seed.h"

namespace Integration {
namespace {

using OtxCtl::Sim::AHost;
using OtxCtl::Sim::HostDescription;
using OtxCtl::Sim::HostGroup;
using testing::Contains;
using testing::ElementsAre;
using testing::IsEmpty;
using testing::Not;
using testing::SizeIs;
using Names = std::vector<std::string>;

// ---- whatever comes

// Draws the requests of one thread.
class RequestDraw {
 public:
  explicit RequestDraw(unsigned seed) : _random(seed) {}

  Request Next(const HostDescription& host) {
    switch (Below(10)) {
      case 0:
        return {Operation::AddDisks, SomeDisks(host), {}};
      case 1:
        return {Operation::AddAllEligibleDisks, {}, {}};
      case 2:
        return {Operation::InitializeDisks, {}, {NewGroup(host)}};
      case 3:
        return {Operation::RemoveDisk, {AnyDisk(host)}, {}};
      case 4:
        return {Operation::RemoveDiskMapping, {}, {KnownGroup(host)}};
      case 5:
        return {Operation::UnmountDiskMapping, {}, {KnownGroup(host)}};
      case 6:
        return {Operation::ClaimUnmountedDiskgroup, {}, {}};
      case 7:
        return {Operation::GetStorageInfo, {}, {}};
      case 8:
        return {Operation::GetConfigInfo, {}, {}};
      default:
        return {Operation::QueryDisksForKova, {}, {}};
    }
  }

 private:
  std::size_t Below(std::size_t limit) { return _random() % limit; }
  const std::string& AnyDisk(const HostDescription& host) {
    return host.disks[Below(host.disks.size())].name;
  }

  Names SomeDisks(const HostDescription& host) {
    Names names;
    for (const OtxCtl::Sim::HostDisk& disk : host.disks) {
      if (Below(2) == 0) {
        names.push_back(disk.name);
      }
    }
    return names;
  }
  // Of disks that may be anybody's by the time that they are used.
  NamedGroup NewGroup(const HostDescription& host) {
    return {"s" + std::to_string(1 + Below(6)), {AnyDisk(host)}};
  }
  NamedGroup KnownGroup(const HostDescription& host) {
    if (host.groups.empty()) {
      return NewGroup(host);
    }
    const HostGroup& group = host.groups[Below(host.groups.size())];
    return {group.ssd, group.capacity};
  }

  std::mt19937 _random;
};

HostDescription ABusyHost() {
  OtxCtl::Sim::HostBuilder host;
  for (int number = 1; number <= 6; ++number) {
    host.WithSsd("s" + std::to_string(number));
  }
  for (int number = 1; number <= 14; ++number) {
    host.WithHdd("c" + std::to_string(number));
  }
  return host.WithCapacityFlash("t1").WithCapacityFlash("t2").WithGroup("s6", {"c14"}).Build();
}

TEST(Concurrency, EightThreadsOfMixedRequestsLeaveASoundHostAndSoundLocks) {
  constexpr int threadCount = 8;
  constexpr int rounds = 60;
  const TestSupport::Seed seed;
  HostedPlugin plugin(ABusyHost());
  std::atomic<int> answered{0};
  std::vector<std::thread> threads;
  for (int number = 0; number < threadCount; ++number) {
    threads.emplace_back([&plugin, &answered, number, first = seed.Value()] {
      RequestDraw draw(first + static_cast<unsigned>(number));
      for (int round = 0; round < rounds; ++round) {
        const Request request = draw.Next(plugin.Host().Snapshot());
        const Answer answer = plugin.Run(request);
        EXPECT_EQ(answer.ended, "") << request;
        EXPECT_EQ(WrongGroups(plugin.Host().Snapshot()), "") << "after " << request;
        EXPECT_THAT(plugin.Locks().HeldHere(), IsEmpty()) << "after " << request;
        ++answered;
      }
    });
  }
  for (std::thread& thread : threads) {
    thread.join();
  }
  EXPECT_FALSE(testing::Test::HasFailure()) << "in one of the threads";
  EXPECT_EQ(answered, threadCount * rounds);
  EXPECT_THAT(plugin.Locks().Mistakes(), IsEmpty());
  int formats = 0;
  for (const OtxCtl::Fault::RecordedCall& call : plugin.Calls().TakeEnded()) {
    formats += call.operation == "FormatDiskMapping" && call.outcome == "ok" ? 1 : 0;
  }
  EXPECT_GT(formats, 10) << "the threads got nothing done";
}

TEST(Concurrency, NobodyMeetsACacheThatAnotherThreadMadeStale) {
  constexpr int rounds = 40;
  HostedPlugin plugin(AHost().WithSsd("s").WithHdd("c").Build());
  std::atomic<bool> isOver{false};
  std::vector<std::thread> readers;
  for (int number = 0; number < 3; ++number) {
    readers.emplace_back([&] {
      while (!isOver) {
        EXPECT_THAT(plugin.Run({Operation::QueryDisksForKova, {}, {}}).results, SizeIs(2));
      }
    });
  }
  for (int round = 0; round < rounds; ++round) {
    const Answer made = plugin.Run({Operation::InitializeDisks, {}, {{"s", {"c"}}}});
    EXPECT_THAT(made.results, ElementsAre("s: c | s inUse, c inUse"));
    EXPECT_THAT(plugin.Run({Operation::QueryDisksForKova, {}, {}}).results,
                ElementsAre("s inUse", "c inUse"));
    EXPECT_EQ(plugin.Run({Operation::RemoveDisk, {"s"}, {}}).fault, "");
    EXPECT_THAT(plugin.Run({Operation::QueryDisksForKova, {}, {}}).results,
                ElementsAre("s eligible", "c eligible"));
  }
  isOver = true;
  for (std::thread& reader : readers) {
    reader.join();
  }
  EXPECT_THAT(plugin.Locks().Mistakes(), IsEmpty());
}

// ---- a format that takes its time

// Holds a format back until enough has happened elsewhere.
class Gate {
 public:
  // Called by the format. False when it was given up, after far longer than the rest can take.
  bool WaitUntilOpen() {
    std::unique_lock lock(_mutex);
    _isReached = true;
    _changed.notify_all();
    return _changed.wait_for(lock, std::chrono::seconds(60), [this] { return _isOpen; });
  }
  void WaitUntilReached() {
    std::unique_lock lock(_mutex);
    _changed.wait(lock, [this] { return _isReached; });
  }
  void Open() {
    const std::lock_guard lock(_mutex);
    _isOpen = true;
    _changed.notify_all();
  }

 private:
  std::mutex _mutex;
  std::condition_variable _changed;
  bool _isReached = false;
  bool _isOpen = false;
};

class SlowFormat : public testing::Test {
 protected:
  SlowFormat()
      : _plugin(AHost()
                    .WithSsd("s1")
                    .WithSsd("s2")
                    .WithHdds({"a", "b"})
                    .WithGroup("s2", {"b"})
                    .Edit([](HostDescription& host) {
                      host.faults = {{"FormatDiskMapping", 0, "", "", "", 1}};
                    })
                    .Build()) {
    _plugin.Host().SetWaiter([this](std::chrono::milliseconds) { _cameThrough = _gate.WaitUntilOpen(); });
    _format = std::thread([this] { _made = _plugin.Run({Operation::InitializeDisks, {}, {{"s1", {"a"}}}}); });
    _gate.WaitUntilReached();
  }
  ~SlowFormat() override { LetItFinish(); }

  void LetItFinish() {
    _gate.Open();
    if (_format.joinable()) {
      _format.join();
    }
  }

  Gate _gate;
  std::atomic<bool> _cameThrough{false};
  Answer _made;
  HostedPlugin _plugin;
  std::thread _format;
};

TEST_F(SlowFormat, HoldsNoQueryUp) {
  constexpr int threadCount = 7;
  constexpr int queries = 12;
  std::vector<std::thread> threads;
  for (int number = 0; number < threadCount; ++number) {
    threads.emplace_back([this] {
      for (int query = 0; query < queries; ++query) {
        EXPECT_THAT(_plugin.Run({Operation::QueryDisksForKova, {}, {}}).results,
                    ElementsAre("s1 eligible", "s2 inUse", "a eligible", "b inUse"));
        EXPECT_TRUE(_plugin.Run({Operation::GetStorageInfo, {}, {}}).hasResult);
        EXPECT_TRUE(_plugin.Run({Operation::GetConfigInfo, {}, {}}).hasResult);
      }
    });
  }
  for (std::thread& thread : threads) {
    thread.join();
  }
  LetItFinish();
  EXPECT_TRUE(_cameThrough) << "the queries waited for the format";
  EXPECT_THAT(_made.results, ElementsAre("s1: a | s1 inUse, a inUse"))
      << "what the queries left in the cache is not taken for the state after the format";
  EXPECT_THAT(_plugin.Locks().Mistakes(), IsEmpty());
}

TEST_F(SlowFormat, HoldsOtherChangesBackUntilItIsDone) {
  std::mutex mutex;
  Names order;
  _plugin.Calls().SetStartObserver([&](const OtxCtl::Fault::RecordedCall& call) {
    const std::lock_guard lock(mutex);
    order.push_back("begin " + call.operation);
  });
  _plugin.Calls().SetEndObserver([&](const OtxCtl::Fault::RecordedCall& call) {
    const std::lock_guard lock(mutex);
    order.push_back("end " + call.operation);
  });
  std::vector<std::thread> threads;
  for (const Request& request : {Request{Operation::RemoveDisk, {"s2"}, {}},
                                 Request{Operation::UnmountDiskMapping, {}, {{"s2", {"b"}}}},
                                 Request{Operation::ClaimUnmountedDiskgroup, {}, {}}}) {
    threads.emplace_back([this, request] { _plugin.Run(request); });
  }
  EXPECT_TRUE(_plugin.Run({Operation::QueryDisksForKova, {}, {}}).hasResult);
  LetItFinish();
  for (std::thread& thread : threads) {
    thread.join();
  }
  const auto formatted = std::find(order.begin(), order.end(), "end FormatDiskMapping");
  ASSERT_NE(formatted, order.end());
  const Names before(order.begin(), formatted);
  for (const char* const change :
       {"begin RemoveDisk", "begin UnmountDiskMapping", "begin ClaimUnmountedDiskgroups"}) {
    EXPECT_THAT(before, Not(Contains(change)));
  }
  EXPECT_THAT(Names(formatted, order.end()), Contains("begin RemoveDisk"));
  EXPECT_THAT(_plugin.Locks().Mistakes(), IsEmpty());
}

}  // namespace
}  // namespace Integration
