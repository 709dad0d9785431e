// What each operation answers while the database file cannot be used as it should: one test for
// each row of the table in docs/reliability.md.
#include <fcntl.h>
#include <json/value.h>
#include <sys/mount.h>
#include <sys/resource.h>
#include <sys/stat.h>
#include <tuvosharing/entry_db.h>
#include <tuvosharing/sharing_db.h>
#include <unistd.h>

#include <cstdio>
#include <filesystem>
#include <fstream>
#include <functional>
#include <string>

#include "db/test_files.h"
#include "faults/fault_points.h"
#include "login/visit.h"

namespace tuvo_test {
namespace {

using TUVO::sharing::db::EntryDB;
using TUVO::sharing::db::SharingDB;
using TUVO::sharing::record::Entry;

constexpr char kFill[] = "/usr/tuvo/etc/private/session/fill";
constexpr char kSmall[] = "size=512k,mode=0711,uid=1,gid=1";

class UnusableFile : public VisitTest {
 protected:
  UnusableFile() {
    hash_ = MakeLink();
    MakeLink([](Entry& entry) { entry.set_expire_at(1); });  // 2, for the purge
    MakeLink();                                              // 3, to be deleted
    id_ = LoggedIn(Visit(hash_));
  }
  ~UnusableFile() override {
    if (mounted_) {
      umount2(kFolder, MNT_DETACH);
    }
  }

  // Moves the file onto a small file system of its own.
  void MoveToSmallFileSystem() {
    const std::string bytes = ReadFile(kDatabase);
    if (mount("none", kFolder, "tmpfs", 0, kSmall) != 0) {
      GTEST_SKIP() << "no tmpfs can be mounted here";
    }
    mounted_ = true;
    WriteFile(kDatabase, bytes);
    GiveToSystem(kDatabase);
  }

  static void GiveToSystem(const char* path) {
    ASSERT_EQ(0, chown(path, 1, 1));
    ASSERT_EQ(0, chmod(path, 0660));
  }

  static void FillFileSystem() {
    const int fd = open(kFill, O_CREAT | O_WRONLY | O_CLOEXEC, 0600);
    const std::string bytes(512, 'x');
    while (write(fd, bytes.data(), bytes.size()) > 0) {
    }
    close(fd);
  }

  // A connection's own file of changes is cut off, so that each write needs room.
  static void CutLog() { SqliteFile(kDatabase).Execute("PRAGMA wal_checkpoint(TRUNCATE)"); }

  // The answers of every operation in a process that opens the file now; `meanwhile` happens
  // between the opening and the rest.
  void ExpectAnswers(
      const std::string& answers, const std::function<void()>& meanwhile = [] {}) {
    const Visit visit = Visit(hash_).Session(id_);
    InChild([&] {
      visit.EnterEnvironment();
      TakeLogged();
      SharingDB& db = SharingDB::Instance();
      std::string found = db.IsGood() ? "opens" : "not good";
      EXPECT_TRUE(db.IsGood() || !TakeLogged().empty());
      meanwhile();
      found += AnswersOf(db, visit);
      EXPECT_EQ(answers, found);
      EXPECT_EQ(ToText(kRoot), ToText(CurrentIds()));
    });
  }

  // That a process which opens the file now works, and has the link.
  void ExpectUsable() {
    EXPECT_EQ(1, Check(Visit(hash_).Session(id_)).code);
    EXPECT_EQ(1, Login(Visit(hash_)).code);
  }

  std::string hash_;
  std::string id_;

 private:
  static std::string Bool(const char* name, bool answer) {
    return std::string(", ") + name + (answer ? " true" : " false");
  }

  std::string AnswersOf(SharingDB& db, const Visit& visit) const {
    std::string session_id;
    _tag_sharing_login_params params = visit.Params();
    params.sharing_sid = nullptr;
    std::string found =
        ", login " + std::to_string(TUVO::TuvoSharingLogin(session_id, &params, true));
    const _tag_sharing_login_params request = visit.Params();
    found += ", check " + std::to_string(TUVO::TuvoSharingIsAuthorized(&request));
    found += Bool("logout", TUVO::TuvoSharingLogout(hash_, id_));
    found += Bool("count", TUVO::TuvoSharingIncreaseUseCount(hash_));
    EntryDB entries(db);
    Entry entry;
    entry.set_project_name("photo").set_owner_uid(kAlice).set_app(Json::objectValue);
    found += Bool("create", entries.CreateWithHash(entry));
    Entry link;
    link.set_project_name("photo").set_owner_uid(kAlice).set_app(Json::objectValue);
    link.set_hash(hash_).set_id(1);
    found += Bool("update", entries.Update(link));
    std::vector<Entry> links;
    const bool queried = entries.Query(links);
    found += Bool("query", queried);
    found += Bool("purge", entries.PurgeExpired(1));
    found += Bool("checkpoint", db.ExecuteWALCheckPoint());
    found += Bool("delete", entries.Delete(3));
    return found;
  }

  bool mounted_ = false;
};

constexpr char kNothingWorks[] =
    ", login -4, check -4, logout false, count false, create false, update false, query false, "
    "purge false, checkpoint false, delete false";
constexpr char kAllWorks[] =
    ", login 1, check 1, logout true, count true, create true, update true, query true, "
    "purge true, checkpoint true, delete true";

TEST_F(UnusableFile, NoneOfIt) {
  ExpectAnswers(std::string("opens") + kAllWorks);
}

TEST_F(UnusableFile, FullDiskAtTheFirstOpen) {
  MoveToSmallFileSystem();
  if (IsSkipped()) {
    return;
  }
  FillFileSystem();
  ExpectAnswers(std::string("not good") + kNothingWorks);
  unlink(kFill);
  ExpectUsable();
}

TEST_F(UnusableFile, DiskFillsUp) {
  MoveToSmallFileSystem();
  if (IsSkipped()) {
    return;
  }
  ExpectAnswers(
      "opens, login -4, check -4, logout false, count false, create false, update false, query "
      "true, purge false, checkpoint true, delete false",
      [] {
        CutLog();
        FillFileSystem();
      });
  unlink(kFill);
  ExpectUsable();
}

TEST_F(UnusableFile, ReadOnlyFileSystemAtTheFirstOpen) {
  MoveToSmallFileSystem();
  if (IsSkipped()) {
    return;
  }
  ASSERT_EQ(0, mount("none", kFolder, "tmpfs", MS_REMOUNT | MS_RDONLY, kSmall));
  ExpectAnswers(std::string("not good") + kNothingWorks);
  ASSERT_EQ(0, mount("none", kFolder, "tmpfs", MS_REMOUNT, kSmall));
  ExpectUsable();
}

TEST_F(UnusableFile, NoFolder) {
  std::filesystem::rename(kFolder, "/usr/tuvo/etc/private/elsewhere");
  ExpectAnswers(std::string("not good") + kNothingWorks);
  std::filesystem::rename("/usr/tuvo/etc/private/elsewhere", kFolder);
  ExpectUsable();
}

TEST_F(UnusableFile, FolderOfAnotherOwner) {
  ASSERT_EQ(0, chown(kFolder, 0, 0));
  ASSERT_EQ(0, chmod(kFolder, 0700));
  ExpectAnswers(std::string("not good") + kNothingWorks);
  ASSERT_EQ(0, chmod(kFolder, 0711));
  ASSERT_EQ(0, chown(kFolder, 1, 1));
  ExpectUsable();
}

TEST_F(UnusableFile, FileOfAnotherOwner) {
  ASSERT_EQ(0, chown(kDatabase, kAlice, kAlice));
  ASSERT_EQ(0, chmod(kDatabase, 0600));
  ExpectAnswers(std::string("not good") + kNothingWorks);
  GiveToSystem(kDatabase);
  ExpectUsable();
}

// The next process makes a new file; what was in it lies in /tmp and can be put back.
TEST_F(UnusableFile, FileOfRoot) {
  ASSERT_EQ(0, chown(kDatabase, 0, 0));
  ASSERT_EQ(0, chmod(kDatabase, 0600));
  ExpectAnswers(
      "not good, login -4, check -5, logout false, count false, create false, update false, query "
      "false, purge false, checkpoint false, delete false");
  ASSERT_TRUE(Exists(kMovedDatabase));
  ASSERT_FALSE(Exists(kDatabase));
  std::filesystem::copy(kMovedDatabase, kDatabase);
  GiveToSystem(kDatabase);
  ExpectUsable();
}

// What SQLite makes beside the file has the file's mode, and is to be mended with it.
TEST_F(UnusableFile, FileThatMayOnlyBeRead) {
  ASSERT_EQ(0, chmod(kDatabase, 0440));
  ExpectAnswers(
      "opens, login -4, check -4, logout false, count false, create false, update false, query "
      "true, purge false, checkpoint true, delete false");
  GiveToSystem(kDatabase);
  for (const char* suffix : {"-wal", "-shm"}) {
    const std::string companion = std::string(kDatabase) + suffix;
    if (Exists(companion)) {
      GiveToSystem(companion.c_str());
    }
  }
  ExpectUsable();
}

#ifdef __SANITIZE_ADDRESS__
constexpr bool kSanitized = true;
#else
constexpr bool kSanitized = false;
#endif
constexpr char kChecksNeedDescriptors[] = "the sanitizers' own checks need descriptors";

void AllowDescriptors(rlim_t count) {
  rlimit limit{};
  getrlimit(RLIMIT_NOFILE, &limit);
  limit.rlim_cur = count;
  setrlimit(RLIMIT_NOFILE, &limit);
}

TEST_F(UnusableFile, NoDescriptorsLeftAtTheFirstOpen) {
  if (kSanitized) {
    GTEST_SKIP() << kChecksNeedDescriptors;
  }
  rlimit usual{};
  ASSERT_EQ(0, getrlimit(RLIMIT_NOFILE, &usual));
  AllowDescriptors(3);
  ExpectAnswers(std::string("not good") + kNothingWorks);
  AllowDescriptors(usual.rlim_cur);
  ExpectUsable();
}

// What a connection needs it has had since it was opened.
TEST_F(UnusableFile, DescriptorsRunOut) {
  if (kSanitized) {
    GTEST_SKIP() << kChecksNeedDescriptors;
  }
  ExpectAnswers(std::string("opens") + kAllWorks, [] { AllowDescriptors(3); });
}

TEST_F(UnusableFile, CorruptHeader) {
  const std::string bytes = ReadFile(kDatabase);
  WriteFile(kDatabase, std::string(100, '\xa5') + bytes.substr(100));
  ExpectAnswers(std::string("not good") + kNothingWorks);
  WriteFile(kDatabase, bytes);
  ExpectUsable();
}

TEST_F(UnusableFile, CorruptPageOfTheLinks) {
  const std::string bytes = ReadFile(kDatabase);
  const size_t page = std::stoul(Value("SELECT rootpage FROM sqlite_master WHERE name = 'entry'"));
  const size_t size = std::stoul(Value("PRAGMA page_size"));
  std::string broken = bytes;
  broken.replace((page - 1) * size, size, size, '\xa5');
  WriteFile(kDatabase, broken);
  ExpectAnswers(
      "opens, login -3, check -7, logout false, count false, create false, update false, query "
      "false, purge false, checkpoint true, delete false");
  WriteFile(kDatabase, bytes);
  ExpectUsable();
}

TEST_F(UnusableFile, NoDatabase) {
  const std::string bytes = ReadFile(kDatabase);
  WriteFile(kDatabase, std::string(20000, 'x'));
  ExpectAnswers(std::string("not good") + kNothingWorks);
  WriteFile(kDatabase, bytes);
  ExpectUsable();
}

TEST_F(UnusableFile, TablesMissing) {
  Change("PRAGMA foreign_keys = OFF; DROP TABLE token; DROP TABLE session; DROP TABLE entry");
  ExpectAnswers(
      "opens, login -3, check -5, logout false, count false, create false, update false, query "
      "false, purge false, checkpoint true, delete false");
}

TEST_F(UnusableFile, AnotherColumn) {
  Change("ALTER TABLE entry ADD COLUMN colour TEXT");
  ExpectAnswers(
      "opens, login 1, check 1, logout true, count true, create false, update true, query true, "
      "purge true, checkpoint true, delete true");
}

TEST_F(UnusableFile, ColumnMissing) {
  Change("ALTER TABLE session RENAME COLUMN timeout TO ends");
  ExpectAnswers(
      "opens, login -4, check -1, logout false, count true, create true, update true, query true, "
      "purge true, checkpoint true, delete true");
}

TEST_F(UnusableFile, NewerVersion) {
  Change("PRAGMA user_version = 3");
  ExpectAnswers(std::string("opens") + kAllWorks);
  EXPECT_EQ("3", Value("PRAGMA user_version"));
}

}  // namespace
}  // namespace tuvo_test
