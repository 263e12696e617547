"""What a request may change of a host, which is nothing that it does not name; and whether its answer is true.

Hosts are descriptions as the agent gives them out, empty lists included. These rules know nothing of how the agent
comes to its decisions: they look at the host before, the host after, and the names in the request.
"""

from host_states import QUERIES, request_name

# What the kernel writes on a disk when it takes it up or lets it go.
WRITTEN = ("kovaUuid", "formatVersion")
OFFLINE = 6  # the kernel's reason against a disk of a group that is not mounted


def violation(operation, named, before, after):
    """What the request changed though it must not; None if all is well."""
    if operation in QUERIES:
        return None if before == after else "a query changed the host"
    for key in sorted(before.keys() | after.keys()):
        if key not in ("disks", "groups") and before.get(key) != after.get(key):
            return f"the request changed '{key}'"
    return Comparison(operation, named, before, after).violation()


def members_of(host):
    """{disk: cache disk of its group}"""
    return {name: group["ssd"] for group in host["groups"] for name in [group["ssd"], *group["capacity"]]}


def is_mounted(group):
    return group.get("mounted", True)


def untruth(operation, answer, before, after):
    """What the answer says has been done and has not; None if all is well."""
    if operation.startswith("Remove") and answer.fault is None and before == after:
        return "nothing was removed, and nobody was told"
    heads = {group["ssd"]: group for group in after["groups"]}
    offline = heads_offline(before)
    called = {}
    for disk in after["disks"]:
        called.setdefault(request_name(disk), set()).add(disk["name"])
    for names in answer.groups:
        if names[0].startswith("kova:") and operation != "UnmountDiskMapping":  # it only gets another identity
            known = any("kova:" + disk.get("kovaUuid", "") == names[0] and disk["name"] in heads
                        for disk in after["disks"])
            if not known:
                return f"no group is headed by '{names[0]}'"
            continue
        group = heads.get(names[0])
        # One that was offline comes back as it is, whatever disks the request gives it.
        if group is None or not (names[0] in offline or holds(group, names, called)):
            return f"there is no group of {names}"
        mounted = operation != "UnmountDiskMapping"
        if is_mounted(group) != mounted:
            return f"the group of '{names[0]}' is not {'mounted' if mounted else 'unmounted'}"
    return None


def heads_offline(host):
    """The cache disks of groups that are not mounted, or of which the kernel says so."""
    said = {disk["name"] for disk in host["disks"] if (disk.get("verdict") or {}).get("reason") == OFFLINE}
    return {group["ssd"] for group in host["groups"] if not is_mounted(group) or group["ssd"] in said}


def holds(group, names, called):
    """Whether the group has a disk for each of the names; more than one disk that has left may bear the same."""
    members = {group["ssd"], *group["capacity"]}
    return all(members & called.get(name, set()) for name in names)


class Comparison:
    def __init__(self, operation, named, before, after):
        self.operation = operation
        self.before, self.after = before, after
        self.named = {disk["name"] for disk in before["disks"] if request_name(disk) in named}
        self.old, self.new = members_of(before), members_of(after)

    def violation(self):
        return self.of_disks() or self.of_memberships() or self.of_groups()

    def of_disks(self):
        old, new = self.before["disks"], self.after["disks"]
        if [disk["name"] for disk in old] != [disk["name"] for disk in new]:
            return "disks of the host came or went"
        for one, other in zip(old, new):
            name = one["name"]
            changed = [key for key in one.keys() | other.keys() if one.get(key) != other.get(key)]
            if set(changed) - set(WRITTEN):
                return f"the request changed {changed} of the disk '{name}'"
            # A disk that has left may be forgotten without being in a group.
            is_forgotten = self.operation == "RemoveDisk" and one.get("absent") and name in self.named
            if changed and self.old.get(name) == self.new.get(name) and not is_forgotten:
                return f"the disk '{name}' was written to, but neither joined nor left a group"
        return None

    def of_memberships(self):
        joined = {name for name in self.new if name not in self.old}
        left = {name for name in self.old if name not in self.new}
        if any(self.old[name] != self.new[name] for name in self.old.keys() & self.new.keys()):
            return "a disk went from one group to another"
        return self.of_joining(joined) or self.of_leaving(left)

    def of_joining(self, joined):
        if not joined:
            return None
        if self.operation not in ("AddDisks", "InitializeDisks", "AddAllEligibleDisks"):
            return f"disks were formatted: {joined}"
        if self.operation != "AddAllEligibleDisks" and joined - self.named:
            return f"disks were formatted that the request does not name: {joined - self.named}"
        flash = {disk["name"] for disk in self.before["disks"] if disk["ssd"]}
        if not {self.new[name] for name in joined} <= flash | set(self.old.values()):
            return "a group was made with a hard disk for its cache"
        unfit = {disk["name"]: self.why_unfit(disk) for disk in self.before["disks"] if disk["name"] in joined}
        return next((f"the disk '{name}' was formatted, which {why}" for name, why in unfit.items() if why), None)

    def why_unfit(self, disk):
        """Why no group may be made of the disk; None where one may, or where the kernel has its own mind."""
        transport = None if "verdict" in disk else disk.get("transport")
        return next((why for is_so, why in [
            (disk.get("absent"), "has left"), (not disk.get("inKernel", True), "the kernel does not know"),
            (disk.get("partitions"), "holds partitions"), (transport == "usb", "is attached by USB"),
            (not disk.get("inInventory", True), "the inventory lacks"),
            (self.before.get("storageSystem") == "missing", "no inventory knows"),
            (not disk.get("local", True) and "verdict" not in disk, "is not local")] if is_so), None)

    def of_leaving(self, left):
        if not left:
            return None
        if self.operation not in ("RemoveDisk", "RemoveDiskMapping"):
            return f"disks left their groups: {left}"
        absent = [disk for disk in self.before["disks"] if disk.get("absent") and disk["name"] in self.named
                  and (disk.get("inKernel", True) or disk["name"] in self.old)]
        if self.operation == "RemoveDisk" and len(absent) > 1:
            return f"of several disks that have left with one name, one was removed: {left}"
        # A cache disk that is named takes its group along.
        strangers = {name for name in left if not {name, self.old[name]} & self.named}
        if strangers:
            return f"disks left their groups that the request does not name: {strangers}"
        heads = {self.old[name] for name in left}
        if self.operation == "RemoveDiskMapping" and {name for name in self.old if self.old[name] in heads} != left:
            return f"a part of a group was removed: {left}"
        return None

    def of_groups(self):
        after = {group["ssd"]: group for group in self.after["groups"]}
        for group in self.before["groups"]:
            was, now = is_mounted(group), is_mounted(after.get(group["ssd"], group))
            if was == now:
                continue
            allowed = {"UnmountDiskMapping": was and group["ssd"] in self.named,
                       "AddDisks": not was and group["ssd"] in self.named,
                       "InitializeDisks": not was and group["ssd"] in self.named,
                       "ClaimUnmountedDiskgroup": not was}.get(self.operation, False)
            if not allowed:
                return f"the group of '{group['ssd']}' was {'unmounted' if was else 'mounted'}"
        return None
