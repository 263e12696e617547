#include "otxctl/sim/LsblkText.h"

#include <algorithm>
#include <optional>

#include "tessa/text/Escape.h"

namespace OtxCtl::Sim {
namespace {

constexpr std::size_t escapeLength = 4;  // \x20

std::optional<unsigned> HexDigit(char character) {
  if (character >= '0' && character <= '9') {
    return static_cast<unsigned>(character - '0');
  }
  const char lower = static_cast<char>(character | 0x20);
  return lower >= 'a' && lower <= 'f' ? std::optional<unsigned>(static_cast<unsigned>(lower - 'a') + 10)
                                      : std::nullopt;
}

// The byte of the escape that `text` begins with.
std::optional<char> EscapedByte(std::string_view text) {
  if (text.size() < escapeLength || text[0] != '\\' || text[1] != 'x') {
    return std::nullopt;
  }
  const std::optional<unsigned> high = HexDigit(text[2]);
  const std::optional<unsigned> low = HexDigit(text[3]);
  return high && low ? std::optional<char>(static_cast<char>(*high * 16 + *low)) : std::nullopt;
}

}  // namespace

std::string CleanLsblkText(std::string_view text) {
  std::string bytes;
  for (std::size_t i = 0; i < text.size();) {
    const std::optional<char> byte = EscapedByte(text.substr(i));
    bytes += byte ? *byte : text[i];
    i += byte ? escapeLength : 1;
  }
  return Tessa::Sanitize(bytes);
}

std::string WithSoundEscapes(std::string_view json) {
  std::string sound;
  sound.reserve(json.size());
  for (std::size_t i = 0; i < json.size(); ++i) {
    sound += json[i];
    if (json[i] != '\\' || i + 1 == json.size()) {
      continue;
    }
    // A backslash and what it escapes are one.
    if (EscapedByte(json.substr(i))) {
      sound += '\\';
    }
    sound += json[++i];
  }
  return sound;
}

std::string WithoutFolder(std::string name) {
  for (const std::string_view folder : {"/dev/mapper/", "/dev/"}) {
    if (name.size() > folder.size() && name.compare(0, folder.size(), folder) == 0) {
      name.erase(0, folder.size());
      break;
    }
  }
  std::replace(name.begin(), name.end(), '!', '/');
  return name;
}

}  // namespace OtxCtl::Sim
