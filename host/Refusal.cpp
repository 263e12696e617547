#include "host/Refusal.h"

#include "orbis/Types.h"

namespace Host {

using Orbis::Fault::InvalidArgument;
using Tessa::MakeRef;

void Explain(Orbis::MethodFault& fault, const char* key, const std::string& text) {
  const auto message = MakeRef<Orbis::LocalizableMessage>();
  message->SetKey(key);
  message->SetMessage(text);
  fault.GetFaultMessage()->Append(message);
}

void RefuseWith(const std::string& property, const std::string& text) {
  const auto fault = MakeRef<InvalidArgument>(property);
  Explain(*fault, invalidArgumentKey, text);
  throw InvalidArgument::Exception(fault);
}

void Refuse(const std::string& property, const std::string& reason) {
  RefuseWith(property, property + ": " + reason);
}

std::string Indexed(const std::string& list, std::size_t index) {
  return list + "[" + std::to_string(index) + "]";
}

}  // namespace Host
