#include "tessa/Panic.h"

#include <unistd.h>

#include <atomic>
#include <cstdarg>
#include <cstdio>
#include <cstdlib>
#include <cstring>

namespace Tessa {
namespace {

// A panic must not allocate: memory may be what is wrong.
constexpr std::size_t longestText = 4096;

std::atomic<PanicHandler> panicHandler{nullptr};

[[noreturn]] void End(const char* text) {
  if (const PanicHandler handler = panicHandler.load()) {
    handler(text);
  }
  for (const char* part : {"panic: ", text, "\n"}) {
    if (write(STDERR_FILENO, part, std::strlen(part)) < 0) {
      break;
    }
  }
  std::abort();
}

}  // namespace

PanicHandler SetPanicHandler(PanicHandler handler) noexcept {
  return panicHandler.exchange(handler);
}

void PanicVerify(const char* condition, const char* path, int line) {
  char text[longestText];
  std::snprintf(text, sizeof text, "%s at %s:%d", condition, path, line);
  End(text);
}

void PanicExit(const std::exception& cause) {
  End(cause.what());
}
void PanicExit(const char* text) {
  End(text);
}

void Panic(const char* format, ...) {
  char text[longestText];
  va_list arguments;
  va_start(arguments, format);
  std::vsnprintf(text, sizeof text, format, arguments);
  va_end(arguments);
  if (char* end = text + std::strlen(text); end != text && end[-1] == '\n') {
    end[-1] = '\0';
  }
  End(text);
}

}  // namespace Tessa
