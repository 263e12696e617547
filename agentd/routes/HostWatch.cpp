#include "agentd/routes/HostWatch.h"

#include <utility>

#include "agentd/tasks/QueryQueue.h"
#include "host/ManagementApi.h"
#include "nox/Faults.h"
#include "nox/Kova.h"
#include "nox/Operations.h"

namespace Agentd {
namespace {

using Nox::Kova::Host::DiskMapInfo;
using Nox::Kova::Host::DiskResult;
using StorageInfo = Nox::Kova::Host::ConfigInfo::StorageInfo;

void CountDisks(const Orbis::DataArray<DiskResult>& disks, HostCounts& counts) {
  for (const DiskResult* disk : disks) {
    const std::string& state = disk->GetState();
    ++(state == DiskResult::STATE_INUSE      ? counts.disksInUse
       : state == DiskResult::STATE_ELIGIBLE ? counts.disksEligible
                                             : counts.disksIneligible);
  }
}

void CountGroups(const StorageInfo& storage, HostCounts& counts) {
  if (const auto& groups = storage.GetDiskMapInfo()) {
    for (const DiskMapInfo* group : *groups) {
      ++(group->GetMounted() ? counts.groupsMounted : counts.groupsUnmounted);
    }
  }
}

// Nothing when the host does not tell all of it.
std::optional<HostCounts> Count(const Host::ManagementApi& api) {
  const Host::Answer disks = api.Query(Nox::Operation::QueryDisksForKova());
  const Host::Answer groups = api.Query(Nox::Operation::GetDiskGroups());
  const auto* const results = dynamic_cast<const Orbis::DataArray<DiskResult>*>(disks.result.Get());
  const auto* const storage = dynamic_cast<const StorageInfo*>(groups.result.Get());
  if (results == nullptr || storage == nullptr || disks.fault || groups.fault) {
    return std::nullopt;
  }
  HostCounts counts;
  CountDisks(*results, counts);
  CountGroups(*storage, counts);
  return counts;
}

}  // namespace

HostWatch::HostWatch(const Host::ManagementApi& api, QueryQueue& queries, Clock clock)
    : _api(api), _queries(queries), _clock(std::move(clock)) {}

std::optional<HostCounts> HostWatch::Last() const {
  const auto now = _clock();
  const std::lock_guard guard(_mutex);
  std::optional<HostCounts> last = _counts;
  if (last) {
    last->age = now - _toldAt;
  }
  return last;
}

bool HostWatch::IsFresh(std::size_t changes) const {
  const std::optional<HostCounts> last = Last();
  const std::lock_guard guard(_mutex);
  return last && last->age < freshTime && _toldAfter == changes;
}

void HostWatch::Refresh(std::size_t changes) {
  if (IsFresh(changes) || _isAsking.exchange(true)) {
    return;
  }
  try {
    _queries.Run([this, changes] {
      const Host::Outcome outcome = Ask(changes);
      _isAsking = false;
      return outcome;
    });
  } catch (const Nox::Fault::Busy::Exception&) {
    _isAsking = false;  // the host has enough to do
  }
}

Host::Outcome HostWatch::Ask(std::size_t changes) {
  const auto asked = _clock();
  std::optional<HostCounts> counts;
  try {
    counts = Count(_api);
  } catch (const std::exception&) {
    return Host::Outcome::Failed;  // the same as a host that answers with a fault
  }
  if (!counts) {
    return Host::Outcome::Failed;
  }
  const std::lock_guard guard(_mutex);
  _counts = counts;
  _toldAt = asked;
  _toldAfter = changes;
  return Host::Outcome::Done;
}

}  // namespace Agentd
