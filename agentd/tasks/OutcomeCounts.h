// How often requests came to each outcome.
#pragma once

#include <array>
#include <cstddef>

#include "host/Outcome.h"

namespace Agentd {

class OutcomeCounts {
 public:
  static constexpr std::array<Host::Outcome, 3> all = {Host::Outcome::Done, Host::Outcome::Partly,
                                                       Host::Outcome::Failed};

  void Add(Host::Outcome outcome) { ++_counts[static_cast<std::size_t>(outcome)]; }
  std::size_t Of(Host::Outcome outcome) const { return _counts[static_cast<std::size_t>(outcome)]; }
  std::size_t Total() const {
    return Of(Host::Outcome::Done) + Of(Host::Outcome::Partly) + Of(Host::Outcome::Failed);
  }

 private:
  std::array<std::size_t, all.size()> _counts = {};
};

}  // namespace Agentd
