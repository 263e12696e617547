// Requests of clients in a line: disks by name, as objects, and disk groups of them.
#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <vector>

#include "host/ManagementApi.h"
#include "nox/Host.h"
#include "nox/Kova.h"
#include "nox/Operations.h"
#include "orbis/TypeDescriptor.h"
#include "orbis/Types.h"

namespace Host::Testing {

namespace Op = Nox::Operation;

using DiskRef = Tessa::Ref<Nox::Host::ScsiDisk>;
using MappingRef = Tessa::Ref<Nox::Kova::Host::DiskMapping>;

// A disk that has only its name, and its ssd flag if one is given.
inline DiskRef ADisk(const std::string& name, std::optional<bool> ssd = std::nullopt) {
  auto disk = Tessa::MakeRef<Nox::Host::ScsiDisk>();
  disk->SetCanonicalName(name);
  disk->SetSsd(ssd);
  return disk;
}

inline Tessa::Ref<DiskList> Disks(const std::vector<DiskRef>& disks) {
  auto list = Tessa::MakeRef<DiskList>();
  for (const DiskRef& disk : disks) {
    list->Append(disk);
  }
  return list;
}

inline Tessa::Ref<DiskList> DisksNamed(const std::vector<std::string>& names) {
  auto list = Tessa::MakeRef<DiskList>();
  for (const std::string& name : names) {
    list->Append(ADisk(name));
  }
  return list;
}

inline MappingRef AMapping(const DiskRef& ssd, const Tessa::Ref<DiskList>& nonSsd) {
  auto mapping = Tessa::MakeRef<Nox::Kova::Host::DiskMapping>();
  mapping->SetSsd(ssd);
  mapping->SetNonSsd(nonSsd);
  return mapping;
}

inline MappingRef MappingOf(const std::string& ssd, const std::vector<std::string>& nonSsd) {
  return AMapping(ADisk(ssd), DisksNamed(nonSsd));
}

inline Tessa::Ref<MappingList> Mappings(const std::vector<MappingRef>& mappings) {
  auto list = Tessa::MakeRef<MappingList>();
  for (const MappingRef& mapping : mappings) {
    list->Append(mapping);
  }
  return list;
}

inline Tessa::Ref<Orbis::TextList> Names(const std::vector<std::string>& names) {
  return Tessa::MakeRef<Orbis::TextList>(names);
}

// What goes with a removal to the kernel.
struct RemovalOptions {
  std::string passThrough;
  std::string text;
  std::int32_t first = 0;
  std::int32_t second = 0;
};

template <class Request>
Request WithOptions(Request request, const RemovalOptions& options) {
  request.SetPassThrough(options.passThrough);
  request.SetOptionText(options.text);
  request.SetOptionFirst(options.first);
  request.SetOptionSecond(options.second);
  return request;
}

// What an answer or a refusal comes to: "done", "KovaFault", "PROPERTY | MESSAGE" for an InvalidArgument with
// a message, the reason of a SystemError.
inline std::string OutcomeText(const Orbis::MethodFault* fault) {
  if (fault == nullptr) {
    return "done";
  }
  if (const auto* const error = dynamic_cast<const Orbis::Fault::SystemError*>(fault)) {
    return error->GetReason();
  }
  const auto* const invalid = dynamic_cast<const Orbis::Fault::InvalidArgument*>(fault);
  const auto messages = fault->GetFaultMessage();
  if (invalid == nullptr || !invalid->HasArgument() || messages->IsEmpty()) {
    return std::string(fault->GetType().name);
  }
  return invalid->GetArgument() + " | " + (*messages)[0]->GetMessage();
}

}  // namespace Host::Testing
