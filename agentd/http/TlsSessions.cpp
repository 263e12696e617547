#include "agentd/http/TlsSessions.h"

#include <openssl/rand.h>
#include <openssl/x509_vfy.h>

#include <array>
#include <cstdint>
#include <cstring>
#include <ctime>
#include <memory>
#include <stdexcept>

namespace Agentd {
namespace {

constexpr std::size_t ticketSecretBytes = 80;
constexpr unsigned char nameOfContext[] = "kova-agentd";

// A certificate, as the handshake would judge it. Those between it and its root are not kept in a ticket: one
// that needs them from its client is not found good here.
bool IsStillGood(X509* certificate, const SSL* session) {
  const std::unique_ptr<X509_STORE_CTX, decltype(&X509_STORE_CTX_free)> check(X509_STORE_CTX_new(),
                                                                              &X509_STORE_CTX_free);
  X509_STORE* const trusted = SSL_CTX_get_cert_store(SSL_get_SSL_CTX(session));
  if (!check || X509_STORE_CTX_init(check.get(), trusted, certificate, nullptr) != 1 ||
      X509_STORE_CTX_set_default(check.get(), "ssl_client") != 1) {
    return false;
  }
  X509_VERIFY_PARAM_set_auth_level(X509_STORE_CTX_get0_param(check.get()), SSL_get_security_level(session));
  return X509_verify_cert(check.get()) == 1;
}

// When the handshake was that began a session, written into its tickets.
using Begin = std::int64_t;

int NoteBegin(SSL* session, void*) {
  SSL_SESSION* const kept = SSL_get_session(session);
  void* noted = nullptr;
  std::size_t size = 0;
  if (SSL_SESSION_get0_ticket_appdata(kept, &noted, &size) == 1 && size == sizeof(Begin)) {
    return 1;  // one that goes on: its age counts from its first handshake
  }
  const Begin now = std::time(nullptr);
  return SSL_SESSION_set1_ticket_appdata(kept, &now, sizeof now);
}

bool IsYoung(SSL_SESSION* kept, std::intptr_t life) {
  void* noted = nullptr;
  std::size_t size = 0;
  if (SSL_SESSION_get0_ticket_appdata(kept, &noted, &size) != 1 || size != sizeof(Begin)) {
    return false;
  }
  Begin begin = 0;
  std::memcpy(&begin, noted, sizeof begin);
  const Begin age = std::time(nullptr) - begin;
  return age >= 0 && age <= life;
}

SSL_TICKET_RETURN Judge(SSL* session, SSL_SESSION* kept, const unsigned char*, std::size_t,
                        SSL_TICKET_STATUS status, void* life) {
  if (status != SSL_TICKET_SUCCESS && status != SSL_TICKET_SUCCESS_RENEW) {
    return SSL_TICKET_RETURN_IGNORE_RENEW;
  }
  X509* const certificate = SSL_SESSION_get0_peer(kept);
  const bool isGood = IsYoung(kept, reinterpret_cast<std::intptr_t>(life)) &&
                      (certificate == nullptr || IsStillGood(certificate, session));
  return isGood ? SSL_TICKET_RETURN_USE : SSL_TICKET_RETURN_IGNORE_RENEW;
}

}  // namespace

void ResumeSessions(SSL_CTX* context, std::chrono::seconds life) {
  SSL_CTX_set_session_cache_mode(context, SSL_SESS_CACHE_OFF);  // only in tickets
  SSL_CTX_set_session_id_context(context, nameOfContext, sizeof nameOfContext - 1);
  SSL_CTX_set_timeout(context, static_cast<long>(life.count()));
  SSL_CTX_set_session_ticket_cb(context, &NoteBegin, &Judge,
                                reinterpret_cast<void*>(static_cast<std::intptr_t>(life.count())));
}

void RenewTicketSecret(SSL_CTX* context) {
  std::array<unsigned char, ticketSecretBytes> secret{};
  if (RAND_bytes(secret.data(), static_cast<int>(secret.size())) != 1 ||
      SSL_CTX_set_tlsext_ticket_keys(context, secret.data(), secret.size()) != 1) {
    throw std::runtime_error("cannot make a secret for the tickets of TLS");
  }
}

}  // namespace Agentd
