// A link under any clock, and when the platform or the libraries beneath it give out. This program
// puts functions of its own before theirs, hence it is one of its own.
#include <dlfcn.h>
#include <gcrypt.h>
#define OPENSSL_SUPPRESS_DEPRECATED
#include <openssl/md5.h>
#include <tuvoplatform/random.h>

#include <functional>

#include "record/record_testing.h"

namespace {

bool clock_stands = false;  // whether time() answers `now`
std::time_t now = 0;
int clock_reads = 0;

struct Draw {
  std::string pool;
  unsigned int length;
};
std::vector<Draw> draws;
bool draw_fails = false;
std::function<void()> during_draw;
bool sha1_fails = false;
bool md5_fails = false;

template <typename Function>
Function Real(const char* name) {
  return reinterpret_cast<Function>(dlsym(RTLD_NEXT, name));
}

}  // namespace

extern "C" {

__attribute__((visibility("default"))) std::time_t time(std::time_t* out) noexcept {
  ++clock_reads;
  timespec real{};
  clock_gettime(CLOCK_REALTIME, &real);
  const std::time_t answer = clock_stands ? now : real.tv_sec;
  if (out != nullptr) {
    *out = answer;
  }
  return answer;
}

__attribute__((visibility("default"))) unsigned int gcry_md_get_algo_dlen(int algo) {
  return sha1_fails ? 0 : Real<unsigned int (*)(int)>("gcry_md_get_algo_dlen")(algo);
}

__attribute__((visibility("default"))) int MD5_Init(MD5_CTX* context) {
  return md5_fails ? 0 : Real<int (*)(MD5_CTX*)>("MD5_Init")(context);
}

}  // extern "C"

__attribute__((visibility("default"))) bool TUVO::RANDOM::TUVORandomBase::getString(
    const std::string& pool, unsigned int length, std::string& out) {
  draws.push_back({pool, length});
  if (during_draw) {
    during_draw();
  }
  out = draw_fails ? "half" : std::string(length, static_cast<char>('a' + draws.size()));
  return !draw_fails;
}

namespace {

using TUVO::sharing::record::Entry;
using tuvo_test::ExpectFailed;
using tuvo_test::LegalEntry;
using tuvo_test::SyslogListener;

class EntryCalls : public testing::Test {
 protected:
  EntryCalls() {
    clock_stands = draw_fails = sha1_fails = md5_fails = false;
    draws.clear();
  }
  ~EntryCalls() override {
    clock_stands = false;
    during_draw = nullptr;
  }

  static Entry PasswordEntry() { return LegalEntry().set_protect_type(Entry::PROTECT_PASSWORD); }

  static bool IsValidAt(std::time_t moment, const Entry& entry) {
    now = moment;
    clock_stands = true;
    const bool valid = entry.IsValid();
    clock_stands = false;
    return valid;
  }
};

TEST_F(EntryCalls, ValidityTakesTheTimeOnce) {
  const Entry entry = LegalEntry().set_start_at(1).set_expire_at(4000000000);
  clock_reads = 0;
  EXPECT_TRUE(entry.IsValid());
  EXPECT_EQ(clock_reads, 1);
}

TEST_F(EntryCalls, LegalityDoesNotLookAtTheClock) {
  clock_reads = 0;
  EXPECT_TRUE(LegalEntry().IsLegal());
  EXPECT_EQ(clock_reads, 0);
}

TEST_F(EntryCalls, ValidityLastsFromStartToExpiryBothIncluded) {
  const Entry entry = LegalEntry().set_start_at(100).set_expire_at(200);
  EXPECT_FALSE(IsValidAt(99, entry));
  EXPECT_TRUE(IsValidAt(100, entry));
  EXPECT_TRUE(IsValidAt(200, entry));
  EXPECT_FALSE(IsValidAt(201, entry));
}

TEST_F(EntryCalls, ValidityUnderAClockBeforeTheEpoch) {
  EXPECT_FALSE(IsValidAt(-10, LegalEntry().set_start_at(5)));
  EXPECT_FALSE(IsValidAt(0, LegalEntry().set_start_at(1)));
  EXPECT_TRUE(IsValidAt(-10, LegalEntry().set_start_at(-5))) << "not set";
  EXPECT_TRUE(IsValidAt(-10, LegalEntry().set_expire_at(5)));
  EXPECT_TRUE(IsValidAt(-10, LegalEntry().set_expire_at(-20))) << "not set";
}

TEST_F(EntryCalls, SaltsAreSixOfThePlatformsLettersAndDigits) {
  Entry entry = PasswordEntry();
  entry.set_protect_password("secret", true, Entry::ENCRYPT_ALGO_DEFAULT);
  ASSERT_EQ(draws.size(), 1U);
  EXPECT_EQ(draws[0].pool, TUVO::RANDOM::POOL_ALPHA_NUMERIC);
  EXPECT_EQ(draws[0].length, 6U);
  EXPECT_EQ(entry.get_protect_password_salt(), "bbbbbb");
  // sha1sum of "secretbbbbbb".
  EXPECT_EQ(entry.get_protect_password(), "2638b2144b1969758a548bfa655dc083d841c4c8");
}

TEST_F(EntryCalls, NoSaltIsDrawnWhereNoneIsNeeded) {
  Entry entry = PasswordEntry();
  entry.set_protect_password("secret", true, Entry::ENCRYPT_ALGO_MD5);
  entry.set_protect_password("secret", false, Entry::ENCRYPT_ALGO_DEFAULT);
  EXPECT_FALSE(entry.IsPasswordValid("secret"));
  EXPECT_TRUE(draws.empty());
}

TEST_F(EntryCalls, AFailedDrawLeavesTheLinkIllegal) {
  SyslogListener log;
  errno = 0;
  Entry entry = PasswordEntry();
  entry.set_protect_password("before", true, Entry::ENCRYPT_ALGO_MD5);
  draw_fails = true;
  entry.set_protect_password("secret", true, Entry::ENCRYPT_ALGO_DEFAULT);
  EXPECT_EQ(entry.get_protect_password(), "");
  EXPECT_EQ(entry.get_protect_password_algo(), Entry::ENCRYPT_ALGO_DEFAULT);
  EXPECT_EQ(entry.get_protect_password_salt(), "half") << "drawn straight into its place";
  EXPECT_FALSE(entry.IsLegal());
  ExpectFailed(log, "entry", {"!blValid_"});
  draw_fails = false;
  entry.set_protect_password("secret", true, Entry::ENCRYPT_ALGO_DEFAULT);
  EXPECT_TRUE(entry.IsLegal());
  EXPECT_TRUE(entry.IsPasswordValid("secret"));
}

TEST_F(EntryCalls, ALinkIsIllegalWhileItsPasswordIsBeingSet) {
  Entry entry = PasswordEntry();
  entry.set_protect_password("before", true, Entry::ENCRYPT_ALGO_DEFAULT);
  EXPECT_TRUE(entry.IsLegal());
  bool legal = true;
  during_draw = [&] { legal = entry.IsLegal(); };
  entry.set_protect_password("secret", true, Entry::ENCRYPT_ALGO_DEFAULT);
  EXPECT_FALSE(legal);
  EXPECT_TRUE(entry.IsLegal());
}

TEST_F(EntryCalls, AFailedDigestLeavesTheLinkIllegal) {
  SyslogListener log;
  errno = 0;
  for (const auto algo : {Entry::ENCRYPT_ALGO_DEFAULT, Entry::ENCRYPT_ALGO_MD5}) {
    Entry entry = PasswordEntry();
    entry.set_protect_password("secret", true, algo);
    sha1_fails = md5_fails = true;
    entry.set_protect_password("secret", true, algo);
    sha1_fails = md5_fails = false;
    EXPECT_EQ(entry.get_protect_password(), "");
    EXPECT_EQ(entry.get_protect_password_algo(), algo);
    EXPECT_FALSE(entry.IsLegal());
    ExpectFailed(log, "entry", {"!blValid_"});
    EXPECT_FALSE(entry.IsPasswordValid("secret"));
  }
}

TEST_F(EntryCalls, NoPasswordIsValidWhileDigestsFail) {
  for (const auto algo : {Entry::ENCRYPT_ALGO_DEFAULT, Entry::ENCRYPT_ALGO_MD5}) {
    Entry entry = PasswordEntry();
    entry.set_protect_password("secret", true, algo);
    sha1_fails = md5_fails = true;
    EXPECT_FALSE(entry.IsPasswordValid("secret"));
    // What no digest is equals no digest.
    entry.set_protect_password("", false, algo);
    EXPECT_FALSE(entry.IsPasswordValid("secret"));
    sha1_fails = md5_fails = false;
  }
}

}  // namespace
