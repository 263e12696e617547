// The management API of an agent, over a socket, TLS or TCP: objects in, objects out.
#pragma once

#include <chrono>
#include <stdexcept>
#include <string>
#include <string_view>

#include "agentd/http/HttpClient.h"
#include "host/ManagementApi.h"

namespace Agentd {

// The agent answers what has no room for a fault with one: the reader of tasks may not read them, a task is
// forgotten. The text is the fault's in a line.
class RefusedByAgent : public std::runtime_error {
 public:
  explicit RefusedByAgent(Tessa::Ref<Orbis::MethodFault> fault);
  const Orbis::MethodFault& GetFault() const { return *_fault; }

 private:
  Tessa::Ref<Orbis::MethodFault> _fault;
};

// A change is waited for as long as it takes, within a day; a query for ten minutes.
//
// Threads: any; every call has a connection of its own. Errors: ConnectionError when the agent cannot be
// reached, AnswerError when it refuses the connection, does not answer in the form it should, or does not
// serve what it is asked. A fault of the gate, or Busy, is an answer like any other; only what answers with a
// text throws RefusedByAgent.
class AgentClient final : public Host::ManagementApi {
 public:
  // A URL: "unix:/run/kova/agentd.sock", "tls:kova.example:9443" or "tcp:127.0.0.1:8080". Throws
  // std::invalid_argument for any other. The files are for TLS, and read by each call, which throws
  // std::runtime_error where they cannot be used.
  explicit AgentClient(const std::string& url, TlsClientFiles files = {});

  Host::Answer Query(const Nox::Operation::Query& request) const override;
  // Neither result nor fault where the request says not to wait.
  Host::Answer Change(Nox::Operation::Change&& request) const override;
  // Throws Host::HostError when the agent's host is not simulated.
  std::string DescribeHost() const override;
  Host::Answer ChangeHost(const std::string& change) const override;

  // What became of the requests that changed disks, as the agent writes it: {"tasks": [..]}.
  std::string Tasks() const;
  // One of them, with its result.
  std::string Task(const std::string& id) const;

 private:
  Host::Answer Ask(const Orbis::DataObject& request, std::chrono::milliseconds patience) const;
  Host::Answer Post(std::string_view operation, const std::string& body,
                    const Orbis::TypeDescriptor* resultType, std::chrono::milliseconds patience) const;
  // The body. Throws RefusedByAgent for a fault in its place.
  std::string Get(const std::string& target) const;
  void RequireJson(const HttpAnswer& http) const;
  Host::Answer Read(const HttpAnswer& http, const Orbis::TypeDescriptor* resultType) const;

  HttpAddress _address;
  TlsClientFiles _files;
};

}  // namespace Agentd
