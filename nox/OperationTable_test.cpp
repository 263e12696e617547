#include "nox/OperationTable.h"

#include <gtest/gtest.h>

#include <set>

#include "nox/Kova.h"
#include "nox/Operations.h"
#include "orbis/TypeDescriptor.h"
#include "tessa/Throwable.h"

namespace Nox {
namespace {

bool Has(const Orbis::TypeDescriptor& type, std::string_view field) {
  for (const Orbis::FieldDescriptor* one : type.fields) {
    if (one->name == field) {
      return true;
    }
  }
  return false;
}

TEST(OperationTable, FindsEveryOperationByItsName) {
  std::set<std::string_view> names;
  for (const OperationDescriptor& operation : Operations()) {
    EXPECT_EQ(FindOperation(operation.name), &operation);
    EXPECT_TRUE(names.insert(operation.name).second) << operation.name;
  }
  EXPECT_EQ(FindOperation("AddDisks")->request.name, "AddDisks");
  EXPECT_EQ(FindOperation("Adddisks"), nullptr);
  EXPECT_EQ(FindOperation(""), nullptr);
}

TEST(OperationTable, TellsTheTypeOfTheResult) {
  using namespace Kova::Host;
  EXPECT_EQ(FindOperation("AddDisks")->result, DiskMapResult::StaticType().array);
  EXPECT_EQ(FindOperation("GetConfigInfo")->result, &ConfigInfo::StaticType());
  EXPECT_EQ(FindOperation("RemoveDisk")->result, nullptr);
}

TEST(OperationTable, FindsTheOperationOfARequest) {
  EXPECT_EQ(OperationOf(Operation::RemoveDisk()).name, "RemoveDisk");
  EXPECT_THROW(OperationOf(Kova::Host::DiskMapping()), Tessa::TypeMismatchException);
}

TEST(OperationTable, EveryRequestIsAQueryOrAChangeAsItSays) {
  for (const OperationDescriptor& operation : Operations()) {
    const auto request = operation.request.create();
    EXPECT_EQ(dynamic_cast<const Operation::Change*>(request.Get()) != nullptr, operation.changes);
    EXPECT_EQ(dynamic_cast<const Operation::Query*>(request.Get()) != nullptr, !operation.changes);
  }
}

TEST(OperationTable, EveryChangeTakesALabelAndIsToldAsATask) {
  for (const OperationDescriptor& operation : Operations()) {
    EXPECT_EQ(Has(operation.request, "label"), operation.changes) << operation.name;
    EXPECT_EQ(Has(operation.request, "wait"), operation.changes) << operation.name;
    EXPECT_EQ(Has(operation.response, "task"), operation.changes) << operation.name;
    EXPECT_EQ(Has(operation.response, "result"), operation.result != nullptr) << operation.name;
    EXPECT_TRUE(Has(operation.response, "fault")) << operation.name;
  }
}

TEST(OperationTable, LabelAndWaitAreThoseOfTheRequest) {
  const auto request = Tessa::MakeRef<Operation::AddDisks>();
  Operation::Change& change = *request;
  EXPECT_FALSE(change.HasLabel());
  EXPECT_FALSE(change.HasWait());
  change.SetLabel("rack 3");
  change.SetWait(false);
  EXPECT_EQ(request->GetLabel(), "rack 3");
  EXPECT_FALSE(request->GetWait());
}

}  // namespace
}  // namespace Nox
