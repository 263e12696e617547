// Values inside other XML texts: the part of the SOAP codec that envelopes share with stand-alone texts.
#pragma once

#include <string>
#include <string_view>

#include "orbis/Any.h"
#include "orbis/xml/XmlReader.h"

namespace Orbis::Soap {

// The object of a request's element, as clients of other makes write them: elements stand in any order, those
// that answers alone must have may be missing, and one that is nil is as if it were not there. Throws
// ParseException.
Ref<Any> ReadRequestElement(const Xml::Element& element, const TypeDescriptor& declared);

// Appends the element, in the API's namespace and with xsi:type unless `declared` is what it is. The prefixes
// xsd and xsi must be bound there. Throws as SerializeObjectToSoap does; `out` then holds a part.
void AppendElement(std::string_view name, const Any& value, const TypeDescriptor* declared, std::string& out);

}  // namespace Orbis::Soap
