// The operations of the management API: what is asked for by name, and what every way in and every way out
// reads of it. Made from the schema, where operations and their parameters are documented.
//
// A request is an object whose fields are the parameters; the classes stand in nox/Operations.h.
//
// Threads: any.
#pragma once

#include <optional>
#include <span>
#include <string>
#include <string_view>

#include "orbis/DataObject.h"

namespace Nox {

namespace Operation {

// A request that reads.
class TESSA_API Query : public Orbis::DataObject {
 protected:
  Query() = default;
  Query(const Query&) = default;
  ~Query() override;
};

// A request that changes the host, and what every one of them takes besides its own parameters.
class TESSA_API Change : public Orbis::DataObject {
 public:
  virtual const std::string& GetLabel() const = 0;
  virtual bool HasLabel() const noexcept = 0;
  virtual void SetLabel(std::optional<std::string> value) = 0;

  virtual bool GetWait() const = 0;
  virtual bool HasWait() const noexcept = 0;
  virtual void SetWait(std::optional<bool> value) = 0;

 protected:
  Change() = default;
  Change(const Change&) = default;
  ~Change() override;
};

}  // namespace Operation

struct OperationDescriptor {
  std::string_view name;                  // "AddDisks"
  bool changes;                           // its request is a Change, and runs as a task; otherwise a Query
  const Orbis::TypeDescriptor& request;   // its fields are the parameters
  const Orbis::TypeDescriptor& response;  // result, if it has one; fault; of a change also task
  const Orbis::TypeDescriptor* result;  // the declared type of the result, a list's if it is one; null: none
};

// All of them, in the order of the schema. The view lives for ever.
TESSA_API std::span<const OperationDescriptor> Operations();

// Null for an unknown name.
TESSA_API const OperationDescriptor* FindOperation(std::string_view name);

// That of a request. Throws Tessa::TypeMismatchException for an object that is none.
TESSA_API const OperationDescriptor& OperationOf(const Orbis::DataObject& request);

}  // namespace Nox
