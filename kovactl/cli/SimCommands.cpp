// Commands for simulated hosts: their disks, their faults.

#include <iostream>

#include "kovactl/cli/CommandLine.h"
#include "kovactl/sim/SimCommand.h"
#include "otxctl/provider/NamedException.h"
#include "otxctl/provider/OperationNames.h"

namespace Kovactl {
namespace {

using Json = nlohmann::ordered_json;
using Pointer = Json::json_pointer;
using Target = std::shared_ptr<Json>;

// Two options that exclude each other, and the place in the change that one makes true, the other false.
struct Switch {
  const char* place;
  const char* yes;
  const char* meansYes;
  const char* no;
  const char* meansNo;
};
constexpr Switch diskSwitches[] = {
    {"/disk/absent", "--absent", "The device has left the host", "--present", "The device is there"},
    {"/disk/ssd", "--ssd", "It is a flash disk", "--hdd", "It is a hard disk"},
    {"/disk/capacityFlash", "--capacity-flash", "It is flash meant for capacity", "--no-capacity-flash",
     "It is not"},
    {"/disk/local", "--local", "No other host can reach it", "--remote", "Other hosts can reach it"},
    {"/disk/inInventory", "--in-inventory", "The agent lists it", "--not-in-inventory",
     "The agent does not list it"},
};

void AddSwitch(CLI::App& command, const Target& target, const Switch& one, CLI::Option* disk) {
  const auto set = [target, place = one.place](bool value) { (*target)[Pointer(place)] = value; };
  auto* const yes = command.add_flag_callback(
      one.yes, [set] { set(true); }, one.meansYes);
  auto* const no = command.add_flag_callback(
      one.no, [set] { set(false); }, one.meansNo);
  yes->needs(disk)->excludes(no);
  no->needs(disk);
}

// An option, or an argument, whose value is written to that place.
template <class Value>
CLI::Option* AddValue(CLI::App& command, const Target& target, const char* word, const char* place,
                      const char* what) {
  return command.add_option_function<Value>(
      word, [target, place](const Value& value) { (*target)[Pointer(place)] = value; }, what);
}

void AddSet(CLI::App& sim, CommandLine& line) {
  const auto change = std::make_shared<HostChange>();
  auto* const command = sim.add_subcommand("set", "Change a disk of the host, or the host itself");
  auto* const disk = AddValue<std::string>(*command, change, "DISK", "/disk/name", "Canonical name");
  for (const Switch& one : diskSwitches) {
    AddSwitch(*command, change, one, disk);
  }
  AddValue<int>(*command, change, "--partitions", "/disk/partitions", "How many partitions it holds")
      ->needs(disk);
  AddValue<std::string>(*command, change, "--transport", "/disk/transport",
                        "How it is attached: sas, nvme, usb and the like")
      ->needs(disk);
  const auto setAutoMode = [change](const std::string& mode) {
    (*change)[Pointer("/set/autoMode")] = mode == "on";
  };
  command
      ->add_option_function<std::string>("--auto-mode", setAutoMode,
                                         "Whether the host claims disks on its own: on or off")
      ->check(CLI::IsMember({"on", "off"}));
  command->callback([&line, change] {
    line.action = [&line, change] {
      return RunSimSet(*Connect(line.global), *change, OptionsOf(line.global), std::cout, std::cerr);
    };
  });
}

void AddFault(CLI::App& sim, CommandLine& line) {
  const auto fault = std::make_shared<Json>();
  auto* const command = sim.add_subcommand("fault", "Let calls of the kernel provider fail or wait");
  const auto& names = OtxCtl::Provider::operationNames;
  AddValue<std::string>(*command, fault, "OPERATION", "/operation", "Operation of the provider")
      ->required()
      ->check(CLI::IsMember(std::vector<std::string>(names.begin(), names.end())));
  AddValue<std::string>(*command, fault, "--exception", "/exception",
                        "Class of the exception, such as HostCtlException or KovaExceptionHasPartition")
      ->check([](const std::string& name) {
        return OtxCtl::Provider::IsExceptionName(name) ? "" : "no exception class is called " + name;
      });
  AddValue<int>(*command, fault, "--call", "/call", "Which call, counted from 1; 0: every call");
  AddValue<std::string>(*command, fault, "--message", "/message", "What the exception says");
  AddValue<std::string>(*command, fault, "--disk", "/disk", "The disk that it names");
  AddValue<int>(*command, fault, "--delay-ms", "/delayMs", "How long the call waits first");
  command->callback([&line, fault] {
    line.action = [&line, fault] {
      return RunSimFault(*Connect(line.global), *fault, OptionsOf(line.global), std::cout, std::cerr);
    };
  });
}

void AddClearFaults(CLI::App& sim, CommandLine& line) {
  sim.add_subcommand("clear-faults", "Take every fault away")->callback([&line] {
    line.action = [&line] {
      const HostChange noFaults = {{"set", {{"faults", Json::array()}}}};
      return RunSimSet(*Connect(line.global), noFaults, OptionsOf(line.global), std::cout, std::cerr);
    };
  });
}

void AddShow(CLI::App& sim, CommandLine& line) {
  sim.add_subcommand("show", "Print the host's description")->callback([&line] {
    line.action = [&line] { return RunSimShow(*Connect(line.global), std::cout); };
  });
}

}  // namespace

void AddSimCommands(CLI::App& app, CommandLine& line) {
  auto* const sim = app.add_subcommand("sim", "Change a simulated host: its disks, its faults");
  sim->require_subcommand(1);
  AddSet(*sim, line);
  AddFault(*sim, line);
  AddClearFaults(*sim, line);
  AddShow(*sim, line);
}

}  // namespace Kovactl
