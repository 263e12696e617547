#include "agentd/http/TlsClient.h"

#include <openssl/err.h>
#include <openssl/ssl.h>
#include <openssl/x509v3.h>

#include <algorithm>
#include <boost/asio/ip/address.hpp>
#include <boost/asio/ssl/error.hpp>
#include <iterator>
#include <stdexcept>

#include "agentd/http/TlsContext.h"

namespace Agentd {
namespace {

namespace ssl = boost::asio::ssl;
using boost::system::error_code;

// What is found of a certificate that is not of the CA.
constexpr long otherCa[] = {
    X509_V_ERR_UNABLE_TO_GET_ISSUER_CERT,   X509_V_ERR_UNABLE_TO_GET_ISSUER_CERT_LOCALLY,
    X509_V_ERR_DEPTH_ZERO_SELF_SIGNED_CERT, X509_V_ERR_SELF_SIGNED_CERT_IN_CHAIN,
    X509_V_ERR_CERT_SIGNATURE_FAILURE,      X509_V_ERR_UNABLE_TO_VERIFY_LEAF_SIGNATURE};
constexpr long otherName[] = {X509_V_ERR_HOSTNAME_MISMATCH, X509_V_ERR_IP_ADDRESS_MISMATCH};

// What the agent says, or is found not to say.
struct Saying {
  int reason;
  const char* text;
};
constexpr const char* refuses = "refuses the client's certificate ";
constexpr Saying sayings[] = {
    {SSL_R_WRONG_VERSION_NUMBER, "does not speak TLS"},
    {SSL_R_PACKET_LENGTH_TOO_LONG, "does not speak TLS"},
    {SSL_R_UNSUPPORTED_PROTOCOL, "does not speak TLS 1.2 or newer"},
    {SSL_R_TLSV1_ALERT_PROTOCOL_VERSION, "does not speak TLS 1.2 or newer"},
    {SSL_R_TLSV13_ALERT_CERTIFICATE_REQUIRED, "wants a certificate of its client"},
    {SSL_R_SSLV3_ALERT_HANDSHAKE_FAILURE, "does not agree on TLS with its client, or wants a certificate"},
    {SSL_R_TLSV1_ALERT_UNKNOWN_CA, refuses},
    {SSL_R_TLSV1_ALERT_ACCESS_DENIED, refuses},
    {SSL_R_SSLV3_ALERT_BAD_CERTIFICATE, refuses},
    {SSL_R_SSLV3_ALERT_UNSUPPORTED_CERTIFICATE, refuses},
    {SSL_R_SSLV3_ALERT_CERTIFICATE_REVOKED, refuses},
    {SSL_R_SSLV3_ALERT_CERTIFICATE_EXPIRED, refuses},
    {SSL_R_SSLV3_ALERT_CERTIFICATE_UNKNOWN, refuses},
};

const Saying* FindSaying(const error_code& error) {
  const int reason = ERR_GET_REASON(static_cast<unsigned long>(error.value()));
  const auto* const found = std::find_if(std::begin(sayings), std::end(sayings),
                                         [reason](const Saying& row) { return row.reason == reason; });
  return IsOfTls(error) && found != std::end(sayings) ? found : nullptr;
}

template <std::size_t count>
bool IsOneOf(const long (&verdicts)[count], long verdict) {
  return std::find(std::begin(verdicts), std::end(verdicts), verdict) != std::end(verdicts);
}

std::string WhatIsWrong(long verdict, const HttpAddress& address, const TlsClientFiles& files) {
  if (IsOneOf(otherCa, verdict)) {
    return files.ca.empty() ? "is of no CA that this host trusts" : "is not of the CA " + files.ca;
  }
  return IsOneOf(otherName, verdict) ? "is not for '" + address.place + "'" : "cannot be trusted";
}

}  // namespace

ssl::context MakeTlsContext(const TlsClientFiles& files) {
  ssl::context context = MakeTlsContext(ssl::context::tls_client);
  context.set_verify_mode(ssl::verify_peer);
  if (files.ca.empty()) {
    context.set_default_verify_paths();
  } else {
    UseCa(context, files.ca, "of the agent");
  }
  if (!files.certificate.empty()) {
    UseCertificate(context, files.certificate, files.key);
  }
  return context;
}

void RequireHost(SSL* session, std::string host) {
  error_code isName;
  boost::asio::ip::make_address(host, isName);
  // A common name is no name of a host: only what the certificate lists as such counts.
  SSL_set_hostflags(session, X509_CHECK_FLAG_NO_PARTIAL_WILDCARDS | X509_CHECK_FLAG_NEVER_CHECK_SUBJECT);
  const bool done = isName ? SSL_set1_host(session, host.c_str()) == 1 &&
                                 SSL_ctrl(session, SSL_CTRL_SET_TLSEXT_HOSTNAME, TLSEXT_NAMETYPE_host_name,
                                          host.data()) == 1
                           : X509_VERIFY_PARAM_set1_ip_asc(SSL_get0_param(session), host.c_str()) == 1;
  if (!done) {
    throw std::runtime_error("cannot ask for the certificate of '" + host + "'");
  }
}

bool IsOfTls(const error_code& error) {
  return error.category() == boost::asio::error::get_ssl_category();
}

std::string WhyTlsFailed(const error_code& error, const SSL* session, const HttpAddress& address,
                         const TlsClientFiles& files) {
  const std::string agent = "the agent on " + address.Name();
  if (const long verdict = SSL_get_verify_result(session); verdict != X509_V_OK) {
    return "the certificate of " + agent + " " + WhatIsWrong(verdict, address, files) + ": " +
           X509_verify_cert_error_string(verdict);
  }
  const Saying* const saying = FindSaying(error);
  if (saying == nullptr) {
    return "no TLS with " + agent + ": " + error.message();
  }
  return agent + " " + saying->text + (saying->text == refuses ? files.certificate : "") + ": " +
         error.message();
}

}  // namespace Agentd
