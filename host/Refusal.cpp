#include "host/Refusal.h"

#include "orbis/Types.h"

namespace Host {

using Orbis::Fault::InvalidArgument;
using Tessa::MakeRef;

void RefuseWith(const std::string& property, const std::string& text) {
  const auto fault = MakeRef<InvalidArgument>(property);
  const auto message = MakeRef<Orbis::LocalizableMessage>();
  message->SetKey("nox.agentd.gate.invalidArgument");
  message->SetMessage(text);
  fault->GetFaultMessage()->Append(message);
  throw InvalidArgument::Exception(fault);
}

void Refuse(const std::string& property, const std::string& reason) {
  RefuseWith(property, property + ": " + reason);
}

std::string Indexed(const std::string& list, std::size_t index) {
  return list + "[" + std::to_string(index) + "]";
}

}  // namespace Host
