"""Hosts in any state that a description allows, what may happen to them, and what clients may ask of them.

Everything is drawn from one generator of random numbers: the same seed brings the same hosts and requests back.
A request is (operation, parameters) as a JSON client writes them.
"""

UUID = "01234567-89ab-cdef-0123-456789abcdef"
OTHER_UUID = "fedcba98-7654-3210-fedc-ba9876543210"
UUIDS = [UUID, OTHER_UUID, UUID[:-1], UUID + "0", "", "x", "../" + UUID]

# Names that a host may have, if an odd one.
ODD_NAMES = ['naa."quoted"', "naa.with blank", " ", "'", "--save", "-", "../../etc/passwd", "/dev/sda", "kova:", "kova",
             "kova:" + UUID, "KOVA:" + UUID, "Kova:" + UUID, "kova:" + UUID[:-1], "kova:" + UUID + "0",
             " kova:" + UUID, "a&b<c>]]>", "%s%n%1%2%9", "\\", "\\u0000", "naa.\u00fc\u4e2d\U0001f4be", "unknown",
             "null", "x" * 1024, "y" * 1025, "z" * 65536]
# Names and texts that only a client comes up with.
BAD_NAMES = ["", "a\nb", "\t", "\r", "a\u0000b", "\u001b[2J", "\u007f", "\u0085", "\ufffe", "w" * (1 << 17)]
TRANSPORTS = ["sas", "sata", "nvme", "usb", ""]
LUNS = ["disk", "tape", "cdrom", "enclosure", "unknown", None]

EXCEPTIONS = ["KovaExceptionHasPartition", "KovaExceptionLastRemainingHDD", "KovaExceptionRescanError",
              "KovaExceptionRemoveMappingAutoModeEnabled", "KovaExceptionRemoveDiskAutoModeEnabled",
              "KovaStorageException", "KovaExceptionIncompatibleDiskMapping", "HostCtlException", "std::runtime_error"]
PROVIDER_OPERATIONS = ["QueryDisks", "GetDiskMappings", "FormatDiskMapping", "RestampDiskMapping", "MountDiskMapping",
                       "RestampDiskMappingByUuid", "RemoveDisk", "RemoveDiskMapping", "UnmountDiskMapping",
                       "RemoveDiskByUuid", "IsAutoModeEnabled", "GetKovaOtxNicConfigs", "GetClusterInfoDetailed",
                       "GetFaultDomainName", "ClaimUnmountedDiskgroups", "RefreshKovaInfo"]
ASKED_ALWAYS = ["RefreshKovaInfo", "QueryDisks", "GetDiskMappings", "FormatDiskMapping"]
OPERATIONS = ["QueryDisksForKova", "GetStorageInfo", "GetDiskGroups", "GetConfigInfo", "GetTwin", "AddDisks",
              "AddAllEligibleDisks", "InitializeDisks", "UnmountDiskMapping", "RemoveDisk", "RemoveDiskMapping",
              "ClaimUnmountedDiskgroup"]
QUERIES = OPERATIONS[:5]


def request_name(disk):
    """What requests call a disk of a description."""
    return "kova:" + disk.get("kovaUuid", "") if disk.get("absent") else disk["name"]


class Draw:
    """Draws a host, and the events and requests of its life.

    Most lives lean towards something, since rare things seldom meet by themselves: many disks have the same flaw, the
    kernel cannot be asked, half of the requests are of one operation.
    """

    def __init__(self, rng):
        self.rng = rng
        self.favourite = rng.choice(OPERATIONS[5:])
        self.is_kernel_away = False
        flaw = self.oddity() if self.chance(2) else {}
        self.flaw = lambda: flaw
        rng.choice([self.lean_to_nothing] * 2 + [self.lean_to_silence, self.lean_to_absence, self.lean_to_strangers])()

    def lean_to_nothing(self):
        pass

    def lean_to_silence(self):
        """The kernel cannot be asked about disks that it would refuse."""
        self.is_kernel_away = True
        self.favourite = self.rng.choice(["AddDisks", "InitializeDisks", "InitializeDisks", "AddAllEligibleDisks"])
        flaw = self.rng.choice([{"local": False}, {"transport": "usb"}])
        self.flaw = lambda: flaw

    def lean_to_absence(self):
        """Disks have left, perhaps all with one UUID, and are to be removed."""
        self.favourite = self.rng.choice(["RemoveDisk", "RemoveDiskMapping"])
        same = self.absence()
        self.flaw = (lambda: same) if self.chance(2) else self.absence

    def lean_to_strangers(self):
        """Disks are used that the kernel knows and the inventory does not."""
        self.favourite = self.rng.choice(["AddDisks", "InitializeDisks", "AddAllEligibleDisks"])
        self.flaw = lambda: {"inInventory": False}

    def uuid(self):
        """One of its own, or one that several disks may bear."""
        digits = f"{self.rng.getrandbits(128):032x}"
        own = "-".join([digits[:8], digits[8:12], digits[12:16], digits[16:20], digits[20:]])
        return own if self.chance(2) else self.rng.choice(UUIDS)

    def absence(self):
        return {"absent": True, "kovaUuid": self.uuid()}

    def chance(self, one_in):
        return self.rng.randrange(one_in) == 0

    # ---- hosts

    def host(self):
        """A whole description but for its faults: every key that a change can set."""
        shapes = [self.small_host] * 6 + [self.full_host, self.bare_host]
        disks, groups = self.rng.choice(shapes)()
        return {"name": self.rng.choice(["a", "", "host \"b\""]), "autoMode": self.chance(5),
                "minimumDiskBytes": self.rng.choice([0, 0, 0, 1 << 30, (1 << 63) - 1]),
                "storageSystem": "missing" if self.chance(10) else "present",
                "cluster": {"enabled": self.chance(2), "clusterUuid": self.rng.choice(UUIDS)},
                "faultDomain": self.rng.choice(["", "rack-1", "a&b"]), "networks": self.networks(),
                "disks": disks, "otherLuns": [self.rng.choice(LUNS) for _ in range(self.rng.randrange(4))],
                "groups": groups, "faults": []}

    def networks(self):
        addresses = ["224.1.2.3", "FF19::4", "", "no address", "300.1.1.1", ":::::"]
        return [{"interface": "otx1", "masterMulticastGroup": self.rng.choice(addresses),
                 "agentMulticastGroup": self.rng.choice(addresses)} for _ in range(self.rng.randrange(3))]

    def small_host(self):
        names = [f"naa.{number}" for number in range(self.rng.randint(2, 14))]
        if self.chance(3):
            names += self.rng.sample(ODD_NAMES, self.rng.randint(1, 4))
        self.rng.shuffle(names)
        disks = [self.disk(name, ssd=self.chance(3)) for name in names]
        free = list(disks)
        groups = []
        while len(free) > 2 and not self.chance(3):
            members = [free.pop() for _ in range(self.rng.randint(1, min(5, len(free))))]
            members[0]["ssd"] = not self.chance(12)
            groups.append(self.group([disk["name"] for disk in members]))
            if self.chance(3):
                self.rng.choice(members).update(self.loss())
        return disks, groups

    def loss(self):
        """How a disk goes missing: from the host, from the inventory, from the kernel."""
        return self.rng.choice([self.absence(), {"inInventory": False}, {"inKernel": False}])

    def full_host(self):
        """Five groups or more, with all the disks that a group may have or nearly so, and some to spare."""
        disks, groups = [], []
        for group in range(self.rng.randint(5, 6)):
            names = [f"naa.{group}.{number}" for number in range(self.rng.choice([8, 8, 7, 9]))]
            disks += [self.disk(name, ssd=name == names[0], odd=60) for name in names]
            groups.append(self.group(names))
        return disks + [self.disk(f"naa.free{number}", ssd=number < 2, odd=60) for number in range(10)], groups

    def bare_host(self):
        return [self.disk(f"naa.{number}", ssd=self.chance(2)) for number in range(self.rng.randrange(3))], []

    def group(self, names):
        return {"ssd": names[0], "capacity": names[1:], "allFlash": self.chance(5), "mounted": not self.chance(2),
                "formatVersion": self.rng.choice([3, 3, 0, 255]), "busy": self.chance(6)}

    def disk(self, name, ssd, odd=6):
        disk = {"name": name, "ssd": ssd, "bytes": 1 << 40}
        while self.chance(odd):
            disk.update(self.oddity())
        if self.chance(3):
            disk.update(self.flaw())
        if self.chance(4):
            disk["kovaUuid"] = self.uuid()
        return disk

    def oddity(self):
        """Some keys of a disk, as they may be or become."""
        return self.rng.choice([
            self.loss(), self.loss(), {"absent": False}, {"inInventory": True}, {"inKernel": True},
            {"partitions": self.rng.choice([0, 1, 99])},
            {"bytes": self.rng.choice([0, 1, (1 << 63) - 1])}, {"local": self.chance(2)},
            {"transport": self.rng.choice(TRANSPORTS)}, {"ssd": self.chance(2)}, {"capacityFlash": self.chance(2)},
            {"blockSize": self.rng.choice([1, 4096, (1 << 31) - 1])}, {"formatVersion": self.rng.choice([0, 1, 255])},
            {"verdict": {"state": self.rng.choice([0, 1, 2, 3, -1, 99]), "reason": self.rng.randint(-1, 9)}},
            {"verdict": {"state": 1, "reason": 0}}, {"verdict": None},
            {"verdict": {"state": 2, "reason": 6}},
            {"durableName": {"authority": "a", "identifier": "i"}, "alternateName": [{}, {"identifier": "j"}],
             "standardInquiry": "AAEC"},
            {"vendor": "a&b", "displayName": "d\u00fc", "serial": "%1"}])

    # ---- what happens to a host

    def event(self, host):
        """The body of a change of the host."""
        if host["disks"] and not self.chance(4):
            return {"disk": {"name": self.rng.choice(host["disks"])["name"], **self.oddity()}}
        groups = [{**group, **self.rng.choice([{"mounted": self.chance(2)}, {"busy": self.chance(2)}])}
                  for group in host["groups"]]
        return {"set": self.rng.choice([
            {"autoMode": self.chance(2)}, {"storageSystem": self.rng.choice(["missing", "present"])},
            {"otherLuns": [self.rng.choice(LUNS)]}, {"minimumDiskBytes": self.rng.choice([0, 1 << 41])},
            {"groups": groups}, {"networks": self.networks()}])}

    def faults(self, calls):
        """Faults of the provider in its next calls; `calls` of each operation were made until now."""
        rules = [{"operation": "QueryDisks", "exception": self.rng.choice(EXCEPTIONS)}] if self.is_kernel_away else []
        while not rules or self.chance(2):
            operation = self.rng.choice(PROVIDER_OPERATIONS + ASKED_ALWAYS * 4)
            call = 0 if self.chance(4) else calls.get(operation, 0) + self.rng.randint(1, 6)
            rules.append({"operation": operation, "call": call, "exception": self.rng.choice(EXCEPTIONS),
                          "message": self.rng.choice(["text", "", "a&b<\u00fc>%1"]),
                          "disk": self.rng.choice(["", "naa.0", "kova:" + UUID, "x" * 2000])})
        return rules

    # ---- requests

    def request(self, host):
        operation = self.favourite if self.chance(2) else self.rng.choice(OPERATIONS)
        parameters = {
            "QueryDisksForKova": lambda: {"names": self.names(host)} if not self.chance(3) else {},
            "AddDisks": lambda: {"disks": [self.named(name) for name in self.names(host)]},
            "InitializeDisks": lambda: {"mappings": self.mappings(host)},
            "UnmountDiskMapping": lambda: {"mappings": self.mappings(host)},
            "RemoveDisk": lambda: {"disk": self.name(host), **self.options()},
            "RemoveDiskMapping": lambda: {"mapping": self.mapping(host), **self.options()},
        }.get(operation, dict)()
        if operation in ("AddDisks", "AddAllEligibleDisks", "InitializeDisks", "UnmountDiskMapping") and self.chance(5):
            parameters["label"] = self.rng.choice(["rack 3", "", "l" * 256])
        return operation, parameters

    def name(self, host):
        odd = self.rng.randrange(40)
        if odd == 0:
            return self.rng.choice(BAD_NAMES)
        if odd < 4 or not host["disks"]:
            return self.rng.choice(ODD_NAMES)
        disk = self.rng.choice(host["disks"])
        return disk["name"] if odd < 8 else request_name(disk)

    def names(self, host):
        kind = self.rng.randrange(5)
        if kind == 0:
            return [self.name(host) for _ in range(self.rng.randrange(8))]
        if kind == 1 and host["groups"]:  # a group again, by its cache disk, and perhaps some more
            names = self.group_names(host)
            return names[:self.rng.choice([1, 1, len(names)])] + self.free(host)[:self.rng.randrange(3)]
        some = [request_name(disk) for disk in host["disks"]] if kind == 2 else self.free(host)
        return self.rng.sample(some, self.rng.randint(len(some) // 2, len(some)))

    @staticmethod
    def free(host, flash=(True, False)):
        """The disks that a group could be made of, as far as one can see."""
        taken = {name for group in host["groups"] for name in [group["ssd"], *group["capacity"]]}
        return [disk["name"] for disk in host["disks"] if disk["name"] not in taken and disk["ssd"] in flash
                and not disk.get("absent") and not disk.get("partitions")]

    def named(self, name):
        """A disk of a request: its name, or an object that may lie about it."""
        if not self.chance(3):
            return name
        disk = {"canonicalName": name, "ssd": self.chance(2), "capacity": {"blockSize": 512, "block": 1}}
        if self.chance(3):
            disk.pop(self.rng.choice(list(disk)))
        return disk

    def mapping(self, host):
        names = self.rng.choice([self.group_names, self.group_names, self.new_group, self.new_group, self.absent_first,
                                 lambda _: []])(host)
        while len(names) < 2 or self.chance(12):
            names.insert(self.rng.randint(0, len(names)), self.name(host))
        if self.chance(12):
            names.pop(self.rng.randrange(len(names)))
        if self.chance(12):
            self.rng.shuffle(names)
        return {"ssd": self.named(names[0]), "nonSsd": [self.named(name) for name in names[1:]]}

    def group_names(self, host):
        if not host["groups"]:
            return []
        called = {disk["name"]: request_name(disk) for disk in host["disks"]}
        group = self.rng.choice(host["groups"])
        return [called.get(name, name) for name in [group["ssd"], *group["capacity"]]]

    def absent_first(self, host):
        """Disks of a group, one that has left in the place of the cache disk."""
        names = self.group_names(host)
        return sorted(names, key=lambda name: not name.startswith("kova:"))

    def new_group(self, host):
        heads, capacity = self.free(host, [True]), self.free(host, [False])
        if not heads or not capacity:
            return []
        return [self.rng.choice(heads), *self.rng.sample(capacity, self.rng.randint(1, min(8, len(capacity))))]

    def mappings(self, host):
        return [self.mapping(host) for _ in range(self.rng.choice([0, 1, 1, 1, 2, 3, 7]))]

    def options(self):
        if not self.chance(4):
            return {}
        return {"passThrough": self.rng.choice(["p", "", "q" * 4096, "q" * 4097, "\n"]),
                "optionText": self.rng.choice(["o", "--force", "a&b", "\u0000"]),
                "optionFirst": self.rng.choice([0, -1, (1 << 31) - 1]), "optionSecond": -(1 << 31)}


def names_in(parameters):
    """Every disk that a request names."""
    if isinstance(parameters, str):
        return {parameters}
    if isinstance(parameters, list):
        return set().union(*map(names_in, parameters))
    if not isinstance(parameters, dict):
        return set()  # the flag of a disk
    parts = ("disks", "disk", "mappings", "mapping", "ssd", "nonSsd", "canonicalName")
    return set().union(*(names_in(parameters[part]) for part in parts if part in parameters))
