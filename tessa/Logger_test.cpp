#include "tessa/Logger.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cstdint>
#include <limits>
#include <stdexcept>
#include <string>
#include <vector>

#include "tessa/Formatter.h"

namespace Tessa::Service {
namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;

// Keeps the lines that pass its level, as a sink would write them.
class ListLogger final : public Logger {
 public:
  explicit ListLogger(LogLevel level) : _level(level) {}

  LogLevel GetLevel() const noexcept override { return _level; }
  void CreateChild(const std::string&, Ref<Logger>& child) override { child = MakeRef<ListLogger>(_level); }
  void Write(LogLevel level, std::string_view format, std::span<const LogArgument> arguments) override {
    lines.push_back(std::string(LevelName(level)) + ": " + FormatMessage(format, arguments));
  }

  std::vector<std::string> lines;

 private:
  LogLevel _level;
};

// Counts how often it was printed.
struct Costly {
  void PrintTo(std::string& out) const {
    ++printed;
    out += "costly";
  }
  mutable int printed = 0;
};

template <class... Args>
std::string Format(std::string_view format, const Args&... args) {
  if constexpr (sizeof...(args) == 0) {
    return FormatMessage(format, {});
  } else {
    const LogArgument arguments[] = {LogArgument(args)...};
    return FormatMessage(format, arguments);
  }
}

TEST(LogInternal, PrintsNothingBelowTheLoggersLevel) {
  const Ref<ListLogger> logger = MakeRef<ListLogger>(LogLevel::Info);
  const Costly argument;
  LogInternal(logger, LogLevel::Verbose, "%1", argument);
  EXPECT_EQ(argument.printed, 0);
  EXPECT_THAT(logger->lines, IsEmpty());
}

TEST(LogInternal, PrintsWhatTheLevelLetsThroughOnce) {
  const Ref<ListLogger> logger = MakeRef<ListLogger>(LogLevel::Info);
  const Costly argument;
  LogInternal(logger, LogLevel::Info, "a %1 line", argument);
  LogInternal(*logger, LogLevel::Error, "a bare line");
  EXPECT_EQ(argument.printed, 1);
  EXPECT_THAT(logger->lines, ElementsAre("info: a costly line", "error: a bare line"));
}

TEST(LogInternal, LetsNothingThroughAtLevelNone) {
  const Ref<ListLogger> logger = MakeRef<ListLogger>(LogLevel::None);
  LogInternal(logger, LogLevel::Error, "nobody reads this");
  EXPECT_THAT(logger->lines, IsEmpty());
}

TEST(FormatMessage, PutsArgumentsWhereTheirNumbersStand) {
  EXPECT_EQ(Format("%2 before %1, %2 again", "one", "two"), "two before one, two again");
  EXPECT_EQ(Format("%1%2%3%4%5%6%7%8%9", 1, 2, 3, 4, 5, 6, 7, 8, 9), "123456789");
}

TEST(FormatMessage, NeverExpandsWhatAnArgumentPrints) {
  EXPECT_EQ(Format("%1 and %2", "%2", "%1"), "%2 and %1");
  EXPECT_EQ(Format("%1", "100%"), "100%");
  EXPECT_EQ(Format("%12", "%", "x"), "%2") << "nor together with what follows";
}

struct FormatCase {
  const char* format;
  const char* expected;

  friend std::ostream& operator<<(std::ostream& out, const FormatCase& row) { return out << row.format; }
};

class FormatMessageWithOneArgument : public ::testing::TestWithParam<FormatCase> {};

TEST_P(FormatMessageWithOneArgument, KeepsWhatIsNoPlaceholder) {
  EXPECT_EQ(Format(GetParam().format, "one"), GetParam().expected);
}

INSTANTIATE_TEST_SUITE_P(Formats, FormatMessageWithOneArgument,
                         ::testing::Values(FormatCase{"", ""}, FormatCase{"%2 has none", "%2 has none"},
                                           FormatCase{"%0", "%0"}, FormatCase{"%", "%"},
                                           FormatCase{"100%", "100%"}, FormatCase{"%10", "one0"},
                                           FormatCase{"%%1", "%one"}, FormatCase{"%s %1", "%s one"},
                                           FormatCase{"%-1", "%-1"}, FormatCase{"%1%", "one%"}));

TEST(FormatMessage, WithoutArgumentsIsTheFormat) {
  EXPECT_EQ(Format("%1 %2 %"), "%1 %2 %");
}

TEST(LogArgument, PrintsTextsAndNumbersOfEveryWidth) {
  EXPECT_EQ(LogArgument("a literal").ToString(), "a literal");
  EXPECT_EQ(LogArgument(std::string("a text")).ToString(), "a text");
  EXPECT_EQ(LogArgument(std::string_view("a view")).ToString(), "a view");
  EXPECT_EQ(LogArgument(std::numeric_limits<std::int64_t>::min()).ToString(), "-9223372036854775808");
  EXPECT_EQ(LogArgument(std::numeric_limits<std::uint64_t>::max()).ToString(), "18446744073709551615");
  EXPECT_EQ(LogArgument(true).ToString(), "1");
}

TEST(LogArgument, PrintsANullTextRatherThanFailing) {
  const char* const none = nullptr;
  EXPECT_EQ(LogArgument(none).ToString(), "(null)");
}

TEST(LogArgument, AppendsToWhatIsThere) {
  std::string line = "size ";
  LogArgument(7).PrintTo(line);
  EXPECT_EQ(line, "size 7");
}

struct LevelCase {
  int level;
  const char* name;

  friend std::ostream& operator<<(std::ostream& out, const LevelCase& row) { return out << row.level; }
};

class LevelNames : public ::testing::TestWithParam<LevelCase> {};

TEST_P(LevelNames, AreThoseOfTheNextLowerLevel) {
  EXPECT_EQ(LevelName(static_cast<LogLevel>(GetParam().level)), GetParam().name);
}

INSTANTIATE_TEST_SUITE_P(Levels, LevelNames,
                         ::testing::Values(LevelCase{0, "none"}, LevelCase{1, "none"}, LevelCase{2, "error"},
                                           LevelCase{3, "error"}, LevelCase{4, "warning"},
                                           LevelCase{8, "info"}, LevelCase{15, "info"},
                                           LevelCase{16, "verbose"}, LevelCase{32, "trivia"},
                                           LevelCase{1000, "trivia"}, LevelCase{-1, "none"}));

TEST(ParseLevel, ReadsNamesAndNumbers) {
  for (const LogLevel level : {LogLevel::None, LogLevel::Error, LogLevel::Warning, LogLevel::Info,
                               LogLevel::Verbose, LogLevel::Trivia}) {
    LogLevel read = LogLevel::None;
    EXPECT_TRUE(ParseLevel(LevelName(level), read));
    EXPECT_EQ(read, level);
    EXPECT_TRUE(ParseLevel(std::to_string(static_cast<int>(level)), read));
    EXPECT_EQ(read, level);
  }
}

TEST(ParseLevel, RefusesAnythingElseAndLeavesTheLevelAlone) {
  for (const char* text : {"", "Error", "loud", "-1", "8 ", " 8", "8x", "99999999999"}) {
    LogLevel level = LogLevel::Warning;
    EXPECT_FALSE(ParseLevel(text, level)) << text;
    EXPECT_EQ(level, LogLevel::Warning) << text;
  }
}

TEST(DefaultLogger, IsTheOneThatWasInstalled) {
  EXPECT_FALSE(GetDefaultLogger());
  const Ref<Logger> logger = MakeRef<ListLogger>(LogLevel::Info);
  SetDefaultLogger(logger);
  EXPECT_TRUE(GetDefaultLogger() == logger);
  EXPECT_EQ(logger->GetRefCount(), 2);
  SetDefaultLogger(nullptr);
  EXPECT_FALSE(GetDefaultLogger());
  EXPECT_EQ(logger->GetRefCount(), 1);
}

class Speaking final : public ObjectImpl {
 public:
  std::string ToString() const override {
    ++asked;
    return "hello %1";
  }
  mutable int asked = 0;
};

class Failing final : public ObjectImpl {
 public:
  std::string ToString() const override { throw std::runtime_error("cannot say"); }
};

class FailingOddly final : public ObjectImpl {
 public:
  std::string ToString() const override { throw 5; }
};

TEST(FormatObject, AsksTheObjectOnlyWhenTheLineIsWritten) {
  const Ref<ListLogger> logger = MakeRef<ListLogger>(LogLevel::Info);
  const Ref<Speaking> object = MakeRef<Speaking>();
  LogInternal(logger, LogLevel::Trivia, "%1", PrintFormatter::FormatObject(object));
  EXPECT_EQ(object->asked, 0);
  LogInternal(logger, LogLevel::Info, "it says %1", PrintFormatter::FormatObject(object));
  EXPECT_EQ(object->asked, 1);
  EXPECT_THAT(logger->lines, ElementsAre("info: it says hello %1"));
}

TEST(FormatObject, PrintsNullAndObjectsThatFailAndNeverThrows) {
  EXPECT_EQ(Format("<%1>", PrintFormatter::FormatObject(Ref<Object>())), "<(null)>");
  EXPECT_EQ(Format("<%1>", PrintFormatter::FormatObject(MakeRef<Failing>())), "<(unprintable)>");
  EXPECT_EQ(Format("<%1>", PrintFormatter::FormatObject(MakeRef<FailingOddly>())), "<(unprintable)>");
}

}  // namespace
}  // namespace Tessa::Service
