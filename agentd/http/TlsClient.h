// The client's side of TLS. Part of the client; nobody else includes this.
#pragma once

#include <boost/asio/ssl/context.hpp>
#include <boost/system/error_code.hpp>
#include <string>

#include "agentd/http/HttpClient.h"

namespace Agentd {

// Throws std::runtime_error that names the file.
boost::asio::ssl::context MakeTlsContext(const TlsClientFiles& files);

// From now on the session asks for that host, and takes a certificate for no other: a numeric address, or a
// name.
void RequireHost(SSL* session, std::string host);

// Whether that is what TLS itself has to say, and not the network below it.
bool IsOfTls(const boost::system::error_code& error);

// Why the session has come to nothing, as a sentence that names the agent and, where it is to blame, the
// file.
std::string WhyTlsFailed(const boost::system::error_code& error, const SSL* session,
                         const HttpAddress& address, const TlsClientFiles& files);

}  // namespace Agentd
