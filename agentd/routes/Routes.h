// Which request calls which operation.
//
//   GET  /healthz                    "ok" while the agent serves; to readers, in a second line, its version
//   GET  /metrics                    what it has served, and what waits (see Metrics.h)
//   GET  /api/v1/disks?names=N&..    QueryDisksForKova
//   GET  /api/v1/groups              GetDiskGroups
//   GET  /api/v1/config              GetConfigInfo
//   POST /api/v1/OPERATION           any operation, its parameters in the body (see RequestReader.h)
//   GET  /api/v1/tasks               what became of the requests that change disks
//   GET  /api/v1/tasks/ID            one of them, with its result
//   GET  /api/v1/host                the description of a simulated host
//   POST /api/v1/host                changes it: {"set": {..}, "disk": {"name": .., ..}}
//   GET  /api/v1/openapi.json        how all of these are described
//   POST /soap                       the operations of the management API as SOAP 1.1 messages
//   GET  /soap?wsdl, ?xsd=nox.xsd    how they are described
//
// An answer in JSON is {"result": .., "fault": ..}, either null or both; that of a changing operation also
// has "task", its id. With "wait": false the answer is the task as it was taken on, with 202.
//
//   200  there is a result, perhaps beside a fault; or neither: done, nothing to say
//   400  InvalidArgument, also for what cannot be read; DuplicateDisks
//   403  NotPermitted        404, 405, 415  the path, the method or the type of the body: an InvalidArgument
//   409  HostChanged, and other faults of the storage service: the host, as it is, does not allow it
//   500  SystemError, and every SOAP fault         503            Busy, with Retry-After
//
// Those from 400 on are for a fault alone, or beside an empty list. Outside of /api/v1 a refusal is a line of
// text.
//
// A request takes the role read, or change if it changes something; /healthz takes none. A client without the
// role is answered with NotPermitted. All of this, but for what an operation in SOAP takes, is known from the
// header, and told before the body is read (see Admit). HEAD is answered like GET.
//
// Queries are answered on the calling thread if there is a place for one more, and left to another that
// answers one already if not (see QueryQueue.h). Changes are handed to the task queue, and answered by it
// when their turn has come. So however many wait, and however slow the kernel is, no thread waits for them
// here.
#pragma once

#include <chrono>
#include <functional>
#include <memory>
#include <utility>

#include "agentd/http/HttpLoad.h"
#include "agentd/http/HttpResponder.h"
#include "agentd/http/HttpTypes.h"
#include "agentd/tasks/QueryQueue.h"

namespace Host {
class ManagementApi;
}

namespace Agentd {

class HostWatch;
class Metrics;
class TaskApi;
class TaskQueue;

class Router {
 public:
  // Both outlive the router and whatever it handed to the queue.
  Router(const Host::ManagementApi& api, TaskQueue& tasks, const QueryLimits& limits = {});
  ~Router();

  // What /metrics says of the server. Set before it runs.
  void OnLoad(std::function<HttpLoad()> load) { _load = std::move(load); }

  // What becomes of a request of which the header has come: who may not ask for it is refused, and so is what
  // is not served; who may only read may send 1 MiB, and who may do nothing, nothing. Threads: any.
  HttpAdmission Admit(const HttpRequest& head) const;

  // Threads: any. Throws nothing that a client could bring about.
  void Serve(const HttpRequest& request, const HttpResponder& responder) const;

  // Waits until no query is at work, not even one that nobody waits for; whether that came about in time.
  bool WaitUntilIdle(std::chrono::milliseconds patience) const;

 private:
  TaskQueue& _tasks;
  const std::shared_ptr<const TaskApi> _api;  // also of what was handed to the queue
  const std::unique_ptr<QueryQueue> _queries;
  const std::unique_ptr<HostWatch> _watch;
  const std::shared_ptr<Metrics> _metrics;  // answers that come late are still counted
  std::function<HttpLoad()> _load = [] { return HttpLoad(); };
};

}  // namespace Agentd
