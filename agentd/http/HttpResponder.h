// The way back to one client.
#pragma once

#include <functional>
#include <memory>

#include "agentd/http/HttpTypes.h"

namespace Agentd {

// Copies are the same way. Threads: any. The client gets the first answer; when the last copy goes without
// one, it is told that there will be none (500).
class HttpResponder {
 public:
  using Send = std::function<void(HttpAnswer)>;

  // `send` is called once, on the thread that answers.
  explicit HttpResponder(Send send);

  void Answer(HttpAnswer answer) const;

 private:
  class State;
  std::shared_ptr<State> _state;
};

}  // namespace Agentd
