// The plug-in's hooks, called by name.
#pragma once

#include <cstdint>
#include <span>
#include <string>
#include <string_view>
#include <vector>

#include "host/PluginLoader.h"

namespace Kovactl {

// Everything that a hook may be given; which of it counts depends on the hook.
struct HookArguments {
  std::vector<std::string> names;
  std::vector<std::string> texts;  // of disks or groups
  std::string disk;
  std::string requestTag;
  std::string passThrough;
  std::string optionText;
  std::int32_t optionFirst = 0;
  std::int32_t optionSecond = 0;
};

struct HookCall {
  std::string_view operation;  // of the management API, that the hook carries out
  std::string_view hook;       // the export's name
  bool takesTag;
  void (*call)(const Host::PluginHooks& hooks, HookArguments& arguments, std::string& fault,
               std::string& result);
};

// One row for each hook.
std::span<const HookCall> HookCalls();

}  // namespace Kovactl
