// Marks what the runtime's libraries show to each other. Everything that is thrown, caught or cast
// across a library must have one type information in the whole process.
#pragma once

#define TESSA_API __attribute__((visibility("default")))
