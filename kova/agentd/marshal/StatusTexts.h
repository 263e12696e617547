// The kernel's status codes as texts, for whoever reads its logs. Exported; nothing in the plug-in calls it.
#pragma once

#include <cstdint>

#define KOVA_STATUS_EXPORT extern "C" __attribute__((visibility("default")))

// 0 is success; the code 0x0BAD0000 + n is row n of the table.
using OTX_ReturnStatus = std::int32_t;  // NOLINT(readability-identifier-naming): as host programs know it

// Rows 0 to 341.
KOVA_STATUS_EXPORT const char* const returnStatusStrs[342];

// Never null; owned by the plug-in. Any thread.
// NOLINTNEXTLINE(readability-identifier-naming): as host programs know it
KOVA_STATUS_EXPORT const char* OTX_ReturnStatusToString(OTX_ReturnStatus status);
