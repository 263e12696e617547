"""What stands on disks, seen from outside: in the files that hold their data. Blank disks cost nothing."""

import hashlib
import os
import random

BLOCK = 64 << 10


def mark(path, seed):
    """Writes data that nobody takes for anything: near the beginning, in the middle, and near the end."""
    size = os.path.getsize(path)
    data = random.Random(seed).randbytes(BLOCK)
    with open(path, "r+b") as file:
        for offset in (1 << 20, size // 2 // BLOCK * BLOCK, size - (1 << 20)):
            file.seek(offset)
            file.write(data)


def digest(path):
    """Of all that is not zero, and of where it stands."""
    found = hashlib.sha256()
    with open(path, "rb") as file:
        for start, end in data_ranges(file):
            file.seek(start)
            while start < end:
                block = file.read(min(BLOCK, end - start))
                if not block:
                    break
                if block.count(0) != len(block):
                    found.update(start.to_bytes(8, "little") + block)
                start += len(block)
    return found.hexdigest()


def data_ranges(file):
    """Where there may be something, in whole blocks: [start, end)."""
    size, position = os.fstat(file.fileno()).st_size, 0
    while position < size:
        try:
            start = os.lseek(file.fileno(), position, os.SEEK_DATA)
        except OSError:  # nothing but zeros up to the end
            return
        position = os.lseek(file.fileno(), start, os.SEEK_HOLE)
        start = max(start // BLOCK * BLOCK, 0)
        position = -(-position // BLOCK) * BLOCK
        yield start, min(position, size)
