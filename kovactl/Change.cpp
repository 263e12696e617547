#include "kovactl/Change.h"

#include <utility>

#include "kovactl/DiskGroups.h"
#include "kovactl/Words.h"
#include "nox/Kova.h"
#include "nox/Operations.h"

namespace Kovactl {
namespace {

namespace Op = Nox::Operation;
using Host::Answer;
using Host::ManagementApi;
using Nox::Host::ScsiDisk;
using Nox::Kova::Host::DiskMapInfo;
using Nox::Kova::Host::DiskMapping;
using Nox::Kova::Host::DiskResult;
using Orbis::MethodFault;
using Tessa::MakeRef;
using Tessa::Ref;

// A disk by its name alone; the gate puts the inventory's in its place.
Ref<ScsiDisk> Named(const std::string& name) {
  const auto disk = MakeRef<ScsiDisk>();
  disk->SetCanonicalName(name);
  return disk;
}

Ref<Host::DiskList> AllNamed(const Texts& names) {
  const auto disks = MakeRef<Host::DiskList>();
  for (const std::string& name : names) {
    disks->Append(Named(name));
  }
  return disks;
}

template <class Request>
Request WithOptions(Request request, const RemovalOptions& options) {
  request.SetPassThrough(options.passThrough);
  request.SetOptionText(options.text);
  request.SetOptionFirst(options.first);
  request.SetOptionSecond(options.second);
  return request;
}

class AddDisksChange final : public Change {
 public:
  explicit AddDisksChange(Texts disks) : _disks(std::move(disks)) {}
  bool Destroys() const override { return true; }
  Texts DisksAtRisk() const override { return _disks; }
  Answer Make(const ManagementApi& host) const override {
    return host.Change(Op::AddDisks(AllNamed(_disks)));
  }
  std::string Participle() const override { return "added"; }
  std::string WordsForSilence() const override { return "Nothing was added."; }
  std::optional<Texts> OfferedDisks() const override { return _disks; }

 private:
  Texts _disks;
};

class AddAllChange final : public Change {
 public:
  Ref<MethodFault> LookAt(const ManagementApi& host) override {
    const Answer answer = host.Query(Op::QueryDisksForKova());
    const auto* const results = dynamic_cast<const Orbis::DataArray<DiskResult>*>(answer.result.Get());
    if (results == nullptr) {
      return answer.fault;
    }
    for (const DiskResult* result : *results) {
      if (result->GetState() == DiskResult::STATE_ELIGIBLE) {
        _eligible.push_back(NameOf(*result->GetDisk()));
      }
    }
    return nullptr;
  }
  bool Destroys() const override { return true; }
  Texts DisksAtRisk() const override { return _eligible; }
  Answer Make(const ManagementApi& host) const override { return host.Change(Op::AddAllEligibleDisks()); }
  std::string Participle() const override { return "added"; }
  std::string WordsForSilence() const override {
    return _eligible.empty() ? "Nothing was added: no disk is eligible."
                             : "Nothing was added: no disk group can be made of the eligible disks.";
  }
  std::optional<Texts> OfferedDisks() const override { return Texts(); }

 private:
  Texts _eligible;
};

class MakeGroupChange final : public Change {
 public:
  MakeGroupChange(std::string cacheDisk, Texts capacityDisks)
      : _cacheDisk(std::move(cacheDisk)), _capacityDisks(std::move(capacityDisks)) {}
  bool Destroys() const override { return true; }
  Texts DisksAtRisk() const override {
    Texts disks = {_cacheDisk};
    disks.insert(disks.end(), _capacityDisks.begin(), _capacityDisks.end());
    return disks;
  }
  Answer Make(const ManagementApi& host) const override {
    const auto group = MakeRef<DiskMapping>();
    group->SetSsd(Named(_cacheDisk));
    group->SetNonSsd(AllNamed(_capacityDisks));
    const auto groups = MakeRef<Host::MappingList>();
    groups->Append(group);
    return host.Change(Op::InitializeDisks(groups));
  }
  std::string Participle() const override { return "made"; }
  std::string WordsForSilence() const override { return "Nothing was made."; }

 private:
  std::string _cacheDisk;
  Texts _capacityDisks;
};

class RemoveDiskChange final : public Change {
 public:
  RemoveDiskChange(std::string disk, RemovalOptions options)
      : _disk(std::move(disk)), _options(std::move(options)) {}
  // The cache disk takes its whole group along.
  Ref<MethodFault> LookAt(const ManagementApi& host) override {
    const DiskGroups groups = DiskGroups::Of(host);
    const DiskMapInfo* const group = groups.Find(_disk);
    _atRisk = group != nullptr ? DisksOf(*group->GetMapping()) : Texts{_disk};
    return groups.Info() == nullptr ? groups.Fault() : nullptr;
  }
  bool Destroys() const override { return true; }
  Texts DisksAtRisk() const override { return _atRisk; }
  Answer Make(const ManagementApi& host) const override {
    return host.Change(WithOptions(Op::RemoveDisk(_disk), _options));
  }
  std::string Participle() const override { return "removed"; }
  std::string WordsForSilence() const override { return "Removed " + _disk + "."; }
  bool AnswersWithGroups() const override { return false; }

 private:
  std::string _disk;
  RemovalOptions _options;
  Texts _atRisk;
};

class RemoveGroupChange final : public Change {
 public:
  RemoveGroupChange(std::string cacheDisk, RemovalOptions options)
      : _cacheDisk(std::move(cacheDisk)), _options(std::move(options)) {}
  Ref<MethodFault> LookAt(const ManagementApi& host) override {
    const DiskGroups groups = DiskGroups::Of(host);
    if (groups.Info() == nullptr) {
      return groups.Fault();
    }
    _group = groups.Require(_cacheDisk).GetMapping();
    return nullptr;
  }
  bool Destroys() const override { return true; }
  Texts DisksAtRisk() const override { return DisksOf(*_group); }
  Answer Make(const ManagementApi& host) const override {
    return host.Change(WithOptions(Op::RemoveDiskMapping(_group), _options));
  }
  std::string Participle() const override { return "removed"; }
  std::string WordsForSilence() const override { return "Removed the disk group of " + _cacheDisk + "."; }
  bool AnswersWithGroups() const override { return false; }

 private:
  std::string _cacheDisk;
  RemovalOptions _options;
  Ref<DiskMapping> _group;
};

class UnmountChange final : public Change {
 public:
  explicit UnmountChange(Texts cacheDisks) : _cacheDisks(std::move(cacheDisks)) {}
  Ref<MethodFault> LookAt(const ManagementApi& host) override {
    const DiskGroups groups = DiskGroups::Of(host);
    if (groups.Info() == nullptr) {
      return groups.Fault();
    }
    _groups = MakeRef<Host::MappingList>();
    for (const std::string& cacheDisk : _cacheDisks) {
      _groups->Append(groups.Require(cacheDisk).GetMapping());
    }
    return nullptr;
  }
  bool Destroys() const override { return false; }
  Answer Make(const ManagementApi& host) const override {
    return host.Change(Op::UnmountDiskMapping(_groups));
  }
  std::string Participle() const override { return "unmounted"; }
  std::string WordsForSilence() const override { return "Nothing was unmounted."; }

 private:
  Texts _cacheDisks;
  Ref<Host::MappingList> _groups;
};

class ClaimChange final : public Change {
 public:
  bool Destroys() const override { return false; }
  Answer Make(const ManagementApi& host) const override { return host.Change(Op::ClaimUnmountedDiskgroup()); }
  std::string Participle() const override { return "mounted"; }
  std::string WordsForSilence() const override { return "Asked the host to mount its disk groups."; }
  bool AnswersWithGroups() const override { return false; }
};

}  // namespace

Ref<MethodFault> Change::LookAt(const ManagementApi&) {
  return nullptr;
}

ChangeRef AddTheseDisks(Texts disks) {
  return std::make_unique<AddDisksChange>(std::move(disks));
}

ChangeRef AddEveryEligibleDisk() {
  return std::make_unique<AddAllChange>();
}

ChangeRef MakeGroup(std::string cacheDisk, Texts capacityDisks) {
  return std::make_unique<MakeGroupChange>(std::move(cacheDisk), std::move(capacityDisks));
}

ChangeRef RemoveOneDisk(std::string disk, RemovalOptions options) {
  return std::make_unique<RemoveDiskChange>(std::move(disk), std::move(options));
}

ChangeRef RemoveGroup(std::string cacheDisk, RemovalOptions options) {
  return std::make_unique<RemoveGroupChange>(std::move(cacheDisk), std::move(options));
}

ChangeRef UnmountGroups(Texts cacheDisks) {
  return std::make_unique<UnmountChange>(std::move(cacheDisks));
}

ChangeRef ClaimGroups() {
  return std::make_unique<ClaimChange>();
}

}  // namespace Kovactl
