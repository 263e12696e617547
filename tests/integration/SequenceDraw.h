// Random sequences of requests: each begins on a host of its own, and meets faults and changes of the host.
#pragma once

#include <cstddef>
#include <iosfwd>
#include <iterator>
#include <optional>
#include <random>
#include <string>
#include <vector>

#include "otxctl/sim/HostDescription.h"
#include "tests/integration/HostModel.h"
#include "tests/integration/HostedPlugin.h"

namespace Integration {

// What may happen to a host behind the plug-in's back.
enum class Event {
  DiskLeaves,
  DiskReturns,
  Partitioned,
  Cleaned,
  Unlisted,
  Listed,
  Tagged,
  Untagged,
  AutoMode,
  Busy
};

struct HostChange {
  Event event;
  std::string disk;
};

struct Step {
  std::optional<HostChange> change;  // before the request
  std::optional<InjectedFault> fault;
  Request request;
};

void Apply(const HostChange& change, OtxCtl::Sim::HostDescription& host);

std::ostream& operator<<(std::ostream& out, const Step& step);

// The same seed draws the same.
class SequenceDraw {
 public:
  explicit SequenceDraw(unsigned seed) : _random(seed) {}

  OtxCtl::Sim::HostDescription Host();
  // A step that fits the host as the model knows it, mostly.
  Step Next(const HostModel& model);

 private:
  int Below(std::size_t limit) { return static_cast<int>(_random() % limit); }
  bool Chance(int oneIn) { return Below(static_cast<std::size_t>(oneIn)) == 0; }
  template <class List>
  const auto& Pick(const List& list) {
    return list[static_cast<std::size_t>(Below(std::size(list)))];
  }

  HostChange Change(const OtxCtl::Sim::HostDescription& host);
  InjectedFault Fault();
  Request AnyRequest(const HostModel& model);
  std::vector<std::string> SomeDisks(const HostModel& model, int oneIn);
  NamedGroup NewGroup(const HostModel& model);
  NamedGroup KnownGroup(const HostModel& model);

  std::mt19937 _random;
};

}  // namespace Integration
