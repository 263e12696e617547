#include "kovactl/change/Consent.h"

#include <istream>
#include <ostream>

#include "kovactl/ExitStatus.h"
#include "tessa/text/Escape.h"

namespace Kovactl {

Consent Consent::Given() {
  return {true, nullptr, nullptr};
}

Consent Consent::AskedFor(std::istream& in, std::ostream& err) {
  return {false, &in, &err};
}

Consent Consent::OfNobody() {
  return {false, nullptr, nullptr};
}

void Consent::Require() const {
  if (!_given && _in == nullptr) {
    throw BadInput("this destroys data, and nobody is at the terminal to be asked: give --yes to go on");
  }
}

bool Consent::AskFor(const std::vector<std::string>& disks) const {
  Require();
  if (_given) {
    return true;
  }
  *_err << "What is on these disks may be lost:\n";
  for (const std::string& disk : disks) {
    *_err << "  " << Tessa::Escape(disk) << "\n";
  }
  *_err << "Go on? [y/N] " << std::flush;
  std::string reply;
  if (!std::getline(*_in, reply)) {
    *_err << "\n";
  }
  return reply == "y" || reply == "Y" || reply == "yes";
}

}  // namespace Kovactl
