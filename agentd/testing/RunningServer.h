// A server that runs for as long as a test needs it.
#pragma once

#include <gtest/gtest.h>
#include <unistd.h>

#include <atomic>
#include <future>
#include <string>
#include <thread>

#include "agentd/http/HttpServer.h"

namespace Agentd::Testing {

// A socket path that no other test uses.
inline std::string FreshSocketPath() {
  static std::atomic<int> count{0};
  return testing::TempDir() + "kova-" + std::to_string(getpid()) + "-" + std::to_string(++count) + ".sock";
}

// Answers what it is asked for: the method, the target and the body.
inline HttpAnswer Echo(const HttpRequest& request) {
  return {200, "text/plain", request.method + " " + request.target + " " + request.body};
}

inline HttpOptions OnSocket(const std::string& path, const HttpLimits& limits = {}) {
  return {.listen = {UnixAddress(path)}, .limits = limits};
}

// The request as it comes from a client of that role.
inline HttpRequest By(HttpRole role, HttpRequest request) {
  request.peer = {role, "a test"};
  return request;
}

// What a handler answers, however late, to a client of that role.
inline HttpAnswer AnswerOf(const HttpDeferringHandler& handler, const HttpRequest& request,
                           HttpRole role = HttpRole::Change) {
  const auto answered = std::make_shared<std::promise<HttpAnswer>>();
  handler(By(role, request),
          HttpResponder([answered](HttpAnswer answer) { answered->set_value(std::move(answer)); }));
  return answered->get_future().get();
}

class RunningServer {
 public:
  explicit RunningServer(HttpHandler handler = &Echo, const HttpLimits& limits = {})
      : _server(OnSocket(_path, limits), std::move(handler)),
        _run(std::async(std::launch::async, [this] { return _server.Run(); })) {}
  template <class Handler>
  RunningServer(const HttpOptions& options, Handler handler, HttpAdmit admit = {})
      : _server(options, std::move(handler), std::move(admit)),
        _run(std::async(std::launch::async, [this] { return _server.Run(); })) {}
  explicit RunningServer(HttpDeferringHandler handler, const HttpLimits& limits = {},
                         std::function<void()> onStopping = {})
      : _server(OnSocket(_path, limits), std::move(handler)),
        _run(std::async(std::launch::async, [this, onStopping = std::move(onStopping)] {
          _server.OnStopping(onStopping);
          return _server.Run();
        })) {}
  ~RunningServer() { Stop(); }
  RunningServer(const RunningServer&) = delete;
  RunningServer& operator=(const RunningServer&) = delete;

  const std::string& Path() const { return _path; }
  HttpAddress Address(std::size_t at = 0) const { return _server.Addresses().at(at); }
  HttpServer& Server() { return _server; }
  HttpLoad Now() const { return _server.Now(); }

  // Waits for Run to return; what it returned.
  bool Wait() { return _run.valid() ? _run.get() : true; }
  bool Stop() {
    _server.Stop();
    return Wait();
  }

 private:
  const std::string _path = FreshSocketPath();
  HttpServer _server;
  std::future<bool> _run;
};

// A handler's way to wait for its test, and the test's way to wait for the handler.
class Gate {
 public:
  void Enter() {
    if (!_entered.exchange(true)) {
      _hasEntered.set_value();
    }
    _opened.wait();
  }
  void WaitUntilEntered() { _hasEntered.get_future().wait(); }
  void Open() { _opening.set_value(); }

 private:
  std::atomic<bool> _entered{false};
  std::promise<void> _hasEntered;
  std::promise<void> _opening;
  std::shared_future<void> _opened = _opening.get_future().share();
};

}  // namespace Agentd::Testing
