#include "tests/lab/contract/LabMachine.h"

#include <sstream>
#include <stdexcept>

#include "otxctl/linux/Commands.h"

namespace Lab {
namespace {

// What is mapped goes first: a disk that has left is let go only then, and comes back under its name. A disk
// that has been deleted comes back when its host looks for disks. What the volume manager remembers of disks
// is not true any more. Disks that are blank are not written to: each that is makes udev look at it again.
constexpr const char* restore = R"script(
find_nodes() {
  nodes=()
  while read -r serial name; do
    if [[ " $serials " == *" $serial "* ]]; then nodes+=("/dev/$name"); fi
  done <<<"$(lsblk -dnro SERIAL,NAME)"
  [ "${#nodes[@]}" -ge "$(wc -w <<<"$serials")" ]
}
is_mapped() { [ "$(dmsetup ls)" != "No devices found" ]; }
if is_mapped; then
  dmsetup remove_all >/dev/null 2>&1
  if is_mapped; then
    dmsetup remove_all --force >/dev/null 2>&1
    udevadm settle --timeout=30
    if is_mapped; then dmsetup ls --tree >&2; exit 1; fi
  fi
fi
rm -f /run/lvm/hints
if ! find_nodes; then
  for scan in /sys/class/scsi_host/host*/scan; do echo '- - -' >"$scan"; done
  for ((i = 0; i < 100; ++i)); do
    if find_nodes; then break; fi
    sleep 0.2
  done
  find_nodes || { echo "not all disks have come back" >&2; exit 1; }
fi
used=$(wipefs -i -n -O DEVICE "${nodes[@]}" | sort -u)
if [ -n "$used" ]; then (cd /dev && wipefs -q -a -f $used) && udevadm settle --timeout=30; fi
)script";

}  // namespace

std::string Shell(const std::string& script) {
  OtxCtl::Linux::SystemCommands commands;
  const OtxCtl::Linux::CommandResult result = commands.Run({"/usr/bin/bash", "-c", script});
  if (result.status != 0) {
    throw std::runtime_error(script + "\nended with status " + std::to_string(result.status) + "\n" +
                             result.output + result.errors);
  }
  return result.output;
}

LabMachine::LabMachine(const std::string& disks) {
  std::istringstream words(disks);
  std::string word;
  while (words >> word) {
    const std::size_t colon = word.find(':');
    if (colon == std::string::npos) {
      throw std::runtime_error("KOVA_LAB_DISKS: no kind of disk: " + word);
    }
    _serials[word.substr(0, colon)].push_back(word.substr(colon + 1));
  }
}

const std::vector<std::string>& LabMachine::DisksOf(const std::string& kind) const {
  static const std::vector<std::string> none;
  const auto found = _serials.find(kind);
  return found == _serials.end() ? none : found->second;
}

void LabMachine::Restore() const {
  std::string all;
  for (const auto& [kind, serials] : _serials) {
    for (const std::string& serial : serials) {
      all += serial + " ";
    }
  }
  Shell("serials=\"" + all + "\"; rm -rf " + stateFolder + restore);
}

}  // namespace Lab
