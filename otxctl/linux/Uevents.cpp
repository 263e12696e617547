#include "otxctl/linux/Uevents.h"

#include <algorithm>
#include <array>

namespace OtxCtl::Linux {
namespace {

constexpr std::string_view subsystemKey = "SUBSYSTEM=";
constexpr std::string_view actionKey = "ACTION=";
// Of what else is told ("bind", "online") disks are none the wiser.
constexpr std::array<std::string_view, 4> actions = {"add", "remove", "change", "move"};

bool BeginsWith(std::string_view text, std::string_view beginning) {
  return text.substr(0, beginning.size()) == beginning;
}

}  // namespace

// "add@/devices/...", then "KEY=value", with a zero byte behind each.
bool IsDiskEvent(std::string_view message) {
  std::string_view subsystem;
  std::string_view action;
  while (!message.empty()) {
    const std::string_view line = message.substr(0, message.find('\0'));
    if (BeginsWith(line, subsystemKey)) {
      subsystem = line.substr(subsystemKey.size());
    } else if (BeginsWith(line, actionKey)) {
      action = line.substr(actionKey.size());
    }
    message.remove_prefix(std::min(line.size() + 1, message.size()));
  }
  if (subsystem.empty() || action.empty()) {
    return true;
  }
  return subsystem == "block" && std::find(actions.begin(), actions.end(), action) != actions.end();
}

}  // namespace OtxCtl::Linux
