#include "otxctl/linux/MountInfo.h"

#include <algorithm>
#include <cstddef>
#include <optional>
#include <utility>

#include "otxctl/linux/SysfsReader.h"
#include "tessa/text/Escape.h"

namespace OtxCtl::Linux {
namespace {

using Disks::Fact;
using Words = std::vector<std::string_view>;

// Between any number of blanks and tabs; the kernel escapes those that belong to a name.
Words WordsOf(std::string_view line) {
  constexpr std::string_view blanks = " \t";
  Words words;
  for (std::size_t start = line.find_first_not_of(blanks); start != std::string_view::npos;) {
    const std::size_t end = std::min(line.find_first_of(blanks, start), line.size());
    words.push_back(line.substr(start, end - start));
    start = line.find_first_not_of(blanks, end);
  }
  return words;
}

// "8:1"
bool IsDeviceNumber(std::string_view word) {
  const std::size_t colon = word.find(':');
  return colon != std::string_view::npos && ParseNumber(word.substr(0, colon)) &&
         ParseNumber(word.substr(colon + 1));
}

// "30 1 8:1 / /boot rw,relatime shared:1 - ext4 /dev/sda1 rw": any number of words stands before the dash.
// The kernel leaves the source empty for some file systems: two words are enough behind it.
std::optional<MountEntry> ParseMount(const Words& words) {
  constexpr std::size_t numberColumn = 2;
  constexpr std::size_t whereColumn = 4;
  constexpr std::size_t firstOptional = 6;
  if (words.size() < firstOptional || !IsDeviceNumber(words[numberColumn])) {
    return std::nullopt;
  }
  const auto dash = std::find(words.begin() + firstOptional, words.end(), "-");
  const auto behind = words.end() - dash;
  if (behind < 3) {
    return std::nullopt;
  }
  return MountEntry{std::string(words[numberColumn]), DecodeOctal(behind > 3 ? dash[2] : std::string_view()),
                    DecodeOctal(dash[1]), DecodeOctal(words[whereColumn])};
}

std::optional<SwapEntry> ParseSwap(const Words& words) {
  constexpr std::size_t columns = 5;
  if (words.size() != columns || (words[1] != "partition" && words[1] != "file")) {
    return std::nullopt;
  }
  return SwapEntry{DecodeOctal(words[0]), words[1] == "file"};
}

// One entry per line, the first `skipped` lines left out.
template <typename Entry>
Fact<std::vector<Entry>> ParseLines(std::string_view text, std::size_t skipped, const char* what,
                                    std::optional<Entry> (*parse)(const Words&)) {
  std::vector<Entry> entries;
  for (std::size_t line = 1; !text.empty(); ++line) {
    const std::size_t end = text.find('\n');
    if (end == std::string_view::npos) {
      return Fact<std::vector<Entry>>::Unknown(std::string(what) + ": cut short in line " +
                                               std::to_string(line));
    }
    if (line > skipped) {
      std::optional<Entry> entry = parse(WordsOf(text.substr(0, end)));
      if (!entry) {
        return Fact<std::vector<Entry>>::Unknown(
            std::string(what) + ": line " + std::to_string(line) +
            " is not understood: " + Tessa::Quote(Tessa::Sanitize(text.substr(0, end))));
      }
      entries.push_back(std::move(*entry));
    }
    text.remove_prefix(end + 1);
  }
  return {std::move(entries)};
}

}  // namespace

std::string DecodeOctal(std::string_view text) {
  constexpr std::size_t digitCount = 3;
  std::string decoded;
  while (!text.empty()) {
    const std::string_view digits = text.substr(1, digitCount);
    const bool isEscape = text.front() == '\\' && digits.size() == digitCount && digits.front() <= '3' &&
                          digits.find_first_not_of("01234567") == std::string_view::npos;
    if (isEscape) {
      decoded += static_cast<char>((digits[0] - '0') * 64 + (digits[1] - '0') * 8 + (digits[2] - '0'));
    } else {
      decoded += text.front();
    }
    text.remove_prefix(isEscape ? digitCount + 1 : 1);
  }
  return decoded;
}

Fact<std::vector<MountEntry>> ParseMountInfo(std::string_view text) {
  return ParseLines<MountEntry>(text, 0, "mounts", ParseMount);
}

Fact<std::vector<SwapEntry>> ParseSwaps(std::string_view text) {
  return ParseLines<SwapEntry>(text, 1, "swap areas", ParseSwap);
}

}  // namespace OtxCtl::Linux
