#include "agentd/routes/DoorMetrics.h"

namespace Agentd {
namespace {

void Describe(std::string& text, const char* name, const char* type, const char* help) {
  text += std::string("# HELP ") + name + " " + help + "\n# TYPE " + name + " " + type + "\n";
}

// A path of a socket may hold anything.
std::string Quoted(const std::string& value) {
  std::string quoted = "\"";
  for (const char byte : value) {
    if (byte == '\n') {
      quoted += "\\n";
      continue;
    }
    if (byte == '"' || byte == '\\') {
      quoted.push_back('\\');
    }
    quoted.push_back(byte);
  }
  return quoted + "\"";
}

}  // namespace

std::string DescribeDoors(const HttpLoad& load) {
  std::string text;
  const char* name = "kova_agent_connections";
  Describe(text, name, "gauge", "Connections that are served, by the address that they came to.");
  for (const HttpLoad::Listener& listener : load.listeners) {
    text += std::string(name) + "{listener=" + Quoted(listener.address) + "} " +
            std::to_string(listener.connections) + "\n";
  }
  name = "kova_agent_refusals_total";
  Describe(text, name, "counter", "Clients that were turned away before they were heard, by cause.");
  for (std::size_t kind = 0; kind < httpRefusals.size(); ++kind) {
    text += std::string(name) + "{cause=\"" + std::string(httpRefusals[kind].name) + "\"} " +
            std::to_string(load.refused[kind]) + "\n";
  }
  name = "kova_agent_body_bytes";
  Describe(text, name, "gauge", "Memory held for bodies that are read or wait to be handled.");
  return text + name + " " + std::to_string(load.bodyBytes) + "\n";
}

}  // namespace Agentd
