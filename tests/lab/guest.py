"""A running machine with the lab's disks, as cases see it: commands in it, and disks to unplug and to plug.

    with guest.boot("build/lab", "build/dev") as machine:
        machine.run("lsblk").out

The power can be cut, and the machine be switched on again with the data that its disks then have.

Everything that waits has a limit; what goes wrong raises `Failed`, with the end of the machine's console."""

import contextlib
import json
import os
import shutil
import subprocess
import tempfile
import time
from dataclasses import dataclass

import disks
import emulator
import image
import packages

BOOT_LIMIT = 120  # seconds; it takes ten when nobody else needs the processors
MEMORY = "1G"
LOGS = ("console.log", "emulator.log")
TESTED = ("bin/agentd", "bin/kovactl", "lib/kova-agentd.so", "test/linux_contract")

Failed = emulator.Failed


@dataclass(frozen=True)
class Outcome:
    """How a command ended in the guest."""

    command: str
    status: int
    out: str
    err: str

    def json(self):
        return json.loads(self.out)

    def __str__(self):
        return f"{self.command}\nended with status {self.status}\n{self.out}{self.err}"


class Guest:
    """Not made by hand: `boot` does, and ends it."""

    def __init__(self, work, folder, programs, kernel, first):
        self.work = work  # for what a run leaves behind
        self.folder = folder  # seen as /host in the guest
        self.programs = programs
        self.full = False  # whether cases may take their time
        self.devices = disks.devices()
        self.disk_files = make_disks(work)  # by the disks' names
        self.answers = False  # until it does, and when it fails to
        self.boot_seconds = 0.0
        self._arguments = arguments(work, folder, programs, kernel, first, self.disk_files)
        self._process = None
        self._number = 0
        self._unplugged = []
        self._connections = contextlib.ExitStack()
        self._control = self._channel = self._answers = None

    def start(self):
        """Switches it on, with all disks plugged, and waits until it is ready."""
        self._process = emulator.start(self._arguments, os.path.join(self.work, "emulator.log"))
        self._unplugged = []
        with contextlib.ExitStack() as made:
            self._control = made.enter_context(contextlib.closing(emulator.Control(
                emulator.connect(self.folder + "/control.sock", self._process))))
            self._channel = made.enter_context(emulator.connect(self.folder + "/channel.sock", self._process))
            self._answers = made.enter_context(self._channel.makefile("rb"))
            self._connections = made.pop_all()
        self.wait_until_ready()

    def cut(self):
        """Takes the power away at once. The disks keep what has come to them so far."""
        self.answers = False
        if self._process:
            emulator.end(self._process)
        self._connections.close()
        for name in ("control.sock", "channel.sock"):
            with contextlib.suppress(FileNotFoundError):
                os.remove(os.path.join(self.folder, name))

    def renew(self):
        """Cuts its power, empties all disks, and switches it on again."""
        self.cut()
        self.disk_files = make_disks(self.work)
        self.start()

    def restart(self):
        """Ends it when everything is on the disks, and switches it on again."""
        self.check("sync")
        self.cut()
        self.start()

    def wait_until_ready(self):
        """Until it answers, and has found the last disk: those on USB come late."""
        start = time.monotonic()
        self._answer(0, BOOT_LIMIT)
        wanted = {disk.serial for disk in disks.DISKS}
        self.eventually("all disks are there", lambda: wanted <= set(self.kernel_names()))
        self.check("udevadm settle --timeout=30")
        self.boot_seconds = time.monotonic() - start

    def run(self, command, limit=60):
        """Runs a command in bash; stdout and stderr are apart. Fails if it takes longer than `limit` seconds."""
        if not self.answers:
            raise self.failed(f"{command}\nis not run: the machine is off, or answers no more")
        self._number += 1
        base = os.path.join(self.folder, str(self._number))
        with open(base + ".sh", "w", encoding="utf-8") as file:
            file.write(command + "\n")
        with contextlib.suppress(BrokenPipeError):  # the answer will be that the machine has ended
            self._channel.sendall(b"%d %d\n" % (self._number, limit))
        status = self._answer(self._number, limit + 15)
        if status == 124:
            raise self.failed(f"{command}\nhas not ended after {limit} s")
        return Outcome(command, status, read(base + ".out"), read(base + ".err"))

    def check(self, command, limit=60):
        """The same, for a command that must end with status 0."""
        outcome = self.run(command, limit)
        if outcome.status != 0:
            raise Failed(str(outcome))
        return outcome

    def unplug(self, path):
        """Takes a path to a disk away, at once and without asking."""
        self._control.command("device_del", id=path)
        self._control.event("DEVICE_DELETED", device=path)
        self._unplugged.append(path)

    def plug(self, path):
        self._control.command("device_add", **self.devices[path])
        if path in self._unplugged:
            self._unplugged.remove(path)

    def plug_all(self):
        """Brings back what a case has left unplugged, and waits until the kernel has it."""
        paths = sum(len(disk.path_names()) for disk in disks.DISKS)
        for path in list(self._unplugged):
            self.plug(path)
        self.eventually("all disks are back", lambda: sum(map(len, self.kernel_names().values())) == paths)

    def eventually(self, what, probe, limit=20):
        """Waits until the probe gives something true, and gives that: `what` should be so within `limit` seconds."""
        deadline = time.monotonic() + limit
        while True:
            found = probe()
            if found:
                return found
            if time.monotonic() > deadline:
                raise self.failed(f"not so after {limit} s: {what}")
            time.sleep(0.1)

    def kernel_names(self):
        """What the kernel calls each disk now, by serial number: a list, since a disk may have several paths."""
        found = {}
        for device in self.check("lsblk --json -d -o NAME,SERIAL").json()["blockdevices"]:
            if device["serial"]:
                found.setdefault(device["serial"], []).append(device["name"])
        return found

    def device(self, name):
        """The device file of a disk, by the disk's name in `disks.DISKS`."""
        serial = next(disk.serial for disk in disks.DISKS if disk.name == name)
        return "/dev/" + sorted(self.kernel_names()[serial])[0]

    def save(self, name, text):
        """Leaves a file beside the console's log."""
        with open(os.path.join(self.work, name), "w", encoding="utf-8") as file:
            file.write(text)

    def failed(self, text):
        return Failed(f"{text}\n{console_tail(self.work)}")

    def _answer(self, number, limit):
        """The status that the guest answers with."""
        self._channel.settimeout(limit)
        self.answers = False
        try:
            line = self._answers.readline()
        except TimeoutError:
            raise self.failed(f"the guest has not answered for {limit} s") from None
        except ConnectionError:
            line = b""
        if not line:
            raise self.failed("the machine has ended")
        answered, status = map(int, line.split())
        if answered != number:
            raise self.failed(f"the guest answers to {answered} instead of {number}")
        self.answers = True
        return status


def read(path):
    with open(path, encoding="utf-8", errors="surrogateescape") as file:
        return file.read()


def console_tail(work, lines=40):
    try:
        tail = read(os.path.join(work, "console.log")).splitlines()[-lines:]
        said = read(os.path.join(work, "emulator.log")).splitlines()[-lines:]
    except FileNotFoundError:
        return ""
    return "\n".join(["--- the end of the machine's console:", *tail, "--- the emulator said:", *said])


def make_disks(work):
    """Fresh data for every disk: nothing, or the partitions that it comes with. Files by the disks' names."""
    folder = os.path.join(work, "disks")
    shutil.rmtree(folder, ignore_errors=True)
    os.makedirs(folder)
    unpacked = os.path.join(work, "unpacked")
    files = {disk.name: os.path.join(folder, disk.name + ".raw") for disk in disks.DISKS}
    for disk in disks.DISKS:
        with open(files[disk.name], "wb") as file:
            file.truncate(disk.size)
        if disk.table:
            subprocess.run([unpacked + "/sbin/sfdisk", "-q", files[disk.name]], input=disk.table, text=True, check=True,
                           env={"LD_LIBRARY_PATH": image.search_path(unpacked)})
    return files


def arguments(work, folder, programs, kernel, first, files):
    """The emulator's. Without hardware virtualization, which is not everywhere and would be another machine."""
    def shared(tag, path, more=""):
        return ["-virtfs", f"local,path={path},mount_tag={tag},security_model=none,multidevs=remap{more}"]

    result = ["-accel", "tcg,thread=multi", "-cpu", "max", "-smp", "2", "-m", MEMORY, "-display", "none", "-nodefaults",
              "-no-reboot", "-kernel", kernel, "-initrd", first,
              "-append", "console=ttyS0 panic=-1 quiet rdinit=/init",
              "-chardev", f"file,id=console,path={work}/console.log,append=on", "-serial", "chardev:console",
              "-qmp", f"unix:{folder}/control.sock,server=on,wait=off",
              "-chardev", f"socket,id=channel,path={folder}/channel.sock,server=on,wait=off",
              "-device", "virtio-serial-pci", "-device", "virtserialport,chardev=channel,name=lab",
              *shared("host", folder), *shared("programs", programs, ",readonly=on")]
    for device in disks.CONTROLLERS:
        result += ["-device", json.dumps(device)]
    for disk in disks.DISKS:
        for node in disks.block_nodes(disk, files[disk.name]):
            result += ["-blockdev", json.dumps(node)]
    for device in disks.devices().values():
        result += ["-device", json.dumps(device)]
    return result


@contextlib.contextmanager
def boot(work, programs):
    """The machine, when it answers. `programs` is a build folder; `work` keeps packages, image, disks and logs."""
    work, programs = os.path.abspath(work), os.path.abspath(programs)
    os.makedirs(work, exist_ok=True)
    with emulator.only_machine(), tempfile.TemporaryDirectory(prefix="kova-lab-") as folder:
        try:
            kernel, first = image.build(work, programs, TESTED)
        except (image.Failed, packages.Failed) as failure:
            raise Failed(str(failure)) from failure
        for log in LOGS:
            with open(os.path.join(work, log), "wb"):
                pass
        machine = Guest(work, folder, programs, kernel, first)
        try:
            machine.start()
            yield machine
        finally:
            machine.cut()
            shutil.rmtree(os.path.join(work, "disks"), ignore_errors=True)
