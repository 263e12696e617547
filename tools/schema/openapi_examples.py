"""Examples for the description of the JSON API: what is sent, and what then comes back."""

CACHE, CAPACITY, STICK = "naa.5000c50000000100", "naa.5000c50000000200", "t10.EXAMPLE_STICK_USB0400"


def disk(name, ssd, blocks):
    return {"@type": "HostScsiDisk", "deviceName": f"/dev/disks/{name}", "deviceType": "disk",
            "uuid": "0200", "canonicalName": name, "lunType": "disk", "operationalState": ["ok"],
            "capacity": {"@type": "HostDiskDimensionsLba", "blockSize": 512, "block": blocks}, "ssd": ssd}


CACHE_DISK, CAPACITY_DISK = disk(CACHE, True, 781422768), disk(CAPACITY, False, 7814037168)
MAPPING = {"@type": "KovaHostDiskMapping", "ssd": CACHE_DISK, "nonSsd": [CAPACITY_DISK]}
BY_NAME = {"ssd": CACHE, "nonSsd": [CAPACITY]}


def result(of, state, **more):
    return {"@type": "KovaHostDiskResult", "disk": of, "state": state, **more}


def answer(value=None, **more):
    return {**more, "result": value, "fault": None}


DISKS = answer([result(CAPACITY_DISK, "eligible"),
                result(disk(STICK, False, 62521344), "ineligible", error={"@type": "DiskIsUSB", "device": STICK})])
GROUPS = answer({"@type": "KovaHostConfigInfoStorageInfo", "autoClaim": False, "diskMapping": [MAPPING],
                 "diskMapInfo": [{"@type": "KovaHostDiskMapInfo", "mapping": MAPPING, "mounted": True,
                                  "volume": [{"@type": "KovaHostDataVolume", "disk": CAPACITY,
                                              "path": "/dev/kova_1a2b/data_3c4d", "bytes": 3998639521792,
                                              "cacheState": "cached, 37% used"}]}]})
CONFIG = answer({"@type": "KovaHostConfigInfo", "enabled": True,
                 "clusterInfo": {"@type": "KovaHostConfigInfoClusterInfo",
                                 "clusterUuid": "52e1cd1c-22b5-4b9a-8f0d-6c1d2f3a4b5c"},
                 "faultDomainInfo": {"@type": "KovaHostConfigInfoFaultDomainInfo", "name": "rack-1"}})
TWIN = answer({"@type": "KovaHostTwin", "generation": "9b1d6c0f5e2a7348",
               "description": '{"disks": [{"name": "%s", "ssd": true, "bytes": 400088457216}]}' % CACHE})
TASK_ID = "task-1a2b3c4d-7"
MADE = answer([{"@type": "KovaHostDiskMapResult", "mapping": MAPPING,
                "diskResult": [result(CACHE_DISK, "inUse"), result(CAPACITY_DISK, "inUse")]}], task=TASK_ID)
UNMOUNTED = answer([{"@type": "KovaHostDiskMapResult", "mapping": MAPPING}], task=TASK_ID)
SILENT = answer(task=TASK_ID)
TASK_FIELDS = {"id": TASK_ID, "label": "rack 3", "operation": "AddDisks", "state": "done", "created": "2024-03-01T10:00:00Z",
        "started": "2024-03-01T10:00:00Z", "ended": "2024-03-01T10:00:04Z", "percent": 100, "step": ""}
TASK = {**TASK_FIELDS, "fault": None}

# operationId: (body or None, answer)
EXAMPLES = {
    "QueryDisksForKova": ({"names": [CAPACITY, STICK]}, DISKS),
    "GetDiskGroups": ({}, GROUPS),
    "GetStorageInfo": ({}, GROUPS),
    "GetConfigInfo": ({}, CONFIG),
    "GetTwin": ({}, TWIN),
    "AddDisks": ({"disks": [CACHE, {"canonicalName": CAPACITY}], "label": "rack 3"}, MADE),
    "AddAllEligibleDisks": ({"label": "rack 3"}, MADE),
    "InitializeDisks": ({"mappings": [BY_NAME]}, MADE),
    "UnmountDiskMapping": ({"mappings": [BY_NAME]}, UNMOUNTED),
    "ClaimUnmountedDiskgroup": ({}, SILENT),
    "GetTasks": ({}, answer([{"@type": "Task", **TASK_FIELDS}])),
    "GetTask": ({"id": TASK_ID}, answer({"@type": "Task", **TASK_FIELDS, "result": MADE["result"]})),
    "RemoveDisk": ({"disk": CAPACITY}, SILENT),
    "RemoveDiskMapping": ({"mapping": BY_NAME}, SILENT),
    "listDisks": (None, DISKS),
    "listGroups": (None, GROUPS),
    "readConfig": (None, CONFIG),
    "listTasks": (None, {"tasks": [TASK]}),
    "readTask": (None, {**TASK, "result": MADE["result"]}),
    "readHost": (None, {"name": "example", "disks": [{"name": CAPACITY, "bytes": 4000787030016}]}),
    "changeHost": ({"disk": {"name": CAPACITY, "absent": True}}, SILENT),
    "readHealth": (None, "ok\n"),
    "readMetrics": (None, "kova_agent_queries_waiting 0\n"),
}



def example_of(operation_id):
    """(body or None, answer). An operation that has none of its own: nothing is asked, nothing said."""
    return EXAMPLES.get(operation_id, ({}, answer()))


WAITING = {**{key: TASK[key] for key in ("id", "label", "operation", "created")}, "state": "waiting", "percent": 0,
           "step": ""}


def refused(kind, message, **more):
    return answer() | {"fault": {"@type": kind, "faultMessage": [
        {"@type": "LocalizableMessage", "key": "nox.agentd.gate.invalidArgument", "message": message}], **more}}


# status: answer
FAULTS = {
    "400": refused("InvalidArgument", "disks[0]: this host has no disk 'naa.1'", argument="disks[0]"),
    "403": refused("NotPermitted", "this takes the role 'change'; uid 1000 has the role 'read'", role="change"),
    "404": refused("InvalidArgument", "no task of that id; those that ended long ago are forgotten"),
    "409": answer() | {"fault": {"@type": "DiskIsLastRemainingNonSSD", "device": CAPACITY}},
    "415": refused("InvalidArgument", "the body must be application/json"),
    "500": answer() | {"fault": {"@type": "SystemError", "reason": "the kernel does not answer"}},
    "503": refused("Busy", "The agent has 64 changes waiting; try again later.", retryAfterSeconds=5),
}
