// Every failure of the kernel, in every operation that changes disks.
//
// A good run of each request is recorded. Then each kind of call that it made fails once, at its first, a
// middle and its last call, with every exception that the kernel has; what the answer must be is told by a
// few rules that know nothing of how the plug-in is written.

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <functional>
#include <map>
#include <optional>
#include <set>
#include <string>
#include <vector>

#include "otxctl/sim/HostBuilder.h"
#include "tests/integration/HostedPlugin.h"
#include "tests/integration/KernelExceptions.h"

namespace Integration {
namespace {

using OtxCtl::Sim::AHost;
using OtxCtl::Sim::HostDescription;
using OtxCtl::Sim::HostGroup;
using testing::ElementsAreArray;
using testing::IsEmpty;

// One failure: the n-th call, from 1, of one of the kernel's operations.
struct Failure {
  std::string operation;  // empty: nothing fails
  int call = 0;
  KernelException exception = kernelExceptions[0];

  std::string FaultText() const { return exception.FaultText("injected", "offender"); }

  bool Is(const std::string& name, int number) const { return operation == name && call == number; }
  // The n-th reading of the kernel's disks.
  bool IsRefresh(int number) const { return Is("RefreshKovaInfo", number) || Is("QueryDisks", number); }
};

// What must come of a request.
struct Forecast {
  Answer answer;
  std::vector<std::string> warnings;
  std::vector<std::string> groups;  // of the host afterwards
};

// ---- the rules

constexpr const char* refreshWarning = "Failed to refresh KOVA disk cache injected";
constexpr const char* formatWarning = "Error formatting KOVA disks: ";

// How a group of a request is made.
enum class Making { Format, Restamp, RestampByUuid };
struct Made {
  std::string ssd;
  std::vector<std::string> capacity;
  Making making = Making::Format;
  // States of its disks as results list them, before and after.
  std::string before;
  std::string after;
};

std::string Text(const Made& group) {
  std::string text = group.ssd + ":";
  for (const std::string& disk : group.capacity) {
    text += " " + disk;
  }
  return text;
}

// How often the groups before `position` are made in that way, plus one.
int NumberOf(const std::vector<Made>& groups, std::size_t position) {
  return 1 + static_cast<int>(
                 std::count_if(groups.begin(), groups.begin() + static_cast<std::ptrdiff_t>(position),
                               [&](const Made& group) { return group.making == groups[position].making; }));
}

// The fault of one group, and its warnings. What could not be read before it is taken for unused: then a
// group that is off-line is asked to be formatted, which the kernel refuses.
std::string FaultOf(const std::vector<Made>& groups, std::size_t position, const Failure& failure,
                    std::vector<std::string>& warnings) {
  const Made& group = groups[position];
  const int number = NumberOf(groups, position);
  const bool isUnknown = failure.IsRefresh(static_cast<int>(position) + 1);
  if (group.making == Making::Restamp && isUnknown) {
    const std::string refusal = "simulated kernel: disk \"" + group.ssd + "\" is in use";
    warnings.push_back(formatWarning + refusal);
    return "SystemError: " + refusal;
  }
  const bool fails = group.making == Making::Format ? failure.Is("FormatDiskMapping", number)
                     : group.making == Making::Restamp
                         ? failure.Is("RestampDiskMapping", number) || failure.Is("MountDiskMapping", number)
                         : failure.Is("RestampDiskMappingByUuid", number);
  if (!fails) {
    return "";
  }
  if (group.making == Making::RestampByUuid) {
    warnings.push_back("Error restamping PDL'd KOVA disk mapping: injected");
  }
  warnings.push_back(std::string(formatWarning) + "injected");
  return failure.FaultText();
}

// The groups are made one by one; the disks are read before the first and after each.
Forecast Making1by1(const std::vector<Made>& groups, const Failure& failure) {
  Forecast forecast;
  forecast.answer.hasResult = true;
  std::vector<std::string> faults;
  for (std::size_t position = 0; position < groups.size(); ++position) {
    const Made& group = groups[position];
    const std::string fault = FaultOf(groups, position, failure, forecast.warnings);
    std::string text = Text(group);
    if (!fault.empty()) {
      text += " !" + fault;
      faults.push_back(fault);
    }
    if (failure.IsRefresh(static_cast<int>(position) + 2)) {
      forecast.warnings.push_back(refreshWarning);
    } else {
      text += " | " + (fault.empty() ? group.after : group.before);
    }
    forecast.answer.results.push_back(text);
    if (fault.empty() && group.making == Making::Format) {
      forecast.groups.push_back(Text(group) + " mounted");
    } else if (group.making != Making::Format) {
      const bool isMounted = fault.empty() && group.making == Making::Restamp;
      forecast.groups.push_back(Text(group) + (isMounted ? " mounted" : " unmounted"));
    }
  }
  forecast.answer.fault = faults.empty() ? "" : faults.size() == 1 ? faults.front() : "KovaFault";
  return forecast;
}

// ---- the requests

struct Scenario {
  std::string title;
  HostDescription host;
  Request request;
  std::function<Forecast(const Failure&)> forecast;
};

void PrintTo(const Scenario& scenario, std::ostream* out) {
  *out << scenario.request;
}

std::string States(const std::vector<std::string>& disks, const std::string& state) {
  std::string text;
  for (const std::string& disk : disks) {
    text += (text.empty() ? "" : ", ") + disk + " " + state;
  }
  return text;
}

// Two hybrid groups, one of flash only and one that is there but not mounted.
HostDescription MixedHost() {
  return AHost()
      .WithSsd("f")
      .WithCapacityFlash("t")
      .WithSsd("s1")
      .WithSsd("s2")
      .WithHdds({"c1", "c2", "c3"})
      .WithSsd("u")
      .WithHdd("m")
      .WithUnmountedGroup("u", {"m"})
      .Build();
}
const Made firstHybrid = {"s1",
                          {"c1", "c3"},
                          Making::Format,
                          States({"s1", "c1", "c3"}, "eligible"),
                          States({"s1", "c1", "c3"}, "inUse")};
const Made secondHybrid = {
    "s2", {"c2"}, Making::Format, States({"s2", "c2"}, "eligible"), States({"s2", "c2"}, "inUse")};
const Made flashOnly = {
    "f", {"t"}, Making::Format, States({"f", "t"}, "eligible"), States({"f", "t"}, "inUse")};
const Made unmounted = {
    "u", {"m"}, Making::Restamp, States({"u", "m"}, "ineligible"), States({"u", "m"}, "inUse")};

// The group of the host that the request did not make, unless it did.
void KeepUnmounted(Forecast& forecast) {
  const bool isNamed = std::any_of(forecast.groups.begin(), forecast.groups.end(),
                                   [](const std::string& group) { return group.starts_with("u: m"); });
  if (!isNamed) {
    forecast.groups.push_back("u: m unmounted");
  }
}

Forecast ForecastAddition(const Failure& failure) {
  Forecast forecast;
  if (failure.IsRefresh(1)) {
    forecast.answer.hasResult = true;
    forecast.answer.fault = "InsufficientDisks";
    forecast.warnings = {refreshWarning,
                         "Error checking disks (only found 0): insufficient disks in given mappings"};
  } else {
    // The kernel's groups are asked for thrice: for groups of flash, for hybrid ones, for unmounted ones.
    std::vector<Made> plan = {firstHybrid, secondHybrid, unmounted, flashOnly};
    if (failure.Is("GetDiskMappings", 3)) {
      plan.erase(plan.begin() + 2);
    }
    forecast = Making1by1(plan, failure);
    if (failure.operation == "GetDiskMappings") {
      forecast.warnings.push_back("Error retrieving disk mappings: injected");
    }
  }
  KeepUnmounted(forecast);
  return forecast;
}

Forecast ForecastAdditionOfAll(const Failure& failure) {
  Forecast forecast;
  if (failure.IsRefresh(1)) {
    forecast.warnings = {refreshWarning};
  } else {
    forecast = Making1by1({firstHybrid, secondHybrid, flashOnly}, failure);
    if (failure.operation == "GetDiskMappings") {
      forecast.warnings = {"Error retrieving disk mappings: injected"};
    }
  }
  KeepUnmounted(forecast);
  return forecast;
}

// Two new groups, two off-line ones and one of which the cache disk has left.
HostDescription HostToInitialize() {
  return AHost()
      .WithSsd("u1")
      .WithHdd("m1")
      .WithSsd("s1")
      .WithHdd("c1")
      .WithSsd("u2")
      .WithHdd("m2")
      .WithSsd("s2")
      .WithHdd("c2")
      .WithSsd("gone")
      .WithHdd("m3")
      .WithUnmountedGroup("u1", {"m1"})
      .WithUnmountedGroup("u2", {"m2"})
      .WithUnmountedGroup("gone", {"m3"})
      .Edit([](HostDescription& host) {
        for (OtxCtl::Sim::HostDisk& disk : host.disks) {
          if (disk.name == "gone") {
            disk.absent = true;
            disk.kovaUuid = "52e7b2b4-0a7c-3a1c-9d3e-2f4a5b6c7d8e";
          }
        }
      })
      .Build();
}
const std::string goneName = "kova:52e7b2b4-0a7c-3a1c-9d3e-2f4a5b6c7d8e";

Forecast ForecastInitialization(const Failure& failure) {
  const std::vector<Made> groups = {
      {"u1", {"m1"}, Making::Restamp, States({"u1", "m1"}, "ineligible"), States({"u1", "m1"}, "inUse")},
      {"s1", {"c1"}, Making::Format, States({"s1", "c1"}, "eligible"), States({"s1", "c1"}, "inUse")},
      {"u2", {"m2"}, Making::Restamp, States({"u2", "m2"}, "ineligible"), States({"u2", "m2"}, "inUse")},
      {goneName, {"m3"}, Making::RestampByUuid, "m3 ineligible", "m3 ineligible"},
      {"s2", {"c2"}, Making::Format, States({"s2", "c2"}, "eligible"), States({"s2", "c2"}, "inUse")},
  };
  Forecast forecast = Making1by1(groups, failure);
  if (failure.IsRefresh(1)) {
    forecast.warnings.insert(forecast.warnings.begin(), refreshWarning);
  }
  return forecast;
}

// Of the two groups, s1 may lose its disk or all; s2's cache disk has left, and a capacity disk of s1.
HostDescription HostToTakeFrom() {
  return AHost()
      .WithSsd("s1")
      .WithHdds({"a", "b", "lost"})
      .WithSsd("gone")
      .WithHdd("c")
      .WithSsd("s3")
      .WithHdd("d")
      .WithGroup("s1", {"a", "b"})
      .WithGroup("gone", {"c"})
      .WithGroup("s3", {"d"})
      .Without("gone")
      .Edit([](HostDescription& host) {
        for (OtxCtl::Sim::HostDisk& disk : host.disks) {
          if (disk.name == "gone") {
            disk.kovaUuid = "52e7b2b4-0a7c-3a1c-9d3e-2f4a5b6c7d8e";
          }
        }
      })
      .Build();
}
const std::string groupOfS1 = "s1: a b mounted";
const std::string groupOfGone = goneName + ": c mounted";
const std::string groupOfS3 = "s3: d mounted";

// A request that asks the kernel for one change, which carries a warning of its own when it is refused.
struct OneChange {
  std::string operation;
  std::string warning;
  std::vector<std::string> groupsAfter;
};
Forecast ForecastOneChange(const OneChange& change, const Failure& failure) {
  Forecast forecast;
  forecast.groups = change.groupsAfter;
  if (failure.IsRefresh(1)) {
    forecast.warnings = {refreshWarning};
  } else if (failure.Is(change.operation, 1)) {
    forecast.warnings = {change.warning + "injected"};
    forecast.answer.fault = failure.FaultText();
    forecast.groups = {groupOfS1, groupOfGone, groupOfS3};
  }
  return forecast;
}

Forecast ForecastRemovalOfGroup(const Failure& failure) {
  if (failure.operation == "GetDiskMappings") {
    Forecast forecast;
    forecast.warnings = {"Failed to validate disk mapping: injected",
                         "Failed to validate existing disk mapping: SSD: s1, Disks: b, a"};
    forecast.answer.fault = "InvalidArgument [nox.agentd.kovaDiskOperation.diskMappingNotFound]";
    forecast.groups = {groupOfS1, groupOfGone, groupOfS3};
    return forecast;
  }
  return ForecastOneChange(
      {"RemoveDiskMapping", "Error removing KOVA disk mapping: ", {groupOfGone, groupOfS3}}, failure);
}

Forecast ForecastUnmount(const Failure& failure) {
  Forecast forecast;
  forecast.answer.hasResult = true;
  std::map<std::string, bool> isMounted;
  int number = 0;
  for (const std::string group : {"s1: a b", "s3: d"}) {
    ++number;
    std::string fault;
    if (failure.Is("GetDiskMappings", number)) {
      forecast.warnings.push_back("Failed to validate disk mapping: injected");
      fault = "InvalidArgument";
    } else if (failure.Is("UnmountDiskMapping", number)) {
      forecast.warnings.push_back("Error unmounting KOVA disk mapping: injected");
      fault = failure.FaultText();
    }
    isMounted[group] = !fault.empty();
    forecast.answer.results.push_back(group + (fault.empty() ? "" : " !" + fault));
    forecast.answer.fault += fault;
  }
  if (failure.IsRefresh(1)) {
    forecast.warnings = {refreshWarning};
  }
  forecast.groups = {"s1: a b" + std::string(isMounted["s1: a b"] ? " mounted" : " unmounted"), groupOfGone,
                     "s3: d" + std::string(isMounted["s3: d"] ? " mounted" : " unmounted")};
  return forecast;
}

Forecast ForecastClaim(const Failure& failure) {
  Forecast forecast;
  const bool fails = failure.Is("ClaimUnmountedDiskgroups", 1);
  forecast.groups = {fails ? "u: m unmounted" : "u: m mounted"};
  if (fails) {
    forecast.warnings = {"Mount diskgroup failed with exception injected "};
  }
  return forecast;
}

std::vector<Scenario> Scenarios() {
  const std::vector<std::string> all = {"f", "t", "s1", "s2", "c1", "c2", "c3", "u", "m"};
  const auto oneChange = [](const OneChange& change) {
    return [change](const Failure& failure) { return ForecastOneChange(change, failure); };
  };
  return {
      {"AddDisks", MixedHost(), {Operation::AddDisks, all, {}}, &ForecastAddition},
      {"AddAllEligibleDisks", MixedHost(), {Operation::AddAllEligibleDisks, {}, {}}, &ForecastAdditionOfAll},
      {"InitializeDisks",
       HostToInitialize(),
       {Operation::InitializeDisks,
        {},
        {{"u1", {"m1"}}, {"s1", {"c1"}}, {"u2", {"m2"}}, {goneName, {"m3"}}, {"s2", {"c2"}}}},
       &ForecastInitialization},
      {"RemoveDisk",
       HostToTakeFrom(),
       {Operation::RemoveDisk, {"a"}, {}},
       oneChange({"RemoveDisk", "Error removing KOVA disks: ", {"s1: b mounted", groupOfGone, groupOfS3}})},
      {"RemoveAbsentDisk",
       HostToTakeFrom(),
       {Operation::RemoveDisk, {goneName}, {}},
       oneChange({"RemoveDiskByUuid", "Error removing KOVA disks: ", {groupOfS1, groupOfS3}})},
      {"RemoveDiskMapping",
       HostToTakeFrom(),
       {Operation::RemoveDiskMapping, {}, {{"s1", {"b", "a"}}}},
       &ForecastRemovalOfGroup},
      {"RemoveDiskMappingOfAbsentSsd",
       HostToTakeFrom(),
       {Operation::RemoveDiskMapping, {}, {{goneName, {"c"}}}},
       oneChange({"RemoveDiskByUuid", "Error removing PDL'd KOVA disk mapping: ", {groupOfS1, groupOfS3}})},
      {"UnmountDiskMapping",
       HostToTakeFrom(),
       {Operation::UnmountDiskMapping, {}, {{"s1", {"a", "b"}}, {"s3", {"d"}}}},
       &ForecastUnmount},
      {"ClaimUnmountedDiskgroup",
       AHost().WithSsd("u").WithHdd("m").WithUnmountedGroup("u", {"m"}).Build(),
       {Operation::ClaimUnmountedDiskgroup, {}, {}},
       &ForecastClaim},
  };
}

// ---- running them

std::vector<std::string> GroupsOf(const HostDescription& host) {
  std::vector<std::string> texts;
  for (const HostGroup& group : host.groups) {
    const auto ssd = std::find_if(host.disks.begin(), host.disks.end(),
                                  [&](const auto& disk) { return disk.name == group.ssd; });
    const NamedGroup named = {ssd->absent ? "kova:" + ssd->kovaUuid : group.ssd, group.capacity};
    std::ostringstream text;
    text << named << (group.mounted ? " mounted" : " unmounted");
    texts.push_back(text.str());
  }
  std::sort(texts.begin(), texts.end());
  return texts;
}

std::vector<std::string> Warnings(TestSupport::RecordingLogger& logger) {
  std::vector<std::string> texts;
  for (const TestSupport::LogLine& line : logger.Lines(Tessa::Service::LogLevel::Warning)) {
    std::vector<Tessa::Service::LogArgument> arguments(line.arguments.begin(), line.arguments.end());
    texts.push_back(Tessa::Service::FormatMessage(line.format, arguments));
  }
  std::sort(texts.begin(), texts.end());
  return texts;
}

std::vector<std::string> Sorted(std::vector<std::string> texts) {
  std::sort(texts.begin(), texts.end());
  return texts;
}

class KernelFailures : public testing::TestWithParam<Scenario> {
 protected:
  // How often the request calls each of the kernel's operations when nothing fails.
  std::map<std::string, int> CallsOfAGoodRun() {
    HostedPlugin plugin(GetParam().host);
    EXPECT_EQ(plugin.Run(GetParam().request), GetParam().forecast({}).answer);
    std::map<std::string, int> calls;
    for (const OtxCtl::Fault::RecordedCall& call : plugin.Calls().TakeEnded()) {
      ++calls[call.operation];
    }
    return calls;
  }

  // The call that fails changes nothing.
  void WatchTheHost(HostedPlugin& plugin) {
    plugin.Calls().SetStartObserver([&](const auto&) { _hostAtStart = plugin.Host().Snapshot(); });
    plugin.Calls().SetEndObserver([&](const OtxCtl::Fault::RecordedCall& call) {
      if (call.outcome != "ok") {
        EXPECT_EQ(plugin.Host().Snapshot(), _hostAtStart) << call.operation << " failed and left something";
      }
      if (call.outcome.find("injected") != std::string::npos) {
        ++_injected;
      }
    });
  }

  void ExpectForecast(HostedPlugin& plugin, const Failure& failure) {
    const Forecast forecast = GetParam().forecast(failure);
    EXPECT_EQ(plugin.Run(GetParam().request), forecast.answer);
    EXPECT_THAT(Warnings(plugin.Log()), ElementsAreArray(Sorted(forecast.warnings)));
    EXPECT_THAT(GroupsOf(plugin.Host().Snapshot()), ElementsAreArray(Sorted(forecast.groups)));
    EXPECT_THAT(plugin.Locks().HeldHere(), IsEmpty());
    EXPECT_THAT(plugin.Locks().Mistakes(), IsEmpty());
    plugin.Log().Clear();
  }

  void Check(const Failure& failure) {
    HostedPlugin plugin(GetParam().host);
    WatchTheHost(plugin);
    _injected = 0;
    plugin.Calls().Inject(
        {failure.operation, failure.call, std::string(failure.exception.name), "injected", "offender", 0});
    ExpectForecast(plugin, failure);
    EXPECT_EQ(_injected, 1) << "the call was not made";
    plugin.Calls().ClearFaults();
    // On the host as it was, the same request now does all it can. Nobody tells the plug-in of the way back.
    plugin.Host().Change([](HostDescription& host) { host = GetParam().host; });
    ExpectForecast(plugin, {});
  }

  HostDescription _hostAtStart;
  int _injected = 0;
};

INSTANTIATE_TEST_SUITE_P(In, KernelFailures, testing::ValuesIn(Scenarios()),
                         [](const auto& test) { return test.param.title; });

TEST_P(KernelFailures, AreAnsweredAndForgotten) {
  const std::map<std::string, int> calls = CallsOfAGoodRun();
  ASSERT_FALSE(calls.empty());
  int checked = 0;
  for (const auto& [operation, count] : calls) {
    for (const int call : std::set<int>{1, (count + 1) / 2, count}) {
      for (const KernelException& exception : kernelExceptions) {
        SCOPED_TRACE(operation + " " + std::to_string(call) + " of " + std::to_string(count) + " throws " +
                     std::string(exception.name));
        Check({operation, call, exception});
        ++checked;
        if (HasFailure()) {
          return;  // one of a kind is enough to read
        }
      }
    }
  }
  RecordProperty("failures", checked);
  std::cout << checked << " failures of " << calls.size() << " operations of the kernel\n";
}

TEST_P(KernelFailures, AreSurvivedOneAfterTheOtherOnOneHost) {
  const std::map<std::string, int> calls = CallsOfAGoodRun();
  HostedPlugin plugin(GetParam().host);
  for (const auto& [operation, count] : calls) {
    plugin.Calls().Inject({operation, 0, "KovaStorageException", "injected", "offender", 0});
    plugin.Run(GetParam().request);
    plugin.Calls().ClearFaults();
    plugin.Host().Change([](HostDescription& host) { host = GetParam().host; });
    EXPECT_THAT(plugin.Locks().HeldHere(), IsEmpty()) << operation;
  }
  plugin.Log().Clear();
  ExpectForecast(plugin, {});
}

}  // namespace
}  // namespace Integration
