// Why a text was refused: where, and for what reason.
#pragma once

#include <string>

#include "tessa/Throwable.h"

namespace Orbis {

class TESSA_API ParseException : public Tessa::Throwable {
 public:
  // `path` names the element or value ("/object/diskResult[2]/disk"), `line` counts from 1; 0, which is not
  // told, when the text as a whole is refused.
  ParseException(std::string path, int line, const std::string& reason);
  ParseException(const ParseException&);
  ParseException& operator=(const ParseException&);
  ~ParseException() override;

  const std::string& GetPath() const noexcept { return _path; }
  int GetLine() const noexcept { return _line; }
  const std::string& GetReason() const noexcept { return _reason; }

 private:
  std::string _path;
  int _line;
  std::string _reason;
};

}  // namespace Orbis
