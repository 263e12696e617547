// The server's side of TLS. Part of the server; nobody else includes this.
#pragma once

#include <boost/asio/ssl/context.hpp>
#include <string>
#include <vector>

#include "agentd/http/HttpOptions.h"

namespace Agentd {

// TLS 1.2 or newer, with forward secrecy and authenticated encryption only. Clients that come back are known
// by tickets (see TlsSessions.h). A client may come without a certificate; one that it shows must be of the
// client CA and valid, or the handshake fails. Throws std::runtime_error that names the file.
boost::asio::ssl::context MakeTlsContext(const TlsFiles& files);

// The names in the verified certificate of the other side: the common names of its subject, then its DNS
// names. A certificate without any has one, empty name; no certificate, none.
std::vector<std::string> CertificateNames(const SSL* session);

}  // namespace Agentd
