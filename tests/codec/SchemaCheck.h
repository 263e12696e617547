// Texts against the XML Schema of the API, by a validator that is not ours.
#pragma once

#include <string>
#include <vector>

namespace Codec {

// Every complaint of the validator about the texts, with the text's number in front; empty when all are
// valid. One run of the validator for all of them.
std::string ValidateAgainstSchema(const std::vector<std::string>& texts);

}  // namespace Codec
