// Fresh hashes and session identifiers where this program draws them, in place of the platform.
#include <gtest/gtest.h>
#include <tuvoplatform/random.h>
#include <tuvosharing/entry_db.h>
#include <tuvosharing/session_db.h>
#include <tuvosharing/sharing_db.h>

#include <deque>
#include <functional>
#include <string>
#include <vector>

#include "sqlite_file.h"
#include "store_records.h"
#include "test_files.h"

namespace {

struct Draw {
  const void* generator;
  std::string pool;
  unsigned int length;
};
std::vector<Draw> draws;
std::deque<std::string> next;  // what the next draws give; nothing left: a text of their own
bool answer = true;

}  // namespace

__attribute__((visibility("default"))) bool TUVO::RANDOM::TUVORandomBase::getString(
    const std::string& pool, unsigned int length, std::string& out) {
  draws.push_back({this, pool, length});
  out = std::string(length, static_cast<char>('a' + draws.size() % 26));
  if (!next.empty()) {
    out = next.front();
    next.pop_front();
  }
  return answer;
}

namespace {

using TUVO::RANDOM::POOL_ALPHA_NUMERIC;
using TUVO::RANDOM::POOL_URL_FRIENDLY;
using TUVO::sharing::db::EntryDB;
using TUVO::sharing::db::SessionDB;
using TUVO::sharing::db::SharingDB;
using TUVO::sharing::record::Entry;
using TUVO::sharing::record::Session;
using tuvo_test::LegalEntry;
using tuvo_test::LegalSession;
using tuvo_test::SqliteFile;
using Texts = std::vector<std::string>;

constexpr char kPath[] = "/tmp/drawn.db";

class DrawnNames : public testing::Test {
 protected:
  DrawnNames() : db_(tuvo_test::NewPath(kPath)) {
    draws.clear();
    next.clear();
    answer = true;
  }

  std::string CreateLink() {
    Entry entry = LegalEntry("");
    EXPECT_TRUE(EntryDB(db_).CreateWithHash(entry));
    return entry.get_hash();
  }

  std::string CreateSession() {
    Session session = LegalSession("");
    EXPECT_TRUE(SessionDB(db_).CreateWithSessionId(session));
    return session.get_session_id();
  }

  static void ExpectOneGenerator(const std::function<void()>& create) {
    // At another place of the stack, were it kept there.
    const std::function<void(int)> create_deeper = [&](int depth) {
      depth > 0 ? create_deeper(depth - 1) : create();
    };
    create();
    create_deeper(50);
    ASSERT_EQ(draws.size(), 2U);
    EXPECT_EQ(draws[0].generator, draws[1].generator);
  }

  SharingDB db_;
};

TEST_F(DrawnNames, AHashIsNineOfThePlatformsLettersAndDigits) {
  next = {"Ab3dE5fG7"};
  EXPECT_EQ(CreateLink(), "Ab3dE5fG7");
  EXPECT_EQ(SqliteFile(kPath).Value("SELECT hash FROM entry"), "Ab3dE5fG7");
  ASSERT_EQ(draws.size(), 1U);
  EXPECT_EQ(draws[0].pool, POOL_ALPHA_NUMERIC);
  EXPECT_EQ(draws[0].length, 9U);
}

TEST_F(DrawnNames, AnIdentifierIs32OfThePlatformsCharactersForUrls) {
  next = {"an identifier"};
  EXPECT_EQ(CreateSession(), "an identifier");
  ASSERT_EQ(draws.size(), 1U);
  EXPECT_EQ(draws[0].pool, POOL_URL_FRIENDLY);
  EXPECT_EQ(draws[0].length, 32U);
}

// The table tells, by refusing it; nobody looks it up before.
TEST_F(DrawnNames, AHashThatIsTakenIsDrawnAgainOneCharacterLongerEveryThirdTime) {
  next = {"taken", "taken", "taken", "taken", "free"};
  EXPECT_EQ(CreateLink(), "taken");
  EXPECT_EQ(CreateLink(), "free");
  std::vector<unsigned int> lengths;
  for (const Draw& draw : draws) {
    lengths.push_back(draw.length);
  }
  EXPECT_EQ(lengths, (std::vector<unsigned int>{9, 9, 9, 9, 10}));
}

TEST_F(DrawnNames, AnIdentifierThatIsTakenIsDrawnAgainAtItsLength) {
  next = {"taken", "taken", "taken", "taken", "free"};
  EXPECT_EQ(CreateSession(), "taken");
  EXPECT_EQ(CreateSession(), "free");
  ASSERT_EQ(draws.size(), 5U);
  EXPECT_EQ(draws[4].length, 32U);
}

// What a failed draw leaves decides: nothing, with the platform's own generator, and then the
// record is refused.
TEST_F(DrawnNames, WhetherADrawSucceededIsNotAsked) {
  answer = false;
  next = {"half", "a half"};
  EXPECT_EQ(CreateLink(), "half");
  EXPECT_EQ(CreateSession(), "a half");
  EXPECT_EQ(draws.size(), 2U);
}

TEST_F(DrawnNames, OneGeneratorDrawsEveryHash) {
  ExpectOneGenerator([this] { CreateLink(); });
}

TEST_F(DrawnNames, OneGeneratorDrawsEveryIdentifier) {
  ExpectOneGenerator([this] { CreateSession(); });
}

}  // namespace
