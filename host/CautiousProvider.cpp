#include "host/CautiousProvider.h"

#include "kova/agentd/include/HostCtlException.h"

namespace Host {

using HostCtl::Lib::HostCtlException;

template <class Ask>
void CautiousProvider::AskOrForget(Ask ask) {
  try {
    ask();
  } catch (...) {
    _knowsDisks = false;
    throw;
  }
}

// A refresh that went well tells nothing about disks yet, and leaves what is known of them as it is: it is
// also made for other questions, which must not stop a change that goes on meanwhile.
void CautiousProvider::RefreshKovaInfo() {
  AskOrForget([&] { StrictProvider::RefreshKovaInfo(); });
}

void CautiousProvider::QueryDisks(const std::vector<std::string>& names,
                                  std::vector<HostCtl::Kova::DiskResult>& results, bool flag) {
  if (!names.empty()) {
    StrictProvider::QueryDisks(names, results, flag);
    return;
  }
  AskOrForget([&] { StrictProvider::QueryDisks(names, results, flag); });
  _knowsDisks = true;
}

void CautiousProvider::FormatDiskMapping(const std::string& ssd,
                                         const std::vector<std::string>& capacityDisks,
                                         const HostCtl::Kova::FormatContext& context) {
  if (!_knowsDisks) {
    throw HostCtlException("the disk group of '" + ssd +
                           "' is not made, for the kernel could not tell about its disks");
  }
  StrictProvider::FormatDiskMapping(ssd, capacityDisks, context);
}

}  // namespace Host
