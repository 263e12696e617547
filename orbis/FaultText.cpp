#include "orbis/FaultText.h"

#include "orbis/TypeDescriptor.h"
#include "orbis/Types.h"

namespace Orbis {

std::string FaultText(const MethodFault& fault) {
  std::string text = fault.GetType().name;
  const char* separator = ": ";
  const auto add = [&](const std::string& part) {
    text += separator + part;
    separator = ", ";
  };
  if (const auto* systemError = dynamic_cast<const Fault::SystemError*>(&fault)) {
    add(systemError->GetReason());
    return text;
  }
  const Ref<DataArray<LocalizableMessage>> messages = fault.GetFaultMessage();
  for (const LocalizableMessage* message : *messages) {
    if (message != nullptr) {
      add(message->GetKey());
    }
  }
  return text;
}

}  // namespace Orbis
