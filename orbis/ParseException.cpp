#include "orbis/ParseException.h"

#include <utility>

namespace Orbis {

ParseException::ParseException(std::string path, int line, const std::string& reason)
    : Throwable(path + (line > 0 ? ", line " + std::to_string(line) : "") + ": " + reason),
      _path(std::move(path)),
      _line(line),
      _reason(reason) {}
ParseException::ParseException(const ParseException&) = default;
ParseException& ParseException::operator=(const ParseException&) = default;
ParseException::~ParseException() = default;

}  // namespace Orbis
