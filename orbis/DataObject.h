// Data objects: values with named fields, as the schema describes them. The classes are generated.
#pragma once

#include "orbis/Any.h"

namespace Orbis {

class TESSA_API DataObject : public Any {
 public:
  static const TypeDescriptor& StaticType();

 protected:
  DataObject() = default;
  DataObject(const DataObject&) = default;
  DataObject& operator=(const DataObject&) = default;
  ~DataObject() override;
};

}  // namespace Orbis
