// The provider of a program that would rather do nothing than format a disk it knows nothing about.
//
// The plug-in checks the disks of a group against what the kernel last told it. When the kernel fails to
// tell, it goes on with no disks at all, finds nothing against any disk, and has the group made. Asking the
// kernel beforehand narrows that down (Gate.h), but a kernel may answer one call and fail the next.
//
// Safe from any thread if the other provider is.
#pragma once

#include <atomic>
#include <string>
#include <vector>

#include "otxctl/provider/StrictProvider.h"

namespace Host {

class CautiousProvider final : public OtxCtl::Provider::StrictProvider {
 public:
  using StrictProvider::StrictProvider;

  void RefreshKovaInfo() override;
  void QueryDisks(const std::vector<std::string>& names, std::vector<HostCtl::Kova::DiskResult>& results,
                  bool flag) override;
  // Throws HostCtlException unless QueryDisks without names has gone well, and neither that nor
  // RefreshKovaInfo has failed since.
  void FormatDiskMapping(const std::string& ssd, const std::vector<std::string>& capacityDisks,
                         const HostCtl::Kova::FormatContext& context) override;

 private:
  // Does what asks the kernel; nothing is known any more if it throws.
  template <class Ask>
  void AskOrForget(Ask ask);

  std::atomic<bool> _knowsDisks = false;
};

}  // namespace Host
