// The agent under load: how many queries of the disks it answers in a second, and how long each takes.
//
// Endpoint: the agent's JSON and SOAP beside a bare server that sends the hook's text, over the same kind of
// socket, with the same clients. Rows are read by report.py.
// Latency: a query of an idle agent, and of one that formats disks at the time.

#include <benchmark/benchmark.h>

#include <algorithm>
#include <chrono>
#include <cstdlib>
#include <filesystem>
#include <future>
#include <stdexcept>
#include <string>
#include <vector>

#include "bench/EndpointClient.h"
#include "bench/EndpointServers.h"
#include "bench/Hosts.h"
#include "host/HostRuntime.h"
#include "host/LogSink.h"
#include "machines/SimulatedMachine.h"
#include "otxctl/fault/CallRecorder.h"

namespace {

using Clock = std::chrono::steady_clock;

// A folder for sockets that is gone with the program.
class SocketFolder {
 public:
  SocketFolder() {
    std::string name = (std::filesystem::temp_directory_path() / "kova-bench-XXXXXX").string();
    if (mkdtemp(name.data()) == nullptr) {
      throw std::runtime_error("cannot make a folder for sockets: " + name);
    }
    _path = name;
  }
  ~SocketFolder() {
    std::error_code ignored;
    std::filesystem::remove_all(_path, ignored);
  }
  SocketFolder(const SocketFolder&) = delete;
  SocketFolder& operator=(const SocketFolder&) = delete;

  std::string PathOf(const char* name) const { return (_path / name).string(); }

 private:
  std::filesystem::path _path;
};

Host::HostRuntime& StartRuntime(const std::shared_ptr<OtxCtl::Sim::SimHost>& host,
                                std::shared_ptr<OtxCtl::Fault::CallRecorder> recorder) {
  Tessa::Service::SetDefaultLogger(Host::MakeConsoleLogger(Tessa::Service::LogLevel::Warning));
  Host::RuntimeOptions options;
  options.makeMachine = [host] { return std::make_unique<Machines::SimulatedMachine>(host); };
  options.recorder = std::move(recorder);
  return Host::HostRuntime::Start(options);
}

// One kind of socket, and both servers on it.
struct Listener {
  std::string name;
  Bench::Address agent;
  Bench::Address bare;
};

// Both servers, side by side on one simulated host.
class World {
 public:
  World()
      : _recorder(std::make_shared<OtxCtl::Fault::CallRecorder>()),
        _runtime(StartRuntime(_host, _recorder)),
        _agent({Agentd::UnixAddress(_folder.PathOf("agent.sock")), AnyPort()}, _runtime),
        _bareUnix(Bench::ToAddress(Agentd::UnixAddress(_folder.PathOf("bare.sock"))), _runtime.Hooks()),
        _bareTcp(Bench::ToAddress(AnyPort()), _runtime.Hooks()) {}

  // Over which sockets each server answers.
  std::vector<Listener> Listeners() const {
    return {{"unix", _agent.At(0), _bareUnix.At()}, {"tcp", _agent.At(1), _bareTcp.At()}};
  }
  OtxCtl::Fault::CallRecorder& Kernel() { return *_recorder; }

  // Another host, of so many disks, none of them in use.
  void ReplaceHost(int disks) {
    _host->Change([disks](OtxCtl::Sim::HostDescription& host) { host = Bench::HostWithDisks(disks); });
    std::string dropped;
    _runtime.Hooks().getStorageInfo(dropped);  // the plug-in's cache of the disks is older than the host
    _recorder->TakeEnded();
  }

 private:
  static Agentd::HttpAddress AnyPort() { return Agentd::ParseAddress("tcp:127.0.0.1:0"); }

  SocketFolder _folder;
  const std::shared_ptr<OtxCtl::Sim::SimHost> _host =
      std::make_shared<OtxCtl::Sim::SimHost>(Bench::HostWithDisks(1));
  std::shared_ptr<OtxCtl::Fault::CallRecorder> _recorder;
  Host::HostRuntime& _runtime;
  Bench::AgentServer _agent;
  Bench::BareServer _bareUnix;
  Bench::BareServer _bareTcp;
};

// One kind of query: whom it goes to, and how the answer names each disk.
struct Query {
  std::string name;
  Bench::Address server;
  std::string request;
  std::string eachDisk;
};

std::string SoapQuery() {
  return Bench::PostRequest("/soap", "text/xml; charset=utf-8",
                            "<e:Envelope xmlns:e=\"http://schemas.xmlsoap.org/soap/envelope/\"><e:Body>"
                            "<QueryDisksForKova xmlns=\"urn:nox\"/></e:Body></e:Envelope>");
}

Query JsonQuery(const Listener& listener) {
  return {listener.name + "/json", listener.agent, Bench::GetRequest("/api/v1/disks"), "\"disk\":"};
}

std::vector<Query> Queries(const Listener& listener) {
  return {{listener.name + "/bare", listener.bare, Bench::GetRequest("/"), "<item>"},
          JsonQuery(listener),
          {listener.name + "/soap", listener.agent, SoapQuery(), "<result>"}};
}

std::size_t CountOf(const std::string& text, const std::string& part) {
  std::size_t count = 0;
  for (std::size_t at = text.find(part); at != std::string::npos; at = text.find(part, at + part.size())) {
    ++count;
  }
  return count;
}

// The time below which that part of the requests was answered, in seconds.
double Quantile(std::vector<double>& seconds, double part) {
  const auto at = static_cast<std::ptrdiff_t>(part * static_cast<double>(seconds.size() - 1));
  std::nth_element(seconds.begin(), seconds.begin() + at, seconds.end());
  return seconds[static_cast<std::size_t>(at)];
}

// Asks as long as the benchmark runs. What each client sees is averaged over the clients.
void Load(benchmark::State& state, const Query& query) {
  Bench::EndpointClient client(query.server);
  std::vector<double> seconds;
  for (auto _ : state) {
    const Clock::time_point asked = Clock::now();
    benchmark::DoNotOptimize(client.Ask(query.request));
    seconds.push_back(std::chrono::duration<double>(Clock::now() - asked).count());
  }
  state.SetItemsProcessed(state.iterations());
  state.counters["p50"] = benchmark::Counter(Quantile(seconds, 0.50), benchmark::Counter::kAvgThreads);
  state.counters["p99"] = benchmark::Counter(Quantile(seconds, 0.99), benchmark::Counter::kAvgThreads);
}

// A host of that size, and a server that answers with all of it.
void Prepare(benchmark::State& state, World& world, const Query& query) {
  world.ReplaceHost(static_cast<int>(state.range(0)));
  Bench::EndpointClient client(query.server);
  const std::string& answer = client.Ask(query.request);
  if (CountOf(answer, query.eachDisk) != static_cast<std::size_t>(state.range(0))) {
    throw std::runtime_error(query.name + " does not answer with every disk");
  }
}

void Endpoint(benchmark::State& state, World& world, const Query& query) {
  if (state.thread_index() == 0) {
    Prepare(state, world, query);  // the other clients wait for this one
  }
  Load(state, query);
}

// A change that is in the middle of formatting two disks for as long as this lives.
class SlowFormat {
 public:
  explicit SlowFormat(World& world) : _kernel(world.Kernel()) {
    std::promise<void> begun;
    _kernel.SetStartObserver([&begun](const OtxCtl::Fault::RecordedCall& call) {
      if (call.operation == "FormatDiskMapping") {
        begun.set_value();
      }
    });
    OtxCtl::Fault::FaultRule slow;
    slow.operation = "FormatDiskMapping";
    slow.delayMs = formatMs;
    _kernel.Inject(slow);
    _change = std::async(std::launch::async, [address = world.Listeners().front().agent] {
      Bench::EndpointClient(address).Ask(Bench::PostRequest("/api/v1/InitializeDisks", "application/json",
                                                            "{\"mappings\":[{\"ssd\":\"" +
                                                                Bench::DiskName(0) + "\",\"nonSsd\":[\"" +
                                                                Bench::DiskName(2) + "\"]}]}"));
    });
    begun.get_future().wait();
    _kernel.SetStartObserver({});
  }
  ~SlowFormat() {
    if (_change.valid()) {
      _change.wait();
    }
    _kernel.ClearFaults();
  }
  SlowFormat(const SlowFormat&) = delete;
  SlowFormat& operator=(const SlowFormat&) = delete;

  bool IsOver() const { return _change.wait_for(std::chrono::seconds(0)) == std::future_status::ready; }

 private:
  static constexpr int formatMs = 3000;

  OtxCtl::Fault::CallRecorder& _kernel;
  std::future<void> _change;
};

void LatencyIdle(benchmark::State& state, World& world, const Query& query) {
  Prepare(state, world, query);
  Load(state, query);
}

void LatencyWhileFormatting(benchmark::State& state, World& world, const Query& query) {
  Prepare(state, world, query);
  const SlowFormat format(world);
  Load(state, query);
  if (format.IsOver()) {
    throw std::runtime_error("the format was over before the last query");
  }
}

void RegisterEndpoint(World& world, const Query& query) {
  const auto run = [&world, query](benchmark::State& state) { Endpoint(state, world, query); };
  benchmark::RegisterBenchmark(("Endpoint/" + query.name).c_str(), run)
      ->ArgName("disks")
      ->Arg(12)
      ->Arg(512)
      ->Threads(1)
      ->Threads(8)
      ->MeasureProcessCPUTime()  // of server and client: what a busy machine leaves as it is
      ->UseRealTime();
}

using Latency = void (*)(benchmark::State&, World&, const Query&);

void RegisterLatency(World& world, const char* name, Latency latency) {
  constexpr int samples = 4000;  // well inside the time of a slow format
  const auto run = [&world, latency, query = JsonQuery(world.Listeners().front())](benchmark::State& state) {
    latency(state, world, query);
  };
  benchmark::RegisterBenchmark(name, run)->ArgName("disks")->Arg(12)->Iterations(samples)->UseRealTime();
}

void RegisterAll(World& world) {
  for (const Listener& listener : world.Listeners()) {
    for (const Query& query : Queries(listener)) {
      RegisterEndpoint(world, query);
    }
  }
  RegisterLatency(world, "LatencyIdle", &LatencyIdle);
  RegisterLatency(world, "LatencyWhileFormatting", &LatencyWhileFormatting);
}

}  // namespace

int main(int argc, char** argv) {
  benchmark::Initialize(&argc, argv);
  if (benchmark::ReportUnrecognizedArguments(argc, argv)) {
    return 2;
  }
  World world;
  RegisterAll(world);
  benchmark::RunSpecifiedBenchmarks();
  benchmark::Shutdown();
  return 0;
}
