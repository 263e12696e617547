#include "agentd/http/HttpResponder.h"

#include <atomic>
#include <utility>

namespace Agentd {

class HttpResponder::State {
 public:
  explicit State(Send send) : _send(std::move(send)) {}
  ~State() { Answer({500, "text/plain; charset=utf-8", "the request was dropped\n"}); }
  State(const State&) = delete;
  State& operator=(const State&) = delete;

  void Answer(HttpAnswer answer) {
    if (!_isAnswered.exchange(true)) {
      _send(std::move(answer));
    }
  }

 private:
  const Send _send;
  std::atomic<bool> _isAnswered{false};
};

HttpResponder::HttpResponder(Send send) : _state(std::make_shared<State>(std::move(send))) {}

void HttpResponder::Answer(HttpAnswer answer) const {
  _state->Answer(std::move(answer));
}

}  // namespace Agentd
