#include "agentd/routes/SoapAnswer.h"

#include <array>
#include <optional>
#include <string>
#include <type_traits>

#include "host/FaultWords.h"
#include "host/Refusal.h"
#include "nox/Faults.h"
#include "nox/Operations.h"
#include "orbis/Envelope.h"
#include "orbis/TypeDescriptor.h"
#include "orbis/WrittenSoap.h"
#include "tessa/Narrow.h"

namespace Agentd {
namespace {

namespace Op = Nox::Operation;
using Orbis::MethodFault;
using Tessa::MakeRef;
using Tessa::Ref;

HttpAnswer Xml(unsigned status) {
  HttpAnswer http;
  http.status = status;
  http.contentType = "text/xml; charset=utf-8";
  return http;
}

// An answer, and the id of its task if it is a change's.
struct Told {
  const Host::Answer& answer;
  std::string_view task;  // empty: none
};

// Sets what there is a place for.
template <class Response, class Result = void>
Ref<Orbis::DataObject> Respond(const Told& told) {
  const auto response = MakeRef<Response>();
  if constexpr (!std::is_void_v<Result>) {
    response->SetResult(Tessa::NarrowToType<Result>(told.answer.result));
  }
  response->SetFault(told.answer.fault);
  if constexpr (requires { response->GetTask(); }) {
    response->SetTask(told.task.empty() ? std::nullopt : std::optional(std::string(told.task)));
  }
  return response;
}

using DiskResults = Orbis::DataArray<Nox::Kova::Host::DiskResult>;
using MapResults = Orbis::DataArray<Nox::Kova::Host::DiskMapResult>;
using ConfigInfo = Nox::Kova::Host::ConfigInfo;

struct Row {
  std::string_view operation;
  Ref<Orbis::DataObject> (*respond)(const Told& told);
};

constexpr std::array<Row, 10> rows = {{
    {"QueryDisksForKova", &Respond<Op::QueryDisksForKovaResponse, DiskResults>},
    {"AddDisks", &Respond<Op::AddDisksResponse, MapResults>},
    {"InitializeDisks", &Respond<Op::InitializeDisksResponse, MapResults>},
    {"RemoveDisk", &Respond<Op::RemoveDiskResponse>},
    {"RemoveDiskMapping", &Respond<Op::RemoveDiskMappingResponse>},
    {"AddAllEligibleDisks", &Respond<Op::AddAllEligibleDisksResponse, MapResults>},
    {"UnmountDiskMapping", &Respond<Op::UnmountDiskMappingResponse, MapResults>},
    {"GetStorageInfo", &Respond<Op::GetStorageInfoResponse, ConfigInfo::StorageInfo>},
    {"GetConfigInfo", &Respond<Op::GetConfigInfoResponse, ConfigInfo>},
    {"ClaimUnmountedDiskgroup", &Respond<Op::ClaimUnmountedDiskgroupResponse>},
}};

// Whose the fault is: the host's, or the request's.
const char* CodeOf(const MethodFault& fault) {
  const bool server = dynamic_cast<const Orbis::Fault::SystemError*>(&fault) != nullptr ||
                      dynamic_cast<const Nox::Fault::Busy*>(&fault) != nullptr;
  return server ? "Server" : "Client";
}

// For whoever reads the fault's text alone: what its kind means and what it carries; of a request that is
// wrong, the message that says where.
std::string TextOf(const MethodFault& fault) {
  const auto messages = fault.GetFaultMessage();
  if (dynamic_cast<const Orbis::Fault::InvalidArgument*>(&fault) != nullptr && !messages->IsEmpty() &&
      (*messages)[0]->HasMessage()) {
    return fault.GetType().name + ": " + (*messages)[0]->GetMessage();
  }
  return fault.GetType().name + ": " + Host::Explain(fault);
}

HttpAnswer TypedFault(const MethodFault& fault, std::string_view task = {}) {
  HttpAnswer http = Xml(500);
  const std::string_view name = task.empty() ? "" : "task";
  Orbis::AppendSoapFault(CodeOf(fault), TextOf(fault), {&fault, name, task}, http.body);
  return http;
}

HttpAnswer ToSoap(std::string_view operation, const Told& told) {
  if (Host::IsFaultAlone(told.answer)) {
    return TypedFault(*told.answer.fault, told.task);
  }
  HttpAnswer http = Xml(200);
  http.outcome = Host::OutcomeOf(told.answer);
  for (const Row& row : rows) {
    if (row.operation == operation) {
      const Ref<Orbis::DataObject> response = row.respond(told);
      Orbis::AppendSoapMessage(response->GetType().name, *response, http.body);
    }
  }
  return http;
}

}  // namespace

HttpAnswer ToSoap(std::string_view operation, const Host::Answer& answer) {
  return ToSoap(operation, Told{answer, {}});
}

HttpAnswer ToSoap(const Task& ended) {
  return ToSoap(ended.operation, Told{ended.answer, ended.id});
}

HttpAnswer ToSoap(std::string_view operation, const Host::WrittenAnswer& answer) {
  using Response = Op::QueryDisksForKovaResponse;
  const Orbis::TypeDescriptor& list = *Nox::Kova::Host::DiskResult::StaticType().array;
  HttpAnswer http = Xml(200);
  if (answer.fault ||
      !Orbis::AppendMessageOfSoap(Response::StaticType().name, "result", list, answer.result, http.body)) {
    return ToSoap(operation, Host::Read(answer));
  }
  return http;
}

HttpAnswer ToSoap(const Orbis::ParseException& refused) {
  if (const auto* const envelope = dynamic_cast<const Orbis::EnvelopeException*>(&refused)) {
    return SoapFault(envelope->GetCode(), refused.what());
  }
  const auto fault = MakeRef<Orbis::Fault::InvalidArgument>(refused.GetPath());
  Host::Explain(*fault, Host::invalidArgumentKey, refused.what());
  return TypedFault(*fault);
}

HttpAnswer SoapFault(std::string_view code, std::string_view text) {
  HttpAnswer http = Xml(500);
  Orbis::AppendSoapFault(code, text, {}, http.body);
  return http;
}

}  // namespace Agentd
