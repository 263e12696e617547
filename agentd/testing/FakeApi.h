// A management API for tests of what stands before it: it notes what it is asked and answers what the test
// says.
#pragma once

#include <functional>
#include <mutex>
#include <string>
#include <vector>

#include "host/HostError.h"
#include "host/ManagementApi.h"
#include "host/testing/RequestInALine.h"

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
  std::function<void(std::string_view change)>
      checkChange;  // throws for a text that is no change of the host

  // The operations so far: "RemoveDisk naa.1 p o 1 2".
  std::vector<std::string> Asked() const {
    const std::lock_guard guard(_mutex);
    return _asked;
  }

  Host::Answer Query(const Nox::Operation::Query& request) const override {
    if (onQuery) {
      onQuery();
    }
    return Note(Host::Testing::InALine(request));
  }
  Host::Answer Change(Nox::Operation::Change&& request) const override {
    return Changed(Host::Testing::InALine(request));
  }
  std::string DescribeHost() const override {
    if (description.empty()) {
      throw Host::HostError("this is no simulated host");
    }
    return description;
  }
  void CheckHostChange(std::string_view change) const override {
    if (checkChange) {
      checkChange(change);
    }
  }
  Host::Answer ChangeHost(const std::string& change) const override {
    return Changed("ChangeHost " + change);
  }

 private:
  Host::Answer Note(const std::string& asked) const {
    const std::lock_guard guard(_mutex);
    _asked.push_back(asked);
    return answerTo ? answerTo(asked) : answer;
  }
  Host::Answer Changed(const std::string& asked) const {
    if (onChange) {
      onChange();
    }
    return Note(asked);
  }

  mutable std::mutex _mutex;
  mutable std::vector<std::string> _asked;
};

}  // namespace Agentd::Testing
