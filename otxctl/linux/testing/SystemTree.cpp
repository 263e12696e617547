#include "otxctl/linux/testing/SystemTree.h"

#include <algorithm>
#include <cstdlib>
#include <fstream>
#include <stdexcept>

namespace OtxCtl::Linux {
namespace {

namespace fs = std::filesystem;

// Page 80 of the vital product data of a SCSI disk.
std::string SerialPage(const std::string& serial) {
  return std::string("\x00\x80\x00", 3) + static_cast<char>(serial.size()) + serial;
}

std::string OrElse(const std::string& text, const std::string& otherwise) {
  return text.empty() ? otherwise : text;
}

// What stands for bytes that are no letters.
std::string Unescape(const std::string& text) {
  std::string bytes;
  for (std::size_t i = 0; i < text.size(); ++i) {
    if (text[i] != '\\') {
      bytes += text[i];
      continue;
    }
    const char kind = text.at(++i);
    if (kind == 'x') {
      bytes += static_cast<char>(std::stoi(text.substr(i + 1, 2), nullptr, 16));
      i += 2;
    } else {
      bytes += kind == 'n' ? '\n' : kind;
    }
  }
  return bytes;
}

}  // namespace

SystemTree::SystemTree() {
  std::string folder = (fs::temp_directory_path() / "kova-system.XXXXXX").string();
  if (mkdtemp(folder.data()) == nullptr) {
    throw std::runtime_error("no folder for the test");
  }
  _root = folder;
  _paths = {folder + "/sys", folder + "/proc", folder + "/dev"};
  for (const char* const path :
       {"sys/class/block", "sys/devices", "proc/self/ns", "proc/1/ns", "dev/mapper"}) {
    MakeFolder(path);
  }
  Link("proc/self/ns/mnt", "mnt:[1]");
  Link("proc/1/ns/mnt", "mnt:[1]");
  Write("proc/self/mountinfo", "");
  Write("proc/swaps", "Filename\t\t\t\tType\t\tSize\t\tUsed\t\tPriority\n");
}

SystemTree::~SystemTree() {
  std::error_code ignored;
  fs::remove_all(_root, ignored);
}

fs::path SystemTree::Full(const std::string& path) const {
  return _root / path;
}

void SystemTree::MakeFolder(const std::string& path) {
  fs::create_directories(Full(path));
}

void SystemTree::Write(const std::string& path, const std::string& bytes) {
  fs::create_directories(Full(path).parent_path());
  if (!std::ofstream(Full(path), std::ios::binary)
           .write(bytes.data(), static_cast<std::streamsize>(bytes.size()))) {
    throw std::runtime_error("cannot write " + path);
  }
}

void SystemTree::Link(const std::string& path, const std::string& target) {
  fs::create_directories(Full(path).parent_path());
  fs::remove(Full(path));
  fs::create_symlink(target, Full(path));
}

void SystemTree::Remove(const std::string& path) {
  fs::remove_all(Full(path));
}

void SystemTree::Load(const std::string& recording) {
  std::ifstream file(recording);
  std::string line;
  std::size_t entries = 0;
  while (std::getline(file, line)) {
    if (line.empty() || line.front() == '#') {
      continue;
    }
    const std::size_t first = line.find(' ');
    const std::size_t second = std::min(line.find(' ', first + 1), line.size());
    const std::string kind = line.substr(0, first);
    const std::string path = line.substr(first + 1, second - first - 1);
    const std::string rest = line.substr(std::min(second + 1, line.size()));
    ++entries;
    if (kind == "file") {
      Write(path, Unescape(rest));
    } else if (kind == "link") {
      Link(path, rest);
    } else if (kind == "dir") {
      MakeFolder(path);
    } else {
      throw std::runtime_error(recording + ": no entry of a tree: " + line);
    }
  }
  if (entries == 0) {
    throw std::runtime_error(recording + ": cannot be read, or is empty");
  }
}

// With the links that lead from each device to what it hangs on.
void SystemTree::AddBus(const std::string& device, const std::string& subsystem) {
  MakeFolder(device);
  Link(device + "/subsystem", "../bus/" + subsystem);
}

std::string SystemTree::AddBlock(const std::string& name, const std::string& place, const TestDisk& disk) {
  const std::string path = place + "/" + name;
  AddBus(path, "block");
  const std::string number = "8:" + std::to_string(_minor++);
  Write(path + "/dev", number + "\n");
  Write(path + "/diskseq", std::to_string(_minor) + "\n");
  Write(path + "/size", std::to_string(disk.bytes / 512) + "\n");
  for (const char* const flag : {"/ro", "/removable", "/hidden"}) {
    Write(path + flag, "0\n");
  }
  Write(path + "/queue/rotational", disk.isFlash ? "0\n" : "1\n");
  Write(path + "/queue/zoned", "none\n");
  Write(path + "/queue/logical_block_size", "512\n");
  MakeFolder(path + "/holders");
  MakeFolder(path + "/slaves");
  Link("sys/class/block/" + name, "../../" + path.substr(4));
  return path;
}

std::string SystemTree::AddScsiDisk(const std::string& name, TestDisk disk) {
  const std::string pci = "sys/devices/pci0000:00/0000:00:05.0";
  std::string host = disk.place;
  if (host.empty()) {
    host = pci + "/virtio0/host0";
    AddBus(pci, "pci");
    AddBus(pci + "/virtio0", "virtio");
  }
  AddBus(host, "scsi");
  const std::string target = "0:0:" + std::to_string(_scsi++);
  AddBus(host + "/target" + target, "scsi");
  const std::string device = host + "/target" + target + "/" + target + ":0";
  AddBus(device, "scsi");
  Write(device + "/type", "0\n");
  Write(device + "/state", "running\n");
  Write(device + "/vendor", disk.vendor + "    \n");
  Write(device + "/model", disk.model + "\n");
  if (!disk.worldWideName.empty()) {
    Write(device + "/wwid", disk.worldWideName + "\n");
  }
  if (!disk.serial.empty()) {
    Write(device + "/vpd_pg80", SerialPage(disk.serial));
  }
  const std::string path = AddBlock(name, device + "/block", disk);
  Link(path + "/device", "../../../" + target + ":0");
  return path;
}

std::string SystemTree::AddUsbDisk(const std::string& name, TestDisk disk) {
  const std::string pci = "sys/devices/pci0000:00/0000:00:06.0";
  AddBus(pci, "pci");
  AddBus(pci + "/usb2", "usb");
  AddBus(pci + "/usb2/2-1", "usb");
  AddBus(pci + "/usb2/2-1/2-1:1.0", "usb");
  disk.place = pci + "/usb2/2-1/2-1:1.0/host3";
  return AddScsiDisk(name, disk);
}

std::string SystemTree::AddNvmeDisk(const std::string& name, TestDisk disk) {
  const std::string controller = name.substr(0, name.rfind('n'));
  const std::string number = controller.substr(4);
  const std::string pci = OrElse(disk.place, "sys/devices/pci0000:00/0000:01:0" + number + ".0");
  const std::string device = pci + "/nvme/" + controller;
  AddBus(pci, "pci");
  AddBus(device, "nvme");
  Write(device + "/transport", "pcie\n");
  Write(device + "/state", "live\n");
  Write(device + "/model", disk.model + "   \n");
  Write(device + "/serial", disk.serial + "   \n");
  const std::string path = AddBlock(name, device, disk);
  Link(path + "/device", "../../" + controller);
  if (!disk.worldWideName.empty()) {
    Write(path + "/wwid", disk.worldWideName + "\n");
  }
  return path;
}

std::string SystemTree::AddNvmeMultipathDisk(const std::string& name,
                                             const std::vector<std::vector<std::string>>& controllers,
                                             const TestDisk& disk) {
  const std::string subsystem = "sys/devices/virtual/nvme-subsystem/nvme-subsys0";
  AddBus(subsystem, "nvme-subsystem");
  Write(subsystem + "/model", disk.model + "\n");
  Write(subsystem + "/serial", disk.serial + "\n");
  for (const std::vector<std::string>& controller : controllers) {
    const std::string device = "sys/devices/pci0000:00/0000:00:08.0/nvme/" + controller.at(0);
    AddBus(device, "nvme");
    Write(device + "/transport", controller.at(1) + "\n");
    Link(subsystem + "/" + controller.at(0), "../../../" + device.substr(12));
  }
  const std::string path = AddBlock(name, subsystem, disk);
  Write(path + "/wwid", disk.worldWideName + "\n");
  Link(path + "/device", "../../nvme-subsys0");
  return path;
}

std::string SystemTree::AddVirtioDisk(const std::string& name, TestDisk disk) {
  const std::string pci = OrElse(disk.place, "sys/devices/pci0000:00/0000:00:02." + name.substr(2));
  AddBus(pci, "pci");
  AddBus(pci + "/virtio1", "virtio");
  Write(pci + "/virtio1/vendor", "0x554d4551\n");
  const std::string path = AddBlock(name, pci + "/virtio1/block", disk);
  Write(path + "/serial", disk.serial);
  Link(path + "/device", "../../../virtio1");
  return path;
}

std::string SystemTree::AddVirtual(const std::string& name, std::int64_t bytes) {
  TestDisk disk;
  disk.bytes = bytes;
  return AddBlock(name, "sys/devices/virtual/block", disk);
}

std::string SystemTree::AddPartition(const std::string& disk, const std::string& name) {
  const std::string path = AddBlock(name, PathOf(disk), {});
  Remove(path + "/queue");
  Write(path + "/partition", "1\n");
  return path;
}

std::string SystemTree::AddMapping(const std::string& name, const std::string& mapping,
                                   const std::string& uuid, const std::vector<std::string>& below) {
  const std::string path = AddVirtual(name, std::int64_t{4} << 30);
  Write(path + "/dm/name", mapping + "\n");
  Write(path + "/dm/uuid", uuid + "\n");
  Write(path + "/dm/suspended", "0\n");
  for (const std::string& device : below) {
    AddHolder(device, name);
    Link(path + "/slaves/" + device, "../../../../" + PathOf(device).substr(12));
  }
  return path;
}

void SystemTree::AddHolder(const std::string& below, const std::string& name) {
  Link(PathOf(below) + "/holders/" + name, "../../" + name);
}

std::string SystemTree::NumberOf(const std::string& name) const {
  std::string number;
  std::ifstream(Full("sys/class/block/" + name + "/dev")) >> number;
  return number;
}

std::string SystemTree::PathOf(const std::string& name) const {
  return fs::relative(fs::canonical(Full("sys/class/block/" + name)), fs::canonical(_root)).string();
}

void SystemTree::Mount(const std::string& number, const std::string& source, const std::string& where,
                       const std::string& type) {
  const auto lines = std::count(_mounts.begin(), _mounts.end(), '\n');
  _mounts += std::to_string(30 + lines) + " 1 " + number + " / " + where + " rw,relatime shared:1 - " + type +
             " " + source + " rw\n";
  Write("proc/self/mountinfo", _mounts);
}

}  // namespace OtxCtl::Linux
