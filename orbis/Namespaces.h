// The namespaces of the texts that the data binding reads and writes.
#pragma once

#include <string_view>

namespace Orbis {

inline constexpr std::string_view apiNamespace = "urn:nox";
inline constexpr std::string_view schemaNamespace = "http://www.w3.org/2001/XMLSchema";
inline constexpr std::string_view envelopeNamespace = "http://schemas.xmlsoap.org/soap/envelope/";
inline constexpr std::string_view instanceNamespace = "http://www.w3.org/2001/XMLSchema-instance";

}  // namespace Orbis
