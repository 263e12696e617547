#include "host/Gate.h"

#include "host/Text.h"

namespace Host::Gate {
namespace {

using Orbis::LocalizableMessage;
using Orbis::MethodFault;
using Tessa::MakeRef;
using Tessa::Ref;

Ref<MethodFault> Refuse(const std::string& property, const std::string& reason) {
  const auto fault = MakeRef<Orbis::Fault::InvalidArgument>(property);
  const auto message = MakeRef<LocalizableMessage>();
  message->SetKey("nox.agentd.gate.invalidArgument");
  message->SetMessage(property + ": " + reason);
  fault->GetFaultMessage()->Append(message);
  return fault;
}

}  // namespace

Ref<MethodFault> CheckNames(const std::string& property, const std::vector<std::string>& names) {
  if (names.size() > mostNames) {
    return Refuse(property, "more than " + std::to_string(mostNames) + " names");
  }
  for (std::size_t i = 0; i < names.size(); ++i) {
    const std::string place = property + "[" + std::to_string(i) + "]";
    if (names[i].empty()) {
      return Refuse(place, "the name of a disk is empty");
    }
    if (names[i].size() > longestName) {
      return Refuse(place, "a name of more than " + std::to_string(longestName) + " bytes");
    }
    if (!IsClean(names[i])) {
      return Refuse(place, "the name '" + Printable(names[i]) + "' holds control characters or is not UTF-8");
    }
  }
  return nullptr;
}

}  // namespace Host::Gate
