#include "tests/codec/SchemaCheck.h"

#include <gtest/gtest.h>
#include <sys/wait.h>

#include <array>
#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <sstream>
#include <stdexcept>
#include <string_view>

namespace Codec {
namespace {

namespace fs = std::filesystem;

// A folder that goes with its owner.
class ScratchFolder {
 public:
  ScratchFolder() {
    std::string pattern = ::testing::TempDir() + "/codec-XXXXXX";
    if (mkdtemp(pattern.data()) == nullptr) {
      throw std::runtime_error("cannot make a folder in " + ::testing::TempDir());
    }
    _path = pattern;
  }
  ~ScratchFolder() { fs::remove_all(_path); }
  ScratchFolder(const ScratchFolder&) = delete;
  ScratchFolder& operator=(const ScratchFolder&) = delete;

  const fs::path& Path() const { return _path; }

 private:
  fs::path _path;
};

struct Run {
  int status;
  std::string output;
};

Run RunCommand(const std::string& command) {
  FILE* const pipe = popen(command.c_str(), "r");
  if (pipe == nullptr) {
    throw std::runtime_error("cannot run " + command);
  }
  std::string output;
  std::array<char, 4096> buffer{};
  for (std::size_t got = 0; (got = std::fread(buffer.data(), 1, buffer.size(), pipe)) > 0;) {
    output.append(buffer.data(), got);
  }
  const int status = pclose(pipe);
  return {WIFEXITED(status) ? WEXITSTATUS(status) : -1, output};
}

}  // namespace

std::string ValidateAgainstSchema(const std::vector<std::string>& texts) {
  const ScratchFolder folder;
  std::string command =
      "cd '" + folder.Path().string() + "' && '" KOVA_XMLLINT "' --noout --schema '" KOVA_XSD "'";
  for (std::size_t i = 0; i < texts.size(); ++i) {
    const std::string name = std::to_string(i) + ".xml";
    std::ofstream(folder.Path() / name, std::ios::binary) << texts[i];
    command += " " + name;
  }
  const Run run = RunCommand(command + " 2>&1");
  // The validator says of every text that it validates, or why not.
  std::string complaints;
  std::size_t valid = 0;
  std::istringstream lines(run.output);
  for (std::string line; std::getline(lines, line);) {
    constexpr std::string_view verdict = " validates";
    const bool good = line.size() > verdict.size() && line.ends_with(verdict);
    valid += good ? 1 : 0;
    complaints += good ? "" : line + "\n";
  }
  if (complaints.empty() && (run.status != 0 || valid != texts.size())) {
    complaints = std::to_string(valid) + " of " + std::to_string(texts.size()) +
                 " texts validated, exit status " + std::to_string(run.status);
  }
  return complaints;
}

}  // namespace Codec
