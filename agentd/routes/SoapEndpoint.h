// The management API for SOAP 1.1 clients: one address, and the documents that describe it.
#pragma once

#include "agentd/http/HttpResponder.h"
#include "agentd/http/HttpTypes.h"

namespace Host {
class ManagementApi;
}

namespace Agentd {

struct HttpTarget;
class TaskQueue;

// Answers a message: queries on the calling thread, changes when the queue has carried them out. Whatever is
// wrong is a SOAP fault.
void ServeSoap(const Host::ManagementApi& api, TaskQueue& tasks, const HttpRequest& request,
               const HttpResponder& responder);

// "/soap?wsdl" and, as it refers to, "/soap?xsd=nox.xsd".
HttpAnswer DescribeService(const HttpTarget& target);

}  // namespace Agentd
