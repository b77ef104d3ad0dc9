#include "host/utility/atomic_file.h"

#include "host/utility/unique_fd.h"
#include "platform/utility.h"
#include "tests/host/files.h"

#include <gmock/gmock.h>

#include <fcntl.h>
#include <sys/file.h>
#include <sys/mount.h>
#include <unistd.h>

#include <chrono>
#include <thread>

namespace {

using hosttest::NamesIn;
using hosttest::ReadText;
using hosttest::StatOf;
using hosttest::WriteText;
using testing::ElementsAre;
using testing::IsEmpty;

int Put(const std::string &path, const std::string &content,
        std::chrono::milliseconds lockLimit = vornhost::kLockLimit) {
  return vornhost::ChangeFile(
      path.c_str(),
      [&content](const std::string & /*old*/, std::string &fresh) {
        fresh = content;
        return 0;
      },
      lockLimit);
}

class AtomicFile : public testing::Test {
protected:
  void SetUp() override { hosttest::FreshFolder("/var/lib/files"); }
  const std::string path_ = "/var/lib/files/a.conf";
};

TEST_F(AtomicFile, KeepsModeAndOwner) {
  WriteText(path_, "old");
  ASSERT_EQ(chmod(path_.c_str(), 0640), 0);
  const bool otherOwner = chown(path_.c_str(), 12, 34) == 0; // not in a user namespace of one user
  const auto before = StatOf(path_);
  ASSERT_EQ(Put(path_, "new"), 0);
  const auto after = StatOf(path_);
  EXPECT_EQ(ReadText(path_), "new");
  EXPECT_NE(after.st_ino, before.st_ino);
  EXPECT_EQ(after.st_mode & 07777U, 0640U);
  EXPECT_EQ(after.st_uid, before.st_uid);
  EXPECT_EQ(after.st_gid, before.st_gid);
  EXPECT_EQ(after.st_uid, otherOwner ? 12U : geteuid());
  EXPECT_THAT(NamesIn("/var/lib/files"), ElementsAre("a.conf"));
}

TEST_F(AtomicFile, TheSameContentIsNotWritten) {
  WriteText(path_, "same");
  const auto before = StatOf(path_);
  ASSERT_EQ(Put(path_, "same"), 0);
  EXPECT_EQ(StatOf(path_).st_ino, before.st_ino);
}

TEST_F(AtomicFile, AnEmptyContentMakesAnEmptyFile) {
  ASSERT_EQ(Put(path_, ""), 0);
  EXPECT_EQ(ReadText(path_), "");
  WriteText(path_, "old");
  ASSERT_EQ(Put(path_, ""), 0);
  EXPECT_EQ(ReadText(path_), "");
}

TEST_F(AtomicFile, ALinkInItsPlaceIsRefusedAndReadThrough) {
  WriteText("/var/lib/target", "k=target\n");
  ASSERT_EQ(symlink("/var/lib/target", path_.c_str()), 0);
  EXPECT_LT(Put(path_, "new"), 0);
  EXPECT_EQ(QARDCErrGet(), QARDC_ERR_ACCESS);
  EXPECT_EQ(ReadText("/var/lib/target"), "k=target\n");
  EXPECT_TRUE(S_ISLNK(StatOf(path_).st_mode));
  EXPECT_EQ(QARDCFileCheckKeyValue(path_.c_str(), "k", "target", 0), 1);
  EXPECT_THAT(NamesIn("/var/lib/files"), ElementsAre("a.conf"));
}

TEST_F(AtomicFile, ALinkAmongItsFoldersIsFollowed) {
  ASSERT_EQ(symlink("/var/lib/files", "/tmp/link"), 0);
  ASSERT_EQ(Put("/tmp/link/a.conf", "new"), 0);
  EXPECT_EQ(ReadText(path_), "new");
  ASSERT_EQ(unlink("/tmp/link"), 0);
}

TEST_F(AtomicFile, WhatIsNoRegularFileIsRefusedWithoutWaiting) {
  ASSERT_EQ(mkfifo(path_.c_str(), 0600), 0);
  std::string content;
  EXPECT_LT(Put(path_, "new"), 0);
  EXPECT_EQ(QARDCErrGet(), QARDC_ERR_ACCESS);
  EXPECT_LT(vornhost::ReadWholeFile(path_.c_str(), content), 0);
  EXPECT_EQ(QARDCErrGet(), QARDC_ERR_ACCESS);
  EXPECT_LT(vornhost::ReadWholeFile("/var/lib/files", content), 0);
  EXPECT_EQ(QARDCErrGet(), QARDC_ERR_ACCESS);
  EXPECT_LT(Put("/var/lib/files", "new"), 0);
  EXPECT_EQ(QARDCErrGet(), QARDC_ERR_ACCESS);
}

TEST_F(AtomicFile, PathsThatNameNoFileAreRefused) {
  for (const char *path : {"/var/lib/files/", "/var/lib/files/.", "/var/lib/files/..", "/"}) {
    EXPECT_LT(Put(path, "new"), 0) << path;
    EXPECT_EQ(QARDCErrGet(), QARDC_ERR_BAD_ARGUMENT) << path;
  }
  EXPECT_LT(Put("/var/lib/absent/a.conf", "new"), 0);
  EXPECT_EQ(QARDCErrGet(), QARDC_ERR_NOT_FOUND);
  EXPECT_LT(Put("/var/lib/files/" + std::string(300, 'x'), "new"), 0);
  EXPECT_EQ(QARDCErrGet(), QARDC_ERR_BAD_ARGUMENT);
  EXPECT_THAT(NamesIn("/var/lib/files"), IsEmpty());
}

TEST_F(AtomicFile, WhatAKilledWriterLeftIsReplaced) {
  WriteText(path_, "old");
  WriteText("/var/lib/files/.a.conf.new", "half of a wri");
  ASSERT_EQ(Put(path_, "new"), 0);
  EXPECT_EQ(ReadText(path_), "new");
  EXPECT_THAT(NamesIn("/var/lib/files"), ElementsAre("a.conf"));
}

TEST_F(AtomicFile, ALinkInTheNewFilesPlaceIsNotWrittenThrough) {
  WriteText("/var/lib/target", "precious");
  ASSERT_EQ(symlink("/var/lib/target", "/var/lib/files/.a.conf.new"), 0);
  ASSERT_EQ(Put(path_, "new"), 0);
  EXPECT_EQ(ReadText("/var/lib/target"), "precious");
  EXPECT_EQ(ReadText(path_), "new");
}

TEST_F(AtomicFile, WaitsForAWriterAndGivesUpAtTheLimit) {
  vornhost::UniqueFd folder(open("/var/lib/files", O_RDONLY | O_DIRECTORY | O_CLOEXEC));
  ASSERT_EQ(flock(folder.Get(), LOCK_EX), 0);
  EXPECT_LT(Put(path_, "new", std::chrono::milliseconds(50)), 0);
  EXPECT_EQ(QARDCErrGet(), QARDC_ERR_TIMEOUT);
  EXPECT_THAT(NamesIn("/var/lib/files"), IsEmpty());

  std::thread release([&folder] {
    std::this_thread::sleep_for(std::chrono::milliseconds(100));
    folder.Reset();
  });
  EXPECT_EQ(Put(path_, "new"), 0);
  release.join();
  EXPECT_EQ(ReadText(path_), "new");
}

// A small file system of its own.
class SmallFileSystem : public testing::Test {
protected:
  void SetUp() override {
    hosttest::FreshFolder(kFolder);
    ASSERT_EQ(mount("tmpfs", kFolder, "tmpfs", 0, "size=64k"), 0);
    WriteText(path_, "k=old\n");
  }
  void TearDown() override { EXPECT_EQ(umount(kFolder), 0); }

  static constexpr const char *kFolder = "/var/lib/small";
  const std::string path_ = std::string(kFolder) + "/a.conf";
};

TEST_F(SmallFileSystem, ReadOnlyLeavesTheOldFile) {
  ASSERT_EQ(mount(nullptr, kFolder, nullptr, MS_REMOUNT | MS_RDONLY, nullptr), 0);
  EXPECT_LT(QARDCFileSetKeyValue(path_.c_str(), "k", "new", "%s=%s\n"), 0);
  EXPECT_EQ(QARDCErrGet(), QARDC_ERR_ACCESS);
  EXPECT_EQ(QARDCFileSetKeyValue(path_.c_str(), "k", "old", "%s=%s\n"), 0); // nothing to do
  EXPECT_LT(QARDCSysUnlink(path_.c_str()), 0);
  EXPECT_EQ(ReadText(path_), "k=old\n");
  EXPECT_THAT(NamesIn(kFolder), ElementsAre("a.conf"));
}

TEST_F(SmallFileSystem, FullLeavesTheOldFileAndNothingBeside) {
  const std::string value(100000, 'x');
  EXPECT_LT(QARDCFileSetKeyValue(path_.c_str(), "k", value.c_str(), "%s=%s\n"), 0);
  EXPECT_EQ(QARDCErrGet(), QARDC_ERR_IO);
  EXPECT_EQ(ReadText(path_), "k=old\n");
  EXPECT_THAT(NamesIn(kFolder), ElementsAre("a.conf"));

  WriteText(std::string(kFolder) + "/filler", std::string(64 * 1024, 'x'));
  EXPECT_LT(QARDCFileSetKeyValue(path_.c_str(), "k", "new", "%s=%s\n"), 0);
  EXPECT_EQ(ReadText(path_), "k=old\n");
  EXPECT_LT(QARDCFileSetKeyValue((std::string(kFolder) + "/b.conf").c_str(), "k", "new", "%s=%s\n"), 0);
  EXPECT_THAT(NamesIn(kFolder), ElementsAre("a.conf", "filler"));
}

TEST_F(AtomicFile, TestsTellWhatIsThere) {
  WriteText(path_, "");
  ASSERT_EQ(symlink("/nowhere", "/var/lib/files/dangling"), 0);
  ASSERT_EQ(symlink("/var/lib/files", "/var/lib/files/loop"), 0);
  EXPECT_EQ(QARDCFileExist(path_.c_str()), 1);
  EXPECT_EQ(QARDCFileExist("/var/lib/files"), 1);
  EXPECT_EQ(QARDCFileExist("/var/lib/files/dangling"), 1);
  EXPECT_EQ(QARDCFileExist("/var/lib/files/absent"), 0);
  EXPECT_EQ(QARDCFileExist("/var/lib/files/a.conf/x"), 0);
  EXPECT_EQ(QARDCFileExist(""), 0);
  EXPECT_EQ(QARDCFileExist(nullptr), 0);
  EXPECT_EQ(QARDCFileCheckDir("/var/lib/files"), 1);
  EXPECT_EQ(QARDCFileCheckDir("/var/lib/files/loop"), 1);
  EXPECT_EQ(QARDCFileCheckDir("/var/lib/files/dangling"), 0);
  EXPECT_EQ(QARDCFileCheckDir(path_.c_str()), 0);
  EXPECT_EQ(QARDCFileCheckDir("/var/lib/absent"), 0);
  EXPECT_EQ(QARDCFileCheckDir(nullptr), 0);
}

TEST_F(AtomicFile, UnlinkRemovesTheNameAndAbsenceIsNoError) {
  WriteText(path_, "x");
  ASSERT_EQ(symlink(path_.c_str(), "/var/lib/files/link"), 0);
  EXPECT_EQ(QARDCSysUnlink("/var/lib/files/link"), 0);
  EXPECT_EQ(ReadText(path_), "x");
  EXPECT_EQ(QARDCSysUnlink(path_.c_str()), 0);
  EXPECT_EQ(QARDCSysUnlink(path_.c_str()), 0);
  EXPECT_EQ(QARDCSysUnlink("/var/lib/absent/file"), 0);
  EXPECT_THAT(NamesIn("/var/lib/files"), IsEmpty());
  EXPECT_LT(QARDCSysUnlink("/var/lib/files"), 0);
  EXPECT_EQ(QARDCFileCheckDir("/var/lib/files"), 1);
  EXPECT_LT(QARDCSysUnlink(nullptr), 0);
  EXPECT_EQ(QARDCErrGet(), QARDC_ERR_BAD_ARGUMENT);
  EXPECT_LT(QARDCSysUnlink(""), 0);
}

} // namespace
