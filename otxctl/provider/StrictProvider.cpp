#include "otxctl/provider/StrictProvider.h"

#include <exception>

#include "kova/agentd/include/HostCtlException.h"

namespace OtxCtl::Provider {

using HostCtl::Lib::HostCtlException;

void StrictProvider::AroundCall(const ProviderCall&, const Forward& forward) {
  try {
    forward();
  } catch (const HostCtlException&) {
    throw;
  } catch (const std::exception& exception) {
    throw HostCtlException(exception.what());
  } catch (...) {
    throw HostCtlException("the provider failed without saying why");
  }
}

}  // namespace OtxCtl::Provider
