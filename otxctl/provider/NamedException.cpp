#include "otxctl/provider/NamedException.h"

#include <algorithm>
#include <array>
#include <stdexcept>

#include "kova/agentd/include/HostCtlException.h"

namespace OtxCtl::Provider {
namespace {

using namespace HostCtl::Lib;

struct NamedClass {
  std::string_view name;
  void (*raise)(const std::string& message, const std::string& disk);
  bool (*matches)(const std::exception& exception) noexcept;
};

template <typename Exception>
bool Matches(const std::exception& exception) noexcept {
  return dynamic_cast<const Exception*>(&exception) != nullptr;
}

template <typename Exception>
constexpr NamedClass DiskClass(std::string_view name) {
  return {name, [](const std::string& message, const std::string& disk) { throw Exception(message, disk); },
          &Matches<Exception>};
}

template <typename Exception>
constexpr NamedClass PlainClass(std::string_view name) {
  return {name, [](const std::string& message, const std::string&) { throw Exception(message); },
          &Matches<Exception>};
}

// A derived class stands before its base, so that the first match is the nearest.
constexpr std::array classes = {
    DiskClass<KovaExceptionHasPartition>("KovaExceptionHasPartition"),
    DiskClass<KovaExceptionLastRemainingHDD>("KovaExceptionLastRemainingHDD"),
    DiskClass<KovaExceptionRescanError>("KovaExceptionRescanError"),
    DiskClass<KovaExceptionRemoveMappingAutoModeEnabled>("KovaExceptionRemoveMappingAutoModeEnabled"),
    DiskClass<KovaExceptionRemoveDiskAutoModeEnabled>("KovaExceptionRemoveDiskAutoModeEnabled"),
    DiskClass<KovaStorageException>("KovaStorageException"),
    PlainClass<KovaExceptionIncompatibleDiskMapping>("KovaExceptionIncompatibleDiskMapping"),
    PlainClass<HostCtlException>("HostCtlException"),
    PlainClass<std::runtime_error>("std::runtime_error"),
};

const NamedClass* Find(std::string_view name) noexcept {
  const auto* const found = std::find_if(classes.begin(), classes.end(),
                                         [name](const NamedClass& one) { return one.name == name; });
  return found == classes.end() ? nullptr : found;
}

}  // namespace

bool IsExceptionName(std::string_view name) noexcept {
  return Find(name) != nullptr;
}

void ThrowNamed(std::string_view name, const std::string& message, const std::string& disk) {
  if (const NamedClass* const named = Find(name)) {
    named->raise(message, disk);
  }
  throw std::invalid_argument("no exception class is called \"" + std::string(name) + "\"");
}

std::string_view ExceptionName(const std::exception& exception) noexcept {
  const auto* const found = std::find_if(
      classes.begin(), classes.end(), [&exception](const NamedClass& one) { return one.matches(exception); });
  return found == classes.end() ? "std::exception" : found->name;
}

}  // namespace OtxCtl::Provider
