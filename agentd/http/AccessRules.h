// Who may do what.
//
// A client is known by what the kernel or a verified certificate says of it, and gets the highest role that
// one of its marks is granted.
#pragma once

#include <sys/types.h>

#include <set>
#include <string>
#include <vector>

#include "agentd/http/HttpTypes.h"

namespace Agentd {

// The process at the other end of a Unix socket, as it was when it connected.
struct ProcessCredentials {
  uid_t uid = 0;
  std::vector<gid_t> groups;  // its own and the supplementary ones
};

struct AccessRules {
  struct Grant {
    std::set<uid_t> uids = {};
    std::set<gid_t> groups = {};
    std::set<std::string> names = {};  // of certificates
  };
  Grant change = {};
  Grant read = {};

  // Root and the user that the agent runs as may always change: they could do so without it.
  HttpPeer PeerOf(const ProcessCredentials& process) const;
  // `names` are those of a certificate that was verified; none: there was no certificate. They are compared
  // to the letter.
  HttpPeer PeerOf(const std::vector<std::string>& names) const;
};

// The number of a user or a group, given by name or as a number. Throws std::invalid_argument.
uid_t FindUser(const std::string& text);
gid_t FindGroup(const std::string& text);

}  // namespace Agentd
