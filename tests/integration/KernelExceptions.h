// The kernel's exceptions by name, and the fault by which a client is told of each.
#pragma once

#include <array>
#include <string>
#include <string_view>

namespace Integration {

struct KernelException {
  std::string_view name;
  enum class Told { Reason, Disk, Words } told;  // by its words as a SystemError, its disk, its words
  std::string_view fault;

  // The fault as the answers of requests write it.
  std::string FaultText(const std::string& words, const std::string& disk) const {
    const std::string type(fault);
    return told == Told::Reason ? type + ": " + words : type + " " + (told == Told::Disk ? disk : words);
  }
};

inline constexpr std::array<KernelException, 8> kernelExceptions = {{
    {"HostCtlException", KernelException::Told::Reason, "SystemError"},
    {"KovaStorageException", KernelException::Told::Reason, "SystemError"},
    {"KovaExceptionHasPartition", KernelException::Told::Disk, "DiskHasPartitions"},
    {"KovaExceptionLastRemainingHDD", KernelException::Told::Disk, "DiskIsLastRemainingNonSSD"},
    {"KovaExceptionRescanError", KernelException::Told::Words, "KovaDiskFault"},
    {"KovaExceptionRemoveMappingAutoModeEnabled", KernelException::Told::Words, "KovaDiskFault"},
    {"KovaExceptionRemoveDiskAutoModeEnabled", KernelException::Told::Words, "KovaDiskFault"},
    {"KovaExceptionIncompatibleDiskMapping", KernelException::Told::Reason, "SystemError"},
}};

}  // namespace Integration
