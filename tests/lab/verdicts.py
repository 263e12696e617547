"""What is said of the lab's disks, and what is expected of it."""

import disks

# By the name of a disk: the fault that it cannot be used for, and words of its `detail`. All others are eligible.
AGAINST = {
    "parted": ("DiskHasPartitions", "gpt partition table with 1 partition"),
    "tiny": ("DiskTooSmall", "smaller than 1 GiB"),
    "twice": ("DiskHasPartitions", "same disk as naa.5000c50000000600"),
    "usb": ("DiskIsUSB", "attached by USB"),
}


def by_serial(results):
    """{serial number: results}, of `kovactl disks -o json`: a disk that is seen twice has two."""
    found = {}
    for result in results:
        found.setdefault(result["disk"]["serialNumber"], []).append(result)
    return found


def faults(results):
    """{serial number: fault types}, nothing for what is eligible."""
    return {serial: [result.get("error", {}).get("@type") for result in same]
            for serial, same in by_serial(results).items()}


def expected_faults(shown=disks.DISKS):
    return {disk.serial: [AGAINST.get(disk.name, (None,))[0]] * len(disk.path_names()) for disk in shown}


def disagreements(results, shown=disks.DISKS):
    """In words, what the results say otherwise than expected; `detail` must say why not."""
    found = []
    said = by_serial(results)
    for disk in shown:
        fault, words = AGAINST.get(disk.name, (None, ""))
        same = said.pop(disk.serial, [])
        if len(same) != len(disk.path_names()):
            found.append(f"{disk.name}: told of {len(same)} times, has {len(disk.path_names())} paths")
        for result in same:
            found += differences(disk, result, fault, words)
    return found + [f"{serial}: not one of the machine's disks" for serial in said]


def differences(disk, result, fault, words):
    told, detail = result.get("error", {}).get("@type"), result["disk"].get("detail", "")
    size = result["disk"]["capacity"]["blockSize"] * result["disk"]["capacity"]["block"]
    if told != fault:
        yield f"{disk.name}: {told} instead of {fault}: {detail}"
    if words not in detail or (fault is None and detail):
        yield f"{disk.name}: the detail is {detail!r}, not {words!r}"
    if size != disk.size:
        yield f"{disk.name}: {size} bytes instead of {disk.size}"
    if result["disk"]["ssd"] == disk.rotational:
        yield f"{disk.name}: flash is {result['disk']['ssd']}"
