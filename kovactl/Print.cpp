#include "kovactl/Print.h"

#include <ostream>

#include "host/FaultWords.h"
#include "kovactl/FaultAdvice.h"
#include "orbis/Json.h"
#include "orbis/Soap.h"
#include "tessa/text/Escape.h"

namespace Kovactl {

void PrintObject(const Orbis::Any& object, const std::string& output, std::ostream& out) {
  std::string text;
  if (output == "json") {
    Orbis::WriteJson(object, text);
  } else {
    Orbis::SerializeObjectToSoap(object, nullptr, text);
  }
  out << text << "\n";
}

void PrintFault(const Orbis::MethodFault& fault, std::ostream& err) {
  err << "kovactl: " << Tessa::Escape(Host::Explain(fault)) << "\n";
  if (const std::string advice = Advise(fault); !advice.empty()) {
    err << "  " << advice << "\n";
  }
}

}  // namespace Kovactl
