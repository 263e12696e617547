#include "agentd/http/HttpAddress.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <stdexcept>

namespace Agentd {
namespace {

TEST(HttpAddress, OfASocketIsItsPath) {
  const HttpAddress address = ParseAddress("unix:/run/a:1.sock");
  EXPECT_TRUE(address.isUnix);
  EXPECT_EQ(address.place, "/run/a:1.sock");
  EXPECT_EQ(address.Text(), "unix:/run/a:1.sock");
  EXPECT_EQ(address.Name(), "/run/a:1.sock");
  EXPECT_TRUE(address.IsLoopback());
}

TEST(HttpAddress, OfTcpIsANumericAddressAndAPort) {
  const HttpAddress v4 = ParseAddress("tcp:10.0.0.1:65535");
  EXPECT_FALSE(v4.isUnix);
  EXPECT_EQ(v4.place, "10.0.0.1");
  EXPECT_EQ(v4.port, 65535);
  EXPECT_EQ(v4.Text(), "tcp:10.0.0.1:65535");
  const HttpAddress v6 = ParseAddress("tcp:[::1]:0");
  EXPECT_EQ(v6.place, "::1");
  EXPECT_EQ(v6.Name(), "[::1]:0");
}

TEST(HttpAddress, OfTcpMayNameAZone) {
  EXPECT_EQ(ParseAddress("tcp:[2001:db8::1%7]:80").place, "2001:db8::1%7");
  EXPECT_EQ(ParseAgentAddress("tls:[2001:db8::1%7]:80").Text(), "tls:[2001:db8::1%7]:80");
}

TEST(HttpAddress, TellsWhetherOnlyThisHostReachesIt) {
  for (const char* text : {"tcp:127.0.0.1:1", "tcp:127.9.9.9:1", "tcp:[::1]:1"}) {
    EXPECT_TRUE(ParseAddress(text).IsLoopback()) << text;
  }
  for (const char* text : {"tcp:0.0.0.0:1", "tcp:10.0.0.1:1", "tcp:[::]:1", "tcp:128.0.0.1:1"}) {
    EXPECT_FALSE(ParseAddress(text).IsLoopback()) << text;
  }
}

TEST(HttpAddress, OfAnAgentByTlsIsANameOrANumericAddressAndAPort) {
  const HttpAddress named = ParseAgentAddress("tls:kova-1.example:9443");
  EXPECT_TRUE(named.isTls);
  EXPECT_FALSE(named.isUnix);
  EXPECT_EQ(named.place, "kova-1.example");
  EXPECT_EQ(named.Name(), "kova-1.example:9443");
  EXPECT_EQ(named.Text(), "tls:kova-1.example:9443");
  EXPECT_EQ(ParseAgentAddress("tls:[::1]:9443").Text(), "tls:[::1]:9443");
  EXPECT_EQ(ParseAgentAddress("tls:10.0.0.1:9443").place, "10.0.0.1");
  EXPECT_EQ(ParseAgentAddress("tcp:10.0.0.1:80").Text(), "tcp:10.0.0.1:80");
  EXPECT_FALSE(ParseAgentAddress("tcp:10.0.0.1:80").isTls);
  EXPECT_EQ(ParseAgentAddress("unix:/a").Text(), "unix:/a");
}

TEST(HttpAddress, OfAnAgentInAnyOtherFormIsRefusedWithTheForms) {
  for (const std::string& text : {std::string("tls:"), std::string("tls:kova.example"), std::string("tls::1"),
                                  std::string("tls:a b:1"), std::string("tls:-a:1"), std::string("tls:::1:1"),
                                  std::string("tls:[kova]:1"), std::string("tls:kova:65536"),
                                  "tls:" + std::string(254, 'a') + ":1", std::string("tcp:localhost:80")}) {
    try {
      ParseAgentAddress(text);
      ADD_FAILURE() << text;
    } catch (const std::invalid_argument& refused) {
      EXPECT_THAT(refused.what(), testing::HasSubstr("tls:HOST:PORT")) << text;
    }
  }
}

TEST(HttpAddress, OfAnyOtherFormIsRefusedWithTheForms) {
  for (const char* text :
       {"", "unix:", "/run/a.sock", "tcp:", "tcp:127.0.0.1", "tcp:127.0.0.1:", "tcp:127.0.0.1:65536",
        "tcp:127.0.0.1:-1", "tcp:127.0.0.1:1x", "tcp:localhost:80", "tcp:::1:80", "tcp:[127.0.0.1]:80",
        "tcp:[]:80", "tcp::80", "tcp:user@10.0.0.1:80", "tcp:10.0.0.1:80/", "tcp:127.0.0.1%1:80",
        "http://127.0.0.1:80", "tls:127.0.0.1:80"}) {
    try {
      ParseAddress(text);
      ADD_FAILURE() << text;
    } catch (const std::invalid_argument& refused) {
      EXPECT_THAT(refused.what(), testing::HasSubstr("unix:PATH and tcp:ADDRESS:PORT")) << text;
    }
  }
}

}  // namespace
}  // namespace Agentd
