// What becomes of the disks of a made-up machine: scanned, and judged.
#pragma once

#include <map>
#include <string>
#include <vector>

#include "otxctl/disks/DiskJudge.h"
#include "otxctl/linux/DiskScan.h"

namespace OtxCtl::Linux {

// "free", or what speaks against it, by kernel name.
inline std::map<std::string, std::string> Judged(const DiskScan& scan) {
  std::vector<Disks::DiskFacts> facts;
  for (const ScannedDisk& disk : scan.disks) {
    facts.push_back(disk.facts);
  }
  const std::vector<Disks::DiskVerdict> verdicts = Disks::JudgeDisks(facts, {});
  std::map<std::string, std::string> judged;
  for (std::size_t i = 0; i < facts.size(); ++i) {
    const bool isFree = verdicts[i].state == HostCtl::Kova::DiskState::Eligible;
    judged[facts[i].kernelName] = isFree ? "free" : verdicts[i].detail;
  }
  return judged;
}

// By kernel name.
inline std::map<std::string, std::string> WhyLeftOut(const DiskScan& scan) {
  std::map<std::string, std::string> whys;
  for (const LeftOut& leftOut : scan.leftOut) {
    whys[leftOut.kernelName] = leftOut.why;
  }
  return whys;
}

}  // namespace OtxCtl::Linux
