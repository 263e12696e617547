// The plug-in's entry points, as a host program finds them with dlsym.
//
// InitKovaPlugin is called once, from one thread, before any hook. Hooks may then be called from any
// thread. They return nothing: answers are appended to the caller's strings, the fault to the first and
// the result to the second where there are two. A string stays as it was when there is nothing to say.
// Unless noted, inputs are only read. What a hook does with an exception is told in KovaLibManager.cpp.
#pragma once

#include <string>
#include <vector>

namespace Kovasvc {

using Texts = std::vector<std::string>;

// 1 on success, 0 on failure, after which it may be called again. Called again after a success, or while the
// process has no default logger, it ends the process.
using InitKovaPluginFn = int();
// SOAP texts of HostScsiDisk objects, request tag, fault, result.
using AddDisksFn = void(const Texts& disks, const std::string& requestTag, std::string& fault,
                        std::string& result);
// SOAP texts of KovaHostDiskMapping objects, request tag, fault, result.
using InitializeDisksFn = void(const Texts& mappings, const std::string& requestTag, std::string& fault,
                               std::string& result);
// Name of the disk, then what the kernel makes of it, fault.
using RemoveDisksFn = void(const std::string& disk, const std::string& passThrough,
                           const std::string& optionText, int optionFirst, int optionSecond,
                           std::string& fault);
// SOAP text of a KovaHostDiskMapping, then as above.
using RemoveDiskMappingFn = void(const std::string& mapping, const std::string& passThrough,
                                 const std::string& optionText, int optionFirst, int optionSecond,
                                 std::string& fault);
// Names of disks (none: every disk), fault, result.
using QueryDisksForKovaFn = void(Texts& names, std::string& fault, std::string& result);
using AddAllEligibleDisksFn = void(const std::string& requestTag, std::string& fault, std::string& result);
// SOAP texts of KovaHostDiskMapping objects, request tag, fault, result.
using UnmountDiskMappingFn = void(const Texts& mappings, const std::string& requestTag, std::string& fault,
                                  std::string& result);
using GetStorageInfoFn = void(std::string& result);
using GetConfigInfoFn = void(std::string& result);
using ClaimUnmountedDiskgroupFn = void();

}  // namespace Kovasvc
