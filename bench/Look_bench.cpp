// A look at a machine's disks: everything about each read from the kernel's tree, and judged.
//
// Floor: the attribute files of the same disks read once each, which no look can do without. The tree is made
// up, in a temporary folder, and nothing is probed.

#include <benchmark/benchmark.h>
#include <fcntl.h>
#include <unistd.h>

#include <array>
#include <cstddef>
#include <cstdint>
#include <filesystem>
#include <map>
#include <memory>
#include <string>
#include <utility>
#include <vector>

#include "bench/CountDisks.h"
#include "otxctl/linux/LinuxHost.h"
#include "otxctl/linux/testing/FakeCommands.h"
#include "otxctl/linux/testing/FakeProbe.h"
#include "otxctl/linux/testing/SystemTree.h"

namespace {

using Bench::CountDisks;
using OtxCtl::Linux::FakeCommands;
using OtxCtl::Linux::FakeProbe;
using OtxCtl::Linux::LinuxHost;
using OtxCtl::Linux::SystemTree;

// "sda" to "sdz", "sdaa", and on.
std::string KernelName(int index) {
  std::string letters;
  for (int rest = index; rest >= 0; rest = rest / 26 - 1) {
    letters.insert(letters.begin(), static_cast<char>('a' + rest % 26));
  }
  return "sd" + letters;
}

// One disk in eight is flash, one in sixteen has a partition that is mounted.
class Machine {
 public:
  explicit Machine(int disks) {
    _tree.Write("proc/self/mountinfo", "");
    for (int i = 0; i < disks; ++i) {
      const std::string name = KernelName(i);
      const std::string number = std::to_string(i);
      _tree.AddScsiDisk(
          name, {.worldWideName = "naa.5000c500" + number, .serial = "S" + number, .isFlash = i % 8 == 0});
      if (i % 16 == 1) {
        _tree.AddPartition(name, name + "1");
        _tree.Mount(_tree.NumberOf(name + "1"), "/dev/" + name + "1", "/data/" + number);
      }
    }
  }

  const OtxCtl::Linux::SystemPaths& Paths() const { return _tree.Paths(); }

  std::vector<std::string> Attributes() const {
    std::vector<std::string> files;
    for (const auto& entry : std::filesystem::recursive_directory_iterator(_tree.Full("sys/devices"))) {
      if (entry.is_regular_file()) {
        files.push_back(entry.path().string());
      }
    }
    return files;
  }

 private:
  SystemTree _tree;
};

// To make one takes far longer than to look at it, and the framework calls a benchmark several times.
const Machine& MachineWith(std::int64_t disks) {
  static std::map<std::int64_t, Machine> machines;
  return machines.try_emplace(disks, static_cast<int>(disks)).first->second;
}

void Look(benchmark::State& state) {
  const Machine& machine = MachineWith(state.range(0));
  auto owned = std::make_unique<FakeProbe>();
  FakeProbe& probe = *owned;
  FakeCommands::Results results;
  OtxCtl::Linux::LinuxHostOptions options;
  options.paths = machine.Paths();
  LinuxHost host(std::move(options), std::move(owned), std::make_unique<FakeCommands>(results));
  for (auto _ : state) {
    probe.probed.clear();  // its notes are no part of a look
    const auto seen = host.Look();
    if (seen->disks.size() != static_cast<std::size_t>(state.range(0))) {
      state.SkipWithError("not all disks were seen");
      break;
    }
  }
  CountDisks(state);
}

void LookFloor(benchmark::State& state) {
  const Machine& machine = MachineWith(state.range(0));
  const std::vector<std::string> files = machine.Attributes();
  std::array<char, 4096> content{};
  for (auto _ : state) {
    for (const std::string& name : files) {
      const int file = open(name.c_str(), O_RDONLY | O_CLOEXEC);
      benchmark::DoNotOptimize(read(file, content.data(), content.size()));
      close(file);
    }
  }
  CountDisks(state);
}

BENCHMARK(Look)->ArgName("disks")->Arg(32)->Arg(512)->Arg(4096);
BENCHMARK(LookFloor)->ArgName("disks")->Arg(32)->Arg(512)->Arg(4096);

}  // namespace
