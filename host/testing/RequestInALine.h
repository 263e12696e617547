// Requests as tests read them: in a line.
#pragma once

#include <string>

#include "host/ManagementApi.h"
#include "nox/Host.h"
#include "nox/Kova.h"
#include "orbis/TypeDescriptor.h"

namespace Host::Testing {

// " naa.1!" for a disk that is flash by its flag, " naa.1?" for one without a flag.
inline std::string InALine(const Nox::Host::ScsiDisk& disk) {
  const std::string flag = !disk.HasSsd() ? "?" : disk.GetSsd() ? "!" : "";
  return " " + disk.GetCanonicalName() + flag;
}

inline std::string InALine(const DiskList* disks) {
  std::string text;
  for (std::size_t i = 0; disks != nullptr && i < disks->Size(); ++i) {
    text += InALine(*(*disks)[i]);
  }
  return text;
}

inline std::string InALine(const Nox::Kova::Host::DiskMapping& mapping) {
  return InALine(*mapping.GetSsd()) + " <" + InALine(mapping.GetNonSsd().Get()) + " >";
}

inline std::string InALine(const Orbis::Any* value) {
  std::string text;
  if (const auto* const mappings = dynamic_cast<const MappingList*>(value)) {
    for (const Nox::Kova::Host::DiskMapping* mapping : *mappings) {
      text += InALine(*mapping);
    }
  } else if (const auto* const mapping = dynamic_cast<const Nox::Kova::Host::DiskMapping*>(value)) {
    text += InALine(*mapping);
  } else if (const auto* const names = dynamic_cast<const Orbis::TextList*>(value)) {
    for (const std::string& name : names->Items()) {
      text += " " + name;
    }
  } else {
    text += InALine(dynamic_cast<const DiskList*>(value));
  }
  return text;
}

// "AddDisks naa.1? naa.2! naa.3", "RemoveDisk naa.1 p o 1 2": the operation and its own parameters, those
// that are not set empty or 0. Label and wait are left out.
inline std::string InALine(const Orbis::DataObject& request) {
  std::string text = request.GetType().name;
  for (const Orbis::FieldDescriptor* field : request.GetType().fields) {
    if (field->name == "label" || field->name == "wait") {
      continue;
    }
    if (field->kind == Orbis::FieldKind::String) {
      const auto* const value = static_cast<const std::string*>(field->read(request));
      text += " " + (value == nullptr ? "" : *value);
    } else if (field->kind == Orbis::FieldKind::Int) {
      const auto* const value = static_cast<const std::int32_t*>(field->read(request));
      text += " " + std::to_string(value == nullptr ? 0 : *value);
    } else {
      text += InALine(field->get(request));
    }
  }
  return text;
}

}  // namespace Host::Testing
