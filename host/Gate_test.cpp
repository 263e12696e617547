#include "host/Gate.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

namespace Host::Gate {
namespace {

using testing::AllOf;
using testing::HasSubstr;
using Names = std::vector<std::string>;

// What an InvalidArgument says: "PROPERTY | MESSAGE"; "let in" for no fault.
std::string Verdict(const Names& names) {
  const auto fault = CheckNames("names", names);
  if (!fault) {
    return "let in";
  }
  const auto* const invalid = dynamic_cast<const Orbis::Fault::InvalidArgument*>(fault.Get());
  const auto messages = fault->GetFaultMessage();
  if (invalid == nullptr || messages->Size() != 1) {
    return "not an InvalidArgument with one message";
  }
  return invalid->GetInvalidProperty() + " | " + (*messages)[0]->GetMessage();
}

TEST(Gate, LetsInWhatCanBeANameOfADisk) {
  EXPECT_EQ(Verdict({}), "let in");
  EXPECT_EQ(Verdict({"naa.5000c50000000100", "t10.VENDOR  Größe", "kova:0123", "a"}), "let in");
}

TEST(Gate, LetsInTheSameNameTwice) {
  EXPECT_EQ(Verdict({"naa.1", "naa.1"}), "let in");
}

TEST(Gate, RefusesAnEmptyNameAndSaysWhich) {
  EXPECT_THAT(Verdict({"naa.1", ""}), AllOf(HasSubstr("names[1] | names[1]: "), HasSubstr("empty")));
}

TEST(Gate, LetsInTheLongestNameAndNoLongerOne) {
  EXPECT_EQ(Verdict({std::string(longestName, 'n')}), "let in");
  EXPECT_THAT(Verdict({std::string(longestName + 1, 'n')}),
              AllOf(HasSubstr("names[0] | "), HasSubstr("1024 bytes")));
}

TEST(Gate, LetsInTheMostNamesAndNoMore) {
  EXPECT_EQ(Verdict(Names(mostNames, "naa.1")), "let in");
  EXPECT_THAT(Verdict(Names(mostNames + 1, "naa.1")),
              AllOf(HasSubstr("names | "), HasSubstr("100000 names")));
}

TEST(Gate, RefusesControlCharactersAndShowsThemHarmlessly) {
  EXPECT_THAT(Verdict({"naa\n1"}), AllOf(HasSubstr("names[0] | "), HasSubstr("'naa\\x0a1'")));
  EXPECT_THAT(Verdict({std::string("naa\0", 4)}), HasSubstr("'naa\\x00'"));
  EXPECT_THAT(Verdict({"\x7f"}), HasSubstr("'\\x7f'"));
  EXPECT_THAT(Verdict({"\xC2\x85"}), HasSubstr("'\\xc2\\x85'"));
}

TEST(Gate, RefusesWhatIsNotUtf8) {
  EXPECT_THAT(Verdict({"naa.\xFF"}), HasSubstr("'naa.\\xff'"));
  EXPECT_THAT(Verdict({"\xED\xA0\x80"}), HasSubstr("names[0] | "));
}

TEST(Gate, NamesTheFirstOfSeveralMistakes) {
  EXPECT_THAT(Verdict({"a", "", "\n"}), HasSubstr("names[1] | "));
}

TEST(Gate, NamesTheParameterThatTheCallerNames) {
  const auto fault = CheckNames("disks", {""});
  ASSERT_TRUE(fault);
  EXPECT_EQ(dynamic_cast<const Orbis::Fault::InvalidArgument&>(*fault).GetInvalidProperty(), "disks[0]");
}

}  // namespace
}  // namespace Host::Gate
