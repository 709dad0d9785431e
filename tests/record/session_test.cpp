#include <internal/session_private.h>
#include <tuvosharing/session.h>
#include <tuvosharing/sharing_db.h>

#include <cerrno>
#include <climits>
#include <type_traits>

#include "record/record_testing.h"
#include "support/class_layout.h"

namespace tuvo_test {

using TUVO::sharing::record::SessionPrivate;
auto MembersOf(const SessionPrivate&);
template struct Reveal<SessionPrivate, &SessionPrivate::blValid_, &SessionPrivate::id_,
                       &SessionPrivate::key_, &SessionPrivate::uid_, &SessionPrivate::ip_,
                       &SessionPrivate::timeout_>;

}  // namespace tuvo_test

namespace {

using TUVO::sharing::db::Row;
using TUVO::sharing::db::SharingDB;
using TUVO::sharing::record::Object;
using TUVO::sharing::record::Session;
using TUVO::sharing::record::SessionPrivate;
using tuvo_test::ExpectFailed;
using tuvo_test::FetchedRow;
using tuvo_test::MembersOf;
using tuvo_test::ParseJson;
using tuvo_test::SelectedRow;
using tuvo_test::SyslogListener;
using tuvo_test::WithinOneSecond;

using Texts = std::vector<std::string>;

constexpr unsigned int kNobody = 4294967295U;
constexpr char kIdentifier[] = "0123456789abcdefABCDEF-_wxyzWXYZ";

static_assert(std::is_polymorphic<Session>::value);
static_assert(std::has_virtual_destructor<Session>::value);
static_assert(sizeof(Session) == 2 * sizeof(void*), "one pointer beside the table's");
static_assert(!std::is_base_of<Object, Session>::value);
static_assert(std::is_base_of<Object, SessionPrivate>::value);
static_assert(std::is_same<
              tuvo_test::TypesOf<decltype(MembersOf(std::declval<const SessionPrivate&>()))>,
              std::tuple<bool, int, std::string, unsigned int, std::string, std::time_t>>::value);
static_assert(std::is_default_constructible<Session>::value);

static_assert(std::is_same<decltype(&Session::GetObject), Object& (Session::*)()>::value);
static_assert(
    std::is_same<decltype(&Session::GetCObject), const Object& (Session::*)() const>::value);
static_assert(std::is_same<decltype(&Session::GetFieldList), Texts (Session::*)() const>::value);
static_assert(std::is_same<decltype(&Session::GetFieldMap),
                           std::map<std::string, std::string> (Session::*)() const>::value);
static_assert(std::is_same<decltype(&Session::IsLegal), bool (Session::*)() const>::value);
static_assert(
    std::is_same<decltype(&Session::ToJSON), void (Session::*)(Json::Value&) const>::value);
static_assert(std::is_same<decltype(&Session::FromRow), bool (Session::*)(const Row&)>::value);
static_assert(std::is_same<decltype(&Session::get_id), int (Session::*)() const>::value);
static_assert(std::is_same<decltype(&Session::set_id), Session& (Session::*)(int)>::value);
static_assert(
    std::is_same<decltype(&Session::get_session_id), std::string (Session::*)() const>::value);
static_assert(std::is_same<decltype(&Session::set_session_id),
                           Session& (Session::*)(const std::string&)>::value);
static_assert(std::is_same<decltype(&Session::get_uid), unsigned int (Session::*)() const>::value);
static_assert(std::is_same<decltype(&Session::set_uid), void (Session::*)(unsigned int)>::value);
static_assert(std::is_same<decltype(&Session::get_ip), std::string (Session::*)() const>::value);
static_assert(
    std::is_same<decltype(&Session::set_ip), Session& (Session::*)(const std::string&)>::value);
static_assert(
    std::is_same<decltype(&Session::get_timeout), std::time_t (Session::*)() const>::value);
static_assert(std::is_same<decltype(&Session::set_timeout), void (Session::*)(long)>::value);
static_assert(std::is_same<decltype(std::declval<Session&>() = std::declval<const Session&>()),
                           Session&>::value);
static_assert(
    std::is_same<decltype(std::declval<Session&>() = std::declval<Session>()), Session&>::value);

Session Make(int id, const std::string& session_id, unsigned int uid, const std::string& ip,
             long timeout) {
  Session session;
  session.set_id(id).set_session_id(session_id).set_ip(ip);
  session.set_uid(uid);
  session.set_timeout(timeout);
  return session;
}

// Everything that a session holds.
Texts Contents(const Session& session) {
  Texts contents = session.GetFieldList();
  contents.push_back(std::to_string(session.get_id()));
  return contents;
}

long Future() {
  return std::time(nullptr) + 1000;
}

// What the base holds for every record: here it is copied along and means nothing.
bool& Mark(Session& session) {
  auto& fields = static_cast<SessionPrivate&>(session.GetObject());
  return fields.*std::get<0>(MembersOf(fields));
}

// Programs that were built against the library rely on both.
TEST(Session, FieldsStandInTheirOrder) {
  Session session;
  const auto& fields = static_cast<const SessionPrivate&>(session.GetCObject());
  EXPECT_TRUE(tuvo_test::StandInThisOrder(fields, MembersOf(fields)));
}

TEST(Session, HasNoVirtualOperationButItsDestructor) {
  if (!tuvo_test::kTablesCanBeRead) {
    GTEST_SKIP() << "on this processor tables are read in another way";
  }
  EXPECT_EQ(tuvo_test::SlotCount<Session>(), 2U);
  EXPECT_EQ(tuvo_test::SlotCount<SessionPrivate>(), tuvo_test::SlotCount<Object>());
}

TEST(Session, StartsEmptyAndWithoutUser) {
  const Session session;
  EXPECT_EQ(session.get_id(), 0);
  EXPECT_EQ(session.get_session_id(), "");
  EXPECT_EQ(session.get_uid(), kNobody);
  EXPECT_EQ(session.get_ip(), "");
  EXPECT_EQ(session.get_timeout(), 0);
}

TEST(Session, KeepsWhatItIsGiven) {
  const Session session = Make(1, kIdentifier, 2001, "192.0.2.7", 4);
  EXPECT_EQ(session.get_id(), 1);
  EXPECT_EQ(session.get_session_id(), kIdentifier);
  EXPECT_EQ(session.get_uid(), 2001U);
  EXPECT_EQ(session.get_ip(), "192.0.2.7");
  EXPECT_EQ(session.get_timeout(), 4);
}

TEST(Session, SettersTakeAnyValue) {
  const std::string bytes("\0\xff'\"", 4);
  const Session session = Make(INT_MIN, bytes, 0, bytes, LONG_MIN);
  EXPECT_EQ(session.get_id(), INT_MIN);
  EXPECT_EQ(session.get_session_id(), bytes);
  EXPECT_EQ(session.get_uid(), 0U);
  EXPECT_EQ(session.get_ip(), bytes);
  EXPECT_EQ(session.get_timeout(), LONG_MIN);
}

TEST(Session, SettersThatReturnSomethingReturnTheSessionItself) {
  Session session;
  EXPECT_EQ(&session.set_id(5), &session);
  EXPECT_EQ(&session.set_session_id("x"), &session);
  EXPECT_EQ(&session.set_ip("x"), &session);
}

TEST(Session, IsSeenByTheStoresAsOneObjectOfItsOwn) {
  Session session = Make(4, kIdentifier, 2001, "::1", Future());
  const Session other;
  EXPECT_EQ(&session.GetObject(), &session.GetCObject());
  EXPECT_NE(&session.GetCObject(), &other.GetCObject());
  EXPECT_NE(dynamic_cast<SessionPrivate*>(&session.GetObject()), nullptr);
  EXPECT_EQ(session.GetObject().get_id(), 4);
  EXPECT_EQ(session.GetObject().GetFieldList(), session.GetFieldList());
  EXPECT_EQ(session.GetObject().GetFieldMap(), session.GetFieldMap());
  EXPECT_TRUE(session.GetObject().IsLegal());
  session.GetObject().set_id(9);
  EXPECT_EQ(session.get_id(), 9);
  EXPECT_FALSE(session.GetObject().FromRow(SelectedRow("8 AS id")));
  EXPECT_EQ(session.get_id(), 8);
}

TEST(Session, ListsItsColumnsInTableOrderWithoutTheId) {
  EXPECT_EQ(Make(3, kIdentifier, 2001, "192.0.2.7", 1700000000).GetFieldList(),
            (Texts{kIdentifier, "2001", "192.0.2.7", "1700000000"}));
}

TEST(Session, ListsTextsBareAndNumbersInPlainDecimal) {
  EXPECT_EQ(Make(0, "it's \"x\"\\", kNobody, "a'b\n", -5).GetFieldList(),
            (Texts{"it's \"x\"\\", "4294967295", "a'b\n", "-5"}));
}

TEST(Session, MapsItsColumnsByName) {
  const std::map<std::string, std::string> expected{
      {"session_id", kIdentifier}, {"uid", "2001"}, {"ip", "192.0.2.7"}, {"timeout", "1700000000"}};
  EXPECT_EQ(Make(3, kIdentifier, 2001, "192.0.2.7", 1700000000).GetFieldMap(), expected);
}

TEST(Session, WithoutIdentifierIsIllegal) {
  SyslogListener log;
  errno = 0;
  EXPECT_FALSE(Session().IsLegal());
  ExpectFailed(log, "session", {"\"\" == session_id_"});
}

TEST(Session, WithoutAddressIsIllegalWhateverItsTimeout) {
  SyslogListener log;
  errno = 0;
  EXPECT_FALSE(Make(1, kIdentifier, 2001, "", Future()).IsLegal());
  ExpectFailed(log, "session", {"\"\" == ip_"});
  EXPECT_FALSE(Make(1, kIdentifier, 2001, "", 0).IsLegal());
  ExpectFailed(log, "session", {"\"\" == ip_"});
}

TEST(Session, WhoseTimeHasPassedIsIllegal) {
  SyslogListener log;
  errno = 0;
  EXPECT_FALSE(Make(1, kIdentifier, 2001, "::1", 1).IsLegal());
  ExpectFailed(log, "session", {"time(NULL) >= timeout_"});
}

TEST(Session, IsIllegalFromTheVerySecondOfItsTimeout) {
  SyslogListener log;
  const auto legal_at = [](long offset) {
    return WithinOneSecond(
        [&](std::time_t now) { return Make(1, kIdentifier, 2001, "::1", now + offset).IsLegal(); });
  };
  EXPECT_FALSE(legal_at(-1));
  EXPECT_FALSE(legal_at(0));
  log.Take();
  EXPECT_TRUE(legal_at(1));
}

TEST(Session, IsLegalWhateverTheBasesMarkSaysAndLeavesIt) {
  Session session = Make(1, kIdentifier, 7, "::1", Future());
  for (const bool mark : {false, true}) {
    Mark(session) = mark;
    EXPECT_TRUE(session.IsLegal());
    EXPECT_FALSE(session.FromRow(SelectedRow("1 AS id")));
    EXPECT_EQ(Mark(session), mark);
    session = Make(1, kIdentifier, 7, "::1", Future());
  }
}

TEST(Session, WithoutUserIsLegalAndLogsNothing) {
  SyslogListener log;
  EXPECT_TRUE(Make(0, kIdentifier, kNobody, "::1", Future()).IsLegal());
  EXPECT_TRUE(log.Take().empty());
}

TEST(Session, LogsTheReasonOfErrnoAndLeavesItAlone) {
  SyslogListener log;
  errno = EACCES;
  EXPECT_FALSE(Session().IsLegal());
  EXPECT_EQ(errno, EACCES);
  ExpectFailed(log, "session", {"\"\" == session_id_"}, EACCES);
}

TEST(Session, JsonHasFourMembersAndNoId) {
  Json::Value value;
  Make(3, kIdentifier, kNobody, "192.0.2.7", LONG_MAX).ToJSON(value);
  EXPECT_EQ(value.getMemberNames(), (Texts{"ip", "session_id", "timeout", "uid"}));
  EXPECT_EQ(value["session_id"], Json::Value(kIdentifier));
  EXPECT_EQ(value["uid"], Json::Value(kNobody));
  EXPECT_TRUE(value["uid"].isUInt());
  EXPECT_EQ(value["ip"], Json::Value("192.0.2.7"));
  EXPECT_EQ(value["timeout"], Json::Value(Json::Int64{LONG_MAX}));
}

TEST(Session, JsonLeavesOtherMembersAlone) {
  Json::Value value = ParseJson(R"({"id":1,"other":[2],"ip":"old"})");
  Make(3, "x", 4, "::1", 8).ToJSON(value);
  EXPECT_EQ(value.getMemberNames(), (Texts{"id", "ip", "other", "session_id", "timeout", "uid"}));
  EXPECT_EQ(value["id"], Json::Value(1));
  EXPECT_EQ(value["other"], ParseJson("[2]"));
  EXPECT_EQ(value["ip"], Json::Value("::1"));
}

TEST(Session, LoadsARow) {
  const long timeout = Future();
  Session session;
  EXPECT_TRUE(
      session.FromRow(SelectedRow("3 AS id, 'abc' AS session_id, 2001 AS uid, '::1' AS ip, " +
                                  std::to_string(timeout) + " AS timeout")));
  EXPECT_EQ(Contents(session), Contents(Make(3, "abc", 2001, "::1", timeout)));
}

TEST(Session, OfAPastRowIsLoadedButIllegal) {
  SyslogListener log;
  errno = 0;
  Session session;
  EXPECT_FALSE(session.FromRow(SelectedRow(
      "1600000000 AS timeout, '::1' AS ip, 2001 AS uid, 'abc' AS session_id, 3 AS id")));
  ExpectFailed(log, "session", {"time(NULL) >= timeout_"});
  EXPECT_EQ(Contents(session), Contents(Make(3, "abc", 2001, "::1", 1600000000)));
}

TEST(Session, TakesDefaultsForValuesThatARowLacks) {
  SyslogListener log;
  errno = 0;
  for (const char* columns :
       {"NULL AS id, NULL AS session_id, NULL AS uid, NULL AS ip, NULL AS timeout",
        "'' AS id, '' AS session_id, '' AS uid, '' AS ip, '' AS timeout",
        "'x' AS id, 'x' AS uid, 'x' AS timeout",
        "99999999999 AS id, 4294967296 AS uid, '99999999999999999999' AS timeout",
        "1 AS something"}) {
    Session session = Make(1, "x", 3, "x", Future());
    EXPECT_FALSE(session.FromRow(SelectedRow(columns)));
    EXPECT_EQ(Contents(session), Contents(Session())) << columns;
    ExpectFailed(log, "session", {"\"\" == session_id_"});
  }
}

TEST(Session, ReadsNumbersAsStreamsDo) {
  Session session;
  session.FromRow(SelectedRow("' 12abc' AS id, '-1' AS uid, '1600000000.5' AS timeout"));
  EXPECT_EQ(session.get_id(), 12);
  EXPECT_EQ(session.get_uid(), kNobody);
  EXPECT_EQ(session.get_timeout(), 1600000000);
  session.FromRow(SelectedRow("'7 8' AS uid"));
  EXPECT_EQ(session.get_uid(), 7U);
}

TEST(Session, OfARowThatIsNotThereIsEmpty) {
  Session session = Make(1, "x", 3, "x", Future());
  EXPECT_FALSE(session.FromRow(Row()));
  EXPECT_EQ(Contents(session), Contents(Session()));
}

TEST(Session, SurvivesItsTable) {
  unlink("/tmp/session.db");
  SharingDB db("/tmp/session.db");
  ASSERT_TRUE(db.IsGood());
  std::string bytes;
  for (int byte = 1; byte < 256; ++byte) {
    bytes.push_back(static_cast<char>(byte));
  }
  const Session odd = Make(1, bytes, kNobody, bytes + "'", Future());
  ASSERT_TRUE(db.Insert("session", odd.GetFieldList())) << db.GetLastError();
  // Digits alone stay a text.
  const Session digits = Make(2, "00000000000000000000000000000042", 0, "0", Future());
  ASSERT_TRUE(db.Insert("session", digits.GetFieldList())) << db.GetLastError();
  Session loaded;
  EXPECT_TRUE(loaded.FromRow(FetchedRow(db, "SELECT * FROM session WHERE id = 1")));
  EXPECT_EQ(Contents(loaded), Contents(odd));
  EXPECT_TRUE(loaded.FromRow(FetchedRow(db, "SELECT * FROM session WHERE id = 2")));
  EXPECT_EQ(Contents(loaded), Contents(digits));

  loaded.set_timeout(Future() + 5);
  ASSERT_TRUE(db.Update("session", loaded.GetFieldMap(), 2));
  Session again;
  EXPECT_TRUE(again.FromRow(FetchedRow(db, "SELECT * FROM session WHERE id = 2")));
  EXPECT_EQ(Contents(again), Contents(loaded));
}

TEST(Session, CopyIsIndependent) {
  Session source = Make(3, kIdentifier, 7, "192.0.2.7", 9);
  Session copy(source);
  EXPECT_EQ(Contents(copy), Contents(source));
  copy.set_session_id("other").set_id(30);
  source.set_ip("::1");
  EXPECT_EQ(Contents(source), Contents(Make(3, kIdentifier, 7, "::1", 9)));
  EXPECT_EQ(Contents(copy), Contents(Make(30, "other", 7, "192.0.2.7", 9)));
}

TEST(Session, CopyAssignmentKeepsTheObjectAndCopiesEveryField) {
  const Session source = Make(3, kIdentifier, 7, "192.0.2.7", 9);
  Session target = Make(1, "x", 1, "x", 1);
  const Object* object = &target.GetObject();
  EXPECT_EQ(&(target = source), &target);
  EXPECT_EQ(&target.GetObject(), object);
  EXPECT_EQ(Contents(target), Contents(source));
  EXPECT_EQ(Contents(source), Contents(Make(3, kIdentifier, 7, "192.0.2.7", 9)));
}

TEST(Session, MovedFromIsUsableWithoutTextsAndWithItsNumbers) {
  // One text that fits the small-string buffer and one that does not.
  Session source = Make(3, kIdentifier, 7, "::1", 9);
  const Session constructed(std::move(source));
  EXPECT_EQ(Contents(constructed), Contents(Make(3, kIdentifier, 7, "::1", 9)));
  EXPECT_EQ(Contents(source), Contents(Make(3, "", 7, "", 9)));
  EXPECT_NE(&source.GetCObject(), &constructed.GetCObject());

  source.set_session_id("again").set_ip("2001:db8:1:2:3:4:5:6");
  Session target = Make(1, "old", 1, "old", 1);
  const Object* object = &target.GetObject();
  EXPECT_EQ(&(target = std::move(source)), &target);
  EXPECT_EQ(&target.GetObject(), object);
  EXPECT_EQ(Contents(target), Contents(Make(3, "again", 7, "2001:db8:1:2:3:4:5:6", 9)));
  EXPECT_EQ(Contents(source), Contents(Make(3, "", 7, "", 9)));

  source.set_session_id("x").set_ip("x").set_timeout(Future());
  EXPECT_TRUE(source.IsLegal());
}

TEST(Session, CopiesAndMovesTheBasesMark) {
  Session source;
  Mark(source) = false;
  Session copied(source);
  Session assigned;
  assigned = source;
  Session moved(std::move(copied));
  Session move_assigned;
  move_assigned = std::move(assigned);
  for (Session* session : {&source, &copied, &assigned, &moved, &move_assigned}) {
    EXPECT_FALSE(Mark(*session));
  }
}

TEST(Session, AssignedToItselfStaysAsItIs) {
  Session session = Make(3, kIdentifier, 7, "::1", 9);
  Session& same = session;
  session = same;
  EXPECT_EQ(Contents(session), Contents(Make(3, kIdentifier, 7, "::1", 9)));
  session = std::move(same);
  EXPECT_EQ(Contents(session), Contents(Make(3, kIdentifier, 7, "::1", 9)));
}

}  // namespace
