#include "otxctl/sim/JsonText.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <nlohmann/json.hpp>
#include <string>

#include "otxctl/sim/HostDescriptionError.h"
#include "tessa/text/Escape.h"

namespace OtxCtl::Sim {
namespace {

using testing::HasSubstr;
using testing::StartsWith;

std::string ErrorOf(std::string_view text, const JsonLimits& limits = {}) {
  try {
    ParseJsonText(text, limits);
  } catch (const HostDescriptionError& error) {
    EXPECT_TRUE(Tessa::IsPrintable(error.what()));
    return error.what();
  }
  return "accepted";
}

std::string Nested(std::size_t depth) {
  return std::string(depth, '[') + std::string(depth, ']');
}

TEST(JsonText, ReadsEveryKindOfValue) {
  const char* const text = R"({"a": [1, -2, 2.5, "x", true, null, {}], "b": {"a": []}})";
  EXPECT_EQ(ParseJsonText(text, {}), nlohmann::json::parse(text));
  EXPECT_EQ(ParseJsonText("3", {}), 3);
}

TEST(JsonText, SyntaxErrorsNameLineAndColumn) {
  EXPECT_THAT(ErrorOf(""), StartsWith("line 1, column 1: "));
  EXPECT_THAT(ErrorOf("{\n  \"a\": 1,\n  }"), StartsWith("line 3, column 3: "));
  EXPECT_THAT(ErrorOf("{} {}"), StartsWith("line 1, column 4: "));
  EXPECT_THAT(ErrorOf("[\"\xC0\x80\"]"), StartsWith("line 1, column 3: "));
  EXPECT_THAT(ErrorOf("[\"a\nb\"]"), StartsWith("line "));
  EXPECT_THAT(ErrorOf("[1e999]"), StartsWith("line 1, column "));
  EXPECT_THAT(ErrorOf("/* */ {}"), StartsWith("line 1, column "));
}

TEST(JsonText, ADuplicateKeyIsNamedWithItsPath) {
  EXPECT_THAT(ErrorOf(R"({"a": 1, "a": 1})"), StartsWith("a: stands twice"));
  EXPECT_THAT(ErrorOf(R"({"disks": [{}, {"x": {"b": 1, "b": 2}}]})"),
              StartsWith("disks[1].x.b: stands twice"));
  EXPECT_EQ(ErrorOf(R"([{"a": 1}, {"a": 1}])"), "accepted");
}

TEST(JsonText, DepthIsBounded) {
  JsonLimits limits;
  limits.depth = 5;
  EXPECT_EQ(ErrorOf(Nested(5), limits), "accepted");
  EXPECT_THAT(ErrorOf(Nested(6), limits), HasSubstr("nested deeper than 5"));
  EXPECT_THAT(ErrorOf(std::string(200'000, '['), limits), StartsWith("[0][0][0][0][0]: nested deeper"));
}

TEST(JsonText, SizeAndNumberOfValuesAreBounded) {
  JsonLimits limits;
  limits.bytes = 8;
  limits.values = 4;
  EXPECT_EQ(ErrorOf("[1,2,3] ", limits), "accepted");
  EXPECT_THAT(ErrorOf("[1,2,3]  ", limits), HasSubstr("larger than 8 bytes"));
  EXPECT_THAT(ErrorOf("[[],[],", limits), StartsWith("line 1"));
  EXPECT_THAT(ErrorOf("[1,2,3,4", limits), StartsWith("[3]: more than 4 values"));
}

}  // namespace
}  // namespace OtxCtl::Sim
