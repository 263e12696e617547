// A management API for tests of what stands before it: it notes what it is asked and answers what the test
// says.
#pragma once

#include <functional>
#include <mutex>
#include <string>
#include <vector>

#include "host/HostError.h"
#include "host/ManagementApi.h"
#include "nox/Host.h"
#include "nox/Kova.h"
#include "orbis/Engine.h"

namespace Agentd::Testing {

class FakeApi final : public Host::ManagementApi {
 public:
  // Set before the operation is called.
  Host::Answer answer;  // of every operation
  // Instead of it, where the answers differ; is given the operation as Asked lists it.
  std::function<Host::Answer(const std::string& asked)> answerTo;
  std::function<void()> onChange;  // called first by every operation that changes disks; may wait or throw
  std::function<void()> onQuery;   // the same by every other
  std::string description;         // empty: the host is not simulated

  // The operations so far: "RemoveDisk naa.1 p o 1 2".
  std::vector<std::string> Asked() const {
    const std::lock_guard guard(_mutex);
    return _asked;
  }

  Host::Answer QueryDisksForKova(const std::vector<std::string>& names) const override {
    std::string text;
    for (const std::string& name : names) {
      text += " " + name;
    }
    return Query("QueryDisksForKova" + text);
  }
  Host::Answer GetStorageInfo() const override { return Query("GetStorageInfo"); }
  Host::Answer GetDiskGroups() const override { return Query("GetDiskGroups"); }
  Host::Answer GetConfigInfo() const override { return Query("GetConfigInfo"); }
  Host::Answer AddDisks(const Host::DiskList& disks) const override {
    return Change("AddDisks" + Show(&disks));
  }
  Host::Answer AddAllEligibleDisks() const override { return Change("AddAllEligibleDisks"); }
  Host::Answer InitializeDisks(const Host::MappingList& mappings) const override {
    return Change("InitializeDisks" + Show(mappings));
  }
  Host::Answer UnmountDiskMapping(const Host::MappingList& mappings) const override {
    return Change("UnmountDiskMapping" + Show(mappings));
  }
  Host::Answer RemoveDisk(const std::string& disk, const Host::RemovalArguments& arguments) const override {
    return Change("RemoveDisk " + disk + Show(arguments));
  }
  Host::Answer RemoveDiskMapping(const Nox::Kova::Host::DiskMapping& mapping,
                                 const Host::RemovalArguments& arguments) const override {
    return Change("RemoveDiskMapping" + Show(mapping) + Show(arguments));
  }
  Host::Answer ClaimUnmountedDiskgroup() const override { return Change("ClaimUnmountedDiskgroup"); }
  std::string DescribeHost() const override {
    if (description.empty()) {
      throw Host::HostError("this is no simulated host");
    }
    return description;
  }
  Host::Answer ChangeHost(const std::string& change) const override { return Change("ChangeHost " + change); }

 private:
  Host::Answer Query(const std::string& asked) const {
    if (onQuery) {
      onQuery();
    }
    return Note(asked);
  }
  Host::Answer Note(const std::string& asked) const {
    const std::lock_guard guard(_mutex);
    _asked.push_back(asked);
    return answerTo ? answerTo(asked) : answer;
  }
  Host::Answer Change(const std::string& asked) const {
    if (onChange) {
      onChange();
    }
    return Note(asked);
  }

  // " naa.1", " naa.1!" for one that is flash by its flag, " naa.1?" for one without.
  static std::string Show(const Nox::Host::ScsiDisk& disk) {
    const std::string flag = !disk.HasSsd() ? "?" : disk.GetSsd() ? "!" : "";
    return " " + disk.GetCanonicalName() + flag;
  }
  static std::string Show(const Host::DiskList* disks) {
    std::string text;
    for (std::size_t i = 0; disks != nullptr && i < disks->Size(); ++i) {
      text += Show(*(*disks)[i]);
    }
    return text;
  }
  static std::string Show(const Nox::Kova::Host::DiskMapping& mapping) {
    return Show(*mapping.GetSsd()) + " <" + Show(mapping.GetNonSsd().Get()) + " >";
  }
  static std::string Show(const Host::MappingList& mappings) {
    std::string text;
    for (const Nox::Kova::Host::DiskMapping* mapping : mappings) {
      text += Show(*mapping);
    }
    return text;
  }
  static std::string Show(const Host::RemovalArguments& arguments) {
    return " " + arguments.passThrough + " " + arguments.optionText + " " +
           std::to_string(arguments.optionFirst) + " " + std::to_string(arguments.optionSecond);
  }

  mutable std::mutex _mutex;
  mutable std::vector<std::string> _asked;
};

}  // namespace Agentd::Testing
