#include "kovactl/replay/ReplayRunner.h"

#include <cxxabi.h>
#include <unistd.h>

#include <cstdio>
#include <cstdlib>
#include <fstream>
#include <istream>
#include <memory>
#include <ostream>
#include <typeinfo>
#include <utility>

#include "host/Answer.h"
#include "host/LogSink.h"
#include "host/Simulation.h"
#include "kovactl/replay/CapturingLogger.h"
#include "kovactl/replay/ReplayRequest.h"
#include "kovactl/replay/ReplayTexts.h"
#include "nox/Host.h"
#include "orbis/ParseException.h"
#include "orbis/json/JsonText.h"
#include "otxctl/fault/CallRecorder.h"
#include "tessa/Panic.h"

namespace Kovactl {
namespace {

using Tessa::MakeRef;
using Tessa::Ref;
using Tessa::Service::LogLevel;
using Texts = std::vector<std::string>;

// The class of an exception as the source names it.
std::string TypeName(const std::type_info& type) {
  int status = 0;
  const std::unique_ptr<char, decltype(&std::free)> demangled(
      abi::__cxa_demangle(type.name(), nullptr, nullptr, &status), &std::free);
  std::string name = status == 0 ? demangled.get() : type.name();
  for (const std::string_view noise : {"__cxx11::", "__1::"}) {
    for (std::size_t at = name.find(noise); at != std::string::npos; at = name.find(noise)) {
      name.erase(at, noise.size());
    }
  }
  return name.substr(0, name.find('<'));
}

void AppendLog(const std::vector<CapturedLine>& lines, std::string& out) {
  const char* separator = "";
  for (const CapturedLine& line : lines) {
    out += separator;
    separator = ",";
    out += "{\"level\":" + std::to_string(static_cast<int>(line.level)) + ",\"format\":";
    Orbis::Json::AppendString(line.format, out);
    out += ",\"arguments\":[";
    for (std::size_t i = 0; i < line.arguments.size(); ++i) {
      out += i == 0 ? "" : ",";
      Orbis::Json::AppendString(line.arguments[i], out);
    }
    out += "]}";
  }
}

// As a simulated machine takes it.
std::string ChangeOf(const ReplayRequest& request) {
  nlohmann::json change = nlohmann::json::object();
  if (!request.hostSet.is_null()) {
    change["set"] = request.hostSet;
  }
  if (!request.hostDisk.is_null()) {
    change["disk"] = request.hostDisk;
  }
  return change.dump();
}

class Replay {
 public:
  Replay(Host::RuntimeOptions options, LogLevel level, std::ostream& out)
      : _logger(MakeRef<CapturingLogger>(level)),
        _recorder(std::make_shared<OtxCtl::Fault::CallRecorder>()),
        _out(out) {
    Tessa::Service::SetDefaultLogger(WithChild(Host::MakeConsoleLogger(LogLevel::Error), _logger));
    Tessa::SetPanicHandler(&AnswerPanic);
    options.recorder = _recorder;
    options.bare = true;
    _runtime = &Host::HostRuntime::Start(options);
    _running = this;
    TakeNoise();
  }
  ~Replay() { _running = nullptr; }
  Replay(const Replay&) = delete;
  Replay& operator=(const Replay&) = delete;

  void Run(ReplayRequest request) {
    _operation = request.operation;
    _faultText.clear();
    _resultText.clear();
    if (request.operation == "host") {
      ChangeHost(request);
      TakeNoise();
      Answer({});
      return;
    }
    AddTexts(request);
    TakeNoise();
    Answer(Call(request));
  }

 private:
  void ChangeHost(const ReplayRequest& request) {
    Host::Simulation* const simulation = _runtime->GetSimulation();
    if (simulation == nullptr) {
      throw Host::ChangeRefused("host: this is no simulated host");
    }
    simulation->Change(ChangeOf(request));
  }

  // How the hook ended; empty: as it should.
  std::string Call(ReplayRequest& request) {
    try {
      request.hook->call(_runtime->Hooks(), request.arguments, _faultText, _resultText);
      return "";
    } catch (const std::exception& exception) {
      return "exception: " + TypeName(typeid(exception)) + ": " + exception.what();
    } catch (...) {
      return "exception: " + TypeName(*abi::__cxa_current_exception_type()) + ": ";
    }
  }

  // What was logged and called outside of requests belongs to no answer.
  void TakeNoise() {
    _logger->Take();
    _recorder->TakeEnded();
  }

  // Throws Orbis::ParseException when what the hook appended cannot be read, a mistake of the plug-in.
  void Answer(const std::string& ended) {
    const Host::Answer answer = Host::AnswerOf(_faultText, _resultText);
    std::string line = "{\"operation\":";
    Orbis::Json::AppendString(_operation, line);
    line += ",\"fault\":";
    Host::WriteJsonFault(answer.fault.Get(), line);
    line += ",\"result\":";
    Host::WriteJsonResult(answer.result, line);
    line += ",\"ended\":";
    if (ended.empty()) {
      line += "null";
    } else {
      Orbis::Json::AppendString(ended, line);
    }
    line += ",\"log\":[";
    AppendLog(_logger->Take(), line);
    line += "],\"calls\":[";
    const char* separator = "";
    for (const OtxCtl::Fault::RecordedCall& call : _recorder->TakeEnded()) {
      line.append(separator).append(OtxCtl::Fault::ToJsonLine(call));
      separator = ",";
    }
    line += "]}\n";
    _out << line << std::flush;
  }

  static void AnswerPanic(const char* text) {
    Host::FlushLogs();
    std::fprintf(stderr, "kovactl: the plug-in panicked: %s\n", text);
    try {
      if (_running != nullptr) {
        _running->Answer(std::string("panic: ") + text);
      }
    } catch (const std::exception& exception) {
      std::fprintf(stderr, "kovactl: no answer tells of it: %s\n", exception.what());
    }
    _exit(static_cast<int>(ExitStatus::Panic));
  }

  static inline Replay* _running = nullptr;  // a panic handler is given nothing but the text

  Ref<CapturingLogger> _logger;
  std::shared_ptr<OtxCtl::Fault::CallRecorder> _recorder;
  std::ostream& _out;
  Host::HostRuntime* _runtime = nullptr;
  std::string _operation;
  std::string _faultText;
  std::string _resultText;
};

std::vector<std::pair<int, ReplayRequest>> ReadRequests(const std::string& file, std::istream& in) {
  std::vector<std::pair<int, ReplayRequest>> requests;
  std::string line;
  for (int number = 1; std::getline(in, line); ++number) {
    if (line.find_first_not_of(" \t\r") == std::string::npos) {
      continue;
    }
    try {
      requests.emplace_back(number, ParseReplayRequest(line));
    } catch (const Orbis::ParseException& refused) {
      throw BadInput(file + ", line " + std::to_string(number) + ": " + refused.GetPath() + ": " +
                     refused.GetReason());
    }
  }
  if (in.bad()) {
    throw BadInput(file + " cannot be read");
  }
  return requests;
}

}  // namespace

ExitStatus RunReplay(const Machines::MachineOptions& machine, Host::RuntimeOptions runtime,
                     const std::string& file, LogLevel level, std::istream& in, std::ostream& out) {
  if (machine.host.empty()) {
    throw BadInput("replay needs a host to run on: name its description with --host");
  }
  std::ifstream opened;
  if (file != "-") {
    opened.open(file);
    if (!opened) {
      throw BadInput(file + " cannot be opened");
    }
  }
  auto requests = ReadRequests(file, file == "-" ? in : opened);
  runtime.makeMachine = Machines::MachineOf(machine);
  Replay replay(std::move(runtime), level, out);
  for (auto& [number, request] : requests) {
    try {
      replay.Run(std::move(request));
    } catch (const Host::ChangeRefused& refused) {
      throw BadInput(file + ", line " + std::to_string(number) + ": " + refused.what());
    }
  }
  return ExitStatus::Done;
}

}  // namespace Kovactl
