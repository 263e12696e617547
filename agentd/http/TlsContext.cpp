#include "agentd/http/TlsContext.h"

#include <openssl/err.h>
#include <openssl/ssl.h>
#include <openssl/x509err.h>

#include <stdexcept>

namespace Agentd {
namespace {

namespace ssl = boost::asio::ssl;
using boost::system::error_code;

[[noreturn]] void Refuse(const std::string& what, const std::string& file, const std::string& reason) {
  throw std::runtime_error("cannot use " + what + " " + file + ": " + reason);
}

void Require(const error_code& error, const std::string& what, const std::string& file) {
  if (error) {
    Refuse(what, file, error.message());
  }
}

bool SaysThatKeysDiffer(const error_code& error) {
  const auto code = static_cast<unsigned long>(error.value());
  const int reason = ERR_GET_REASON(code);
  return ERR_GET_LIB(code) == ERR_LIB_X509 &&
         (reason == X509_R_KEY_VALUES_MISMATCH || reason == X509_R_KEY_TYPE_MISMATCH);
}

}  // namespace

ssl::context MakeTlsContext(ssl::context::method side) {
  ssl::context context(side);
  SSL_CTX_set_min_proto_version(context.native_handle(), TLS1_2_VERSION);
  return context;
}

void UseCertificate(ssl::context& context, const std::string& certificate, const std::string& key) {
  error_code error;
  context.use_certificate_chain_file(certificate, error);
  Require(error, "the certificate", certificate);
  context.use_private_key_file(key, ssl::context::pem, error);
  if (SaysThatKeysDiffer(error)) {
    Refuse("the key", key, "it is not that of the certificate " + certificate);
  }
  Require(error, "the key", key);
}

void UseCa(ssl::context& context, const std::string& ca, const char* whose) {
  error_code error;
  context.load_verify_file(ca, error);
  Require(error, std::string("the CA ") + whose, ca);
}

}  // namespace Agentd
