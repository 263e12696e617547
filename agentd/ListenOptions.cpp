#include "agentd/ListenOptions.h"

#include <CLI/CLI.hpp>
#include <stdexcept>

namespace Agentd {
namespace {

constexpr const char* defaultAddress = "unix:/run/kova/agentd.sock";

// One value each time the option is given.
void AddList(CLI::App& cli, const std::string& name, std::vector<std::string>& values,
             const std::string& text) {
  cli.add_option(name, values, text + "; may be repeated")
      ->expected(1)
      ->multi_option_policy(CLI::MultiOptionPolicy::TakeAll);
}

std::optional<TlsFiles> CheckTls(const TlsFiles& files) {
  const bool none = files.certificate.empty() && files.key.empty() && files.clientCa.empty();
  const bool all = !files.certificate.empty() && !files.key.empty() && !files.clientCa.empty();
  if (!none && !all) {
    throw std::invalid_argument("TLS takes all of --tls-cert, --tls-key and --tls-client-ca");
  }
  return all ? std::optional(files) : std::nullopt;
}

}  // namespace

void ListenOptions::AddTo(CLI::App& cli) {
  AddList(
      cli, "--listen", _listen,
      std::string("Where to answer: unix:PATH or tcp:ADDRESS:PORT, port 0 for any that is free; default ") +
          defaultAddress);
  AddTo(cli, "change", _change);
  AddTo(cli, "read", _read);
  cli.add_option("--tls-cert", _tls.certificate, "Certificate of the agent for TCP, with its chain, PEM");
  cli.add_option("--tls-key", _tls.key, "Its key, PEM");
  cli.add_option("--tls-client-ca", _tls.clientCa, "CA whose certificates clients may come with, PEM");
  AddList(cli, "--server-name", _serverNames, "Name or address by which TCP clients may call the agent");
}

void ListenOptions::AddTo(CLI::App& cli, const std::string& role, Grant& grant) {
  const std::string may = role == "read" ? " may read" : " may read and change";
  AddList(cli, "--" + role + "-uid", grant.users, "User that" + may + ", on a Unix socket");
  AddList(cli, "--" + role + "-group", grant.groups, "Group whose members" + may + ", on a Unix socket");
  AddList(cli, "--" + role + "-name", grant.names,
          "Name of a client's certificate that" + may + ", with TLS");
}

AccessRules::Grant ListenOptions::Read(const Grant& grant) {
  AccessRules::Grant read;
  for (const std::string& user : grant.users) {
    read.uids.insert(FindUser(user));
  }
  for (const std::string& group : grant.groups) {
    read.groups.insert(FindGroup(group));
  }
  read.names.insert(grant.names.begin(), grant.names.end());
  return read;
}

HttpOptions ListenOptions::Read() const {
  HttpOptions options;
  for (const std::string& address : _listen) {
    options.listen.push_back(ParseAddress(address));
  }
  if (_listen.empty()) {
    options.listen.push_back(ParseAddress(defaultAddress));
  }
  options.access = {.change = Read(_change), .read = Read(_read)};
  options.tls = CheckTls(_tls);
  options.serverNames = _serverNames;
  return options;
}

}  // namespace Agentd
