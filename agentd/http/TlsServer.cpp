#include "agentd/http/TlsServer.h"

#include <openssl/ssl.h>
#include <openssl/x509v3.h>

#include <memory>

#include "agentd/http/TlsContext.h"

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

// No session outlives its connection: what a certificate was worth is found out anew each time.
void ForgetSessions(SSL_CTX* context) {
  SSL_CTX_set_session_cache_mode(context, SSL_SESS_CACHE_OFF);
  SSL_CTX_set_num_tickets(context, 0);
  SSL_CTX_set_options(context, SSL_OP_NO_TICKET | SSL_OP_NO_RENEGOTIATION);
}

}  // namespace

ssl::context MakeTlsContext(const TlsFiles& files) {
  ssl::context context = MakeTlsContext(ssl::context::tls_server);
  ForgetSessions(context.native_handle());
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
