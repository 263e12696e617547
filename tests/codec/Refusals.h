// What the tests of refused texts share.
#pragma once

#include <functional>
#include <ostream>
#include <string>

#include "orbis/Any.h"

namespace Codec {

// A text that must be refused: where, and with what words among others.
struct Refusal {
  std::string name;
  std::string text;
  std::string path;
  int line;
  std::string reason;

  friend std::ostream& operator<<(std::ostream& out, const Refusal& refusal) { return out << refusal.name; }
};

// A text that must be accepted: the neighbour of one that is not.
struct Acceptance {
  std::string name;
  std::string text;

  friend std::ostream& operator<<(std::ostream& out, const Acceptance& row) { return out << row.name; }
};

using Read = std::function<Orbis::Ref<Orbis::Any>(const std::string&)>;

// `read` must throw a ParseException that says all this.
void ExpectRefused(const Refusal& refusal, const Read& read);

// `read` must refuse every beginning of the text, the empty one too, and accept the whole.
void ExpectRefusedWhenCutOff(const std::string& text, const Read& read);

std::string Repeated(const std::string& piece, std::size_t times);

}  // namespace Codec
