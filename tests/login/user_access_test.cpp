// Who a visitor is, and whether a link for accounts admits it.
#include <internal/user_access.h>
#include <json/value.h>
#include <pwd.h>
#include <stdio.h>
#include <tuvoplatform/cgi.h>

#include <cstdlib>
#include <filesystem>
#include <fstream>

#include "login/platform_spy.h"
#include "login/visit.h"

namespace tuvo_test {
namespace {

using TUVO::sharing::CheckUserAccess;
using TUVO::sharing::GetRemoteIP;
using TUVO::sharing::record::Entry;

constexpr unsigned int kNobodyYet = 4294967295U;

// A link for the accounts `uids` and the groups `gids`.
Entry LinkFor(const std::vector<unsigned int>& uids, const std::vector<unsigned int>& gids = {}) {
  Entry entry;
  entry.set_protect_type(Entry::PROTECT_USER).set_protect_uids(uids).set_protect_gids(gids);
  return entry;
}

// The answer, and in `uid` what is left there.
int Access(const Entry& entry, const Visit& visit, unsigned int& uid) {
  Spy().calls.clear();
  visit.EnterEnvironment();
  const _tag_sharing_login_params params = visit.Params();
  return CheckUserAccess(entry, &params, &uid);
}

int Access(const Entry& entry, const Visit& visit) {
  unsigned int uid = kNobodyYet;
  return Access(entry, visit, uid);
}

// The Set-Cookie lines that the program would send now.
std::string QueuedCookies() {
  TUVOCGI cgi{};
  TuvoCgiInit("", &cgi);
  char* text = nullptr;
  size_t size = 0;
  FILE* out = open_memstream(&text, &size);
  TuvoCgiWriteCookies(&cgi, nullptr, out);
  fclose(out);
  TuvoCgiFree(&cgi);
  std::string cookies(text, size);
  free(text);
  return cookies;
}

int CountOf(const std::string& call) {
  int count = 0;
  for (const std::string& made : Spy().calls) {
    count += made == call ? 1 : 0;
  }
  return count;
}

Visit Alice() {
  return Visit().Account("alice", "alice-secret");
}

TEST(GetRemoteIP, IsTheAddressThatTheServerSaw) {
  InChild([] {
    Visit().From("198.51.100.7").EnterEnvironment();
    std::string ip = "before";
    EXPECT_TRUE(GetRemoteIP(ip));
    EXPECT_EQ("198.51.100.7", ip);
  });
}

TEST(GetRemoteIP, TakesTheLongestAddress) {
  InChild([] {
    Visit().From("2001:0db8:1111:2222:3333:4444:5555:6666").EnterEnvironment();
    std::string ip;
    EXPECT_TRUE(GetRemoteIP(ip));
    EXPECT_EQ("2001:db8:1111:2222:3333:4444:5555:6666", ip);
  });
}

TEST(GetRemoteIP, WithoutAnAddressTheTextIsUntouched) {
  for (const Visit& visit : {Visit().FromNowhere(), Visit().From(""), Visit().From("unknown")}) {
    InChild([&] {
      visit.EnterEnvironment();
      std::string ip = "before";
      EXPECT_FALSE(GetRemoteIP(ip));
      EXPECT_EQ("before", ip);
    });
  }
}

TEST(GetRemoteIP, LooksAtNoHeaderOfTheClient) {
  Visit visit;
  visit.Environment("HTTP_X_FORWARDED_FOR", "203.0.113.9")
      .Environment("HTTP_X_REAL_IP", "203.0.113.9")
      .Environment("HTTP_FORWARDED", "for=203.0.113.9")
      .Environment("HTTP_CLIENT_IP", "203.0.113.9");
  InChild([&] {
    visit.EnterEnvironment();
    std::string ip;
    EXPECT_TRUE(GetRemoteIP(ip));
    EXPECT_EQ(kAddress, ip);
  });
  visit.FromNowhere();
  InChild([&] {
    visit.EnterEnvironment();
    std::string ip;
    EXPECT_FALSE(GetRemoteIP(ip));
  });
}

TEST(GetRemoteIP, OnlyTheAnswerMinusOneIsAFailure) {
  for (const int answer : {0, 1, -2}) {
    InChild([=] {
      Visit().EnterEnvironment();
      Spy().failing = "TuvoCgiGetRemoteIP";
      Spy().answer = answer;
      std::string ip = "before";
      EXPECT_TRUE(GetRemoteIP(ip)) << answer;
      EXPECT_EQ("", ip);  // what the buffer holds
    });
  }
}

TEST(GetRemoteIP, GivesThePlatformAZeroedBufferOf65Bytes) {
  InChild([] {
    Visit().EnterEnvironment();
    std::string ip;
    EXPECT_TRUE(GetRemoteIP(ip));
    EXPECT_EQ(65U, Spy().address_size);
    EXPECT_TRUE(Spy().address_was_zero);
  });
}

TEST(CheckUserAccess, AdmitsAListedAccountAndStoresItsUid) {
  InChild([] {
    unsigned int uid = kNobodyYet;
    EXPECT_EQ(1, Access(LinkFor({kBob, kAlice}), Alice(), uid));
    EXPECT_EQ(kAlice, uid);
  });
}

TEST(CheckUserAccess, AdmitsAMemberOfAListedGroup) {
  InChild([] {
    unsigned int uid = kNobodyYet;
    EXPECT_EQ(1, Access(LinkFor({}, {1, kFriends}), Alice(), uid));
    EXPECT_EQ(kAlice, uid);
  });
}

TEST(CheckUserAccess, AdmitsByThePrimaryGroupToo) {
  constexpr unsigned int kGroupBob = 2002;
  InChild(
      [] { EXPECT_EQ(1, Access(LinkFor({}, {kGroupBob}), Visit().Account("bob", "bob-secret"))); });
}

TEST(CheckUserAccess, AListedAccountNeedsNoListedGroup) {
  InChild([] { EXPECT_EQ(1, Access(LinkFor({kAlice}, {2002}), Alice())); });
}

// The login itself went well: the caller may want to know who it was.
TEST(CheckUserAccess, RefusesAnAccountThatIsNotListedButStoresItsUid) {
  InChild([] {
    unsigned int uid = kNobodyYet;
    EXPECT_EQ(-6, Access(LinkFor({kAlice}, {kFriends}), Visit().Account("bob", "bob-secret"), uid));
    EXPECT_EQ(kBob, uid);
  });
}

TEST(CheckUserAccess, ALinkWithEmptyListsAdmitsNobody) {
  InChild([] { EXPECT_EQ(-6, Access(LinkFor({}), Alice())); });
}

// An id of a user is none of a group, and the other way round.
TEST(CheckUserAccess, UsersAndGroupsAreNotMixedUp) {
  InChild([] {
    const passwd* games = getpwnam("games");  // an account whose group has another number
    ASSERT_NE(nullptr, games);
    ASSERT_NE(games->pw_uid, games->pw_gid);
    unsigned int uid = games->pw_uid;
    EXPECT_EQ(-6, Access(LinkFor({games->pw_gid}, {games->pw_uid}), Visit(), uid));
    EXPECT_EQ(1, Access(LinkFor({games->pw_uid}), Visit(), uid));
    EXPECT_EQ(1, Access(LinkFor({}, {games->pw_gid}), Visit(), uid));
  });
}

TEST(CheckUserAccess, RefusesAWrongLoginAndLeavesTheUid) {
  const Visit refused[] = {
      Visit().Account("alice", "wrong"),       Visit().Account("alice", ""),
      Visit().Account("alice", "bob-secret"),  Visit().AccountName("alice"),
      Visit().Account("nobody-such", "alice"), Visit().Account("", "alice-secret"),
      Visit().Account("dave", "dave-secret"),  // the account has expired
  };
  for (const Visit& visit : refused) {
    InChild([&] {
      unsigned int uid = kAlice;
      EXPECT_EQ(-2, Access(LinkFor({kAlice, kDave}), visit, uid));
      EXPECT_EQ(kAlice, uid);
      EXPECT_EQ(1, CountOf("TuvoCgiFree"));
      EXPECT_EQ(0, CountOf("TUVOUserFree"));
    });
  }
}

TEST(CheckUserAccess, WithoutANameTheUidIsLookedUp) {
  InChild([] {
    unsigned int uid = kAlice;
    EXPECT_EQ(1, Access(LinkFor({kAlice}), Visit(), uid));
    EXPECT_EQ(kAlice, uid);
  });
  InChild([] {
    unsigned int uid = kAlice;
    EXPECT_EQ(1, Access(LinkFor({}, {kFriends}), Visit(), uid));
  });
  InChild([] {
    unsigned int uid = kBob;
    EXPECT_EQ(-6, Access(LinkFor({kAlice}, {kFriends}), Visit(), uid));
    EXPECT_EQ(kBob, uid);
  });
}

TEST(CheckUserAccess, WithoutANameThePasswordMeansNothing) {
  InChild([] {
    Visit visit;
    visit.Password("alice-secret");
    unsigned int uid = kAlice;
    EXPECT_EQ(1, Access(LinkFor({kAlice}), visit, uid));
    EXPECT_EQ(0, CountOf("TuvoCgiLogin"));
  });
}

TEST(CheckUserAccess, WithoutNameAndKnownUidFails) {
  for (const unsigned int unknown : {kNobodyYet, 54321U}) {
    InChild([=] {
      unsigned int uid = unknown;
      EXPECT_EQ(-4, Access(LinkFor({kAlice, unknown}), Visit(), uid));
      EXPECT_EQ(unknown, uid);
      EXPECT_EQ(1, CountOf("TuvoCgiFree"));
      EXPECT_EQ(0, CountOf("TUVOUserFree"));
    });
  }
}

TEST(CheckUserAccess, ANameOnTheListCountsOnceTheAccountExists) {
  Entry entry = LinkFor({});
  entry.set_protect_users({"erin"});
  constexpr unsigned int kErin = 2005;
  InChild([&] {
    unsigned int uid = kErin;
    EXPECT_EQ(-4, Access(entry, Visit(), uid));
  });
  const auto former_size = std::filesystem::file_size("/etc/passwd");
  std::ofstream("/etc/passwd", std::ios::app) << "erin:x:2005:2005::/:/usr/sbin/nologin\n";
  InChild([&] {
    unsigned int uid = kErin;
    EXPECT_EQ(1, Access(entry, Visit(), uid));
  });
  std::filesystem::resize_file("/etc/passwd", former_size);
}

TEST(CheckUserAccess, AsksForTheLoginAsThePlatformExpectsIt) {
  InChild([] {
    EXPECT_EQ(1, Access(LinkFor({kAlice}), Alice()));
    const LoginCall& login = Spy().login;
    EXPECT_EQ("alice", login.user);
    EXPECT_EQ("alice-secret", login.password);
    EXPECT_EQ("webui", login.client);
    EXPECT_EQ(15, login.type);
    EXPECT_EQ(1, login.flag);
    EXPECT_EQ(123U, login.reply_size);
    EXPECT_TRUE(login.reply_was_zero);
  });
}

TEST(CheckUserAccess, AnAccountLoginMakesTheseCalls) {
  InChild([] {
    EXPECT_EQ(1, Access(LinkFor({kAlice}), Alice()));
    EXPECT_EQ((Lines{"TuvoCgiInit ", "TuvoCgiLoadInCookies", "TuvoCgiGetRequestParam _sid",
                     "TuvoCgiLogin", "TUVOUserGet alice", "TLIBGroupInfoHashGet alice",
                     "TUVOUserFree", "TuvoCgiFree"}),
              Spy().calls);
  });
}

TEST(CheckUserAccess, ACheckByUidMakesTheseCalls) {
  InChild([] {
    unsigned int uid = kBob;
    EXPECT_EQ(-6, Access(LinkFor({kAlice}), Visit().Query("_sid=abc"), uid));
    EXPECT_EQ((Lines{"TuvoCgiInit ", "TuvoCgiLoadInCookies", "TuvoCgiGetRequestParam _sid",
                     "TuvoCgiSetCookies id abc /", "TUVOUserGetByUID 2002",
                     "TLIBGroupInfoHashGet bob", "TUVOUserFree", "TuvoCgiFree"}),
              Spy().calls);
  });
}

// What CheckUserAccess answers when this function of the platform answers so.
int AccessWhen(const std::string& function, int answer, const Visit& visit) {
  Spy().failing = function;
  Spy().answer = answer;
  unsigned int uid = kAlice;
  return Access(LinkFor({kAlice}), visit, uid);
}

TEST(CheckUserAccess, EveryAnswerOfThePlatformButOneIsAFailure) {
  for (const int answer : {-1, 0, 2}) {
    InChild([=] {
      EXPECT_EQ(-4, AccessWhen("TuvoCgiInit", answer, Alice())) << answer;
      EXPECT_EQ(-4, AccessWhen("TuvoCgiSetCookies", answer, Alice().Query("_sid=abc"))) << answer;
      EXPECT_EQ(-2, AccessWhen("TuvoCgiLogin", answer, Alice())) << answer;
    });
  }
}

TEST(CheckUserAccess, EveryAnswerToALookUpByUidButZeroIsAFailure) {
  for (const int answer : {-1, 1}) {
    InChild([=] { EXPECT_EQ(-4, AccessWhen("TUVOUserGetByUID", answer, Visit())) << answer; });
  }
}

// Only -1 means that there is no such account; another failure leaves no record either.
TEST(CheckUserAccess, ALookUpWithoutARecordFails) {
  InChild([] {
    EXPECT_EQ(-4, AccessWhen("TUVOUserGet", -2, Alice()));
    EXPECT_EQ(0, CountOf("TUVOUserFree"));
    EXPECT_EQ(1, CountOf("TuvoCgiFree"));
  });
}

TEST(CheckUserAccess, GoesOnWithoutTheRequestsCookies) {
  InChild([] { EXPECT_EQ(1, AccessWhen("TuvoCgiLoadInCookies", -1, Alice())); });
}

// The look-up converts the name itself: what it is given is what the visitor typed.
TEST(CheckUserAccess, TheNameIsConvertedOnceForTheLoginAndOnceForTheLookUp) {
  InChild([] {
    Spy().real_names = {{"Alice (typed)", "alice"}, {"alice", "bob"}};
    EXPECT_EQ(1, Access(LinkFor({kAlice}), Visit().Account("Alice (typed)", "alice-secret")));
    EXPECT_EQ("alice", Spy().login.user);
    EXPECT_EQ(1, CountOf("TUVOUserGet alice"));
  });
}

// An account can vanish between its login and its look-up.
TEST(CheckUserAccess, FailsWhenTheAccountVanishes) {
  SyslogListener syslog;
  InChild([] {
    Spy().failing = "TUVOUserGet";
    unsigned int uid = kNobodyYet;
    EXPECT_EQ(-4, Access(LinkFor({kAlice}), Alice(), uid));
    EXPECT_EQ(kNobodyYet, uid);
    EXPECT_EQ(1, CountOf("TuvoCgiFree"));
  });
  const Lines log = syslog.TakeTexts();
  ASSERT_EQ(1U, log.size());
  EXPECT_EQ("utils_user_group:LINE No such user [alice]", Normalized(log[0]));
}

TEST(CheckUserAccess, FailsWithoutTheAccountsGroups) {
  InChild([] {
    Spy().failing = "TLIBGroupInfoHashGet";
    unsigned int uid = kNobodyYet;
    EXPECT_EQ(-4, Access(LinkFor({kAlice}), Alice(), uid));
    EXPECT_EQ(kNobodyYet, uid);
    EXPECT_EQ(1, CountOf("TUVOUserFree"));
    EXPECT_EQ(1, CountOf("TuvoCgiFree"));
  });
  InChild([] {
    Spy().failing = "TLIBGroupInfoHashGet";
    unsigned int uid = kAlice;
    EXPECT_EQ(-4, Access(LinkFor({kAlice}), Visit(), uid));
    EXPECT_EQ(1, CountOf("TUVOUserFree"));
    EXPECT_EQ(1, CountOf("TuvoCgiFree"));
  });
}

TEST(CheckUserAccess, CarriesTheAppliancesSessionOnAsACookie) {
  InChild([] {
    EXPECT_EQ(1, Access(LinkFor({kAlice}), Alice().Query("a=b&_sid=Xy-1_2&c=d")));
    EXPECT_EQ("Set-Cookie: id=Xy-1_2; Path=/; HttpOnly; SameSite=Lax\r\n", QueuedCookies());
  });
}

TEST(CheckUserAccess, CarriesTheSessionOnHoweverTheCheckEnds) {
  InChild([] {
    unsigned int uid = kBob;
    EXPECT_EQ(-6, Access(LinkFor({kAlice}), Visit().Query("_sid=abc"), uid));
    EXPECT_NE("", QueuedCookies());
  });
  InChild([] {
    EXPECT_EQ(-2, Access(LinkFor({kAlice}), Visit().Account("alice", "no").Query("_sid=abc")));
    EXPECT_NE("", QueuedCookies());
  });
}

TEST(CheckUserAccess, WithoutASessionParameterQueuesNoCookie) {
  for (const char* query : {"", "_sid=", "_sid", "sid=abc", "_SID=abc"}) {
    InChild([=] {
      EXPECT_EQ(1, Access(LinkFor({kAlice}), Alice().Query(query)));
      EXPECT_EQ("", QueuedCookies());
      EXPECT_EQ(0, CountOf("TuvoCgiSetCookies"));
    });
  }
}

// The session comes from the request's fields; a cookie of that name is none.
TEST(CheckUserAccess, ACookieIsNoSessionParameter) {
  InChild([] {
    EXPECT_EQ(1, Access(LinkFor({kAlice}),
                        Alice().Query("").Environment("HTTP_COOKIE", "_sid=abc; id=def")));
    EXPECT_EQ("", QueuedCookies());
  });
}

TEST(CheckUserAccess, FailsBeforeTheLoginWhenTheCookieCannotBeSet) {
  InChild([] {
    unsigned int uid = kNobodyYet;
    EXPECT_EQ(-4, Access(LinkFor({kAlice}), Alice().Query("_sid=a%3Bb"), uid));
    EXPECT_EQ(kNobodyYet, uid);
    EXPECT_EQ("", QueuedCookies());
    EXPECT_EQ(0, CountOf("TuvoCgiLogin"));
    EXPECT_EQ("TuvoCgiFree", Spy().calls.at(4));
  });
}

TEST(CheckUserAccess, FailsWithARequestThatCannotBeReadAndFreesItAllTheSame) {
  InChild([] {
    Visit visit = Alice();
    visit.Environment("REQUEST_METHOD", "POST").Environment("CONTENT_LENGTH", "no number");
    unsigned int uid = kNobodyYet;
    EXPECT_EQ(-4, Access(LinkFor({kAlice}), visit, uid));
    EXPECT_EQ(kNobodyYet, uid);
    EXPECT_EQ((Lines{"TuvoCgiInit ", "TuvoCgiFree"}), Spy().calls);
  });
}

TEST(CheckUserAccess, MayBeAskedAgainInOneProcess) {
  InChild([] {
    EXPECT_EQ(-2, Access(LinkFor({kAlice}), Visit().Account("alice", "wrong")));
    EXPECT_EQ(1, Access(LinkFor({kAlice}), Alice()));
    EXPECT_EQ(-6, Access(LinkFor({kAlice}), Visit().Account("bob", "bob-secret")));
    EXPECT_EQ(1, CountOf("TuvoCgiFree"));
  });
}

TEST(CheckUserAccess, LogsNothingItself) {
  SyslogListener syslog;
  InChild([] {
    EXPECT_EQ(1, Access(LinkFor({kAlice}), Alice()));
    EXPECT_EQ(-2, Access(LinkFor({kAlice}), Visit().Account("alice", "wrong")));
    EXPECT_EQ(-6, Access(LinkFor({kAlice}), Visit().Account("bob", "bob-secret")));
    EXPECT_EQ(-4, Access(LinkFor({kAlice}), Visit()));
  });
  for (const std::string& text : syslog.TakeTexts()) {
    EXPECT_EQ(0U, text.find("pam_unix(webui:auth)")) << text;
  }
}

}  // namespace
}  // namespace tuvo_test
