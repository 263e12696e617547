#include "kovactl/sim/SimCommand.h"

#include <ostream>

#include "kovactl/Print.h"
#include "tessa/text/Escape.h"

namespace Kovactl {
namespace {

using Json = nlohmann::ordered_json;

constexpr const char* nameKey = "name";

// A line for each key: "naa.1: absent = true".
void PrintSettings(const std::string& subject, const Json& settings, std::ostream& out) {
  for (const auto& [key, value] : settings.items()) {
    if (key != nameKey) {
      out << Tessa::Escape(subject + ": " + key + " = " + value.dump()) << "\n";
    }
  }
}

void PrintChange(const HostChange& change, const std::string& output, std::ostream& out) {
  if (output != "table") {
    out << change.dump() << "\n";
    return;
  }
  if (change.contains("set")) {
    PrintSettings("host", change.at("set"), out);
  }
  if (change.contains("disk")) {
    PrintSettings(change.at("disk").at(nameKey).get<std::string>(), change.at("disk"), out);
  }
}

}  // namespace

ExitStatus RunSimSet(const Host::ManagementApi& host, const HostChange& change, const ChangeOptions& options,
                     std::ostream& out, std::ostream& err) {
  if (!change.contains("set") && (!change.contains("disk") || change.at("disk").size() < 2)) {
    throw BadInput("say what to set; `kovactl sim set --help` lists what can be");
  }
  const Host::Answer answer = host.ChangeHost(change.dump());
  if (answer.fault) {
    PrintFault(*answer.fault, err);
    return ExitStatus::Fault;
  }
  PrintChange(change, options.output, out);
  NoteForgotten(options, err);
  return ExitStatus::Done;
}

ExitStatus RunSimFault(const Host::ManagementApi& host, const Json& fault, const ChangeOptions& options,
                       std::ostream& out, std::ostream& err) {
  if (!fault.contains("exception") && !fault.contains("delayMs")) {
    throw BadInput("a fault throws or waits: give --exception, --delay-ms or both");
  }
  Json faults = Json::parse(host.DescribeHost()).value("faults", Json::array());
  faults.push_back(fault);
  return RunSimSet(host, {{"set", {{"faults", faults}}}}, options, out, err);
}

ExitStatus RunSimShow(const Host::ManagementApi& host, std::ostream& out) {
  out << host.DescribeHost();
  return ExitStatus::Done;
}

}  // namespace Kovactl
