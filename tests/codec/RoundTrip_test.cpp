// Random objects of every type through both texts and back.
//
// Each object is made from a seed of its own; a failure prints the seed of the shortest text that went
// wrong. KOVA_SEED=<n> in the environment starts elsewhere.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cstdlib>
#include <string>

#include "nox/Faults.h"
#include "nox/Host.h"
#include "nox/Kova.h"
#include "orbis/Engine.h"
#include "orbis/Json.h"
#include "orbis/ParseException.h"
#include "orbis/Soap.h"
#include "orbis/Types.h"
#include "orbis/WrittenSoap.h"
#include "tests/codec/CleanText.h"
#include "tests/codec/Samples.h"
#include "tests/codec/SchemaCheck.h"

namespace Codec {
namespace {

using Orbis::Limits;
using Orbis::MakeRef;
using ::testing::IsEmpty;

constexpr std::uint64_t objectCount = 4'000;

std::uint64_t FirstSeed() {
  const char* const given = std::getenv("KOVA_SEED");
  return given == nullptr ? 1 : std::strtoull(given, nullptr, 10);
}

// The type for a seed: each in turn, every fifth as a list.
const TypeDescriptor& TypeFor(std::uint64_t seed) {
  const std::vector<const TypeDescriptor*> types = ConcreteTypes();
  const TypeDescriptor& type = *types[seed % types.size()];
  return seed % 5 == 0 ? *type.array : type;
}

struct Codec {
  const char* name;
  Form form;
  std::string (*write)(const Any&);
  Ref<Any> (*read)(const std::string&, const TypeDescriptor&);

  friend std::ostream& operator<<(std::ostream& out, const Codec& codec) { return out << codec.name; }
};

std::string WriteSoap(const Any& value) {
  std::string text;
  Orbis::SerializeObjectToSoap(value, nullptr, text);
  return text;
}

Ref<Any> ReadSoap(const std::string& text, const TypeDescriptor& type) {
  Ref<Any> value;
  Orbis::DeserializeSoapToObject(text, value, nullptr, &type);
  return value;
}

std::string WriteJson(const Any& value) {
  std::string text;
  Orbis::WriteJson(value, text);
  return text;
}

Ref<Any> ReadJson(const std::string& text, const TypeDescriptor& type) {
  return Orbis::ReadJson(text, Limits::OwnOutput(), &type);
}

constexpr Codec codecs[] = {{"Soap", Form::Xml, &WriteSoap, &ReadSoap},
                            {"Json", Form::Json, &WriteJson, &ReadJson}};

// Why the text does not give back the value; empty when it does.
std::string WhatIsLost(const Codec& codec, const std::string& text, const Any& wanted) {
  try {
    const Ref<Any> read = codec.read(text, wanted.GetType());
    if (!Orbis::Equal(read.Get(), &wanted)) {
      return "read as another value";
    }
    return codec.write(*read) == text ? "" : "read and written again, it is another text";
  } catch (const Orbis::ParseException& exception) {
    return exception.what();
  }
}

class RoundTrip : public ::testing::TestWithParam<Codec> {
 protected:
  void ExpectEveryObjectBack(Texts texts) {
    std::uint64_t failures = 0;
    std::string shortest;
    std::string why;
    for (std::uint64_t seed = FirstSeed(); seed < FirstSeed() + objectCount; ++seed) {
      const Ref<Any> original = RandomObjects(seed, texts).Make(TypeFor(seed));
      const std::string text = GetParam().write(*original);
      // Clean texts must come back to the letter; dirty ones as what the form can hold of them.
      const Ref<Any> wanted = texts == Texts::Clean ? original : CleanCopy(*original, GetParam().form);
      const std::string lost = WhatIsLost(GetParam(), text, *wanted);
      if (!lost.empty() && (failures++ == 0 || text.size() < shortest.size())) {
        shortest = text;
        why = "seed " + std::to_string(seed) + ", " + original->GetType().name + ": " + lost;
      }
    }
    EXPECT_EQ(failures, 0u) << why << "\n" << shortest;
  }
};

TEST_P(RoundTrip, GivesBackEveryObject) {
  ExpectEveryObjectBack(Texts::Clean);
}

TEST_P(RoundTrip, GivesBackWhatCanBeWrittenOfAnyText) {
  ExpectEveryObjectBack(Texts::Dirty);
}

TEST_P(RoundTrip, GivesBackAVeryLongText) {
  const Ref<Orbis::Fault::SystemError> fault =
      MakeRef<Orbis::Fault::SystemError>(std::string(20'000'000, 'x'));
  EXPECT_EQ(WhatIsLost(GetParam(), GetParam().write(*fault), *fault), "");
}

Ref<Any> AChainOfFaults(std::size_t length) {
  Ref<Orbis::MethodFault> fault;
  for (std::size_t i = 0; i < length; ++i) {
    const Ref<Nox::Fault::DiskIsUSB> outer = MakeRef<Nox::Fault::DiskIsUSB>("naa." + std::to_string(i));
    outer->SetCause(fault);
    fault = outer;
  }
  return fault;
}

TEST_P(RoundTrip, GivesBackAChainOfFaultsAsDeepAsTheBoundAndNotDeeper) {
  // The innermost fault's device is one level deeper in XML.
  const std::size_t deepest = Limits::OwnOutput().depth - (GetParam().form == Form::Xml ? 1 : 0);
  const Ref<Any> chain = AChainOfFaults(deepest);
  EXPECT_EQ(WhatIsLost(GetParam(), GetParam().write(*chain), *chain), "");
  const Ref<Any> tooDeep = AChainOfFaults(deepest + 1);
  EXPECT_THAT(WhatIsLost(GetParam(), GetParam().write(*tooDeep), *tooDeep),
              ::testing::HasSubstr("deeper than"));
}

TEST_P(RoundTrip, KeepsUnsetAndEmptyApart) {
  const Ref<Nox::Host::ScsiDisk> disk = MakeRef<Nox::Host::ScsiDisk>();
  disk->SetVendor("");
  disk->SetStandardInquiry(MakeRef<Orbis::Binary>());
  const Ref<Any> read = GetParam().read(GetParam().write(*disk), Nox::Host::ScsiDisk::StaticType());
  const auto& back = static_cast<const Nox::Host::ScsiDisk&>(*read);
  EXPECT_TRUE(back.HasVendor());
  EXPECT_FALSE(back.HasModel());
  ASSERT_TRUE(back.GetStandardInquiry());
  EXPECT_THAT(back.GetStandardInquiry()->GetValue(), IsEmpty());
}

TEST_P(RoundTrip, MakesNoListOfAnAbsentOne) {
  const Ref<Nox::Kova::Host::DiskMapping> mapping = MakeRef<Nox::Kova::Host::DiskMapping>();
  const std::string without = GetParam().write(*mapping);
  mapping->SetNonSsd(MakeRef<Orbis::DataArray<Nox::Host::ScsiDisk>>());
  EXPECT_EQ(GetParam().write(*mapping), without);
}

TEST_P(RoundTrip, KeepsTheTypeOfAnEmptyListThatStandsForAnyValue) {
  const Ref<Orbis::KeyAnyValue> pair = MakeRef<Orbis::KeyAnyValue>();
  pair->SetValue(MakeRef<Orbis::DataArray<Nox::Host::ScsiDisk>>());
  EXPECT_EQ(WhatIsLost(GetParam(), GetParam().write(*pair), *pair), "");
}

INSTANTIATE_TEST_SUITE_P(Codecs, RoundTrip, ::testing::ValuesIn(codecs),
                         [](const auto& row) { return row.param.name; });

TEST(WrittenSoap, TurnsIntoTheJsonOfItsObject) {
  for (std::uint64_t seed = FirstSeed(); seed < FirstSeed() + objectCount; ++seed) {
    const Ref<Any> original = RandomObjects(seed, Texts::Dirty).Make(TypeFor(seed));
    const std::string text = WriteSoap(*original);
    std::string json;
    ASSERT_TRUE(Orbis::AppendJsonOfSoap(text, json)) << "seed " << seed << "\n" << text;
    ASSERT_EQ(json, WriteJson(*ReadSoap(text, original->GetType()))) << "seed " << seed << "\n" << text;
  }
}

TEST(RandomTexts, AreValidInTheSchema) {
  constexpr std::uint64_t textCount = 600;
  std::vector<std::string> texts;
  for (std::uint64_t seed = FirstSeed(); seed < FirstSeed() + textCount; ++seed) {
    texts.push_back(WriteSoap(*RandomObjects(seed, Texts::Dirty).Make(TypeFor(seed))));
  }
  EXPECT_THAT(ValidateAgainstSchema(texts), IsEmpty()) << "text n is of seed " << FirstSeed() << " + n";
}

struct CleanCase {
  std::string text;
  std::string clean;
};

TEST(CleanText, ReplacesWhatIsNoCharacter) {
  const std::string gap = "\xef\xbf\xbd";
  for (const CleanCase& row : {CleanCase{"plain", "plain"},
                               {"\xff", gap},
                               {"\xc3", gap},
                               {"\xc3(", gap + "("},
                               {"\xe2\x82", gap},
                               {"\xe2\x82x", gap + "x"},
                               {"\xc0\x80", gap + gap},
                               {"\xed\xa0\x80", gap + gap + gap},
                               {"\xf0\x9d\x84", gap},
                               {"\xf4\x90\x80\x80", gap + gap + gap + gap},
                               {"\xf4\x8f\xbf\xbf", "\xf4\x8f\xbf\xbf"},
                               {"\xed\x9f\xbf", "\xed\x9f\xbf"},
                               {"\xee\x80\x80", "\xee\x80\x80"}}) {
    EXPECT_EQ(CleanText(row.text, Form::Xml), row.clean);
    EXPECT_EQ(CleanText(row.text, Form::Json), row.clean);
  }
  EXPECT_EQ(CleanText("\x01\t\xef\xbf\xbf", Form::Xml), gap + "\t" + gap);
  EXPECT_EQ(CleanText("\x01\t\xef\xbf\xbf", Form::Json), "\x01\t\xef\xbf\xbf");
}

}  // namespace
}  // namespace Codec
