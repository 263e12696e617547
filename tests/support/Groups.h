// Disk groups in tests: disks by the handful, and groups as texts.
#pragma once

#include <string>
#include <vector>

#include "tests/support/Builders.h"

namespace TestSupport {

using Disks = std::vector<Tessa::Ref<Nox::Host::ScsiDisk>>;

inline Tessa::Ref<Nox::Host::ScsiDisk> Ssd(const std::string& name) {
  return AScsiDisk(name).Ssd();
}
inline Tessa::Ref<Nox::Host::ScsiDisk> Hdd(const std::string& name) {
  return AScsiDisk(name);
}

// "c1", "c2" and so on.
inline std::vector<std::string> Numbered(const std::string& prefix, int count) {
  std::vector<std::string> names;
  for (int number = 1; number <= count; ++number) {
    names.push_back(prefix + std::to_string(number));
  }
  return names;
}
inline Disks Ssds(const std::string& prefix, int count) {
  Disks disks;
  for (const std::string& name : Numbered(prefix, count)) {
    disks.push_back(Ssd(name));
  }
  return disks;
}
inline Disks Hdds(const std::string& prefix, int count) {
  Disks disks;
  for (const std::string& name : Numbered(prefix, count)) {
    disks.push_back(Hdd(name));
  }
  return disks;
}
inline Disks operator+(Disks left, const Disks& right) {
  left.insert(left.end(), right.begin(), right.end());
  return left;
}

// The canonical name; "unnamed" or "null" for want of one.
inline std::string DiskText(const Nox::Host::ScsiDisk* disk) {
  if (disk == nullptr) {
    return "null";
  }
  return disk->HasCanonicalName() ? disk->GetCanonicalName() : "unnamed";
}

// As in "ssd: disk disk".
inline std::string GroupText(const Nox::Kova::Host::DiskMapping& mapping) {
  std::string text = DiskText(mapping.GetSsd().Get()) + ":";
  if (mapping.GetNonSsd()) {
    for (const Nox::Host::ScsiDisk* disk : *mapping.GetNonSsd()) {
      text += " " + DiskText(disk);
    }
  }
  return text;
}
// The same, or "null".
inline std::string GroupText(const Nox::Kova::Host::DiskMapping* mapping) {
  return mapping != nullptr ? GroupText(*mapping) : "null";
}
inline std::vector<std::string> GroupTexts(const Orbis::DataArray<Nox::Kova::Host::DiskMapping>& mappings) {
  std::vector<std::string> texts;
  for (const Nox::Kova::Host::DiskMapping* mapping : mappings) {
    texts.push_back(GroupText(mapping));
  }
  return texts;
}
inline std::vector<std::string> DiskTexts(const Orbis::DataArray<Nox::Host::ScsiDisk>& disks) {
  std::vector<std::string> texts;
  for (const Nox::Host::ScsiDisk* disk : disks) {
    texts.push_back(DiskText(disk));
  }
  return texts;
}

// The list of a request or of a planner.
inline Tessa::Ref<Orbis::DataArray<Nox::Kova::Host::DiskMapping>> Mappings(
    const std::vector<Tessa::Ref<Nox::Kova::Host::DiskMapping>>& mappings) {
  const auto list = Tessa::MakeRef<Orbis::DataArray<Nox::Kova::Host::DiskMapping>>();
  for (const Tessa::Ref<Nox::Kova::Host::DiskMapping>& mapping : mappings) {
    list->Append(mapping);
  }
  return list;
}

}  // namespace TestSupport
