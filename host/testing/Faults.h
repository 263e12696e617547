// Faults for tests of what is said about them.
#pragma once

#include <string>
#include <vector>

#include "orbis/TypeDescriptor.h"
#include "orbis/Types.h"

namespace Host::Testing {

// Every fault class there is, made without anything set.
inline std::vector<Tessa::Ref<Orbis::MethodFault>> EveryFault() {
  std::vector<Tessa::Ref<Orbis::MethodFault>> faults;
  for (const Orbis::TypeDescriptor* type : Orbis::AllTypes()) {
    if (type->kind == Orbis::TypeKind::DataObject && type->IsA(Orbis::MethodFault::StaticType()) &&
        !type->IsAbstract()) {
      faults.emplace_back(static_cast<Orbis::MethodFault*>(type->create().Get()));
    }
  }
  return faults;
}

// A fault with one message, which has only its key.
template <class Fault>
Tessa::Ref<Fault> WithKey(const std::string& key) {
  const auto message = Tessa::MakeRef<Orbis::LocalizableMessage>();
  message->SetKey(key);
  const auto fault = Tessa::MakeRef<Fault>();
  fault->GetFaultMessage()->Append(message);
  return fault;
}

}  // namespace Host::Testing
