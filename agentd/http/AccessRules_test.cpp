#include "agentd/http/AccessRules.h"

#include <gtest/gtest.h>
#include <unistd.h>

#include <stdexcept>

namespace Agentd {
namespace {

// A user that is neither root nor whoever runs the tests.
uid_t Stranger() {
  return geteuid() == 4711 ? 4712 : 4711;
}

TEST(AccessRules, RootAndTheAgentsOwnUserMayAlwaysChange) {
  const AccessRules rules;
  EXPECT_EQ(rules.PeerOf(ProcessCredentials{0, {0}}).role, HttpRole::Change);
  EXPECT_EQ(rules.PeerOf(ProcessCredentials{geteuid(), {1}}).role, HttpRole::Change);
}

TEST(AccessRules, NobodyElseMayDoAnythingUnlessToldSo) {
  const HttpPeer peer = AccessRules().PeerOf(ProcessCredentials{Stranger(), {0, 1}});
  EXPECT_EQ(peer.role, HttpRole::None);
  EXPECT_EQ(peer.identity, "uid " + std::to_string(Stranger()));
}

TEST(AccessRules, UsersAreGrantedARole) {
  AccessRules rules;
  rules.read.uids = {Stranger()};
  EXPECT_EQ(rules.PeerOf(ProcessCredentials{Stranger(), {}}).role, HttpRole::Read);
  EXPECT_EQ(rules.PeerOf(ProcessCredentials{Stranger() + 10, {}}).role, HttpRole::None);
}

TEST(AccessRules, SoAreTheGroupsAUserIsIn) {
  AccessRules rules;
  rules.read.groups = {20};
  rules.change.groups = {30};
  EXPECT_EQ(rules.PeerOf(ProcessCredentials{Stranger(), {10, 20}}).role, HttpRole::Read);
  EXPECT_EQ(rules.PeerOf(ProcessCredentials{Stranger(), {30}}).role, HttpRole::Change);
  EXPECT_EQ(rules.PeerOf(ProcessCredentials{Stranger(), {10}}).role, HttpRole::None);
}

TEST(AccessRules, TheHighestRoleCounts) {
  AccessRules rules;
  rules.read.uids = {Stranger()};
  rules.change.groups = {30};
  EXPECT_EQ(rules.PeerOf(ProcessCredentials{Stranger(), {30}}).role, HttpRole::Change);
}

TEST(AccessRules, CertificatesAreKnownByTheirNamesToTheLetter) {
  AccessRules rules;
  rules.change.names = {"operator"};
  rules.read.names = {"monitor.example"};
  EXPECT_EQ(rules.PeerOf({"operator"}).role, HttpRole::Change);
  EXPECT_EQ(rules.PeerOf({"somebody", "monitor.example"}).role, HttpRole::Read);
  for (const char* name : {"Operator", "operator ", "operato", "operator.example", ""}) {
    EXPECT_EQ(rules.PeerOf({name}).role, HttpRole::None) << name;
  }
  EXPECT_EQ(rules.PeerOf({std::string("operator\0.example", 17)}).role, HttpRole::None);
}

TEST(AccessRules, NoCertificateIsNoRole) {
  AccessRules rules;
  rules.read.names = {""};
  EXPECT_EQ(rules.PeerOf(std::vector<std::string>()).role, HttpRole::None);
}

TEST(AccessRules, AnIdentityIsPrintable) {
  EXPECT_EQ(AccessRules().PeerOf({"a\n'b"}).identity, "certificate 'a\\x0a\\x27b'");
}

TEST(AccessRules, UsersAndGroupsGoByNameOrNumber) {
  EXPECT_EQ(FindUser("root"), 0u);
  EXPECT_EQ(FindUser("1234"), 1234u);
  EXPECT_EQ(FindGroup("root"), 0u);
  EXPECT_EQ(FindGroup("1234"), 1234u);
  for (const char* text : {"", "no such one", "-1", "4294967295", "4294967296"}) {
    EXPECT_THROW(FindUser(text), std::invalid_argument) << text;
    EXPECT_THROW(FindGroup(text), std::invalid_argument) << text;
  }
}

}  // namespace
}  // namespace Agentd
