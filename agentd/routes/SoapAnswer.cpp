#include "agentd/routes/SoapAnswer.h"

#include <array>
#include <string>

#include "host/Refusal.h"
#include "nox/Faults.h"
#include "nox/Operations.h"
#include "orbis/Envelope.h"
#include "orbis/FaultText.h"
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

template <class Response, class Result>
Ref<Orbis::DataObject> Respond(const Host::Answer& answer) {
  const auto response = MakeRef<Response>();
  response->SetResult(Tessa::NarrowToType<Result>(answer.result));
  response->SetFault(answer.fault);
  return response;
}

// For an operation without a result.
template <class Response>
Ref<Orbis::DataObject> RespondPlainly(const Host::Answer& answer) {
  const auto response = MakeRef<Response>();
  response->SetFault(answer.fault);
  return response;
}

using DiskResults = Orbis::DataArray<Nox::Kova::Host::DiskResult>;
using MapResults = Orbis::DataArray<Nox::Kova::Host::DiskMapResult>;
using ConfigInfo = Nox::Kova::Host::ConfigInfo;

struct Row {
  std::string_view operation;
  Ref<Orbis::DataObject> (*respond)(const Host::Answer& answer);
};

constexpr std::array<Row, 10> rows = {{
    {"QueryDisksForKova", &Respond<Op::QueryDisksForKovaResponse, DiskResults>},
    {"AddDisks", &Respond<Op::AddDisksResponse, MapResults>},
    {"InitializeDisks", &Respond<Op::InitializeDisksResponse, MapResults>},
    {"RemoveDisk", &RespondPlainly<Op::RemoveDiskResponse>},
    {"RemoveDiskMapping", &RespondPlainly<Op::RemoveDiskMappingResponse>},
    {"AddAllEligibleDisks", &Respond<Op::AddAllEligibleDisksResponse, MapResults>},
    {"UnmountDiskMapping", &Respond<Op::UnmountDiskMappingResponse, MapResults>},
    {"GetStorageInfo", &Respond<Op::GetStorageInfoResponse, ConfigInfo::StorageInfo>},
    {"GetConfigInfo", &Respond<Op::GetConfigInfoResponse, ConfigInfo>},
    {"ClaimUnmountedDiskgroup", &RespondPlainly<Op::ClaimUnmountedDiskgroupResponse>},
}};

bool IsNothing(const Ref<Orbis::Any>& result) {
  const auto* const list = dynamic_cast<const Orbis::DataArrayBase*>(result.Get());
  return !result || (list != nullptr && list->IsEmpty());
}

// Whose the fault is: the host's, or the request's.
const char* CodeOf(const MethodFault& fault) {
  const bool server = dynamic_cast<const Orbis::Fault::SystemError*>(&fault) != nullptr ||
                      dynamic_cast<const Nox::Fault::Busy*>(&fault) != nullptr;
  return server ? "Server" : "Client";
}

// For whoever reads the fault's text alone: its first message in words, if it has one.
std::string TextOf(const MethodFault& fault) {
  const auto messages = fault.GetFaultMessage();
  for (const Orbis::LocalizableMessage* message : *messages) {
    if (message->HasMessage()) {
      return fault.GetType().name + ": " + message->GetMessage();
    }
  }
  return Orbis::FaultText(fault);
}

HttpAnswer TypedFault(const MethodFault& fault) {
  HttpAnswer http = Xml(500);
  Orbis::AppendSoapFault(CodeOf(fault), TextOf(fault), &fault, http.body);
  return http;
}

}  // namespace

HttpAnswer ToSoap(std::string_view operation, const Host::Answer& answer) {
  if (answer.fault && IsNothing(answer.result)) {
    return TypedFault(*answer.fault);
  }
  HttpAnswer http = Xml(200);
  for (const Row& row : rows) {
    if (row.operation == operation) {
      const Ref<Orbis::DataObject> response = row.respond(answer);
      Orbis::AppendSoapMessage(response->GetType().name, *response, http.body);
    }
  }
  return http;
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
  Orbis::AppendSoapFault(code, text, nullptr, http.body);
  return http;
}

}  // namespace Agentd
