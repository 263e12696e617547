#include "agentd/routes/Metrics.h"

#include <cstdio>

#include "host/Build.h"

namespace Agentd {
namespace {

// What stands before the values of a metric.
void Describe(std::string& text, const char* name, const char* type, const char* help) {
  text += std::string("# HELP ") + name + " " + help + "\n# TYPE " + name + " " + type + "\n";
}

void WriteOne(std::string& text, const char* name, const char* help, std::size_t value) {
  Describe(text, name, "gauge", help);
  text += std::string(name) + " " + std::to_string(value) + "\n";
}

// One of several values of a metric that one label tells apart.
void WriteOf(std::string& text, const char* name, const char* label, std::string_view value,
             std::size_t count) {
  text.append(name).append("{").append(label).append("=\"").append(value).append("\"} ");
  text += std::to_string(count) + "\n";
}

std::string Seconds(Metrics::Time time) {
  char text[32];
  std::snprintf(text, sizeof text, "%.9f", std::chrono::duration<double>(time).count());
  return text;
}

void WriteBuild(std::string& text) {
  Describe(text, "kova_agent_info", "gauge", "What the agent is; always 1.");
  text += "kova_agent_info{version=\"" + std::string(Host::Version()) + "\",build=\"" +
          std::string(Host::BuildId()) + "\",api=\"" + std::string(Host::ApiVersion()) + "\"} 1\n";
}

void WriteOutcomes(std::string& text, const char* name, const char* help, const OutcomeCounts& ended) {
  Describe(text, name, "counter", help);
  for (const Host::Outcome outcome : OutcomeCounts::all) {
    WriteOf(text, name, "outcome", Host::NameOf(outcome), ended.Of(outcome));
  }
}

void WriteQueues(std::string& text, const MetricsNow& now) {
  WriteOutcomes(text, "kova_agent_changes_total", "Changes that have ended, by outcome.", now.changes.ended);
  WriteOne(text, "kova_agent_changes_running", "Changes at work: 0 or 1.", now.changes.running);
  WriteOne(text, "kova_agent_changes_waiting", "Changes that wait for their turn.", now.changes.waiting);
  WriteOutcomes(text, "kova_agent_queries_total", "Queries that have ended, by outcome.", now.queries.ended);
  WriteOne(text, "kova_agent_queries_running", "Queries at work.", now.queries.running);
  WriteOne(text, "kova_agent_queries_waiting", "Queries that wait for a place.", now.queries.waiting);
}

void WriteHost(std::string& text, const HostCounts& host) {
  constexpr const char* disks = "kova_disks";
  Describe(text, disks, "gauge", "Disks of the host by state, when it last told.");
  WriteOf(text, disks, "state", "inUse", host.disksInUse);
  WriteOf(text, disks, "state", "eligible", host.disksEligible);
  WriteOf(text, disks, "state", "ineligible", host.disksIneligible);
  constexpr const char* groups = "kova_disk_groups";
  Describe(text, groups, "gauge", "Disk groups of the host by state, when it last told.");
  WriteOf(text, groups, "state", "mounted", host.groupsMounted);
  WriteOf(text, groups, "state", "unmounted", host.groupsUnmounted);
  constexpr const char* age = "kova_host_age_seconds";
  Describe(text, age, "gauge", "Time since the host told of its disks and groups.");
  text += std::string(age) + " " + Seconds(host.age) + "\n";
}

}  // namespace

void Metrics::Count(std::string_view route, unsigned status, Time time) {
  const double seconds = std::chrono::duration<double>(time).count();
  const std::lock_guard guard(_mutex);
  ++_requests[{std::string(route), status}];
  auto found = _times.find(route);
  if (found == _times.end()) {
    found = _times.emplace(std::string(route), Times()).first;
  }
  Times& times = found->second;
  for (std::size_t i = 0; i < buckets.size(); ++i) {
    times.atMost[i] += seconds <= buckets[i].seconds ? 1 : 0;
  }
  ++times.count;
  times.sum += time;
}

std::string Metrics::Text(const MetricsNow& now) const {
  std::string text;
  WriteBuild(text);
  WriteCounted(text);
  WriteQueues(text, now);
  if (now.host) {
    WriteHost(text, *now.host);
  }
  return text;
}

void Metrics::WriteCounted(std::string& text) const {
  const std::lock_guard guard(_mutex);
  Describe(text, "kova_agent_requests_total", "counter", "Requests answered, by route and status.");
  for (const auto& [key, count] : _requests) {
    text += "kova_agent_requests_total{route=\"" + key.first + "\",status=\"" + std::to_string(key.second) +
            "\"} " + std::to_string(count) + "\n";
  }
  Describe(text, "kova_agent_request_seconds", "histogram", "Time until requests were answered, by route.");
  for (const auto& [route, times] : _times) {
    WriteTimes(text, route, times);
  }
}

void Metrics::WriteTimes(std::string& text, const std::string& route, const Times& times) {
  const std::string name = "kova_agent_request_seconds";
  const std::string label = "{route=\"" + route + "\"";
  const std::string total = std::to_string(times.count) + "\n";
  for (std::size_t i = 0; i < buckets.size(); ++i) {
    text.append(name).append("_bucket").append(label).append(",le=\"").append(buckets[i].text).append("\"} ");
    text += std::to_string(times.atMost[i]) + "\n";
  }
  text += name + "_bucket" + label + ",le=\"+Inf\"} " + total;
  text += name + "_sum" + label + "} " + Seconds(times.sum) + "\n";
  text += name + "_count" + label + "} " + total;
}

}  // namespace Agentd
