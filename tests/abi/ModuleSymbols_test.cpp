// What the built module shows to the world and what it asks of it, as its symbol tables say.

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cstdio>
#include <fstream>
#include <memory>
#include <regex>
#include <set>
#include <sstream>
#include <stdexcept>
#include <string>
#include <vector>

namespace {

using testing::AnyOf;
using testing::Each;
using testing::Eq;
using testing::IsEmpty;
using testing::IsSupersetOf;
using testing::Not;
using testing::StartsWith;

// What the program writes to standard output, line by line. Fails unless it succeeds.
std::vector<std::string> LinesOf(const std::string& command) {
  FILE* const pipe = popen(command.c_str(), "r");
  if (pipe == nullptr) {
    throw std::runtime_error("cannot run " + command);
  }
  std::string output;
  char buffer[4096];
  while (const std::size_t count = std::fread(buffer, 1, sizeof buffer, pipe)) {
    output.append(buffer, count);
  }
  if (pclose(pipe) != 0) {
    throw std::runtime_error(command + " failed");
  }
  std::istringstream stream(output);
  std::vector<std::string> lines;
  for (std::string line; std::getline(stream, line);) {
    lines.push_back(line);
  }
  return lines;
}

struct Symbol {
  char kind;
  std::string name;  // without its version
};

std::vector<Symbol> SymbolsOf(const std::string& options) {
  std::vector<Symbol> symbols;
  const std::regex pattern("^[0-9a-f ]*([A-Za-z]) ([^@]*).*$");
  for (const std::string& line : LinesOf(std::string(KOVA_NM) + " -D " + options + " " KOVA_MODULE)) {
    std::smatch match;
    if (!std::regex_match(line, match, pattern)) {
      throw std::runtime_error("not understood: " + line);
    }
    symbols.push_back({match[1].str().front(), match[2].str()});
  }
  return symbols;
}

std::set<std::string> NamesOf(const std::vector<Symbol>& symbols) {
  std::set<std::string> names;
  for (const Symbol& symbol : symbols) {
    names.insert(symbol.name);
  }
  return names;
}

TEST(ModuleSymbols, ShowExactlyTheListedNames) {
  std::set<std::string> allowed;
  std::ifstream list(KOVA_EXPORTS);
  for (std::string name; std::getline(list, name);) {
    allowed.insert(name);
  }
  ASSERT_EQ(allowed.size(), 13U);
  EXPECT_EQ(NamesOf(SymbolsOf("--defined-only")), allowed);
}

// A unique symbol would tie the module to its process for ever: it could not be unloaded.
TEST(ModuleSymbols, HoldNoUniqueSymbol) {
  const std::vector<Symbol> defined = SymbolsOf("--defined-only");
  ASSERT_THAT(defined, Not(IsEmpty()));
  EXPECT_THAT(defined, Each(testing::Field(&Symbol::kind, Not(Eq('u')))));
}

TEST(ModuleSymbols, ShowTheTableOfTextsAsData) {
  for (const Symbol& symbol : SymbolsOf("--defined-only")) {
    const bool isTable = symbol.name == "returnStatusStrs";
    EXPECT_THAT(symbol.kind, isTable ? testing::Matcher<char>(AnyOf('D', 'R')) : testing::Matcher<char>('T'))
        << symbol.name;
  }
}

TEST(ModuleSymbols, NeedOnlyTheRuntimeTheKernelLibraryAndTheLanguagesLibraries) {
  const std::regex pattern(R"(.*\(NEEDED\).*\[(.*)\])");
  std::vector<std::string> needed;
  for (const std::string& line : LinesOf(std::string(KOVA_READELF) + " -d " KOVA_MODULE)) {
    std::smatch match;
    if (std::regex_match(line, match, pattern)) {
      needed.push_back(match[1].str());
    }
  }
  ASSERT_THAT(needed, testing::Contains(StartsWith("libtessa.so")));
  EXPECT_THAT(needed,
              Each(AnyOf(StartsWith("libtessa.so"), StartsWith("liborbis.so"), StartsWith("libnox.so"),
                         StartsWith("libotxctl.so"), Eq("libstdc++.so.6"), Eq("libgcc_s.so.1"),
                         Eq("libm.so.6"), Eq("libc.so.6"), StartsWith("ld-linux"))));
}

// The module reads no file and no environment, starts no thread or program and talks to nobody.
TEST(ModuleSymbols, AskForNothingOfTheSystem) {
  const std::set<std::string> forbidden = {
      "open",        "open64",   "openat",      "openat64",       "creat",
      "fopen",       "fopen64",  "freopen",     "opendir",        "read",
      "pread",       "pread64",  "readv",       "fread",          "fgets",
      "getline",     "write",    "pwrite",      "stat",           "fstat",
      "access",      "mmap",     "getenv",      "secure_getenv",  "__secure_getenv",
      "setenv",      "environ",  "__environ",   "pthread_create", "thrd_create",
      "clone",       "fork",     "vfork",       "system",         "popen",
      "posix_spawn", "execve",   "execvp",      "socket",         "connect",
      "bind",        "listen",   "accept",      "send",           "recv",
      "sendto",      "recvfrom", "getaddrinfo", "ioctl",          "fcntl",
      "syscall",     "dlopen",   "dlsym",       "uname",          "gethostname",
      "sysconf",     "sleep",    "nanosleep",   "usleep",         "signal",
      "sigaction",   "kill"};
  // Streams on files, threads and the file system of the C++ library, by the beginnings of their names.
  const std::vector<std::string> forbiddenBeginnings = {
      "_ZNSt13basic_filebuf", "_ZNSt14basic_ifstream", "_ZNSt14basic_ofstream", "_ZNSt13basic_fstream",
      "_ZNSt12__basic_file",  "_ZNSt6thread",          "_ZNSt10filesystem",     "_ZNSt13random_device"};
  const std::set<std::string> wanted = NamesOf(SymbolsOf("--undefined-only"));
  ASSERT_THAT(wanted, IsSupersetOf({"__cxa_throw"})) << "the table was not read";
  for (const std::string& name : wanted) {
    EXPECT_EQ(forbidden.count(name), 0U) << name;
    for (const std::string& beginning : forbiddenBeginnings) {
      EXPECT_NE(name.compare(0, beginning.size(), beginning), 0) << name;
    }
  }
}

}  // namespace
