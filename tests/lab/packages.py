"""Debian packages that the guest is made from: downloaded once, unpacked into a folder, never installed."""

import glob
import os
import re
import shutil
import subprocess
import tempfile

LIST = os.path.join(os.path.dirname(__file__), "../../tools/setup/packages.txt")
PURPOSE = "lab-guest"
LIMIT = 600  # seconds for a download


class Failed(Exception):
    """A package cannot be had; says why."""


def listed(text, purpose=PURPOSE):
    """The packages of one purpose in tools/setup/packages.txt."""
    lines = (line.split(":", 1) for line in text.splitlines() if ":" in line and not line.startswith("#"))
    return [name for head, names in lines if head == purpose for name in names.split()]


def kernel_of(depends):
    """The kernel's own package, in what its package of packages depends on."""
    found = re.search(r"\blinux-image-\d[^ ,]*", depends)
    if not found:
        raise Failed(f"no kernel among the dependencies: {depends}")
    return found.group()


def fetch(cache):
    """The packages' files in the cache. What is there already is taken as it is."""
    os.makedirs(cache, exist_ok=True)
    with open(LIST, encoding="utf-8") as file:
        names = listed(file.read())
    files = fetch_named(names, cache)
    kernel = kernel_of(output("dpkg-deb", "-f", cached("linux-image-amd64", cache), "Depends"))
    return files + fetch_named([kernel], cache)


def cached(name, cache):
    found = glob.glob(os.path.join(cache, glob.escape(name) + "_*.deb"))
    return max(found, key=os.path.getmtime) if found else None


def fetch_named(names, cache):
    missing = [name for name in names if not cached(name, cache)]
    if missing:
        print("Downloading packages for the guest:", *missing, flush=True)
        with tempfile.TemporaryDirectory(dir=cache) as folder:
            download(missing, folder)
            for file in os.listdir(folder):
                os.replace(os.path.join(folder, file), os.path.join(cache, file))
    return [cached(name, cache) for name in names]


def download(names, folder):
    """A second time with fresh lists of packages, should those have aged; only root may fetch lists."""
    command = ["apt-get", "download", "-q", *names]
    if attempt(command, folder).returncode == 0:
        return
    if os.geteuid() == 0:
        attempt(["apt-get", "update", "-q"], folder)
    second = attempt(command, folder)
    if second.returncode != 0:
        raise Failed("packages cannot be had; if the lists of packages are old, apt-get update\n" + second.stderr)


def attempt(command, folder):
    try:
        return subprocess.run(command, cwd=folder, capture_output=True, text=True, check=False, timeout=LIMIT)
    except subprocess.TimeoutExpired:
        raise Failed(f"{' '.join(command)} has not ended after {LIMIT} s") from None


def unpack(files, folder):
    """Into one folder, which other packages than these have not been unpacked into."""
    wanted = "\n".join(sorted(os.path.basename(file) for file in files))
    mark = os.path.join(folder, "unpacked-packages")
    if os.path.exists(mark):
        with open(mark, encoding="utf-8") as file:
            if file.read() == wanted:
                return
    shutil.rmtree(folder, ignore_errors=True)
    os.makedirs(folder)
    for file in files:
        output("dpkg", "-x", file, folder)
    with open(mark, "w", encoding="utf-8") as file:
        file.write(wanted)


def output(*command):
    done = subprocess.run(command, capture_output=True, text=True, check=False)
    if done.returncode != 0:
        raise Failed(f"{' '.join(command)}: {done.stderr}")
    return done.stdout
