// One text of each form for every type, as it was looked at and found right. The texts stand in golden/;
// a type without them fails the test. What was written instead of a golden text is left in the folder
// golden-written of the build, to be compared and, where the change is wanted, copied.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <filesystem>
#include <fstream>
#include <iterator>
#include <set>
#include <string>

#include "nox/Faults.h"
#include "nox/Host.h"
#include "nox/Kova.h"
#include "orbis/Engine.h"
#include "orbis/Json.h"
#include "orbis/Soap.h"
#include "orbis/TypeDescriptor.h"
#include "tests/codec/Samples.h"
#include "tests/codec/SchemaCheck.h"

namespace Codec {
namespace {

namespace fs = std::filesystem;
using ::testing::HasSubstr;
using ::testing::IsEmpty;
using ::testing::Not;

const fs::path goldenFolder = KOVA_CODEC_SOURCE "/golden";
const fs::path writtenFolder = KOVA_CODEC_BUILD "/golden-written";

std::string Soap(const Any& value) {
  std::string text;
  Orbis::SerializeObjectToSoap(value, nullptr, text);
  return text;
}

std::string Json(const Any& value) {
  std::string text;
  Orbis::WriteJson(value, text);
  return text;
}

// Without the line end at the end of the file.
std::string ReadFile(const fs::path& path) {
  std::ifstream file(path, std::ios::binary);
  std::string text{std::istreambuf_iterator<char>(file), {}};
  if (!text.empty() && text.back() == '\n') {
    text.pop_back();
  }
  return text;
}

void ExpectGolden(const std::string& fileName, const std::string& written) {
  const fs::path golden = goldenFolder / fileName;
  if (!fs::exists(golden) || ReadFile(golden) != written) {
    fs::create_directories(writtenFolder);
    std::ofstream(writtenFolder / fileName, std::ios::binary) << written << '\n';
  }
  ASSERT_TRUE(fs::exists(golden)) << "a type without its golden text";
  EXPECT_EQ(written, ReadFile(golden)) << fileName;
}

class GoldenText : public ::testing::TestWithParam<std::string> {};

TEST_P(GoldenText, IsWhatIsWrittenAsSoap) {
  ExpectGolden(GetParam() + ".xml", Soap(*MakeSample(*Orbis::FindType(GetParam()))));
}

TEST_P(GoldenText, IsWhatIsWrittenAsJson) {
  ExpectGolden(GetParam() + ".json", Json(*MakeSample(*Orbis::FindType(GetParam()))));
}

TEST_P(GoldenText, IsReadBack) {
  const Ref<Any> sample = MakeSample(*Orbis::FindType(GetParam()));
  Ref<Any> read;
  Orbis::DeserializeSoapToObject(ReadFile(goldenFolder / (GetParam() + ".xml")), read);
  EXPECT_TRUE(Orbis::Equal(read.Get(), sample.Get())) << read->ToString();
  read = Orbis::ReadJson(ReadFile(goldenFolder / (GetParam() + ".json")), Orbis::Limits::Untrusted(),
                         &sample->GetType());
  EXPECT_TRUE(Orbis::Equal(read.Get(), sample.Get())) << read->ToString();
}

INSTANTIATE_TEST_SUITE_P(Types, GoldenText, ::testing::ValuesIn(TypeNames()),
                         [](const auto& row) { return row.param; });

TEST(GoldenTexts, StandForTypesThatThereAre) {
  std::set<std::string> names;
  for (const fs::directory_entry& file : fs::directory_iterator(goldenFolder)) {
    names.insert(file.path().stem());
  }
  for (const TypeDescriptor* type : Orbis::AllTypes()) {
    names.erase(type->name);
  }
  EXPECT_THAT(names, IsEmpty());
}

TEST(GoldenTexts, AreValidInTheSchema) {
  std::vector<std::string> texts;
  for (const TypeDescriptor* type : Orbis::AllTypes()) {
    texts.push_back(ReadFile(goldenFolder / (type->name + ".xml")));
    texts.push_back(Soap(*type->array->createArray()));
  }
  EXPECT_THAT(ValidateAgainstSchema(texts), IsEmpty());
}

TEST(SchemaCheck, FindsWhatIsNotValid) {
  const std::string good = Soap(*MakeSample(Nox::Host::ScsiDisk::StaticType()));
  std::string bad = good;
  bad.replace(bad.find("<capacity>"), 10, "<extra/><capacity>");
  EXPECT_THAT(ValidateAgainstSchema({good}), IsEmpty());
  EXPECT_THAT(ValidateAgainstSchema({good, bad}), HasSubstr("1.xml"));
  EXPECT_THAT(ValidateAgainstSchema({good, "<object"}), Not(IsEmpty()));
}

}  // namespace
}  // namespace Codec
