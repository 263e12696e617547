// What stands for a host as it is at one moment, in a word.
#pragma once

#include <string>

namespace Host {

struct HostState;

// 16 hexadecimal digits. Two states of the same values have the same; any other value anywhere in the state,
// another order of disks included, makes another one. Whoever planned on a host can so tell whether it is
// still the same.
//
// Pure: nothing but the values counts, so it is the same in every process, today and tomorrow. It is no
// protection against somebody who wants two hosts to look alike.
std::string GenerationOf(const HostState& state);

}  // namespace Host
