// Random sequences of requests, with faults and changes of the host in between, against the model.
//
// Each sequence begins on a host of its own. After every request the answer and the whole host must be the
// model's, and what no host may ever look like is looked for. A sequence that fails is cut down as long as it
// fails, and printed with the seed that brings it back:
//
//   KOVA_SEED=4711 KOVA_MODEL_REQUESTS=100000 model_check_test

#include <gtest/gtest.h>

#include <algorithm>
#include <cstdlib>
#include <iostream>
#include <map>
#include <optional>
#include <random>
#include <set>
#include <sstream>
#include <string>
#include <vector>

#include "tests/integration/HostModel.h"
#include "tests/integration/HostedPlugin.h"
#include "tests/integration/SequenceDraw.h"

namespace Integration {
namespace {

using OtxCtl::Sim::HostDescription;
using OtxCtl::Sim::HostDisk;
using OtxCtl::Sim::HostGroup;
using Names = std::vector<std::string>;

constexpr int requestsOfASequence = 25;

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
  ADD_FAILURE() << "KOVA_SEED=" << seed << " brings this back\n"
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
  const auto firstSeed = static_cast<unsigned>(FromEnvironment("KOVA_SEED", std::random_device()()));
  std::cout << "KOVA_SEED=" << firstSeed << std::endl;
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
