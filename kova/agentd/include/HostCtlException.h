// The exceptions by which the kernel control library reports every failure.
//
// They derive from std::exception only and are thrown by value. Only HostCtlException itself and the
// classes below leave a provider.
#pragma once

#include <exception>
#include <string>
#include <vector>

#include "kova/agentd/include/Api.h"

namespace HostCtl::Lib {

// The event message that the kernel recorded for a failure. Carried along, not interpreted.
struct EvtMessage {
  std::string id;
  std::vector<std::string> arguments;
};

class HOSTCTL_API HostCtlException : public std::exception {
 public:
  explicit HostCtlException(std::string message, std::string detail = {}, EvtMessage event = {});
  HostCtlException(const HostCtlException&);
  HostCtlException& operator=(const HostCtlException&);
  ~HostCtlException() override;

  // The message text: what logs and faults show.
  virtual std::string Describe() const;

  const std::string& GetDetail() const noexcept { return _detail; }
  const EvtMessage& GetEvent() const noexcept { return _event; }
  const char* what() const noexcept override;

 private:
  std::string _message;
  std::string _detail;
  EvtMessage _event;
};

// A failure that concerns one disk.
class HOSTCTL_API KovaStorageException : public HostCtlException {
 public:
  KovaStorageException(std::string message, std::string diskName, std::string detail = {},
                       EvtMessage event = {});
  KovaStorageException(const KovaStorageException&);
  KovaStorageException& operator=(const KovaStorageException&);
  ~KovaStorageException() override;

  const std::string& GetDiskName() const noexcept { return _diskName; }

 private:
  std::string _diskName;
};

class HOSTCTL_API KovaExceptionHasPartition : public KovaStorageException {
 public:
  using KovaStorageException::KovaStorageException;
  ~KovaExceptionHasPartition() override;
};

class HOSTCTL_API KovaExceptionLastRemainingHDD : public KovaStorageException {
 public:
  using KovaStorageException::KovaStorageException;
  ~KovaExceptionLastRemainingHDD() override;
};

class HOSTCTL_API KovaExceptionRescanError : public KovaStorageException {
 public:
  using KovaStorageException::KovaStorageException;
  ~KovaExceptionRescanError() override;
};

class HOSTCTL_API KovaExceptionRemoveMappingAutoModeEnabled : public KovaStorageException {
 public:
  using KovaStorageException::KovaStorageException;
  ~KovaExceptionRemoveMappingAutoModeEnabled() override;
};

class HOSTCTL_API KovaExceptionRemoveDiskAutoModeEnabled : public KovaStorageException {
 public:
  using KovaStorageException::KovaStorageException;
  ~KovaExceptionRemoveDiskAutoModeEnabled() override;
};

// Not a KovaStorageException: it names no single disk, and is reported like any failure.
class HOSTCTL_API KovaExceptionIncompatibleDiskMapping : public HostCtlException {
 public:
  using HostCtlException::HostCtlException;
  ~KovaExceptionIncompatibleDiskMapping() override;
};

}  // namespace HostCtl::Lib
