"""Writes the archive that the kernel unpacks as its first file system: cpio, in the format `newc`."""

import os
import stat


class Archive:
    """Files of the host by the paths that they get in the guest. Folders above them come by themselves."""

    def __init__(self):
        self._entries = {}  # path -> (mode, content, or file that holds it)

    def folder(self, path):
        self._above(path)
        self._entries.setdefault(path, (stat.S_IFDIR | 0o755, b""))

    def link(self, path, target):
        self._above(path)
        self._entries[path] = (stat.S_IFLNK | 0o777, target.encode())

    def text(self, path, content, mode=0o644):
        self._above(path)
        self._entries[path] = (stat.S_IFREG | mode, content.encode())

    def file(self, path, source):
        self._above(path)
        self._entries[path] = (stat.S_IFREG | stat.S_IMODE(os.stat(source).st_mode), source)

    def __contains__(self, path):
        return path in self._entries

    def _above(self, path):
        above = os.path.dirname(path)
        if above and above not in self._entries:
            self.folder(above)

    def write(self, out):
        """Folders before what is in them, since the kernel makes none by itself."""
        for number, (path, (mode, content)) in enumerate(sorted(self._entries.items()), 1):
            if isinstance(content, str):
                with open(content, "rb") as file:
                    content = file.read()
            out.write(entry(number, path, mode, content))
        out.write(entry(0, "TRAILER!!!", 0, b""))


def entry(number, path, mode, content):
    name = path.encode() + b"\0"
    links = 2 if stat.S_ISDIR(mode) else 1
    fields = (number, mode, 0, 0, links, 0, len(content), 0, 0, 0, 0, len(name), 0)
    head = b"070701" + b"".join(b"%08X" % field for field in fields)
    return padded(head + name) + padded(content)


def padded(data):
    return data + b"\0" * (-len(data) % 4)
