#include "agentd/routes/SoapRequest.h"

#include <array>
#include <utility>

#include "agentd/routes/RequestReader.h"
#include "nox/Operations.h"
#include "orbis/Envelope.h"
#include "orbis/Excerpt.h"
#include "orbis/Soap.h"
#include "orbis/TypeDescriptor.h"

namespace Agentd {
namespace {

namespace Op = Nox::Operation;
using Orbis::EnvelopeException;

// How the parameters of each message become arguments; one overload for each.
void Take(const Op::QueryDisksForKova& request, SoapRequest& read) {
  if (request.GetNames()) {
    read.arguments.names = request.GetNames()->Items();
  }
}

// A list that was left out is an empty one.
template <class List>
void TakeList(const Tessa::Ref<List>& list, Tessa::Ref<List>& argument) {
  if (list) {
    argument = list;
  }
}

template <class Request>
void TakeLabel(const Request& request, SoapRequest& read) {
  if (request.HasLabel()) {
    read.label = request.GetLabel();
  }
}

template <class Request>
void TakeRemoval(const Request& request, Host::RemovalArguments& removal) {
  removal.passThrough = request.HasPassThrough() ? request.GetPassThrough() : "";
  removal.optionText = request.HasOptionText() ? request.GetOptionText() : "";
  removal.optionFirst = request.HasOptionFirst() ? request.GetOptionFirst() : 0;
  removal.optionSecond = request.HasOptionSecond() ? request.GetOptionSecond() : 0;
}

void Take(const Op::AddDisks& request, SoapRequest& read) {
  TakeList(request.GetDisks(), read.arguments.disks);
  TakeLabel(request, read);
}

void Take(const Op::InitializeDisks& request, SoapRequest& read) {
  TakeList(request.GetMappings(), read.arguments.mappings);
  TakeLabel(request, read);
}

void Take(const Op::UnmountDiskMapping& request, SoapRequest& read) {
  TakeList(request.GetMappings(), read.arguments.mappings);
  TakeLabel(request, read);
}

void Take(const Op::AddAllEligibleDisks& request, SoapRequest& read) {
  TakeLabel(request, read);
}

void Take(const Op::RemoveDisk& request, SoapRequest& read) {
  read.arguments.disk = request.GetDisk();
  TakeRemoval(request, read.arguments.removal);
}

void Take(const Op::RemoveDiskMapping& request, SoapRequest& read) {
  read.arguments.mapping = request.GetMapping();
  TakeRemoval(request, read.arguments.removal);
}

void Take(const Op::GetStorageInfo&, SoapRequest&) {}
void Take(const Op::GetConfigInfo&, SoapRequest&) {}
void Take(const Op::ClaimUnmountedDiskgroup&, SoapRequest&) {}

template <class Request>
void ReadAs(const Orbis::SoapMessage& message, SoapRequest& read) {
  const auto object = message.Read(Request::StaticType());
  Take(static_cast<const Request&>(*object), read);
}

struct Row {
  std::string_view name;
  void (*read)(const Orbis::SoapMessage& message, SoapRequest& read);
};

constexpr std::array<Row, 10> rows = {{
    {"QueryDisksForKova", &ReadAs<Op::QueryDisksForKova>},
    {"AddDisks", &ReadAs<Op::AddDisks>},
    {"InitializeDisks", &ReadAs<Op::InitializeDisks>},
    {"RemoveDisk", &ReadAs<Op::RemoveDisk>},
    {"RemoveDiskMapping", &ReadAs<Op::RemoveDiskMapping>},
    {"AddAllEligibleDisks", &ReadAs<Op::AddAllEligibleDisks>},
    {"UnmountDiskMapping", &ReadAs<Op::UnmountDiskMapping>},
    {"GetStorageInfo", &ReadAs<Op::GetStorageInfo>},
    {"GetConfigInfo", &ReadAs<Op::GetConfigInfo>},
    {"ClaimUnmountedDiskgroup", &ReadAs<Op::ClaimUnmountedDiskgroup>},
}};

const Row& FindRow(std::string_view name) {
  for (const Row& row : rows) {
    if (row.name == name) {
      return row;
    }
  }
  throw EnvelopeException("Client", "/Envelope/Body", 0,
                          "there is no operation '" + std::string(Orbis::Excerpt(name)) + "'");
}

std::string_view Unquoted(std::string_view text) {
  const bool quoted = text.size() >= 2 && text.front() == '"' && text.back() == '"';
  return quoted ? text.substr(1, text.size() - 2) : text;
}

void CheckAction(std::string_view action, std::string_view name) {
  const std::string_view wanted = Unquoted(action);
  if (!wanted.empty() && wanted != std::string(Orbis::apiNamespace) + "#" + std::string(name)) {
    throw EnvelopeException(
        "Client", "SOAPAction", 0,
        "the header does not name the operation of the body, '" + std::string(name) + "'");
  }
}

}  // namespace

SoapRequest ReadSoapRequest(std::string_view body, std::string_view action) {
  const Orbis::SoapMessage message(body, Orbis::Limits::Untrusted());
  const Row& row = FindRow(message.GetName());
  CheckAction(action, row.name);
  SoapRequest read{.operation = FindOperation(row.name), .arguments = {}, .label = {}};
  row.read(message, read);
  CheckLabel(read.label);
  return read;
}

}  // namespace Agentd
