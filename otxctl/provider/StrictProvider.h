// A provider that throws what providers may throw, whatever another one does.
//
// The plug-in ends the process over any exception that is not the kernel library's. So a program that must
// live on stands this before its provider: any other exception becomes a HostCtlException with its text.
// Safe from any thread if the other provider is.
#pragma once

#include "otxctl/provider/ForwardingProvider.h"

namespace OtxCtl::Provider {

class StrictProvider : public ForwardingProvider {
 public:
  using ForwardingProvider::ForwardingProvider;

 protected:
  void AroundCall(const ProviderCall& call, const Forward& forward) override;
};

}  // namespace OtxCtl::Provider
