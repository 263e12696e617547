#include "kova/agentd/disks/AbsentDisk.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <ostream>
#include <string>

#include "nox/Host.h"
#include "orbis/Engine.h"

namespace Kovasvc {
namespace {

using Nox::Host::ScsiDisk;
using Tessa::MakeRef;
using Tessa::Ref;
using testing::ElementsAre;

const std::string uuid = "52e7b2b4-0a7c-3a1c-9d3e-2f4a5b6c7d8e";

struct Name {
  const char* what;
  std::string name;
  bool isAbsentDiskInput;
  std::string uuid;
};

std::ostream& operator<<(std::ostream& out, const Name& name) {
  return out << name.name;
}

class AbsentDiskName : public testing::TestWithParam<Name> {};

INSTANTIATE_TEST_SUITE_P(
    Names, AbsentDiskName,
    testing::Values(
        Name{"Whole", "kova:" + uuid, true, uuid},
        Name{"AnyThirtySixCharacters", "kova:" + std::string(36, 'x'), true, std::string(36, 'x')},
        Name{"PrefixInsideTheUuid", "kova:kova:" + uuid.substr(5), true, "kova:" + uuid.substr(5)},
        Name{"OneCharacterShort", "kova:" + uuid.substr(1), true, ""},
        Name{"OneCharacterLong", "kova:" + uuid + "0", true, ""}, Name{"PrefixAlone", "kova:", true, ""},
        Name{"PrefixWithoutColon", "kova", false, ""}, Name{"Empty", "", false, ""},
        Name{"UpperCase", "KOVA:" + uuid, false, ""}, Name{"MixedCase", "kovA:" + uuid, false, ""},
        Name{"OtherPrefixOfTheSameLength", "nova:" + uuid, false, ""},
        Name{"PrefixNotAtTheFront", " kova:" + uuid.substr(1), false, ""},
        Name{"CanonicalName", "naa.5000c50000000201", false, ""}, Name{"UuidAlone", uuid, false, ""}),
    [](const auto& test) { return std::string(test.param.what); });

TEST_P(AbsentDiskName, IsKnownByItsPrefix) {
  EXPECT_EQ(IsPDLDiskInput(GetParam().name), GetParam().isAbsentDiskInput);
}

TEST_P(AbsentDiskName, HoldsTheUuidOnlyAtItsExactLength) {
  std::string found = "from before";
  PDLDiskToKovaUuid(GetParam().name, found);
  EXPECT_EQ(found, GetParam().uuid);
}

TEST(AbsentDiskStandIn, HasExactlyTheFieldsThatAreKnown) {
  Ref<ScsiDisk> disk;
  GeneratePDLScsiDisk(uuid, true, disk);
  ASSERT_TRUE(disk);
  EXPECT_EQ(disk->GetDeviceName(), "unknown");
  EXPECT_EQ(disk->GetDeviceType(), "unknown");
  EXPECT_EQ(disk->GetUuid(), uuid);
  EXPECT_EQ(disk->GetLunType(), ScsiDisk::SCSILUNTYPE_UNKNOWN);
  EXPECT_THAT(disk->GetOperationalState()->Items(), ElementsAre(ScsiDisk::STATE_ERROR));
  EXPECT_EQ(disk->GetCapacity()->GetBlockSize(), 0);
  EXPECT_EQ(disk->GetCapacity()->GetBlock(), 0);
  EXPECT_EQ(disk->GetCanonicalName(), "kova:" + uuid);
  EXPECT_EQ(disk->GetDisplayName(), "Absent KOVA Disk (KOVA UUID:" + uuid + ")");
}

TEST(AbsentDiskStandIn, LeavesEveryOtherFieldAsANewDiskHasIt) {
  Ref<ScsiDisk> disk;
  GeneratePDLScsiDisk(uuid, true, disk);
  const auto expected = MakeRef<ScsiDisk>();
  expected->SetDeviceName(disk->GetDeviceName());
  expected->SetDeviceType(disk->GetDeviceType());
  expected->SetUuid(disk->GetUuid());
  expected->SetCanonicalName(disk->GetCanonicalName());
  expected->SetDisplayName(disk->GetDisplayName());
  expected->SetLunType(disk->GetLunType());
  expected->SetOperationalState(disk->GetOperationalState());
  expected->SetCapacity(disk->GetCapacity());
  expected->SetSsd(disk->GetSsd());
  EXPECT_TRUE(Orbis::Equal(disk.Get(), expected.Get())) << disk->ToString();
}

TEST(AbsentDiskStandIn, CarriesTheSsdFlagAsItIsGiven) {
  for (const bool ssd : {false, true}) {
    Ref<ScsiDisk> disk;
    GeneratePDLScsiDisk(uuid, ssd, disk);
    EXPECT_EQ(disk->GetSsd(), ssd);
  }
}

TEST(AbsentDiskStandIn, ReplacesWhatTheReferenceHeld) {
  const auto old = MakeRef<ScsiDisk>();
  Ref<ScsiDisk> disk = old;
  GeneratePDLScsiDisk(uuid, true, disk);
  EXPECT_NE(disk, old);
  EXPECT_EQ(old->GetRefCount(), 1);
  EXPECT_EQ(disk->GetRefCount(), 1);
}

TEST(AbsentDiskStandIn, IsNamedSoThatARequestFindsItsUuidAgain) {
  Ref<ScsiDisk> disk;
  GeneratePDLScsiDisk(uuid, true, disk);
  std::string found;
  PDLDiskToKovaUuid(disk->GetCanonicalName(), found);
  EXPECT_EQ(found, uuid);
}

}  // namespace
}  // namespace Kovasvc
