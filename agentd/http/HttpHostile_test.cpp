// Clients that mean harm: each is answered or dropped within a bound of time and memory, and others are
// served meanwhile.

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/resource.h>

#include <algorithm>
#include <atomic>
#include <chrono>
#include <cstdio>
#include <fstream>
#include <functional>

#include "agentd/testing/RawClient.h"
#include "agentd/testing/RunningServer.h"

namespace Agentd {
namespace {

using namespace std::chrono_literals;
using Testing::RawAnswer;
using Testing::RawClient;
using Testing::RunningServer;
using Clock = std::chrono::steady_clock;

constexpr std::size_t kib = 1024;
constexpr std::size_t mib = kib * kib;

// A sanitizer keeps what was freed for a while.
#if defined(__SANITIZE_ADDRESS__) || defined(__SANITIZE_THREAD__)
constexpr std::size_t mostMemory = 1024 * mib;
#else
constexpr std::size_t mostMemory = 64 * mib;  // a body of 16 MiB grows in steps of twice its size: 48 at most
#endif
constexpr std::chrono::seconds mostTime(20);

// Bytes of this process that are, or were at most, in memory.
std::size_t StatusField(const std::string& name) {
  std::ifstream file("/proc/self/status");
  std::string word;
  while (file >> word) {
    std::size_t value = 0;
    if (word == name + ":" && file >> value) {
      return value * kib;
    }
  }
  return 0;
}

// How much more memory was in use at some moment since this was made. Client and server are one process, so
// the clients of these tests hold next to nothing themselves.
class MemoryGrowth {
 public:
  MemoryGrowth() {
    std::ofstream("/proc/self/clear_refs") << "5";  // forgets the highest mark
    _before = StatusField("VmRSS");
  }
  std::size_t Bytes() const {
    const std::size_t most = StatusField("VmHWM");
    return most > _before ? most - _before : 0;
  }

 private:
  std::size_t _before;
};

// A server, somebody who asks it for something every now and then, and the bounds.
class HttpHostile : public testing::Test {
 protected:
  // None: the attack takes every place, and sees to others itself.
  enum class Others { Ask, None };

  // Serves with these limits while the attack goes on; it returns the status it was answered with.
  void Withstand(const std::string& row, const HttpLimits& limits,
                 const std::function<unsigned(RunningServer&)>& attack, Others present = Others::Ask) {
    const MemoryGrowth growth;
    const Clock::time_point begin = Clock::now();
    unsigned status = 0;
    {
      RunningServer server(&Testing::Echo, limits);
      std::atomic<bool> over{present == Others::None};
      const auto policy = present == Others::None ? std::launch::deferred : std::launch::async;
      auto others = std::async(policy, [&] { return AskUntil(over, server.Path()); });
      status = attack(server);
      over = true;
      EXPECT_EQ(others.get(), "") << "others were served";
    }
    const auto time = std::chrono::duration_cast<std::chrono::milliseconds>(Clock::now() - begin);
    EXPECT_LT(time, mostTime);
    EXPECT_LT(growth.Bytes(), mostMemory);
    std::printf("  %-52s status %3u %6ld ms %6zu KiB\n", row.c_str(), status, static_cast<long>(time.count()),
                growth.Bytes() / kib);
    _status = status;
  }

  // Empty when every answer was right.
  static std::string AskUntil(const std::atomic<bool>& over, const std::string& path) {
    do {
      RawClient client(path);
      client.Send("GET /a HTTP/1.1\r\nHost: x\r\nConnection: close\r\n\r\n");
      const RawAnswer answer = client.Receive();
      if (answer.body != "GET /a ") {
        return "an answer with status " + std::to_string(answer.status);
      }
    } while (!over);
    return "";
  }

  unsigned _status = 0;
};

// One text, and the status it is answered with.
struct Row {
  const char* name;
  std::string header;
  std::string body;
  unsigned status;
};

class HttpHostileText : public HttpHostile, public testing::WithParamInterface<Row> {};

TEST_P(HttpHostileText, IsRefused) {
  Withstand(GetParam().name, HttpLimits(), [](RunningServer& server) {
    RawClient client(server.Path());
    client.Send("POST / HTTP/1.1\r\nHost: x\r\n" + GetParam().header + "\r\n" + GetParam().body);
    const unsigned status = client.Receive().status;
    EXPECT_TRUE(client.IsClosed()) << "nothing that follows is taken for a request";
    return status;
  });
  EXPECT_EQ(_status, GetParam().status);
}

const std::string smuggled = "GET /smuggled HTTP/1.1\r\nHost: x\r\n\r\n";

INSTANTIATE_TEST_SUITE_P(
    Rows, HttpHostileText,
    testing::Values(
        Row{"Content-Length, then Transfer-Encoding", "Content-Length: 4\r\nTransfer-Encoding: chunked\r\n",
            "0\r\n\r\n" + smuggled, 400},
        Row{"Transfer-Encoding, then Content-Length", "Transfer-Encoding: chunked\r\nContent-Length: 4\r\n",
            "0\r\n\r\n" + smuggled, 400},
        Row{"two Content-Lengths that differ", "Content-Length: 4\r\nContent-Length: 5\r\n",
            "abcd" + smuggled, 400},
        Row{"two Content-Lengths that are the same", "Content-Length: 4\r\nContent-Length: 4\r\n",
            "abcd" + smuggled, 400},
        Row{"a list as Content-Length", "Content-Length: 4, 5\r\n", "abcd" + smuggled, 400},
        Row{"a signed Content-Length", "Content-Length: +4\r\n", "abcd" + smuggled, 400},
        Row{"chunk size -2", "Transfer-Encoding: chunked\r\n", "-2\r\nab\r\n0\r\n\r\n", 400},
        Row{"chunk size beyond 64 bits", "Transfer-Encoding: chunked\r\n", "fffffffffffffffff\r\n", 400},
        Row{"chunk size 2^64 - 1", "Transfer-Encoding: chunked\r\n", "ffffffffffffffff\r\n", 413},
        Row{"Content-Length 10^15", "Content-Length: 1000000000000000\r\n", "", 413},
        Row{"Content-Length beyond 64 bits", "Content-Length: 99999999999999999999\r\n", "", 400},
        Row{"a compressed bomb", "Content-Encoding: gzip\r\nContent-Length: 4\r\n", "\x1f\x8b\x08", 415},
        Row{"a compressed bomb in chunks", "Transfer-Encoding: gzip, chunked\r\n",
            "4\r\n\x1f\x8b\x08\x01\r\n", 501},
        Row{"an expectation nobody knows", "Expect: a miracle\r\nContent-Length: 4\r\n", "", 417}));

// Sends the piece again and again, up to 200 MB in all, and then reads the answer.
unsigned Pour(RunningServer& server, const std::string& begin, const std::string& piece) {
  RawClient client(server.Path());
  bool goesOn = client.Send(begin);
  for (std::size_t sent = 0; goesOn && sent < 200 * mib; sent += piece.size()) {
    goesOn = client.Send(piece);
  }
  return client.Receive().status;
}

TEST_F(HttpHostile, AHeaderWithoutAnEndIsRefusedWith431) {
  Withstand("a header without newline of 200 MB", HttpLimits(), [](RunningServer& server) {
    return Pour(server, "GET / HTTP/1.1\r\nX: ", std::string(64 * kib, 'x'));
  });
  EXPECT_EQ(_status, 431u);
}

TEST_F(HttpHostile, ManyHeaderFieldsAreRefusedWith431) {
  Withstand("header fields without end", HttpLimits(), [](RunningServer& server) {
    return Pour(server, "GET / HTTP/1.1\r\n",
                "X: x\r\nX: x\r\nX: x\r\nX: x\r\nX: x\r\nX: x\r\nX: x\r\nX: x\r\n");
  });
  EXPECT_EQ(_status, 431u);
}

constexpr const char* inChunks = "POST / HTTP/1.1\r\nHost: x\r\nTransfer-Encoding: chunked\r\n\r\n";

TEST_F(HttpHostile, ChunksWithoutEndAreRefusedWith413) {
  Withstand("endless chunks", HttpLimits(), [](RunningServer& server) {
    return Pour(server, inChunks, "10000\r\n" + std::string(0x10000, 'c') + "\r\n");
  });
  EXPECT_EQ(_status, 413u);
}

TEST_F(HttpHostile, TheHeaderOfAChunkWithoutEndIsRefusedWith431) {
  Withstand("the header of a chunk without newline", HttpLimits(), [](RunningServer& server) {
    return Pour(server, std::string(inChunks) + "1;x=", std::string(64 * kib, 'x'));
  });
  EXPECT_EQ(_status, 431u);
}

TEST_F(HttpHostile, FieldsWithoutEndBehindABodyAreRefusedWith431) {
  Withstand("fields without end behind a body", HttpLimits(), [](RunningServer& server) {
    return Pour(server, std::string(inChunks) + "0\r\n", "X: " + std::string(kib, 'x') + "\r\n");
  });
  EXPECT_EQ(_status, 431u);
}

// One byte after the other, as fast as they go: only the time for the whole request ends it.
unsigned Drip(RunningServer& server, const std::string& begin) {
  RawClient client(server.Path());
  bool goesOn = client.Send(begin);
  const Clock::time_point end = Clock::now() + mostTime;
  while (goesOn && Clock::now() < end && !client.HasAnswer(1ms)) {
    goesOn = client.Send("x");
  }
  return client.Receive().status;
}

TEST_F(HttpHostile, AHeaderThatComesByteByByteIsGivenUpWith408) {
  HttpLimits limits;
  limits.readTime = 200ms;
  Withstand("a header of one byte at a time", limits,
            [](RunningServer& server) { return Drip(server, "GET / HTTP/1.1\r\nX: "); });
  EXPECT_EQ(_status, 408u);
}

TEST_F(HttpHostile, ABodyThatComesByteByByteIsGivenUpWith408) {
  HttpLimits limits;
  limits.readTime = 200ms;
  Withstand("a body of one byte at a time", limits, [](RunningServer& server) {
    return Drip(server, "POST / HTTP/1.1\r\nHost: x\r\nContent-Length: 1000000\r\n\r\n");
  });
  EXPECT_EQ(_status, 408u);
}

TEST_F(HttpHostile, AClientThatNeverReadsItsAnswersIsGivenUp) {
  HttpLimits limits;
  limits.writeTime = 200ms;
  Withstand("a client that never reads its answers", limits, [](RunningServer& server) {
    RawClient client(server.Path());
    const std::string request =
        "POST / HTTP/1.1\r\nHost: x\r\nContent-Length: 65536\r\n\r\n" + std::string(65536, 'b');
    while (client.Send(request)) {
    }
    return 0u;  // its sending failed, for the server has gone
  });
}

// As many descriptors as this process may have, up to that number.
int RaiseDescriptors(int wanted) {
  rlimit limit{};
  getrlimit(RLIMIT_NOFILE, &limit);
  limit.rlim_cur = std::min<rlim_t>(limit.rlim_max, static_cast<rlim_t>(wanted));
  setrlimit(RLIMIT_NOFILE, &limit);
  getrlimit(RLIMIT_NOFILE, &limit);
  return static_cast<int>(limit.rlim_cur);
}

// How many of them were refused: those behind the first, all of which are held.
int CountRefused(const std::vector<std::unique_ptr<RawClient>>& clients, std::size_t held) {
  return static_cast<int>(std::count_if(clients.begin() + static_cast<std::ptrdiff_t>(held), clients.end(),
                                        [](const auto& client) { return client->Receive().status == 503; }));
}

unsigned StatusFor(const RunningServer& server) {
  RawClient client(server.Path());
  client.Send("GET /a HTTP/1.1\r\nHost: x\r\n\r\n");
  return client.Receive().status;
}

TEST_F(HttpHostile, IdleConnectionsBeyondTheLimitAreAnsweredWith503AndMakeRoomWhenTheyGo) {
  HttpLimits limits;
  limits.connections = 256;
  limits.readTime = 60s;
  const int count = std::min(10'000, RaiseDescriptors(11'000) - 1'000);
  Withstand(
      "idle connections: " + std::to_string(count), limits,
      [&](RunningServer& server) {
        std::vector<std::unique_ptr<RawClient>> idle;
        for (int i = 0; i < count; ++i) {
          idle.push_back(std::make_unique<RawClient>(server.Path()));
        }
        EXPECT_EQ(CountRefused(idle, limits.connections), count - static_cast<int>(limits.connections))
            << "each is told why";
        const unsigned status = StatusFor(server);
        idle.clear();
        unsigned served = 503;
        while (served == 503) {  // that they left is noticed one by one
          served = StatusFor(server);
        }
        EXPECT_EQ(served, 200u);
        return status;
      },
      Others::None);
  EXPECT_EQ(_status, 503u);
}

}  // namespace
}  // namespace Agentd
