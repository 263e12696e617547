#include "otxctl/disks/DiskNames.h"

#include <cstddef>

namespace OtxCtl::Disks {
namespace {

constexpr std::size_t longestName = 200;

// Only letters, digits and a few marks; runs of anything else become one underscore.
std::string NamePart(std::string_view text, bool toLower = false) {
  std::string part;
  for (const char character : text) {
    const bool isLetter = (character >= 'a' && character <= 'z') || (character >= 'A' && character <= 'Z');
    const bool isDigit = character >= '0' && character <= '9';
    if (isLetter || isDigit || character == '.' || character == '-' || character == ':') {
      const bool isUpper = character >= 'A' && character <= 'Z';
      part += toLower && isUpper ? static_cast<char>(character - 'A' + 'a') : character;
    } else if (!part.empty() && part.back() != '_') {
      part += '_';
    }
  }
  while (!part.empty() && part.back() == '_') {
    part.pop_back();
  }
  return part.substr(0, longestName);
}

// Without a serial number two disks of one kind would get the same name.
std::string DescriptiveName(const DiskIdentity& identity) {
  const std::string serial = NamePart(identity.serial);
  if (serial.empty()) {
    return {};
  }
  std::string name = "t10.";
  for (const std::string* const text : {&identity.vendor, &identity.model}) {
    const std::string part = NamePart(*text);
    name += part.empty() ? part : part + "_";
  }
  return (name + serial).substr(0, longestName);
}

}  // namespace

std::string WorldWideName(std::string_view told) {
  const std::string_view start = told.substr(0, 2);
  if (start == "0x" || start == "0X") {
    const std::string digits = NamePart(told.substr(2), true);
    return digits.empty() ? digits : "naa." + digits;
  }
  return NamePart(told, true);
}

std::string CanonicalName(const DiskIdentity& identity, std::string_view place) {
  if (!identity.worldWideName.empty()) {
    return identity.worldWideName;
  }
  const std::string descriptive = DescriptiveName(identity);
  if (!descriptive.empty()) {
    return descriptive;
  }
  const std::string part = NamePart(place);
  return "path." + (part.empty() ? "disk" : part);
}

std::string DisplayName(const DiskIdentity& identity, std::string_view kernelName) {
  std::string what = identity.vendor;
  if (!identity.model.empty()) {
    what += (what.empty() ? "" : " ") + identity.model;
  }
  return (what.empty() ? "Disk" : what) + " (" + std::string(kernelName) + ")";
}

std::string UniqueNames::Take(const std::string& name) {
  std::string unique = name;
  while (!_taken.insert(unique).second) {
    unique = name + "." + std::to_string(++_count.try_emplace(name, 1).first->second);
  }
  return unique;
}

}  // namespace OtxCtl::Disks
