// The question that stands before data is destroyed.
#pragma once

#include <iosfwd>
#include <string>
#include <vector>

namespace Kovactl {

class Consent {
 public:
  // Given beforehand, as by --yes: nobody is asked.
  static Consent Given();
  // To be asked for, at a terminal. Both streams must outlive it.
  static Consent AskedFor(std::istream& in, std::ostream& err);
  // Nobody is there who could be asked: refused.
  static Consent OfNobody();

  // Throws BadInput, which says how to give consent, when it can neither be taken for granted nor asked for.
  void Require() const;
  // Names the disks that may lose their data and asks whether to go on; only "y" or "yes" means that.
  bool AskFor(const std::vector<std::string>& disks) const;

 private:
  Consent(bool given, std::istream* in, std::ostream* err) : _given(given), _in(in), _err(err) {}

  bool _given;
  std::istream* _in;   // null: nobody to ask
  std::ostream* _err;  // where the question is put
};

}  // namespace Kovactl
