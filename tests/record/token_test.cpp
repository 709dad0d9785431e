#include <internal/token_private.h>
#include <tuvosharing/sharing_db.h>
#include <tuvosharing/token.h>

#include <cerrno>
#include <climits>
#include <type_traits>

#include "record/record_testing.h"
#include "support/class_layout.h"

namespace tuvo_test {

using TUVO::sharing::record::TokenPrivate;
auto MembersOf(const TokenPrivate&);
template struct Reveal<TokenPrivate, &TokenPrivate::blValid_, &TokenPrivate::id_,
                       &TokenPrivate::key_, &TokenPrivate::entry_id_, &TokenPrivate::session_id_,
                       &TokenPrivate::timeout_>;

}  // namespace tuvo_test

namespace {

using TUVO::sharing::db::Row;
using TUVO::sharing::db::SharingDB;
using TUVO::sharing::record::Object;
using TUVO::sharing::record::Token;
using TUVO::sharing::record::TokenPrivate;
using tuvo_test::ExpectFailed;
using tuvo_test::FetchedRow;
using tuvo_test::MembersOf;
using tuvo_test::ParseJson;
using tuvo_test::SelectedRow;
using tuvo_test::SyslogListener;
using tuvo_test::WithinOneSecond;

using Texts = std::vector<std::string>;

static_assert(std::is_polymorphic<Token>::value);
static_assert(std::has_virtual_destructor<Token>::value);
static_assert(sizeof(Token) == 2 * sizeof(void*), "one pointer beside the table's");
static_assert(!std::is_base_of<Object, Token>::value);
static_assert(std::is_base_of<Object, TokenPrivate>::value);
static_assert(
    std::is_same<tuvo_test::TypesOf<decltype(MembersOf(std::declval<const TokenPrivate&>()))>,
                 std::tuple<bool, int, std::string, int, int, std::time_t>>::value);
static_assert(std::is_default_constructible<Token>::value);

static_assert(std::is_same<decltype(&Token::GetObject), Object& (Token::*)()>::value);
static_assert(std::is_same<decltype(&Token::GetCObject), const Object& (Token::*)() const>::value);
static_assert(std::is_same<decltype(&Token::GetFieldList), Texts (Token::*)() const>::value);
static_assert(std::is_same<decltype(&Token::GetFieldMap),
                           std::map<std::string, std::string> (Token::*)() const>::value);
static_assert(std::is_same<decltype(&Token::IsLegal), bool (Token::*)() const>::value);
static_assert(std::is_same<decltype(&Token::ToJSON), void (Token::*)(Json::Value&) const>::value);
static_assert(std::is_same<decltype(&Token::FromRow), bool (Token::*)(const Row&)>::value);
static_assert(std::is_same<decltype(&Token::get_id), int (Token::*)() const>::value);
static_assert(std::is_same<decltype(&Token::set_id), Token& (Token::*)(int)>::value);
static_assert(std::is_same<decltype(&Token::get_entry_id), int (Token::*)() const>::value);
static_assert(std::is_same<decltype(&Token::set_entry_id), void (Token::*)(int)>::value);
static_assert(std::is_same<decltype(&Token::get_session_id), int (Token::*)() const>::value);
static_assert(std::is_same<decltype(&Token::set_session_id), void (Token::*)(int)>::value);
static_assert(std::is_same<decltype(&Token::get_timeout), std::time_t (Token::*)() const>::value);
static_assert(std::is_same<decltype(&Token::set_timeout), void (Token::*)(long)>::value);
static_assert(
    std::is_same<decltype(std::declval<Token&>() = std::declval<const Token&>()), Token&>::value);
static_assert(
    std::is_same<decltype(std::declval<Token&>() = std::declval<Token>()), Token&>::value);

Token Make(int id, int entry_id, int session_id, long timeout) {
  Token token;
  token.set_id(id);
  token.set_entry_id(entry_id);
  token.set_session_id(session_id);
  token.set_timeout(timeout);
  return token;
}

// Everything that a token holds.
Texts Contents(const Token& token) {
  Texts contents = token.GetFieldList();
  contents.push_back(std::to_string(token.get_id()));
  return contents;
}

long Future() {
  return std::time(nullptr) + 1000;
}

// What the base holds for every record: here it is copied along and means nothing.
bool& Mark(Token& token) {
  auto& fields = static_cast<TokenPrivate&>(token.GetObject());
  return fields.*std::get<0>(MembersOf(fields));
}

std::string& Key(Token& token) {
  auto& fields = static_cast<TokenPrivate&>(token.GetObject());
  return fields.*std::get<2>(MembersOf(fields));
}

// Programs that were built against the library rely on both.
TEST(Token, FieldsStandInTheirOrder) {
  Token token;
  const auto& fields = static_cast<const TokenPrivate&>(token.GetCObject());
  EXPECT_TRUE(tuvo_test::StandInThisOrder(fields, MembersOf(fields)));
}

TEST(Token, HasNoVirtualOperationButItsDestructor) {
  if (!tuvo_test::kTablesCanBeRead) {
    GTEST_SKIP() << "on this processor tables are read in another way";
  }
  EXPECT_EQ(tuvo_test::SlotCount<Token>(), 2U);
  EXPECT_EQ(tuvo_test::SlotCount<TokenPrivate>(), tuvo_test::SlotCount<Object>());
}

TEST(Token, StartsEmpty) {
  const Token token;
  EXPECT_EQ(token.get_id(), 0);
  EXPECT_EQ(token.get_entry_id(), 0);
  EXPECT_EQ(token.get_session_id(), 0);
  EXPECT_EQ(token.get_timeout(), 0);
}

TEST(Token, KeepsWhatItIsGiven) {
  Token token;
  token.set_id(1);
  token.set_entry_id(2);
  token.set_session_id(3);
  token.set_timeout(4);
  EXPECT_EQ(token.get_id(), 1);
  EXPECT_EQ(token.get_entry_id(), 2);
  EXPECT_EQ(token.get_session_id(), 3);
  EXPECT_EQ(token.get_timeout(), 4);
}

TEST(Token, SettersTakeAnyValue) {
  const Token token = Make(INT_MIN, INT_MIN, INT_MAX, LONG_MIN);
  EXPECT_EQ(token.get_id(), INT_MIN);
  EXPECT_EQ(token.get_entry_id(), INT_MIN);
  EXPECT_EQ(token.get_session_id(), INT_MAX);
  EXPECT_EQ(token.get_timeout(), LONG_MIN);
}

TEST(Token, SettingTheIdReturnsTheTokenItself) {
  Token token;
  EXPECT_EQ(&token.set_id(5), &token);
}

TEST(Token, IsSeenByTheStoresAsOneObjectOfItsOwn) {
  Token token = Make(4, 5, 7, Future());
  const Token other;
  EXPECT_EQ(&token.GetObject(), &token.GetCObject());
  EXPECT_NE(&token.GetCObject(), &other.GetCObject());
  EXPECT_NE(dynamic_cast<TokenPrivate*>(&token.GetObject()), nullptr);
  EXPECT_EQ(token.GetObject().get_id(), 4);
  EXPECT_EQ(token.GetObject().GetFieldList(), token.GetFieldList());
  EXPECT_EQ(token.GetObject().GetFieldMap(), token.GetFieldMap());
  EXPECT_TRUE(token.GetObject().IsLegal());
  token.GetObject().set_id(9);
  EXPECT_EQ(token.get_id(), 9);
  EXPECT_FALSE(token.GetObject().FromRow(SelectedRow("8 AS id")));
  EXPECT_EQ(token.get_id(), 8);
}

TEST(Token, ListsItsColumnsInTableOrderWithoutTheId) {
  EXPECT_EQ(Make(3, 5, 7, 1700000000).GetFieldList(), (Texts{"5", "7", "1700000000"}));
}

TEST(Token, ListsNegativeAndLargeNumbersInPlainDecimal) {
  EXPECT_EQ(Make(0, INT_MIN, INT_MAX, -5).GetFieldList(),
            (Texts{"-2147483648", "2147483647", "-5"}));
  EXPECT_EQ(Make(0, 0, 0, LONG_MAX).GetFieldList().at(2), std::to_string(LONG_MAX));
}

TEST(Token, MapsItsColumnsByName) {
  const std::map<std::string, std::string> expected{
      {"entry_id", "5"}, {"session_id", "7"}, {"timeout", "1700000000"}};
  EXPECT_EQ(Make(3, 5, 7, 1700000000).GetFieldMap(), expected);
}

TEST(Token, WithoutEntryIsIllegal) {
  SyslogListener log;
  errno = 0;
  EXPECT_FALSE(Token().IsLegal());
  ExpectFailed(log, "token", {"0 == entry_id_"});
}

TEST(Token, WithoutSessionIsIllegal) {
  SyslogListener log;
  errno = 0;
  EXPECT_FALSE(Make(0, 5, 0, 0).IsLegal());
  ExpectFailed(log, "token", {"0 == session_id_"});
}

TEST(Token, WhoseTimeHasPassedIsIllegal) {
  SyslogListener log;
  errno = 0;
  EXPECT_FALSE(Make(1, 5, 7, 1).IsLegal());
  ExpectFailed(log, "token", {"time(NULL) >= timeout_"});
  EXPECT_FALSE(Make(1, 5, 7, -1).IsLegal());
  ExpectFailed(log, "token", {"time(NULL) >= timeout_"});
}

TEST(Token, IsIllegalFromTheVerySecondOfItsTimeout) {
  SyslogListener log;
  const auto legal_at = [](long offset) {
    return WithinOneSecond([&](std::time_t now) { return Make(1, 5, 7, now + offset).IsLegal(); });
  };
  EXPECT_FALSE(legal_at(-1));
  EXPECT_FALSE(legal_at(0));
  log.Take();
  EXPECT_TRUE(legal_at(1));
}

TEST(Token, IsLegalWhateverTheBasesMarkSaysAndLeavesIt) {
  Token token = Make(1, 5, 7, Future());
  for (const bool mark : {false, true}) {
    Mark(token) = mark;
    EXPECT_TRUE(token.IsLegal());
    EXPECT_FALSE(token.FromRow(SelectedRow("1 AS id")));
    EXPECT_EQ(Mark(token), mark);
    token = Make(1, 5, 7, Future());
  }
}

TEST(Token, BecomesIllegalByTheClockAlone) {
  const long end = std::time(nullptr) + 1;
  const Token token = Make(1, 5, 7, end);
  while (std::time(nullptr) < end) {
    usleep(10000);
  }
  EXPECT_FALSE(token.IsLegal());
}

TEST(Token, ThatIsLegalLogsNothing) {
  SyslogListener log;
  EXPECT_TRUE(Make(0, 5, 7, Future()).IsLegal());
  EXPECT_TRUE(Make(1, -5, -7, LONG_MAX).IsLegal());
  EXPECT_TRUE(log.Take().empty());
}

TEST(Token, LogsTheReasonOfErrnoAndLeavesItAlone) {
  SyslogListener log;
  errno = EACCES;
  EXPECT_FALSE(Token().IsLegal());
  EXPECT_EQ(errno, EACCES);
  ExpectFailed(log, "token", {"0 == entry_id_"}, EACCES);
}

TEST(Token, JsonHasThreeMembersAndNoId) {
  Json::Value value;
  Make(3, 5, -7, 1700000000).ToJSON(value);
  EXPECT_EQ(value, ParseJson(R"({"entry_id":5,"session_id":-7,"timeout":1700000000})"));
  EXPECT_TRUE(value["entry_id"].isInt());
  EXPECT_TRUE(value["session_id"].isInt());
  EXPECT_TRUE(value["timeout"].isInt64());
}

TEST(Token, JsonHasTheLatestTime) {
  Json::Value value;
  Make(3, 5, 7, LONG_MAX).ToJSON(value);
  EXPECT_EQ(value["timeout"].asInt64(), LONG_MAX);
}

TEST(Token, JsonLeavesOtherMembersAlone) {
  Json::Value value = ParseJson(R"({"id":1,"other":[2],"timeout":"old"})");
  Make(3, 5, 7, 8).ToJSON(value);
  EXPECT_EQ(value, ParseJson(R"({"id":1,"other":[2],"entry_id":5,"session_id":7,"timeout":8})"));
}

TEST(Token, LoadsARow) {
  const long timeout = Future();
  Token token;
  EXPECT_TRUE(token.FromRow(SelectedRow("3 AS id, 5 AS entry_id, 7 AS session_id, " +
                                        std::to_string(timeout) + " AS timeout")));
  EXPECT_EQ(Contents(token), Contents(Make(3, 5, 7, timeout)));
}

TEST(Token, FindsColumnsByNameNotByPlace) {
  const long timeout = Future();
  Token token;
  EXPECT_TRUE(token.FromRow(SelectedRow("9 AS more, " + std::to_string(timeout) +
                                        " AS timeout, 7 AS session_id, 5 AS entry_id, 3 AS id")));
  EXPECT_EQ(Contents(token), Contents(Make(3, 5, 7, timeout)));
}

TEST(Token, OfAPastRowIsLoadedButIllegal) {
  SyslogListener log;
  errno = 0;
  Token token;
  EXPECT_FALSE(
      token.FromRow(SelectedRow("3 AS id, 5 AS entry_id, 7 AS session_id, 1600000000 AS timeout")));
  ExpectFailed(log, "token", {"time(NULL) >= timeout_"});
  EXPECT_EQ(Contents(token), Contents(Make(3, 5, 7, 1600000000)));
}

TEST(Token, TakesZeroForValuesThatARowLacks) {
  SyslogListener log;
  for (const char* columns :
       {"NULL AS id, NULL AS entry_id, NULL AS session_id, NULL AS timeout",
        "'' AS id, '' AS entry_id, '' AS session_id, '' AS timeout",
        "'x' AS id, 'x' AS entry_id, 'x' AS session_id, 'x' AS timeout",
        "99999999999 AS id, 99999999999 AS entry_id, -99999999999 AS session_id,"
        " '99999999999999999999' AS timeout",
        "1 AS something"}) {
    Token token = Make(1, 2, 3, Future());
    EXPECT_FALSE(token.FromRow(SelectedRow(columns)));
    EXPECT_EQ(Contents(token), Contents(Token())) << columns;
    EXPECT_EQ(log.Take().size(), 1U);
  }
}

TEST(Token, ReadsNumbersAsStreamsDo) {
  Token token;
  token.FromRow(
      SelectedRow("' 12abc' AS id, '-4' AS entry_id, '+5' AS session_id,"
                  " '1600000000.5' AS timeout"));
  EXPECT_EQ(Contents(token), Contents(Make(12, -4, 5, 1600000000)));
}

TEST(Token, OfARowThatIsNotThereIsEmpty) {
  Token token = Make(1, 2, 3, Future());
  EXPECT_FALSE(token.FromRow(Row()));
  EXPECT_EQ(Contents(token), Contents(Token()));
}

TEST(Token, SurvivesItsTable) {
  unlink("/tmp/token.db");
  SharingDB db("/tmp/token.db");
  ASSERT_TRUE(db.IsGood());
  ASSERT_TRUE(db.Execute("INSERT INTO entry (id) VALUES (5); INSERT INTO session (id) VALUES (7)"));
  const Token stored = Make(1, 5, 7, Future());
  ASSERT_TRUE(db.Insert("token", stored.GetFieldList())) << db.GetLastError();
  Token loaded;
  EXPECT_TRUE(loaded.FromRow(FetchedRow(db, "SELECT * FROM token")));
  EXPECT_EQ(Contents(loaded), Contents(stored));

  loaded.set_timeout(Future() + 5);
  ASSERT_TRUE(db.Update("token", loaded.GetFieldMap(), 1));
  Token again;
  EXPECT_TRUE(again.FromRow(FetchedRow(db, "SELECT * FROM token")));
  EXPECT_EQ(Contents(again), Contents(loaded));
}

TEST(Token, CopyIsIndependent) {
  Token source = Make(3, 5, 7, 9);
  Token copy(source);
  EXPECT_EQ(Contents(copy), Contents(source));
  copy.set_id(30);
  copy.set_entry_id(50);
  source.set_timeout(90);
  EXPECT_EQ(Contents(source), Contents(Make(3, 5, 7, 90)));
  EXPECT_EQ(Contents(copy), Contents(Make(30, 50, 7, 9)));
}

TEST(Token, CopyAssignmentKeepsTheObjectAndCopiesEveryField) {
  const Token source = Make(3, 5, 7, 9);
  Token target = Make(1, 1, 1, 1);
  const Object* object = &target.GetObject();
  EXPECT_EQ(&(target = source), &target);
  EXPECT_EQ(&target.GetObject(), object);
  EXPECT_EQ(Contents(target), Contents(source));
}

TEST(Token, MovedFromIsUsableWithItsNumbers) {
  Token source = Make(3, 5, 7, 9);
  const Token constructed(std::move(source));
  EXPECT_EQ(Contents(constructed), Contents(Make(3, 5, 7, 9)));
  EXPECT_EQ(Contents(source), Contents(Make(3, 5, 7, 9)));
  EXPECT_NE(&source.GetCObject(), &constructed.GetCObject());
  source.set_id(4);

  Token target;
  const Object* object = &target.GetObject();
  EXPECT_EQ(&(target = std::move(source)), &target);
  EXPECT_EQ(&target.GetObject(), object);
  EXPECT_EQ(Contents(target), Contents(Make(4, 5, 7, 9)));
  EXPECT_EQ(Contents(source), Contents(Make(4, 5, 7, 9)));
  source.set_timeout(Future());
  EXPECT_TRUE(source.IsLegal());
}

TEST(Token, CopiesAndMovesWhatTheBaseHolds) {
  const std::string text = "a text that is too long for the small-string buffer";
  Token source;
  Mark(source) = false;
  Key(source) = text;
  Token copied(source);
  Token assigned;
  assigned = source;
  Token moved(std::move(copied));
  Token move_assigned;
  move_assigned = std::move(assigned);
  for (Token* token : {&source, &moved, &move_assigned}) {
    EXPECT_FALSE(Mark(*token));
    EXPECT_EQ(Key(*token), text);
  }
  for (Token* token : {&copied, &assigned}) {
    EXPECT_FALSE(Mark(*token));
    EXPECT_EQ(Key(*token), "");
  }
}

TEST(Token, AssignedToItselfStaysAsItIs) {
  Token token = Make(3, 5, 7, 9);
  Token& same = token;
  token = same;
  EXPECT_EQ(Contents(token), Contents(Make(3, 5, 7, 9)));
  token = std::move(same);
  EXPECT_EQ(Contents(token), Contents(Make(3, 5, 7, 9)));
}

}  // namespace
