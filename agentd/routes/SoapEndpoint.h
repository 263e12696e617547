// The management API for SOAP 1.1 clients: one address, and the documents that describe it.
#pragma once

#include "agentd/http/HttpResponder.h"
#include "agentd/http/HttpTypes.h"

namespace Agentd {

struct HttpTarget;
struct Services;

// Answers a message when its query has had its place, or its change its turn. Whatever is wrong is a SOAP
// fault.
void ServeSoap(const Services& services, const HttpRequest& request, const HttpResponder& responder);

// "/soap?wsdl": one document, whose address is the one that this client came by; and "/soap?xsd=nox.xsd", the
// types alone, for people.
HttpAnswer DescribeService(const HttpRequest& request, const HttpTarget& target);

}  // namespace Agentd
