// What providers were asked to do, in order, and what came of it.
//
// A recorder is shared: it outlives the providers that write to it, so that calls can be read after the
// plug-in has deleted its provider. Safe from any thread. Observers run on the calling thread without the
// recorder's lock, one at a time per call; they may use the recorder.
#pragma once

#include <nlohmann/json.hpp>

#include <cstdint>
#include <functional>
#include <mutex>
#include <string>
#include <string_view>
#include <vector>

#include "otxctl/fault/FaultRules.h"

namespace OtxCtl::Fault {

struct RecordedCall {
  std::string operation;
  // An array of the inputs in order, outputs left out, records as arrays:
  // ["naa.1", ["naa.2"], ["tag", 1, 0]].
  nlohmann::json arguments = nlohmann::json::array();
  // "ok" or "CLASS: TEXT"; empty while the call is under way.
  std::string outcome;
};

// One line of JSON: {"operation": ..., "arguments": [...], "outcome": ...}. Bytes that are not UTF-8 are
// replaced, so this never fails on a text.
std::string ToJsonLine(const RecordedCall& call);

class CallRecorder {
 public:
  using Observer = std::function<void(const RecordedCall&)>;

  // Told of each call before it reaches the provider. Must not throw.
  void SetStartObserver(Observer observer);
  // Told of each call when its outcome is known. Must not throw.
  void SetEndObserver(Observer observer);

  // Adds a rule; a later rule of the same call is passed over if an earlier one throws.
  void Inject(FaultRule rule);
  // Takes every rule away. Counting goes on.
  void ClearFaults();

  // A copy of the calls so far, in the order in which they began.
  std::vector<RecordedCall> Calls() const;
  // Hands over the calls that have ended and forgets them.
  std::vector<RecordedCall> TakeEnded();

 private:
  friend class RecordingProvider;

  struct Entry {
    std::uint64_t ticket;
    RecordedCall call;
  };

  // Records the call, says what injected fault it has to suffer and tells the observer. Returns its ticket.
  std::uint64_t Begin(std::string_view operation, nlohmann::json arguments, FaultEffect& effect);
  void End(std::uint64_t ticket, std::string outcome);

  mutable std::mutex _mutex;
  std::vector<Entry> _entries;
  std::uint64_t _lastTicket = 0;
  std::vector<FaultRule> _rules;
  CallCounter _counter;
  Observer _onStart;
  Observer _onEnd;
};

}  // namespace OtxCtl::Fault
