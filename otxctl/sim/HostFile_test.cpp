#include "otxctl/sim/HostFile.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/resource.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <csignal>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <tuple>

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
  EXPECT_EQ(HostFileWriter(_path).Save(host), std::nullopt);
  EXPECT_EQ(LoadHostFile(_path), host);
  EXPECT_THAT(FilesInFolder(), UnorderedElementsAre("host.json", "host.json.lock"));
}

TEST_F(HostFileTest, SavesAgainAndAgain) {
  const HostFileWriter writer(_path);
  EXPECT_EQ(writer.Save(AHost().WithSsd("naa.1").Build()), std::nullopt);
  EXPECT_EQ(writer.Save(AHost().WithSsd("naa.2").Build()), std::nullopt);
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
  EXPECT_EQ(first.Save(AHost().Build()), std::nullopt);
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
  EXPECT_EQ(HostFileWriter(_path).Save(host), std::nullopt);
  EXPECT_EQ(LoadHostFile(_path), host);
  EXPECT_THAT(FilesInFolder(), UnorderedElementsAre("host.json", "host.json.lock"));
}
TEST_F(HostFileTest, AFailedSaveLeavesTheOldFileAndNothingElse) {
  const HostDescription old = AHost().WithSsd("naa.1").Build();
  const HostFileWriter writer(_path);
  EXPECT_EQ(writer.Save(old), std::nullopt);
  HostBuilder large;
  for (int number = 0; number < 100; ++number) {
    large.WithHdd("naa." + std::to_string(number));
  }
  std::string error;
  {
    const FileSizeLimit limit(1000);
    error = ErrorOf([&] { std::ignore = writer.Save(large.Build()); });
  }
  EXPECT_THAT(error, AllOf(StartsWith(_path + ": cannot be saved"), HasSubstr("large")));
  EXPECT_EQ(LoadHostFile(_path), old);
  EXPECT_THAT(FilesInFolder(), UnorderedElementsAre("host.json", "host.json.lock"));
}

// A folder whose entries cannot be made to last, at the first `folderFailures` calls.
int folderFailures = 0;
int folderError = 0;

int FailingSync(int folder) {
  if (folderFailures-- > 0) {
    errno = folderError;
    return -1;
  }
  return fsync(folder);
}

TEST_F(HostFileTest, AFileInItsPlaceIsSavedThoughAPowerCutMayUndoIt) {
  const HostFileWriter writer(_path, &FailingSync);
  EXPECT_EQ(writer.Save(AHost().WithSsd("naa.1").Build()), std::nullopt);
  folderFailures = 1;
  folderError = EIO;
  EXPECT_EQ(writer.Save(AHost().WithSsd("naa.2").Build()),
            _path + ": was saved, but may not last a power cut: Input/output error");
  EXPECT_EQ(LoadHostFile(_path).disks.at(0).name, "naa.2");
  EXPECT_THAT(FilesInFolder(), UnorderedElementsAre("host.json", "host.json.lock"));
  EXPECT_EQ(writer.Save(AHost().WithSsd("naa.3").Build()), std::nullopt) << "the next save covers both";
}

TEST_F(HostFileTest, ASignalWhileTheFolderIsMadeToLastIsNoFailure) {
  const HostFileWriter writer(_path, &FailingSync);
  folderFailures = 3;
  folderError = EINTR;
  EXPECT_EQ(writer.Save(AHost().Build()), std::nullopt);
  EXPECT_LT(folderFailures, 0) << "it was asked again until it had been done";
}

// The folder is looked for before the file is put in its place: there is no turning back from that.
TEST_F(HostFileTest, AFolderThatIsGoneLeavesNothingSaved) {
  std::filesystem::create_directory(_folder / "inner");
  const HostFileWriter writer(_folder / "inner" / "host.json");
  std::filesystem::remove_all(_folder / "inner");
  EXPECT_THAT(ErrorOf([&] { std::ignore = writer.Save(AHost().Build()); }),
              HasSubstr("inner: cannot be opened"));
  EXPECT_THAT(FilesInFolder(), testing::IsEmpty());
}

TEST_F(HostFileTest, AHostThatCannotBeWrittenLeavesTheOldFile) {
  const HostFileWriter writer(_path);
  EXPECT_EQ(writer.Save(AHost().Build()), std::nullopt);
  HostDescription bad;
  bad.name = "\xFF";
  EXPECT_THAT(ErrorOf([&] { std::ignore = writer.Save(bad); }), StartsWith(_path + ": "));
  EXPECT_EQ(LoadHostFile(_path), HostDescription());
}

TEST_F(HostFileTest, SavingKeepsThePermissionsOfTheFile) {
  Put("{}");
  std::filesystem::permissions(_path, std::filesystem::perms(0640));
  EXPECT_EQ(HostFileWriter(_path).Save(AHost().Build()), std::nullopt);
  EXPECT_EQ(std::filesystem::status(_path).permissions(), std::filesystem::perms(0640));
}

TEST_F(HostFileTest, ALinkStaysALink) {
  std::filesystem::create_directory(_folder / "real");
  const std::string target = _folder / "real" / "host.json";
  std::ofstream(target) << "{}";
  std::filesystem::create_symlink(target, _path);
  EXPECT_EQ(HostFileWriter(_path).Save(AHost().WithSsd("naa.1").Build()), std::nullopt);
  EXPECT_TRUE(std::filesystem::is_symlink(_path));
  EXPECT_EQ(LoadHostFile(target).disks.size(), 1U);
}

TEST_F(HostFileTest, AFolderThatDoesNotExistIsAnErrorThatNamesIt) {
  const std::string path = _folder / "nowhere" / "host.json";
  EXPECT_THAT(ErrorOf([&] { HostFileWriter writer(path); }), HasSubstr("nowhere/host.json"));
}

}  // namespace
}  // namespace OtxCtl::Sim
