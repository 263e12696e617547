#include "agentd/http/RefusalTally.h"

#include <algorithm>

namespace Agentd {
namespace {

std::string Line(HttpRefusal refusal, const std::string& who) {
  return "Refused " + who + ": " + std::string(KindOf(refusal).text);
}

}  // namespace

void RefusalTally::Count(HttpRefusal refusal, const std::string& who, Time now) {
  CatchUp(now);
  Row& row = _rows[static_cast<std::size_t>(refusal)];
  ++row.counted;
  if (now >= row.silentUntil) {
    row.said = row.counted;
    row.silentUntil = now + silence;
    _say(Line(refusal, who));
  }
}

void RefusalTally::CatchUp(Time now) {
  for (std::size_t kind = 0; kind < _rows.size(); ++kind) {
    Row& row = _rows[kind];
    const unsigned long unsaid = row.counted - row.said;
    if (unsaid != 0 && now >= row.silentUntil) {
      row.said = row.counted;
      row.silentUntil = now + silence;
      _say(Line(static_cast<HttpRefusal>(kind), std::to_string(unsaid) + " more"));
    }
  }
}

bool RefusalTally::IsBehind() const {
  return std::any_of(_rows.begin(), _rows.end(), [](const Row& row) { return row.said != row.counted; });
}

std::array<unsigned long, httpRefusals.size()> RefusalTally::Counts() const {
  std::array<unsigned long, httpRefusals.size()> counts{};
  std::transform(_rows.begin(), _rows.end(), counts.begin(),
                 [](const Row& row) { return row.counted.load(); });
  return counts;
}

}  // namespace Agentd
