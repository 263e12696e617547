#include "agentd/http/HttpHeaderRules.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

namespace Agentd {
namespace {

namespace http = boost::beast::http;

constexpr std::uint16_t port = 8080;
const HttpDoor unixDoor;
const HttpDoor tcpDoor{port, {"kova.example", "10.0.0.5", "[fd00::5]"}};

HttpHeader AHeader(const std::vector<std::pair<std::string, std::string>>& fields) {
  HttpHeader header;
  header.version(10);  // which leaves it to the client whether there is a Host header
  for (const auto& [name, value] : fields) {
    header.insert(name, value);
  }
  return header;
}

unsigned StatusOf(const HttpHeader& header, const HttpDoor& door = unixDoor) {
  const auto refusal = RefusalOf(header, door);
  return refusal ? refusal->status : 0;
}

TEST(HostHeader, NamesLoopbackWithThePortOrTheServersOwnNames) {
  for (const char* host :
       {"localhost:8080", "LocalHost:8080", "127.0.0.1:8080", "127.1.2.3:8080", "[::1]:8080", "kova.example",
        "KOVA.example:8080", "kova.example:443", "10.0.0.5", "10.0.0.5:8080", "[fd00::5]", "[fd00::5]:1"}) {
    EXPECT_TRUE(IsOwnHost(host, tcpDoor)) << host;
  }
}

TEST(HostHeader, NamesNobodyElse) {
  for (const char* host : {"",
                           ":8080",
                           "localhost",
                           "localhost:8081",
                           "localhost:08080",
                           "localhost:8080 ",
                           "localhost.:8080",
                           "localhost.evil.example:8080",
                           "evil.example:8080",
                           "evil.example",
                           "10.0.0.6:8080",
                           "127.0.0.1",
                           "[::1]",
                           "::1:8080",
                           "[127.0.0.1]:8080",
                           "[::2]:8080",
                           "kova.example.evil",
                           "xkova.example",
                           "<script>:8080",
                           "127.0.0.1:8080@evil.example"}) {
    EXPECT_FALSE(IsOwnHost(host, tcpDoor)) << host;
  }
}

TEST(HostHeader, MayLeaveOutThePortThatEverybodyAssumes) {
  EXPECT_TRUE(IsOwnHost("localhost", {80, {}}));
  EXPECT_TRUE(IsOwnHost("localhost:80", {80, {}}));
  EXPECT_TRUE(IsOwnHost("localhost", {443, {}, true}));
  EXPECT_FALSE(IsOwnHost("localhost", {443, {}})) << "without TLS it is 80";
  EXPECT_FALSE(IsOwnHost("localhost", {80, {}, true}));
}

TEST(HostHeader, IsWrittenInOneWay) {
  for (const char* host : {"", "localhost", "kova.example:9443", "10.0.0.5", "[fd00::5]",
                           "[::ffff:1.2.3.4]:1", "%2frun%2fkova.sock", "a_b~c-d", "kova:"}) {
    EXPECT_TRUE(IsHost(host)) << host;
  }
  for (const char* host : {"<i>", "a b", "a\"b", "a'b", "a&b", "a/b", "user@a", "a:b", "a:123456", "a:1:2",
                           "[::1", "::1", "[]", "[a]b", "[a%]", "\x01", "\xc3\xa4"}) {
    EXPECT_FALSE(IsHost(host)) << host;
    EXPECT_EQ(StatusOf(AHeader({{"Host", host}})), 400u) << host;
  }
}

TEST(HttpHeaderRules, TheHostIsLookedAtOnTcpOnly) {
  const HttpHeader strange = AHeader({{"Host", "evil.example:8080"}});
  EXPECT_EQ(StatusOf(strange, tcpDoor), 421u);
  EXPECT_EQ(StatusOf(AHeader({}), tcpDoor), 421u);
  EXPECT_EQ(StatusOf(strange), 0u);
  EXPECT_EQ(StatusOf(AHeader({{"Host", "localhost:8080"}}), tcpDoor), 0u);
}

TEST(HttpHeaderRules, ARequestOfTheCurrentVersionBearsAHost) {
  HttpHeader header = AHeader({});
  EXPECT_EQ(StatusOf(header), 0u);
  header.version(11);
  EXPECT_EQ(StatusOf(header), 400u);
  EXPECT_EQ(StatusOf(header, tcpDoor), 400u);
  header.insert("Host", "");
  EXPECT_EQ(StatusOf(header), 0u);
  EXPECT_EQ(StatusOf(header, tcpDoor), 421u);
}

HttpAsked Asked(const std::string& target, const std::string& host = "kova.example") {
  HttpHeader header = AHeader({{"Host", host}});
  header.target(target);
  return WhatIsAsked(header);
}

TEST(HttpHeaderRules, ATargetMayNameTheHostToo) {
  EXPECT_EQ(Asked("/a?b").target, "/a?b");
  EXPECT_EQ(Asked("/a?b").authority, "kova.example");
  for (const char* target : {"http://other.example:8/a?b=/", "HTTPS://other.example:8/a?b=/"}) {
    EXPECT_EQ(Asked(target).target, "/a?b=/") << target;
    EXPECT_EQ(Asked(target).authority, "other.example:8") << target;
  }
  EXPECT_EQ(Asked("http://a").target, "/");
  EXPECT_EQ(Asked("http://a?b").target, "/?b");
  EXPECT_EQ(Asked("ftp://a/b").target, "ftp://a/b") << "which is served nowhere";
  EXPECT_EQ(Asked("*").target, "*");
}

TEST(HttpHeaderRules, TheHostThatATargetNamesIsTheOneThatCounts) {
  HttpHeader header = AHeader({{"Host", "kova.example"}});
  header.target("http://evil.example/a");
  EXPECT_EQ(StatusOf(header, tcpDoor), 421u);
  header.target("http://user@kova.example/a");
  EXPECT_EQ(StatusOf(header, tcpDoor), 400u);
  header.set("Host", "evil.example");
  header.target("http://kova.example/a");
  EXPECT_EQ(StatusOf(header, tcpDoor), 0u);
}

TEST(HttpHeaderRules, WhatMayStandThereOnceMustNotStandThereTwice) {
  for (const char* field : {"Host", "Content-Length", "Transfer-Encoding", "Content-Type", "Expect"}) {
    EXPECT_EQ(StatusOf(AHeader({{field, "chunked"}, {field, "chunked"}})), 400u) << field;
  }
  EXPECT_EQ(StatusOf(AHeader({{"X", "a"}, {"X", "b"}})), 0u);
}

TEST(HttpHeaderRules, ABodyIsReadAsItIsOrInChunks) {
  EXPECT_EQ(StatusOf(AHeader({{"Transfer-Encoding", "Chunked"}})), 0u);
  EXPECT_EQ(StatusOf(AHeader({{"Transfer-Encoding", "gzip, chunked"}})), 501u);
  EXPECT_EQ(StatusOf(AHeader({{"Transfer-Encoding", ""}})), 501u);
  EXPECT_EQ(StatusOf(AHeader({{"Content-Encoding", "Identity"}})), 0u);
  EXPECT_EQ(StatusOf(AHeader({{"Content-Encoding", "gzip"}})), 415u);
  EXPECT_EQ(StatusOf(AHeader({{"Content-Encoding", "identity"}, {"Content-Encoding", "br"}})), 415u);
}

TEST(HttpHeaderRules, OnlyOneThingCanBeExpected) {
  HttpHeader header = AHeader({{"Host", "a"}, {"Expect", "100-Continue"}});
  header.version(11);
  EXPECT_EQ(StatusOf(header), 0u);
  EXPECT_TRUE(WantsContinue(header));
  header.version(10);
  EXPECT_FALSE(WantsContinue(header)) << "an old client would take it for the answer";
  EXPECT_FALSE(WantsContinue(AHeader({})));
  EXPECT_EQ(StatusOf(AHeader({{"Expect", "a miracle"}})), 417u);
}

}  // namespace
}  // namespace Agentd
