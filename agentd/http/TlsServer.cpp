#include "agentd/http/TlsServer.h"

#include <openssl/ssl.h>
#include <openssl/x509v3.h>

#include <memory>
#include <stdexcept>

#include "agentd/http/TlsContext.h"
#include "agentd/http/TlsSessions.h"

namespace Agentd {
namespace {

namespace ssl = boost::asio::ssl;

// Empty for what is no text. A byte of zero stays in the name, which then equals no other.
std::string ToText(const ASN1_STRING* value) {
  unsigned char* bytes = nullptr;
  const int length = ASN1_STRING_to_UTF8(&bytes, value);
  if (length < 0) {
    return "";
  }
  const std::string text(reinterpret_cast<const char*>(bytes), static_cast<std::size_t>(length));
  OPENSSL_free(bytes);
  return text;
}

void AddCommonNames(const X509* certificate, std::vector<std::string>& names) {
  const X509_NAME* const subject = X509_get_subject_name(certificate);
  int at = -1;
  while ((at = X509_NAME_get_index_by_NID(subject, NID_commonName, at)) >= 0) {
    names.push_back(ToText(X509_NAME_ENTRY_get_data(X509_NAME_get_entry(subject, at))));
  }
}

void AddDnsNames(const X509* certificate, std::vector<std::string>& names) {
  const std::unique_ptr<GENERAL_NAMES, decltype(&GENERAL_NAMES_free)> all(
      static_cast<GENERAL_NAMES*>(X509_get_ext_d2i(certificate, NID_subject_alt_name, nullptr, nullptr)),
      &GENERAL_NAMES_free);
  for (int i = 0; all && i < sk_GENERAL_NAME_num(all.get()); ++i) {
    const GENERAL_NAME* const name = sk_GENERAL_NAME_value(all.get(), i);
    if (name->type == GEN_DNS) {
      names.push_back(ToText(name->d.dNSName));
    }
  }
}

// Of TLS 1.2, only what keeps a recorded conversation closed when the server's key is found later, and cannot
// be changed under way. What 1.3 has is all of that kind.
constexpr const char* suites12 =
    "ECDHE-ECDSA-AES256-GCM-SHA384:ECDHE-RSA-AES256-GCM-SHA384:"
    "ECDHE-ECDSA-CHACHA20-POLY1305:ECDHE-RSA-CHACHA20-POLY1305:"
    "ECDHE-ECDSA-AES128-GCM-SHA256:ECDHE-RSA-AES128-GCM-SHA256";
constexpr const char* groups = "X25519:P-256:P-384:P-521";

void ChooseSuites(SSL_CTX* context) {
  if (SSL_CTX_set_cipher_list(context, suites12) != 1 || SSL_CTX_set1_groups_list(context, groups) != 1) {
    throw std::runtime_error("this system's library lacks every suite of TLS that the agent speaks");
  }
  SSL_CTX_set_options(context,
                      SSL_OP_CIPHER_SERVER_PREFERENCE | SSL_OP_NO_RENEGOTIATION | SSL_OP_NO_COMPRESSION);
}

}  // namespace

ssl::context MakeTlsContext(const TlsFiles& files) {
  ssl::context context = MakeTlsContext(ssl::context::tls_server);
  ChooseSuites(context.native_handle());
  ResumeSessions(context.native_handle());
  UseCertificate(context, files.certificate, files.key);
  UseCa(context, files.clientCa, "of clients");
  // Tells clients whose certificates are wanted.
  SSL_CTX_set_client_CA_list(context.native_handle(), SSL_load_client_CA_file(files.clientCa.c_str()));
  context.set_verify_mode(ssl::verify_peer);
  return context;
}

std::vector<std::string> CertificateNames(const SSL* session) {
  const X509* const certificate = SSL_get0_peer_certificate(session);
  if (certificate == nullptr || SSL_get_verify_result(session) != X509_V_OK) {
    return {};
  }
  std::vector<std::string> names;
  AddCommonNames(certificate, names);
  AddDnsNames(certificate, names);
  return names.empty() ? std::vector<std::string>{""} : names;
}

}  // namespace Agentd
