// Attributes, links and folders of the kernel's tree of devices.
//
// What cannot be read is unknown, and the fact names the path and the reason: never "no". What does not exist
// is known not to be there, which is something else; where it must be there, the Required functions are for.
// Paths begin with a slash and are meant below the root: "/class/block/sda/size". Texts are cleaned and may
// be shown; names in folders are as they are, for they lead to further paths.
//
// Threads: any; nothing is kept but the root.
#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "otxctl/disks/Fact.h"
#include "otxctl/linux/BoundedFile.h"

namespace OtxCtl::Linux {

class SysfsReader {
 public:
  template <typename Value>
  using Optional = Disks::Fact<std::optional<Value>>;

  explicit SysfsReader(std::string root);

  Optional<std::string> Bytes(const std::string& path, Refusal refusal = Refusal::IsFailure) const;
  Optional<std::string> Text(const std::string& path, Refusal refusal = Refusal::IsFailure) const;
  Disks::Fact<std::string> RequiredText(const std::string& path) const;
  // Neither negative nor beyond 64 bits.
  Disks::Fact<std::int64_t> RequiredNumber(const std::string& path) const;
  // "0" or "1"
  Disks::Fact<bool> RequiredFlag(const std::string& path) const;
  Disks::Fact<bool> FlagOr(bool ifMissing, const std::string& path) const;

  // In the order of the alphabet.
  Optional<std::vector<std::string>> Folder(const std::string& path) const;
  Disks::Fact<bool> Exists(const std::string& path) const;
  // The last name of what the link says, be it there or not.
  Optional<std::string> LinkName(const std::string& path) const;
  // Without links, below the root: "/devices/...". A link that leads nowhere, or out of the root, is unknown.
  Optional<std::string> RealPath(const std::string& path) const;

  // As messages name it.
  std::string Shown(const std::string& path) const;

 private:
  std::string _root;
  std::string _realRoot;
};

// What is known and empty as well as what does not exist becomes the empty text.
Disks::Fact<std::string> TextOrEmpty(const Disks::Fact<std::optional<std::string>>& text);

// Digits alone, at most those of 63 bits.
std::optional<std::int64_t> ParseNumber(std::string_view text);

// The last name of a path, and the path before it; "/" has neither.
std::string_view LastName(std::string_view path);
std::string_view ParentPath(std::string_view path);

}  // namespace OtxCtl::Linux
