// A manager of which every inner operation is noted, and may be replaced.
//
// Calls between operations go through the operation table; a spy sees those that do, with their arguments.
// Not guarded: for tests of one thread.
#pragma once

#include <functional>
#include <string>
#include <vector>

#include "kova/agentd/KovaManagerImpl.h"
#include "nox/Kova.h"
#include "orbis/Types.h"
#include "tests/support/Groups.h"

namespace TestSupport {

class SpyManager final : public Kovasvc::KovaManagerImpl {
 public:
  using KovaManagerImpl::KovaManagerImpl;
  using Fault = Tessa::Ref<Orbis::MethodFault>;
  using MapResultRef = Tessa::Ref<Nox::Kova::Host::DiskMapResult>;
  using MappingRef = Tessa::Ref<Nox::Kova::Host::DiskMapping>;

  // "InitializeMapping(s1: a b, tag, 1, 0)" and the like.
  std::vector<std::string> calls;
  // Calls that stand in for the operations; where there is none, the plain operation is called.
  std::function<void(Tessa::Ref<Orbis::Any>& result, Fault& fault)> initializeDisksInt;
  std::function<void(const MappingRef& mapping, MapResultRef& result)> validateDiskMapping;
  std::function<void()> validateDiskMappings;
  std::function<bool()> diskMappingExists;
  std::function<void()> formatDiskMapping;
  std::function<void()> restampDiskMapping;
  std::function<void(const MappingRef& mapping, MapResultRef& result)> initializeMapping;
  std::function<void(MappingRef& mapping, Fault& fault)> unmountDiskMappingInt;

  void InitializeDisksInt(Orbis::DataArray<Mapping>* mappings, const std::string& requestTag,
                          Tessa::Ref<Orbis::Any>& result, Fault& fault) override {
    calls.push_back("InitializeDisksInt(" + List(mappings) + ", " + requestTag + ")");
    if (initializeDisksInt) {
      initializeDisksInt(result, fault);
    } else {
      KovaManagerImpl::InitializeDisksInt(mappings, requestTag, result, fault);
    }
  }
  void ValidateDiskMapping(MappingRef mapping, MapResultRef& result) override {
    calls.push_back("ValidateDiskMapping(" + GroupText(mapping.Get()) + ")");
    if (validateDiskMapping) {
      validateDiskMapping(mapping, result);
    } else {
      KovaManagerImpl::ValidateDiskMapping(mapping, result);
    }
  }
  void ValidateDiskMappings(Orbis::DataArray<Mapping>* mappings) override {
    calls.push_back("ValidateDiskMappings(" + List(mappings) + ")");
    if (validateDiskMappings) {
      validateDiskMappings();
    } else {
      KovaManagerImpl::ValidateDiskMappings(mappings);
    }
  }
  bool DiskMappingExists(MappingRef mapping) override {
    calls.push_back("DiskMappingExists(" + GroupText(mapping.Get()) + ")");
    return diskMappingExists ? diskMappingExists() : KovaManagerImpl::DiskMappingExists(mapping);
  }
  void FormatDiskMapping(const std::string& ssdName, Texts& nonSsdNames, const std::string& requestTag,
                         int mappingCount, int mappingIndex) override {
    calls.push_back("FormatDiskMapping(" + ssdName + ", " + List(nonSsdNames) + ", " + requestTag + ", " +
                    std::to_string(mappingCount) + ", " + std::to_string(mappingIndex) + ")");
    if (formatDiskMapping) {
      formatDiskMapping();
    } else {
      KovaManagerImpl::FormatDiskMapping(ssdName, nonSsdNames, requestTag, mappingCount, mappingIndex);
    }
  }
  void RestampDiskMapping(const std::string& ssdName, Texts& capacityNames) override {
    calls.push_back("RestampDiskMapping(" + ssdName + ", " + List(capacityNames) + ")");
    if (restampDiskMapping) {
      restampDiskMapping();
    } else {
      KovaManagerImpl::RestampDiskMapping(ssdName, capacityNames);
    }
  }
  void InitializeMapping(MappingRef mapping, const std::string& requestTag, int mappingCount,
                         int mappingIndex, MapResultRef& result) override {
    calls.push_back("InitializeMapping(" + GroupText(mapping.Get()) + ", " + requestTag + ", " +
                    std::to_string(mappingCount) + ", " + std::to_string(mappingIndex) + ")");
    if (initializeMapping) {
      initializeMapping(mapping, result);
    } else {
      KovaManagerImpl::InitializeMapping(mapping, requestTag, mappingCount, mappingIndex, result);
    }
  }
  void UnmountDiskMappingInt(MappingRef& mapping, const std::string& requestTag, Fault& fault) override {
    calls.push_back("UnmountDiskMappingInt(" + GroupText(mapping.Get()) + ", " + requestTag + ")");
    if (unmountDiskMappingInt) {
      unmountDiskMappingInt(mapping, fault);
    } else {
      KovaManagerImpl::UnmountDiskMappingInt(mapping, requestTag, fault);
    }
  }

 private:
  static std::string List(const Orbis::DataArray<Mapping>* mappings) {
    return mappings != nullptr ? List(GroupTexts(*mappings)) : "null";
  }
  static std::string List(const std::vector<std::string>& parts) {
    std::string text;
    for (const std::string& part : parts) {
      text += (text.empty() ? "" : ", ") + part;
    }
    return "[" + text + "]";
  }
};

}  // namespace TestSupport
