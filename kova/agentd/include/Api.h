// Marks what the kernel control library shows to the programs and the plug-in that link it.
#pragma once

// Classes that are thrown, caught or cast across libraries need one type information for all of them.
#define HOSTCTL_API __attribute__((visibility("default")))
