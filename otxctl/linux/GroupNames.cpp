#include "otxctl/linux/GroupNames.h"

#include <sys/random.h>

#include <array>
#include <cstdio>
#include <stdexcept>

#include "otxctl/linux/FileDescriptor.h"

namespace OtxCtl::Linux {
namespace {

// The first twelve digits: enough to tell those of one machine apart, and short enough for a path.
std::string Short(const std::string& uuid) {
  constexpr std::size_t digits = 12;
  std::string text;
  for (const char letter : uuid) {
    if (letter != '-' && text.size() < digits) {
      text += letter;
    }
  }
  return text;
}

}  // namespace

std::string VolumeGroupName(const std::string& groupUuid) {
  return "kova_" + Short(groupUuid);
}

std::string DataVolumeName(const std::string& diskUuid) {
  return "data_" + Short(diskUuid);
}

// The volume manager calls it so when it makes it.
std::string CacheVolumeName(const std::string& diskUuid) {
  return DataVolumeName(diskUuid) + "_cache";
}

std::string NewUuid() {
  std::array<unsigned char, 16> bytes{};
  if (Uninterrupted([&] { return getrandom(bytes.data(), bytes.size(), 0); }) !=
      static_cast<ssize_t>(bytes.size())) {
    throw std::runtime_error("the kernel gives no random numbers");
  }
  bytes[6] = static_cast<unsigned char>((bytes[6] & 0x0F) | 0x40);  // version 4
  bytes[8] = static_cast<unsigned char>((bytes[8] & 0x3F) | 0x80);  // of the usual variant
  std::string uuid;
  for (std::size_t index = 0; index < bytes.size(); ++index) {
    std::array<char, 3> digits{};
    std::snprintf(digits.data(), digits.size(), "%02x", bytes[index]);
    uuid += (index == 4 || index == 6 || index == 8 || index == 10) ? "-" : "";
    uuid += digits.data();
  }
  return uuid;
}

}  // namespace OtxCtl::Linux
