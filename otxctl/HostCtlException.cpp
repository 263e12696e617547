#include "kova/agentd/include/HostCtlException.h"

#include <utility>

namespace HostCtl::Lib {

HostCtlException::HostCtlException(std::string message, std::string detail, EvtMessage event)
    : _message(std::move(message)), _detail(std::move(detail)), _event(std::move(event)) {}

HostCtlException::HostCtlException(const HostCtlException&) = default;
HostCtlException& HostCtlException::operator=(const HostCtlException&) = default;
HostCtlException::~HostCtlException() = default;

std::string HostCtlException::Describe() const {
  return _message;
}

const char* HostCtlException::what() const noexcept {
  return _message.c_str();
}

KovaStorageException::KovaStorageException(std::string message, std::string diskName, std::string detail,
                                           EvtMessage event)
    : HostCtlException(std::move(message), std::move(detail), std::move(event)),
      _diskName(std::move(diskName)) {}

KovaStorageException::KovaStorageException(const KovaStorageException&) = default;
KovaStorageException& KovaStorageException::operator=(const KovaStorageException&) = default;
KovaStorageException::~KovaStorageException() = default;

// Each class has its one virtual table, and with it its one type information, in this library.
KovaExceptionHasPartition::~KovaExceptionHasPartition() = default;
KovaExceptionLastRemainingHDD::~KovaExceptionLastRemainingHDD() = default;
KovaExceptionRescanError::~KovaExceptionRescanError() = default;
KovaExceptionRemoveMappingAutoModeEnabled::~KovaExceptionRemoveMappingAutoModeEnabled() = default;
KovaExceptionRemoveDiskAutoModeEnabled::~KovaExceptionRemoveDiskAutoModeEnabled() = default;
KovaExceptionIncompatibleDiskMapping::~KovaExceptionIncompatibleDiskMapping() = default;

}  // namespace HostCtl::Lib
