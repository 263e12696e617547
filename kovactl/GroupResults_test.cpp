#include "kovactl/GroupResults.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <sstream>

#include "kovactl/testing/Objects.h"
#include "nox/Faults.h"

namespace Kovactl {
namespace {

using Nox::Fault::DiskHasPartitions;
using Nox::Fault::DiskIsUSB;
using Testing::AGroupResult;
using Testing::AVerdict;
using testing::HasSubstr;
using Testing::MakeRef;
using Testing::Ref;

Ref<GroupResults> List(const std::vector<Ref<Testing::DiskMapResult>>& results) {
  return Ref<GroupResults>(static_cast<GroupResults*>(Testing::WithList(results).result.Get()));
}

std::string Printed(const Ref<GroupResults>& results) {
  std::ostringstream out;
  PrintGroupResults(*results, "added", out);
  return out.str();
}

std::string Explained(const Ref<GroupResults>& results, const Ref<Orbis::MethodFault>& overall) {
  std::ostringstream err;
  PrintGroupFaults(results.Get(), overall.Get(), err);
  return err.str();
}

TEST(GroupResults, ArePrintedWithEachDisksState) {
  const auto results = List(
      {AGroupResult("naa.1", {"naa.2", "naa.3"},
                    {AVerdict("naa.3", "inUse"), AVerdict("naa.1", "inUse"), AVerdict("naa.2", "inUse")}),
       AGroupResult("naa.4", {"naa.5"})});
  EXPECT_EQ(Printed(results),
            "OUTCOME  ROLE      DISK   STATE\n"
            "added    cache     naa.1  in use\n"
            "         capacity  naa.2  in use\n"
            "         capacity  naa.3  in use\n"
            "added    cache     naa.4\n"
            "         capacity  naa.5\n"
            "\n"
            "2 disk groups: 2 added\n");
}

TEST(GroupResults, ThatFailedSayWhichDiskIsTheCause) {
  const auto partitions = MakeRef<DiskHasPartitions>("naa.2");
  const auto results = List(
      {AGroupResult("naa.1", {"naa.2"},
                    {AVerdict("naa.1", "eligible"), AVerdict("naa.2", "ineligible", partitions)}, partitions),
       AGroupResult("naa.4", {"naa.5"})});
  EXPECT_EQ(Printed(results),
            "OUTCOME  ROLE      DISK   STATE       WHY\n"
            "failed   cache     naa.1  eligible\n"
            "         capacity  naa.2  ineligible  holds partitions or is in use by others\n"
            "added    cache     naa.4\n"
            "         capacity  naa.5\n"
            "\n"
            "2 disk groups: 1 added, 1 failed\n");
}

TEST(GroupResults, ThatAllFailedCountNothingElse) {
  EXPECT_THAT(Printed(List({AGroupResult("naa.1", {"naa.2"}, {}, MakeRef<DiskIsUSB>("naa.2"))})),
              HasSubstr("1 disk group: 1 failed\n"));
}

TEST(GroupResults, OfNoGroupPrintNothing) {
  EXPECT_EQ(Printed(List({})), "");
}

TEST(GroupFaults, ExplainOneFailedGroupOnce) {
  const auto fault = MakeRef<DiskIsUSB>("naa.2");
  const auto results = List({AGroupResult("naa.1", {"naa.2"}, {}, fault)});
  EXPECT_EQ(Explained(results, MakeRef<DiskIsUSB>("naa.2")),
            "kovactl: disk group of naa.1: attached by USB: naa.2\n"
            "  Disks on USB are never used: leave it out.\n");
}

TEST(GroupFaults, ExplainEachFailedGroupInsteadOfTheirSum) {
  const auto results = List({AGroupResult("naa.1", {"naa.2"}, {}, MakeRef<DiskIsUSB>("naa.2")),
                             AGroupResult("naa.3", {"naa.4"}, {}, MakeRef<DiskIsUSB>("naa.4"))});
  EXPECT_EQ(Explained(results, MakeRef<Nox::Fault::KovaFault>()),
            "kovactl: disk group of naa.1: attached by USB: naa.2\n"
            "  Disks on USB are never used: leave it out.\n"
            "kovactl: disk group of naa.3: attached by USB: naa.4\n");
}

TEST(GroupFaults, ExplainAnOverallFaultThatIsNotTheGroups) {
  const auto overall = MakeRef<Orbis::Fault::SystemError>("out of memory");
  EXPECT_THAT(Explained(nullptr, overall), HasSubstr("kovactl: something in the host failed: out of memory"));
  const auto results = List({AGroupResult("naa.1", {"naa.2"}, {}, MakeRef<DiskIsUSB>("naa.2"))});
  EXPECT_THAT(Explained(results, overall),
              testing::AllOf(HasSubstr("attached by USB"), HasSubstr("out of memory")));
}

TEST(GroupFaults, OfASuccessAreSilent) {
  EXPECT_EQ(Explained(List({AGroupResult("naa.1", {"naa.2"})}), nullptr), "");
  EXPECT_EQ(Explained(nullptr, nullptr), "");
}

}  // namespace
}  // namespace Kovactl
