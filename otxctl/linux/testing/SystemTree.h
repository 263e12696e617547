// The kernel's folders, made up for a test in a temporary folder: no root and no hardware needed.
//
//   SystemTree tree;
//   tree.AddScsiDisk("sda", {.serial = "S1"});
//   tree.AddPartition("sda", "sda1");
//   tree.AddMapping("dm-0", "vg0-data", "LVM-abc", {"sda1"});
//
// Every disk that is added is one that may be used; what else a test wants, it writes into the tree.
#pragma once

#include <cstdint>
#include <filesystem>
#include <string>
#include <vector>

#include "otxctl/linux/SystemPaths.h"

namespace OtxCtl::Linux {

struct TestDisk {
  std::string worldWideName = {};
  std::string vendor = "LAB";
  std::string model = "HDD";
  std::string serial = {};  // of SCSI disks: as page 80 of their vital product data
  std::int64_t bytes = std::int64_t{4} << 30;
  bool isFlash = false;
  // What the disk hangs on; its own devices are put below. Empty: as is usual for the kind of disk.
  std::string place = {};
};

class SystemTree {
 public:
  SystemTree();
  ~SystemTree();
  SystemTree(const SystemTree&) = delete;
  SystemTree& operator=(const SystemTree&) = delete;

  const SystemPaths& Paths() const noexcept { return _paths; }

  // Paths begin with "sys/", "proc/" or "dev/". Folders on the way are made.
  void Write(const std::string& path, const std::string& bytes);
  void Link(const std::string& path, const std::string& target);
  void Remove(const std::string& path);
  void MakeFolder(const std::string& path);
  std::filesystem::path Full(const std::string& path) const;

  // What a machine's kernel told, recorded: a line for each "file PATH CONTENT", "link PATH TARGET" and "dir
  // PATH"; in contents, "\\n", "\\\\" and "\\xNN" are bytes. Throws over anything else.
  void Load(const std::string& recording);

  // Each has a device path like
  // "/devices/pci0000:00/0000:00:05.0/virtio0/host0/target0:0:1/0:0:1:0/block/sda", which is handed back with
  // "sys" in front.
  std::string AddScsiDisk(const std::string& name, TestDisk disk = {});
  std::string AddNvmeDisk(const std::string& name, TestDisk disk = {});
  std::string AddVirtioDisk(const std::string& name, TestDisk disk = {});
  std::string AddUsbDisk(const std::string& name, TestDisk disk = {});
  std::string AddVirtual(const std::string& name, std::int64_t bytes);
  // Under the multipathing of NVMe itself, by these controllers: pairs of a name and its transport.
  std::string AddNvmeMultipathDisk(const std::string& name,
                                   const std::vector<std::vector<std::string>>& controllers,
                                   const TestDisk& disk);
  std::string AddPartition(const std::string& disk, const std::string& name);
  // A device-mapper device on others, which it then holds.
  std::string AddMapping(const std::string& name, const std::string& mapping, const std::string& uuid,
                         const std::vector<std::string>& below);
  void AddHolder(const std::string& below, const std::string& name);

  // "8:16", as it was given to the device.
  std::string NumberOf(const std::string& name) const;
  // Where the device lies, beginning with "sys/devices/".
  std::string PathOf(const std::string& name) const;

  // A line of mountinfo.
  void Mount(const std::string& number, const std::string& source, const std::string& where,
             const std::string& type = "ext4");

 private:
  std::string AddBlock(const std::string& name, const std::string& place, const TestDisk& disk);
  void AddBus(const std::string& device, const std::string& subsystem);

  std::filesystem::path _root;
  SystemPaths _paths;
  int _minor = 0;
  int _scsi = 0;
  std::string _mounts;
};

}  // namespace OtxCtl::Linux
