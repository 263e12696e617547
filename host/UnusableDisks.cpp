#include "host/UnusableDisks.h"

#include <string>

#include "host/FaultWords.h"
#include "host/Refusal.h"
#include "nox/Kova.h"
#include "tessa/text/Escape.h"

namespace Host {
namespace {

using Nox::Kova::Host::DiskResult;

constexpr std::size_t mostNamed = 5;

std::string ReasonOf(const DiskResult& result) {
  if (result.GetError()) {
    return WordsFor(*result.GetError());
  }
  return result.GetState() == DiskResult::STATE_INUSE ? "in use already" : "not to be used";
}

}  // namespace

void NameUnusableDisks(const Answer& queried, Orbis::MethodFault& fault) {
  const auto* const results = dynamic_cast<const Orbis::DataArray<DiskResult>*>(queried.result.Get());
  std::string text;
  std::size_t count = 0;
  if (results != nullptr) {
    for (const DiskResult* result : *results) {
      if (result->GetState() != DiskResult::STATE_ELIGIBLE && ++count <= mostNamed) {
        text += (text.empty() ? "" : "; ") + Tessa::Escape(result->GetDisk()->GetCanonicalName()) + ": " +
                ReasonOf(*result);
      }
    }
  }
  if (count > mostNamed) {
    text += "; and " + std::to_string(count - mostNamed) + " more";
  }
  if (count > 0) {
    Explain(fault, "nox.agentd.addDisks.unusable", text);
  }
}

}  // namespace Host
