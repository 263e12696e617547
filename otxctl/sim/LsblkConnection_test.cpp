#include "otxctl/sim/LsblkConnection.h"

#include <gtest/gtest.h>

namespace OtxCtl::Sim {
namespace {

using Disks::Attachment;

LsblkDevice Attached(const char* transport, const char* subsystems) {
  LsblkDevice device;
  device.name = "sda";
  device.transport = transport;
  device.subsystems = subsystems;
  return device;
}

struct Row {
  const char* transport;
  const char* subsystems;
  Attachment attachment;
};

TEST(LsblkConnection, IsWhatTheDeviceIsSeenToHangOn) {
  for (const Row& row : {Row{"sata", "block:scsi:pci", Attachment::Machine},
                         Row{"sas", "block:scsi:pci", Attachment::Machine},
                         Row{"", "block:scsi:pci", Attachment::Machine},
                         Row{"", "block:scsi:virtio:pci", Attachment::Machine},
                         Row{"nvme", "block:nvme:pci", Attachment::Machine},
                         Row{"", "block:scsi:vmbus:acpi", Attachment::Machine},
                         Row{"", "block:xen", Attachment::Machine},
                         Row{"", "block:scsi:platform", Attachment::Machine},
                         Row{"usb", "block:scsi:usb:pci", Attachment::Usb},
                         Row{"", "block:scsi:usb:pci", Attachment::Usb},
                         Row{"usb", "", Attachment::Usb},
                         Row{"sbp", "block:scsi:firewire:pci", Attachment::FireWire},
                         Row{"", "block:scsi:ieee1394:pci", Attachment::FireWire},
                         Row{"", "block:mmc:mmc_host:platform", Attachment::MemoryCard},
                         Row{"", "block:mmc:mmc_host:rtsx_usb:usb:pci", Attachment::Usb},
                         Row{"iscsi", "block:scsi:platform", Attachment::Remote},
                         Row{"fc", "block:scsi:pci", Attachment::Remote},
                         Row{"fcoe", "block:scsi:pci", Attachment::Remote},
                         Row{"srp", "block:scsi:pci", Attachment::Remote},
                         Row{"", "block:rbd", Attachment::Remote},
                         Row{"", "block:scsi:infiniband_srp:pci", Attachment::Remote},
                         Row{"", "block:memstick:memstick_host:pci", Attachment::MemoryCard},
                         Row{"nvme", "block:nvme:pci:vmbus:acpi", Attachment::Machine},
                         Row{"virtio", "block:virtio:ccw:css", Attachment::Machine},
                         Row{"pcie", "block:nvme:pci", Attachment::Machine},
                         Row{"", "block:scsi:vio", Attachment::Machine},
                         Row{"tcp", "block:nvme:nvme-fabrics", Attachment::Remote},
                         Row{"nvme", "block:nvme:nvme-fabrics", Attachment::Remote}}) {
    const auto connection = ConnectionOf(Attached(row.transport, row.subsystems));
    ASSERT_TRUE(connection.IsKnown()) << row.subsystems;
    EXPECT_EQ(connection.Get().attachment, row.attachment) << row.transport << " " << row.subsystems;
    const bool isUsb = row.attachment == Attachment::Usb;
    EXPECT_EQ(connection.Get().transport, isUsb ? "usb" : row.transport);
  }
}

TEST(LsblkConnection, OfWhatIsNotSeenToHangOnABusNobodyKnows) {
  const auto why = [](const char* transport, const char* subsystems) {
    const auto connection = ConnectionOf(Attached(transport, subsystems));
    return connection.IsKnown() ? "known" : connection.WhyUnknown();
  };
  EXPECT_EQ(why("", ""), "the capture has no SUBSYSTEMS of sda");
  EXPECT_EQ(why("nvme", "block:nvme-subsystem"), "what sda is attached to (block:nvme-subsystem)");
  EXPECT_EQ(why("", "block:scsi:pseudo"), "what sda is attached to (block:scsi:pseudo)");
  EXPECT_EQ(why("", "block:scsi:fabric:pci"), "what sda is attached to (block:scsi:fabric:pci)")
      << "a bus in the end does not make a way known";
  EXPECT_EQ(why("", "block:mtd:platform"), "what sda is attached to (block:mtd:platform)");
  EXPECT_EQ(why("", "block:nd:acpi"), "what sda is attached to (block:nd:acpi)");
  EXPECT_EQ(why("", "block"), "what sda is attached to (block)");
  EXPECT_EQ(why("teleport", "block:scsi:pci"), "whether teleport is a way to a local disk");
}

TEST(LsblkConnection, AVirtualDeviceHangsOnNothing) {
  EXPECT_TRUE(IsVirtual(Attached("", "block")));
  EXPECT_FALSE(IsVirtual(Attached("", "")));
  EXPECT_FALSE(IsVirtual(Attached("", "block:nvme-subsystem")));
  EXPECT_FALSE(IsVirtual(Attached("iscsi", "block")));
}

}  // namespace
}  // namespace OtxCtl::Sim
