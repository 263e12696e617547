// An eligibility query, from the hook to the text: every disk, and a list of names.
//
// Floor: the answer's text written from the finished objects, which no query can do without.

#include <benchmark/benchmark.h>

#include <memory>

#include "bench/Hosts.h"
#include "host/AgentApp.h"
#include "host/Inventory.h"
#include "host/LogSink.h"
#include "kova/agentd/KovaLibManager.h"
#include "kova/agentd/KovaManagerImpl.h"
#include "nox/Host.h"
#include "nox/Kova.h"
#include "orbis/Soap.h"
#include "otxctl/ProviderFactory.h"
#include "otxctl/sim/SimProvider.h"
#include "tessa/App.h"

namespace {

// A manager over a host of so many disks.
class Fixture {
 public:
  explicit Fixture(int disks) {
    const OtxCtl::Sim::HostDescription description = Bench::HostWithDisks(disks);
    const auto host = std::make_shared<OtxCtl::Sim::SimHost>(description);
    const auto inventory = Tessa::MakeRef<Host::Inventory>();
    inventory->Replace(Host::DescribeInventory(description));
    _app.SetObject("storageSystem", inventory);
    Tessa::Service::SetApp(&_app);
    OtxCtl::Kova::SetProviderFactory([host] { return std::make_unique<OtxCtl::Sim::SimProvider>(host); });
    auto logger = Host::MakeConsoleLogger(Tessa::Service::LogLevel::Warning);
    _manager = Tessa::MakeRef<Kovasvc::KovaManagerImpl>(logger);
  }
  ~Fixture() {
    _manager.Reset();
    OtxCtl::Kova::SetProviderFactory({});
    Tessa::Service::SetApp(nullptr);
  }
  Fixture(const Fixture&) = delete;
  Fixture& operator=(const Fixture&) = delete;

  // The cache is invalidated first, as it is after every change of the host.
  std::string Query(std::vector<std::string>& names) {
    std::string fault;
    std::string result;
    _manager->InvalidateKovaDiskCache();
    _manager->QueryDisksForKova(names, fault, result);
    return result;
  }

 private:
  Host::AgentApp _app;
  Tessa::Ref<Kovasvc::KovaManagerImpl> _manager;
};

void CountDisks(benchmark::State& state) {
  state.counters["per disk"] =
      benchmark::Counter(static_cast<double>(state.range(0)) * static_cast<double>(state.iterations()),
                         benchmark::Counter::kIsRate | benchmark::Counter::kInvert);
}

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
