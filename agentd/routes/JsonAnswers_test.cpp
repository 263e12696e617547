// With which status an answer goes out as JSON.

#include "agentd/routes/JsonAnswers.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "nox/Faults.h"
#include "nox/Kova.h"
#include "orbis/TypeDescriptor.h"
#include "orbis/Types.h"

namespace Agentd {
namespace {

using Orbis::MethodFault;
using Tessa::MakeRef;
using Tessa::Ref;

struct Row {
  Ref<MethodFault> fault;
  unsigned status;
};

class FaultStatus : public testing::TestWithParam<Row> {};

TEST_P(FaultStatus, IsThatOfItsKind) {
  EXPECT_EQ(ToHttp(Host::Answer{.result = nullptr, .fault = GetParam().fault}).status, GetParam().status);
}

template <class Fault>
Row Of(unsigned status) {
  return {MakeRef<Fault>(), status};
}

INSTANTIATE_TEST_SUITE_P(
    OfFaults, FaultStatus,
    testing::Values(Of<Orbis::Fault::InvalidArgument>(400), Of<Orbis::Fault::SystemError>(500),
                    Of<Nox::Fault::NotPermitted>(403), Of<Nox::Fault::Busy>(503),
                    Of<Nox::Fault::HostChanged>(409), Of<Nox::Fault::KovaFault>(409),
                    Of<Nox::Fault::KovaDiskFault>(409), Of<Nox::Fault::DiskHasPartitions>(409),
                    Of<Nox::Fault::DiskIsLastRemainingNonSSD>(409),
                    Of<Nox::Fault::KovaIncompatibleDiskMapping>(409), Of<Nox::Fault::DiskIsNonLocal>(409),
                    Of<Nox::Fault::DiskIsUSB>(409), Of<Nox::Fault::DiskTooSmall>(409),
                    Of<Nox::Fault::InsufficientDisks>(409), Of<Nox::Fault::DuplicateDisks>(400)),
    [](const auto& row) { return row.param.fault->GetType().name; });

TEST(JsonAnswers, AFaultBesideAnEmptyListIsAFailureAndStillShowsTheList) {
  const auto empty = MakeRef<Orbis::DataArray<Nox::Kova::Host::DiskMapResult>>();
  const HttpAnswer http =
      ToHttp(Host::Answer{.result = empty, .fault = MakeRef<Nox::Fault::InsufficientDisks>("naa.1")});
  EXPECT_EQ(http.status, 409u);
  EXPECT_EQ(http.body, "{\"result\":[],\"fault\":{\"@type\":\"InsufficientDisks\",\"device\":\"naa.1\"}}\n");
}

TEST(JsonAnswers, AFaultBesideAResultIs200) {
  const auto texts = MakeRef<Orbis::TextList>(std::vector<std::string>{"a"});
  const HttpAnswer http =
      ToHttp(Host::Answer{.result = texts, .fault = MakeRef<Orbis::Fault::SystemError>("no")});
  EXPECT_EQ(http.status, 200u);
}

TEST(JsonAnswers, ALineOfTextNamesItsCharset) {
  const HttpAnswer http = PlainText(404, "no");
  EXPECT_EQ(http.contentType, "text/plain; charset=utf-8");
  EXPECT_EQ(http.body, "no\n");
}

}  // namespace
}  // namespace Agentd
