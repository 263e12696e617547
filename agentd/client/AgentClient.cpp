#include "agentd/client/AgentClient.h"

#include <stdexcept>
#include <utility>

#include "host/HostError.h"
#include "nox/Kova.h"
#include "orbis/Excerpt.h"
#include "orbis/FaultText.h"
#include "orbis/Json.h"
#include "orbis/ParseException.h"
#include "orbis/TypeDescriptor.h"
#include "orbis/json/JsonText.h"

namespace Agentd {

using Host::Answer;
using Nox::Kova::Host::ConfigInfo;
using Nox::Kova::Host::DiskMapping;
using Nox::Kova::Host::DiskMapResult;
using Nox::Kova::Host::DiskResult;
using Orbis::DataArray;

namespace {

constexpr std::string_view jsonType = "application/json";
constexpr std::string_view folder = "/api/v1/";
constexpr std::size_t longestShown = 1024;  // bytes of an answer that is not understood

constexpr std::chrono::milliseconds queryPatience = std::chrono::minutes(10);
// A kernel may format for long, and to give up would not stop it.
constexpr std::chrono::milliseconds changePatience = std::chrono::hours(24);

// The members of a JSON object, one after the other.
class Body {
 public:
  Body& Add(const char* name, const std::string& text) {
    Begin(name);
    Orbis::Json::AppendString(text, _text);
    return *this;
  }
  Body& Add(const char* name, std::int32_t number) {
    Begin(name);
    _text += std::to_string(number);
    return *this;
  }
  Body& Add(const char* name, const Orbis::Any& value) {
    Begin(name);
    Orbis::WriteJson(value, _text);
    return *this;
  }
  Body& Add(const Host::RemovalArguments& arguments) {
    return Add("passThrough", arguments.passThrough)
        .Add("optionText", arguments.optionText)
        .Add("optionFirst", arguments.optionFirst)
        .Add("optionSecond", arguments.optionSecond);
  }
  std::string Done() const { return _text + "}"; }

 private:
  void Begin(const char* name) {
    _text += _text.size() == 1 ? "" : ",";
    Orbis::Json::AppendString(name, _text);
    _text += ":";
  }

  std::string _text = "{";
};

const Orbis::TypeDescriptor* GroupResults() {
  return &DataArray<DiskMapResult>::StaticType();
}
constexpr const Orbis::TypeDescriptor* noResult = nullptr;

// The agent is of another kind: it lacks the operation, or takes it in another form.
bool IsUnserved(unsigned status) {
  return status == 404 || status == 405 || status == 415;
}

std::string InALine(const Answer& answer) {
  if (!answer.fault) {
    return "it gives no reason";
  }
  for (const Orbis::LocalizableMessage* message : *answer.fault->GetFaultMessage()) {
    if (message->HasMessage()) {
      return message->GetMessage();
    }
  }
  return Orbis::FaultText(*answer.fault);
}

}  // namespace

RefusedByAgent::RefusedByAgent(Tessa::Ref<Orbis::MethodFault> fault)
    : std::runtime_error(InALine({.result = nullptr, .fault = fault})), _fault(std::move(fault)) {}

AgentClient::AgentClient(const std::string& url, TlsClientFiles files)
    : _address(ParseAgentAddress(url)), _files(std::move(files)) {}

Answer AgentClient::QueryDisksForKova(const std::vector<std::string>& names) const {
  const std::string body = Body().Add("names", Orbis::TextList(names)).Done();
  return Ask("QueryDisksForKova", body, &DataArray<DiskResult>::StaticType(), queryPatience);
}

Answer AgentClient::GetStorageInfo() const {
  return Ask("GetStorageInfo", "{}", &ConfigInfo::StorageInfo::StaticType(), queryPatience);
}

Answer AgentClient::GetDiskGroups() const {
  return Ask("GetDiskGroups", "{}", &ConfigInfo::StorageInfo::StaticType(), queryPatience);
}

Answer AgentClient::GetConfigInfo() const {
  return Ask("GetConfigInfo", "{}", &ConfigInfo::StaticType(), queryPatience);
}

Answer AgentClient::AddDisks(const Host::DiskList& disks) const {
  return Ask("AddDisks", Body().Add("disks", disks).Done(), GroupResults(), changePatience);
}

Answer AgentClient::AddAllEligibleDisks() const {
  return Ask("AddAllEligibleDisks", "{}", GroupResults(), changePatience);
}

Answer AgentClient::InitializeDisks(const Host::MappingList& mappings) const {
  return Ask("InitializeDisks", Body().Add("mappings", mappings).Done(), GroupResults(), changePatience);
}

Answer AgentClient::UnmountDiskMapping(const Host::MappingList& mappings) const {
  return Ask("UnmountDiskMapping", Body().Add("mappings", mappings).Done(), GroupResults(), changePatience);
}

Answer AgentClient::RemoveDisk(const std::string& disk, const Host::RemovalArguments& arguments) const {
  return Ask("RemoveDisk", Body().Add("disk", disk).Add(arguments).Done(), noResult, changePatience);
}

Answer AgentClient::RemoveDiskMapping(const DiskMapping& mapping,
                                      const Host::RemovalArguments& arguments) const {
  return Ask("RemoveDiskMapping", Body().Add("mapping", mapping).Add(arguments).Done(), noResult,
             changePatience);
}

Answer AgentClient::ClaimUnmountedDiskgroup() const {
  return Ask("ClaimUnmountedDiskgroup", "{}", noResult, changePatience);
}

std::string AgentClient::DescribeHost() const {
  try {
    return Get("host");
  } catch (const RefusedByAgent& refused) {
    if (dynamic_cast<const Orbis::Fault::InvalidArgument*>(&refused.GetFault()) == nullptr) {
      throw;
    }
    throw Host::HostError(refused.what());
  }
}

Answer AgentClient::ChangeHost(const std::string& change) const {
  return Ask("host", change, noResult, changePatience);
}

std::string AgentClient::Tasks() const {
  return Get("tasks");
}

std::string AgentClient::Task(const std::string& id) const {
  return Get("tasks/" + id);
}

Answer AgentClient::Ask(const std::string& operation, const std::string& body,
                        const Orbis::TypeDescriptor* resultType, std::chrono::milliseconds patience) const {
  const HttpAnswer http = Exchange(
      _address, {"POST", std::string(folder) + operation, std::string(jsonType), body}, patience, _files);
  DemandJson(http);
  const Answer answer = Read(http, resultType);
  if (IsUnserved(http.status)) {
    throw ConnectionError("the agent on " + _address.Name() + " answered with status " +
                          std::to_string(http.status) + ": " + InALine(answer));
  }
  return answer;
}

Answer AgentClient::Read(const HttpAnswer& http, const Orbis::TypeDescriptor* resultType) const {
  try {
    return Host::ReadJsonAnswer(http.body, resultType);
  } catch (const Orbis::ParseException& refused) {
    throw AnswerError("the answer of the agent on " + _address.Name() + " cannot be read: " + refused.what());
  }
}

std::string AgentClient::Get(const std::string& target) const {
  HttpAnswer http = Exchange(_address, {"GET", std::string(folder) + target, "", ""}, queryPatience, _files);
  DemandJson(http);
  if (http.status == 200) {
    return std::move(http.body);
  }
  const Answer answer = Read(http, noResult);
  if (!answer.fault) {
    throw ConnectionError("the agent on " + _address.Name() + " answered with status " +
                          std::to_string(http.status) + " and without a reason");
  }
  throw RefusedByAgent(answer.fault);
}

void AgentClient::DemandJson(const HttpAnswer& http) const {
  if (http.contentType != jsonType) {
    throw AnswerError("the agent on " + _address.Name() + " answered with status " +
                      std::to_string(http.status) + ": " +
                      std::string(Orbis::Excerpt(http.body, longestShown)));
  }
}

}  // namespace Agentd
