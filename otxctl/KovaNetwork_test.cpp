#include "kova/agentd/include/KovaNetwork.h"

#include <gtest/gtest.h>

namespace {

using HostCtl::Kova::KovaIpAddress;
using HostCtl::Kova::KovaOtxNicConfig;

class CountedNic : public KovaOtxNicConfig {
 public:
  explicit CountedNic(int& alive) : _alive(alive) { ++_alive; }
  ~CountedNic() override { --_alive; }
  std::string GetOtxnicName() const override { return "otx1"; }
  KovaIpAddress GetMasterMulticastGroup() const override { return {}; }
  KovaIpAddress GetAgentMulticastGroup() const override { return {}; }

 private:
  int& _alive;
};

TEST(Addresses, ReturnTheTextTheyWereMadeOf) {
  EXPECT_EQ(HostCtl::Network::Ipv4Address("224.1.2.3").GetStringAddress(), "224.1.2.3");
  EXPECT_EQ(HostCtl::Network::Ipv6Address("FF19::3").GetStringAddress(), "FF19::3");
  EXPECT_EQ(HostCtl::Network::Ipv4Address().GetStringAddress(), "");
  EXPECT_EQ(HostCtl::Network::Ipv6Address().GetStringAddress(), "");
}

TEST(DeleteVector, DeletesEveryRecordAndToleratesNullEntries) {
  int alive = 0;
  std::vector<KovaOtxNicConfig*> records = {new CountedNic(alive), nullptr, new CountedNic(alive)};
  ASSERT_EQ(alive, 2);
  OtxCtl::Util::DeleteVector(records);
  EXPECT_EQ(alive, 0);
  EXPECT_TRUE(records.empty());
}

TEST(DeleteVector, LeavesAnEmptyListEmpty) {
  std::vector<KovaOtxNicConfig*> records;
  OtxCtl::Util::DeleteVector(records);
  EXPECT_TRUE(records.empty());
}

}  // namespace
