#include "agentd/routes/Metrics.h"

#include <cstdio>

namespace Agentd {
namespace {

// What stands before the values of a metric.
void Describe(std::string& text, const char* name, const char* type, const char* help) {
  text += std::string("# HELP ") + name + " " + help + "\n# TYPE " + name + " " + type + "\n";
}

void WriteOne(std::string& text, const char* name, const char* type, const char* help, std::size_t value) {
  Describe(text, name, type, help);
  text += std::string(name) + " " + std::to_string(value) + "\n";
}

std::string Seconds(Metrics::Time time) {
  char text[32];
  std::snprintf(text, sizeof text, "%.9f", std::chrono::duration<double>(time).count());
  return text;
}

}  // namespace

void Metrics::Count(std::string_view route, unsigned status, Time time) {
  const std::lock_guard guard(_mutex);
  ++_requests[{std::string(route), status}];
  auto found = _times.find(route);
  if (found == _times.end()) {
    found = _times.emplace(std::string(route), std::pair<Time, unsigned long>()).first;
  }
  found->second.first += time;
  ++found->second.second;
}

std::string Metrics::Text(const TaskQueue::Load& changes, const QueryQueue::Load& queries) const {
  std::string text;
  {
    const std::lock_guard guard(_mutex);
    Describe(text, "kova_agent_requests_total", "counter", "Requests answered, by route and status.");
    for (const auto& [key, count] : _requests) {
      text += "kova_agent_requests_total{route=\"" + key.first + "\",status=\"" + std::to_string(key.second) +
              "\"} " + std::to_string(count) + "\n";
    }
    Describe(text, "kova_agent_request_seconds", "summary", "Time until requests were answered, by route.");
    for (const auto& [route, time] : _times) {
      const std::string labels = "{route=\"" + route + "\"} ";
      text += "kova_agent_request_seconds_sum" + labels + Seconds(time.first) + "\n";
      text += "kova_agent_request_seconds_count" + labels + std::to_string(time.second) + "\n";
    }
  }
  Describe(text, "kova_agent_changes_total", "counter", "Changes that have ended, by outcome.");
  text += "kova_agent_changes_total{outcome=\"done\"} " + std::to_string(changes.done) + "\n";
  text += "kova_agent_changes_total{outcome=\"failed\"} " + std::to_string(changes.failed) + "\n";
  WriteOne(text, "kova_agent_changes_running", "gauge", "Changes at work: 0 or 1.", changes.running);
  WriteOne(text, "kova_agent_changes_waiting", "gauge", "Changes that wait for their turn.", changes.waiting);
  WriteOne(text, "kova_agent_queries_running", "gauge", "Queries at work.", queries.running);
  WriteOne(text, "kova_agent_queries_waiting", "gauge", "Queries that wait for a place.", queries.waiting);
  return text;
}

}  // namespace Agentd
