#include "agentd/http/AccessRules.h"
#include "tessa/text/Escape.h"

#include <grp.h>
#include <pwd.h>
#include <unistd.h>

#include <algorithm>
#include <charconv>
#include <optional>
#include <stdexcept>

namespace Agentd {
namespace {

template <class Set, class List>
bool HoldsAny(const Set& set, const List& list) {
  return std::any_of(list.begin(), list.end(), [&set](const auto& item) { return set.count(item) != 0; });
}

// Nothing for what is no number; all bits set stands for "no user" in system calls, and is none either.
std::optional<unsigned> ParseId(const std::string& text) {
  unsigned id = 0;
  const auto [end, error] = std::from_chars(text.data(), text.data() + text.size(), id);
  const bool whole = error == std::errc() && end == text.data() + text.size();
  return whole && id != ~0u ? std::optional(id) : std::nullopt;
}

bool Grants(const AccessRules::Grant& grant, const ProcessCredentials& process) {
  return grant.uids.count(process.uid) != 0 || HoldsAny(grant.groups, process.groups);
}

template <class Granted>
HttpRole HighestOf(const AccessRules& rules, Granted granted) {
  return granted(rules.change) ? HttpRole::Change : granted(rules.read) ? HttpRole::Read : HttpRole::None;
}

}  // namespace

HttpPeer AccessRules::PeerOf(const ProcessCredentials& process) const {
  const bool always = process.uid == 0 || process.uid == geteuid();
  const HttpRole role = HighestOf(*this, [&](const Grant& grant) { return Grants(grant, process); });
  return {always ? HttpRole::Change : role, "uid " + std::to_string(process.uid)};
}

HttpPeer AccessRules::PeerOf(const std::vector<std::string>& certificateNames) const {
  if (certificateNames.empty()) {
    return {HttpRole::None, "a client without a certificate"};
  }
  const HttpRole role =
      HighestOf(*this, [&](const Grant& grant) { return HoldsAny(grant.names, certificateNames); });
  return {role, "certificate '" + Tessa::EscapeToAscii(certificateNames.front()) + "'"};
}

uid_t FindUser(const std::string& text) {
  if (const std::optional<unsigned> id = ParseId(text)) {
    return *id;
  }
  const passwd* const user = getpwnam(text.c_str());
  if (user == nullptr) {
    throw std::invalid_argument("there is no user '" + text + "'");
  }
  return user->pw_uid;
}

gid_t FindGroup(const std::string& text) {
  if (const std::optional<unsigned> id = ParseId(text)) {
    return *id;
  }
  const group* const found = getgrnam(text.c_str());
  if (found == nullptr) {
    throw std::invalid_argument("there is no group '" + text + "'");
  }
  return found->gr_gid;
}

}  // namespace Agentd
