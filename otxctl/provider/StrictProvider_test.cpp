#include "otxctl/provider/StrictProvider.h"

#include <gtest/gtest.h>

#include <stdexcept>

#include "kova/agentd/include/HostCtlException.h"
#include "otxctl/provider/testing/Operations.h"

namespace OtxCtl::Provider {
namespace {

using HostCtl::Lib::HostCtlException;
using HostCtl::Lib::KovaExceptionHasPartition;

template <class Thrown>
class FailingProvider : public ForwardingProvider {
 public:
  explicit FailingProvider(Thrown thrown) : _thrown(std::move(thrown)) {}

 protected:
  void AroundCall(const ProviderCall&, const Forward&) override { throw _thrown; }

 private:
  Thrown _thrown;
};

class StrictProviders : public testing::TestWithParam<Operation> {
 protected:
  // The operation on a provider that throws this.
  template <class Thrown>
  void CallOneThatThrows(Thrown thrown) {
    StrictProvider provider(std::make_shared<FailingProvider<Thrown>>(std::move(thrown)));
    GetParam().call(provider);
  }

  template <class Thrown>
  std::string TextOf(Thrown thrown) {
    try {
      CallOneThatThrows(std::move(thrown));
    } catch (const HostCtlException& exception) {
      return exception.Describe();
    }
    ADD_FAILURE() << "nothing was thrown";
    return {};
  }
};

TEST_P(StrictProviders, TurnWhatNoProviderMayThrowIntoWhatItMay) {
  EXPECT_EQ(TextOf(std::runtime_error("boom")), "boom");
  EXPECT_EQ(TextOf(42), "the provider failed without saying why");
}

TEST_P(StrictProviders, LetTheKernelLibrarysExceptionsPass) {
  EXPECT_THROW(CallOneThatThrows(KovaExceptionHasPartition("boom", "naa.1")), KovaExceptionHasPartition);
}

INSTANTIATE_TEST_SUITE_P(Operations, StrictProviders, testing::ValuesIn(AllOperations()),
                         [](const auto& row) { return std::string(row.param.name); });

}  // namespace
}  // namespace OtxCtl::Provider
