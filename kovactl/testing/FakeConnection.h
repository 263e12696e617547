// A host for tests of commands: it answers with what the test says.
#pragma once

#include <string>
#include <vector>

#include "kovactl/Connection.h"

namespace Kovactl::Testing {

class FakeConnection final : public Connection {
 public:
  Host::Answer QueryDisksForKova(const std::vector<std::string>& names) const override {
    asked = names;
    return answer;
  }
  Host::Answer GetStorageInfo() const override { return answer; }
  Host::Answer GetConfigInfo() const override { return answer; }

  Host::Answer answer;
  mutable std::vector<std::string> asked;  // names of the last query
};

}  // namespace Kovactl::Testing
