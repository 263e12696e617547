// The contract, kept by the simulated host: bare, saved after each change, behind a recorder, and held to
// what providers may throw.
#include "otxctl/contract/ProviderContract.h"
#include "otxctl/fault/RecordingProvider.h"
#include "otxctl/provider/StrictProvider.h"
#include "otxctl/sim/SimProvider.h"

namespace OtxCtl::Contract {
namespace {

class SimulatedHost : public ContractHost {
 public:
  explicit SimulatedHost(const Sim::HostDescription& host) : _host(std::make_shared<Sim::SimHost>(host)) {}

  std::unique_ptr<HostCtl::Kova::KovaInfo> NewProvider() override {
    return std::make_unique<Sim::SimProvider>(_host);
  }

  Sim::SimHost& Host() { return *_host; }

 private:
  std::shared_ptr<Sim::SimHost> _host;
};

class RecordedHost : public ContractHost {
 public:
  explicit RecordedHost(const Sim::HostDescription& host) : _host(host) {}

  std::unique_ptr<HostCtl::Kova::KovaInfo> NewProvider() override {
    return std::make_unique<Fault::RecordingProvider>(_host.NewProvider(), _recorder);
  }

 private:
  SimulatedHost _host;
  std::shared_ptr<Fault::CallRecorder> _recorder = std::make_shared<Fault::CallRecorder>();
};

class StrictHost : public ContractHost {
 public:
  explicit StrictHost(const Sim::HostDescription& host) : _host(host) {}

  std::unique_ptr<HostCtl::Kova::KovaInfo> NewProvider() override {
    return std::make_unique<Provider::StrictProvider>(_host.NewProvider());
  }

 private:
  SimulatedHost _host;
};

ContractSubject Bare() {
  return {"Bare", [](const Sim::HostDescription& host) { return std::make_unique<SimulatedHost>(host); }, {}};
}

// With a saver the host takes another road through a change: on a copy.
ContractSubject Saved() {
  return {"Saved",
          [](const Sim::HostDescription& description) {
            auto host = std::make_unique<SimulatedHost>(description);
            host->Host().SetSaver(
                [](const Sim::HostDescription& changed) { Sim::CheckHostDescription(changed); });
            return host;
          },
          {}};
}

ContractSubject Recorded() {
  return {
      "Recorded", [](const Sim::HostDescription& host) { return std::make_unique<RecordedHost>(host); }, {}};
}

ContractSubject Strict() {
  return {"Strict", [](const Sim::HostDescription& host) { return std::make_unique<StrictHost>(host); }, {}};
}

INSTANTIATE_TEST_SUITE_P(Simulated, ProviderContract, testing::Values(Bare(), Saved(), Recorded(), Strict()),
                         SubjectName);

}  // namespace
}  // namespace OtxCtl::Contract
