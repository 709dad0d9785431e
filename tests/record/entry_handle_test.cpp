// The public handle of a link: its accessors, its times as texts, copying and moving.
#include <internal/entry_private.h>
#include <tuvosharing/keys.h>

#include <climits>
#include <type_traits>

#include "record/record_testing.h"
#include "support/class_layout.h"

namespace tuvo_test {

using TUVO::sharing::record::EntryPrivate;
auto MembersOf(const EntryPrivate&);
template struct Reveal<
    EntryPrivate, &EntryPrivate::blValid_, &EntryPrivate::id_, &EntryPrivate::key_,
    &EntryPrivate::project_name_, &EntryPrivate::enabled_, &EntryPrivate::owner_uid_,
    &EntryPrivate::start_at_, &EntryPrivate::expire_at_, &EntryPrivate::expire_times_,
    &EntryPrivate::use_count_, &EntryPrivate::auto_gc_, &EntryPrivate::enable_match_ip_,
    &EntryPrivate::protect_type_, &EntryPrivate::protect_title_, &EntryPrivate::protect_password_,
    &EntryPrivate::protect_password_salt_, &EntryPrivate::protect_password_algo_,
    &EntryPrivate::protect_uids_, &EntryPrivate::protect_extra_users_, &EntryPrivate::protect_gids_,
    &EntryPrivate::protect_extra_groups_, &EntryPrivate::redirect_type_,
    &EntryPrivate::redirect_uri_, &EntryPrivate::app_, &EntryPrivate::private_data_>;

}  // namespace tuvo_test

namespace {

using TUVO::sharing::db::Row;
using TUVO::sharing::record::Entry;
using TUVO::sharing::record::EntryPrivate;
using TUVO::sharing::record::Object;
using tuvo_test::Contents;
using tuvo_test::DataOf;
using tuvo_test::FullEntry;
using tuvo_test::LegalEntry;
using tuvo_test::MembersOf;
using tuvo_test::ParseJson;
using tuvo_test::ScopedZone;
using tuvo_test::SelectedRow;

using Texts = std::vector<std::string>;
using Ids = std::vector<unsigned int>;

constexpr unsigned int kNobody = 4294967295U;
constexpr char kFormat[] = "%Y-%m-%d %H:%M:%S";
constexpr std::time_t kDay = 86400;

// ---- The interface, as programs compile against it

static_assert(std::is_polymorphic<Entry>::value);
static_assert(std::has_virtual_destructor<Entry>::value);
static_assert(sizeof(Entry) == 2 * sizeof(void*), "one pointer beside the table's");
static_assert(!std::is_base_of<Object, Entry>::value);
static_assert(std::is_base_of<Object, EntryPrivate>::value);
static_assert(
    std::is_same<
        tuvo_test::TypesOf<decltype(MembersOf(std::declval<const EntryPrivate&>()))>,
        std::tuple<bool, int, std::string, std::string, bool, unsigned int, std::time_t,
                   std::time_t, int, int, bool, bool, Entry::ProtectType, std::string, std::string,
                   std::string, Entry::PasswordEncryptAlgo, Ids, Texts, Ids, Texts,
                   Entry::RedirectType, std::string, Json::Value, Json::Value>>::value);
static_assert(std::is_default_constructible<Entry>::value);

static_assert(Entry::PROTECT_NONE == 0 && Entry::PROTECT_PASSWORD == 1 && Entry::PROTECT_USER == 2);
static_assert(Entry::ENCRYPT_ALGO_DEFAULT == 0 && Entry::ENCRYPT_ALGO_MD5 == 1);
static_assert(Entry::REDIRECT_NONE == 0 && Entry::REDIRECT_URLPARAM == 1 &&
              Entry::REDIRECT_ALWAYS == 2);
static_assert(std::is_convertible<Entry::ProtectType, int>::value);
static_assert(std::is_convertible<Entry::PasswordEncryptAlgo, int>::value);
static_assert(std::is_convertible<Entry::RedirectType, int>::value);
static_assert(std::is_same<std::underlying_type_t<Entry::ProtectType>, int>::value);
static_assert(std::is_same<std::underlying_type_t<Entry::PasswordEncryptAlgo>, int>::value);
static_assert(std::is_same<std::underlying_type_t<Entry::RedirectType>, int>::value);

template <typename Result, typename... Arguments>
using Reader = Result (Entry::*)(Arguments...) const;
template <typename... Arguments>
using Setter = Entry& (Entry::*)(Arguments...);

#define HAS(member, type) static_assert(std::is_same<decltype(&Entry::member), type>::value)
HAS(GetObject, Object& (Entry::*)());
HAS(GetCObject, Reader<const Object&>);
HAS(GetFieldList, Reader<Texts>);
using StringMap = std::map<std::string, std::string>;
HAS(GetFieldMap, Reader<StringMap>);
HAS(IsLegal, Reader<bool>);
HAS(IsValid, Reader<bool>);
using PasswordCheck = Reader<bool, const std::string&>;
HAS(IsPasswordValid, PasswordCheck);
using JsonWriter = Reader<void, Json::Value&>;
HAS(ToJSON, JsonWriter);
HAS(FromRow, bool (Entry::*)(const Row&));
HAS(get_id, Reader<int>);
HAS(set_id, Setter<int>);
HAS(get_hash, Reader<std::string>);
HAS(set_hash, Setter<std::string>);
HAS(get_project_name, Reader<std::string>);
HAS(set_project_name, Setter<const std::string&>);
HAS(get_enabled, Reader<bool>);
HAS(set_enabled, Setter<const bool&>);
HAS(get_owner_uid, Reader<unsigned int>);
HAS(set_owner_uid, Setter<unsigned int>);
HAS(get_owner_user, Reader<std::string>);
HAS(set_owner_user, Setter<const std::string&>);
using TimeReader = Reader<std::string, const char*>;
using TimeSetter = Setter<const std::string&, const char*>;
HAS(get_start_at, Reader<std::time_t>);
HAS(set_start_at, Setter<long>);
HAS(get_start_at_str, TimeReader);
HAS(set_start_at_str, TimeSetter);
HAS(get_expire_at, Reader<std::time_t>);
HAS(set_expire_at, Setter<long>);
HAS(get_expire_at_str, TimeReader);
HAS(set_expire_at_str, TimeSetter);
HAS(get_expire_times, Reader<int>);
HAS(set_expire_times, Setter<const int&>);
HAS(get_use_count, Reader<int>);
HAS(set_use_count, Setter<const int&>);
HAS(inc_use_count, void (Entry::*)());
HAS(get_auto_gc, Reader<bool>);
HAS(set_auto_gc, Setter<const bool&>);
HAS(get_enable_match_ip, Reader<bool>);
HAS(set_enable_match_ip, Setter<bool>);
HAS(get_protect_type, Reader<Entry::ProtectType>);
HAS(set_protect_type, Setter<Entry::ProtectType>);
HAS(get_protect_title, Reader<std::string>);
HAS(set_protect_title, Setter<const std::string&>);
HAS(get_protect_password, Reader<std::string>);
using PasswordSetter = Setter<const std::string&, bool, Entry::PasswordEncryptAlgo>;
HAS(set_protect_password, PasswordSetter);
HAS(get_protect_password_algo, Reader<Entry::PasswordEncryptAlgo>);
HAS(get_protect_password_salt, Reader<std::string>);
HAS(get_protect_users, Reader<Texts>);
HAS(set_protect_users, Setter<const Texts&>);
HAS(get_protect_uids, Reader<Ids>);
HAS(set_protect_uids, Setter<const Ids&>);
HAS(get_protect_groups, Reader<Texts>);
HAS(set_protect_groups, Setter<const Texts&>);
HAS(get_protect_gids, Reader<Ids>);
HAS(set_protect_gids, Setter<const Ids&>);
HAS(get_redirect_type, Reader<Entry::RedirectType>);
HAS(set_redirect_type, Setter<Entry::RedirectType>);
HAS(get_redirect_uri, Reader<std::string>);
HAS(set_redirect_uri, Setter<const std::string&>);
HAS(get_app, Reader<Json::Value>);
HAS(set_app, Setter<const Json::Value&>);
HAS(get_private_data, Reader<Json::Value>);
HAS(set_private_data, Setter<const Json::Value&>);
#undef HAS
static_assert(
    std::is_same<decltype(std::declval<Entry&>() = std::declval<const Entry&>()), Entry&>::value);
static_assert(
    std::is_same<decltype(std::declval<Entry&>() = std::declval<Entry>()), Entry&>::value);

// ---- In memory

// Programs that were built against the library rely on both.
TEST(Entry, FieldsStandInTheirOrder) {
  Entry entry;
  const auto& fields = static_cast<const EntryPrivate&>(entry.GetCObject());
  EXPECT_TRUE(tuvo_test::StandInThisOrder(fields, MembersOf(fields)));
}

TEST(Entry, HasNoVirtualOperationButItsDestructor) {
  if (!tuvo_test::kTablesCanBeRead) {
    GTEST_SKIP() << "on this processor tables are read in another way";
  }
  EXPECT_EQ(tuvo_test::SlotCount<Entry>(), 2U);
  EXPECT_EQ(tuvo_test::SlotCount<EntryPrivate>(), tuvo_test::SlotCount<Object>());
}

// ---- Accessors

TEST(Entry, StartsWithItsDefaults) {
  const Entry entry;
  EXPECT_EQ(entry.get_id(), 0);
  EXPECT_EQ(entry.get_hash(), "");
  EXPECT_EQ(entry.get_project_name(), "");
  EXPECT_TRUE(entry.get_enabled());
  EXPECT_EQ(entry.get_owner_uid(), kNobody);
  EXPECT_EQ(entry.get_owner_user(), "");
  EXPECT_EQ(entry.get_start_at(), 0);
  EXPECT_EQ(entry.get_expire_at(), 0);
  EXPECT_EQ(entry.get_expire_times(), 0);
  EXPECT_EQ(entry.get_use_count(), 0);
  EXPECT_TRUE(entry.get_auto_gc());
  EXPECT_TRUE(entry.get_enable_match_ip());
  EXPECT_EQ(entry.get_protect_type(), Entry::PROTECT_NONE);
  EXPECT_EQ(entry.get_protect_title(), "");
  EXPECT_EQ(entry.get_protect_password(), "");
  EXPECT_EQ(entry.get_protect_password_salt(), "");
  EXPECT_EQ(entry.get_protect_password_algo(), Entry::ENCRYPT_ALGO_DEFAULT);
  EXPECT_EQ(entry.get_protect_users(), Texts());
  EXPECT_EQ(entry.get_protect_uids(), Ids());
  EXPECT_EQ(entry.get_protect_groups(), Texts());
  EXPECT_EQ(entry.get_protect_gids(), Ids());
  EXPECT_EQ(entry.get_redirect_type(), Entry::REDIRECT_NONE);
  EXPECT_EQ(entry.get_redirect_uri(), "");
  EXPECT_TRUE(entry.get_app().isNull());
  EXPECT_EQ(entry.get_private_data(), Json::Value(Json::objectValue));
}

TEST(Entry, KeepsWhatItIsGiven) {
  const Entry entry = FullEntry();
  EXPECT_EQ(entry.get_id(), 17);
  EXPECT_EQ(entry.get_hash(), "aB3xY7k9Q");
  EXPECT_EQ(entry.get_project_name(), "photos");
  EXPECT_FALSE(entry.get_enabled());
  EXPECT_EQ(entry.get_owner_uid(), 2001U);
  EXPECT_EQ(entry.get_start_at(), 1600000000);
  EXPECT_EQ(entry.get_expire_at(), 1700000000);
  EXPECT_EQ(entry.get_expire_times(), 9);
  EXPECT_EQ(entry.get_use_count(), 4);
  EXPECT_FALSE(entry.get_auto_gc());
  EXPECT_FALSE(entry.get_enable_match_ip());
  EXPECT_EQ(entry.get_protect_type(), Entry::PROTECT_PASSWORD);
  EXPECT_EQ(entry.get_protect_title(), "A title, and a long one");
  EXPECT_EQ(entry.get_redirect_type(), Entry::REDIRECT_ALWAYS);
  EXPECT_EQ(entry.get_redirect_uri(), "https://example.com/a/page");
  EXPECT_EQ(entry.get_app(), ParseJson(R"({"path":["/exports/photos",1,2.5,null,true]})"));
  EXPECT_EQ(entry.get_private_data(), ParseJson(R"({"key":{"inner":"secret"}})"));
}

TEST(Entry, SettersReturnTheLinkItself) {
  Entry entry;
  EXPECT_EQ(&entry.set_id(1), &entry);
  EXPECT_EQ(&entry.set_hash(""), &entry);
  EXPECT_EQ(&entry.set_project_name(""), &entry);
  EXPECT_EQ(&entry.set_enabled(true), &entry);
  EXPECT_EQ(&entry.set_owner_uid(1), &entry);
  EXPECT_EQ(&entry.set_owner_user("alice"), &entry);
  EXPECT_EQ(&entry.set_start_at(1), &entry);
  EXPECT_EQ(&entry.set_start_at_str("", kFormat), &entry);
  EXPECT_EQ(&entry.set_expire_at(1), &entry);
  EXPECT_EQ(&entry.set_expire_at_str("", kFormat), &entry);
  EXPECT_EQ(&entry.set_expire_times(1), &entry);
  EXPECT_EQ(&entry.set_use_count(1), &entry);
  EXPECT_EQ(&entry.set_auto_gc(true), &entry);
  EXPECT_EQ(&entry.set_enable_match_ip(true), &entry);
  EXPECT_EQ(&entry.set_protect_type(Entry::PROTECT_NONE), &entry);
  EXPECT_EQ(&entry.set_protect_title(""), &entry);
  EXPECT_EQ(&entry.set_protect_password("", true, Entry::ENCRYPT_ALGO_MD5), &entry);
  EXPECT_EQ(&entry.set_protect_users({}), &entry);
  EXPECT_EQ(&entry.set_protect_uids({}), &entry);
  EXPECT_EQ(&entry.set_protect_groups({}), &entry);
  EXPECT_EQ(&entry.set_protect_gids({}), &entry);
  EXPECT_EQ(&entry.set_redirect_type(Entry::REDIRECT_NONE), &entry);
  EXPECT_EQ(&entry.set_redirect_uri(""), &entry);
  EXPECT_EQ(&entry.set_app(1), &entry);
  EXPECT_EQ(&entry.set_private_data(1), &entry);
}

// Each setter against all fields: what it is for changes, and nothing else does.
TEST(Entry, SettersChangeTheirFieldOnly) {
  const Texts before = Contents(FullEntry());
  const auto changed = [&before](Entry entry) {
    // The salt differs from link to link.
    const Texts after = Contents(entry);
    std::string places;
    for (size_t i = 0; i + 2 < after.size(); ++i) {
      places += after[i] != before[i] ? std::to_string(i) + " " : "";
    }
    places += after.back() != before.back() ? "id " : "";
    const Json::Value data = DataOf(entry);
    const Json::Value old = ParseJson(before[9]);
    for (const std::string& name : old.getMemberNames()) {
      if (name != "protect_password_salt" && data[name] != old[name]) {
        places += name + " ";
      }
    }
    return places;
  };
  EXPECT_EQ(changed(FullEntry()), "");
  EXPECT_EQ(changed(FullEntry().set_id(1)), "id ");
  EXPECT_EQ(changed(FullEntry().set_hash("x")), "0 ");
  EXPECT_EQ(changed(FullEntry().set_project_name("x")), "1 ");
  EXPECT_EQ(changed(FullEntry().set_enabled(true)), "2 ");
  EXPECT_EQ(changed(FullEntry().set_owner_uid(1)), "3 ");
  EXPECT_EQ(changed(FullEntry().set_owner_user("bob")), "3 ");
  EXPECT_EQ(changed(FullEntry().set_start_at(1)), "4 ");
  EXPECT_EQ(changed(FullEntry().set_start_at_str("", kFormat)), "4 ");
  EXPECT_EQ(changed(FullEntry().set_expire_at(1)), "5 ");
  EXPECT_EQ(changed(FullEntry().set_expire_at_str("", kFormat)), "5 ");
  EXPECT_EQ(changed(FullEntry().set_expire_times(1)), "6 ");
  EXPECT_EQ(changed(FullEntry().set_use_count(1)), "7 ");
  EXPECT_EQ(changed(FullEntry().set_auto_gc(true)), "8 ");
  EXPECT_EQ(changed(FullEntry().set_enable_match_ip(true)), "enable_match_ip ");
  EXPECT_EQ(changed(FullEntry().set_protect_type(Entry::PROTECT_USER)), "protect_type ");
  EXPECT_EQ(changed(FullEntry().set_protect_title("x")), "protect_title ");
  EXPECT_EQ(changed(FullEntry().set_protect_password("x", false, Entry::ENCRYPT_ALGO_DEFAULT)),
            "protect_password protect_password_algo ");
  EXPECT_EQ(changed(FullEntry().set_protect_users({"carol", "x"})),
            "protect_extra_users protect_uids ");
  EXPECT_EQ(changed(FullEntry().set_protect_uids({1})), "protect_extra_users protect_uids ");
  EXPECT_EQ(changed(FullEntry().set_protect_groups({"bob", "x"})),
            "protect_extra_groups protect_gids ");
  EXPECT_EQ(changed(FullEntry().set_protect_gids({1})), "protect_extra_groups protect_gids ");
  EXPECT_EQ(changed(FullEntry().set_redirect_type(Entry::REDIRECT_NONE)), "redirect_type ");
  EXPECT_EQ(changed(FullEntry().set_redirect_uri("x")), "redirect_uri ");
  EXPECT_EQ(changed(FullEntry().set_app(1)), "app ");
  EXPECT_EQ(changed(FullEntry().set_private_data(1)), "private_data ");
  Entry used = FullEntry();
  used.inc_use_count();
  EXPECT_EQ(changed(used), "7 ");
}

TEST(Entry, SettersTakeAnyValue) {
  const std::string bytes("\0\xff'\"\n", 5);
  Entry entry;
  entry.set_id(INT_MIN).set_hash(bytes).set_project_name(bytes).set_start_at(LONG_MIN);
  entry.set_expire_at(LONG_MAX).set_use_count(INT_MIN).set_protect_title(bytes);
  entry.set_redirect_uri(bytes);
  EXPECT_EQ(entry.get_id(), INT_MIN);
  EXPECT_EQ(entry.get_hash(), bytes);
  EXPECT_EQ(entry.get_project_name(), bytes);
  EXPECT_EQ(entry.get_start_at(), LONG_MIN);
  EXPECT_EQ(entry.get_expire_at(), LONG_MAX);
  EXPECT_EQ(entry.get_use_count(), INT_MIN);
  EXPECT_EQ(entry.get_protect_title(), bytes);
  EXPECT_EQ(entry.get_redirect_uri(), bytes);
}

TEST(Entry, HandsOutCopiesOfItsDocuments) {
  Entry entry = FullEntry();
  Json::Value app = entry.get_app();
  app["path"] = "changed";
  EXPECT_EQ(entry.get_app(), FullEntry().get_app());
  Json::Value given(Json::objectValue);
  entry.set_private_data(given);
  given["later"] = 1;
  EXPECT_EQ(entry.get_private_data(), Json::Value(Json::objectValue));
}

TEST(Entry, IsSeenByTheStoresAsOneObjectOfItsOwn) {
  Entry entry = FullEntry();
  const Entry other;
  EXPECT_EQ(&entry.GetObject(), &entry.GetCObject());
  EXPECT_NE(&entry.GetCObject(), &other.GetCObject());
  EXPECT_NE(dynamic_cast<EntryPrivate*>(&entry.GetObject()), nullptr);
  EXPECT_EQ(entry.GetObject().get_id(), 17);
  EXPECT_EQ(entry.GetObject().GetFieldList(), entry.GetFieldList());
  EXPECT_EQ(entry.GetObject().GetFieldMap(), entry.GetFieldMap());
  EXPECT_TRUE(entry.GetObject().IsLegal());
  entry.GetObject().set_id(9);
  EXPECT_EQ(entry.get_id(), 9);
  EXPECT_FALSE(entry.GetObject().FromRow(SelectedRow("8 AS id")));
  EXPECT_EQ(entry.get_id(), 8);
  Json::Value through_object;
  Json::Value through_handle;
  entry.GetCObject().ToJSON(through_object);
  entry.ToJSON(through_handle);
  EXPECT_EQ(through_object, through_handle);
}

// ---- Counting uses

TEST(Entry, StartsCountingWhenALimitIsSetWhereThereWasNone) {
  Entry entry;
  entry.set_use_count(7).set_expire_times(3);
  EXPECT_EQ(entry.get_expire_times(), 3);
  EXPECT_EQ(entry.get_use_count(), 0);
}

TEST(Entry, GoesOnCountingWhenTheLimitChanges) {
  Entry entry;
  entry.set_expire_times(3).set_use_count(2).set_expire_times(5);
  EXPECT_EQ(entry.get_expire_times(), 5);
  EXPECT_EQ(entry.get_use_count(), 2);
  entry.set_expire_times(0);
  EXPECT_EQ(entry.get_expire_times(), 0);
  EXPECT_EQ(entry.get_use_count(), 2) << "the limit was lifted";
  entry.set_expire_times(0);
  EXPECT_EQ(entry.get_use_count(), 2) << "there was none and there is none";
}

TEST(Entry, TakesNegativeLimitsAsSet) {
  Entry entry;
  entry.set_use_count(7).set_expire_times(-1);
  EXPECT_EQ(entry.get_use_count(), 0);
  entry.set_use_count(7).set_expire_times(3);
  EXPECT_EQ(entry.get_use_count(), 7);
}

TEST(Entry, CountsUsesOneByOne) {
  Entry entry;
  entry.inc_use_count();
  entry.inc_use_count();
  EXPECT_EQ(entry.get_use_count(), 2);
  entry.set_use_count(-1);
  entry.inc_use_count();
  EXPECT_EQ(entry.get_use_count(), 0);
  entry.set_use_count(INT_MAX - 1);
  entry.inc_use_count();
  EXPECT_EQ(entry.get_use_count(), INT_MAX);
}

// A count that began again would open a used-up link.
TEST(Entry, StaysAtTheLargestCount) {
  Entry entry;
  entry.set_use_count(INT_MAX);
  entry.inc_use_count();
  EXPECT_EQ(entry.get_use_count(), INT_MAX);
}

// ---- Times as texts: the same for both times

struct TimeAccess {
  std::time_t (Entry::*get)() const;
  Entry& (Entry::*set)(long);
  std::string (Entry::*get_text)(const char*) const;
  Entry& (Entry::*set_text)(const std::string&, const char*);
};

class EntryTime : public testing::TestWithParam<TimeAccess> {
 protected:
  std::string Text(long time, const char* format = kFormat) {
    (entry_.*GetParam().set)(time);
    return (entry_.*GetParam().get_text)(format);
  }

  std::time_t Time(const std::string& text, const char* format = kFormat) {
    (entry_.*GetParam().set)(12345);
    (entry_.*GetParam().set_text)(text, format);
    return (entry_.*GetParam().get)();
  }

 private:
  Entry entry_;
};

INSTANTIATE_TEST_SUITE_P(Start, EntryTime,
                         testing::Values(TimeAccess{&Entry::get_start_at, &Entry::set_start_at,
                                                    &Entry::get_start_at_str,
                                                    &Entry::set_start_at_str}));
INSTANTIATE_TEST_SUITE_P(Expiry, EntryTime,
                         testing::Values(TimeAccess{&Entry::get_expire_at, &Entry::set_expire_at,
                                                    &Entry::get_expire_at_str,
                                                    &Entry::set_expire_at_str}));

TEST_P(EntryTime, IsALocalTimeText) {
  {
    const ScopedZone zone("UTC0");
    EXPECT_EQ(Text(1700000000), "2023-11-14 22:13:20");
    EXPECT_EQ(Time("2023-11-14 22:13:20"), 1700000000);
  }
  {
    const ScopedZone zone("XXX-5:30");
    EXPECT_EQ(Text(1700000000), "2023-11-15 03:43:20");
    EXPECT_EQ(Time("2023-11-15 03:43:20"), 1700000000);
  }
}

TEST_P(EntryTime, IsTakenInTheZoneOfTheMomentEvenIfTheZoneHasJustChanged) {
  const ScopedZone zone("UTC0");
  EXPECT_EQ(Text(1700000000), "2023-11-14 22:13:20");
  setenv("TZ", "XXX-5:30", 1);
  EXPECT_EQ(Text(1700000000), "2023-11-15 03:43:20");
  setenv("TZ", "UTC0", 1);
  EXPECT_EQ(Text(1700000000), "2023-11-14 22:13:20");
  setenv("TZ", "XXX-5:30", 1);
  EXPECT_EQ(Time("2023-11-15 03:43:20"), 1700000000);
}

TEST_P(EntryTime, FollowsTheFormat) {
  const ScopedZone zone("UTC0");
  EXPECT_EQ(Text(1700000000, "%d.%m.%y"), "14.11.23");
  EXPECT_EQ(Time("14.11.23", "%d.%m.%y"), 1699920000);
  EXPECT_EQ(Text(1700000000, "%s"), "1700000000");
  EXPECT_EQ(Text(1700000000, "no conversion"), "no conversion");
}

TEST_P(EntryTime, OfZeroIsNoText) {
  EXPECT_EQ(Text(0), "");
  EXPECT_EQ(Text(0, "text"), "");
}

TEST_P(EntryTime, BeforeTheEpochIsATextToo) {
  const ScopedZone zone("UTC0");
  EXPECT_EQ(Text(-1), "1969-12-31 23:59:59");
}

TEST_P(EntryTime, WithoutFormatIsNoTextAndNoTime) {
  EXPECT_EQ(Text(1700000000, nullptr), "");
  EXPECT_EQ(Time("2023-11-14 22:13:20", nullptr), 0);
  EXPECT_EQ(Text(1700000000, ""), "");
}

TEST_P(EntryTime, IsNoTextWhenLongerThan127Bytes) {
  EXPECT_EQ(Text(1700000000, std::string(127, 'x').c_str()), std::string(127, 'x'));
  EXPECT_EQ(Text(1700000000, std::string(128, 'x').c_str()), "");
  const ScopedZone zone("UTC0");
  EXPECT_EQ(Text(1700000000, (std::string(123, 'x') + "%Y").c_str()),
            std::string(123, 'x') + "2023");
  EXPECT_EQ(Text(1700000000, (std::string(124, 'x') + "%Y").c_str()), "");
}

TEST_P(EntryTime, BeyondTheCalendarIsNoText) {
  if (sizeof(std::time_t) < 8) {
    GTEST_SKIP() << "no time here is beyond the calendar";
  }
  EXPECT_EQ(Text(LONG_MAX), "");
  EXPECT_EQ(Text(LONG_MIN), "");
}

TEST_P(EntryTime, OfATextThatDoesNotFitIsNotSet) {
  for (const char* text : {"", "tomorrow", "2023-11-14", "2023-13-14 22:13:20",
                           "2023-11-14 24:13:20", "14.11.2023 22:13:20", "2023-11-14 22:13"}) {
    EXPECT_EQ(Time(text), 0) << text;
  }
}

TEST_P(EntryTime, OfATextThatGoesOnAfterTheTimeIsTheTime) {
  const ScopedZone zone("UTC0");
  EXPECT_EQ(Time("2023-11-14 22:13:20 and more"), 1700000000);
  EXPECT_EQ(Time(" 2023-11-14  22:13:20", "%Y-%m-%d %H:%M:%S"), 1700000000);
}

// A zone in which daylight saving lasts from `first` to `last`, counted in days from today.
std::string ZoneWithDaylightSaving(int first, int last) {
  const std::time_t now = std::time(nullptr);
  std::tm today{};
  gmtime_r(&now, &today);
  const auto day = [&today](int offset) {
    return std::to_string((today.tm_yday + offset + 365) % 365);
  };
  return "STD0DST," + day(first) + "," + day(last);
}

std::string HalfAYearFromNow() {
  const std::time_t then = std::time(nullptr) + 182 * kDay;
  std::tm broken{};
  gmtime_r(&then, &broken);
  char text[64];
  std::strftime(text, sizeof text, "%Y-%m-%d 12:00:00", &broken);
  return text;
}

// 12 o'clock there and then, in the zone's standard time.
std::time_t NoonOf(const std::string& text) {
  std::tm broken{};
  strptime(text.c_str(), kFormat, &broken);
  return timegm(&broken);
}

// Whether daylight saving applies is taken from now, not from the text: a time half a year off
// comes out an hour beside.
TEST_P(EntryTime, IsTakenAsDaylightSavingWhenThatAppliesNow) {
  const std::string text = HalfAYearFromNow();
  const ScopedZone zone(ZoneWithDaylightSaving(-40, 40).c_str());
  EXPECT_EQ(Time(text), NoonOf(text) - 3600);
  EXPECT_EQ(Text(NoonOf(text)), text) << "there and then it does not apply";
}

TEST_P(EntryTime, IsTakenAsStandardTimeWhenThatAppliesNow) {
  const std::string text = HalfAYearFromNow();
  const ScopedZone zone(ZoneWithDaylightSaving(142, 222).c_str());
  EXPECT_EQ(Time(text), NoonOf(text));
  EXPECT_EQ(Text(NoonOf(text) - 3600), text) << "there and then it does apply";
}

TEST(Entry, KeepsItsTwoTimesApart) {
  const ScopedZone zone("UTC0");
  Entry entry;
  entry.set_start_at_str("2023-11-14 22:13:20", kFormat);
  entry.set_expire_at_str("2020-09-13 12:26:40", kFormat);
  EXPECT_EQ(entry.get_start_at(), 1700000000);
  EXPECT_EQ(entry.get_expire_at(), 1600000000);
  EXPECT_EQ(entry.get_start_at_str(kFormat), "2023-11-14 22:13:20");
  EXPECT_EQ(entry.get_expire_at_str(kFormat), "2020-09-13 12:26:40");
}

// ---- Copying and moving

TEST(Entry, CopyIsIndependent) {
  Entry source = FullEntry();
  const Texts before = Contents(source);
  Entry copy(source);
  EXPECT_EQ(Contents(copy), before);
  copy = Entry();
  EXPECT_EQ(Contents(source), before);
  copy = source;
  source.set_hash("x").set_protect_users({}).set_app(1).set_private_data(2).set_id(3);
  EXPECT_EQ(Contents(copy), before);
}

TEST(Entry, CopyAssignmentKeepsTheObjectAndCopiesEveryField) {
  const Entry source = FullEntry();
  Entry target = LegalEntry().set_protect_users({"carol", "ghost"});
  const Object* object = &target.GetObject();
  EXPECT_EQ(&(target = source), &target);
  EXPECT_EQ(&target.GetObject(), object);
  EXPECT_EQ(Contents(target), Contents(source));
}

TEST(Entry, CopiesAndMovesThatItsPasswordWasNotHashed) {
  Entry failed = LegalEntry().set_protect_password("", true, Entry::ENCRYPT_ALGO_MD5);
  Entry copy(failed);
  EXPECT_FALSE(copy.IsLegal());
  Entry target = LegalEntry();
  target = failed;
  EXPECT_FALSE(target.IsLegal());
  target = LegalEntry();
  EXPECT_TRUE(target.IsLegal());
  target = std::move(copy);
  EXPECT_FALSE(target.IsLegal());
  EXPECT_FALSE(Entry(std::move(target)).IsLegal());
}

// A moved-from link's numbers stay, its texts and lists are empty and its documents null.
void ExpectMovedFrom(Entry& entry, const Entry& before) {
  Texts expected = before.GetFieldList();
  Texts contents = entry.GetFieldList();
  expected[0] = expected[1] = "";
  expected.pop_back();
  contents.pop_back();
  EXPECT_EQ(contents, expected);
  EXPECT_EQ(entry.get_id(), before.get_id());
  EXPECT_EQ(DataOf(entry), ParseJson(R"({
    "enable_match_ip": false, "protect_type": "password", "protect_title": "",
    "protect_password": "", "protect_password_algo": "md5", "protect_password_salt": "",
    "protect_uids": [], "protect_extra_users": [], "protect_gids": [], "protect_extra_groups": [],
    "redirect_type": "always", "redirect_uri": "", "app": null, "private_data": null})"));
  // And it is a link to be used again.
  entry = LegalEntry();
  EXPECT_TRUE(entry.IsValid());
}

TEST(Entry, MoveConstructionLeavesNumbersOnly) {
  Entry source = FullEntry();
  const Entry before(source);
  const Entry target(std::move(source));
  EXPECT_EQ(Contents(target), Contents(before));
  EXPECT_NE(&source.GetCObject(), &target.GetCObject());
  ExpectMovedFrom(source, before);
}

// Nothing of what the target held before turns up in the source.
TEST(Entry, MoveAssignmentLeavesNumbersOnly) {
  Entry source = FullEntry();
  const Entry before(source);
  Entry target = FullEntry().set_private_data(ParseJson(R"({"of":"the target"})"));
  const Object* object = &target.GetObject();
  EXPECT_EQ(&(target = std::move(source)), &target);
  EXPECT_EQ(&target.GetObject(), object);
  EXPECT_EQ(Contents(target), Contents(before));
  ExpectMovedFrom(source, before);
}

TEST(Entry, AssignedToItselfStaysAsItIs) {
  Entry entry = FullEntry();
  const Texts before = Contents(entry);
  Entry& same = entry;
  entry = same;
  EXPECT_EQ(Contents(entry), before);
  entry = std::move(same);
  EXPECT_EQ(Contents(entry), before);
}

TEST(Entry, MovesThroughAVector) {
  std::vector<Entry> entries;
  for (int i = 0; i < 20; ++i) {
    entries.push_back(FullEntry().set_id(i));
  }
  for (int i = 0; i < 20; ++i) {
    EXPECT_EQ(entries[static_cast<size_t>(i)].get_id(), i);
    EXPECT_EQ(entries[static_cast<size_t>(i)].get_hash(), "aB3xY7k9Q");
  }
}

}  // namespace
