// What a request must be before it may reach the plug-in.
//
// The plug-in takes a mistyped or half-filled request for impossible and ends the process over it. So every
// request of a client passes here first. What is refused is thrown as an InvalidArgument, whose property is
// the place ("disks[3]") and whose message says why; in what is let in, the inventory's object takes the
// place of every disk that the inventory knows: a client cannot call a hard disk flash.
//
// Threads: any.
#pragma once

#include <string>
#include <string_view>
#include <vector>

#include "host/ManagementApi.h"
#include "orbis/Types.h"

namespace HostCtl::Kova {
class KovaInfo;
}

namespace Host {
class KnownDisks;
class Simulation;
}  // namespace Host

namespace Host::Gate {

inline constexpr std::size_t longestName = 1024;    // bytes
inline constexpr std::size_t longestOption = 4096;  // bytes
inline constexpr std::size_t mostNames = 100'000;   // or disks, of a whole request
inline constexpr std::size_t mostMappings = 10'000;
inline constexpr std::size_t mostDisksOfGroup = 1000;  // beside its cache disk

// Not more than that many of what `what` says; a name not longer than the longest.
void CheckCount(const std::string& place, std::size_t count, std::size_t most, const char* what);
void CheckLength(const std::string& place, const std::string& name);

// Names must be there, not too long, UTF-8 without control characters, and not too many. `property` is what
// the client calls them.
void CheckNames(const std::string& property, const std::vector<std::string>& names);

// One such name: of a disk, present or absent.
void CheckName(const std::string& place, const std::string& name);

// A text that goes to the kernel as it is: not too long, UTF-8 without control characters.
void CheckOption(const std::string& property, const std::string& text);

// The disks of an AddDisks. One that the inventory lacks is refused, whatever flag it brings: the kernel may
// know it, but nobody has vouched for what it is.
// Without an inventory nobody can tell: a SystemError, here and below.
void AdmitDisks(DiskList& disks, const KnownDisks& known);

// Groups to be made: as AdmitDisks, but absent disks may be named too.
void AdmitNewGroups(MappingList& mappings, const KnownDisks& known);

// Groups that are there already, to be unmounted or removed. Their disks may be unknown to the inventory:
// the plug-in compares names, and says itself when there is no such group. A null is refused.
void AdmitGroups(MappingList& mappings, const KnownDisks& known);
void AdmitGroup(Nox::Kova::Host::DiskMapping* mapping, const KnownDisks& known);

// Disks as AdmitDisks lets them in: a cache disk of a group that is not mounted brings its whole group along,
// and the plug-in cannot bear a member that the inventory lacks. Refuses the disk and names the member. A
// kernel that cannot be asked is a SystemError, thrown as well.
void RequireWholeGroups(const DiskList& disks, const KnownDisks& known, HostCtl::Kova::KovaInfo& kernel);

// The kernel must be able to tell about its disks before groups are made: the plug-in takes one that fails
// for one without disks to refuse. A SystemError otherwise.
void RequireAnswers(HostCtl::Kova::KovaInfo& kernel);

// A group to be removed whose cache disk is named as one that has left: the kernel must have a group of that
// cache disk, for it would take out any other absent disk of that name just as well. Nothing is asked about
// other groups.
void RequireGroupIfAbsent(const Nox::Kova::Host::DiskMapping& mapping, HostCtl::Kova::KovaInfo& kernel);

// A disk to be taken out that is named as one that has left: no other disk that has left may bear the same
// UUID, as copies of one disk do, for the kernel would take out any of them, and a cache disk's group with
// it. `place` is where the request names it. Nothing is asked about other disks.
void RequireOneIfAbsent(const std::string& place, const std::string& name, HostCtl::Kova::KovaInfo& kernel);

// The text of a change of a simulated host, whatever that host is like now.
void CheckHostChange(const Simulation& simulation, std::string_view change);

// A change of a simulated host that the host would not accept; `error` begins with the path.
[[noreturn]] void RefuseChange(const std::string& error);

}  // namespace Host::Gate
