#include "otxctl/linux/NaturalOrder.h"

#include <algorithm>
#include <cstddef>

namespace OtxCtl::Linux {
namespace {

bool IsDigit(char character) {
  return character >= '0' && character <= '9';
}

// Digits alone or none at all; taken off the front.
std::string_view TakeRun(std::string_view& text) {
  const bool isNumber = IsDigit(text.front());
  const auto* const end =
      std::find_if(text.begin(), text.end(), [&](char character) { return IsDigit(character) != isNumber; });
  const std::string_view run = text.substr(0, static_cast<std::size_t>(end - text.begin()));
  text.remove_prefix(run.size());
  return run;
}

// Below, at or above zero, as the run is before, like or behind the other.
int Compare(std::string_view run, std::string_view other) {
  const bool isNumber = IsDigit(run.front());
  if (isNumber != IsDigit(other.front())) {
    return isNumber ? -1 : 1;
  }
  if (isNumber) {
    run.remove_prefix(std::min(run.find_first_not_of('0'), run.size()));
    other.remove_prefix(std::min(other.find_first_not_of('0'), other.size()));
  }
  constexpr std::size_t kindSize = 2;  // letters that tell the kind of device: "sd" of "sdaa"
  const int kind = isNumber ? 0 : run.substr(0, kindSize).compare(other.substr(0, kindSize));
  if (kind == 0 && run.size() != other.size()) {
    return run.size() < other.size() ? -1 : 1;
  }
  return kind != 0 ? kind : run.compare(other);
}

}  // namespace

bool IsNaturallyBefore(std::string_view name, std::string_view other) {
  std::string_view left = name;
  std::string_view right = other;
  while (!left.empty() && !right.empty()) {
    const int order = Compare(TakeRun(left), TakeRun(right));
    if (order != 0) {
      return order < 0;
    }
  }
  if (left.empty() != right.empty()) {
    return left.empty();
  }
  return name < other;
}

}  // namespace OtxCtl::Linux
