// A link under any clock, and when the platform or the libraries beneath it give out. This program
// puts functions of its own before theirs, hence it is one of its own.
#include <dlfcn.h>
#include <gcrypt.h>
#include <internal/constant_time.h>
#define OPENSSL_SUPPRESS_DEPRECATED
#include <openssl/md5.h>
#include <tuvoplatform/random.h>
#include <tuvosharing/session.h>
#include <tuvosharing/token.h>

#include <climits>
#include <functional>
#include <new>

#include "record/record_testing.h"

namespace {

bool clock_stands = false;  // whether time() answers `now`
std::time_t now = 0;
int clock_reads = 0;

struct Draw {
  const void* generator;
  std::string pool;
  unsigned int length;
};
std::vector<Draw> draws;
bool draw_fails = false;
std::function<void()> during_draw;
bool sha1_fails = false;
bool md5_fails = false;
std::vector<size_t> compared_lengths;

constexpr long kUnlimited = -1;
long allocations_left = kUnlimited;
long allocations_alive = 0;

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

// The linker gives these names (--wrap): calls of the comparison come to the first, and the second
// is what they would have reached.
bool CompareNoted(std::string_view a, std::string_view b) __asm__(
    "__wrap__ZN4TUVO7sharing8internal22AreEqualInConstantTimeESt17basic_string_viewIcSt11char_"
    "traitsIcEES5_");
bool CompareReally(std::string_view a, std::string_view b) __asm__(
    "__real__ZN4TUVO7sharing8internal22AreEqualInConstantTimeESt17basic_string_viewIcSt11char_"
    "traitsIcEES5_");

bool CompareNoted(std::string_view a, std::string_view b) {
  compared_lengths.push_back(a.size());
  return CompareReally(a, b);
}

void* operator new(std::size_t size, const std::nothrow_t& /*tag*/) noexcept {
  if (allocations_left == 0) {
    return nullptr;
  }
  if (allocations_left > 0) {
    --allocations_left;
  }
  ++allocations_alive;
  return std::malloc(size != 0 ? size : 1);
}

void* operator new(std::size_t size) {
  void* memory = ::operator new(size, std::nothrow);
  if (memory == nullptr) {
    throw std::bad_alloc();
  }
  return memory;
}

void operator delete(void* memory) noexcept {
  allocations_alive -= memory != nullptr ? 1 : 0;
  std::free(memory);
}

void operator delete(void* memory, std::size_t /*size*/) noexcept {
  ::operator delete(memory);
}

__attribute__((visibility("default"))) bool TUVO::RANDOM::TUVORandomBase::getString(
    const std::string& pool, unsigned int length, std::string& out) {
  draws.push_back({this, pool, length});
  if (during_draw) {
    during_draw();
  }
  out = draw_fails ? "half" : std::string(length, static_cast<char>('a' + draws.size()));
  return !draw_fails;
}

namespace {

using TUVO::sharing::record::Entry;
using TUVO::sharing::record::Session;
using TUVO::sharing::record::Token;
using tuvo_test::Contents;
using tuvo_test::ExpectFailed;
using tuvo_test::FullEntry;
using tuvo_test::LegalEntry;
using tuvo_test::SyslogListener;

class EntryCalls : public testing::Test {
 protected:
  EntryCalls() {
    clock_stands = draw_fails = sha1_fails = md5_fails = false;
    draws.clear();
    compared_lengths.clear();
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
  const Entry entry = LegalEntry().set_start_at(1).set_expire_at(LONG_MAX);
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

TEST_F(EntryCalls, OneGeneratorServesEveryLink) {
  const auto draw = [] {
    Entry entry = PasswordEntry();
    entry.set_protect_password("secret", true, Entry::ENCRYPT_ALGO_DEFAULT);
  };
  // At another place of the stack, were it kept there.
  const std::function<void(int)> draw_deeper = [&](int depth) {
    depth > 0 ? draw_deeper(depth - 1) : draw();
  };
  draw();
  draw_deeper(50);
  ASSERT_EQ(draws.size(), 2U);
  EXPECT_EQ(draws[0].generator, draws[1].generator);
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

// How long an answer takes tells nothing about how much of a digest was right.
TEST_F(EntryCalls, DigestsAreComparedInConstantTime) {
  Entry entry = PasswordEntry();
  entry.set_protect_password("secret", true, Entry::ENCRYPT_ALGO_DEFAULT);
  EXPECT_TRUE(entry.IsPasswordValid("secret"));
  EXPECT_FALSE(entry.IsPasswordValid("wrong"));
  entry.set_protect_password("secret", true, Entry::ENCRYPT_ALGO_MD5);
  EXPECT_FALSE(entry.IsPasswordValid("wrong"));
  EXPECT_EQ(compared_lengths, (std::vector<size_t>{40, 40, 32}));
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

// Runs `construct` with one allocation more each time, until it needs no more. Every time before,
// what was missing is handed on as bad_alloc, what was allocated by then is released, and
// `untouched` holds.
void ExpectWholeOrNothing(const std::function<void()>& construct,
                          const std::function<bool()>& untouched) {
  bool whole = false;
  long limit = 0;
  for (; !whole; ++limit) {
    const long before = allocations_alive;
    allocations_left = limit;
    try {
      construct();
      whole = true;
    } catch (const std::bad_alloc&) {
    }
    allocations_left = kUnlimited;
    if (!whole) {
      EXPECT_EQ(allocations_alive, before) << "with " << limit;
      EXPECT_TRUE(untouched()) << "with " << limit;
    }
  }
  EXPECT_GT(limit, 1) << "nothing was refused";
}

template <typename Record>
void ExpectConstructorsAreWholeOrNothing(const Record& full) {
  const auto fields = full.GetFieldList();
  ExpectWholeOrNothing([] { const Record made; }, [] { return true; });
  ExpectWholeOrNothing([&] { const Record made(full); },
                       [&] { return full.GetFieldList() == fields; });
  Record source(full);
  ExpectWholeOrNothing([&] { const Record made(std::move(source)); },
                       [&] { return source.GetFieldList() == fields; });
}

TEST_F(EntryCalls, WithoutMemoryARecordIsNotConstructedAndNothingIsLost) {
  const std::string text = "a text that is too long for the small-string buffer";
  Session session;
  session.set_session_id(text).set_ip(text);
  ExpectConstructorsAreWholeOrNothing(Token());
  ExpectConstructorsAreWholeOrNothing(session);
  ExpectConstructorsAreWholeOrNothing(FullEntry());
}

}  // namespace
