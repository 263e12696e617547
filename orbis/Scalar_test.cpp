#include "orbis/Scalar.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <limits>
#include <random>

#include "tests/support/Seed.h"

namespace Orbis {
namespace {

std::string Text(FieldKind kind, const void* value) {
  std::string text;
  AppendScalar(kind, value, text);
  return text;
}
std::string TextOf(std::int32_t value) {
  return Text(FieldKind::Int, &value);
}
std::string TextOf(std::int64_t value) {
  return Text(FieldKind::Long, &value);
}
std::string TextOf(DateTime value) {
  return Text(FieldKind::DateTime, &value);
}

constexpr std::int64_t second = 1'000'000;
constexpr std::int64_t hour = 3600 * second;
constexpr DateTime firstMoment{-62'135'596'800 * second};
constexpr DateTime lastMoment{253'402'300'799 * second + 999'999};

TEST(Boolean, HasTwoFormsOfEachValueAndIsWrittenInWords) {
  for (const auto& [text, expected] :
       {std::pair{"true", true}, {"1", true}, {"false", false}, {"0", false}}) {
    bool value = !expected;
    EXPECT_TRUE(ParseScalar(FieldKind::Boolean, text, &value)) << text;
    EXPECT_EQ(value, expected) << text;
    EXPECT_EQ(Text(FieldKind::Boolean, &value), expected ? "true" : "false");
  }
}

TEST(Boolean, HasNoOtherForm) {
  for (const char* text : {"", "True", "TRUE", "yes", "2", " true", "true ", "00", "t"}) {
    bool value = true;
    EXPECT_FALSE(ParseScalar(FieldKind::Boolean, text, &value)) << text;
    EXPECT_TRUE(value) << text;
  }
}

struct IntegerCase {
  const char* text;
  std::int64_t value;
};

TEST(Integer, OfEitherWidthIsReadUpToItsBounds) {
  for (const IntegerCase& row : {IntegerCase{"0", 0},
                                 {"-0", 0},
                                 {"+7", 7},
                                 {"007", 7},
                                 {"-7", -7},
                                 {"2147483647", 2147483647},
                                 {"-2147483648", -2147483648}}) {
    std::int32_t narrow = 99;
    std::int64_t wide = 99;
    EXPECT_TRUE(ParseScalar(FieldKind::Int, row.text, &narrow)) << row.text;
    EXPECT_TRUE(ParseScalar(FieldKind::Long, row.text, &wide)) << row.text;
    EXPECT_EQ(narrow, row.value) << row.text;
    EXPECT_EQ(wide, row.value) << row.text;
  }
  std::int64_t wide = 0;
  EXPECT_TRUE(ParseScalar(FieldKind::Long, "9223372036854775807", &wide));
  EXPECT_EQ(wide, std::numeric_limits<std::int64_t>::max());
  EXPECT_TRUE(ParseScalar(FieldKind::Long, "-9223372036854775808", &wide));
  EXPECT_EQ(wide, std::numeric_limits<std::int64_t>::min());
}

TEST(Integer, BeyondItsBoundsIsRefused) {
  std::int32_t narrow = 5;
  std::int64_t wide = 5;
  for (const char* text : {"2147483648", "-2147483649", "9223372036854775807"}) {
    EXPECT_FALSE(ParseScalar(FieldKind::Int, text, &narrow)) << text;
  }
  for (const char* text : {"9223372036854775808", "-9223372036854775809", "99999999999999999999999"}) {
    EXPECT_FALSE(ParseScalar(FieldKind::Long, text, &wide)) << text;
  }
  EXPECT_EQ(narrow, 5);
  EXPECT_EQ(wide, 5);
}

TEST(Integer, IsNothingButDigitsAndASign) {
  for (const char* text :
       {"", "+", "-", "+-7", "--7", "++7", "- 7", " 7", "7 ", "7\n", "7.0", "7e1", "0x7", "seven"}) {
    std::int32_t narrow = 5;
    std::int64_t wide = 5;
    EXPECT_FALSE(ParseScalar(FieldKind::Int, text, &narrow)) << text;
    EXPECT_FALSE(ParseScalar(FieldKind::Long, text, &wide)) << text;
    EXPECT_EQ(narrow, 5) << text;
    EXPECT_EQ(wide, 5) << text;
  }
}

TEST(Integer, IsWrittenShortest) {
  EXPECT_EQ(TextOf(std::numeric_limits<std::int32_t>::min()), "-2147483648");
  EXPECT_EQ(TextOf(std::numeric_limits<std::int64_t>::min()), "-9223372036854775808");
  EXPECT_EQ(TextOf(std::int32_t{0}), "0");
}

struct DateCase {
  const char* text;
  std::int64_t microseconds;
  const char* written;  // in UTC, shortest

  friend std::ostream& operator<<(std::ostream& out, const DateCase& row) { return out << row.text; }
};

class Date : public ::testing::TestWithParam<DateCase> {};

TEST_P(Date, IsReadInAnyZoneAndWrittenInUtc) {
  DateTime value{42};
  ASSERT_TRUE(ParseScalar(FieldKind::DateTime, GetParam().text, &value));
  EXPECT_EQ(value.microseconds, GetParam().microseconds);
  EXPECT_EQ(TextOf(value), GetParam().written);
}

INSTANTIATE_TEST_SUITE_P(
    Texts, Date,
    ::testing::Values(DateCase{"1970-01-01T00:00:00Z", 0, "1970-01-01T00:00:00Z"},
                      DateCase{"1970-01-01T01:00:00+01:00", 0, "1970-01-01T00:00:00Z"},
                      DateCase{"1969-12-31T23:30:00-00:30", 0, "1970-01-01T00:00:00Z"},
                      DateCase{"1970-01-01T14:00:00+14:00", 0, "1970-01-01T00:00:00Z"},
                      DateCase{"1970-01-01T00:00:00-14:00", 14 * hour, "1970-01-01T14:00:00Z"},
                      DateCase{"1969-12-31T23:59:59.999999Z", -1, "1969-12-31T23:59:59.999999Z"},
                      DateCase{"1970-01-01T00:00:00.5Z", 500'000, "1970-01-01T00:00:00.5Z"},
                      DateCase{"1970-01-01T00:00:00.500000Z", 500'000, "1970-01-01T00:00:00.5Z"},
                      DateCase{"1970-01-01T00:00:00.000000Z", 0, "1970-01-01T00:00:00Z"},
                      DateCase{"1970-01-01T00:00:00.000001Z", 1, "1970-01-01T00:00:00.000001Z"},
                      DateCase{"2020-02-29T12:34:56Z", 1'582'979'696 * second, "2020-02-29T12:34:56Z"},
                      DateCase{"2000-02-29T00:00:00Z", 951'782'400 * second, "2000-02-29T00:00:00Z"},
                      DateCase{"0001-01-01T00:00:00Z", firstMoment.microseconds, "0001-01-01T00:00:00Z"},
                      DateCase{"9999-12-31T23:59:59.999999Z", lastMoment.microseconds,
                               "9999-12-31T23:59:59.999999Z"}));

class BrokenDate : public ::testing::TestWithParam<std::string> {};

TEST_P(BrokenDate, IsRefusedAndTheValueStays) {
  DateTime value{42};
  EXPECT_FALSE(ParseScalar(FieldKind::DateTime, GetParam(), &value));
  EXPECT_EQ(value.microseconds, 42);
}

INSTANTIATE_TEST_SUITE_P(
    Texts, BrokenDate,
    ::testing::Values("", "2020-01-31", "2020-01-31T12:00:00", "2020-01-31T12:00Z", "2020-01-31 12:00:00Z",
                      "2020-02-30T12:00:00Z", "2019-02-29T12:00:00Z", "1900-02-29T12:00:00Z",
                      "2020-13-01T12:00:00Z", "2020-00-01T12:00:00Z", "2020-01-00T12:00:00Z",
                      "2020-01-31T24:00:00Z", "2020-01-31T12:60:00Z", "2020-01-31T12:00:60Z",
                      "2020-01-31T12:00:00.Z", "2020-01-31T12:00:00.1234567Z", "2020-01-31T12:00:00z",
                      "2020-01-31t12:00:00Z", "2020-01-31T12:00:00+1:00", "2020-01-31T12:00:00+14:01",
                      "2020-01-31T12:00:00+15:00", "2020-01-31T12:00:00+01:60", "2020-01-31T12:00:00+0100",
                      "2020-01-31T12:00:00ZZ", " 2020-01-31T12:00:00Z", "2020-01-31T12:00:00Z ",
                      "0000-01-01T00:00:00Z", "-001-01-01T00:00:00Z", "20200-01-01T00:00:00Z",
                      "20-01-01T00:00:00Z", "2020-1-31T12:00:00Z",
                      // In UTC before the year 1 or behind the year 9999.
                      "0001-01-01T00:00:00+00:01", "9999-12-31T23:59:59-00:01"));

TEST(Date, IsReadBackFromWhatWasWrittenOverTheWholeRange) {
  const TestSupport::Seed seed;
  std::mt19937_64 random(seed.Value());
  std::uniform_int_distribution<std::int64_t> moments(firstMoment.microseconds, lastMoment.microseconds);
  for (int i = 0; i < 20'000; ++i) {
    const DateTime moment{moments(random)};
    DateTime read{42};
    ASSERT_TRUE(ParseScalar(FieldKind::DateTime, TextOf(moment), &read)) << TextOf(moment);
    ASSERT_EQ(read, moment) << TextOf(moment);
  }
}

TEST(Date, IsReadFromNoTextThatIsCutOff) {
  const std::string whole = "2020-01-31T12:00:00.123456+01:30";
  for (std::size_t size = 0; size < whole.size(); ++size) {
    DateTime value;
    EXPECT_FALSE(ParseScalar(FieldKind::DateTime, std::string_view(whole).substr(0, size), &value)) << size;
  }
}

TEST(Text, IsAnythingAndStaysAsItIs) {
  for (const std::string& text :
       {std::string(), std::string("  "), std::string("a\0b", 3), std::string("<&\xff")}) {
    std::string value = "before";
    EXPECT_TRUE(ParseScalar(FieldKind::String, text, &value));
    EXPECT_EQ(value, text);
    EXPECT_EQ(Text(FieldKind::String, &value), text);
  }
}

TEST(EqualScalar, ComparesValues) {
  const std::string left = "a";
  const std::string same = "a";
  const std::string other = "b";
  EXPECT_TRUE(EqualScalar(FieldKind::String, &left, &same));
  EXPECT_FALSE(EqualScalar(FieldKind::String, &left, &other));
  const std::int64_t big = 1LL << 40;
  const std::int64_t zeroInItsLowHalf = 0;
  EXPECT_FALSE(EqualScalar(FieldKind::Long, &big, &zeroInItsLowHalf));
  const Bytes bytes = {1, 2};
  const Bytes otherBytes = {1, 3};
  EXPECT_FALSE(EqualScalar(FieldKind::Base64, &bytes, &otherBytes));
}

TEST(Boxed, KeepsItsValueAndIsCopiedApart) {
  const Ref<Boxed<std::int32_t>> number = MakeRef<Boxed<std::int32_t>>(7);
  EXPECT_EQ(*static_cast<const std::int32_t*>(BoxedValue(static_cast<const Any&>(*number))), 7);
  const Ref<Any> copy = CloneBoxed(*number);
  number->Value() = 8;
  EXPECT_EQ(static_cast<const Boxed<std::int32_t>&>(*copy).GetValue(), 7);
  EXPECT_EQ(copy->GetRefCount(), 1);
}

template <class T>
void ExpectBoxKnowsItsType(const char* name, FieldKind kind) {
  const Ref<Any> boxed = Boxed<T>::StaticType().create();
  EXPECT_EQ(boxed->GetType().name, name);
  EXPECT_EQ(boxed->GetType().simple, kind) << name;
  EXPECT_EQ(&boxed->GetType(), FindSimpleType(name));
  EXPECT_EQ(BoxedValue(*boxed), &static_cast<Boxed<T>&>(*boxed).Value()) << name;
}

TEST(Boxed, OfEveryKindKnowsItsSchemaType) {
  ExpectBoxKnowsItsType<bool>("boolean", FieldKind::Boolean);
  ExpectBoxKnowsItsType<std::int32_t>("int", FieldKind::Int);
  ExpectBoxKnowsItsType<std::int64_t>("long", FieldKind::Long);
  ExpectBoxKnowsItsType<DateTime>("dateTime", FieldKind::DateTime);
  ExpectBoxKnowsItsType<std::string>("string", FieldKind::String);
  ExpectBoxKnowsItsType<Bytes>("base64Binary", FieldKind::Base64);
}

}  // namespace
}  // namespace Orbis
