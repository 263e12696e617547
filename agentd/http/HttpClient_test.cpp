#include "agentd/http/HttpClient.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/socket.h>
#include <sys/un.h>
#include <unistd.h>

#include <cstring>
#include <functional>
#include <thread>

#include "agentd/testing/RunningServer.h"

namespace Agentd {
namespace {

using testing::AllOf;
using testing::HasSubstr;
using Testing::RunningServer;

// Accepts one connection and does with it what it is told.
class OneConnection {
 public:
  explicit OneConnection(const std::function<void(int)>& serve)
      : _path(Testing::FreshSocketPath()), _listener(socket(AF_UNIX, SOCK_STREAM, 0)) {
    sockaddr_un address{};
    address.sun_family = AF_UNIX;
    std::memcpy(address.sun_path, _path.data(), _path.size());
    EXPECT_EQ(bind(_listener, reinterpret_cast<const sockaddr*>(&address), sizeof address), 0);
    EXPECT_EQ(listen(_listener, 1), 0);
    _thread = std::thread([this, serve] {
      const int accepted = accept(_listener, nullptr, nullptr);
      serve(accepted);
      close(accepted);
    });
  }
  ~OneConnection() {
    _thread.join();
    close(_listener);
    unlink(_path.c_str());
  }

  const std::string& Path() const { return _path; }

 private:
  const std::string _path;
  const int _listener;
  std::thread _thread;
};

// Reads what has come, so that the client has sent its request before the answer.
void ReadSome(int connection) {
  char bytes[4096];
  EXPECT_GT(recv(connection, bytes, sizeof bytes, 0), 0);
}

void Say(int connection, const std::string& text) {
  EXPECT_EQ(send(connection, text.data(), text.size(), MSG_NOSIGNAL), static_cast<ssize_t>(text.size()));
}

std::string WhyNot(const std::string& path, std::chrono::milliseconds patience = std::chrono::seconds(60)) {
  try {
    Exchange(UnixAddress(path), {"GET", "/", "", ""}, patience);
    return "there was an answer";
  } catch (const ConnectionError& error) {
    return error.what();
  }
}

TEST(HttpClient, SendsTheRequestAndReadsTheWholeAnswer) {
  const std::string body(std::size_t{3} << 20, 'b');
  RunningServer server([](const HttpRequest& request) {
    return HttpAnswer{202, request.contentType, request.method + " " + request.target + " " + request.body};
  });
  const HttpAnswer answer = Exchange(UnixAddress(server.Path()), {"POST", "/a?b", "text/y", body});
  EXPECT_EQ(answer.status, 202u);
  EXPECT_EQ(answer.contentType, "text/y");
  EXPECT_EQ(answer.body, "POST /a?b " + body);
}

TEST(HttpClient, SaysThatNobodyAnswers) {
  const std::string path = Testing::FreshSocketPath();
  EXPECT_THAT(WhyNot(path), AllOf(HasSubstr("no agent answers on " + path), HasSubstr("No such file")));
}

TEST(HttpClient, RefusesAPathThatNoSocketCanHave) {
  EXPECT_THAT(WhyNot(""), HasSubstr("1 to 107 bytes"));
  EXPECT_THAT(WhyNot("/" + std::string(107, 'x')), HasSubstr("1 to 107 bytes"));
}

TEST(HttpClient, SaysThatTheOtherSideHungUp) {
  const OneConnection other(&ReadSome);
  EXPECT_THAT(WhyNot(other.Path()), HasSubstr("no answer from the agent on " + other.Path()));
}

TEST(HttpClient, SaysThatTheAnswerIsCutShort) {
  const OneConnection other([](int connection) {
    ReadSome(connection);
    Say(connection, "HTTP/1.1 200 OK\r\nContent-Length: 10\r\n\r\nhalf");
  });
  EXPECT_THAT(WhyNot(other.Path()), HasSubstr("no answer from the agent on " + other.Path()));
}

TEST(HttpClient, SaysThatTheOtherSideSpeaksSomethingElse) {
  const OneConnection other([](int connection) {
    ReadSome(connection);
    Say(connection, "220 mail.example ESMTP\r\n");
  });
  EXPECT_THAT(WhyNot(other.Path()), HasSubstr("no answer from the agent on " + other.Path()));
}

TEST(HttpClient, LosesItsPatienceWithOneWhoNeverAnswers) {
  std::promise<void> givenUp;
  const OneConnection other([&givenUp](int connection) {
    ReadSome(connection);
    givenUp.get_future().wait();
  });
  EXPECT_THAT(WhyNot(other.Path(), std::chrono::milliseconds(20)),
              HasSubstr("no answer from the agent on " + other.Path()));
  givenUp.set_value();
}

}  // namespace
}  // namespace Agentd
