// Planning and checking of disk groups, by the number of disks of the request.
//
// The cost per disk should stay flat: nothing here may look at every disk for each disk.
// Floors: every disk's name and flag read once, or the kernel's groups listed, which no planner can do
// without.

#include <benchmark/benchmark.h>

#include <algorithm>
#include <random>
#include <stdexcept>
#include <string>
#include <vector>

#include "bench/ManagerFixture.h"
#include "nox/Kova.h"

namespace {

using Bench::CountDisks;
using Nox::Host::ScsiDisk;
using Nox::Kova::Host::DiskMapping;
using Orbis::DataArray;
using OtxCtl::Sim::HostDescription;
using Tessa::MakeRef;
using Tessa::Ref;

constexpr int disksPerGroup = 8;

// Every second flash disk is tagged for capacity.
HostDescription EmptyHost(int disks) {
  HostDescription host = Bench::HostWithDisks(disks);
  for (std::size_t i = disksPerGroup; i < host.disks.size(); i += 2 * disksPerGroup) {
    host.disks[i].capacityFlash = true;
  }
  return host;
}

// Disks in groups of eight from the first on, so many groups at most; the first disk of each is flash.
HostDescription HostWithGroups(int disks, std::size_t mostGroups, bool mounted) {
  HostDescription host = Bench::HostWithDisks(disks);
  for (std::size_t i = 0; i + disksPerGroup <= host.disks.size() && host.groups.size() < mostGroups;
       i += disksPerGroup) {
    OtxCtl::Sim::HostGroup& group = host.groups.emplace_back();
    group.ssd = host.disks[i].name;
    group.mounted = mounted;
    for (std::size_t j = i + 1; j + 1 < i + disksPerGroup; ++j) {
      group.capacity.push_back(host.disks[j].name);
    }
  }
  return host;
}

class Fixture : public Bench::ManagerFixture {
 public:
  explicit Fixture(const HostDescription& host) : ManagerFixture(host), _disks(Bench::DisksOf(host)) {
    Manager().RefreshKovaDiskCache();
  }

  DataArray<ScsiDisk>* Disks() const { return _disks.Get(); }

  Ref<DataArray<ScsiDisk>> HardDisks() const {
    const auto disks = MakeRef<DataArray<ScsiDisk>>();
    for (ScsiDisk* disk : *_disks) {
      if (!disk->GetSsd()) {
        disks->Append(disk);
      }
    }
    return disks;
  }

  // The disks as groups of a request, in the host's order or in none.
  Ref<DataArray<DiskMapping>> Groups(bool shuffled) const {
    std::vector<Ref<ScsiDisk>> disks;
    for (ScsiDisk* disk : *_disks) {
      disks.emplace_back(disk);
    }
    if (shuffled) {
      std::shuffle(disks.begin(), disks.end(), std::mt19937(1));
    }
    const auto groups = MakeRef<DataArray<DiskMapping>>();
    Ref<DataArray<ScsiDisk>> capacity;
    for (std::size_t i = 0; i < disks.size(); ++i) {
      if (i % disksPerGroup == 0) {
        const auto mapping = MakeRef<DiskMapping>();
        capacity = MakeRef<DataArray<ScsiDisk>>();
        mapping->SetSsd(disks[i]);
        mapping->SetNonSsd(capacity);
        groups->Append(mapping);
      } else {
        capacity->Append(disks[i]);
      }
    }
    return groups;
  }

 private:
  Ref<DataArray<ScsiDisk>> _disks;
};

// A benchmark that does nothing would be fast.
void Expect(bool done) {
  if (!done) {
    throw std::logic_error("nothing was planned");
  }
}

void ReadDisks(benchmark::State& state) {
  const Fixture fixture(EmptyHost(static_cast<int>(state.range(0))));
  for (auto _ : state) {
    std::size_t sum = 0;
    for (const ScsiDisk* disk : *fixture.Disks()) {
      sum += disk->GetCanonicalName().size() + (disk->GetSsd() ? 1 : 0);
    }
    benchmark::DoNotOptimize(sum);
  }
  CountDisks(state);
}

void PlanHybrid(benchmark::State& state) {
  Fixture fixture(EmptyHost(static_cast<int>(state.range(0))));
  Ref<DataArray<DiskMapping>> mappings;
  bool limitReached = false;
  for (auto _ : state) {
    fixture.Manager().ComputeDiskMappings(fixture.Disks(), false, mappings, limitReached);
  }
  Expect(!mappings->IsEmpty());
  CountDisks(state);
}

// Five groups have room for one disk each.
void ExtendGroups(benchmark::State& state) {
  Fixture fixture(HostWithGroups(static_cast<int>(state.range(0)), 5, true));
  const Ref<DataArray<ScsiDisk>> disks = fixture.HardDisks();
  Ref<DataArray<DiskMapping>> mappings;
  bool limitReached = false;
  for (auto _ : state) {
    fixture.Manager().ComputeDiskMappings(disks.Get(), false, mappings, limitReached);
  }
  Expect(!mappings->IsEmpty());
  CountDisks(state);
}

void SplitAllFlash(benchmark::State& state) {
  Fixture fixture(EmptyHost(static_cast<int>(state.range(0))));
  Ref<DataArray<DiskMapping>> mappings;
  Ref<DataArray<ScsiDisk>> remaining;
  bool limitReached = false;
  for (auto _ : state) {
    fixture.Manager().AllFlashDiskMappingSwitch(fixture.Disks(), mappings, remaining, limitReached);
  }
  Expect(mappings && !mappings->IsEmpty());
  CountDisks(state);
}

void FindUnmounted(benchmark::State& state) {
  const int disks = static_cast<int>(state.range(0));
  Fixture fixture(HostWithGroups(disks, static_cast<std::size_t>(disks), false));
  std::size_t found = 0;
  for (auto _ : state) {
    auto mappings = MakeRef<DataArray<DiskMapping>>();
    fixture.Manager().ComputeNotMountedDiskMappings(fixture.Disks(), mappings);
    found = mappings->Size();
  }
  Expect(found == static_cast<std::size_t>(disks / disksPerGroup));
  CountDisks(state);
}

// The request as a whole.
void CheckGroups(benchmark::State& state, bool shuffled) {
  Fixture fixture(EmptyHost(static_cast<int>(state.range(0))));
  const Ref<DataArray<DiskMapping>> groups = fixture.Groups(shuffled);
  for (auto _ : state) {
    fixture.Manager().ValidateDiskMappings(groups.Get());
  }
  CountDisks(state);
}
void CheckRequest(benchmark::State& state) {
  CheckGroups(state, false);
}
void CheckShuffled(benchmark::State& state) {
  CheckGroups(state, true);
}

BENCHMARK(PlanHybrid)->ArgName("disks")->Arg(32)->Arg(512)->Arg(4096)->Arg(32768);
BENCHMARK(ExtendGroups)->ArgName("disks")->Arg(32)->Arg(512)->Arg(4096)->Arg(32768);
BENCHMARK(SplitAllFlash)->ArgName("disks")->Arg(32)->Arg(512)->Arg(4096)->Arg(32768);
BENCHMARK(FindUnmounted)->ArgName("disks")->Arg(32)->Arg(512)->Arg(4096)->Arg(32768);
BENCHMARK(CheckRequest)->ArgName("disks")->Arg(32)->Arg(512)->Arg(4096)->Arg(32768);
BENCHMARK(CheckShuffled)->ArgName("disks")->Arg(32)->Arg(512)->Arg(4096)->Arg(32768);

void PlanHybridFloor(benchmark::State& state) {
  ReadDisks(state);
}
void ExtendGroupsFloor(benchmark::State& state) {
  ReadDisks(state);
}
void SplitAllFlashFloor(benchmark::State& state) {
  ReadDisks(state);
}
// The kernel's own list of so many groups is the larger part of finding them.
void FindUnmountedFloor(benchmark::State& state) {
  const int disks = static_cast<int>(state.range(0));
  Fixture fixture(HostWithGroups(disks, static_cast<std::size_t>(disks), false));
  for (auto _ : state) {
    std::vector<HostCtl::Kova::DiskMapping> groups;
    fixture.Kernel().GetDiskMappings(groups, true);
    benchmark::DoNotOptimize(groups);
  }
  CountDisks(state);
}
void CheckRequestFloor(benchmark::State& state) {
  ReadDisks(state);
}

BENCHMARK(PlanHybridFloor)->ArgName("disks")->Arg(32)->Arg(512)->Arg(4096)->Arg(32768);
BENCHMARK(ExtendGroupsFloor)->ArgName("disks")->Arg(32)->Arg(512)->Arg(4096)->Arg(32768);
BENCHMARK(SplitAllFlashFloor)->ArgName("disks")->Arg(32)->Arg(512)->Arg(4096)->Arg(32768);
BENCHMARK(FindUnmountedFloor)->ArgName("disks")->Arg(32)->Arg(512)->Arg(4096)->Arg(32768);
void CheckShuffledFloor(benchmark::State& state) {
  ReadDisks(state);
}
BENCHMARK(CheckShuffledFloor)->ArgName("disks")->Arg(32)->Arg(512)->Arg(4096)->Arg(32768);
BENCHMARK(CheckRequestFloor)->ArgName("disks")->Arg(32)->Arg(512)->Arg(4096)->Arg(32768);

}  // namespace
