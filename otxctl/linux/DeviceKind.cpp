#include "otxctl/linux/DeviceKind.h"

#include <algorithm>
#include <array>
#include <string_view>

#include "otxctl/linux/DeviceIdentity.h"
#include "tessa/text/Escape.h"

namespace OtxCtl::Linux {
namespace {

struct Word {
  std::string_view beginning;
  std::string_view word;
};

// By the beginning of a mapping's UUID.
constexpr std::array<Word, 6> mappers = {{{"LVM-", "LVM"},
                                          {"CRYPT-", "encryption"},
                                          {"mpath-", "multipath"},
                                          {"DMRAID-", "RAID"},
                                          {"part", "partition"},
                                          {"VERITY-", "integrity"}}};

// By the beginning of a name, which a number follows.
constexpr std::array<Word, 7> noDisks = {{{"loop", "a loop device"},
                                          {"ram", "memory"},
                                          {"zram", "memory"},
                                          {"md", "a RAID array"},
                                          {"bcache", "a cached device"},
                                          {"fd", "a floppy drive"},
                                          {"sr", "an optical drive"}}};

bool BeginsWith(std::string_view text, std::string_view beginning) {
  return text.substr(0, beginning.size()) == beginning;
}

std::string MapperInWords(const BlockDevice& device) {
  if (!device.mapping->uuid.IsKnown()) {
    return "device-mapper";
  }
  const auto* const found = std::find_if(mappers.begin(), mappers.end(), [&](const Word& mapper) {
    return BeginsWith(device.mapping->uuid.Get(), mapper.beginning);
  });
  return found == mappers.end() ? "device-mapper" : std::string(found->word);
}

// The areas beside the user's own of a soldered memory card: "mmcblk0boot0", "mmcblk0rpmb".
bool IsCardArea(std::string_view name) {
  constexpr std::string_view card = "mmcblk";
  if (!BeginsWith(name, card)) {
    return false;
  }
  const std::string_view rest = name.substr(card.size());
  return rest.find_first_not_of("0123456789") != std::string_view::npos;
}

std::string WhyByName(const std::string& name) {
  for (const Word& kind : noDisks) {
    if (BeginsWith(name, kind.beginning) &&
        ParseNumber(std::string_view(name).substr(kind.beginning.size()))) {
      return std::string(kind.word);
    }
  }
  return IsCardArea(name) ? "an area of a memory card" : "";
}

}  // namespace

bool IsMultipathMap(const BlockDevice& device) {
  return device.mapping && device.mapping->uuid.IsKnown() && BeginsWith(device.mapping->uuid.Get(), "mpath-");
}

bool IsMappedPartition(const BlockDevice& device) {
  return device.mapping && device.mapping->uuid.IsKnown() && BeginsWith(device.mapping->uuid.Get(), "part");
}

std::string WhyLeftOut(const SysfsReader& reader, const BlockDevice& device) {
  if (device.mapping && !IsMultipathMap(device)) {
    return device.mapping->uuid.IsKnown() ? "a mapped device: " + InWords(device)
                                          : "nobody knows what it maps: " + device.mapping->uuid.WhyUnknown();
  }
  const std::string byName = device.isRaid ? "a RAID array" : WhyByName(device.name);
  if (!byName.empty()) {
    return byName;
  }
  if (!device.isHidden.Is(false)) {
    return device.isHidden.IsKnown() ? "hidden" : "nobody knows: " + device.isHidden.WhyUnknown();
  }
  if (!device.number.IsKnown()) {
    return "nobody knows: " + device.number.WhyUnknown();
  }
  const Disks::Fact<std::string> whyNoDisk = WhyNoDisk(reader, device);
  if (!whyNoDisk.Is({})) {
    return whyNoDisk.IsKnown() ? whyNoDisk.Get() : "nobody knows: " + whyNoDisk.WhyUnknown();
  }
  return device.bytes.Is(0) ? "without a medium" : "";
}

std::string InWords(const BlockDevice& device) {
  if (device.mapping) {
    const bool isNamed = device.mapping->name.IsKnown() && !device.mapping->name.Get().empty();
    return (isNamed ? device.mapping->name.Get() : device.name) + " (" + MapperInWords(device) + ")";
  }
  return device.isRaid ? device.name + " (RAID)" : device.name;
}

}  // namespace OtxCtl::Linux
