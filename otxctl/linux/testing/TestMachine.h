// A whole machine for tests: a tree of the kernel's, a probe, a volume manager and settings, all made up.
#pragma once

#include <chrono>
#include <memory>
#include <string>
#include <utility>

#include "otxctl/linux/LinuxHost.h"
#include "otxctl/linux/testing/FakeCommands.h"
#include "otxctl/linux/testing/FakeProbe.h"
#include "otxctl/linux/testing/SystemTree.h"

namespace OtxCtl::Linux {

class TestMachine {
 public:
  TestMachine() {
    tree.Write("proc/swaps", "Filename Type Size Used Priority\n");
    for (const char* const process : {"self", "1"}) {
      tree.Write(std::string("proc/") + process + "/mountinfo", "");
    }
  }

  // Of a flash disk sda, which is its cache disk, and a hard disk sdb.
  void AddGroup(const std::string& state = "ready", bool isActive = true) {
    tree.AddScsiDisk("sda", {.worldWideName = "naa.1", .serial = "S1", .isFlash = true});
    tree.AddScsiDisk("sdb", {.worldWideName = "naa.2", .serial = "S2"});
    for (const char* const name : {"sda", "sdb"}) {
      ProbeResult member = EmptyDisk();
      member.signatures = std::vector<std::string>{"LVM physical volume"};
      probeResults[name] = member;
    }
    const auto row = [&state](const std::string& name, const std::string& number, const std::string& tags) {
      const std::size_t colon = number.find(':');
      return R"({"pv_name":")" + name + R"(","pv_major":")" + number.substr(0, colon) + R"(","pv_minor":")" +
             number.substr(colon + 1) + R"(","pv_missing":"","pv_pe_count":"511","pv_tags":")" + tags +
             R"(","vg_name":"vg","vg_uuid":"v","vg_tags":"kova,kova.group=g1,kova.machine=m1,kova.state=)" +
             state + R"("})";
    };
    results.of["pvs"].output =
        R"({"report":[{"pv":[)" + row("/dev/sda", tree.NumberOf("sda"), "kova.disk=u1,kova.role=cache") +
        "," + row("/dev/sdb", tree.NumberOf("sdb"), "kova.disk=u2,kova.role=capacity") + "]}]}";
    results.of["lvs"].output =
        std::string(
            R"({"report":[{"lv":[{"vg_uuid":"v","lv_name":"d","lv_path":"/dev/vg/d","lv_size":"4096",)") +
        R"("lv_tags":"kova.disk=u2","segtype":"cache","lv_device_open":"","cache_mode":"writethrough",)" +
        R"("cache_used_blocks":"1","cache_total_blocks":"4","lv_active":")" + (isActive ? "active" : "") +
        R"("}]}]})";
    if (isActive) {
      tree.AddMapping("dm-0", "vg-d", "LVM-d", {"sda", "sdb"});
    }
  }

  // The machine may be changed and looked at again.
  std::shared_ptr<LinuxHost> Host() {
    auto made = std::make_unique<FakeProbe>();
    made->results = probeResults;
    probe = made.get();
    LinuxHostOptions options;
    options.paths = tree.Paths();
    options.machineId = "m1";
    options.readSettings = [this] { return settings; };
    options.freshness = freshness;
    options.stateFolder = stateFolder;
    return std::make_shared<LinuxHost>(std::move(options), std::move(made),
                                       std::make_unique<FakeCommands>(results));
  }

  SystemTree tree;
  std::unordered_map<std::string, ProbeResult> probeResults;  // by kernel name
  FakeCommands::Results results;
  HostSettings settings;
  std::string stateFolder;
  FakeProbe* probe = nullptr;  // of the last host that was made
  std::chrono::milliseconds freshness{0};
};

}  // namespace OtxCtl::Linux
