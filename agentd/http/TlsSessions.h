// Clients of TLS that come back: tickets, by which a connection goes on with the secrets of an earlier one.
// Part of the server; nobody else includes this.
//
// A ticket spares the handshake's work, not its checks: the certificate that it holds is verified anew, by
// today's time and the CA of the context, and where that does not hold, or the ticket is too old, the client
// is asked for its certificate as if it had never been here. Whoever was verified is then known by its
// certificate as in any other handshake.
#pragma once

#include <openssl/ssl.h>

#include <chrono>

namespace Agentd {

constexpr std::chrono::seconds tlsSessionLife = std::chrono::hours(1);  // from the handshake that began it

// For a context of a server that has its CA and its way of verifying. It is used on one thread.
void ResumeSessions(SSL_CTX* context, std::chrono::seconds life = tlsSessionLife);

// Forgets the secret that tickets are sealed with, and so all tickets: what is caught today must not be read
// by a secret that is found tomorrow. Throws std::runtime_error.
void RenewTicketSecret(SSL_CTX* context);

}  // namespace Agentd
