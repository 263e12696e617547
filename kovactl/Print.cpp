#include "kovactl/Print.h"

#include <ostream>

#include "host/Text.h"
#include "kovactl/Words.h"
#include "orbis/Json.h"
#include "orbis/Soap.h"

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

void PrintFault(const Host::Answer& answer, std::ostream& err) {
  if (answer.fault) {
    err << "kovactl: " << Host::Printable(Explain(*answer.fault)) << "\n";
  }
}

}  // namespace Kovactl
