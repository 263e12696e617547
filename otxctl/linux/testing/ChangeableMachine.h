// A machine whose groups can be changed, for tests: what the volume manager is asked to do is recorded, and
// what it reports afterwards is what the test says.
//
// Disks sda (flash, naa.1), sdb to sdd (naa.2 to naa.4); sde (flash, naa.5). All are free at first.
#pragma once

#include <gtest/gtest.h>

#include <cstdlib>
#include <filesystem>
#include <memory>
#include <string>
#include <utility>
#include <vector>

#include "otxctl/linux/GroupChanges.h"
#include "otxctl/linux/testing/TestMachine.h"

namespace OtxCtl::Linux {

struct FakeLocks final : DiskLocks {
  struct Held final : DiskLock {
    explicit Held(const std::string& why) : _why(why) {}
    std::string WhyNotTheSame() const override { return _why; }

   private:
    const std::string& _why;
  };

  std::unique_ptr<DiskLock> Lock(const ScannedDisk& disk, bool mustBeFree) override {
    taken.push_back(disk.facts.canonicalName + (mustBeFree ? " free" : ""));
    return std::make_unique<Held>(whyNotTheSame);
  }

  explicit FakeLocks(std::vector<std::string>& names, std::string& why) : taken(names), whyNotTheSame(why) {}

  std::vector<std::string>& taken;
  std::string& whyNotTheSame;
};

struct MemberRow {
  std::string disk;  // "sda"; empty: it has left the host
  std::string uuid;
  bool isCache = false;
  bool isLeftBehind = false;
  std::string volumeKind = "cache";  // empty: it has none
  bool isActive = true;
  bool isOpen = false;
};

struct GroupRow {
  std::string state = "ready";
  std::vector<MemberRow> members = {};
  std::string uuid = "g1";
  std::string name = "kova_g1";
  std::string foreignVolume = {};
};

inline GroupRow WholeGroup() {
  return {"ready", {{"sda", "u1", true}, {"sdb", "u2"}, {"sdc", "u3"}}};
}

class ChangeableMachine {
 public:
  ChangeableMachine() {
    machine.tree.AddScsiDisk("sda", {.worldWideName = "naa.1", .serial = "S1", .isFlash = true});
    machine.tree.AddScsiDisk("sdb", {.worldWideName = "naa.2", .serial = "S2"});
    machine.tree.AddScsiDisk("sdc", {.worldWideName = "naa.3", .serial = "S3"});
    machine.tree.AddScsiDisk("sdd", {.worldWideName = "naa.4", .serial = "S4"});
    machine.tree.AddScsiDisk("sde", {.worldWideName = "naa.5", .serial = "S5", .isFlash = true});
    machine.stateFolder = machine.tree.Full("var/kova").string();
    machine.results.answer = [this](const std::vector<std::string>& command) { return Answer(command); };
    host = machine.Host();
    ChangeTools tools;
    tools.commands = std::make_unique<FakeCommands>(machine.results);
    tools.locks = std::make_unique<FakeLocks>(locked, whyNotTheSame);
    tools.log = [this](const std::string& line) { log.push_back(line); };
    tools.flush = [this](const std::string& path) { flushed.push_back(path); };
    tools.holdsData = [this](const std::string&) { return holdsData; };
    changes = std::make_unique<GroupChanges>(host, std::move(tools));
  }

  std::string Node(const std::string& disk) const { return machine.tree.Paths().dev + "/" + disk; }

  // From the next look on.
  void Show(const std::vector<GroupRow>& groups) {
    std::string pvs;
    std::string lvs;
    for (const GroupRow& group : groups) {
      for (const MemberRow& member : group.members) {
        pvs += (pvs.empty() ? "" : ",") + PhysicalRow(group, member);
        if (!member.isCache && !member.volumeKind.empty()) {
          lvs += (lvs.empty() ? "" : ",") + LogicalRow(group, member);
        }
        ShowOn(member);
      }
      if (!group.foreignVolume.empty()) {
        lvs += (lvs.empty() ? "" : ",") +
               LogicalRow(group, {"", "", false, false, "linear"}, group.foreignVolume);
      }
    }
    machine.results.of["pvs"] = {0, R"({"report":[{"pv":[)" + pvs + "]}]}", ""};
    machine.results.of["lvs"] = {0, R"({"report":[{"lv":[)" + lvs + "]}]}", ""};
  }

  // A physical volume in no group.
  void ShowOrphan(const std::string& disk) {
    GroupRow none;
    none.name = none.uuid = "";
    machine.results.of["pvs"] = {0, R"({"report":[{"pv":[)" + PhysicalRow(none, {disk, ""}) + "]}]}", ""};
    MarkAsMember(disk);
  }

  // The commands that were run but reports, without program and "--devices", in words.
  std::vector<std::string> Changes() const {
    std::vector<std::string> ran;
    for (const std::vector<std::string>& command : machine.results.commands) {
      if (command.at(1) != "pvs" && command.at(1) != "lvs") {
        std::vector<std::string> words(command.begin() + 4, command.end());
        words.insert(words.begin(), command.at(1));
        ran.push_back(Shortened(InWords(words)));
      }
    }
    return ran;
  }

  // Device files by the names of their disks.
  std::string Shortened(std::string text) const {
    const std::string dev = machine.tree.Paths().dev + "/";
    for (std::size_t at = text.find(dev); at != std::string::npos; at = text.find(dev, at)) {
      text.erase(at, dev.size());
    }
    return text;
  }

  std::vector<std::string> Recorded() const { return ChangeRecord(machine.stateFolder).Read(); }

  TestMachine machine;
  std::shared_ptr<LinuxHost> host;
  std::vector<std::string> locked;
  std::string whyNotTheSame;
  std::vector<std::string> log;
  std::vector<std::string> flushed;
  bool holdsData = false;
  // Which of the changing commands fail, counted from 1, and how.
  std::map<std::size_t, CommandResult> failing;
  std::size_t hanging = 0;
  // Called after each changing command that succeeded.
  std::function<void(const std::vector<std::string>&)> after;
  std::unique_ptr<GroupChanges> changes;

 private:
  std::optional<CommandResult> Answer(const std::vector<std::string>& command) {
    if (command.at(1) == "pvs" || command.at(1) == "lvs") {
      return std::nullopt;
    }
    ++_changing;
    if (_changing == hanging) {
      throw CommandFailed("lvm has not ended in time");
    }
    if (const auto found = failing.find(_changing); found != failing.end()) {
      return found->second;
    }
    if (after) {
      after(command);
    }
    return CommandResult{};
  }

  void MarkAsMember(const std::string& disk) {
    ProbeResult result = EmptyDisk();
    result.signatures = std::vector<std::string>{"LVM physical volume"};
    machine.probe->results[disk] = result;
  }

  void ShowOn(const MemberRow& member) {
    if (member.disk.empty()) {
      return;
    }
    MarkAsMember(member.disk);
    if (member.isActive && !_mapped[member.disk]) {
      machine.tree.AddMapping("dm-" + member.disk, "vg-" + member.disk, "LVM-" + member.disk, {member.disk});
      _mapped[member.disk] = true;
    }
  }

  std::string PhysicalRow(const GroupRow& group, const MemberRow& member) const {
    const std::string number = member.disk.empty() ? "0:0" : machine.tree.NumberOf(member.disk);
    const std::size_t colon = number.find(':');
    const bool isMissing = member.disk.empty() || member.isLeftBehind;
    const std::string tags =
        member.uuid.empty()
            ? ""
            : "kova.disk=" + member.uuid +
                  ",kova.role=" + (member.isCache ? "cache" : "capacity,kova.place=" + member.uuid.substr(1));
    return R"({"pv_name":")" + (member.disk.empty() ? "[unknown]" : Node(member.disk)) + R"(","pv_major":")" +
           number.substr(0, colon) + R"(","pv_minor":")" + number.substr(colon + 1) + R"(","pv_missing":")" +
           (isMissing ? "missing" : "") + R"(","pv_pe_count":"511","pv_tags":")" + tags + R"(","vg_name":")" +
           group.name + R"(","vg_uuid":")" + (group.uuid.empty() ? "" : "id-" + group.uuid) +
           R"(","vg_tags":")" +
           (group.uuid.empty() ? ""
                               : "kova,kova.group=" + group.uuid +
                                     ",kova.machine=m1,kova.created=1,kova.state=" + group.state) +
           R"("})";
  }

  static std::string LogicalRow(const GroupRow& group, const MemberRow& member,
                                const std::string& name = {}) {
    const std::string own = name.empty() ? "data_" + member.uuid : name;
    return R"({"vg_uuid":"id-)" + group.uuid + R"(","lv_name":")" + own + R"(","lv_path":"/dev/)" +
           group.name + "/" + own + R"(","lv_size":"4096","lv_tags":")" +
           (name.empty() ? "kova.disk=" + member.uuid : "") + R"(","segtype":")" + member.volumeKind +
           R"(","lv_active":")" + (member.isActive ? "active" : "") + R"(","lv_device_open":")" +
           (member.isOpen ? "open" : "") +
           R"(","cache_mode":"writethrough","cache_used_blocks":"1","cache_total_blocks":"4"})";
  }

  std::map<std::string, bool> _mapped;
  std::size_t _changing = 0;
};

}  // namespace OtxCtl::Linux
