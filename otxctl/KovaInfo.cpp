#include "kova/agentd/include/KovaInfo.h"

#include "kova/agentd/include/KovaPlugin.h"

namespace HostCtl {

// Out of line, so that every library sees the same type information.
KovaPlugin::~KovaPlugin() = default;
Kova::KovaInfo::~KovaInfo() = default;

}  // namespace HostCtl
