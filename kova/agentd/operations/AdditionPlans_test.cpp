// What both additions plan alike: all-flash and hybrid groups, each kind by its own count.

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <string>

#include "tests/support/OperationFixture.h"
#include "tests/support/SpyManager.h"

namespace Kovasvc {
namespace {

using TestSupport::ARecord;
using TestSupport::Hdds;
using TestSupport::operator+;
using TestSupport::Ssds;

// Seven cache disks, three flash disks that are tagged for capacity, four hard disks and no groups.
class AdditionPlans : public TestSupport::OperationFixture {
 protected:
  AdditionPlans() : _spy(UseManager<TestSupport::SpyManager>()) {
    _spy->initializeDisksInt = [](auto&, auto&) {};
    _disks = Ssds("s", 7) + Ssds("t", 3) + Hdds("h", 4);
    std::vector<HostCtl::Kova::DiskResult> records;
    for (const auto& disk : _disks) {
      ARecord record(disk->GetCanonicalName());
      records.push_back(disk->GetCanonicalName().front() == 't' ? record.Ssd().CapacityFlash()
                                                                : record.Ssd(disk->GetSsd()));
    }
    SetHost(_disks, records);
  }

  const Tessa::Ref<TestSupport::SpyManager> _spy;
  TestSupport::Disks _disks;
  const std::string _plan =
      "InitializeDisksInt([s4: h1, s5: h2, s6: h3, s7: h4, s1: t1, s2: t2, s3: t3], tag)";
};

TEST_F(AdditionPlans, OfNamedDisksCountTheGroupsOfEachKindApart) {
  _manager->AddDisks(TestSupport::SoapTexts(_disks), "tag", _faultText, _resultText);
  EXPECT_THAT(_spy->calls, testing::ElementsAre(_plan)) << "more groups in all than either kind may have";
}

TEST_F(AdditionPlans, OfAllDisksCountTheGroupsOfEachKindApart) {
  _manager->AddAllEligibleDisks("tag", _faultText, _resultText);
  EXPECT_THAT(_spy->calls, testing::ElementsAre(_plan)) << "more groups in all than either kind may have";
}

}  // namespace
}  // namespace Kovasvc
