#include "otxctl/provider/ForwardingProvider.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <stdexcept>

#include "otxctl/provider/OperationNames.h"
#include "otxctl/provider/testing/Operations.h"

namespace OtxCtl::Provider {
namespace {

using HostCtl::Kova::DiskMapping;
using HostCtl::Kova::DiskResult;
using HostCtl::Kova::FormatContext;
using HostCtl::Kova::KovaClusterInfoDetailed;
using HostCtl::Kova::KovaOtxNicConfig;
using HostCtl::Kova::RemovalOptions;
using testing::ElementsAre;

std::string Text(bool flag) {
  return flag ? "true" : "false";
}
std::string Text(const std::string& text) {
  return text;
}
std::string Text(const std::vector<std::string>& names) {
  std::string text;
  for (const std::string& name : names) {
    text += (text.empty() ? "" : "+") + name;
  }
  return text;
}
std::string Text(const FormatContext& context) {
  return context.requestTag + "/" + std::to_string(context.mappingCount) + "/" +
         std::to_string(context.mappingIndex);
}
std::string Text(const RemovalOptions& options) {
  return options.text + "/" + std::to_string(options.first) + "/" + std::to_string(options.second);
}

std::string Text(const ProviderCall& call) {
  std::string text(call.operation);
  for (const Input& input : call.inputs) {
    text += " " + std::visit([](const auto& given) { return Text(given); }, input);
  }
  return text;
}

using Calls = std::vector<std::string>;

// Notes what passes, and forwards it.
class NotingProvider : public ForwardingProvider {
 public:
  explicit NotingProvider(Calls& calls, std::shared_ptr<KovaInfo> target = nullptr)
      : ForwardingProvider(std::move(target)), _calls(calls) {}

 protected:
  void AroundCall(const ProviderCall& call, const Forward& forward) override {
    _calls.push_back(Text(call));
    forward();
  }

 private:
  Calls& _calls;
};

TEST(ForwardingProvider, NamesEveryOperationAndItsInputsInOrder) {
  Calls calls;
  NotingProvider provider(calls);
  for (const Operation& operation : AllOperations()) {
    operation.call(provider);
  }
  EXPECT_THAT(calls, ElementsAre("QueryDisks naa.1+naa.2 true", "GetDiskMappings true",
                                 "FormatDiskMapping naa.1 naa.2 t1/1/0", "RestampDiskMapping naa.1 naa.2",
                                 "MountDiskMapping naa.1 true", "RestampDiskMappingByUuid uuid",
                                 "RemoveDisk naa.2 pass text/1/2", "RemoveDiskMapping naa.1  /0/-1",
                                 "UnmountDiskMapping naa.1", "RemoveDiskByUuid uuid pass",
                                 "IsAutoModeEnabled", "GetKovaOtxNicConfigs", "GetClusterInfoDetailed",
                                 "GetFaultDomainName", "ClaimUnmountedDiskgroups", "RefreshKovaInfo"));
}

TEST(ForwardingProvider, HandsEveryOperationToTheSameOneOfItsTarget) {
  Calls given;
  Calls forwarded;
  NotingProvider provider(given, std::make_shared<NotingProvider>(forwarded));
  for (const Operation& operation : AllOperations()) {
    operation.call(provider);
  }
  EXPECT_EQ(given.size(), operationNames.size());
  EXPECT_EQ(forwarded, given);
}

class FakeNic : public KovaOtxNicConfig {
 public:
  explicit FakeNic(int& alive) : _alive(alive) { ++_alive; }
  ~FakeNic() override { --_alive; }
  std::string GetOtxnicName() const override { return "otx0"; }
  HostCtl::Kova::KovaIpAddress GetMasterMulticastGroup() const override { return {}; }
  HostCtl::Kova::KovaIpAddress GetAgentMulticastGroup() const override { return {}; }

 private:
  int& _alive;
};

// Answers whatever has an answer.
class AnsweringProvider : public ForwardingProvider {
 public:
  explicit AnsweringProvider(int& nicsAlive) : _nicsAlive(nicsAlive) {}

  void QueryDisks(const std::vector<std::string>&, std::vector<DiskResult>& results, bool) override {
    results.emplace_back();
  }
  void GetDiskMappings(std::vector<DiskMapping>& mappings, bool) override { mappings.emplace_back(); }
  bool IsAutoModeEnabled() override { return true; }
  std::vector<KovaOtxNicConfig*> GetKovaOtxNicConfigs() override { return {new FakeNic(_nicsAlive)}; }
  void GetClusterInfoDetailed(KovaClusterInfoDetailed& info) override { info.clusterUuid = "cluster"; }
  std::string GetFaultDomainName() override { return "rack-1"; }

 private:
  int& _nicsAlive;
};

struct Answers {
  std::vector<DiskResult> records;
  std::vector<DiskMapping> groups;
  KovaClusterInfoDetailed cluster;
};

Answers Ask(ForwardingProvider& provider) {
  Answers answers{std::vector<DiskResult>(1), std::vector<DiskMapping>(1), {}};
  provider.QueryDisks({}, answers.records, false);
  provider.GetDiskMappings(answers.groups, false);
  provider.GetClusterInfoDetailed(answers.cluster);
  return answers;
}

TEST(ForwardingProvider, BringsEveryAnswerBack) {
  int nicsAlive = 0;
  ForwardingProvider provider(std::make_shared<AnsweringProvider>(nicsAlive));
  const Answers answers = Ask(provider);
  EXPECT_EQ(answers.records.size(), 2U) << "behind what the caller had";
  EXPECT_EQ(answers.groups.size(), 2U);
  EXPECT_EQ(answers.cluster.clusterUuid, "cluster");
  EXPECT_TRUE(provider.IsAutoModeEnabled());
  EXPECT_EQ(provider.GetFaultDomainName(), "rack-1");
  auto nics = provider.GetKovaOtxNicConfigs();
  EXPECT_EQ(nics.size(), 1U);
  EXPECT_EQ(nicsAlive, 1) << "the caller frees it";
  Util::DeleteVector(nics);
}

void ExpectNoAnswer(ForwardingProvider& provider) {
  const Answers answers = Ask(provider);
  EXPECT_EQ(answers.records.size(), 1U);
  EXPECT_EQ(answers.groups.size(), 1U);
  EXPECT_EQ(answers.cluster.clusterUuid, "");
  EXPECT_FALSE(provider.IsAutoModeEnabled());
  EXPECT_EQ(provider.GetFaultDomainName(), "");
  EXPECT_TRUE(provider.GetKovaOtxNicConfigs().empty());
}

class HoldingBack : public ForwardingProvider {
 public:
  using ForwardingProvider::ForwardingProvider;

 protected:
  void AroundCall(const ProviderCall&, const Forward&) override {}
};

TEST(ForwardingProvider, AnswersNothingWhenACallIsNotForwarded) {
  int nicsAlive = 0;
  HoldingBack provider(std::make_shared<AnsweringProvider>(nicsAlive));
  ExpectNoAnswer(provider);
}

TEST(ForwardingProvider, AnswersNothingWithoutATarget) {
  ForwardingProvider provider;
  ExpectNoAnswer(provider);
}

class FailingAfterwards : public ForwardingProvider {
 public:
  using ForwardingProvider::ForwardingProvider;

 protected:
  void AroundCall(const ProviderCall&, const Forward& forward) override {
    forward();
    throw std::runtime_error("too late");
  }
};

TEST(ForwardingProvider, FreesTheRecordsThatACallerWillNeverSee) {
  int nicsAlive = 0;
  FailingAfterwards provider(std::make_shared<AnsweringProvider>(nicsAlive));
  EXPECT_THROW(provider.GetKovaOtxNicConfigs(), std::runtime_error);
  EXPECT_EQ(nicsAlive, 0);
}

}  // namespace
}  // namespace OtxCtl::Provider
