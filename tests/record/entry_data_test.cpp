// The JSON document in a link's "data" column.
#include <pthread.h>
#include <tuvosharing/sharing_db.h>

#include <cmath>
#include <functional>
#include <limits>
#include <locale>
#include <map>
#include <random>

#include "record/record_testing.h"

namespace {

using TUVO::sharing::db::SharingDB;
using TUVO::sharing::record::Entry;
using tuvo_test::Contents;
using tuvo_test::DataOf;
using tuvo_test::FetchedRow;
using tuvo_test::FullEntry;
using tuvo_test::LegalEntry;
using tuvo_test::ParseJson;
using tuvo_test::Quoted;
using tuvo_test::SelectedRow;
using tuvo_test::SyslogListener;

using Texts = std::vector<std::string>;
using Ids = std::vector<unsigned int>;

// Loads a document into `entry`, the columns around it being those of a legal link.
bool LoadData(const std::string& data, Entry& entry) {
  return entry.FromRow(SelectedRow("3 AS id, 'h' AS hash, 'p' AS project_name, 7 AS owner_uid, " +
                                   Quoted(data) + " AS data"));
}

// A document of a legal link but for one member; an empty text leaves it out.
std::string Document(const std::string& member, const std::string& value) {
  Json::Value data = DataOf(FullEntry());
  if (value.empty()) {
    data.removeMember(member);
  } else {
    data[member] = ParseJson("[" + value + "]")[0];
  }
  return data.toStyledString();
}

Entry Loaded(const std::string& member, const std::string& value) {
  Entry entry = FullEntry();
  LoadData(Document(member, value), entry);
  return entry;
}

Texts Strings(const Json::Value& array) {
  Texts texts;
  for (const Json::Value& element : array) {
    texts.push_back(element.asString());
  }
  return texts;
}

// ---- Writing

TEST(EntryData, OfADefaultLink) {
  EXPECT_EQ(DataOf(Entry()), ParseJson(R"({
    "enable_match_ip": true, "protect_type": "none", "protect_title": "", "protect_password": "",
    "protect_password_algo": "default", "protect_password_salt": "", "protect_uids": [],
    "protect_extra_users": [], "protect_gids": [], "protect_extra_groups": [],
    "redirect_type": "none", "redirect_uri": "", "app": null, "private_data": {}})"));
}

TEST(EntryData, HasEveryFieldFromTheAddressMatchOn) {
  const Entry entry = FullEntry();
  const Json::Value data = DataOf(entry);
  Json::Value expected = ParseJson(R"({
    "enable_match_ip": false, "protect_type": "password",
    "protect_title": "A title, and a long one",
    "protect_password": "5ebe2294ecd0e0f08eab7690d2a6ee69", "protect_password_algo": "md5",
    "protect_uids": [2001, 2002], "protect_extra_users": ["nobody-yet"],
    "protect_gids": [3001], "protect_extra_groups": ["no-such-group"],
    "redirect_type": "always", "redirect_uri": "https://example.com/a/page",
    "app": {"path": ["/exports/photos", 1, 2.5, null, true]},
    "private_data": {"key": {"inner": "secret"}}})");
  expected["protect_password_salt"] = entry.get_protect_password_salt();
  EXPECT_EQ(data, expected);
  EXPECT_EQ(entry.get_protect_password_salt().size(), 6U);
}

TEST(EntryData, HasTheJsonTypesOfItsMembers) {
  const Json::Value data = DataOf(FullEntry());
  EXPECT_TRUE(data["enable_match_ip"].isBool());
  EXPECT_TRUE(data["protect_uids"][0].isUInt());
  EXPECT_TRUE(data["protect_gids"][0].isUInt());
  const Json::Value largest = DataOf(Entry().set_protect_uids({4294967295U}));
  EXPECT_EQ(largest["protect_uids"][0].asUInt(), 4294967295U);
}

TEST(EntryData, IsOneLineWithoutBlanksBetweenItsTokens) {
  const std::string text = Entry().GetFieldMap().at("data");
  EXPECT_EQ(text.find_first_of(" \n\t"), std::string::npos) << text;
}

TEST(EntryData, NamesTheKindsOfProtection) {
  const auto text = [](int type) {
    return DataOf(Entry().set_protect_type(static_cast<Entry::ProtectType>(type)))["protect_type"]
        .asString();
  };
  EXPECT_EQ(text(0), "none");
  EXPECT_EQ(text(1), "password");
  EXPECT_EQ(text(2), "user");
  EXPECT_EQ(text(3), "user");
  EXPECT_EQ(text(-1), "user");
}

TEST(EntryData, NamesTheKindsOfRedirect) {
  const auto text = [](int type) {
    const auto redirect = static_cast<Entry::RedirectType>(type);
    return DataOf(Entry().set_redirect_type(redirect))["redirect_type"].asString();
  };
  EXPECT_EQ(text(0), "none");
  EXPECT_EQ(text(1), "url_param");
  EXPECT_EQ(text(2), "always");
  EXPECT_EQ(text(3), "always");
  EXPECT_EQ(text(-1), "always");
}

TEST(EntryData, KeepsAnyJsonValueAsDocuments) {
  for (const char* text : {"null", "[]", "[1,{}]", "\"text\"", "-7", "2.5", "true", "{}"}) {
    const Entry entry = Entry().set_app(ParseJson(text)).set_private_data(ParseJson(text));
    EXPECT_EQ(DataOf(entry)["app"], ParseJson(text));
    EXPECT_EQ(DataOf(entry)["private_data"], ParseJson(text));
  }
}

// ---- Reading

TEST(EntryData, IsReadBackIntoEveryField) {
  Entry entry;
  EXPECT_TRUE(LoadData(FullEntry().GetFieldMap().at("data"), entry));
  EXPECT_FALSE(entry.get_enable_match_ip());
  EXPECT_EQ(entry.get_protect_type(), Entry::PROTECT_PASSWORD);
  EXPECT_EQ(entry.get_protect_title(), "A title, and a long one");
  EXPECT_EQ(entry.get_protect_password(), "5ebe2294ecd0e0f08eab7690d2a6ee69");
  EXPECT_EQ(entry.get_protect_password_algo(), Entry::ENCRYPT_ALGO_MD5);
  EXPECT_EQ(entry.get_protect_password_salt().size(), 6U);
  EXPECT_EQ(entry.get_protect_uids(), (Ids{2001, 2002}));
  EXPECT_EQ(entry.get_protect_users(), (Texts{"alice", "bob", "nobody-yet"}));
  EXPECT_EQ(entry.get_protect_gids(), (Ids{3001}));
  EXPECT_EQ(entry.get_protect_groups(), (Texts{"friends", "no-such-group"}));
  EXPECT_EQ(entry.get_redirect_type(), Entry::REDIRECT_ALWAYS);
  EXPECT_EQ(entry.get_redirect_uri(), "https://example.com/a/page");
  EXPECT_EQ(entry.get_app(), FullEntry().get_app());
  EXPECT_EQ(entry.get_private_data(), FullEntry().get_private_data());
}

TEST(EntryData, ReplacesWhatTheLinkHeld) {
  Entry entry = FullEntry();
  EXPECT_TRUE(LoadData(LegalEntry().GetFieldMap().at("data"), entry));
  EXPECT_EQ(DataOf(entry), DataOf(LegalEntry()));
}

TEST(EntryData, ReadsTheKindsOfProtectionAndEverythingElseAsAccounts) {
  const auto type = [](const char* text) {
    return Loaded("protect_type", text).get_protect_type();
  };
  EXPECT_EQ(type("\"none\""), Entry::PROTECT_NONE);
  EXPECT_EQ(type("\"password\""), Entry::PROTECT_PASSWORD);
  EXPECT_EQ(type("\"user\""), Entry::PROTECT_USER);
  for (const char* other : {"", "null", "\"\"", "\"None\"", "\"none \"", "\"none\\u0000\"",
                            "\"passwor\"", "\"always\"", "\"default\""}) {
    EXPECT_EQ(type(other), Entry::PROTECT_USER) << other;
  }
}

TEST(EntryData, ReadsTheDefaultAlgorithmAndEverythingElseAsMd5) {
  const auto algo = [](const char* text) {
    return Loaded("protect_password_algo", text).get_protect_password_algo();
  };
  EXPECT_EQ(algo("\"default\""), Entry::ENCRYPT_ALGO_DEFAULT);
  for (const char* other :
       {"", "null", "\"md5\"", "\"\"", "\"Default\"", "\"default\\u0000\"", "\"none\""}) {
    EXPECT_EQ(algo(other), Entry::ENCRYPT_ALGO_MD5) << other;
  }
}

TEST(EntryData, ReadsTheKindsOfRedirectAndEverythingElseAsAlways) {
  const auto type = [](const char* text) {
    return Loaded("redirect_type", text).get_redirect_type();
  };
  EXPECT_EQ(type("\"none\""), Entry::REDIRECT_NONE);
  EXPECT_EQ(type("\"url_param\""), Entry::REDIRECT_URLPARAM);
  EXPECT_EQ(type("\"always\""), Entry::REDIRECT_ALWAYS);
  for (const char* other : {"", "null", "\"\"", "\"NONE\"", "\"url_params\"", "\"user\""}) {
    EXPECT_EQ(type(other), Entry::REDIRECT_ALWAYS) << other;
  }
}

TEST(EntryData, ReadsMissingAndNullMembersAsEmpty) {
  for (const char* none : {"", "null"}) {
    EXPECT_FALSE(Loaded("enable_match_ip", none).get_enable_match_ip()) << none;
    EXPECT_EQ(Loaded("protect_title", none).get_protect_title(), "") << none;
    EXPECT_EQ(Loaded("protect_password", none).get_protect_password(), "") << none;
    EXPECT_EQ(Loaded("protect_password_salt", none).get_protect_password_salt(), "") << none;
    EXPECT_EQ(Loaded("protect_uids", none).get_protect_users(), (Texts{"nobody-yet"})) << none;
    EXPECT_EQ(Loaded("protect_extra_users", none).get_protect_users(), (Texts{"alice", "bob"}))
        << none;
    EXPECT_EQ(Loaded("protect_gids", none).get_protect_groups(), (Texts{"no-such-group"})) << none;
    EXPECT_EQ(Loaded("protect_extra_groups", none).get_protect_groups(), (Texts{"friends"}))
        << none;
    EXPECT_EQ(Loaded("redirect_uri", none).get_redirect_uri(), "") << none;
    EXPECT_TRUE(Loaded("app", none).get_app().isNull()) << none;
  }
}

TEST(EntryData, WithoutPrivateDataHasAnEmptyObjectOfIt) {
  EXPECT_EQ(Loaded("private_data", "").get_private_data(), Json::Value(Json::objectValue));
  EXPECT_TRUE(Loaded("private_data", "null").get_private_data().isNull());
  EXPECT_EQ(Loaded("private_data", "[1]").get_private_data(), ParseJson("[1]"));
}

TEST(EntryData, ThatIsAnEmptyObjectIsALinkForAccountsWithoutAny) {
  Entry entry = FullEntry();
  EXPECT_FALSE(LoadData("{}", entry)) << "without app";
  EXPECT_EQ(DataOf(entry), ParseJson(R"({
    "enable_match_ip": false, "protect_type": "user", "protect_title": "", "protect_password": "",
    "protect_password_algo": "md5", "protect_password_salt": "", "protect_uids": [],
    "protect_extra_users": [], "protect_gids": [], "protect_extra_groups": [],
    "redirect_type": "always", "redirect_uri": "", "app": null, "private_data": {}})"));
}

TEST(EntryData, ReadsIdsAsUnsignedNumbers) {
  EXPECT_EQ(Loaded("protect_uids", "[0,4294967295,7,7,5.0]").get_protect_uids(),
            (Ids{0, 4294967295U, 7, 7, 5}));
  EXPECT_EQ(Loaded("protect_gids", "[3,2,1]").get_protect_gids(), (Ids{3, 2, 1}));
}

// Names in the document stay names although the accounts exist by now; ids count for both.
TEST(EntryData, KeepsNamesAsNames) {
  const Entry entry = Loaded("protect_extra_users", R"(["alice","ghost","alice"])");
  EXPECT_EQ(Strings(DataOf(entry)["protect_extra_users"]), (Texts{"alice", "ghost", "alice"}));
  EXPECT_EQ(DataOf(entry)["protect_uids"], ParseJson("[2001,2002]"));
  EXPECT_EQ(entry.get_protect_uids(), (Ids{2001, 2002, 2001, 2001}));
}

TEST(EntryData, MayHaveMembersThatNobodyKnowsCommentsAndBlanks) {
  Entry entry;
  EXPECT_TRUE(
      LoadData("// written by hand\n { \"other\": [1], \"app\" : {\"a\": /* one */ 1}, \n"
               "\t\"protect_type\":\"none\", \"enable_match_ip\":true } // end",
               entry));
  EXPECT_TRUE(entry.get_enable_match_ip());
  EXPECT_EQ(entry.get_protect_type(), Entry::PROTECT_NONE);
  EXPECT_EQ(entry.get_app(), ParseJson(R"({"a":1})"));
  const std::string text = entry.GetFieldMap().at("data");
  EXPECT_EQ(text.find("/*"), std::string::npos) << "comments are not stored";
  EXPECT_EQ(text.find("other"), std::string::npos);
}

// ---- Not readable

void ExpectRefused(const std::string& data) {
  SyslogListener log;
  Entry entry = FullEntry();
  const std::string before = entry.GetFieldMap().at("data");
  EXPECT_FALSE(LoadData(data, entry)) << data;
  EXPECT_EQ(entry.GetFieldMap().at("data"), before) << data;
  EXPECT_EQ(entry.get_id(), 3) << "the plain columns are loaded: " << data;
  EXPECT_EQ(entry.get_hash(), "h");
  EXPECT_EQ(entry.get_owner_uid(), 7U);
  EXPECT_FALSE(entry.get_auto_gc());
  EXPECT_TRUE(log.Take().empty()) << data;
  EXPECT_TRUE(entry.IsLegal()) << "and usable: " << data;
}

TEST(EntryData, ThatIsNoJsonChangesNothing) {
  for (const char* data :
       {"", " ", "no JSON", "{", "}", "{\"app\":{}", "{\"app\":}", "{\"app\":{},}", "{app:{}}",
        "{'app':{}}", "{\"app\":nan}", "{\"app\":\"\\ud800\"}", "{\"app\":\"\\x\"}",
        "{\"app\":\"open}", "{\"app\":1e999}", "\xef\xbb\xbf{}", "//", "/*", "nul"}) {
    ExpectRefused(data);
  }
}

TEST(EntryData, ThatIsNoObjectChangesNothing) {
  for (const char* data : {"null", "[]", "[{}]", "\"{}\"", "1", "1.5", "true"}) {
    ExpectRefused(data);
  }
}

TEST(EntryData, NumbersAreBooleansWhereOneBelongs) {
  for (const auto& [number, expected] :
       std::map<std::string, bool>{{"0", false}, {"1", true}, {"-1", true}, {"1.5", true}}) {
    Entry entry;
    EXPECT_TRUE(LoadData(Document("enable_match_ip", number), entry)) << number;
    EXPECT_EQ(entry.get_enable_match_ip(), expected) << number;
  }
}

TEST(EntryData, NumbersAndBooleansAreTextsWhereOneBelongs) {
  for (const auto& [value, expected] : std::map<std::string, std::string>{
           {"1", "1"}, {"-5", "-5"}, {"1.5", "1.5"}, {"true", "true"}, {"false", "false"}}) {
    Entry entry;
    EXPECT_TRUE(LoadData(Document("protect_title", value), entry)) << value;
    EXPECT_EQ(entry.get_protect_title(), expected);
    EXPECT_TRUE(LoadData(Document("protect_extra_users", "[" + value + "]"), entry));
    EXPECT_EQ(Strings(DataOf(entry)["protect_extra_users"]), Texts{expected});
    EXPECT_TRUE(LoadData(Document("protect_type", value), entry));
    EXPECT_EQ(entry.get_protect_type(), Entry::PROTECT_USER);
  }
}

TEST(EntryData, WithAMemberThatHasNoConversionChangesNothing) {
  for (const char* wrong : {"\"true\"", "[]", "{}"}) {
    ExpectRefused(Document("enable_match_ip", wrong));
  }
  for (const char* member :
       {"protect_type", "protect_title", "protect_password", "protect_password_algo",
        "protect_password_salt", "redirect_type", "redirect_uri"}) {
    for (const char* wrong : {"[]", "{}", "[\"none\"]"}) {
      ExpectRefused(Document(member, wrong));
    }
  }
  for (const char* member : {"protect_uids", "protect_gids"}) {
    for (const char* wrong :
         {"{}", "{\"0\":1}", "\"1\"", "1", "true", "[1,null]", "[-1]", "[4294967296]", "[\"1\"]",
          "[1.5]", "[true]", "[[1]]", "[{}]", "[1e30]", "[-1e30]", "[18446744073709551616]"}) {
      ExpectRefused(Document(member, wrong));
    }
  }
  for (const char* member : {"protect_extra_users", "protect_extra_groups"}) {
    for (const char* wrong :
         {"{}", "{\"0\":\"x\"}", "\"x\"", "1", "true", "[null]", "[[]]", "[{}]"}) {
      ExpectRefused(Document(member, wrong));
    }
  }
}

// ---- Byte for byte

std::string AllBytes() {
  std::string bytes;
  for (int byte = 0; byte < 256; ++byte) {
    bytes.push_back(static_cast<char>(byte));
  }
  return bytes;
}

void ExpectSurvives(const Entry& entry) {
  unlink("/tmp/data.db");
  SharingDB db("/tmp/data.db");
  ASSERT_TRUE(db.Insert("entry", entry.GetFieldList())) << db.GetLastError();
  Entry loaded;
  EXPECT_TRUE(loaded.FromRow(FetchedRow(db, "SELECT * FROM entry")));
  loaded.set_id(entry.get_id());
  EXPECT_EQ(Contents(loaded), Contents(entry));
  EXPECT_EQ(loaded.get_protect_title(), entry.get_protect_title());
  EXPECT_EQ(loaded.get_protect_password(), entry.get_protect_password());
  EXPECT_EQ(loaded.get_redirect_uri(), entry.get_redirect_uri());
  EXPECT_EQ(loaded.get_protect_users(), entry.get_protect_users());
  EXPECT_EQ(loaded.get_protect_groups(), entry.get_protect_groups());
  EXPECT_EQ(loaded.get_app(), entry.get_app());
  EXPECT_EQ(loaded.get_private_data(), entry.get_private_data());
}

TEST(EntryData, KeepsEveryByteOfItsTexts) {
  const std::string bytes = AllBytes();
  Entry entry = LegalEntry();
  entry.set_protect_title(bytes).set_redirect_uri(bytes + bytes);
  entry.set_protect_password(bytes, false, Entry::ENCRYPT_ALGO_MD5);
  entry.set_protect_users({bytes, "", "'", "\xff"}).set_protect_groups({"\xc3", bytes});
  Json::Value app(Json::objectValue);
  app[bytes] = bytes;
  app["list"].append(bytes);
  entry.set_app(app).set_private_data(app);
  ExpectSurvives(entry);
}

TEST(EntryData, KeepsTextsThatLookLikeSomethingElse) {
  for (const char* text : {"'", "''", "\\'", "\"", "\\", "\\u0041", "\\\\u0000", "</script>",
                           "%s%n", "'; --", "\xf0\x9f\x98\x80", "\xed\xa0\x80", "\xc0\x80",
                           "\xe2\x80\xa8", "\x7f", "\x1b[0m", "/*", "//", "\xef\xbb\xbf"}) {
    Entry entry = LegalEntry();
    Json::Value app(Json::objectValue);
    app[text] = text;
    entry.set_protect_title(text).set_app(app);
    ExpectSurvives(entry);
  }
}

TEST(EntryData, KeepsNumbersExactly) {
  Json::Value app(Json::objectValue);
  app["smallest"] = Json::Value(std::numeric_limits<Json::Int64>::min());
  app["largest"] = Json::Value(std::numeric_limits<Json::UInt64>::max());
  app["int"] = Json::Value(-1);
  app["doubles"].append(0.1);
  app["doubles"].append(1.0);
  app["doubles"].append(-0.0);
  app["doubles"].append(std::numeric_limits<double>::max());
  app["doubles"].append(std::numeric_limits<double>::denorm_min());
  app["doubles"].append(123456789.123456789);
  ExpectSurvives(LegalEntry().set_app(app));
}

// A caller's division by zero must not make its link unreadable.
TEST(EntryData, KeepsNumbersThatJsonHasNoFormFor) {
  Json::Value app(Json::objectValue);
  app["most"] = std::numeric_limits<double>::infinity();
  app["least"] = -std::numeric_limits<double>::infinity();
  ExpectSurvives(LegalEntry().set_app(app));
  app["none"] = std::numeric_limits<double>::quiet_NaN();
  Entry loaded;
  EXPECT_TRUE(LoadData(LegalEntry().set_app(app).GetFieldMap().at("data"), loaded));
  EXPECT_TRUE(std::isnan(loaded.get_app()["none"].asDouble()));
}

TEST(EntryData, KeepsALargeDocument) {
  Json::Value app(Json::objectValue);
  for (int i = 0; i < 5000; ++i) {
    app["files"].append("/exports/photos/'" + std::to_string(i) + "'\xff.jpg");
  }
  ExpectSurvives(LegalEntry().set_app(app).set_protect_title(std::string(300000, '\'')));
}

// A program may have set a locale that groups digits.
TEST(EntryData, IsWrittenTheSameUnderEveryLocale) {
  class Grouping : public std::numpunct<char> {
   protected:
    char do_thousands_sep() const override { return '.'; }
    char do_decimal_point() const override { return ','; }
    std::string do_grouping() const override { return "\3"; }
  };
  const Entry entry = FullEntry();
  const Texts before = Contents(entry);
  const std::locale old = std::locale::global(std::locale(std::locale(), new Grouping));
  const Texts grouped = Contents(entry);
  Entry loaded;
  const bool legal =
      LoadData(LegalEntry().set_protect_uids({1234567}).GetFieldMap().at("data"), loaded);
  std::locale::global(old);
  EXPECT_EQ(grouped, before);
  EXPECT_TRUE(legal);
  EXPECT_EQ(loaded.get_protect_uids(), (Ids{1234567}));
}

// ---- Deep nesting

// Runs `body` on a small stack, as threads of a web server have.
void OnSmallStack(std::function<void()> body) {
  pthread_attr_t attributes;
  ASSERT_EQ(pthread_attr_init(&attributes), 0);
  ASSERT_EQ(pthread_attr_setstacksize(&attributes, 256 * 1024), 0);
  pthread_t thread{};
  const auto run = [](void* argument) -> void* {
    (*static_cast<std::function<void()>*>(argument))();
    return nullptr;
  };
  ASSERT_EQ(pthread_create(&thread, &attributes, run, &body), 0);
  pthread_join(thread, nullptr);
  pthread_attr_destroy(&attributes);
}

// `levels` values within each other: objects or arrays around `value`.
Json::Value Nested(int levels, bool objects, Json::Value value = 1) {
  for (int i = 1; i < levels; ++i) {
    Json::Value outer;
    if (objects) {
      outer["a"] = value;
    } else {
      outer.append(value);
    }
    value.swap(outer);
  }
  return value;
}

TEST(EntryData, IsReadWithDocumentsOf99LevelsAndNotOfMore) {
  OnSmallStack([] {
    const std::string empty_link = LegalEntry().GetFieldMap().at("data");
    for (const Json::Value& innermost :
         {Json::Value(1), Json::Value(Json::objectValue), Json::Value(Json::arrayValue)}) {
      for (const int levels : {2, 50, 98, 99, 100, 101, 150}) {
        Json::Value document(Json::objectValue);
        document["a"] = Nested(levels - 1, levels % 2 == 0, innermost);
        for (const Entry& entry :
             {LegalEntry().set_app(document), LegalEntry().set_private_data(document)}) {
          const std::string text = entry.GetFieldMap().at("data");
          Entry loaded = LegalEntry();
          EXPECT_EQ(LoadData(text, loaded), levels <= 99) << levels;
          EXPECT_EQ(loaded.GetFieldMap().at("data"), levels <= 99 ? text : empty_link) << levels;
        }
      }
    }
  });
}

TEST(EntryData, NestedTooDeeplyAnywhereChangesNothing) {
  OnSmallStack([] {
    ExpectRefused("{\"app\":{},\"other\":" + std::string(99, '[') + "1" + std::string(99, ']') +
                  "}");
    ExpectRefused(std::string(1000, '[') + std::string(1000, ']'));
    ExpectRefused(std::string(200000, '['));
    std::string objects;
    for (int i = 0; i < 50000; ++i) {
      objects += "{\"a\":";
    }
    ExpectRefused(objects);
    ExpectRefused("{\"app\":" + objects);
    ExpectRefused("{\"protect_uids\":" + std::string(100000, '['));
  });
}

TEST(EntryData, NestedTooDeeplyIsStoredAllTheSame) {
  OnSmallStack([] {
    Json::Value app(Json::objectValue);
    app["a"] = Nested(200, false);
    const Entry entry = LegalEntry().set_app(app);
    EXPECT_TRUE(entry.IsLegal());
    const std::string text = entry.GetFieldMap().at("data");
    EXPECT_NE(text.find(std::string(199, '[') + "1" + std::string(199, ']')), std::string::npos);
    EXPECT_EQ(Entry(entry).get_app(), app);
  });
}

// ---- Any text

std::string Mutated(std::string text, std::mt19937& random) {
  const auto below = [&random](size_t bound) {
    return std::uniform_int_distribution<size_t>(0, bound - 1)(random);
  };
  static const std::string kPieces[] = {
      "{",    "}",        "[",          "]",       ",",        ":",
      "\"",   "\\",       "\\u",        "\\ud800", "/",        "/*",
      "*/",   "//",       "\n",         "-",       "1e999",    "1",
      ".",    "e",        "null",       "true",    "fals",     "\xff",
      "\xc3", "'",        "4294967296", "[[[[[[",  "\"app\":", "\"protect_uids\":",
      "NaN",  "-Infinity"};
  for (size_t changes = 1 + below(4); changes > 0; --changes) {
    const size_t at = below(text.size() + 1);
    const size_t length = std::min(below(12), text.size() - at);
    const std::string piece = kPieces[below(std::size(kPieces))];
    switch (below(6)) {
      case 0:
        text.replace(at, std::min<size_t>(1, length), 1, static_cast<char>(1 + below(255)));
        break;
      case 1:
        text.insert(at, piece);
        break;
      case 2:
        text.erase(at, length);
        break;
      case 3:
        text.replace(at, length, piece);
        break;
      case 4:
        text.insert(below(text.size() + 1), text.substr(at, 5 * length));
        break;
      default:
        text.resize(std::max<size_t>(1, at));
    }
    if (text.empty()) {
      text = "{";
    }
  }
  return text;
}

// Whatever the text, loading it does not throw, and sets all of the fields or none.
TEST(EntryData, OfAnyTextIsLoadedWholeOrNotAtAll) {
  std::mt19937 random(20240229);
  const std::string valid = FullEntry().GetFieldMap().at("data");
  const Entry holding = LegalEntry().set_protect_title("held before");
  const std::string held = holding.GetFieldMap().at("data");
  int loaded = 0;
  int refused = 0;
  for (int i = 0; i < 8000; ++i) {
    const std::string text = Mutated(valid, random);
    Entry entry = holding;
    bool legal = false;
    ASSERT_NO_THROW(legal = LoadData(text, entry)) << text;
    const std::string now = entry.GetFieldMap().at("data");
    EXPECT_EQ(entry.get_id(), 3) << text;
    if (now == held) {
      EXPECT_FALSE(legal) << text;
      ++refused;
      continue;
    }
    ++loaded;
    EXPECT_EQ(legal, entry.IsLegal()) << text;
    // What was read is written so that it is read again as the same.
    Entry again;
    EXPECT_EQ(LoadData(now, again), legal) << text;
    EXPECT_EQ(again.GetFieldMap().at("data"), now) << text;
  }
  EXPECT_GT(loaded, 200);
  EXPECT_GT(refused, 200);
}

}  // namespace
