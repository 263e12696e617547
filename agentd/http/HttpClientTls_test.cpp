#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <openssl/ssl.h>

#include <boost/asio/io_context.hpp>
#include <boost/asio/ip/tcp.hpp>
#include <boost/asio/read.hpp>
#include <boost/asio/ssl/context.hpp>
#include <boost/asio/ssl/stream.hpp>
#include <functional>
#include <thread>

#include "agentd/http/HttpClient.h"
#include "agentd/testing/Certificates.h"
#include "agentd/testing/RunningServer.h"

namespace Agentd {
namespace {

namespace asio = boost::asio;
using boost::system::error_code;
using testing::AllOf;
using Testing::Certificates;
using testing::HasSubstr;
using Testing::RunningServer;

const HttpAddress anyPort{false, "127.0.0.1", 0};

// Whom the server takes the client for.
HttpAnswer Whoami(const HttpRequest& request) {
  return {200, "text/plain", std::string(NameOf(request.peer.role)) + " " + request.body};
}

// A CA, strangers of another, and a server of that address and of a name.
class HttpClientTls : public testing::Test {
 protected:
  static void SetUpTestSuite() {
    _certificates = std::make_unique<Certificates>();
    _certificates->MakeCa("ca");
    _certificates->MakeCa("strangers");
    _certificates->Issue("server", "ca", "IP:127.0.0.1,DNS:localhost");
    _certificates->Issue("operator", "ca", "DNS:operator");
  }
  static void TearDownTestSuite() { _certificates.reset(); }

  static const Certificates& Made() { return *_certificates; }

  static HttpOptions Serving(const std::string& server) {
    HttpOptions options{.listen = {anyPort}, .tls = Made().ServerFiles(server, "ca")};
    options.access.change.names = {"operator"};
    return options;
  }
  static HttpAddress ByTls(HttpAddress address, const std::string& place = "127.0.0.1") {
    return {false, place, address.port, true};
  }
  static TlsClientFiles TrustOnly(const std::string& ca) { return {.ca = Made().Pem(ca)}; }
  static TlsClientFiles As(const std::string& client) {
    return {.ca = Made().Pem("ca"), .certificate = Made().Pem(client), .key = Made().Key(client)};
  }

  static std::string Ask(const HttpAddress& address, const TlsClientFiles& files,
                         const std::string& body = "") {
    return Exchange(address, {"POST", "/", "text/plain", body}, std::chrono::seconds(60), files).body;
  }
  // What is said of TLS that came to nothing.
  static std::string WhyNot(const HttpAddress& address, const TlsClientFiles& files) {
    try {
      return "the answer was " + Ask(address, files);
    } catch (const TlsError& error) {
      return error.what();
    }
  }
  // The same, of a server with that certificate.
  static std::string WhyNotOf(const std::string& server, const TlsClientFiles& files) {
    RunningServer running(Serving(server), &Whoami);
    return WhyNot(ByTls(running.Address()), files);
  }

 private:
  inline static std::unique_ptr<Certificates> _certificates;
};

// Accepts one client of TLS, as strictly as it is told, and hears it out.
class StrictServer {
 public:
  using Stream = asio::ssl::stream<asio::ip::tcp::socket>;

  StrictServer(const TlsFiles& files, const std::function<void(SSL_CTX*)>& configure)
      : _context(asio::ssl::context::tls_server),
        _acceptor(_network, {asio::ip::make_address("127.0.0.1"), 0}) {
    _context.use_certificate_chain_file(files.certificate);
    _context.use_private_key_file(files.key, asio::ssl::context::pem);
    _context.load_verify_file(files.clientCa);
    configure(_context.native_handle());
    _thread = std::thread([this] { Serve(); });
  }
  ~StrictServer() { _thread.join(); }
  StrictServer(const StrictServer&) = delete;
  StrictServer& operator=(const StrictServer&) = delete;

  HttpAddress Address() const { return {false, "127.0.0.1", _acceptor.local_endpoint().port(), true}; }

 private:
  void Serve() {
    Stream stream(_acceptor.accept(), _context);
    error_code ignored;
    stream.handshake(Stream::server, ignored);
    stream.next_layer().shutdown(asio::ip::tcp::socket::shutdown_send, ignored);
    char byte = 0;
    while (!ignored || ignored != asio::error::eof) {
      stream.next_layer().read_some(asio::buffer(&byte, 1), ignored);
    }
  }

  asio::io_context _network;
  asio::ssl::context _context;
  asio::ip::tcp::acceptor _acceptor;
  std::thread _thread;
};

void DemandCertificate(SSL_CTX* context, int version) {
  SSL_CTX_set_max_proto_version(context, version);
  SSL_CTX_set_verify(context, SSL_VERIFY_PEER | SSL_VERIFY_FAIL_IF_NO_PEER_CERT, nullptr);
}

TEST_F(HttpClientTls, AsksAndIsKnownByItsCertificate) {
  RunningServer server(Serving("server"), &Whoami);
  const std::string body(std::size_t{3} << 20, 'b');
  EXPECT_EQ(Ask(ByTls(server.Address()), As("operator"), body), "change " + body);
  EXPECT_EQ(Ask(ByTls(server.Address()), TrustOnly("ca")), "none ");
}

TEST_F(HttpClientTls, IsKnownToHaveComeByTls) {
  RunningServer server(Serving("server"), [](const HttpRequest& request) {
    return HttpAnswer{200, "text/plain", request.scheme + "://" + request.authority};
  });
  EXPECT_EQ(Ask(ByTls(server.Address()), TrustOnly("ca")), "https://" + server.Address().Name());
}

TEST_F(HttpClientTls, FindsAServerByItsName) {
  RunningServer server(Serving("server"), &Whoami);
  EXPECT_EQ(Ask(ByTls(server.Address(), "localhost"), TrustOnly("ca")), "none ");
  try {
    Ask(ByTls(server.Address(), "no-such-host.invalid"), TrustOnly("ca"));
    ADD_FAILURE() << "somebody answered";
  } catch (const ConnectionError& error) {
    EXPECT_THAT(error.what(), HasSubstr("nobody knows where 'no-such-host.invalid' is"));
  }
}

TEST_F(HttpClientTls, TrustsOnlyServersOfTheCa) {
  EXPECT_THAT(WhyNotOf("server", TrustOnly("strangers")),
              AllOf(HasSubstr("the certificate of the agent on 127.0.0.1:"),
                    HasSubstr("is not of the CA " + Made().Pem("strangers"))));
  EXPECT_THAT(WhyNotOf("server", {}), HasSubstr("is of no CA that this host trusts"));
  Made().Issue("forged", "strangers", "IP:127.0.0.1");
  EXPECT_THAT(WhyNotOf("forged", TrustOnly("ca")), HasSubstr("is not of the CA " + Made().Pem("ca")));
}

TEST_F(HttpClientTls, TrustsOnlyServersOfTheNameItAsksFor) {
  Made().Issue("elsewhere", "ca", "DNS:127.0.0.1,DNS:*.example,IP:127.0.0.2");
  EXPECT_THAT(WhyNotOf("elsewhere", TrustOnly("ca")), HasSubstr("is not for '127.0.0.1'"));
  Made().Issue("localhost", "ca", "DNS:other.example");  // its common name is no name of a host
  RunningServer server(Serving("localhost"), &Whoami);
  EXPECT_THAT(WhyNot(ByTls(server.Address(), "localhost"), TrustOnly("ca")),
              HasSubstr("is not for 'localhost'"));
}

TEST_F(HttpClientTls, TrustsNoCertificateBeyondItsTime) {
  Made().Issue("expired", "ca", "IP:127.0.0.1", "-1");
  EXPECT_THAT(WhyNotOf("expired", TrustOnly("ca")),
              AllOf(HasSubstr("cannot be trusted"), HasSubstr("certificate has expired")));
}

TEST_F(HttpClientTls, SaysThatTheServerDoesNotSpeakTls) {
  RunningServer server({.listen = {anyPort}}, &Whoami);
  EXPECT_THAT(WhyNot(ByTls(server.Address()), TrustOnly("ca")),
              AllOf(HasSubstr("the agent on 127.0.0.1:"), HasSubstr("does not speak TLS: ")));
}

TEST_F(HttpClientTls, GuessesThatAServerWhichHangsUpSpeaksTls) {
  RunningServer server(Serving("server"), &Whoami);
  try {
    Ask(server.Address(), {});
    ADD_FAILURE() << "there was an answer";
  } catch (const ConnectionError& error) {
    EXPECT_THAT(error.what(), HasSubstr("its address is tls:127.0.0.1:"));
  }
}

TEST_F(HttpClientTls, SaysThatTheServerSpeaksOnlyWhatIsTooOld) {
  const StrictServer server(Made().ServerFiles("server", "ca"), [](SSL_CTX* context) {
    SSL_CTX_set_cipher_list(context, "DEFAULT@SECLEVEL=0");
    SSL_CTX_set_max_proto_version(context, TLS1_1_VERSION);
  });
  EXPECT_THAT(WhyNot(server.Address(), TrustOnly("ca")), HasSubstr("does not speak TLS 1.2 or newer"));
}

TEST_F(HttpClientTls, SaysThatTheServerWantsACertificate) {
  for (const int version : {TLS1_2_VERSION, TLS1_3_VERSION}) {
    const StrictServer server(Made().ServerFiles("server", "ca"),
                              [version](SSL_CTX* context) { DemandCertificate(context, version); });
    EXPECT_THAT(WhyNot(server.Address(), TrustOnly("ca")), HasSubstr("wants a certificate")) << version;
  }
}

TEST_F(HttpClientTls, SaysThatTheServerRefusesItsCertificate) {
  for (const int version : {TLS1_2_VERSION, TLS1_3_VERSION}) {
    const StrictServer server(Made().ServerFiles("server", "strangers"),
                              [version](SSL_CTX* context) { DemandCertificate(context, version); });
    EXPECT_THAT(WhyNot(server.Address(), As("operator")),
                AllOf(HasSubstr("refuses the client's certificate " + Made().Pem("operator")),
                      HasSubstr("unknown ca")))
        << version;
  }
}

struct FilesCase {
  TlsClientFiles files;
  std::string refusal;
};

TEST_F(HttpClientTls, NamesAFileThatItCannotUse) {
  TlsClientFiles otherKey = As("operator");
  otherKey.key = Made().Key("server");
  for (const FilesCase& row :
       {FilesCase{{.ca = "/none/ca"}, "cannot use the CA of the agent /none/ca: "},
        FilesCase{{.ca = Made().Key("ca")}, "cannot use the CA of the agent " + Made().Key("ca")},
        FilesCase{{.certificate = "/none/c", .key = "/none/k"}, "cannot use the certificate /none/c: "},
        FilesCase{{.certificate = Made().Pem("operator"), .key = "/none/k"}, "cannot use the key /none/k: "},
        FilesCase{otherKey, "cannot use the key " + Made().Key("server") +
                                ": it is not that of the certificate " + Made().Pem("operator")}}) {
    try {
      Ask({false, "127.0.0.1", 1, true}, row.files);
      ADD_FAILURE() << row.refusal;
    } catch (const ConnectionError&) {
      ADD_FAILURE() << "it went to the agent: " << row.refusal;
    } catch (const std::runtime_error& refused) {
      EXPECT_THAT(refused.what(), HasSubstr(row.refusal));
    }
  }
}

}  // namespace
}  // namespace Agentd
