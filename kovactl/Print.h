// How commands print what the host answered.
#pragma once

#include <iosfwd>
#include <string>

#include "host/Answer.h"
#include "kovactl/ExitStatus.h"

namespace Kovactl {

// Prints the object as JSON or SOAP text.
void PrintObject(const Orbis::Any& object, const std::string& output, std::ostream& out);

// Explains the fault on a line of its own, and says on the next what can be done.
void PrintFault(const Orbis::MethodFault& fault, std::ostream& err);

// Prints a result of that type, as a table by `printTable`; Fault when there is a fault or no such result.
template <class Result, class PrintTable>
ExitStatus PrintAnswer(const Host::Answer& answer, const std::string& output, std::ostream& out,
                       std::ostream& err, PrintTable printTable) {
  if (answer.fault) {
    PrintFault(*answer.fault, err);
  }
  const auto* const result = dynamic_cast<const Result*>(answer.result.Get());
  if (result == nullptr) {
    return ExitStatus::Fault;
  }
  if (output == "table") {
    printTable(*result, out);
  } else {
    PrintObject(*result, output, out);
  }
  return answer.fault ? ExitStatus::Fault : ExitStatus::Done;
}

}  // namespace Kovactl
