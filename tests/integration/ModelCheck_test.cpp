// Random sequences of requests, with faults and changes of the host in between, against the model.
//
// Each sequence begins on a host of its own. After every request the answer and the whole host must be the
// model's, and what no host may ever look like is looked for. A sequence that fails is cut down as long as it
// fails, and printed with the seed that brings it back:
//
//   KOVA_MODEL_SEED=4711 KOVA_MODEL_REQUESTS=100000 model_check_test

#include <gtest/gtest.h>

#include <algorithm>
#include <array>
#include <cstdlib>
#include <iostream>
#include <map>
#include <optional>
#include <random>
#include <set>
#include <sstream>
#include <string>
#include <vector>

#include "otxctl/sim/HostBuilder.h"
#include "tests/integration/HostModel.h"
#include "tests/integration/HostedPlugin.h"

namespace Integration {
namespace {

using OtxCtl::Sim::HostBuilder;
using OtxCtl::Sim::HostDescription;
using OtxCtl::Sim::HostDisk;
using OtxCtl::Sim::HostGroup;
using OtxCtl::Sim::HostVerdict;
using Names = std::vector<std::string>;

constexpr int requestsOfASequence = 25;

// ---- steps

// What may happen to a host behind the plug-in's back.
enum class Event {
  DiskLeaves,
  DiskReturns,
  Partitioned,
  Cleaned,
  Unlisted,
  Listed,
  Tagged,
  Untagged,
  AutoMode,
  Busy
};
constexpr std::array<const char*, 10> eventNames = {"leaves",
                                                    "returns",
                                                    "is partitioned",
                                                    "is cleaned",
                                                    "is listed no more",
                                                    "is listed",
                                                    "is tagged for capacity",
                                                    "is tagged no more",
                                                    "switches the automatic mode",
                                                    "holds its group back"};

struct HostChange {
  Event event;
  std::string disk;
};

struct Step {
  std::optional<HostChange> change;  // before the request
  std::optional<InjectedFault> fault;
  Request request;
};

void Apply(const HostChange& change, HostDescription& host) {
  for (HostDisk& disk : host.disks) {
    if (disk.name != change.disk) {
      continue;
    }
    switch (change.event) {
      case Event::DiskLeaves:
      case Event::DiskReturns:
        disk.absent = change.event == Event::DiskLeaves;
        break;
      case Event::Partitioned:
      case Event::Cleaned:
        disk.partitions = change.event == Event::Partitioned ? 2 : 0;
        break;
      case Event::Unlisted:
      case Event::Listed:
        disk.inInventory = change.event == Event::Listed;
        break;
      case Event::Tagged:
      case Event::Untagged:
        disk.capacityFlash = change.event == Event::Tagged;
        break;
      case Event::AutoMode:
        host.autoMode = !host.autoMode;
        break;
      case Event::Busy:
        for (HostGroup& group : host.groups) {
          group.busy = group.ssd == disk.name ? !group.busy : group.busy;
        }
        break;
    }
  }
}

std::ostream& operator<<(std::ostream& out, const Step& step) {
  if (step.change) {
    out << "(" << step.change->disk << " " << eventNames[static_cast<std::size_t>(step.change->event)]
        << ") ";
  }
  out << step.request;
  if (step.fault) {
    out << " (call " << step.fault->call << " of " << step.fault->operation << " throws "
        << step.fault->exception.name << ")";
  }
  return out;
}

// ---- drawing them

class SequenceDraw {
 public:
  explicit SequenceDraw(unsigned seed) : _random(seed) {}

  HostDescription Host();
  // A step that fits the host as the model knows it, mostly.
  Step Next(const HostModel& model);

 private:
  int Below(std::size_t limit) { return static_cast<int>(_random() % limit); }
  bool Chance(int oneIn) { return Below(static_cast<std::size_t>(oneIn)) == 0; }
  template <class List>
  const auto& Pick(const List& list) {
    return list[static_cast<std::size_t>(Below(std::size(list)))];
  }

  HostChange Change(const HostDescription& host);
  InjectedFault Fault();
  Request AnyRequest(const HostModel& model);
  Names SomeDisks(const HostModel& model, int oneIn);
  NamedGroup NewGroup(const HostModel& model);
  NamedGroup KnownGroup(const HostModel& model);

  std::mt19937 _random;
};

HostDescription SequenceDraw::Host() {
  HostBuilder host;
  host.Edit([](HostDescription& description) { description.name = "model"; });
  Names ssds;
  Names others;
  const int disks = Chance(4) ? 24 : 4 + Below(12);
  for (int number = 1; number <= disks; ++number) {
    const std::string name = "d" + std::to_string(number);
    const bool ssd = Chance(3);
    const bool tagged = Chance(4) && (ssd || Chance(6));
    const bool usb = Chance(20);
    // Eligible, but too small; eligible, but of an unmounted group; ineligible for no reason; in use by
    // nobody.
    constexpr std::array<HostVerdict, 4> odd = {{{1, 5}, {1, 6}, {2, 0}, {0, 0}}};
    const bool isOdd = Chance(20);
    host.WithDisk(name, ssd, [&](HostDisk& disk) {
      disk.capacityFlash = tagged;
      disk.partitions = Chance(15) ? 1 : 0;
      disk.transport = usb ? std::optional<std::string>("usb") : std::nullopt;
      disk.verdict = isOdd ? std::optional<HostVerdict>(Pick(odd)) : std::nullopt;
    });
    (ssd && !tagged ? ssds : others).push_back(name);
  }
  for (int groups = Chance(3) ? 5 : Below(3); groups > 0 && !ssds.empty() && !others.empty(); --groups) {
    Names capacity;
    for (int left = 1 + Below(Chance(4) ? 7 : 3); left > 0 && !others.empty(); --left) {
      capacity.push_back(others.back());
      others.pop_back();
    }
    const bool mounted = !Chance(3);
    const bool allFlash = Chance(4);
    host.WithGroup(ssds.back(), capacity, [&](HostGroup& group) {
      group.mounted = mounted;
      group.allFlash = allFlash;
    });
    ssds.pop_back();
  }
  // As long as those that the kernel gives.
  return host
      .Edit([](HostDescription& description) {
        for (std::size_t index = 0; index < description.disks.size(); ++index) {
          if (!description.disks[index].kovaUuid.empty()) {
            const std::string number = std::to_string(100 + index);
            description.disks[index].kovaUuid = "00000000-0000-0000-0000-000000000" + number;
          }
        }
      })
      .Build();
}

Step SequenceDraw::Next(const HostModel& model) {
  Step step;
  HostModel changed = model;
  if (Chance(4)) {
    step.change = Change(model.Host());
    changed.Change([&](HostDescription& host) { Apply(*step.change, host); });
  }
  if (Chance(5)) {
    step.fault = Fault();
  }
  step.request = AnyRequest(changed);
  return step;
}

HostChange SequenceDraw::Change(const HostDescription& host) {
  const HostDisk& disk = Pick(host.disks);
  const bool isMember = std::any_of(host.groups.begin(), host.groups.end(), [&](const HostGroup& group) {
    return group.ssd == disk.name ||
           std::find(group.capacity.begin(), group.capacity.end(), disk.name) != group.capacity.end();
  });
  switch (Below(8)) {
    case 0:
    case 1:
    case 2:
      return {disk.absent ? Event::DiskReturns : Event::DiskLeaves, disk.name};
    case 3:
      return {disk.partitions > 0 || isMember ? Event::Cleaned : Event::Partitioned, disk.name};
    case 4:
      return {disk.inInventory && Chance(2) ? Event::Unlisted : Event::Listed, disk.name};
    case 5:
      return {disk.capacityFlash ? Event::Untagged
              : disk.ssd         ? Event::Tagged
                                 : Event::DiskReturns,
              disk.name};
    case 6:
      return {host.autoMode || Chance(3) ? Event::AutoMode : Event::DiskReturns, disk.name};
    default:
      return {Event::Busy, disk.name};
  }
}

InjectedFault SequenceDraw::Fault() {
  static const Names operations = {"RefreshKovaInfo",
                                   "QueryDisks",
                                   "GetDiskMappings",
                                   "FormatDiskMapping",
                                   "FormatDiskMapping",
                                   "RestampDiskMapping",
                                   "MountDiskMapping",
                                   "RestampDiskMappingByUuid",
                                   "RemoveDisk",
                                   "RemoveDiskMapping",
                                   "RemoveDiskByUuid",
                                   "UnmountDiskMapping",
                                   "ClaimUnmountedDiskgroups"};
  return {Pick(operations), Chance(2) ? 1 : 1 + Below(4), Pick(kernelExceptions)};
}

Names SequenceDraw::SomeDisks(const HostModel& model, int oneIn) {
  Names names;
  for (const HostDisk& disk : model.Host().disks) {
    if (oneIn == 1 || Chance(oneIn)) {
      names.push_back(model.RequestName(disk.name));
    }
  }
  std::shuffle(names.begin(), names.end(), _random);
  if (!names.empty() && Chance(10)) {
    names.insert(names.begin() + Below(names.size() + 1), Pick(names));  // one twice, now and then neighbours
  }
  if (Chance(12)) {
    names.push_back("nobody");
  }
  return names;
}

NamedGroup SequenceDraw::NewGroup(const HostModel& model) {
  Names ssds;
  Names others;
  for (const HostDisk& disk : model.Host().disks) {
    (disk.ssd && !disk.capacityFlash ? ssds : others).push_back(model.RequestName(disk.name));
  }
  std::shuffle(others.begin(), others.end(), _random);
  const int count = Chance(12) ? Below(10) : 1 + Below(3);
  others.resize(std::min(others.size(), static_cast<std::size_t>(count)));
  const std::string ssd = ssds.empty() || Chance(12) ? Pick(model.Host().disks).name : Pick(ssds);
  return {ssd, others};
}

NamedGroup SequenceDraw::KnownGroup(const HostModel& model) {
  if (model.Host().groups.empty() || Chance(8)) {
    return NewGroup(model);
  }
  const HostGroup& known = Pick(model.Host().groups);
  NamedGroup group = {model.RequestName(known.ssd), {}};
  for (const std::string& disk : known.capacity) {
    group.capacity.push_back(model.RequestName(disk));
  }
  if (Chance(10)) {
    group.capacity.pop_back();
  }
  std::shuffle(group.capacity.begin(), group.capacity.end(), _random);
  return group;
}

bool ShareADisk(const NamedGroup& left, const NamedGroup& right) {
  Names all = left.capacity;
  all.push_back(left.ssd);
  const auto isAmongAll = [&](const std::string& disk) {
    return std::find(all.begin(), all.end(), disk) != all.end();
  };
  return isAmongAll(right.ssd) || std::any_of(right.capacity.begin(), right.capacity.end(), isAmongAll);
}

Request SequenceDraw::AnyRequest(const HostModel& model) {
  const auto groups = [&](auto draw) {
    std::vector<NamedGroup> drawn;
    for (int left = Chance(20) ? 0 : 1 + Below(3); left > 0; --left) {
      const NamedGroup group = (this->*draw)(model);
      const bool isShared = std::any_of(drawn.begin(), drawn.end(),
                                        [&](const NamedGroup& other) { return ShareADisk(group, other); });
      if (!isShared || Chance(10)) {
        drawn.push_back(group);
      }
    }
    return drawn;
  };
  switch (Below(16)) {
    case 0:
    case 1:
    case 2:
      return {Operation::AddDisks, SomeDisks(model, 1 + Below(3)), {}};
    case 3:
      return {Operation::AddAllEligibleDisks, {}, {}};
    case 4:
    case 5:
    case 6:
      return {Operation::InitializeDisks, {}, groups(&SequenceDraw::NewGroup)};
    case 7:
      return {Operation::InitializeDisks, {}, groups(&SequenceDraw::KnownGroup)};
    case 8:
    case 9:
      return {Operation::RemoveDisk,
              {Chance(15) ? "kova:short" : model.RequestName(Pick(model.Host().disks).name)},
              {}};
    case 10:
    case 11:
      return {Operation::RemoveDiskMapping, {}, {KnownGroup(model)}};
    case 12:
    case 13:
      return {Operation::UnmountDiskMapping, {}, groups(&SequenceDraw::KnownGroup)};
    case 14:
      return {Operation::ClaimUnmountedDiskgroup, {}, {}};
    default:
      return {Operation::QueryDisksForKova, Chance(2) ? Names() : SomeDisks(model, 3), {}};
  }
}

// ---- what no host may ever look like

// Each of the two planners keeps to five groups, counting those of before the request as far as it is told of
// them: a kernel that cannot say which there are is taken to have none.
std::string TooManyGroups(const Step& step, const HostDescription& before, const HostDescription& after) {
  const Operation operation = step.request.operation;
  const bool isKnown = !step.fault || step.fault->operation != "GetDiskMappings";
  if (!isKnown || (operation != Operation::AddDisks && operation != Operation::AddAllEligibleDisks)) {
    return "";
  }
  for (const bool allFlash : {false, true}) {
    std::size_t count = before.groups.size();
    for (std::size_t index = before.groups.size(); index < after.groups.size(); ++index) {
      const bool isOfTags = std::all_of(
          after.groups[index].capacity.begin(), after.groups[index].capacity.end(),
          [&](const std::string& name) {
            return std::any_of(after.disks.begin(), after.disks.end(),
                               [&](const HostDisk& disk) { return disk.name == name && disk.capacityFlash; });
          });
      count += isOfTags == allFlash ? 1 : 0;
    }
    if (count > 5 && count > before.groups.size()) {
      return "more than five groups were planned";
    }
  }
  return "";
}

// Counts what the kernel carries out, and watches its formats: none may take a disk out of a group that is
// not mounted.
class KernelWatch {
 public:
  KernelWatch(HostedPlugin& plugin, std::map<std::string, int>& carriedOut) {
    plugin.Calls().SetStartObserver([&](const OtxCtl::Fault::RecordedCall& call) {
      if (call.operation == "FormatDiskMapping") {
        _before = plugin.Host().Snapshot();
      }
    });
    plugin.Calls().SetEndObserver([&](const OtxCtl::Fault::RecordedCall& call) {
      carriedOut[call.operation] += call.outcome == "ok" ? 1 : 0;
      if (call.operation == "FormatDiskMapping" && call.outcome == "ok") {
        Look(call.arguments[0].get<std::string>(), call.arguments[1].get<Names>());
      }
    });
  }
  const std::string& Mistake() const { return _mistake; }

 private:
  void Look(const std::string& ssd, Names formatted) {
    formatted.push_back(ssd);
    for (const HostGroup& group : _before.groups) {
      for (const std::string& disk : formatted) {
        const bool isMember = group.ssd == disk || std::find(group.capacity.begin(), group.capacity.end(),
                                                             disk) != group.capacity.end();
        if (isMember && !group.mounted) {
          _mistake = disk + " was formatted, of an unmounted group";
        }
      }
    }
  }

  HostDescription _before;
  std::string _mistake;
};

// ---- running a sequence

struct Sequence {
  HostDescription host;
  std::vector<Step> steps;
};

// What the sequences came to.
struct Tally {
  int requests = 0;
  int panics = 0;
  int changes = 0;
  std::map<std::string, int> carriedOut;  // by operation of the kernel
  std::map<std::string, int> faults;      // by type
  std::set<std::size_t> sizes;            // of groups on a host
};

template <class Value>
std::string Difference(const char* what, const Value& actual, const Value& expected) {
  std::ostringstream text;
  text << what << "\nactual   " << actual << "\nexpected " << expected;
  return text.str();
}

std::string HostText(const HostDescription& host) {
  return OtxCtl::Sim::WriteHostDescription(host);
}

std::string RunStep(HostedPlugin& plugin, HostModel& model, const Step& step, Tally& tally) {
  if (step.change) {
    const auto edit = [&](HostDescription& host) { Apply(*step.change, host); };
    plugin.ChangeHost(edit);
    model.Change(edit);
    ++tally.changes;
  }
  if (step.fault) {
    plugin.FailCall(step.fault->operation, step.fault->call, step.fault->exception.name);
  }
  const HostDescription before = plugin.Host().Snapshot();
  const Answer expected = model.Run(step.request, step.fault);
  const Answer answer = WithoutTheKernelsWords(plugin.Run(step.request));
  plugin.Calls().ClearFaults();
  const HostDescription after = plugin.Host().Snapshot();
  ++tally.requests;
  tally.panics += answer.ended.empty() ? 0 : 1;
  ++tally.faults[answer.fault.substr(0, answer.fault.find_first_of(": "))];
  tally.sizes.insert(after.groups.size());
  if (answer != expected) {
    return Difference("the answer is another", answer, expected);
  }
  if (after != model.Host()) {
    return Difference("the host is another", HostText(after), HostText(model.Host()));
  }
  for (const std::string& mistake : {WrongGroups(after), TooManyGroups(step, before, after)}) {
    if (!mistake.empty()) {
      return mistake;
    }
  }
  if (!plugin.Locks().HeldHere().empty() || !plugin.Locks().Mistakes().empty()) {
    return "locks were left behind or taken in the wrong order";
  }
  return "";
}

// Empty, or what went wrong in which step.
std::string RunSequence(const Sequence& sequence, Tally& tally) {
  HostedPlugin plugin(sequence.host);
  plugin.Log().SetLevel(Tessa::Service::LogLevel::None);
  const KernelWatch watch(plugin, tally.carriedOut);
  HostModel model(sequence.host);
  for (std::size_t index = 0; index < sequence.steps.size(); ++index) {
    std::string mistake = RunStep(plugin, model, sequence.steps[index], tally);
    if (mistake.empty()) {
      mistake = watch.Mistake();
    }
    if (!mistake.empty()) {
      return "step " + std::to_string(index + 1) + ": " + mistake;
    }
    plugin.ForgetCalls();
  }
  return "";
}

bool Fails(const Sequence& sequence) {
  Tally dropped;
  return !RunSequence(sequence, dropped).empty();
}

// Takes steps away, and then parts of those that are left, as long as the sequence still fails.
class Shortener {
 public:
  explicit Shortener(Sequence sequence) : _sequence(std::move(sequence)) {}

  Sequence Shortest() {
    do {
      _isShorter = false;
      TryWithoutEach([](Sequence & sequence) -> auto& { return sequence.steps; });
      for (std::size_t index = 0; index < _sequence.steps.size(); ++index) {
        TryWithoutEach([index](Sequence & sequence) -> auto& { return sequence.steps[index].request.disks; });
        TryWithoutEach([index](Sequence & sequence) -> auto& {
          return sequence.steps[index].request.groups;
        });
        Try([index](Sequence& sequence) { return Reset(sequence.steps[index].change); });
        Try([index](Sequence& sequence) { return Reset(sequence.steps[index].fault); });
      }
    } while (_isShorter);
    return _sequence;
  }

 private:
  template <class Part>
  static bool Reset(std::optional<Part>& part) {
    const bool isThere = part.has_value();
    part.reset();
    return isThere;
  }
  // `cut` makes a sequence smaller, or says that it cannot.
  template <class Cut>
  void Try(Cut cut) {
    Sequence smaller = _sequence;
    if (cut(smaller) && Fails(smaller)) {
      _sequence = std::move(smaller);
      _isShorter = true;
    }
  }
  // One element stays: some requests need it.
  template <class ListOf>
  void TryWithoutEach(ListOf listOf) {
    for (std::size_t index = listOf(_sequence).size(); index-- > 0;) {
      Try([&](Sequence& sequence) {
        auto& list = listOf(sequence);
        if (list.size() == 1) {
          return false;
        }
        list.erase(list.begin() + static_cast<std::ptrdiff_t>(index));
        return true;
      });
    }
  }

  Sequence _sequence;
  bool _isShorter = false;
};

Sequence DrawSequence(unsigned seed) {
  SequenceDraw draw(seed);
  Sequence sequence = {draw.Host(), {}};
  HostModel model(sequence.host);
  for (int left = requestsOfASequence; left > 0; --left) {
    const Step step = draw.Next(model);
    if (step.change) {
      model.Change([&](HostDescription& host) { Apply(*step.change, host); });
    }
    model.Run(step.request, step.fault);
    sequence.steps.push_back(step);
  }
  return sequence;
}

unsigned long FromEnvironment(const char* name, unsigned long otherwise) {
  const char* const text = std::getenv(name);
  return text == nullptr ? otherwise : std::strtoul(text, nullptr, 10);
}

void Report(const Sequence& sequence, unsigned seed) {
  const Sequence shortest = Shortener(sequence).Shortest();
  std::ostringstream text;
  for (std::size_t index = 0; index < shortest.steps.size(); ++index) {
    text << index + 1 << ". " << shortest.steps[index] << "\n";
  }
  Tally dropped;
  ADD_FAILURE() << "KOVA_MODEL_SEED=" << seed << " brings this back\n"
                << HostText(shortest.host) << text.str() << RunSequence(shortest, dropped);
}

// Sequences that never get anywhere would prove nothing.
void ExpectWorthwhile(const Tally& tally) {
  constexpr const char* changing[] = {
      "FormatDiskMapping",        "RestampDiskMapping", "MountDiskMapping",
      "RestampDiskMappingByUuid", "RemoveDisk",         "RemoveDiskMapping",
      "RemoveDiskByUuid",         "UnmountDiskMapping", "ClaimUnmountedDiskgroups"};
  if (tally.requests >= 5000) {
    for (const char* const operation : changing) {
      const auto found = tally.carriedOut.find(operation);
      EXPECT_GT(found == tally.carriedOut.end() ? 0 : found->second, 0) << operation;
    }
    EXPECT_GE(tally.faults.size(), 8U);
  }
}

TEST(ModelCheck, EveryRequestLeavesTheHostThatTheModelForetells) {
  const unsigned long requests = FromEnvironment("KOVA_MODEL_REQUESTS", 10000);
  const auto firstSeed = static_cast<unsigned>(FromEnvironment("KOVA_MODEL_SEED", std::random_device()()));
  std::cout << "KOVA_MODEL_SEED=" << firstSeed << std::endl;
  Tally tally;
  unsigned seed = firstSeed;
  while (static_cast<unsigned long>(tally.requests) < requests) {
    const Sequence sequence = DrawSequence(seed);
    if (!RunSequence(sequence, tally).empty()) {
      return Report(sequence, seed);
    }
    ++seed;
  }
  std::cout << tally.requests << " requests, " << tally.changes << " changes from outside, " << tally.panics
            << " panics, up to " << *tally.sizes.rbegin() << " groups\ncarried out:";
  for (const auto& [operation, count] : tally.carriedOut) {
    std::cout << " " << operation << " " << count;
  }
  std::cout << "\nanswered:";
  for (const auto& [fault, count] : tally.faults) {
    std::cout << " " << (fault.empty() ? "no fault" : fault) << " " << count;
  }
  std::cout << std::endl;
  ExpectWorthwhile(tally);
}

}  // namespace
}  // namespace Integration
