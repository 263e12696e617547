// A client from classes that a generator made of the description; it is built and run by java_test.py. The address is
// the one that stands in the description.
//
//   java Story WSDL SCENE    ends with status 0 when everything was answered as it should be

import java.net.URL;
import java.util.LinkedHashMap;
import java.util.List;
import java.util.Map;
import java.util.concurrent.Callable;
import java.util.logging.LogManager;
import java.util.stream.Collectors;
import javax.xml.ws.Holder;
import nox.DiskHasPartitions;
import nox.DiskIsUSB;
import nox.Fault;
import nox.HostScsiDisk;
import nox.InsufficientDisks;
import nox.InvalidArgument;
import nox.KovaHostConfigInfo;
import nox.KovaHostConfigInfoStorageInfo;
import nox.KovaHostDiskMapResult;
import nox.KovaHostDiskMapping;
import nox.KovaHostDiskResult;
import nox.KovaPort;
import nox.KovaService;
import nox.MethodFault;
import nox.NotPermitted;
import nox.SystemError;

public final class Story {
  private static int failures = 0;

  private final KovaPort port;

  private Story(KovaPort port) {
    this.port = port;
  }

  private static void check(boolean holds, String what) {
    if (!holds) {
      System.err.println(what);
      ++failures;
    }
  }

  private static HostScsiDisk named(String name) {
    HostScsiDisk disk = new HostScsiDisk();
    disk.setCanonicalName(name);
    return disk;
  }

  private static KovaHostDiskMapping group(String ssd, String... capacity) {
    KovaHostDiskMapping mapping = new KovaHostDiskMapping();
    mapping.setSsd(named(ssd));
    for (String name : capacity) {
      mapping.getNonSsd().add(named(name));
    }
    return mapping;
  }

  private Map<String, KovaHostDiskResult> disks(String... names) throws Fault {
    Holder<List<KovaHostDiskResult>> result = new Holder<>();
    port.queryDisksForKova(List.of(names), result, new Holder<>());
    return result.value.stream().collect(Collectors.toMap(r -> r.getDisk().getCanonicalName(), r -> r, (a, b) -> a,
                                                          LinkedHashMap::new));
  }

  // Cache disk: capacity disks, of the mounted groups.
  private Map<String, List<String>> groups() throws Fault {
    Holder<KovaHostConfigInfoStorageInfo> result = new Holder<>();
    port.getStorageInfo(result, new Holder<>());
    Map<String, List<String>> found = new LinkedHashMap<>();
    for (KovaHostDiskMapping mapping : result.value.getDiskMapping()) {
      found.put(mapping.getSsd().getCanonicalName(),
                mapping.getNonSsd().stream().map(HostScsiDisk::getCanonicalName).collect(Collectors.toList()));
    }
    return found;
  }

  private static Fault faultOf(Callable<?> call) throws Exception {
    try {
      call.call();
    } catch (Fault fault) {
      return fault;
    }
    throw new IllegalStateException("there is a fault");
  }

  private void story() throws Exception {
    Map<String, KovaHostDiskResult> disks = disks();
    check(disks.size() == 8 && disks.get("naa.f1").getState().equals("eligible"), "eight disks");
    check(disks.get("naa.u1").getError() instanceof DiskIsUSB, "a disk on USB");
    check(disks("naa.u1").size() == 1, "one by its name");

    Holder<List<KovaHostDiskMapResult>> made = new Holder<>();
    Holder<MethodFault> fault = new Holder<>();
    Holder<String> task = new Holder<>();
    port.addAllEligibleDisks("the first", null, made, fault, task);
    check(fault.value == null && made.value.size() == 2 && !task.value.isEmpty(), "two groups are made");
    check(groups().equals(Map.of("naa.f1", List.of("naa.c1", "naa.c3"), "naa.f2", List.of("naa.c2", "naa.c4"))),
          "groups");
    Holder<KovaHostConfigInfo> config = new Holder<>();
    port.getConfigInfo(config, new Holder<>());
    check(config.value.getFaultDomainInfo().getName().equals("rack-1"), "the fault domain");

    List<KovaHostDiskMapping> first = List.of(made.value.get(0).getMapping());  // as it came
    port.unmountDiskMapping(first, "", true, new Holder<>(), fault, task);
    check(fault.value == null && groups().keySet().equals(java.util.Set.of("naa.f2")), "one group is left");
    port.claimUnmountedDiskgroup(null, null, fault, task);
    check(groups().size() == 2, "it is back");
    port.removeDisk("naa.c1", null, null, null, null, null, null, fault, task);
    check(groups().get("naa.f1").equals(List.of("naa.c3")), "a disk is removed");
    port.removeDiskMapping(group("naa.f1", "naa.c3"), "p", "o", 1, 2, null, null, fault, task);
    check(groups().size() == 1, "a group is removed");
    port.addDisks(List.of(named("naa.f1"), named("naa.c1")), null, null, made, fault, task);
    check(groups().get("naa.f1").equals(List.of("naa.c1")), "disks are added by their names");
  }

  private void faults() throws Exception {
    Fault few = faultOf(() -> {
      port.initializeDisks(List.of(), null, null, new Holder<>(), new Holder<>(), new Holder<>());
      return null;
    });
    check(few.getFaultInfo() instanceof InsufficientDisks, "the type: " + few.getFaultInfo());
    check(few.getMessage().contains("too few disks"), "in words: " + few.getMessage());
    Fault refused = faultOf(() -> disks("naa.1\n"));
    check(refused.getFaultInfo() instanceof InvalidArgument invalid && invalid.getArgument().equals("names[0]"),
          "a name that is none");
    Holder<MethodFault> fault = new Holder<>();
    port.initializeDisks(List.of(group("naa.f1", "naa.p1")), null, null, new Holder<>(), fault, new Holder<>());
    check(fault.value instanceof DiskHasPartitions parted && parted.getDevice().equals("naa.p1"), "a parted disk");
  }

  private void part() throws Exception {
    Holder<List<KovaHostDiskMapResult>> result = new Holder<>();
    Holder<MethodFault> fault = new Holder<>();
    port.addAllEligibleDisks(null, null, result, fault, new Holder<>());
    check(fault.value instanceof SystemError error && error.getReason().equals("it does not answer"), "what failed");
    check(result.value.get(0).getError() == null && result.value.get(1).getError() != null, "the second group failed");
  }

  private void absent() throws Exception {
    String gone = disks().keySet().stream().filter(name -> name.startsWith("kova:")).findFirst().orElseThrow();
    port.removeDisk(gone, null, null, null, null, null, null, new Holder<>(), new Holder<>());
    check(groups().equals(Map.of("naa.f1", List.of("naa.c2"))), "it is removed");
  }

  private void read() throws Exception {
    check(disks().size() == 8, "eight disks");
    Fault refused = faultOf(() -> {
      port.claimUnmountedDiskgroup(null, null, new Holder<>(), new Holder<>());
      return null;
    });
    check(refused.getFaultInfo() instanceof NotPermitted, "reading only");
  }

  public static void main(String[] arguments) throws Exception {
    LogManager.getLogManager().reset();  // what the library says of itself is not our finding
    Story story = new Story(new KovaService(new URL(arguments[0])).getKovaPort());
    switch (arguments[1]) {
      case "story" -> story.story();
      case "faults" -> story.faults();
      case "part" -> story.part();
      case "absent" -> story.absent();
      case "read" -> story.read();
      default -> throw new IllegalArgumentException(arguments[1]);
    }
    System.exit(failures == 0 ? 0 : 1);
  }
}
