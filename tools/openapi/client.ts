// What a client in TypeScript does with the types of the description. It is compiled, never run: if it compiles in the
// strictest mode, a disk or a group of an answer can be handed back as it came, and faults are told apart by their type.

import type { components, operations } from "./generated/agent";

type Body<Name extends keyof operations> = operations[Name] extends {
  requestBody: { content: { "application/json": infer Sent } };
}
  ? Sent
  : never;
type Answer<Name extends keyof operations> = operations[Name] extends {
  responses: { 200: { content: { "application/json": infer Received } } };
}
  ? Received
  : never;

export function addEveryFlashDisk(disks: Answer<"listDisks">): Body<"AddDisks"> {
  const eligible = (disks.result ?? []).filter((one) => one.state === "eligible" && one.disk.ssd);
  return { disks: eligible.map((one) => one.disk), label: "flash" };
}

export function unmountEverything(groups: Answer<"listGroups">): Body<"UnmountDiskMapping"> {
  const mounted = (groups.result?.diskMapInfo ?? []).filter((one) => one.mounted);
  return { mappings: mounted.map((one) => one.mapping) };
}

export function removeFirst(groups: Answer<"GetStorageInfo">): Body<"RemoveDiskMapping"> | undefined {
  const mapping = groups.result?.diskMapping?.[0];
  return mapping && { mapping };
}

export function byName(): Body<"InitializeDisks"> {
  return { mappings: [{ ssd: "naa.1", nonSsd: ["naa.2", { canonicalName: "naa.3", ssd: true }] }] };
}

// What an answer tells of a disk is there, not perhaps there.
export function bytes(disk: components["schemas"]["ReportedDisk"]): number {
  return disk.capacity.block * disk.capacity.blockSize;
}

export function words(fault: components["schemas"]["AnyMethodFault"]): string {
  switch (fault["@type"]) {
    case "SystemError":
      return fault.reason;
    case "InvalidArgument":
      return fault.argument ?? "the request";
    case "Busy":
      return `again in ${fault.retryAfterSeconds} s`;
    case "NotPermitted":
      return fault.role;
    default:
      return fault["@type"];
  }
}

// A state that there is not would be a mistake that the compiler finds.
export function isOver(task: components["schemas"]["Task"]): boolean {
  // @ts-expect-error "finished" is no state
  const wrong = task.state === "finished";
  return wrong || task.state === "done" || task.state === "partly" || task.state === "failed";
}
// @ts-expect-error a disk without its name is none that a request could mean
export const nameless: Body<"AddDisks"> = { disks: [{ ssd: true }] };
