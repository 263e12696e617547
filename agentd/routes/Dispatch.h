// From a request object to the answer that goes to the client: the way that all encodings share.
//
// Queries are answered on the calling thread if there is a place for one more, and left to another that
// answers one already if not. Changes are handed to the task queue.
#pragma once

#include <memory>

#include "agentd/http/HttpResponder.h"
#include "agentd/http/HttpTypes.h"
#include "agentd/routes/RequestReader.h"
#include "agentd/tasks/Task.h"
#include "host/Answer.h"

namespace Host {
class ManagementApi;
}

namespace Agentd {

class QueryQueue;
class TaskQueue;

// What carries requests out. The queues outlive what was dispatched; a request keeps the API that it needs.
struct Services {
  std::shared_ptr<const Host::ManagementApi> api;
  TaskQueue& tasks;
  QueryQueue& queries;
};

// How an encoding tells what became of a request.
struct Encoding {
  HttpAnswer (*answer)(const Nox::OperationDescriptor& operation, const Host::Answer& answer);  // to a query
  HttpAnswer (*ended)(const Task& task);           // to a change that was waited for
  HttpAnswer (*takenOn)(const Task& task);         // to one that was not
  HttpAnswer (*fault)(const Host::Answer& fault);  // to what came to a fault and nothing else
};

// Checks the request's bounds, carries it out and answers. Throws what is wrong with it: an
// Orbis::MethodFault::Exception.
void Dispatch(const Services& services, const Nox::OperationDescriptor& operation, const RequestRef& request,
              const Encoding& encoding, const HttpResponder& responder);

}  // namespace Agentd
