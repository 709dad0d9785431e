// A link's rules, its protection, and its forms as a row and as JSON.
#include <internal/entry_private.h>
#include <linux/filter.h>
#include <linux/seccomp.h>
#include <sys/prctl.h>
#include <sys/syscall.h>
#include <tuvosharing/sharing_db.h>
#include <tuvosharing/utils.h>

#include <cerrno>
#include <climits>
#include <cstddef>
#include <set>

#include "record/record_testing.h"
#include "support/child.h"

namespace {

using TUVO::sharing::Sha1WithSaltHashPassword;
using TUVO::sharing::db::Row;
using TUVO::sharing::db::SharingDB;
using TUVO::sharing::record::Entry;
using tuvo_test::Contents;
using tuvo_test::DataOf;
using tuvo_test::ExpectFailed;
using tuvo_test::FetchedRow;
using tuvo_test::FullEntry;
using tuvo_test::LegalEntry;
using tuvo_test::ParseJson;
using tuvo_test::Quoted;
using tuvo_test::RunInChild;
using tuvo_test::ScopedLine;
using tuvo_test::ScopedZone;
using tuvo_test::SelectedRow;
using tuvo_test::SyslogListener;
using tuvo_test::WithinOneSecond;

using Texts = std::vector<std::string>;
using Ids = std::vector<unsigned int>;

constexpr unsigned int kNobody = 4294967295U;
constexpr char kLegalData[] = R"({"protect_type":"none","redirect_type":"none","app":{}})";

constexpr char kNoHash[] = "\"\" == hash_";
constexpr char kNoProject[] = "\"\" == project_name_";
constexpr char kNoOwner[] = "UID_ERR == owner_uid_";
constexpr char kBadApp[] = "! app_.isObject()";
constexpr char kBadPrivateData[] = "! private_data_.isObject()";
constexpr char kNoPassword[] =
    "Entry::PROTECT_PASSWORD == protect_type_ && \"\" == protect_password_";
constexpr char kNoSalt[] =
    "Entry::PROTECT_PASSWORD == protect_type_ && "
    "Entry::ENCRYPT_ALGO_DEFAULT == protect_password_algo_ && \"\" == protect_password_salt_";
constexpr char kNobodyAdmitted[] =
    "Entry::PROTECT_USER == protect_type_ && (0 == protect_uids_.size() + "
    "protect_extra_users_.size() + protect_gids_.size() + protect_extra_groups_.size())";
constexpr char kFailedHashing[] = "!blValid_";
constexpr char kIllegal[] = "! IsLegal()";
constexpr char kDisabled[] = "! enabled_";
constexpr char kNotStarted[] = "0 < start_at_ && start_at_ > timeNow";
constexpr char kExpired[] = "0 < expire_at_ && timeNow > expire_at_";
constexpr char kUsedUp[] = "0 < expire_times_ && use_count_ > expire_times_";

// From here on the kernel's random generator fails. False when this machine does not allow that.
bool BreakRandomSource() {
  sock_filter filter[] = {
      BPF_STMT(BPF_LD | BPF_W | BPF_ABS, offsetof(seccomp_data, nr)),
      BPF_JUMP(BPF_JMP | BPF_JEQ | BPF_K, __NR_getrandom, 0, 1),
      BPF_STMT(BPF_RET | BPF_K, SECCOMP_RET_ERRNO | EIO),
      BPF_STMT(BPF_RET | BPF_K, SECCOMP_RET_ALLOW),
  };
  const sock_fprog program{sizeof filter / sizeof *filter, filter};
  return prctl(PR_SET_NO_NEW_PRIVS, 1, 0, 0, 0) == 0 &&
         prctl(PR_SET_SECCOMP, SECCOMP_MODE_FILTER, &program) == 0;
}

// The columns of a row that loads as a legal link, but for those given.
std::string Columns(const std::string& replaced, const std::string& by) {
  std::string columns;
  const std::vector<std::pair<std::string, std::string>> all{
      {"id", "5"},         {"hash", "'h'"},    {"project_name", "'p'"},     {"enabled", "1"},
      {"owner_uid", "7"},  {"start_at", "11"}, {"expire_at", "12"},         {"expire_times", "13"},
      {"use_count", "14"}, {"auto_gc", "1"},   {"data", Quoted(kLegalData)}};
  for (const auto& [name, value] : all) {
    const bool replace = name == replaced;
    if (!replace || !by.empty()) {
      columns += (columns.empty() ? "" : ", ") + (replace ? by : value) + " AS " + name;
    }
  }
  return columns;
}

Entry Load(const std::string& replaced, const std::string& by) {
  Entry entry = FullEntry();
  entry.FromRow(SelectedRow(Columns(replaced, by)));
  return entry;
}

// ---- Whether it may be stored

TEST(EntryLegality, OfADefaultLinkFailsForTheHash) {
  SyslogListener log;
  errno = 0;
  EXPECT_FALSE(Entry().IsLegal());
  ExpectFailed(log, "entry", {kNoHash});
}

TEST(EntryLegality, OfALinkThatHasEverythingLogsNothing) {
  SyslogListener log;
  EXPECT_TRUE(LegalEntry().IsLegal());
  EXPECT_TRUE(FullEntry().IsLegal());
  EXPECT_TRUE(LegalEntry().GetCObject().IsLegal());
  EXPECT_TRUE(log.Take().empty());
}

// Everything is wrong at first; what the log names is put right one by one.
TEST(EntryLegality, IsDecidedByTheFirstFailingCheck) {
  SyslogListener log;
  errno = 0;
  const auto expect = [&log](const Entry& entry, const char* condition) {
    EXPECT_FALSE(entry.IsLegal());
    ExpectFailed(log, "entry", {condition});
  };
  Entry entry;
  entry.set_private_data(Json::Value("text")).set_protect_type(Entry::PROTECT_PASSWORD);
  entry.set_protect_password("", true, Entry::ENCRYPT_ALGO_MD5);
  expect(entry, kFailedHashing);
  entry.set_protect_password("", false, Entry::ENCRYPT_ALGO_DEFAULT);
  expect(entry, kNoHash);
  entry.set_hash("h");
  expect(entry, kNoProject);
  entry.set_project_name("p");
  expect(entry, kNoOwner);
  entry.set_owner_uid(0);
  expect(entry, kBadApp);
  entry.set_app(Json::Value(Json::objectValue));
  expect(entry, kBadPrivateData);
  entry.set_private_data(Json::Value(Json::objectValue));
  expect(entry, kNoPassword);
  entry.set_protect_password("digest", false, Entry::ENCRYPT_ALGO_DEFAULT);
  expect(entry, kNoSalt);
  entry.set_protect_type(Entry::PROTECT_USER);
  expect(entry, kNobodyAdmitted);
  entry.set_protect_uids({0});
  EXPECT_TRUE(entry.IsLegal());
  EXPECT_TRUE(log.Take().empty());
}

TEST(EntryLegality, NeedsObjectsAsBothDocuments) {
  SyslogListener log;
  errno = 0;
  for (const char* text : {"null", "[]", "[{}]", "\"{}\"", "1", "true", "1.5"}) {
    EXPECT_FALSE(LegalEntry().set_app(ParseJson(text)).IsLegal()) << text;
    ExpectFailed(log, "entry", {kBadApp});
    EXPECT_FALSE(LegalEntry().set_private_data(ParseJson(text)).IsLegal()) << text;
    ExpectFailed(log, "entry", {kBadPrivateData});
  }
}

TEST(EntryLegality, OfAPasswordLinkNeedsASaltForTheDefaultAlgorithmOnly) {
  SyslogListener log;
  errno = 0;
  Entry entry = LegalEntry();
  entry.set_protect_type(Entry::PROTECT_PASSWORD);
  entry.set_protect_password("digest", false, Entry::ENCRYPT_ALGO_MD5);
  EXPECT_TRUE(entry.IsLegal());
  entry.set_protect_password("digest", false, Entry::ENCRYPT_ALGO_DEFAULT);
  EXPECT_FALSE(entry.IsLegal());
  ExpectFailed(log, "entry", {kNoSalt});
  entry.set_protect_password("secret", true, Entry::ENCRYPT_ALGO_DEFAULT);
  EXPECT_TRUE(entry.IsLegal());
  entry.set_protect_password("digest", false, Entry::ENCRYPT_ALGO_DEFAULT);
  EXPECT_TRUE(entry.IsLegal()) << "the salt is still there";
}

TEST(EntryLegality, OfAPasswordLinkNeedsAPassword) {
  SyslogListener log;
  errno = 0;
  Entry entry = LegalEntry();
  entry.set_protect_type(Entry::PROTECT_PASSWORD);
  for (const auto algo : {Entry::ENCRYPT_ALGO_DEFAULT, Entry::ENCRYPT_ALGO_MD5}) {
    entry.set_protect_password("", false, algo);
    EXPECT_FALSE(entry.IsLegal());
    ExpectFailed(log, "entry", {kNoPassword});
  }
}

TEST(EntryLegality, OfAnAccountLinkNeedsOneOfFourKinds) {
  SyslogListener log;
  errno = 0;
  const auto make = [] { return LegalEntry().set_protect_type(Entry::PROTECT_USER); };
  EXPECT_FALSE(make().IsLegal());
  ExpectFailed(log, "entry", {kNobodyAdmitted});
  EXPECT_TRUE(make().set_protect_uids({2001}).IsLegal());
  EXPECT_TRUE(make().set_protect_users({"nobody-yet"}).IsLegal());
  EXPECT_TRUE(make().set_protect_gids({3001}).IsLegal());
  EXPECT_TRUE(make().set_protect_groups({"no-such-group"}).IsLegal());
  EXPECT_TRUE(log.Take().empty());
}

TEST(EntryLegality, LooksAtProtectionOnlyWhereItApplies) {
  Entry entry = LegalEntry();
  EXPECT_TRUE(entry.set_protect_type(Entry::PROTECT_NONE).IsLegal());
  EXPECT_TRUE(entry.set_protect_type(static_cast<Entry::ProtectType>(3)).IsLegal());
  EXPECT_TRUE(entry.set_protect_type(static_cast<Entry::ProtectType>(-1)).IsLegal());
  entry.set_protect_password("digest", false, Entry::ENCRYPT_ALGO_MD5);
  EXPECT_TRUE(entry.set_protect_type(Entry::PROTECT_PASSWORD).IsLegal()) << "without accounts";
  entry.set_protect_password("", false, Entry::ENCRYPT_ALGO_DEFAULT).set_protect_uids({1});
  EXPECT_TRUE(entry.set_protect_type(Entry::PROTECT_USER).IsLegal()) << "without a password";
}

TEST(EntryLegality, DoesNotDependOnTimesUsesSwitchAndId) {
  Entry entry = LegalEntry();
  entry.set_enabled(false).set_start_at(LONG_MAX).set_expire_at(1).set_expire_times(1);
  entry.set_use_count(2).set_id(-1);
  EXPECT_TRUE(entry.IsLegal());
}

TEST(EntryLegality, LogsTheReasonOfErrnoAndLeavesItAlone) {
  SyslogListener log;
  errno = EACCES;
  EXPECT_FALSE(Entry().IsLegal());
  EXPECT_EQ(errno, EACCES);
  ExpectFailed(log, "entry", {kNoHash}, EACCES);
}

// ---- Whether it may be used now

TEST(EntryValidity, OfAPlainLegalLinkLogsNothing) {
  SyslogListener log;
  EXPECT_TRUE(LegalEntry().IsValid());
  EXPECT_TRUE(log.Take().empty());
}

TEST(EntryValidity, OfAnIllegalLinkFailsWithTwoLines) {
  SyslogListener log;
  errno = EACCES;
  Entry entry;
  entry.set_enabled(false).set_expire_at(1);
  EXPECT_FALSE(entry.IsValid());
  ExpectFailed(log, "entry", {kNoHash, kIllegal}, EACCES);
}

TEST(EntryValidity, IsDecidedByTheFirstFailingCheck) {
  SyslogListener log;
  errno = 0;
  const auto expect = [&log](const Entry& entry, const char* condition) {
    EXPECT_FALSE(entry.IsValid());
    ExpectFailed(log, "entry", {condition});
  };
  Entry entry = LegalEntry();
  entry.set_enabled(false).set_start_at(std::time(nullptr) + 1000).set_expire_at(1);
  entry.set_expire_times(1).set_use_count(2);
  expect(entry, kDisabled);
  entry.set_enabled(true);
  expect(entry, kNotStarted);
  entry.set_start_at(1);
  expect(entry, kExpired);
  entry.set_expire_at(0);
  expect(entry, kUsedUp);
  entry.set_use_count(1);
  EXPECT_TRUE(entry.IsValid());
}

bool IsValidStartingAt(long offset) {
  return WithinOneSecond(
      [&](std::time_t now) { return LegalEntry().set_start_at(now + offset).IsValid(); });
}

bool IsValidExpiringAt(long offset) {
  return WithinOneSecond(
      [&](std::time_t now) { return LegalEntry().set_expire_at(now + offset).IsValid(); });
}

TEST(EntryValidity, BeginsInTheVerySecondOfTheStart) {
  EXPECT_TRUE(IsValidStartingAt(-1));
  EXPECT_TRUE(IsValidStartingAt(0));
  EXPECT_FALSE(IsValidStartingAt(1));
  EXPECT_FALSE(LegalEntry().set_start_at(LONG_MAX).IsValid());
}

TEST(EntryValidity, LastsThroughTheVerySecondOfTheExpiry) {
  EXPECT_FALSE(IsValidExpiringAt(-1));
  EXPECT_TRUE(IsValidExpiringAt(0));
  EXPECT_TRUE(IsValidExpiringAt(1));
  EXPECT_FALSE(LegalEntry().set_expire_at(1).IsValid());
}

TEST(EntryValidity, TakesTimesOfZeroAndBelowAsNotSet) {
  for (const long unset : {0L, -1L, LONG_MIN}) {
    EXPECT_TRUE(LegalEntry().set_start_at(unset).set_expire_at(unset).IsValid()) << unset;
  }
}

TEST(EntryValidity, EndsAboveTheLimitOfUses) {
  const auto valid = [](int limit, int used) {
    return LegalEntry().set_expire_times(limit).set_use_count(used).IsValid();
  };
  EXPECT_TRUE(valid(3, 2));
  EXPECT_TRUE(valid(3, 3));
  EXPECT_FALSE(valid(3, 4));
  EXPECT_TRUE(valid(1, 1));
  EXPECT_FALSE(valid(1, 2));
  EXPECT_TRUE(valid(0, INT_MAX));
  EXPECT_TRUE(valid(-1, INT_MAX));
  EXPECT_TRUE(valid(INT_MAX, INT_MAX));
}

TEST(EntryValidity, EndsWithTheClockAlone) {
  const long end = std::time(nullptr);
  const Entry entry = LegalEntry().set_expire_at(end);
  while (std::time(nullptr) <= end) {
    usleep(10000);
  }
  EXPECT_FALSE(entry.IsValid());
}

// ---- The password

TEST(EntryPassword, OfALinkWithoutPasswordProtectionIsAnyText) {
  Entry entry = LegalEntry();
  entry.set_protect_password("secret", true, Entry::ENCRYPT_ALGO_DEFAULT);
  for (const int type : {0, 2, 3, -1, 1000}) {
    entry.set_protect_type(static_cast<Entry::ProtectType>(type));
    EXPECT_TRUE(entry.IsPasswordValid(""));
    EXPECT_TRUE(entry.IsPasswordValid("wrong"));
    EXPECT_TRUE(entry.IsPasswordValid("secret"));
  }
  EXPECT_TRUE(Entry().IsPasswordValid(""));
}

TEST(EntryPassword, IsAcceptedUnderBothAlgorithmsAndNoOtherIs) {
  Entry entry = LegalEntry().set_protect_type(Entry::PROTECT_PASSWORD);
  for (const auto algo : {Entry::ENCRYPT_ALGO_DEFAULT, Entry::ENCRYPT_ALGO_MD5}) {
    entry.set_protect_password("secret", true, algo);
    EXPECT_EQ(entry.get_protect_password_algo(), algo);
    EXPECT_TRUE(entry.IsPasswordValid("secret"));
    for (const char* wrong : {"", "Secret", "secre", "secret ", "secrets", "geheim"}) {
      EXPECT_FALSE(entry.IsPasswordValid(wrong)) << wrong;
    }
    EXPECT_FALSE(entry.IsPasswordValid(entry.get_protect_password())) << "the digest itself";
    EXPECT_TRUE(entry.IsLegal());
  }
}

TEST(EntryPassword, IsKeptAsItsDigest) {
  Entry entry;
  entry.set_protect_password("abc", true, Entry::ENCRYPT_ALGO_MD5);
  EXPECT_EQ(entry.get_protect_password(), "900150983cd24fb0d6963f7d28e17f72");
  entry.set_protect_password("abc", true, Entry::ENCRYPT_ALGO_DEFAULT);
  std::string digest;
  ASSERT_TRUE(Sha1WithSaltHashPassword("abc", entry.get_protect_password_salt(), digest));
  EXPECT_EQ(entry.get_protect_password(), digest);
  EXPECT_EQ(digest.size(), 40U);
}

// "abc" digested by other means: the salt stands behind the password.
TEST(EntryPassword, OfAStoredLinkIsCheckedWithTheStoredSalt) {
  const std::string data = Quoted(
      R"({"protect_type":"password","protect_password_algo":"default","redirect_type":"none",)"
      R"("protect_password":"a9993e364706816aba3e25717850c26c9cd0d89d",)"
      R"("protect_password_salt":"c","app":{}})");
  const Entry entry = Load("data", data);
  EXPECT_TRUE(entry.IsPasswordValid("ab"));
  EXPECT_FALSE(entry.IsPasswordValid("abc"));
  EXPECT_FALSE(entry.IsPasswordValid("a"));
}

TEST(EntryPassword, GetsAFreshSaltEachTime) {
  Entry entry = LegalEntry().set_protect_type(Entry::PROTECT_PASSWORD);
  std::set<std::string> salts;
  std::set<std::string> digests;
  for (int i = 0; i < 50; ++i) {
    entry.set_protect_password("secret", true, Entry::ENCRYPT_ALGO_DEFAULT);
    EXPECT_TRUE(entry.IsPasswordValid("secret"));
    const std::string salt = entry.get_protect_password_salt();
    EXPECT_EQ(salt.size(), 6U);
    EXPECT_TRUE(std::all_of(salt.begin(), salt.end(), [](unsigned char c) {
      return c < 128 && std::isalnum(c) != 0;
    })) << salt;
    salts.insert(salt);
    digests.insert(entry.get_protect_password());
  }
  EXPECT_EQ(salts.size(), 50U);
  EXPECT_EQ(digests.size(), 50U);
}

TEST(EntryPassword, UnderMd5LeavesTheSaltAlone) {
  Entry entry;
  entry.set_protect_password("abc", true, Entry::ENCRYPT_ALGO_MD5);
  EXPECT_EQ(entry.get_protect_password_salt(), "");
  entry.set_protect_password("abc", true, Entry::ENCRYPT_ALGO_DEFAULT);
  const std::string salt = entry.get_protect_password_salt();
  entry.set_protect_password("abc", true, Entry::ENCRYPT_ALGO_MD5);
  EXPECT_EQ(entry.get_protect_password_salt(), salt);
  EXPECT_EQ(entry.get_protect_password(), "900150983cd24fb0d6963f7d28e17f72");
}

TEST(EntryPassword, GivenAsADigestIsKeptUnchangedWithTheSaltThatWasThere) {
  for (const auto algo : {Entry::ENCRYPT_ALGO_DEFAULT, Entry::ENCRYPT_ALGO_MD5}) {
    Entry entry = LegalEntry();
    entry.set_protect_password("drawn for its salt", true, Entry::ENCRYPT_ALGO_DEFAULT);
    const std::string salt = entry.get_protect_password_salt();
    const std::string odd("not a digest\0\xff'", 15);
    entry.set_protect_password(odd, false, algo);
    EXPECT_EQ(entry.get_protect_password(), odd);
    EXPECT_EQ(entry.get_protect_password_salt(), salt);
    EXPECT_EQ(entry.get_protect_password_algo(), algo);
    EXPECT_TRUE(entry.IsLegal());
  }
}

TEST(EntryPassword, IsComparedWithItsCase) {
  Entry entry = LegalEntry().set_protect_type(Entry::PROTECT_PASSWORD);
  entry.set_protect_password("900150983CD24FB0D6963F7D28E17F72", false, Entry::ENCRYPT_ALGO_MD5);
  EXPECT_FALSE(entry.IsPasswordValid("abc"));
  entry.set_protect_password("900150983cd24fb0d6963f7d28e17f72", false, Entry::ENCRYPT_ALGO_MD5);
  EXPECT_TRUE(entry.IsPasswordValid("abc"));
}

TEST(EntryPassword, DoesNotMatchADigestCutShortOrContinued) {
  Entry entry = LegalEntry().set_protect_type(Entry::PROTECT_PASSWORD);
  for (const char* digest :
       {"900150983cd24fb0d6963f7d28e17f7", "900150983cd24fb0d6963f7d28e17f720",
        "900150983cd24fb0d6963f7d28e17f73", "800150983cd24fb0d6963f7d28e17f72", ""}) {
    entry.set_protect_password(digest, false, Entry::ENCRYPT_ALGO_MD5);
    EXPECT_FALSE(entry.IsPasswordValid("abc")) << digest;
  }
}

TEST(EntryPassword, ThatIsEmptyIsRefusedUnderMd5AndTakenUnderTheDefault) {
  Entry entry = LegalEntry().set_protect_type(Entry::PROTECT_PASSWORD);
  entry.set_protect_password("", false, Entry::ENCRYPT_ALGO_MD5);
  EXPECT_FALSE(entry.IsPasswordValid("")) << "no digest, although both are empty";
  entry.set_protect_password("", true, Entry::ENCRYPT_ALGO_DEFAULT);
  EXPECT_TRUE(entry.IsLegal());
  EXPECT_TRUE(entry.IsPasswordValid(""));
  EXPECT_FALSE(entry.IsPasswordValid("x"));
}

TEST(EntryPassword, MayHoldAnyByte) {
  Entry entry = LegalEntry().set_protect_type(Entry::PROTECT_PASSWORD);
  const std::string password("a\0b\xff\n", 5);
  for (const auto algo : {Entry::ENCRYPT_ALGO_DEFAULT, Entry::ENCRYPT_ALGO_MD5}) {
    entry.set_protect_password(password, true, algo);
    EXPECT_TRUE(entry.IsPasswordValid(password));
    EXPECT_FALSE(entry.IsPasswordValid("a"));
    EXPECT_FALSE(entry.IsPasswordValid(std::string("a\0c\xff\n", 5)));
  }
}

TEST(EntryPassword, OfAnyOtherAlgorithmIsMd5) {
  const auto other = static_cast<Entry::PasswordEncryptAlgo>(2);
  Entry entry = LegalEntry().set_protect_type(Entry::PROTECT_PASSWORD);
  entry.set_protect_password("abc", true, other);
  EXPECT_EQ(entry.get_protect_password(), "900150983cd24fb0d6963f7d28e17f72");
  EXPECT_EQ(entry.get_protect_password_algo(), other);
  EXPECT_EQ(entry.get_protect_password_salt(), "");
  EXPECT_TRUE(entry.IsLegal());
  EXPECT_TRUE(entry.IsPasswordValid("abc"));
  EXPECT_EQ(DataOf(entry)["protect_password_algo"], Json::Value("md5"));
}

TEST(EntryPassword, ThatCannotBeHashedLeavesTheLinkIllegalUntilALaterSuccess) {
  SyslogListener log;
  errno = 0;
  Entry entry = LegalEntry();
  entry.set_protect_password("before", true, Entry::ENCRYPT_ALGO_DEFAULT);
  const std::string salt = entry.get_protect_password_salt();
  entry.set_protect_password("", true, Entry::ENCRYPT_ALGO_MD5);
  EXPECT_EQ(entry.get_protect_password(), "");
  EXPECT_EQ(entry.get_protect_password_algo(), Entry::ENCRYPT_ALGO_MD5);
  EXPECT_EQ(entry.get_protect_password_salt(), salt);
  EXPECT_FALSE(entry.IsLegal()) << "although not even protected by it";
  ExpectFailed(log, "entry", {kFailedHashing});
  EXPECT_FALSE(entry.IsValid());
  ExpectFailed(log, "entry", {kFailedHashing, kIllegal});
  EXPECT_FALSE(Entry(entry).IsLegal()) << "nor is a copy";
  ExpectFailed(log, "entry", {kFailedHashing});

  for (int way = 0; way < 3; ++way) {
    Entry again = entry;
    again.set_protect_password("after", way != 0,
                               way == 1 ? Entry::ENCRYPT_ALGO_DEFAULT : Entry::ENCRYPT_ALGO_MD5);
    EXPECT_TRUE(again.IsLegal()) << way;
  }
}

TEST(EntryPassword, ThatCouldNotBeHashedIsNotForgottenByLoadingARow) {
  SyslogListener log;
  errno = 0;
  Entry entry;
  entry.set_protect_password("", true, Entry::ENCRYPT_ALGO_MD5);
  EXPECT_FALSE(entry.FromRow(SelectedRow(Columns("", ""))));
  ExpectFailed(log, "entry", {kFailedHashing});
  EXPECT_EQ(entry.get_hash(), "h");
}

TEST(EntryPassword, IsNotSetWhenNoSaltCanBeDrawn) {
  SyslogListener log;
  const int status = RunInChild([] {
    Entry entry = LegalEntry().set_protect_type(Entry::PROTECT_PASSWORD);
    entry.set_protect_password("before", true, Entry::ENCRYPT_ALGO_MD5);
    if (!BreakRandomSource()) {
      return 77;
    }
    entry.set_protect_password("secret", true, Entry::ENCRYPT_ALGO_DEFAULT);
    EXPECT_EQ(entry.get_protect_password(), "");
    EXPECT_EQ(entry.get_protect_password_algo(), Entry::ENCRYPT_ALGO_DEFAULT);
    EXPECT_FALSE(entry.IsLegal());
    EXPECT_FALSE(entry.IsPasswordValid("secret"));
    EXPECT_FALSE(entry.IsPasswordValid(""));
    entry.set_protect_password("secret", true, Entry::ENCRYPT_ALGO_MD5);
    EXPECT_TRUE(entry.IsLegal());
    EXPECT_TRUE(entry.IsPasswordValid("secret"));
    return 0;
  });
  if (status == 77) {
    GTEST_SKIP() << "this machine allows no system call filter";
  }
  EXPECT_EQ(status, 0);
  ExpectFailed(log, "entry", {kFailedHashing}, EIO, tuvo_test::LastChild());
}

// ---- Owner, users and groups

TEST(EntryOwner, IsKnownByNameAndById) {
  Entry entry;
  EXPECT_EQ(&entry.set_owner_user("alice"), &entry);
  EXPECT_EQ(entry.get_owner_uid(), 2001U);
  EXPECT_EQ(entry.get_owner_user(), "alice");
  EXPECT_EQ(entry.set_owner_uid(2002).get_owner_user(), "bob");
  EXPECT_EQ(entry.set_owner_uid(0).get_owner_user(), "root");
}

TEST(EntryOwner, OfAnUnknownNameIsNobody) {
  for (const char* name : {"nobody-yet", "", "2001", "Alice", "alice "}) {
    Entry entry;
    entry.set_owner_uid(2002).set_owner_user(name);
    EXPECT_EQ(entry.get_owner_uid(), kNobody) << name;
  }
}

TEST(EntryOwner, OfAnUnknownIdHasNoName) {
  EXPECT_EQ(Entry().get_owner_user(), "");
  EXPECT_EQ(Entry().set_owner_uid(2999).get_owner_user(), "");
}

TEST(EntryUsers, AreKeptAsIdsWhereTheNamesResolve) {
  Entry entry;
  entry.set_protect_users({"bob", "nobody-yet", "alice", "", "bob", "nobody-yet"});
  EXPECT_EQ(DataOf(entry)["protect_uids"], ParseJson("[2002,2001,2002]"));
  EXPECT_EQ(DataOf(entry)["protect_extra_users"], ParseJson(R"(["nobody-yet","","nobody-yet"])"));
  EXPECT_EQ(entry.get_protect_uids(), (Ids{2002, 2001, 2002}));
  EXPECT_EQ(entry.get_protect_users(),
            (Texts{"bob", "alice", "bob", "nobody-yet", "", "nobody-yet"}));
}

TEST(EntryUsers, ReplaceThoseBefore) {
  Entry entry;
  entry.set_protect_users({"alice", "nobody-yet"}).set_protect_groups({"friends", "no-group"});
  entry.set_protect_users({"bob"});
  EXPECT_EQ(entry.get_protect_users(), (Texts{"bob"}));
  EXPECT_EQ(entry.get_protect_groups(), (Texts{"friends", "no-group"}));
  entry.set_protect_users({});
  EXPECT_EQ(entry.get_protect_users(), Texts());
  EXPECT_EQ(entry.get_protect_uids(), Ids());
}

TEST(EntryUsers, SetAsIdsReplaceNamesToo) {
  Entry entry;
  entry.set_protect_users({"alice", "nobody-yet"}).set_protect_groups({"friends", "no-group"});
  entry.set_protect_uids({2003, 2999, 2003, kNobody, 0});
  EXPECT_EQ(entry.get_protect_uids(), (Ids{2003, 2999, 2003, kNobody, 0}));
  EXPECT_EQ(DataOf(entry)["protect_extra_users"], ParseJson("[]"));
  EXPECT_EQ(entry.get_protect_users(), (Texts{"carol", "carol", "root"})) << "who has a name";
  EXPECT_EQ(entry.get_protect_groups(), (Texts{"friends", "no-group"}));
}

TEST(EntryUsers, CountAsSoonAsTheirNamesExist) {
  Entry entry;
  entry.set_protect_users({"alice", "newcomer", "nobody-yet"});
  EXPECT_EQ(entry.get_protect_uids(), (Ids{2001}));
  {
    const ScopedLine account("/etc/passwd", "newcomer:x:2100:2100::/:/usr/sbin/nologin");
    EXPECT_EQ(entry.get_protect_uids(), (Ids{2001, 2100}));
    EXPECT_EQ(entry.get_protect_users(), (Texts{"alice", "newcomer", "nobody-yet"}));
    EXPECT_EQ(DataOf(entry)["protect_uids"], ParseJson("[2001]")) << "still kept as a name";
  }
  EXPECT_EQ(entry.get_protect_uids(), (Ids{2001}));
  EXPECT_EQ(entry.get_protect_users(), (Texts{"alice", "newcomer", "nobody-yet"}));
}

TEST(EntryUsers, WhoseAccountIsGoneHaveNoName) {
  Entry entry;
  {
    const ScopedLine account("/etc/passwd", "leaver:x:2101:2101::/:/usr/sbin/nologin");
    entry.set_protect_users({"leaver", "alice"});
    EXPECT_EQ(entry.get_protect_users(), (Texts{"leaver", "alice"}));
  }
  EXPECT_EQ(entry.get_protect_users(), (Texts{"alice"}));
  EXPECT_EQ(entry.get_protect_uids(), (Ids{2101, 2001}));
}

TEST(EntryGroups, AreKeptAsIdsWhereTheNamesResolve) {
  Entry entry;
  EXPECT_EQ(&entry.set_protect_groups({"friends", "no-group", "bob", "friends"}), &entry);
  EXPECT_EQ(DataOf(entry)["protect_gids"], ParseJson("[3001,2002,3001]"));
  EXPECT_EQ(DataOf(entry)["protect_extra_groups"], ParseJson(R"(["no-group"])"));
  EXPECT_EQ(entry.get_protect_gids(), (Ids{3001, 2002, 3001}));
  EXPECT_EQ(entry.get_protect_groups(), (Texts{"friends", "bob", "friends", "no-group"}));
}

TEST(EntryGroups, AreNotUsers) {
  // "friends" is no account and "administrators" no user id.
  Entry entry;
  entry.set_protect_users({"friends"}).set_protect_uids({3002});
  EXPECT_EQ(entry.get_protect_users(), Texts());
  entry.set_protect_gids({3002});
  EXPECT_EQ(entry.get_protect_groups(), (Texts{"administrators"}));
  EXPECT_EQ(entry.get_protect_uids(), (Ids{3002}));
}

TEST(EntryGroups, SetAsIdsReplaceNamesToo) {
  Entry entry;
  entry.set_protect_users({"alice", "nobody-yet"}).set_protect_groups({"friends", "no-group"});
  entry.set_protect_gids({3002, 3999, 3002});
  EXPECT_EQ(entry.get_protect_gids(), (Ids{3002, 3999, 3002}));
  EXPECT_EQ(DataOf(entry)["protect_extra_groups"], ParseJson("[]"));
  EXPECT_EQ(entry.get_protect_groups(), (Texts{"administrators", "administrators"}));
  EXPECT_EQ(entry.get_protect_users(), (Texts{"alice", "nobody-yet"}));
  entry.set_protect_groups({});
  EXPECT_EQ(entry.get_protect_gids(), Ids());
}

TEST(EntryGroups, CountAsSoonAsTheirNamesExist) {
  Entry entry;
  entry.set_protect_groups({"newcomers", "friends"});
  EXPECT_EQ(entry.get_protect_gids(), (Ids{3001}));
  {
    const ScopedLine group("/etc/group", "newcomers:x:3100:");
    EXPECT_EQ(entry.get_protect_gids(), (Ids{3001, 3100}));
    EXPECT_EQ(entry.get_protect_groups(), (Texts{"friends", "newcomers"}));
  }
  EXPECT_EQ(entry.get_protect_gids(), (Ids{3001}));
}

TEST(EntryGroups, ThatAreGoneHaveNoName) {
  Entry entry;
  {
    const ScopedLine group("/etc/group", "leavers:x:3101:");
    entry.set_protect_groups({"leavers", "friends"});
  }
  EXPECT_EQ(entry.get_protect_groups(), (Texts{"friends"}));
  EXPECT_EQ(entry.get_protect_gids(), (Ids{3101, 3001}));
}

// ---- Column texts

TEST(EntryColumns, AreListedInTableOrderWithoutTheId) {
  Entry entry = FullEntry();
  Texts expected{"aB3xY7k9Q", "photos", "0", "2001", "1600000000", "1700000000", "9", "4", "0"};
  Texts list = entry.GetFieldList();
  ASSERT_EQ(list.size(), 10U);
  EXPECT_TRUE(ParseJson(list.back()).isObject());
  list.pop_back();
  EXPECT_EQ(list, expected);
}

TEST(EntryColumns, OfADefaultLinkHaveTheDefaults) {
  Texts list = Entry().GetFieldList();
  list.pop_back();
  EXPECT_EQ(list, (Texts{"", "", "1", "4294967295", "0", "0", "0", "0", "1"}));
}

TEST(EntryColumns, AreBareTextsAndPlainDecimals) {
  Entry entry;
  entry.set_hash("it's\n\"\\").set_project_name("\xff'").set_owner_uid(0).set_start_at(LONG_MIN);
  entry.set_expire_at(LONG_MAX).set_expire_times(INT_MIN).set_use_count(INT_MAX);
  Texts list = entry.GetFieldList();
  list.pop_back();
  EXPECT_EQ(list, (Texts{"it's\n\"\\", "\xff'", "1", "0", std::to_string(LONG_MIN),
                         std::to_string(LONG_MAX), "-2147483648", "2147483647", "1"}));
}

TEST(EntryColumns, AreMappedByName) {
  const Entry entry = FullEntry();
  const Texts list = entry.GetFieldList();
  const std::map<std::string, std::string> expected{
      {"hash", list[0]},         {"project_name", list[1]}, {"enabled", list[2]},
      {"owner_uid", list[3]},    {"start_at", list[4]},     {"expire_at", list[5]},
      {"expire_times", list[6]}, {"use_count", list[7]},    {"auto_gc", list[8]},
      {"data", list[9]}};
  EXPECT_EQ(entry.GetFieldMap(), expected);
  EXPECT_EQ(entry.GetCObject().GetFieldMap(), expected);
  EXPECT_EQ(entry.GetCObject().GetFieldList(), list);
}

// ---- Reading a row

TEST(EntryRow, IsLoadedWhole) {
  Entry entry;
  EXPECT_TRUE(entry.FromRow(SelectedRow(Columns("", ""))));
  EXPECT_EQ(entry.get_id(), 5);
  EXPECT_EQ(entry.get_hash(), "h");
  EXPECT_EQ(entry.get_project_name(), "p");
  EXPECT_TRUE(entry.get_enabled());
  EXPECT_EQ(entry.get_owner_uid(), 7U);
  EXPECT_EQ(entry.get_start_at(), 11);
  EXPECT_EQ(entry.get_expire_at(), 12);
  EXPECT_EQ(entry.get_expire_times(), 13);
  EXPECT_EQ(entry.get_use_count(), 14);
  EXPECT_TRUE(entry.get_auto_gc());
}

TEST(EntryRow, ThatLoadsAsALegalLinkIsTrueWhateverItsValidity) {
  SyslogListener log;
  Entry entry;
  EXPECT_TRUE(entry.FromRow(SelectedRow(Columns("enabled", "0")))) << "disabled and expired";
  EXPECT_FALSE(entry.get_enabled());
  EXPECT_TRUE(log.Take().empty());
}

TEST(EntryRow, ThatLoadsAsIllegalIsFalseAndLoadedAllTheSame) {
  SyslogListener log;
  errno = 0;
  Entry entry;
  EXPECT_FALSE(entry.FromRow(SelectedRow(Columns("hash", "NULL"))));
  ExpectFailed(log, "entry", {kNoHash});
  EXPECT_EQ(entry.get_id(), 5);
  EXPECT_EQ(entry.get_project_name(), "p");
  EXPECT_EQ(entry.get_use_count(), 14);
  EXPECT_EQ(entry.get_app(), Json::Value(Json::objectValue));
}

TEST(EntryRow, IsReadByColumnNameWhateverTheOrder) {
  Entry entry;
  EXPECT_TRUE(entry.FromRow(
      SelectedRow(Quoted(kLegalData) +
                  " AS data, 1 AS more, 0 AS auto_gc, 14 AS use_count, 13 AS expire_times,"
                  " 12 AS expire_at, 11 AS start_at, 7 AS owner_uid, 1 AS enabled,"
                  " 'p' AS project_name, 'h' AS hash, 5 AS id")));
  EXPECT_EQ(entry.get_id(), 5);
  EXPECT_EQ(entry.get_hash(), "h");
  EXPECT_FALSE(entry.get_auto_gc());
}

// What a row lacks: an empty replacement leaves the column out.
TEST(EntryRow, TakesDefaultsForValuesThatItLacks) {
  for (const char* none : {"NULL", "''", ""}) {
    EXPECT_EQ(Load("id", none).get_id(), 0) << none;
    EXPECT_EQ(Load("hash", none).get_hash(), "") << none;
    EXPECT_EQ(Load("project_name", none).get_project_name(), "") << none;
    EXPECT_TRUE(Load("enabled", none).get_enabled()) << none;
    EXPECT_EQ(Load("owner_uid", none).get_owner_uid(), kNobody) << none;
    EXPECT_EQ(Load("start_at", none).get_start_at(), 0) << none;
    EXPECT_EQ(Load("expire_at", none).get_expire_at(), 0) << none;
    EXPECT_EQ(Load("expire_times", none).get_expire_times(), 0) << none;
    EXPECT_EQ(Load("use_count", none).get_use_count(), 0) << none;
    EXPECT_FALSE(Load("auto_gc", none).get_auto_gc()) << none;
  }
}

TEST(EntryRow, TakesDefaultsForValuesThatAreNoNumbersOrTooLarge) {
  for (const char* bad : {"'x'", "'99999999999999999999'"}) {
    EXPECT_EQ(Load("id", bad).get_id(), 0) << bad;
    EXPECT_EQ(Load("owner_uid", bad).get_owner_uid(), kNobody) << bad;
    EXPECT_EQ(Load("start_at", bad).get_start_at(), 0) << bad;
    EXPECT_EQ(Load("expire_at", bad).get_expire_at(), 0) << bad;
    EXPECT_EQ(Load("expire_times", bad).get_expire_times(), 0) << bad;
    EXPECT_EQ(Load("use_count", bad).get_use_count(), 0) << bad;
    EXPECT_FALSE(Load("auto_gc", bad).get_auto_gc()) << bad;
  }
}

TEST(EntryRow, IsEnabledByTheTextOneOnly) {
  EXPECT_TRUE(Load("enabled", "1").get_enabled());
  EXPECT_TRUE(Load("enabled", "'1'").get_enabled());
  for (const char* off : {"0", "2", "-1", "'true'", "'01'", "' 1'", "'1 '", "1.0", "' '"}) {
    EXPECT_FALSE(Load("enabled", off).get_enabled()) << off;
  }
}

TEST(EntryRow, IsCollectedAutomaticallyForEveryNumberButZero) {
  for (const char* on : {"1", "2", "-1", "'1x'", "'+3'"}) {
    EXPECT_TRUE(Load("auto_gc", on).get_auto_gc()) << on;
  }
  for (const char* off : {"0", "'00'", "'true'", "'0x1'"}) {
    EXPECT_FALSE(Load("auto_gc", off).get_auto_gc()) << off;
  }
}

TEST(EntryRow, ReadsNumbersAsStreamsDo) {
  EXPECT_EQ(Load("id", "' 12abc'").get_id(), 12);
  EXPECT_EQ(Load("owner_uid", "'-1'").get_owner_uid(), kNobody);
  EXPECT_EQ(Load("owner_uid", "'-2'").get_owner_uid(), 4294967294U);
  EXPECT_EQ(Load("owner_uid", "4294967294").get_owner_uid(), 4294967294U);
  EXPECT_EQ(Load("owner_uid", "4294967296").get_owner_uid(), kNobody);
  EXPECT_EQ(Load("expire_at", std::to_string(LONG_MAX)).get_expire_at(), LONG_MAX);
  EXPECT_EQ(Load("expire_at", std::to_string(LONG_MIN)).get_expire_at(), LONG_MIN);
  EXPECT_EQ(Load("expire_times", "-7").get_expire_times(), -7);
  EXPECT_EQ(Load("use_count", "'3.9'").get_use_count(), 3);
}

TEST(EntryRow, LoadingALimitDoesNotResetTheCount) {
  Entry entry;
  EXPECT_TRUE(entry.FromRow(SelectedRow(Columns("use_count", "6"))));
  EXPECT_EQ(entry.get_expire_times(), 13);
  EXPECT_EQ(entry.get_use_count(), 6);
}

TEST(EntryRow, WhoseDataIsNoJsonLoadsThePlainColumnsAndLogsNothing) {
  SyslogListener log;
  Entry entry = FullEntry();
  const Json::Value data = DataOf(entry);
  EXPECT_FALSE(entry.FromRow(SelectedRow(Columns("data", "'no JSON'"))));
  Texts list = entry.GetFieldList();
  list.pop_back();
  EXPECT_EQ(list, (Texts{"h", "p", "1", "7", "11", "12", "13", "14", "1"}));
  EXPECT_EQ(entry.get_id(), 5);
  EXPECT_EQ(DataOf(entry), data);
  EXPECT_TRUE(log.Take().empty());
}

TEST(EntryRow, ThatIsNotThereIsALinkOfDefaultColumns) {
  Entry entry = FullEntry();
  const Json::Value data = DataOf(entry);
  EXPECT_FALSE(entry.FromRow(Row()));
  Texts list = entry.GetFieldList();
  list.pop_back();
  EXPECT_EQ(list, (Texts{"", "", "1", "4294967295", "0", "0", "0", "0", "0"}));
  EXPECT_EQ(entry.get_id(), 0);
  EXPECT_EQ(DataOf(entry), data);
}

TEST(EntryRow, SurvivesItsTable) {
  unlink("/tmp/entry.db");
  SharingDB db("/tmp/entry.db");
  ASSERT_TRUE(db.IsGood());
  std::string bytes;
  for (int byte = 1; byte < 256; ++byte) {
    bytes.push_back(static_cast<char>(byte));
  }
  Entry stored = FullEntry();
  stored.set_hash("00012" + bytes).set_project_name(bytes + "'").set_id(1);
  stored.set_start_at(LONG_MIN).set_expire_at(LONG_MAX).set_owner_uid(4294967294U);
  stored.set_expire_times(INT_MIN).set_use_count(INT_MAX);
  ASSERT_TRUE(db.Insert("entry", stored.GetFieldList())) << db.GetLastError();
  Entry loaded;
  EXPECT_TRUE(loaded.FromRow(FetchedRow(db, "SELECT * FROM entry")));
  EXPECT_EQ(Contents(loaded), Contents(stored));

  loaded.set_enabled(true).set_hash("0012").set_redirect_uri("'; DROP TABLE entry; --");
  ASSERT_TRUE(db.Update("entry", loaded.GetFieldMap(), 1)) << db.GetLastError();
  Entry again;
  EXPECT_TRUE(again.FromRow(FetchedRow(db, "SELECT * FROM entry")));
  EXPECT_EQ(Contents(again), Contents(loaded));
}

// ---- JSON form

TEST(EntryJson, HasThePublicMembersOnly) {
  Json::Value value;
  FullEntry().ToJSON(value);
  EXPECT_EQ(
      value.getMemberNames(),
      (Texts{"app", "auto_gc", "enable_match_ip", "enabled", "expire_at", "expire_times", "hash",
             "owner_user", "project_name", "protect_groups", "protect_title", "protect_type",
             "protect_users", "redirect_type", "redirect_uri", "start_at", "use_count"}));
  const std::string text = value.toStyledString();
  EXPECT_EQ(text.find("5ebe2294ecd0e0f08eab7690d2a6ee69"), std::string::npos) << "the password";
  EXPECT_EQ(text.find(FullEntry().get_protect_password_salt()), std::string::npos);
  EXPECT_EQ(text.find("secret"), std::string::npos) << "the private data";
}

TEST(EntryJson, HasTheMembersValues) {
  const ScopedZone zone("XXX-2");
  Json::Value value;
  FullEntry().ToJSON(value);
  EXPECT_EQ(value, ParseJson(R"({
    "hash": "aB3xY7k9Q", "project_name": "photos", "enabled": false, "owner_user": "alice",
    "start_at": "2020-09-13 14:26:40", "expire_at": "2023-11-15 00:13:20", "expire_times": 9,
    "use_count": 4, "auto_gc": false, "enable_match_ip": false,
    "protect_title": "A title, and a long one", "protect_type": "password",
    "protect_users": ["alice", "bob", "nobody-yet"], "protect_groups": ["friends",
    "no-such-group"], "redirect_type": "always", "redirect_uri": "https://example.com/a/page",
    "app": {"path": ["/exports/photos", 1, 2.5, null, true]}})"));
}

TEST(EntryJson, OfADefaultLink) {
  Json::Value value;
  Entry().ToJSON(value);
  EXPECT_EQ(value, ParseJson(R"({
    "hash": "", "project_name": "", "enabled": true, "owner_user": "", "start_at": "",
    "expire_at": "", "expire_times": 0, "use_count": 0, "auto_gc": true, "enable_match_ip": true,
    "protect_title": "", "protect_type": "none", "protect_users": [], "protect_groups": [],
    "redirect_type": "none", "redirect_uri": "", "app": null})"));
}

TEST(EntryJson, ReplacesWhatWasThere) {
  Json::Value expected;
  LegalEntry().ToJSON(expected);
  for (const char* before : {R"({"id":1,"other":2,"private_data":{}})", "[1,2]", "\"text\"", "7"}) {
    Json::Value value = ParseJson(before);
    LegalEntry().GetCObject().ToJSON(value);
    EXPECT_EQ(value, expected) << before;
  }
}

TEST(EntryJson, NamesTheKindsOfProtection) {
  const auto text = [](int type) {
    Json::Value value;
    Entry().set_protect_type(static_cast<Entry::ProtectType>(type)).ToJSON(value);
    return value["protect_type"].asString();
  };
  EXPECT_EQ(text(0), "none");
  EXPECT_EQ(text(1), "password");
  EXPECT_EQ(text(2), "user");
  EXPECT_EQ(text(3), "none");
  EXPECT_EQ(text(-1), "none");
}

TEST(EntryJson, NamesTheKindsOfRedirect) {
  const auto text = [](int type) {
    Json::Value value;
    Entry().set_redirect_type(static_cast<Entry::RedirectType>(type)).ToJSON(value);
    return value["redirect_type"].asString();
  };
  EXPECT_EQ(text(0), "none");
  EXPECT_EQ(text(1), "url_param");
  EXPECT_EQ(text(2), "always");
  EXPECT_EQ(text(3), "none");
  EXPECT_EQ(text(-1), "none");
}

TEST(EntryJson, HasNoNameForAnOwnerWithoutAccount) {
  Json::Value value;
  Entry().set_owner_uid(2999).ToJSON(value);
  EXPECT_EQ(value["owner_user"], Json::Value(""));
}

TEST(EntryJson, HasACopyOfTheApplicationsData) {
  Entry entry = FullEntry();
  Json::Value value;
  entry.ToJSON(value);
  value["app"]["path"] = "changed";
  EXPECT_EQ(entry.get_app(), FullEntry().get_app());
}

}  // namespace
