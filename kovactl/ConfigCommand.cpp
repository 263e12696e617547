#include "kovactl/ConfigCommand.h"

#include <ostream>

#include "kovactl/Print.h"
#include "kovactl/Table.h"
#include "nox/Kova.h"
#include "nox/Operations.h"

namespace Kovactl {
namespace {

using Nox::Kova::Host::ConfigInfo;

// A part that the host could not read is said to be unknown, not empty.
constexpr const char* unknown = "unknown (the host could not read it)";

std::string OrNone(const std::string& text) {
  return text.empty() ? "none" : text;
}

void PrintNetworks(const ConfigInfo& config, std::ostream& out) {
  const auto& network = config.GetNetworkInfo();
  out << "\n";
  if (!network) {
    out << "Networks: " << unknown << "\n";
    return;
  }
  if (!network->GetPort() || network->GetPort()->IsEmpty()) {
    out << "Networks: none\n";
    return;
  }
  Table table({{"INTERFACE"}, {"MASTER GROUP"}, {"AGENT GROUP"}});
  for (const ConfigInfo::NetworkInfo::PortConfig* port : *network->GetPort()) {
    table.AddRow({port->GetInterfaceName(), port->GetIpConfig()->GetMasterGroup(),
                  port->GetIpConfig()->GetAgentGroup()});
  }
  table.Print(out);
}

void PrintText(const ConfigInfo& config, std::ostream& out) {
  const auto& cluster = config.GetClusterInfo();
  Table table({{"SETTING"}, {"VALUE"}});
  table.AddRow({"Enabled", !config.HasEnabled() ? unknown : config.GetEnabled() ? "yes" : "no"});
  table.AddRow(
      {"Cluster", cluster && cluster->HasClusterUuid() ? OrNone(cluster->GetClusterUuid()) : unknown});
  table.AddRow({"Node", cluster && cluster->HasNodeUuid() ? OrNone(cluster->GetNodeUuid()) : unknown});
  const auto& faultDomain = config.GetFaultDomainInfo();
  table.AddRow({"Fault domain", faultDomain ? OrNone(faultDomain->GetName()) : unknown});
  table.Print(out);
  PrintNetworks(config, out);
}

}  // namespace

ExitStatus RunConfig(const Host::ManagementApi& host, const std::string& output, std::ostream& out,
                     std::ostream& err) {
  return PrintAnswer<ConfigInfo>(host.Query(Nox::Operation::GetConfigInfo()), output, out, err, &PrintText);
}

}  // namespace Kovactl
