"""The kernel and the first file system of the guest, made from Debian packages and programs of this machine.

`build` makes them anew only when something that they are made from has changed: a package, a program, a library or
these scripts. The programs under test are no part of the image; the guest reads them from their build."""

import glob
import hashlib
import lzma
import os
import shutil
import struct
import subprocess

import archive
import packages

HERE = os.path.dirname(os.path.abspath(__file__))

MODULES = """virtio_pci virtio_console virtio_scsi 9p 9pnet_virtio sd_mod nvme xhci_pci usb_storage ext4
crc32c_generic loop dm_mod dm_cache dm_cache_smq dm_mirror dm_snapshot dm_thin_pool dm_raid dm_multipath
md_mod raid0 raid1 nvmet nvmet_tcp nvme_tcp""".split()

# Programs of this machine, all of packages that every Debian has. Busybox stands in for what is not named here.
HOST_PROGRAMS = """bash cat cp dd ls lsblk blkid blockdev findmnt losetup mkfs.ext4 mkswap mount stat swapoff swapon
timeout umount wipefs""".split()

# Programs of the unpacked packages, and what they read.
GUEST_PROGRAMS = """bin/udevadm bin/kmod sbin/lvm sbin/dmsetup sbin/mdadm sbin/sfdisk sbin/fdisk
usr/sbin/pdata_tools lib/udev/ata_id lib/udev/scsi_id""".split()
GUEST_FILES = "etc/lvm lib/udev/rules.d lib/modprobe.d etc/udev/udev.conf"

LINKS = {"usr/bin/sh": "bash", "usr/lib/systemd/systemd-udevd": "/usr/bin/udevadm", "bin": "usr/bin",
         "sbin": "usr/sbin", "lib": "usr/lib", "lib64": "usr/lib64", "init": "usr/sbin/lab-init"}
KMOD_NAMES = ("modprobe", "insmod", "rmmod", "lsmod", "depmod", "modinfo")
LIBRARIES = "usr/lib/x86_64-linux-gnu"
LOADER = "/lib64/ld-linux-x86-64.so.2"
MACHINE_ID = "6b6f7661206c616220206d616368696e"


class Failed(Exception):
    """The image cannot be made; says why."""


def build(work, tested, names):
    """(kernel, first file system) in the folder `work`, good for the programs of these names in the folder `tested`."""
    unpacked = os.path.join(work, "unpacked")
    packages.unpack(packages.fetch(os.path.join(work, "cache")), unpacked)
    sources = programs(unpacked)
    files = [*sources.values(), *(os.path.join(tested, name) for name in names)]
    libraries = [path for path in needed_libraries(files, unpacked) if not path.startswith(tested + "/")]
    name = digest([*sources.values(), *libraries, *glob.glob(HERE + "/*.py"), HERE + "/init",
                   os.path.join(unpacked, "unpacked-packages")])
    kernel, image = os.path.join(work, "vmlinux"), os.path.join(work, f"image-{name}.cpio")
    if not (os.path.exists(image) and os.path.exists(kernel)):
        for old in glob.glob(os.path.join(work, "image-*.cpio")):
            os.remove(old)
        write_whole(kernel, lambda out: out.write(plain_kernel(only(unpacked + "/boot/vmlinuz-*"))))
        write_whole(image, lambda out: contents(work, unpacked, sources, libraries).write(out))
    return kernel, image


def write_whole(path, write):
    """A file that is there complete or not at all."""
    with open(path + ".new", "wb") as out:
        write(out)
    os.replace(path + ".new", path)


def digest(files):
    whole = hashlib.sha256()
    for file in sorted(files):
        with open(file, "rb") as opened:
            whole.update(file.encode() + b"\0" + hashlib.sha256(opened.read()).digest())
    return whole.hexdigest()[:16]


def only(pattern):
    found = glob.glob(pattern)
    if len(found) != 1:
        raise Failed(f"{pattern}: {len(found)} files, one is needed")
    return found[0]


def in_guest(path):
    """Where a file of a package stands in the guest, whose /bin, /sbin and /lib are links into /usr."""
    return path if path.startswith(("usr/", "etc/")) else "usr/" + path


def programs(unpacked):
    """Files by their places in the guest."""
    found = {}
    for name in HOST_PROGRAMS:
        path = shutil.which(name, path="/usr/sbin:/usr/bin:/sbin:/bin")
        if not path:
            raise Failed(f"{name} is not on this machine, but the guest needs it")
        found["usr/bin/" + name] = os.path.realpath(path)
    for path in GUEST_PROGRAMS:
        found[in_guest(path)] = os.path.join(unpacked, path)
    return found


def search_path(unpacked):
    return ":".join(os.path.join(unpacked, folder, "x86_64-linux-gnu") for folder in ("lib", "usr/lib"))


def needed_libraries(files, unpacked):
    """The libraries that programs need, as the guest will find them."""
    found = set()
    for file in files:
        listing = subprocess.run(["ldd", file], capture_output=True, text=True, check=False,
                                 env=os.environ | {"LD_LIBRARY_PATH": search_path(unpacked)})
        if listing.returncode != 0:
            raise Failed(f"ldd {file}: {listing.stderr}")
        found.update(libraries_of(listing.stdout))
    return sorted(found)


def libraries_of(listing):
    """The files that ldd names."""
    for line in listing.splitlines():
        name, arrow, path = line.strip().partition(" => ")
        if arrow and path.startswith("not found"):
            raise Failed(f"the library {name} is on this machine no more than in the guest's packages")
        if arrow:
            yield path.split(" (")[0]


def plain_kernel(path):
    """The kernel out of its compressed form: unpacking it under emulation would take longer than all of booting."""
    with open(path, "rb") as file:
        data = file.read()
    if data[0x202:0x206] != b"HdrS":
        raise Failed(f"{path} is no kernel")
    sectors = data[0x1F1] or 4
    offset, length = struct.unpack_from("<II", data, 0x248)
    start = (sectors + 1) * 512 + offset
    return lzma.LZMADecompressor(lzma.FORMAT_XZ).decompress(data[start:start + length])


def with_dependencies(names, dependencies):
    """Files of modules and of what those need, by the text of modules.dep."""
    needs, files = {}, {}
    for line in dependencies.splitlines():
        file, _, rest = line.partition(":")
        needs[file] = rest.split()
        files[module_name(file)] = file
    missing = [name for name in names if module_name(name) not in files]
    if missing:
        raise Failed(f"the kernel's package has no module {', '.join(missing)}")
    chosen = {files[module_name(name)] for name in names}
    return sorted(chosen.union(*(needs[file] for file in chosen)))


def module_name(file):
    return os.path.basename(file).split(".ko")[0].replace("-", "_")


def depmod(unpacked, base, version):
    """The lists by which modprobe finds modules."""
    subprocess.run(["depmod", "-b", base, version], executable=os.path.join(unpacked, "bin/kmod"), check=True,
                   env={"LD_LIBRARY_PATH": search_path(unpacked), "PATH": os.environ["PATH"]})


def choose_modules(work, unpacked):
    """A folder with lib/modules/VERSION of the few modules that the guest needs, out of thousands."""
    version = os.path.basename(only(unpacked + "/lib/modules/*"))
    source = os.path.join(unpacked, "lib/modules", version)
    if not os.path.exists(source + "/modules.dep"):
        depmod(unpacked, unpacked, version)
    with open(source + "/modules.dep", encoding="utf-8") as file:
        chosen = with_dependencies(MODULES, file.read())
    base = os.path.join(work, "modules")
    shutil.rmtree(base, ignore_errors=True)
    target = os.path.join(base, "lib/modules", version)
    for file in [*chosen, "modules.order", "modules.builtin", "modules.builtin.modinfo"]:
        os.makedirs(os.path.dirname(os.path.join(target, file)), exist_ok=True)
        shutil.copyfile(os.path.join(source, file), os.path.join(target, file))
    depmod(unpacked, base, version)
    return base


def add_tree(image, base, path):
    """A file, or a folder with all that is in it."""
    full = os.path.join(base, path)
    if os.path.islink(full):
        image.link(in_guest(path), os.readlink(full))
    elif os.path.isdir(full):
        for name in os.listdir(full):
            add_tree(image, base, os.path.join(path, name))
    else:
        image.file(in_guest(path), full)


def contents(work, unpacked, sources, libraries):
    image = archive.Archive()
    for folder in ("dev", "proc", "sys", "run", "tmp", "host", "etc", "var/lib", "mnt", "usr/lib64"):
        image.folder(folder)
    for path, source in sources.items():
        image.file(path, source)
    for source in libraries:
        image.file(f"{LIBRARIES}/{os.path.basename(source)}", source)
    image.file("usr" + LOADER, os.path.realpath(LOADER))
    for path in GUEST_FILES.split():
        add_tree(image, unpacked, path)
    add_tree(image, choose_modules(work, unpacked), "lib/modules")
    with open(HERE + "/init", encoding="utf-8") as file:
        image.text("usr/sbin/lab-init", file.read(), 0o755)
    image.text("etc/passwd", "root:x:0:0:root:/:/bin/sh\n")
    image.text("etc/machine-id", MACHINE_ID + "\n")
    for path in ("etc/group", "etc/ld.so.conf"):
        image.file(path, "/" + path)
    for path, target in LINKS.items():
        image.link(path, target)
    add_names(image, unpacked)
    return image


def add_names(image, unpacked):
    """Programs that go by several names."""
    for name in KMOD_NAMES:
        image.link("usr/sbin/" + name, "/usr/bin/kmod")
    for path in glob.glob(unpacked + "/sbin/*"):
        if os.path.islink(path) and os.readlink(path) == "lvm":
            image.link("usr/sbin/" + os.path.basename(path), "lvm")
    image.link("usr/sbin/cache_check", "pdata_tools")
    busybox = os.path.join(unpacked, "bin/busybox")
    image.file("usr/bin/busybox", busybox)
    for name in packages.output(busybox, "--list").split():
        if f"usr/bin/{name}" not in image and f"usr/sbin/{name}" not in image:
            image.link("usr/bin/" + name, "busybox")
