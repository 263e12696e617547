"""A disk behind a network: the guest serves it to itself, by NVMe over TCP.

    with remote.disk(machine):
        ...                            # the kernel has a disk with the serial number SERIAL

It is no disk of the lab's list, so it must have gone before disks are counted."""

import contextlib

SERIAL = "FARAWAY0000800"
NAME = "nqn.lab"
SUBSYSTEM = f"/sys/kernel/config/nvmet/subsystems/{NAME}"
PORT = "/sys/kernel/config/nvmet/ports/1"

SERVE = f"""set -e
modprobe -a nvmet nvmet_tcp nvme_tcp
[ -d /sys/kernel/config/nvmet ] || mount -t configfs none /sys/kernel/config
truncate -s 2G /run/faraway
mkdir {SUBSYSTEM} {SUBSYSTEM}/namespaces/1 {PORT}
echo 1 >{SUBSYSTEM}/attr_allow_any_host
echo {SERIAL} >{SUBSYSTEM}/attr_serial
echo -n /run/faraway >{SUBSYSTEM}/namespaces/1/device_path
echo 1 >{SUBSYSTEM}/namespaces/1/buffered_io
echo 1 >{SUBSYSTEM}/namespaces/1/enable
echo tcp >{PORT}/addr_trtype
echo ipv4 >{PORT}/addr_adrfam
echo 127.0.0.1 >{PORT}/addr_traddr
echo 4420 >{PORT}/addr_trsvcid
ln -s {SUBSYSTEM} {PORT}/subsystems/{NAME}
echo transport=tcp,traddr=127.0.0.1,trsvcid=4420,nqn={NAME} >/dev/nvme-fabrics"""

REMOVE = f"""for one in /sys/class/nvme/*; do
  if grep -qx tcp $one/transport; then echo 1 >$one/delete_controller; fi
done
rm -f {PORT}/subsystems/{NAME}
rmdir {PORT}
echo 0 >{SUBSYSTEM}/namespaces/1/enable
rmdir {SUBSYSTEM}/namespaces/1 {SUBSYSTEM}
rm -f /run/faraway"""


@contextlib.contextmanager
def disk(machine):
    try:
        machine.check(SERVE)
        machine.eventually("the remote disk is there", lambda: SERIAL in machine.kernel_names())
        machine.check("udevadm settle --timeout=30")
        yield
    finally:
        machine.run(REMOVE)
        machine.eventually("the remote disk is gone", lambda: SERIAL not in machine.kernel_names())
