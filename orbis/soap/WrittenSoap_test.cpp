// That written texts become what their objects would be written as; random objects are in the codec's tests.
#include "orbis/WrittenSoap.h"

#include <gtest/gtest.h>

#include <string>

#include "orbis/Soap.h"
#include "orbis/TypeDescriptor.h"
#include "orbis/Types.h"

namespace Orbis {
namespace {

using Tessa::MakeRef;

using Pairs = DataArray<KeyAnyValue>;

std::string Written(const Any& value) {
  std::string text;
  SerializeObjectToSoap(value, nullptr, text);
  return text;
}

Ref<KeyAnyValue> APair(const char* key, Ref<Any> value) {
  const Ref<KeyAnyValue> pair = MakeRef<KeyAnyValue>();
  pair->SetKey(key);
  pair->SetValue(std::move(value));
  return pair;
}

// A list whose elements hold what could be taken for its own tags.
Ref<Pairs> TrickyPairs() {
  const Ref<Pairs> pairs = MakeRef<Pairs>();
  pairs->Append(APair("a & b", MakeRef<TextList>(std::vector<std::string>{"<item>", "</item>", ""})));
  pairs->Append(APair("", APair("inner", MakeRef<TextList>(std::vector<std::string>{"x"}))));
  return pairs;
}

std::string MessageOf(const std::string& text, const TypeDescriptor& list) {
  std::string out = "kept ";
  const bool done = AppendMessageOfSoap("Response", "result", list, text, out);
  return done ? out : "refused: " + out;
}

const TypeDescriptor& PairsType() {
  return *KeyAnyValue::StaticType().array;
}

TEST(AppendMessageOfSoap, RenamesTheItemsOfTheListAndNothingInThem) {
  EXPECT_EQ(MessageOf(Written(*TrickyPairs()), PairsType()),
            "kept <?xml version=\"1.0\" encoding=\"UTF-8\"?>\n"
            "<soapenv:Envelope xmlns:soapenv=\"http://schemas.xmlsoap.org/soap/envelope/\" "
            "xmlns:xsd=\"http://www.w3.org/2001/XMLSchema\" "
            "xmlns:xsi=\"http://www.w3.org/2001/XMLSchema-instance\"><soapenv:Body>"
            "<Response xmlns=\"urn:nox\">"
            "<result><key>a &amp; b</key><value xsi:type=\"TextList\"><item>&lt;item&gt;</item>"
            "<item>&lt;/item&gt;</item><item></item></value></result>"
            "<result><key></key><value xsi:type=\"KeyAnyValue\"><key>inner</key>"
            "<value xsi:type=\"TextList\"><item>x</item></value></value></result>"
            "</Response></soapenv:Body></soapenv:Envelope>\n");
}

TEST(AppendMessageOfSoap, KeepsTheTypesOfItemsThatDerive) {
  const Ref<DataArray<MethodFault>> faults = MakeRef<DataArray<MethodFault>>();
  faults->Append(MakeRef<Fault::SystemError>("r"));
  EXPECT_NE(MessageOf(Written(*faults), *MethodFault::StaticType().array)
                .find("<result xsi:type=\"SystemError\"><reason>r</reason></result>"),
            std::string::npos);
}

TEST(AppendMessageOfSoap, TakesAListOfTheGivenTypeOnly) {
  EXPECT_EQ(MessageOf(Written(*TrickyPairs()), *MethodFault::StaticType().array), "refused: kept ");
  EXPECT_EQ(MessageOf(Written(*APair("k", MakeRef<Boxed<bool>>(true))), PairsType()), "refused: kept ");
}

TEST(AppendJsonOfSoap, WritesEveryKindOfValue) {
  const Ref<Pairs> pairs = TrickyPairs();
  pairs->Append(APair("\r\n\"\\\t", MakeRef<Boxed<std::int32_t>>(-3)));
  pairs->Append(APair("none", MakeRef<Pairs>()));
  std::string json = "kept ";
  EXPECT_TRUE(AppendJsonOfSoap(Written(*pairs), json));
  EXPECT_EQ(json, R"(kept [{"@type":"KeyAnyValue","key":"a & b","value":)"
                  R"({"@type":"TextList","@value":["<item>","</item>",""]}},)"
                  R"({"@type":"KeyAnyValue","key":"","value":{"@type":"KeyAnyValue","key":"inner","value":)"
                  R"({"@type":"TextList","@value":["x"]}}},)"
                  R"({"@type":"KeyAnyValue","key":"\r\n\"\\\t","value":{"@type":"xsd:int","@value":-3}},)"
                  R"({"@type":"KeyAnyValue","key":"none","value":{"@type":"KeyAnyValueList","@value":[]}}])");
}

TEST(AppendJsonOfSoap, TakesTextsThatGrowInJson) {
  const std::string quotes(100'000, '"');
  std::string json;
  EXPECT_TRUE(AppendJsonOfSoap(Written(*APair(quotes.c_str(), MakeRef<Boxed<bool>>(true))), json));
  std::string wanted;
  for (std::size_t count = 0; count < quotes.size(); ++count) {
    wanted += "\\\"";
  }
  EXPECT_EQ(json, R"({"@type":"KeyAnyValue","key":")" + wanted +
                      R"(","value":{"@type":"xsd:boolean","@value":true}})");
}

std::string Replaced(std::string text, const std::string& part, const std::string& by) {
  return text.replace(text.find(part), part.size(), by);
}

// Texts that the full reader has to judge: some are good, and none is as the writer writes it.
TEST(WrittenSoap, LeavesToTheReaderWhatTheWriterDoesNotWrite) {
  const std::string text = Written(*TrickyPairs());
  for (const std::string& other :
       {std::string(), text.substr(0, text.size() / 2), text + "\n", " " + text,
        Replaced(text, "<item>&lt;item", "<item xsi:type=\"xsd:string\">&lt;item"),
        Replaced(text, "&amp;", "&quot;"), Replaced(text, "<item><key>", "<item> <key>"),
        Replaced(text, "<item><key>", "<item><!-- --><key>"), Replaced(text, "<item></item>", "<item/>"),
        Replaced(text, "</object>", "<item></item></object>"), Replaced(text, "</key>", "</kez>"),
        Replaced(text, "TextList", "NoType"), Replaced(text, "KeyAnyValueList", "MethodFault")}) {
    std::string json = "kept ";
    EXPECT_FALSE(AppendJsonOfSoap(other, json)) << other;
    EXPECT_EQ(json, "kept ");
  }
  for (const std::string& other :
       {std::string(), text.substr(0, text.size() / 2), text + "\n", " " + text,
        Replaced(text, "<item><key>", "<other><key>"), Replaced(text, "</object>", "</item></object>"),
        Replaced(text, "<object ", "<object other=\"1\" ")}) {
    EXPECT_EQ(MessageOf(other, PairsType()), "refused: kept ") << other;
  }
}

TEST(CountItemsOfSoap, CountsItemsAndThoseThatHaveTheFieldThemselves) {
  const auto counted = CountItemsOfSoap(Written(*TrickyPairs()), "value");
  ASSERT_TRUE(counted);
  EXPECT_EQ(counted->list, &PairsType());
  EXPECT_EQ(counted->all, 2u);
  EXPECT_EQ(counted->withField, 2u);
  EXPECT_EQ(CountItemsOfSoap(Written(*TrickyPairs()), "item")->withField, 0u) << "those stand deeper";
}

TEST(CountItemsOfSoap, CountsNoneOfAnEmptyListAndTextsOfAListOfTexts) {
  EXPECT_EQ(CountItemsOfSoap(Written(Pairs()), "value")->all, 0u);
  EXPECT_EQ(CountItemsOfSoap(Written(TextList({"a", "", "<b>"})), "value")->all, 3u);
}

TEST(CountItemsOfSoap, CountsNothingOfWhatIsNoList) {
  const std::string text = Written(*TrickyPairs());
  for (const std::string& other :
       {std::string(), std::string("rubbish"), Written(*APair("a", MakeRef<TextList>())), text + "\n",
        text.substr(0, text.size() / 2), Replaced(text, "</object>", "</item></object>"),
        Replaced(text, "KeyAnyValueList", "NoType")}) {
    EXPECT_FALSE(CountItemsOfSoap(other, "value")) << other;
  }
}

}  // namespace
}  // namespace Orbis
