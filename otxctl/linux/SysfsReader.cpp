#include "otxctl/linux/SysfsReader.h"

#include <dirent.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <charconv>
#include <climits>
#include <cstdlib>
#include <memory>
#include <utility>

#include "tessa/text/Escape.h"

namespace OtxCtl::Linux {
namespace {

using Disks::Fact;

constexpr std::size_t longestAttribute = 4096;  // the kernel gives no more than a page
constexpr std::size_t mostNames = 1U << 20U;

// Empty, with errno, if there is none.
std::string RealPathOf(const std::string& path) {
  const std::unique_ptr<char, void (*)(void*)> real(realpath(path.c_str(), nullptr), std::free);
  return real == nullptr ? std::string() : std::string(real.get());
}

struct CloseFolder {
  void operator()(DIR* folder) const { closedir(folder); }
};

}  // namespace

SysfsReader::SysfsReader(std::string root) : _root(std::move(root)), _realRoot(RealPathOf(_root)) {}

std::string SysfsReader::Shown(const std::string& path) const {
  return Tessa::Escape(_root + path);
}

SysfsReader::Optional<std::string> SysfsReader::Bytes(const std::string& path, Refusal refusal) const {
  return ReadWhole(_root + path, longestAttribute, refusal);
}

SysfsReader::Optional<std::string> SysfsReader::Text(const std::string& path, Refusal refusal) const {
  const Optional<std::string> bytes = Bytes(path, refusal);
  return bytes.IsKnown() && bytes.Get() ? Optional<std::string>(Tessa::Sanitize(*bytes.Get())) : bytes;
}

Fact<std::string> SysfsReader::RequiredText(const std::string& path) const {
  const Optional<std::string> text = Text(path);
  if (!text.IsKnown()) {
    return Fact<std::string>::Unknown(text.WhyUnknown());
  }
  return text.Get() ? Fact<std::string>(*text.Get())
                    : Fact<std::string>::Unknown(Shown(path) + ": does not exist");
}

Fact<std::int64_t> SysfsReader::RequiredNumber(const std::string& path) const {
  const Fact<std::string> text = RequiredText(path);
  if (!text.IsKnown()) {
    return Fact<std::int64_t>::Unknown(text.WhyUnknown());
  }
  const std::optional<std::int64_t> number = ParseNumber(text.Get());
  return number ? Fact<std::int64_t>(*number)
                : Fact<std::int64_t>::Unknown(Shown(path) + ": not a number: " + Tessa::Quote(text.Get()));
}

Fact<bool> SysfsReader::RequiredFlag(const std::string& path) const {
  const Fact<std::string> text = RequiredText(path);
  if (!text.IsKnown()) {
    return Fact<bool>::Unknown(text.WhyUnknown());
  }
  if (text.Get() == "0" || text.Get() == "1") {
    return {text.Get() == "1"};
  }
  return Fact<bool>::Unknown(Shown(path) + ": neither 0 nor 1: " + Tessa::Quote(text.Get()));
}

Fact<bool> SysfsReader::FlagOr(bool ifMissing, const std::string& path) const {
  const Fact<bool> exists = Exists(path);
  return exists.Is(false) ? Fact<bool>(ifMissing) : RequiredFlag(path);
}

SysfsReader::Optional<std::vector<std::string>> SysfsReader::Folder(const std::string& path) const {
  using Names = std::vector<std::string>;
  const std::string full = _root + path;
  const std::unique_ptr<DIR, CloseFolder> folder(opendir(full.c_str()));
  if (folder == nullptr) {
    const int error = errno;
    return error == ENOENT ? Optional<Names>(std::nullopt)
                           : Optional<Names>::Unknown(CannotRead(full, error));
  }
  Names names;
  errno = 0;
  while (const dirent* const entry = readdir(folder.get())) {
    const std::string_view name = entry->d_name;
    if (name != "." && name != "..") {
      names.emplace_back(name);
    }
    if (names.size() > mostNames) {
      return Optional<Names>::Unknown(Shown(path) + ": too many names");
    }
    errno = 0;
  }
  if (errno != 0) {
    return Optional<Names>::Unknown(CannotRead(full, errno));
  }
  std::sort(names.begin(), names.end());
  return Optional<Names>(std::move(names));
}

Fact<bool> SysfsReader::Exists(const std::string& path) const {
  const std::string full = _root + path;
  struct stat status = {};
  if (lstat(full.c_str(), &status) == 0) {
    return {true};
  }
  return errno == ENOENT ? Fact<bool>(false) : Fact<bool>::Unknown(CannotRead(full, errno));
}

SysfsReader::Optional<std::string> SysfsReader::LinkName(const std::string& path) const {
  const std::string full = _root + path;
  std::array<char, PATH_MAX> target = {};
  const ssize_t size = readlink(full.c_str(), target.data(), target.size());
  if (size < 0) {
    const int error = errno;
    return error == ENOENT ? Optional<std::string>(std::nullopt)
                           : Optional<std::string>::Unknown(CannotRead(full, error));
  }
  return {std::string(LastName({target.data(), static_cast<std::size_t>(size)}))};
}

SysfsReader::Optional<std::string> SysfsReader::RealPath(const std::string& path) const {
  const std::string full = _root + path;
  const std::string real = RealPathOf(full);
  if (real.empty()) {
    const int error = errno;
    return error == ENOENT && Exists(path).Is(false)
               ? Optional<std::string>(std::nullopt)
               : Optional<std::string>::Unknown(CannotRead(full, error));
  }
  if (_realRoot.empty() || real.compare(0, _realRoot.size() + 1, _realRoot + "/") != 0) {
    return Optional<std::string>::Unknown(Shown(path) + ": leads out of " + Shown({}));
  }
  return {real.substr(_realRoot.size())};
}

Fact<std::string> TextOrEmpty(const Fact<std::optional<std::string>>& text) {
  return text.IsKnown() ? Fact<std::string>(text.Get().value_or(std::string()))
                        : Fact<std::string>::Unknown(text.WhyUnknown());
}

std::optional<std::int64_t> ParseNumber(std::string_view text) {
  std::int64_t number = 0;
  const char* const end = text.data() + text.size();
  const auto [stop, error] = std::from_chars(text.data(), end, number);
  const bool isNumber = error == std::errc() && stop == end && text.front() != '-';
  return isNumber ? std::optional<std::int64_t>(number) : std::nullopt;
}

std::string_view LastName(std::string_view path) {
  const std::size_t slash = path.rfind('/');
  return slash == std::string_view::npos ? path : path.substr(slash + 1);
}

std::string_view ParentPath(std::string_view path) {
  const std::size_t slash = path.rfind('/');
  return slash == std::string_view::npos ? std::string_view() : path.substr(0, slash);
}

}  // namespace OtxCtl::Linux
