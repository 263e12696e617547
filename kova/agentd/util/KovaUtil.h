// What the plug-in asks of its host agent: a session, and the host's disks.
//
// The two handles are shared by all instances: making a KovaUtil replaces the logger, destroying any one
// clears it. They are not guarded; the manager makes its one KovaUtil before the first hook is called.
#pragma once

#include <string>

#include "nox/Fwd.h"
#include "orbis/DataArray.h"
#include "orbis/Types.h"
#include "tessa/Lockable.h"
#include "tessa/Logger.h"
#include "tessa/Ref.h"
#include "tessa/Session.h"

namespace Kovasvc::Util {

// The session that the plug-in presents to the agent's authorization.
class SessionImpl final : public Tessa::SessionMixin, public Tessa::System::LockableObjectImpl {
 public:
  SessionImpl();
  ~SessionImpl() override;
};

class KovaUtil : public virtual Tessa::ObjectImpl {
 public:
  explicit KovaUtil(Tessa::Ref<Tessa::Service::Logger>& logger);
  ~KovaUtil() override;

  // Fills `session` with the one session of the plug-in, acting as the built-in user "System"; made and
  // registered with the agent on first use. Throws Orbis::Fault::SystemError::Exception without an
  // application or authorization manager; `session` is then unchanged. Not guarded.
  static void GetSession(Tessa::Ref<Tessa::Session>& session);

  // Replaces `disks` with a new array of the host's disks, in the agent's order. The disks are the agent's
  // own objects: copy one before changing it. Throws Orbis::Fault::SystemError::Exception when the agent
  // has no storage system, Tessa::TypeMismatchException when that is something else; `disks` is then
  // unchanged. Safe from any thread.
  static void GetDisksFromAgentd(Tessa::Ref<Orbis::DataArray<Nox::Host::ScsiDisk>>& disks);

  static Tessa::Ref<Tessa::Service::Logger> _logger;
  static Tessa::Ref<SessionImpl> _session;
};

// The host's disks as above; without an inventory, a warning and null.
Tessa::Ref<Orbis::DataArray<Nox::Host::ScsiDisk>> InventoryOrNone(Tessa::Service::Logger& logger);

// The reason that the thrown fault carries: why there is no inventory.
const std::string& ReasonOf(const Orbis::Fault::SystemError::Exception& exception);

// Replaces `disks` with a new array of those logical units that are disks, in order. No information, or no
// list in it, gives an empty array.
void EnumScsiDiskDevice(Nox::Host::StorageDeviceInfo* info,
                        Tessa::Ref<Orbis::DataArray<Nox::Host::ScsiDisk>>& disks);

}  // namespace Kovasvc::Util
