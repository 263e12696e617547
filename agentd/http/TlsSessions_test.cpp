#include "agentd/http/TlsSessions.h"

#include <gtest/gtest.h>
#include <openssl/bio.h>
#include <openssl/x509_vfy.h>

#include <boost/asio/ssl/context.hpp>
#include <ctime>
#include <functional>
#include <memory>
#include <string>
#include <vector>

#include "agentd/http/TlsServer.h"
#include "agentd/testing/Certificates.h"

namespace Agentd {
namespace {

template <class Type, void (*release)(Type*)>
struct Released {
  void operator()(Type* owned) const { release(owned); }
};
using Context = std::unique_ptr<SSL_CTX, Released<SSL_CTX, &SSL_CTX_free>>;
using Stream = std::unique_ptr<SSL, Released<SSL, &SSL_free>>;
using Kept = std::unique_ptr<SSL_SESSION, Released<SSL_SESSION, &SSL_SESSION_free>>;

// How a conversation went.
struct Handshake {
  bool done = false;
  bool resumed = false;
  std::vector<std::string> names = {};  // that the server knows its client by
  Kept kept = nullptr;                  // what the client may come back with
};

// Lets both sides talk for as long as they have something to say. Without a network.
void Connect(SSL* near, SSL* far) {
  BIO* nearEnd = nullptr;
  BIO* farEnd = nullptr;
  BIO_new_bio_pair(&nearEnd, 1 << 16, &farEnd, 1 << 16);
  SSL_set_bio(near, nearEnd, nearEnd);
  SSL_set_bio(far, farEnd, farEnd);
  SSL_set_connect_state(near);
  SSL_set_accept_state(far);
  for (int step = 0; step < 10; ++step) {
    SSL_do_handshake(near);
    SSL_do_handshake(far);
  }
}

class TlsSessions : public testing::TestWithParam<int> {
 protected:
  static void SetUpTestSuite() {
    _certificates = std::make_unique<Testing::Certificates>();
    _certificates->MakeCa("ca");
    _certificates->Issue("server", "ca", "DNS:server");
    _certificates->Issue("operator", "ca", "DNS:desk");
  }
  static void TearDownTestSuite() { _certificates.reset(); }

  TlsSessions() : _server(MakeTlsContext(_certificates->ServerFiles("server", "ca"))) {
    RenewTicketSecret(Server());
  }

  SSL_CTX* Server() { return _server.native_handle(); }

  static Context Client(const std::string& certificate) {
    Context context(SSL_CTX_new(TLS_client_method()));
    SSL_CTX_set_max_proto_version(context.get(), GetParam());
    if (!certificate.empty()) {
      SSL_CTX_use_certificate_file(context.get(), _certificates->Pem(certificate).c_str(), SSL_FILETYPE_PEM);
      SSL_CTX_use_PrivateKey_file(context.get(), _certificates->Key(certificate).c_str(), SSL_FILETYPE_PEM);
    }
    return context;
  }

  Handshake Meet(SSL_CTX* client, SSL_SESSION* kept = nullptr) {
    const Stream near(SSL_new(client));
    const Stream far(SSL_new(Server()));
    if (kept != nullptr) {
      SSL_set_session(near.get(), kept);
    }
    Connect(near.get(), far.get());
    char byte = 0;
    SSL_read(near.get(), &byte, 1);  // takes the tickets
    Handshake handshake{.done = SSL_is_init_finished(near.get()) == 1 && SSL_is_init_finished(far.get()) == 1,
                        .resumed = SSL_session_reused(far.get()) == 1};
    if (handshake.done) {
      handshake.names = CertificateNames(far.get());
      handshake.kept.reset(SSL_get1_session(near.get()));
    }
    SSL_shutdown(near.get());
    return handshake;
  }

  // What becomes of a client that comes back when the server has changed so.
  Handshake ComeBackAfter(const std::function<void()>& change) {
    const Context client = Client("operator");
    const Handshake first = Meet(client.get());
    EXPECT_TRUE(first.done);
    EXPECT_FALSE(first.resumed);
    change();
    return Meet(client.get(), first.kept.get());
  }

  inline static std::unique_ptr<Testing::Certificates> _certificates;
  boost::asio::ssl::context _server;
};

const std::vector<std::string> operatorsNames = {"operator", "desk"};

TEST_P(TlsSessions, AClientThatComesBackIsSparedTheHandshakeAndKnownAsBefore) {
  const Handshake again = ComeBackAfter([] {});
  EXPECT_TRUE(again.done);
  EXPECT_TRUE(again.resumed);
  EXPECT_EQ(again.names, operatorsNames);
}

TEST_P(TlsSessions, AndMayComeBackAgain) {
  const Context client = Client("operator");
  Handshake last = Meet(client.get());
  for (int i = 0; i < 3; ++i) {
    last = Meet(client.get(), last.kept.get());
    EXPECT_TRUE(last.resumed) << i;
  }
  EXPECT_EQ(last.names, operatorsNames);
}

TEST_P(TlsSessions, AClientWithoutACertificateComesBackAsNobody) {
  const Context client = Client("");
  const Handshake first = Meet(client.get());
  const Handshake again = Meet(client.get(), first.kept.get());
  EXPECT_TRUE(again.resumed);
  EXPECT_TRUE(again.names.empty());
}

TEST_P(TlsSessions, ACertificateThatHasExpiredSinceIsNotGoodByItsTicket) {
  const Handshake again = ComeBackAfter([this] {
    const std::unique_ptr<X509_VERIFY_PARAM, decltype(&X509_VERIFY_PARAM_free)> later(
        X509_VERIFY_PARAM_new(), &X509_VERIFY_PARAM_free);
    X509_VERIFY_PARAM_set_time(later.get(), std::time(nullptr) + 3 * 24 * 3600);
    X509_STORE_set1_param(SSL_CTX_get_cert_store(Server()), later.get());
  });
  EXPECT_FALSE(again.resumed);
}

TEST_P(TlsSessions, ACertificateOfACaThatIsTrustedNoMoreIsNotGoodByItsTicket) {
  const Handshake again = ComeBackAfter([this] { SSL_CTX_set_cert_store(Server(), X509_STORE_new()); });
  EXPECT_FALSE(again.resumed);
  EXPECT_FALSE(again.done) << "shown again, it is refused";
}

TEST_P(TlsSessions, ATicketEndsWithTheSecretThatItWasSealedWith) {
  const Handshake again = ComeBackAfter([this] { RenewTicketSecret(Server()); });
  EXPECT_TRUE(again.done);
  EXPECT_FALSE(again.resumed);
  EXPECT_EQ(again.names, operatorsNames);
}

TEST_P(TlsSessions, ATicketEndsWithTheLifeOfItsSession) {
  const Handshake again = ComeBackAfter([this] { ResumeSessions(Server(), std::chrono::seconds(-1)); });
  EXPECT_TRUE(again.done);
  EXPECT_FALSE(again.resumed);
}

// Whether a client that offers only these suites, with such a certificate of the server, is spoken to, and
// with which.
std::string SuiteOf(const Testing::Certificates& certificates, const std::string& server,
                    const char* offered) {
  auto context = MakeTlsContext(certificates.ServerFiles(server, "ca"));
  const Context client(SSL_CTX_new(TLS_client_method()));
  SSL_CTX_set_max_proto_version(client.get(), TLS1_2_VERSION);
  if (SSL_CTX_set_cipher_list(client.get(), offered) != 1) {
    return "the client does not know it";
  }
  const Stream near(SSL_new(client.get()));
  const Stream far(SSL_new(context.native_handle()));
  Connect(near.get(), far.get());
  return SSL_is_init_finished(far.get()) == 1 ? SSL_get_cipher_name(far.get()) : "none";
}

TEST(TlsSuites, KeepWhatWasRecordedClosedAndAreTheServersChoice) {
  const Testing::Certificates certificates;
  certificates.MakeCa("ca");
  certificates.Issue("ec", "ca", "DNS:server");
  certificates.Issue("rsa", "ca", "DNS:server", "2", Testing::Certificates::newRsaKey);
  for (const char* old : {"AES256-GCM-SHA384", "AES128-SHA", "ECDHE-RSA-AES128-SHA",
                          "ECDHE-RSA-AES256-SHA384", "DHE-RSA-AES128-GCM-SHA256"}) {
    EXPECT_EQ(SuiteOf(certificates, "rsa", old), "none") << old;
  }
  for (const char* old : {"ECDHE-ECDSA-AES128-SHA", "ECDHE-ECDSA-AES256-SHA384"}) {
    EXPECT_EQ(SuiteOf(certificates, "ec", old), "none") << old;
  }
  for (const std::string kind : {"rsa", "ec"}) {
    const std::string prefix = kind == "rsa" ? "ECDHE-RSA-" : "ECDHE-ECDSA-";
    for (const char* suite : {"AES128-GCM-SHA256", "CHACHA20-POLY1305", "AES256-GCM-SHA384"}) {
      EXPECT_EQ(SuiteOf(certificates, kind, (prefix + suite).c_str()), prefix + suite);
    }
    EXPECT_EQ(
        SuiteOf(certificates, kind, (prefix + "AES128-GCM-SHA256:" + prefix + "AES256-GCM-SHA384").c_str()),
        prefix + "AES256-GCM-SHA384")
        << "the client would take the other";
  }
}

INSTANTIATE_TEST_SUITE_P(Versions, TlsSessions, testing::Values(TLS1_2_VERSION, TLS1_3_VERSION),
                         [](const auto& row) { return row.param == TLS1_2_VERSION ? "Tls12" : "Tls13"; });

}  // namespace
}  // namespace Agentd
