// What can be asked of a host, as programs call it: a request in, an answer out.
//
// One interface for the host of this very process (KovaService), for an agent's (Agentd::AgentClient) and for
// what an agent itself adds (Agentd::TaskApi), so that a command is written once. The operations and their
// parameters are those of the schema: nox/Operations.h has a class for each request. Every request passes the
// gate on its way to the plug-in. Disks may be given by canonical name alone: one that the inventory knows is
// replaced by the inventory's object.
//
// Threads: any. The caller waits for the answer. Errors: what the host says is in the answer; only
// an agent that cannot be reached is an exception (Agentd::ConnectionError).
#pragma once

#include <string>
#include <string_view>

#include "host/Answer.h"
#include "nox/Fwd.h"
#include "nox/OperationTable.h"
#include "orbis/DataArray.h"

namespace Host {

using DiskList = Orbis::DataArray<Nox::Host::ScsiDisk>;
using MappingList = Orbis::DataArray<Nox::Kova::Host::DiskMapping>;

class ManagementApi {
 public:
  virtual ~ManagementApi() = default;

  // The result is of the type that the operation declares. An answer without one has a fault.
  virtual Answer Query(const Nox::Operation::Query& request) const = 0;

  // A fault beside a result tells what failed in all. Neither of them: there was nothing to do, or to say.
  // The request is given away, with all that it holds: the inventory's disks are put into it.
  virtual Answer Change(Nox::Operation::Change&& request) const = 0;

  // Simulated hosts only. The host's description, as a file would hold it.
  virtual std::string DescribeHost() const = 0;
  // Throws Orbis::MethodFault::Exception for a text that is no change, whatever the host is like now, where
  // that can be told without asking an agent.
  virtual void CheckHostChange(std::string_view change) const { static_cast<void>(change); }
  // Changes it: {"set": {key: value, ..}, "disk": {"name": .., key: value, ..}}, either may be missing. No
  // result; an InvalidArgument fault when the changed host would not be accepted as a file.
  virtual Answer ChangeHost(const std::string& change) const = 0;
};

}  // namespace Host
