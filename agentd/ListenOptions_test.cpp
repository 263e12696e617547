#include "agentd/ListenOptions.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <CLI/CLI.hpp>
#include <stdexcept>

namespace Agentd {
namespace {

using testing::ElementsAre;

HttpOptions Parse(std::vector<std::string> arguments) {
  CLI::App cli;
  ListenOptions options;
  options.AddTo(cli);
  std::reverse(arguments.begin(), arguments.end());  // as the library takes them
  cli.parse(arguments);
  return options.Read();
}

TEST(ListenOptions, GiveOneSocketUnlessTold) {
  const HttpOptions options = Parse({});
  ASSERT_EQ(options.listen.size(), 1u);
  EXPECT_EQ(options.listen[0].Text(), "unix:/run/kova/agentd.sock");
  EXPECT_FALSE(options.tls);
  EXPECT_TRUE(options.serverNames.empty());
}

TEST(ListenOptions, TakeAddressesInTheirOrder) {
  const HttpOptions options = Parse({"--listen", "tcp:127.0.0.1:0", "--listen", "unix:/a"});
  ASSERT_EQ(options.listen.size(), 2u);
  EXPECT_EQ(options.listen[0].Text(), "tcp:127.0.0.1:0");
  EXPECT_EQ(options.listen[1].Text(), "unix:/a");
}

TEST(ListenOptions, GrantRolesByUserGroupAndName) {
  const HttpOptions options =
      Parse({"--change-uid", "7", "--change-uid", "root", "--change-group", "8", "--change-name", "operator",
             "--read-uid", "9", "--read-group", "root", "--read-name", "a", "--read-name", "b"});
  EXPECT_THAT(options.access.change.uids, ElementsAre(0, 7));
  EXPECT_THAT(options.access.change.groups, ElementsAre(8));
  EXPECT_THAT(options.access.change.names, ElementsAre("operator"));
  EXPECT_THAT(options.access.read.uids, ElementsAre(9));
  EXPECT_THAT(options.access.read.groups, ElementsAre(0));
  EXPECT_THAT(options.access.read.names, ElementsAre("a", "b"));
}

TEST(ListenOptions, TakeAllFilesOfTlsOrNone) {
  const HttpOptions options =
      Parse({"--tls-cert", "c", "--tls-key", "k", "--tls-client-ca", "a", "--server-name", "kova.example"});
  ASSERT_TRUE(options.tls);
  EXPECT_EQ(options.tls->certificate + options.tls->key + options.tls->clientCa, "cka");
  EXPECT_THAT(options.serverNames, ElementsAre("kova.example"));
  EXPECT_THROW(Parse({"--tls-cert", "c", "--tls-key", "k"}), std::invalid_argument);
  EXPECT_THROW(Parse({"--tls-client-ca", "a"}), std::invalid_argument);
}

TEST(ListenOptions, RefuseWhatTheyDoNotUnderstand) {
  EXPECT_THROW(Parse({"--listen", "127.0.0.1:80"}), std::invalid_argument);
  EXPECT_THROW(Parse({"--change-uid", "no such one"}), std::invalid_argument);
  EXPECT_THROW(Parse({"--read-group", "no such one"}), std::invalid_argument);
}

}  // namespace
}  // namespace Agentd
