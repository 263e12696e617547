// What a client can ask for: every operation of the management API by its name, with its parameters.
//
// The one table that all ways in share; each has its own reader that fills the arguments.
#pragma once

#include <string>
#include <string_view>
#include <vector>

#include "host/ManagementApi.h"
#include "nox/Kova.h"

namespace Agentd {

// Which fields count depends on the operation; lists and the mapping are never null.
struct Arguments {
  std::vector<std::string> names;
  Tessa::Ref<Host::DiskList> disks = Tessa::MakeRef<Host::DiskList>();
  Tessa::Ref<Host::MappingList> mappings = Tessa::MakeRef<Host::MappingList>();
  std::string disk;
  Tessa::Ref<Nox::Kova::Host::DiskMapping> mapping = Tessa::MakeRef<Nox::Kova::Host::DiskMapping>();
  Host::RemovalArguments removal;
};

struct Parameter {
  std::string_view name;
  bool isRequired = false;
};

struct Operation {
  std::string_view name;
  bool changes = false;  // runs as a task
  std::vector<Parameter> parameters;
  Host::Answer (*call)(const Host::ManagementApi& api, const Arguments& arguments);
  // The same with the result as the plug-in wrote it; null for most.
  Host::WrittenAnswer (*callWritten)(const Host::ManagementApi& api, const Arguments& arguments) = nullptr;
};

// Null for an unknown name.
const Operation* FindOperation(std::string_view name);

const std::vector<Operation>& Operations();

// Cuts the arguments down to what the operations look at. Too many of anything, or too long a name, are
// refused by an InvalidArgument, before the request waits for its turn.
void Bound(Arguments& arguments);

// Roughly the bytes that they take in memory; bounded ones.
std::size_t WeightOf(const Arguments& arguments);

}  // namespace Agentd
