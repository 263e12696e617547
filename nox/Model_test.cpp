// What holds for every type of the API: values of new objects, and what reading an unset field does.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <functional>
#include <map>
#include <string>

#include "nox/Faults.h"
#include "nox/Host.h"
#include "nox/Kova.h"
#include "nox/Tasks.h"
#include "orbis/Engine.h"
#include "orbis/Scalar.h"
#include "orbis/TypeDescriptor.h"
#include "orbis/Types.h"

namespace Nox {
namespace {

using Orbis::AllTypes;
using Orbis::Any;
using Orbis::DataObject;
using Orbis::FieldDescriptor;
using Orbis::FieldKind;
using Orbis::IsScalar;
using Orbis::MakeRef;
using Orbis::Presence;
using Orbis::Ref;
using Orbis::TypeDescriptor;

template <class T>
T& As(DataObject& object) {
  return static_cast<T&>(object);
}

using Getter = std::function<void(DataObject&)>;

// How each optional simple field is read in C++, by "Type.field".
const std::map<std::string, Getter>& OptionalGetters() {
  static const auto* const getters = new std::map<std::string, Getter>{
      {"HostScsiLun.canonicalName", [](DataObject& o) { As<Host::ScsiLun>(o).GetCanonicalName(); }},
      {"HostScsiLun.displayName", [](DataObject& o) { As<Host::ScsiLun>(o).GetDisplayName(); }},
      {"HostScsiLun.vendor", [](DataObject& o) { As<Host::ScsiLun>(o).GetVendor(); }},
      {"HostScsiLun.model", [](DataObject& o) { As<Host::ScsiLun>(o).GetModel(); }},
      {"HostScsiLun.serialNumber", [](DataObject& o) { As<Host::ScsiLun>(o).GetSerialNumber(); }},
      {"HostScsiDisk.ssd", [](DataObject& o) { As<Host::ScsiDisk>(o).GetSsd(); }},
      {"HostScsiDisk.local", [](DataObject& o) { As<Host::ScsiDisk>(o).GetLocal(); }},
      {"HostScsiDisk.transport", [](DataObject& o) { As<Host::ScsiDisk>(o).GetTransport(); }},
      {"HostScsiDisk.detail", [](DataObject& o) { As<Host::ScsiDisk>(o).GetDetail(); }},
      {"KovaHostKovaDiskInfo.formatVersion",
       [](DataObject& o) { As<Kova::Host::KovaDiskInfo>(o).GetFormatVersion(); }},
      {"KovaHostDiskResult.kovaUuid", [](DataObject& o) { As<Kova::Host::DiskResult>(o).GetKovaUuid(); }},
      {"KovaHostConfigInfo.enabled", [](DataObject& o) { As<Kova::Host::ConfigInfo>(o).GetEnabled(); }},
      {"KovaHostConfigInfoClusterInfo.clusterUuid",
       [](DataObject& o) { As<Kova::Host::ConfigInfo::ClusterInfo>(o).GetClusterUuid(); }},
      {"KovaHostConfigInfoClusterInfo.nodeUuid",
       [](DataObject& o) { As<Kova::Host::ConfigInfo::ClusterInfo>(o).GetNodeUuid(); }},
      {"KovaHostConfigInfoStorageInfo.autoClaim",
       [](DataObject& o) { As<Kova::Host::ConfigInfo::StorageInfo>(o).GetAutoClaim(); }},
      {"Task.started", [](DataObject& o) { As<Task>(o).GetStarted(); }},
      {"Task.ended", [](DataObject& o) { As<Task>(o).GetEnded(); }},
      {"Task.resultForgotten", [](DataObject& o) { As<Task>(o).GetResultForgotten(); }},
      {"KovaDiskFault.device", [](DataObject& o) { As<Fault::KovaDiskFault>(o).GetDevice(); }},
      {"InvalidArgument.argument", [](DataObject& o) { As<Orbis::Fault::InvalidArgument>(o).GetArgument(); }},
      {"LocalizableMessage.message", [](DataObject& o) { As<Orbis::LocalizableMessage>(o).GetMessage(); }},
  };
  return *getters;
}

std::string WhatReadingThrows(const Getter& getter, DataObject& object) {
  try {
    getter(object);
  } catch (const Tessa::NotInitializedException& exception) {
    return exception.what();
  }
  return "";
}

// Calls `action(type, field, object)` for the fields of a new object of every type that has objects.
void ForEachFieldOfNewObjects(
    const std::function<void(const TypeDescriptor&, const FieldDescriptor&, DataObject&)>& action) {
  for (const TypeDescriptor* type : AllTypes()) {
    if (!type->IsAbstract()) {
      for (const FieldDescriptor* field : type->fields) {
        const Ref<Any> object = type->create();
        SCOPED_TRACE(type->name + "." + std::string(field->name));
        action(*type, *field, static_cast<DataObject&>(*object));
      }
    }
  }
}

// The type that brings the field in.
const TypeDescriptor& OwnerOf(const TypeDescriptor& type, const FieldDescriptor& field) {
  const TypeDescriptor* owner = &type;
  const auto owns = [&](const TypeDescriptor& candidate) {
    for (const FieldDescriptor& own : candidate.ownFields) {
      if (&own == &field) {
        return true;
      }
    }
    return false;
  };
  while (!owns(*owner)) {
    owner = owner->base;
  }
  return *owner;
}

TEST(NewObject, HasItsRequiredSimpleFieldsSetToNothing) {
  ForEachFieldOfNewObjects([](const TypeDescriptor&, const FieldDescriptor& field, DataObject& object) {
    if (field.presence == Presence::Required && IsScalar(field.kind)) {
      const void* const value = field.read(object);
      ASSERT_NE(value, nullptr);
      std::string text;
      Orbis::AppendScalar(field.kind, value, text);
      EXPECT_EQ(text, field.kind == FieldKind::String     ? ""
                      : field.kind == FieldKind::Boolean  ? "false"
                      : field.kind == FieldKind::DateTime ? "1970-01-01T00:00:00Z"
                                                          : "0");
    }
  });
}

TEST(NewObject, HasItsRequiredObjectsMade) {
  int required = 0;
  ForEachFieldOfNewObjects([&](const TypeDescriptor&, const FieldDescriptor& field, DataObject& object) {
    if (field.presence == Presence::Required && field.kind == FieldKind::Object) {
      ++required;
      const Any* const value = field.get(object);
      ASSERT_NE(value, nullptr);
      EXPECT_EQ(&value->GetType(), &field.declaredType());
    }
  });
  EXPECT_GT(required, 4);
}

TEST(NewObject, HasItsOptionalFieldsUnset) {
  ForEachFieldOfNewObjects([](const TypeDescriptor&, const FieldDescriptor& field, DataObject& object) {
    if (field.presence != Presence::Required) {
      EXPECT_EQ(IsScalar(field.kind) ? field.read(object) : field.get(object), nullptr);
    }
  });
}

TEST(NewObject, SharesNothingWithAnother) {
  ForEachFieldOfNewObjects([](const TypeDescriptor& type, const FieldDescriptor& field, DataObject& object) {
    if (field.presence == Presence::Required && field.kind == FieldKind::Object) {
      const Ref<Any> another = type.create();
      EXPECT_NE(field.get(object), field.get(static_cast<DataObject&>(*another)));
    }
  });
}

TEST(UnsetField, ThrowsWhenRead) {
  int texts = 0;
  int others = 0;
  ForEachFieldOfNewObjects([&](const TypeDescriptor& type, const FieldDescriptor& field, DataObject& object) {
    if (field.presence != Presence::Optional || !IsScalar(field.kind)) {
      return;
    }
    const std::string name = OwnerOf(type, field).name + "." + std::string(field.name);
    const auto getter = OptionalGetters().find(name);
    ASSERT_NE(getter, OptionalGetters().end()) << name << " wants a row in OptionalGetters()";
    const bool isText = field.kind == FieldKind::String;
    ++(isText ? texts : others);
    EXPECT_EQ(WhatReadingThrows(getter->second, object),
              isText ? "Not initialized" : "optional value not set");
    field.write(object);
    EXPECT_EQ(WhatReadingThrows(getter->second, object), "") << "once it is set";
  });
  EXPECT_GT(texts, 0);
  EXPECT_GT(others, 0);
}

TEST(OptionalField, IsUnsetAgainByNothing) {
  const Ref<Host::ScsiDisk> disk = MakeRef<Host::ScsiDisk>();
  disk->SetSsd(false);
  EXPECT_TRUE(disk->HasSsd());
  EXPECT_FALSE(disk->GetSsd());
  disk->SetSsd(std::nullopt);
  EXPECT_FALSE(disk->HasSsd());
  disk->SetCanonicalName("");
  EXPECT_TRUE(disk->HasCanonicalName());
  EXPECT_EQ(disk->GetCanonicalName(), "");
}

TEST(Types, AreFoundByNameAndHaveListsOfThemselves) {
  for (const TypeDescriptor* type : AllTypes()) {
    SCOPED_TRACE(type->name);
    EXPECT_EQ(Orbis::FindType(type->name), type);
    const TypeDescriptor* const list = Orbis::FindType(type->name + "List");
    ASSERT_NE(list, nullptr);
    EXPECT_EQ(list->element, type);
    EXPECT_EQ(&list->createArray()->GetType(), list);
    EXPECT_EQ(Orbis::FindType(type->name + "ListList"), nullptr);
  }
}

TEST(Types, KnowThemselves) {
  for (const TypeDescriptor* type : AllTypes()) {
    if (!type->IsAbstract()) {
      EXPECT_EQ(&type->create()->GetType(), type) << type->name;
    }
  }
}

TEST(Types, HaveNoFieldTwice) {
  for (const TypeDescriptor* type : AllTypes()) {
    std::map<std::string_view, int> counts;
    for (const FieldDescriptor* field : type->fields) {
      EXPECT_EQ(++counts[field->name], 1) << type->name << "." << field->name;
    }
  }
}

TEST(Types, HaveTheNamesOfTheWire) {
  const std::map<std::string, std::string_view> expected = {
      {"HostScsiDisk", "Nox::Host::ScsiDisk"},
      {"HostDiskDimensionsLba", "Nox::Host::DiskDimensions::Lba"},
      {"KovaHostDiskMapping", "Nox::Kova::Host::DiskMapping"},
      {"KovaHostConfigInfoNetworkInfoPortConfig", "Nox::Kova::Host::ConfigInfo::NetworkInfo::PortConfig"},
      {"DiskIsUSB", "Nox::Fault::DiskIsUSB"},
      {"MethodFault", "Orbis::MethodFault"},
  };
  for (const auto& [name, source] : expected) {
    const TypeDescriptor* const type = Orbis::FindType(name);
    ASSERT_NE(type, nullptr) << name;
    EXPECT_EQ(type->source, source);
  }
}

TEST(Clone, OfADiskMappingSharesNoDisk) {
  const Ref<Kova::Host::DiskMapping> mapping = MakeRef<Kova::Host::DiskMapping>();
  mapping->SetNonSsd(MakeRef<Orbis::DataArray<Host::ScsiDisk>>());
  mapping->GetNonSsd()->Append(MakeRef<Host::ScsiDisk>());
  const Ref<Kova::Host::DiskMapping> copy = Orbis::Clone(mapping);
  ASSERT_TRUE(Orbis::Equal(mapping.Get(), copy.Get()));
  (*copy->GetNonSsd())[0]->SetCanonicalName("naa.1");
  copy->GetSsd()->SetCanonicalName("naa.2");
  EXPECT_FALSE((*mapping->GetNonSsd())[0]->HasCanonicalName());
  EXPECT_FALSE(mapping->GetSsd()->HasCanonicalName());
}

}  // namespace
}  // namespace Nox
