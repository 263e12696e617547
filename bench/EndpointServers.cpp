#include "bench/EndpointServers.h"

#include <boost/asio/ip/tcp.hpp>
#include <boost/beast/core/flat_buffer.hpp>
#include <boost/beast/http.hpp>
#include <utility>

namespace Bench {

namespace asio = boost::asio;
namespace http = boost::beast::http;
using boost::system::error_code;

AgentServer::AgentServer(const std::vector<Agentd::HttpAddress>& listen, Host::HostRuntime& runtime)
    : _service(runtime.Hooks(), &runtime.GetMachine()),
      _router(_service, _tasks),
      // By that name clients reach it whatever port was found.
      _server(Agentd::HttpOptions{.listen = listen, .serverNames = {"localhost"}},
              [this](const Agentd::HttpRequest& request, const Agentd::HttpResponder& responder) {
                _router.Serve(request, responder);
              }),
      _run([this] { _server.Run(); }) {}

AgentServer::~AgentServer() {
  _server.Stop();
  _run.join();
}

BareServer::BareServer(const Address& address, const Host::PluginHooks& hooks)
    : _hooks(hooks), _acceptor(_context, address) {
  Accept();
  _run = std::thread([this] { _context.run(); });
}

BareServer::~BareServer() {
  _context.stop();
  _run.join();
  for (std::thread& client : _clients) {
    client.join();
  }
}

void BareServer::Accept() {
  _acceptor.async_accept([this](error_code error, Protocol::socket socket) {
    if (!error) {
      _clients.emplace_back([this, socket = std::move(socket)]() mutable { Serve(socket, _hooks); });
      Accept();
    }
  });
}

void BareServer::Serve(Protocol::socket& socket, const Host::PluginHooks& hooks) {
  boost::beast::flat_buffer buffer;
  error_code error;
  if (socket.local_endpoint().protocol().family() != AF_UNIX) {
    socket.set_option(asio::ip::tcp::no_delay(true));
  }
  for (;;) {
    http::request<http::string_body> request;
    http::read(socket, buffer, request, error);
    if (error) {
      return;
    }
    http::response<http::string_body> response(http::status::ok, request.version());
    response.set(http::field::content_type, "text/xml; charset=utf-8");
    std::vector<std::string> names;
    std::string fault;
    hooks.queryDisksForKova(names, fault, response.body());
    response.prepare_payload();
    http::write(socket, response, error);
    if (error) {
      return;
    }
  }
}

}  // namespace Bench
