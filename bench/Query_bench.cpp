// An eligibility query, from the hook to the text: every disk, and a list of names.
//
// Floor: the answer's text written from the finished objects, which no query can do without.

#include <benchmark/benchmark.h>

#include <string>
#include <vector>

#include "bench/ManagerFixture.h"
#include "nox/Kova.h"
#include "orbis/Soap.h"

namespace {

using Bench::CountDisks;

// A manager over a host of so many disks.
class Fixture : public Bench::ManagerFixture {
 public:
  explicit Fixture(int disks) : ManagerFixture(Bench::HostWithDisks(disks)) {}

  // The cache is invalidated first, as it is after every change of the host.
  std::string Query(std::vector<std::string>& names) {
    std::string fault;
    std::string result;
    Manager().InvalidateKovaDiskCache();
    Manager().QueryDisksForKova(names, fault, result);
    return result;
  }
};

void QueryAll(benchmark::State& state) {
  Fixture fixture(static_cast<int>(state.range(0)));
  std::vector<std::string> names;
  for (auto _ : state) {
    benchmark::DoNotOptimize(fixture.Query(names));
  }
  CountDisks(state);
}

void QueryByName(benchmark::State& state) {
  Fixture fixture(static_cast<int>(state.range(0)));
  std::vector<std::string> names;
  names.reserve(static_cast<std::size_t>(state.range(0)));
  for (int i = 0; i < state.range(0); ++i) {
    names.push_back(Bench::DiskName(i));
  }
  for (auto _ : state) {
    benchmark::DoNotOptimize(fixture.Query(names));
  }
  CountDisks(state);
}

void WriteAnswer(benchmark::State& state) {
  Fixture fixture(static_cast<int>(state.range(0)));
  std::vector<std::string> names;
  Orbis::Ref<Orbis::Any> answer;
  Orbis::DeserializeSoapToObject(fixture.Query(names), answer);
  for (auto _ : state) {
    std::string text;
    Orbis::SerializeObjectToSoap(*answer, nullptr, text);
    benchmark::DoNotOptimize(text);
  }
  CountDisks(state);
}

void QueryAllFloor(benchmark::State& state) {
  WriteAnswer(state);
}
void QueryByNameFloor(benchmark::State& state) {
  WriteAnswer(state);
}

BENCHMARK(QueryAll)->ArgName("disks")->Arg(32)->Arg(512)->Arg(4096);
BENCHMARK(QueryAllFloor)->ArgName("disks")->Arg(32)->Arg(512)->Arg(4096);
BENCHMARK(QueryByName)->ArgName("disks")->Arg(32)->Arg(512)->Arg(4096);
BENCHMARK(QueryByNameFloor)->ArgName("disks")->Arg(32)->Arg(512)->Arg(4096);

}  // namespace
