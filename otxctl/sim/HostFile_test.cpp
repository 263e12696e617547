#include "otxctl/sim/HostFile.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/resource.h>
#include <sys/stat.h>

#include <csignal>
#include <cstdlib>
#include <filesystem>
#include <fstream>

#include "otxctl/sim/HostBuilder.h"

namespace OtxCtl::Sim {
namespace {

using testing::AllOf;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::StartsWith;
using testing::UnorderedElementsAre;

class HostFileTest : public testing::Test {
 protected:
  HostFileTest() {
    std::string folder = (std::filesystem::temp_directory_path() / "kova-host-file.XXXXXX").string();
    if (mkdtemp(folder.data()) == nullptr) {
      throw std::runtime_error("no folder for the test");
    }
    _folder = folder;
    _path = _folder / "host.json";
  }
  ~HostFileTest() override { std::filesystem::remove_all(_folder); }

  void Put(const std::string& text) { std::ofstream(_path) << text; }

  std::vector<std::string> FilesInFolder() const {
    std::vector<std::string> names;
    for (const auto& entry : std::filesystem::directory_iterator(_folder)) {
      names.push_back(entry.path().filename());
    }
    return names;
  }

  template <typename Action>
  static std::string ErrorOf(Action action) {
    try {
      action();
    } catch (const HostFileError& error) {
      return error.what();
    }
    return "no error";
  }

  std::filesystem::path _folder;
  std::string _path;
};

TEST_F(HostFileTest, LoadsWhatItSaved) {
  const HostDescription host = AHost().WithSsd("naa.1").WithHdd("naa.2").Build();
  HostFileWriter(_path).Save(host);
  EXPECT_EQ(LoadHostFile(_path), host);
  EXPECT_THAT(FilesInFolder(), UnorderedElementsAre("host.json", "host.json.lock"));
}

TEST_F(HostFileTest, SavesAgainAndAgain) {
  const HostFileWriter writer(_path);
  writer.Save(AHost().WithSsd("naa.1").Build());
  writer.Save(AHost().WithSsd("naa.2").Build());
  EXPECT_EQ(LoadHostFile(_path).disks.at(0).name, "naa.2");
}

TEST_F(HostFileTest, ErrorsNameTheFile) {
  EXPECT_THAT(ErrorOf([this] { LoadHostFile(_path); }),
              AllOf(StartsWith(_path + ": "), HasSubstr("No such file")));
  Put(R"({"disks": [{"name": "a", "ssd": 1, "bytes": 1}]})");
  EXPECT_THAT(ErrorOf([this] { LoadHostFile(_path); }), StartsWith(_path + ": disks[0].ssd: "));
  Put("{\n3");
  EXPECT_THAT(ErrorOf([this] { LoadHostFile(_path); }), StartsWith(_path + ": line 2, column 1: "));
  EXPECT_THAT(ErrorOf([this] { LoadHostFile(_folder); }), HasSubstr("no regular file"));
}

TEST_F(HostFileTest, APipeDoesNotHoldTheProgramUp) {
  ASSERT_EQ(mkfifo(_path.c_str(), 0600), 0);
  EXPECT_THAT(ErrorOf([this] { LoadHostFile(_path); }), HasSubstr("no regular file"));
}

TEST_F(HostFileTest, ReadingIsBounded) {
  Put("12345");
  EXPECT_EQ(ReadTextFile(_path, 5), "12345");
  EXPECT_THAT(ErrorOf([this] { ReadTextFile(_path, 4); }), HasSubstr("larger than 4 bytes"));
}

TEST_F(HostFileTest, ASecondWriterIsKeptOutUntilTheFirstIsGone) {
  {
    const HostFileWriter first(_path);
    EXPECT_THAT(ErrorOf([this] { HostFileWriter second(_path); }),
                AllOf(StartsWith(_path + ": "), HasSubstr("another program saves this host")));
  }
  EXPECT_NO_THROW(HostFileWriter second(_path));
}

TEST_F(HostFileTest, TheLockOutlivesSaving) {
  const HostFileWriter first(_path);
  first.Save(AHost().Build());
  EXPECT_THAT(ErrorOf([this] { HostFileWriter second(_path); }), HasSubstr("another program"));
}

TEST_F(HostFileTest, ALockedFileCanBeRead) {
  Put("{}");
  const HostFileWriter writer(_path);
  EXPECT_EQ(LoadHostFile(_path), HostDescription());
}

// A limit on the size of files is the full disk that even root runs into.
class FileSizeLimit {
 public:
  explicit FileSizeLimit(rlim_t bytes) : _oldHandler(std::signal(SIGXFSZ, SIG_IGN)) {
    getrlimit(RLIMIT_FSIZE, &_old);
    const rlimit limit = {bytes, _old.rlim_max};
    setrlimit(RLIMIT_FSIZE, &limit);
  }
  ~FileSizeLimit() {
    setrlimit(RLIMIT_FSIZE, &_old);
    std::signal(SIGXFSZ, _oldHandler);
  }
  FileSizeLimit(const FileSizeLimit&) = delete;
  FileSizeLimit& operator=(const FileSizeLimit&) = delete;

 private:
  rlimit _old{};
  void (*_oldHandler)(int);
};

TEST_F(HostFileTest, ReplacesWhatAKilledWriterLeftBehind) {
  std::ofstream(_path + ".new") << "half of a host";
  const HostDescription host = AHost().WithSsd("naa.1").Build();
  HostFileWriter(_path).Save(host);
  EXPECT_EQ(LoadHostFile(_path), host);
  EXPECT_THAT(FilesInFolder(), UnorderedElementsAre("host.json", "host.json.lock"));
}
TEST_F(HostFileTest, AFailedSaveLeavesTheOldFileAndNothingElse) {
  const HostDescription old = AHost().WithSsd("naa.1").Build();
  const HostFileWriter writer(_path);
  writer.Save(old);
  HostBuilder large;
  for (int number = 0; number < 100; ++number) {
    large.WithHdd("naa." + std::to_string(number));
  }
  std::string error;
  {
    const FileSizeLimit limit(1000);
    error = ErrorOf([&] { writer.Save(large.Build()); });
  }
  EXPECT_THAT(error, AllOf(StartsWith(_path + ": cannot be saved"), HasSubstr("large")));
  EXPECT_EQ(LoadHostFile(_path), old);
  EXPECT_THAT(FilesInFolder(), UnorderedElementsAre("host.json", "host.json.lock"));
}

TEST_F(HostFileTest, AHostThatCannotBeWrittenLeavesTheOldFile) {
  const HostFileWriter writer(_path);
  writer.Save(AHost().Build());
  HostDescription bad;
  bad.name = "\xFF";
  EXPECT_THAT(ErrorOf([&] { writer.Save(bad); }), StartsWith(_path + ": "));
  EXPECT_EQ(LoadHostFile(_path), HostDescription());
}

TEST_F(HostFileTest, SavingKeepsThePermissionsOfTheFile) {
  Put("{}");
  std::filesystem::permissions(_path, std::filesystem::perms(0640));
  HostFileWriter(_path).Save(AHost().Build());
  EXPECT_EQ(std::filesystem::status(_path).permissions(), std::filesystem::perms(0640));
}

TEST_F(HostFileTest, ALinkStaysALink) {
  std::filesystem::create_directory(_folder / "real");
  const std::string target = _folder / "real" / "host.json";
  std::ofstream(target) << "{}";
  std::filesystem::create_symlink(target, _path);
  HostFileWriter(_path).Save(AHost().WithSsd("naa.1").Build());
  EXPECT_TRUE(std::filesystem::is_symlink(_path));
  EXPECT_EQ(LoadHostFile(target).disks.size(), 1U);
}

TEST_F(HostFileTest, AFolderThatDoesNotExistIsAnErrorThatNamesIt) {
  const std::string path = _folder / "nowhere" / "host.json";
  EXPECT_THAT(ErrorOf([&] { HostFileWriter writer(path); }), HasSubstr("nowhere/host.json"));
}

}  // namespace
}  // namespace OtxCtl::Sim
