// How KOVA marks what is its own, in the tags of volume groups and their members. The marks lie in the volume
// group's metadata, so those of a member that has left the host are still there.
#pragma once

#include <string_view>

namespace OtxCtl::Linux::Tags {

// Of a volume group that is a disk group.
inline constexpr std::string_view marker = "kova";
inline constexpr std::string_view group = "kova.group=";      // the disk group's UUID
inline constexpr std::string_view machine = "kova.machine=";  // the id of the machine that made it
inline constexpr std::string_view state = "kova.state=";  // "creating" until all of it stands, then "ready"
inline constexpr std::string_view created = "kova.created=";  // seconds since 1970, for the order of groups

// Of its members.
inline constexpr std::string_view disk = "kova.disk=";    // the disk's KOVA UUID
inline constexpr std::string_view role = "kova.role=";    // "cache" or "capacity"
inline constexpr std::string_view place = "kova.place=";  // of a capacity disk in its group, from 0

inline constexpr std::string_view ready = "ready";
inline constexpr std::string_view cache = "cache";
inline constexpr std::string_view capacity = "capacity";

}  // namespace OtxCtl::Linux::Tags
