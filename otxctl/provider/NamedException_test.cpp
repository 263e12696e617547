#include "otxctl/provider/NamedException.h"

#include <gtest/gtest.h>

#include <stdexcept>

#include "kova/agentd/include/HostCtlException.h"
#include "otxctl/provider/OperationNames.h"

namespace OtxCtl::Provider {
namespace {

using namespace HostCtl::Lib;

struct Row {
  const char* name;
  bool isFamily;
  bool carriesDisk;
};

void PrintTo(const Row& row, std::ostream* out) {
  *out << row.name;
}

class NamedException : public testing::TestWithParam<Row> {};

TEST_P(NamedException, IsThrownAndRecognisedByItsName) {
  const Row& row = GetParam();
  EXPECT_TRUE(IsExceptionName(row.name));
  try {
    ThrowNamed(row.name, "text", "naa.1");
  } catch (const std::exception& exception) {
    EXPECT_EQ(ExceptionName(exception), row.name);
    EXPECT_STREQ(exception.what(), "text");
    EXPECT_EQ(dynamic_cast<const HostCtlException*>(&exception) != nullptr, row.isFamily);
    const auto* const storage = dynamic_cast<const KovaStorageException*>(&exception);
    EXPECT_EQ(storage != nullptr, row.carriesDisk);
    if (storage != nullptr) {
      EXPECT_EQ(storage->GetDiskName(), "naa.1");
    }
  }
}

INSTANTIATE_TEST_SUITE_P(EveryClass, NamedException,
                         testing::Values(Row{"HostCtlException", true, false},
                                         Row{"KovaStorageException", true, true},
                                         Row{"KovaExceptionHasPartition", true, true},
                                         Row{"KovaExceptionLastRemainingHDD", true, true},
                                         Row{"KovaExceptionRescanError", true, true},
                                         Row{"KovaExceptionRemoveMappingAutoModeEnabled", true, true},
                                         Row{"KovaExceptionRemoveDiskAutoModeEnabled", true, true},
                                         Row{"KovaExceptionIncompatibleDiskMapping", true, false},
                                         Row{"std::runtime_error", false, false}));

TEST(ExceptionNames, ADerivedClassIsCalledByItsNearestKnownBase) {
  class Special : public KovaExceptionHasPartition {
   public:
    using KovaExceptionHasPartition::KovaExceptionHasPartition;
  };
  EXPECT_EQ(ExceptionName(Special("m", "d")), "KovaExceptionHasPartition");
  EXPECT_EQ(ExceptionName(std::range_error("m")), "std::runtime_error");
  EXPECT_EQ(ExceptionName(std::logic_error("m")), "std::exception");
}

TEST(ExceptionNames, AnUnknownNameIsRefused) {
  for (const char* const name :
       {"", "runtime_error", "HostCtl::Lib::HostCtlException", "kovastorageexception"}) {
    EXPECT_FALSE(IsExceptionName(name)) << name;
    EXPECT_THROW(ThrowNamed(name, "", ""), std::invalid_argument) << name;
  }
}

TEST(OperationNames, AreTheSixteenOfTheProvider) {
  EXPECT_TRUE(IsOperationName("QueryDisks"));
  EXPECT_TRUE(IsOperationName("RefreshKovaInfo"));
  EXPECT_FALSE(IsOperationName("queryDisks"));
  EXPECT_FALSE(IsOperationName(""));
}

}  // namespace
}  // namespace OtxCtl::Provider
