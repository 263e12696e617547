#include "otxctl/fault/CallRecorder.h"

#include <algorithm>
#include <iterator>
#include <utility>

namespace OtxCtl::Fault {
namespace {

using Guard = std::lock_guard<std::mutex>;

}  // namespace

std::string ToJsonLine(const RecordedCall& call) {
  const nlohmann::ordered_json line = {
      {"operation", call.operation}, {"arguments", call.arguments}, {"outcome", call.outcome}};
  return line.dump(-1, ' ', false, nlohmann::ordered_json::error_handler_t::replace);
}

void CallRecorder::SetStartObserver(Observer observer) {
  const Guard guard(_mutex);
  _onStart = std::move(observer);
}

void CallRecorder::SetEndObserver(Observer observer) {
  const Guard guard(_mutex);
  _onEnd = std::move(observer);
}

void CallRecorder::Inject(FaultRule rule) {
  const Guard guard(_mutex);
  _rules.push_back(std::move(rule));
}

void CallRecorder::ClearFaults() {
  const Guard guard(_mutex);
  _rules.clear();
}

std::vector<RecordedCall> CallRecorder::Calls() const {
  const Guard guard(_mutex);
  std::vector<RecordedCall> calls;
  calls.reserve(_entries.size());
  std::transform(_entries.begin(), _entries.end(), std::back_inserter(calls),
                 [](const Entry& entry) { return entry.call; });
  return calls;
}

std::vector<RecordedCall> CallRecorder::TakeEnded() {
  const Guard guard(_mutex);
  std::vector<RecordedCall> ended;
  std::vector<Entry> underWay;
  for (Entry& entry : _entries) {
    if (entry.call.outcome.empty()) {
      underWay.push_back(std::move(entry));
    } else {
      ended.push_back(std::move(entry.call));
    }
  }
  _entries = std::move(underWay);
  return ended;
}

std::uint64_t CallRecorder::Begin(std::string_view operation, nlohmann::json arguments, FaultEffect& effect) {
  RecordedCall call{std::string(operation), std::move(arguments), {}};
  Observer observer;
  std::uint64_t ticket = 0;
  {
    const Guard guard(_mutex);
    ticket = ++_lastTicket;
    effect = EffectOf(_rules, operation, _counter.Next(operation));
    _entries.push_back(Entry{ticket, call});
    observer = _onStart;
  }
  if (observer) {
    observer(call);
  }
  return ticket;
}

void CallRecorder::End(std::uint64_t ticket, std::string outcome) {
  Observer observer;
  RecordedCall ended;
  {
    const Guard guard(_mutex);
    // Searched from the back: the call that ends is nearly always among the last.
    const auto found = std::find_if(_entries.rbegin(), _entries.rend(),
                                    [ticket](const Entry& entry) { return entry.ticket == ticket; });
    if (found == _entries.rend()) {
      return;
    }
    found->call.outcome = std::move(outcome);
    observer = _onEnd;
    if (observer) {
      ended = found->call;
    }
  }
  if (observer) {
    observer(ended);
  }
}

}  // namespace OtxCtl::Fault
