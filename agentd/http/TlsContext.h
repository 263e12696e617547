// What both sides of TLS do alike: the versions they speak, and the files they come with. Part of server and
// client; nobody else includes this.
#pragma once

#include <boost/asio/ssl/context.hpp>
#include <string>

namespace Agentd {

// TLS 1.2 or newer, for one of the sides.
boost::asio::ssl::context MakeTlsContext(boost::asio::ssl::context::method side);

// The following take files in PEM form, and throw std::runtime_error that names the file.

// The side's own certificate, with those between it and its root, and its key.
void UseCertificate(boost::asio::ssl::context& context, const std::string& certificate,
                    const std::string& key);
// Whose certificates the other side may show. `whose` is for messages: "of clients".
void UseCa(boost::asio::ssl::context& context, const std::string& ca, const char* whose);

}  // namespace Agentd
