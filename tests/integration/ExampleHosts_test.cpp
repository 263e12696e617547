// Every example host says what it is known to say.

#include <gtest/gtest.h>

#include <algorithm>
#include <filesystem>
#include <fstream>
#include <set>
#include <sstream>

#include "otxctl/sim/HostFile.h"
#include "otxctl/sim/LsblkImport.h"
#include "tests/integration/Outcome.h"

namespace Integration {
namespace {

namespace fs = std::filesystem;

const std::string examples = KOVA_EXAMPLE_HOSTS;
const std::string lsblkOutput = "lab-lsblk";  // the one example that is imported, not loaded

std::string ReadText(const fs::path& path) {
  std::ifstream file(path);
  EXPECT_TRUE(file) << path << " cannot be read";
  std::ostringstream text;
  text << file.rdbuf();
  return text.str();
}

OtxCtl::Sim::HostDescription LoadExample(const std::string& name) {
  const std::string path = examples + "/" + name + ".json";
  return name == lsblkOutput ? OtxCtl::Sim::ImportLsblk(ReadText(path)).host
                             : OtxCtl::Sim::LoadHostFile(path);
}

std::set<std::string> NamesIn(const std::string& folder, const std::string& extension) {
  std::set<std::string> names;
  for (const fs::directory_entry& entry : fs::directory_iterator(folder)) {
    if (entry.path().extension() == extension) {
      names.insert(entry.path().stem().string());
    }
  }
  return names;
}

class ExampleHost : public testing::TestWithParam<std::string> {};

TEST_P(ExampleHost, SaysWhatItIsKnownToSay) {
  EXPECT_EQ(OutcomeOf(LoadExample(GetParam())),
            ReadText(fs::path(KOVA_EXPECTED_OUTCOMES) / (GetParam() + ".txt")));
}

std::string TestName(const testing::TestParamInfo<std::string>& info) {
  std::string name = info.param;
  std::replace(name.begin(), name.end(), '-', '_');
  return name;
}

INSTANTIATE_TEST_SUITE_P(All, ExampleHost, testing::ValuesIn(NamesIn(examples, ".json")), TestName);

TEST(ExampleHosts, EachHasAnExpectedOutcomeAndTheOtherWayRound) {
  EXPECT_EQ(NamesIn(examples, ".json"), NamesIn(KOVA_EXPECTED_OUTCOMES, ".txt"));
  EXPECT_GE(NamesIn(examples, ".json").size(), 8u);
}

}  // namespace
}  // namespace Integration
