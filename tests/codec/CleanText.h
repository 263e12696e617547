// What becomes of texts that a text form cannot hold: said once more, apart from the writers, so that
// tests can tell what a reader must get.
#pragma once

#include <string>
#include <string_view>

#include "orbis/Any.h"

namespace Codec {

enum class Form { Xml, Json };

// In both forms every longest beginning of a UTF-8 character that is not continued, or else every single
// byte, becomes U+FFFD. In XML, so does each control character but tab, line feed and carriage return,
// and so do U+FFFE and U+FFFF.
std::string CleanText(std::string_view text, Form form);

// A copy of the value with every text in it cleaned.
Orbis::Ref<Orbis::Any> CleanCopy(const Orbis::Any& value, Form form);

}  // namespace Codec
