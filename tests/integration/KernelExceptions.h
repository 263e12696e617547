// The kernel's exceptions by name, and the fault by which a client is told of each.
#pragma once

#include <array>
#include <string>
#include <string_view>

namespace Integration {

struct KernelException {
  std::string_view name;
  enum class FaultShows { Reason, Disk, Words } told;  // by its words as a SystemError, its disk, its words
  std::string_view fault;

  // The fault as the answers of requests write it.
  std::string FaultText(const std::string& words, const std::string& disk) const {
    const std::string type(fault);
    return told == FaultShows::Reason ? type + ": " + words
                                      : type + " " + (told == FaultShows::Disk ? disk : words);
  }
};

inline constexpr std::array<KernelException, 8> kernelExceptions = {{
    {"HostCtlException", KernelException::FaultShows::Reason, "SystemError"},
    {"KovaStorageException", KernelException::FaultShows::Reason, "SystemError"},
    {"KovaExceptionHasPartition", KernelException::FaultShows::Disk, "DiskHasPartitions"},
    {"KovaExceptionLastRemainingHDD", KernelException::FaultShows::Disk, "DiskIsLastRemainingNonSSD"},
    {"KovaExceptionRescanError", KernelException::FaultShows::Words, "KovaDiskFault"},
    {"KovaExceptionRemoveMappingAutoModeEnabled", KernelException::FaultShows::Words, "KovaDiskFault"},
    {"KovaExceptionRemoveDiskAutoModeEnabled", KernelException::FaultShows::Words, "KovaDiskFault"},
    {"KovaExceptionIncompatibleDiskMapping", KernelException::FaultShows::Reason, "SystemError"},
}};

}  // namespace Integration
