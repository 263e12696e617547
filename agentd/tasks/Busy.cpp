#include "agentd/tasks/Busy.h"

#include "host/Refusal.h"
#include "nox/Faults.h"

namespace Agentd {

constexpr int retryAfterSeconds = 5;

Tessa::Ref<Nox::Fault::Busy> TooBusy(const char* key, const std::string& reason) {
  const auto fault = Tessa::MakeRef<Nox::Fault::Busy>();
  fault->SetRetryAfterSeconds(retryAfterSeconds);
  Host::Explain(*fault, key, reason);
  return fault;
}

}  // namespace Agentd
