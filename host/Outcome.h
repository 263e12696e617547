// What became of a request, in a word.
#pragma once

#include <cstddef>
#include <string_view>

namespace Host {

enum class Outcome {
  Done,    // all that was asked for
  Partly,  // a part of it; the answer tells what failed
  Failed,  // nothing of it
};

constexpr std::string_view NameOf(Outcome outcome) {
  constexpr std::string_view names[] = {"done", "partly", "failed"};
  return names[static_cast<std::size_t>(outcome)];
}

}  // namespace Host
