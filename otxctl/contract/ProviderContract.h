// One behaviour suite for every kernel provider: what the plug-in relies on, whoever carries it out.
//
// A test executable links the suite and instantiates it for its provider:
//
//   INSTANTIATE_TEST_SUITE_P(Simulated, ProviderContract, testing::Values(MySubject()), SubjectName);
//
// A subject makes hosts from descriptions. A provider that cannot bring about a part of a description says so
// in its capabilities; the tests that need that part are then shown as skipped.
#pragma once

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <functional>
#include <memory>
#include <ostream>
#include <string>
#include <vector>

#include "kova/agentd/include/HostCtlException.h"
#include "kova/agentd/include/KovaInfo.h"
#include "otxctl/sim/HostBuilder.h"
#include "otxctl/sim/HostDescription.h"

namespace OtxCtl::Contract {

// A host under test. Deleted after its providers.
class ContractHost {
 public:
  virtual ~ContractHost() = default;
  virtual std::unique_ptr<HostCtl::Kova::KovaInfo> NewProvider() = 0;
};

struct Capabilities {
  bool absentDisks = true;      // disks can leave the host
  bool automaticMode = true;    // claiming disks automatically can be switched on
  bool configuration = true;    // cluster, networks and fault domain can be given
  bool groupsFromStart = true;  // a host can be made that has groups already
};

struct ContractSubject {
  std::string name;
  std::function<std::unique_ptr<ContractHost>(const Sim::HostDescription&)> makeHost;
  Capabilities capabilities;
};

std::string SubjectName(const testing::TestParamInfo<ContractSubject>& info);
void PrintTo(const ContractSubject& subject, std::ostream* out);

// Everything that can be seen of a host's disks.
struct HostState {
  std::vector<HostCtl::Kova::DiskResult> disks;
  std::vector<HostCtl::Kova::DiskMapping> groups;  // those that are not mounted as well

  friend bool operator==(const HostState&, const HostState&) = default;
};

class ProviderContract : public testing::TestWithParam<ContractSubject> {
 protected:
  using Names = std::vector<std::string>;

  // Makes the host and the provider that the test talks to.
  void Start(const Sim::HostBuilder& host);
  HostCtl::Kova::KovaInfo& Provider() { return *_provider; }
  std::unique_ptr<HostCtl::Kova::KovaInfo> AnotherProvider() { return _host->NewProvider(); }
  const Capabilities& Can() const { return GetParam().capabilities; }

  HostState State();
  std::vector<HostCtl::Kova::DiskResult> Query(const Names& names = {});
  // The record of one disk; fails the test unless there is exactly one.
  HostCtl::Kova::DiskResult RecordOf(const std::string& disk);
  std::vector<HostCtl::Kova::DiskMapping> Groups(bool withUnmounted = true);
  void Format(const std::string& ssd, const Names& capacity);

  // The operation throws an exception of exactly that class, and nothing on the host is different.
  template <typename Exception>
  Exception Refused(const std::function<void()>& operation);

 private:
  std::unique_ptr<ContractHost> _host;
  std::unique_ptr<HostCtl::Kova::KovaInfo> _provider;
};

// The names of a group's disks, the cache disk first.
std::vector<std::string> NamesOf(const HostCtl::Kova::DiskMapping& group);

template <typename Exception>
Exception ProviderContract::Refused(const std::function<void()>& operation) {
  const HostState before = State();
  std::unique_ptr<Exception> caught;
  try {
    operation();
    ADD_FAILURE() << "the operation was carried out";
  } catch (const Exception& exception) {
    EXPECT_EQ(typeid(exception), typeid(Exception)) << exception.what();
    caught = std::make_unique<Exception>(exception);
  }
  EXPECT_TRUE(State() == before) << "the refused operation left something behind";
  return caught ? *caught : Exception("", "");
}

}  // namespace OtxCtl::Contract
