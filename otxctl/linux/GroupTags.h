// How KOVA marks what is its own, in the tags of volume groups and their members. The marks lie in the volume
// group's metadata, so those of a member that has left the host are still there.
#pragma once

#include <string_view>

namespace OtxCtl::Linux::Tags {

// Of a volume group that is a disk group.
inline constexpr std::string_view marker = "kova";
inline constexpr std::string_view group = "kova.group=";      // the disk group's UUID
inline constexpr std::string_view machine = "kova.machine=";  // the id of the machine that made it
inline constexpr std::string_view state = "kova.state=";      // one of the states below
inline constexpr std::string_view created = "kova.created=";  // microseconds since 1970: the order of groups
inline constexpr std::string_view kind = "kova.kind=";        // as it was made: one of the kinds below

// Of its members; the disk's UUID also of a capacity disk's data volume, for without one it is no member.
inline constexpr std::string_view disk = "kova.disk=";    // the disk's KOVA UUID
inline constexpr std::string_view role = "kova.role=";    // "cache" or "capacity"
inline constexpr std::string_view place = "kova.place=";  // of a capacity disk in its group, from 0

// States: a group that was made to the end is ready. The others are never mounted.
inline constexpr std::string_view creating = "creating";
inline constexpr std::string_view ready = "ready";
inline constexpr std::string_view removing = "removing";
// Its cache disk was removed after it had left the host, and its volumes hold data.
inline constexpr std::string_view released = "released";

inline constexpr std::string_view hybrid = "hybrid";
inline constexpr std::string_view allFlash = "all-flash";

inline constexpr std::string_view cache = "cache";
inline constexpr std::string_view capacity = "capacity";

}  // namespace OtxCtl::Linux::Tags
