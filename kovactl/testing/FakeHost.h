// A host for tests of commands: it answers with what the test says, and keeps what it was asked for.
#pragma once

#include <string>
#include <vector>

#include "host/HostError.h"
#include "host/ManagementApi.h"
#include "host/testing/RequestInALine.h"
#include "nox/Kova.h"
#include "nox/Operations.h"

namespace Kovactl::Testing {

class FakeHost final : public Host::ManagementApi {
 public:
  Host::Answer Query(const Nox::Operation::Query& request) const override {
    if (const auto* const disks = dynamic_cast<const Nox::Operation::QueryDisksForKova*>(&request)) {
      asked = disks->GetNames() ? disks->GetNames()->Items() : std::vector<std::string>();
      return answer;
    }
    if (dynamic_cast<const Nox::Operation::GetTwin*>(&request) != nullptr) {
      return NextTwin();
    }
    const bool isGroups = dynamic_cast<const Nox::Operation::GetDiskGroups*>(&request) != nullptr;
    return isGroups ? NextGroups() : answer;
  }
  Host::Answer Change(Nox::Operation::Change&& request) const override {
    return Changed(Host::Testing::InALine(request));
  }

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
  mutable std::vector<std::string> descriptions;  // from DescribeHost or GetTwin, one after the other
  mutable std::vector<std::string> asked;         // names of the last query
  mutable std::vector<std::string> changes;       // "RemoveDisk naa.1", in order

 private:
  Host::Answer Changed(const std::string& what) const {
    changes.push_back(what);
    return changeAnswer;
  }
  Host::Answer NextTwin() const {
    if (descriptions.empty()) {
      return Host::FailedWith("this host cannot be looked at");
    }
    const auto twin = Tessa::MakeRef<Nox::Kova::Host::Twin>();
    twin->SetGeneration("0123456789abcdef");
    twin->SetDescription(DescribeHost());
    return {.result = twin, .fault = nullptr};
  }
  // The last of the prepared states stays; the others are given once.
  Host::Answer NextGroups() const {
    if (groups.empty()) {
      return answer;
    }
    const Host::Answer now = groups.front();
    if (groups.size() > 1) {
      groups.erase(groups.begin());
    }
    return now;
  }
};

}  // namespace Kovactl::Testing
