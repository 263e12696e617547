#include "tests/codec/Refusals.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "orbis/ParseException.h"

namespace Codec {

void ExpectRefused(const Refusal& refusal, const Read& read) {
  try {
    const Orbis::Ref<Orbis::Any> value = read(refusal.text);
    ADD_FAILURE() << refusal.name << " was read as " << (value ? value->ToString().substr(0, 500) : "null");
  } catch (const Orbis::ParseException& exception) {
    EXPECT_EQ(exception.GetPath(), refusal.path) << refusal.name << ": " << exception.what();
    EXPECT_EQ(exception.GetLine(), refusal.line) << refusal.name << ": " << exception.what();
    EXPECT_THAT(exception.GetReason(), ::testing::HasSubstr(refusal.reason)) << refusal.name;
    EXPECT_LT(exception.GetReason().size(), 1'000u) << refusal.name << ": a reason repeats no long text";
  }
}

void ExpectRefusedWhenCutOff(const std::string& text, const Read& read) {
  ASSERT_TRUE(read(text));
  for (std::size_t size = 0; size < text.size(); ++size) {
    try {
      read(text.substr(0, size));
      ADD_FAILURE() << "accepted: " << text.substr(0, size);
      return;
    } catch (const Orbis::ParseException& exception) {
      EXPECT_FALSE(exception.GetPath().empty());
      EXPECT_FALSE(exception.GetReason().empty());
    }
  }
}

std::string Repeated(const std::string& piece, std::size_t times) {
  std::string text;
  text.reserve(piece.size() * times);
  for (std::size_t i = 0; i < times; ++i) {
    text += piece;
  }
  return text;
}

}  // namespace Codec
