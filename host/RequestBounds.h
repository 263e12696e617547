// What a request may be at most while it waits for its turn, and what of it is worth keeping.
//
// Threads: any.
#pragma once

#include <cstddef>

namespace Orbis {
class DataObject;
}

namespace Host {

// Checks a request and cuts it down to what the gate looks at: of a disk, its name and its flag. Too many of
// anything, or too long a text, is refused by an InvalidArgument as the gate does it; whatever else is wrong
// is left to the gate. Texts are names of disks in a list; a text that must be there names one thing, one
// that may be missing is handed on as it is.
void BoundRequest(Orbis::DataObject& request);

// Roughly the bytes that the request takes in memory; a bounded one.
std::size_t WeightOf(const Orbis::DataObject& request);

}  // namespace Host
