// How the process ends when something happens that must not.
//
// All three go through one handler, which the host program may replace. It is given the text, should
// flush its logs, and ends the process without running destructors. When it returns, or none is
// installed, the text goes to standard error and the process aborts.
//
// Threads: safe from any thread.
#pragma once

#include <exception>

#include "tessa/Api.h"

namespace Tessa {

using PanicHandler = void (*)(const char* text);

// Returns the handler before. Null restores the default.
TESSA_API PanicHandler SetPanicHandler(PanicHandler handler) noexcept;

// Text: "CONDITION at PATH:LINE".
[[noreturn]] TESSA_API void PanicVerify(const char* condition, const char* path, int line);

// Text: the exception's.
[[noreturn]] TESSA_API void PanicExit(const std::exception& cause);
[[noreturn]] TESSA_API void PanicExit(const char* text);

// Text: printf-like; a line feed at its end is dropped.
[[noreturn]] TESSA_API void Panic(const char* format, ...) __attribute__((format(printf, 1, 2)));

}  // namespace Tessa
