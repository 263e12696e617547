// A host for tests of commands: it answers with what the test says, and keeps what it was asked for.
#pragma once

#include <string>
#include <vector>

#include "host/HostError.h"
#include "host/ManagementApi.h"
#include "nox/Kova.h"

namespace Kovactl::Testing {

class FakeHost final : public Host::ManagementApi {
 public:
  Host::Answer QueryDisksForKova(const std::vector<std::string>& names) const override {
    asked = names;
    return answer;
  }
  Host::Answer GetStorageInfo() const override { return answer; }
  // The last of the prepared states stays; the others are given once.
  Host::Answer GetDiskGroups() const override {
    if (groups.empty()) {
      return answer;
    }
    const Host::Answer now = groups.front();
    if (groups.size() > 1) {
      groups.erase(groups.begin());
    }
    return now;
  }
  Host::Answer GetConfigInfo() const override { return answer; }

  Host::Answer AddDisks(const Host::DiskList& disks) const override {
    return Changed("AddDisks" + NamesOf(disks));
  }
  Host::Answer AddAllEligibleDisks() const override { return Changed("AddAllEligibleDisks"); }
  Host::Answer InitializeDisks(const Host::MappingList& mappings) const override {
    return Changed("InitializeDisks" + NamesOf(mappings));
  }
  Host::Answer UnmountDiskMapping(const Host::MappingList& mappings) const override {
    return Changed("UnmountDiskMapping" + NamesOf(mappings));
  }
  Host::Answer RemoveDisk(const std::string& disk, const Host::RemovalArguments& arguments) const override {
    return Changed("RemoveDisk " + disk + TextOf(arguments));
  }
  Host::Answer RemoveDiskMapping(const Nox::Kova::Host::DiskMapping& mapping,
                                 const Host::RemovalArguments& arguments) const override {
    return Changed("RemoveDiskMapping" + NamesOf(mapping) + TextOf(arguments));
  }
  Host::Answer ClaimUnmountedDiskgroup() const override { return Changed("ClaimUnmountedDiskgroup"); }

  std::string DescribeHost() const override {
    if (descriptions.empty()) {
      throw Host::HostError("this host is not simulated");
    }
    const std::string now = descriptions.front();
    if (descriptions.size() > 1) {
      descriptions.erase(descriptions.begin());
    }
    return now;
  }
  Host::Answer ChangeHost(const std::string& change) const override {
    return Changed("ChangeHost " + change);
  }

  Host::Answer answer;                            // to every question without one of its own
  mutable std::vector<Host::Answer> groups;       // to GetDiskGroups, one after the other
  Host::Answer changeAnswer;                      // to every change
  mutable std::vector<std::string> descriptions;  // from DescribeHost, one after the other
  mutable std::vector<std::string> asked;         // names of the last query
  mutable std::vector<std::string> changes;       // "RemoveDisk naa.1", in order

 private:
  Host::Answer Changed(const std::string& what) const {
    changes.push_back(what);
    return changeAnswer;
  }
  static std::string NamesOf(const Host::DiskList& disks) {
    std::string text;
    for (const Nox::Host::ScsiDisk* disk : disks) {
      text += " " + disk->GetCanonicalName();
    }
    return text;
  }
  static std::string NamesOf(const Nox::Kova::Host::DiskMapping& mapping) {
    return " [" + mapping.GetSsd()->GetCanonicalName() + ":" + NamesOf(*mapping.GetNonSsd()) + "]";
  }
  static std::string NamesOf(const Host::MappingList& mappings) {
    std::string text;
    for (const Nox::Kova::Host::DiskMapping* mapping : mappings) {
      text += NamesOf(*mapping);
    }
    return text;
  }
  static std::string TextOf(const Host::RemovalArguments& arguments) {
    return " '" + arguments.passThrough + "' '" + arguments.optionText + "' " +
           std::to_string(arguments.optionFirst) + " " + std::to_string(arguments.optionSecond);
  }
};

}  // namespace Kovactl::Testing
