// The two servers that the endpoint's benchmark compares, over one plug-in in one process.
#pragma once

#include <boost/asio/basic_socket_acceptor.hpp>
#include <boost/asio/generic/stream_protocol.hpp>
#include <boost/asio/io_context.hpp>
#include <string>
#include <thread>
#include <vector>

#include "agentd/http/HttpServer.h"
#include "agentd/routes/Routes.h"
#include "agentd/tasks/TaskQueue.h"
#include "bench/EndpointClient.h"
#include "host/HostRuntime.h"
#include "host/KovaService.h"

namespace Bench {

// The agent as it is shipped, but for its command line: HTTP server, routes, tasks, gate and plug-in.
class AgentServer {
 public:
  AgentServer(const std::vector<Agentd::HttpAddress>& listen, Host::HostRuntime& runtime);
  // Clients must have gone, and their changes ended.
  ~AgentServer();
  AgentServer(const AgentServer&) = delete;
  AgentServer& operator=(const AgentServer&) = delete;

  // Of the listener of that place in the list, with the port that was found.
  Address At(std::size_t listener) const { return ToAddress(_server.Addresses().at(listener)); }

 private:
  Host::KovaService _service;
  Agentd::TaskQueue _tasks;
  Agentd::Router _router;
  Agentd::HttpServer _server;
  std::thread _run;
};

// What the HTTP library can do with nothing round it: a blocking thread per client that calls the query's
// hook, whatever it is asked, and sends the hook's text as it is. No limits, no routes, no gate.
class BareServer {
 public:
  BareServer(const Address& address, const Host::PluginHooks& hooks);
  // Clients must have gone.
  ~BareServer();
  BareServer(const BareServer&) = delete;
  BareServer& operator=(const BareServer&) = delete;

  Address At() const { return _acceptor.local_endpoint(); }

 private:
  using Protocol = boost::asio::generic::stream_protocol;

  void Accept();
  static void Serve(Protocol::socket& socket, const Host::PluginHooks& hooks);

  const Host::PluginHooks& _hooks;
  boost::asio::io_context _context;
  boost::asio::basic_socket_acceptor<Protocol> _acceptor;
  std::vector<std::thread> _clients;
  std::thread _run;
};

}  // namespace Bench
