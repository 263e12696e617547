// What the volume manager calls disk groups and their volumes.
#pragma once

#include <string>

namespace OtxCtl::Linux {

// "kova_0123456789ab", from the disk group's UUID.
std::string VolumeGroupName(const std::string& groupUuid);

// Of a capacity disk, from its KOVA UUID: "data_0123456789ab", and what it is cached by.
std::string DataVolumeName(const std::string& diskUuid);
std::string CacheVolumeName(const std::string& diskUuid);

// A new random UUID, of version 4. Throws std::runtime_error if the kernel gives none.
std::string NewUuid();

}  // namespace OtxCtl::Linux
