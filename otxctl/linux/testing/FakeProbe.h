// A probe that finds what a test says: by default nothing, on a disk that nobody uses.
#pragma once

#include <functional>
#include <string>
#include <unordered_map>
#include <vector>

#include "otxctl/linux/DiskProbe.h"

namespace OtxCtl::Linux {

inline ProbeResult EmptyDisk() {
  ProbeResult result;
  result.signatures = std::vector<std::string>();
  result.partitionTable = std::string();
  result.isBusy = false;
  return result;
}

class FakeProbe : public DiskProbe {
 public:
  ProbeResult Probe(const std::string& node, const std::string& number) override {
    const std::string name = node.substr(node.rfind("/dev/") + 5);
    probed.push_back(name + " " + number);
    if (whileProbing) {
      whileProbing(name);
    }
    const auto found = results.find(name);
    return found == results.end() ? EmptyDisk() : found->second;
  }

  std::unordered_map<std::string, ProbeResult> results;  // by the name below /dev
  std::vector<std::string> probed;
  std::function<void(const std::string&)> whileProbing;
};

}  // namespace OtxCtl::Linux
