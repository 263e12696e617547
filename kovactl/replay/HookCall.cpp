#include "kovactl/replay/HookCall.h"

namespace Kovactl {
namespace {

using Hooks = Host::PluginHooks;
using Arguments = HookArguments;
using Text = std::string;

constexpr bool tagged = true;

constexpr HookCall calls[] = {
    {"QueryDisksForKova", "QueryDisksForKovaHookFn", !tagged,
     [](const Hooks& hooks, Arguments& a, Text& fault, Text& result) {
       hooks.queryDisksForKova(a.names, fault, result);
     }},
    {"AddDisks", "AddDisksHookFn", tagged,
     [](const Hooks& hooks, Arguments& a, Text& fault, Text& result) {
       hooks.addDisks(a.texts, a.requestTag, fault, result);
     }},
    {"InitializeDisks", "InitializeDisksHookFn", tagged,
     [](const Hooks& hooks, Arguments& a, Text& fault, Text& result) {
       hooks.initializeDisks(a.texts, a.requestTag, fault, result);
     }},
    {"RemoveDisk", "RemoveDisksHookFn", !tagged,
     [](const Hooks& hooks, Arguments& a, Text& fault, Text&) {
       hooks.removeDisks(a.disk, a.passThrough, a.optionText, a.optionFirst, a.optionSecond, fault);
     }},
    {"RemoveDiskMapping", "RemoveDiskMappingHookFn", !tagged,
     [](const Hooks& hooks, Arguments& a, Text& fault, Text&) {
       hooks.removeDiskMapping(a.texts.empty() ? Text() : a.texts.front(), a.passThrough, a.optionText,
                               a.optionFirst, a.optionSecond, fault);
     }},
    {"UnmountDiskMapping", "UnmountDiskMappingHookFn", tagged,
     [](const Hooks& hooks, Arguments& a, Text& fault, Text& result) {
       hooks.unmountDiskMapping(a.texts, a.requestTag, fault, result);
     }},
    {"AddAllEligibleDisks", "AddAllEligibleDisksHookFn", tagged,
     [](const Hooks& hooks, Arguments& a, Text& fault, Text& result) {
       hooks.addAllEligibleDisks(a.requestTag, fault, result);
     }},
    {"GetStorageInfo", "GetStorageInfoHookFn", !tagged,
     [](const Hooks& hooks, Arguments&, Text&, Text& result) { hooks.getStorageInfo(result); }},
    {"GetConfigInfo", "GetConfigInfoHookFn", !tagged,
     [](const Hooks& hooks, Arguments&, Text&, Text& result) { hooks.getConfigInfo(result); }},
    {"ClaimUnmountedDiskgroup", "ClaimUnmountedDiskgroupHookFn", !tagged,
     [](const Hooks& hooks, Arguments&, Text&, Text&) { hooks.claimUnmountedDiskgroup(); }},
};

}  // namespace

std::span<const HookCall> HookCalls() {
  return calls;
}

}  // namespace Kovactl
