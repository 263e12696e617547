#include "agentd/tasks/Busy.h"

#include "nox/Faults.h"
#include "orbis/Types.h"

namespace Agentd {

constexpr int retryAfterSeconds = 5;

Tessa::Ref<Nox::Fault::Busy> TooBusy(const char* key, const std::string& reason) {
  const auto fault = Tessa::MakeRef<Nox::Fault::Busy>();
  fault->SetRetryAfterSeconds(retryAfterSeconds);
  const auto message = Tessa::MakeRef<Orbis::LocalizableMessage>();
  message->SetKey(key);
  message->SetMessage(reason);
  fault->GetFaultMessage()->Append(message);
  return fault;
}

}  // namespace Agentd
