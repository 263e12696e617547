// Appends many small parts to a string for less than the string itself takes: the string is kept longer than
// what is in it, so that each part is a copy and nothing else.
//
// Threads: one. The string must outlive this; once this is gone, it holds the parts and no more.
#pragma once

#include <cstddef>
#include <string>
#include <string_view>

namespace Orbis {

class GrowingText {
 public:
  // `expected`: about how many bytes will be appended.
  GrowingText(std::string& out, std::size_t expected);
  ~GrowingText();
  GrowingText(const GrowingText&) = delete;
  GrowingText& operator=(const GrowingText&) = delete;

  // Texts, one behind the other.
  template <class... Parts>
  void Append(const Parts&... parts) {
    const std::size_t size = (std::string_view(parts).size() + ...);
    if (size > static_cast<std::size_t>(_limit - _end)) {
      Grow(size);
    }
    (Copy(parts), ...);
  }

 private:
  void Copy(std::string_view part) { _end += part.copy(_end, part.size()); }
  void Grow(std::size_t wanted);

  std::string& _out;
  char* _end;    // of the parts
  char* _limit;  // of the string
};

}  // namespace Orbis
