#include "webapi/handler.h"

#include <gtest/gtest.h>
#include <tuvosharing/sharing_db.h>

#include <functional>
#include <new>

#include "platform/failing_allocations.h"
#include "support/child.h"
#include "support/syslog_listener.h"
#include "webapi/answer.h"

namespace webapi {
namespace {

using TUVO::sharing::db::SharingDB;
using tuvo_test::allocations_left;

constexpr const char* kDatabase = "/usr/tuvo/etc/private/session/sharing.db";
const owner::Account kAlice{2001, "alice", false};

Call CallOf(const std::string& method) {
  Call call;
  call.api = "TUVO.Sharing.Link";
  call.version = 1;
  call.method = method;
  call.account = kAlice;
  call.address = "192.0.2.7";
  return call;
}

int CodeOf(const Call& call) {
  const Json::Value answer = Handle(call).document;
  return IsSuccess(answer) ? 1 : answer["error"]["code"].asInt();
}

// The event that the call leaves; empty when it leaves none.
std::string EventOf(const Call& call) {
  tuvo_test::SyslogListener log;
  Handle(call);
  std::string events;
  for (const std::string& text : log.TakeTexts()) {
    events += text.compare(0, 8, "sharing ") == 0 ? text : "";
  }
  return events;
}

class WebapiHandler : public testing::Test {
 protected:
  void TearDown() override {
    allocations_left = -1;
    SharingDB::Instance().Execute("DELETE FROM entry");
  }
};

TEST_F(WebapiHandler, FaultsAreFoundInTheirOrder) {
  Call call = CallOf("no-such");
  call.api = "no-such";
  call.version = 9;
  call.may_change = false;
  call.same_origin = false;
  call.account.reset();
  call.arguments["nonsense"] = 1;
  EXPECT_EQ(CodeOf(call), 102);
  call.api = "TUVO.Sharing.Link";
  EXPECT_EQ(CodeOf(call), 104);
  call.version = 1;
  EXPECT_EQ(CodeOf(call), 103);
  call.method = "create";
  EXPECT_EQ(CodeOf(call), 107);
  call.may_change = true;
  EXPECT_EQ(CodeOf(call), 109);
  call.same_origin = true;
  EXPECT_EQ(CodeOf(call), 105);
  call.account = kAlice;
  EXPECT_EQ(CodeOf(call), 200);
  call.arguments.removeMember("nonsense");
  EXPECT_EQ(CodeOf(call), 201);
  call.arguments["project_name"] = 7;
  EXPECT_EQ(CodeOf(call), 202);
  call.arguments["project_name"] = "";
  EXPECT_EQ(CodeOf(call), 203);
  call.arguments["project_name"] = "x";
  EXPECT_EQ(CodeOf(call), 1);
}

TEST_F(WebapiHandler, ReadingMethodNeedsNoPostButTheSameSite) {
  Call call = CallOf("list");
  call.may_change = false;
  EXPECT_EQ(CodeOf(call), 1);
  call.same_origin = false;
  EXPECT_EQ(CodeOf(call), 109);
}

TEST_F(WebapiHandler, TextsAreReadByTheirTypes) {
  Call call = CallOf("list");
  call.arguments["limit"] = "7";
  EXPECT_EQ(CodeOf(call), 202);
  call.texts = true;
  EXPECT_EQ(CodeOf(call), 1);
  call.arguments["limit"] = "seven";
  EXPECT_EQ(CodeOf(call), 202);
}

TEST_F(WebapiHandler, ChangeLeavesOneEvent) {
  Call call = CallOf("create");
  call.arguments["project_name"] = "x";
  const std::string event = EventOf(call);
  EXPECT_EQ(event.substr(0, 26), "sharing event=create link=") << event;
  EXPECT_NE(event.find(" address=192.0.2.7 result=1 by=2001"), std::string::npos) << event;
}

TEST_F(WebapiHandler, RefusedChangeLeavesOneEvent) {
  Call call = CallOf("delete");
  call.account.reset();
  EXPECT_EQ(EventOf(call), "sharing event=delete link=0 address=192.0.2.7 result=105");
  call.account = kAlice;
  call.may_change = false;
  EXPECT_EQ(EventOf(call), "sharing event=delete link=0 address=192.0.2.7 result=107 by=2001");
}

TEST_F(WebapiHandler, WhatChangesNothingLeavesNoEvent) {
  EXPECT_EQ(EventOf(CallOf("list")), "");
  EXPECT_EQ(EventOf(CallOf("no-such")), "");
}

// Calls `call` with its first, second, … allocation failing, until one call has enough of them.
void RunOutOfMemory(const std::function<Call()>& make_call) {
  bool enough = false;
  for (long attempt = 0; !enough; ++attempt) {
    SharingDB::Instance().Execute("DELETE FROM entry");  // few rows, few allocations
    const Call call = make_call();
    allocations_left = attempt;
    try {
      const Json::Value answer = Handle(call).document;
      enough = allocations_left >= 0;
      allocations_left = -1;
      EXPECT_TRUE(IsSuccess(answer) || (!enough && answer["error"]["code"].asInt() >= 100))
          << call.method << " " << attempt << answer.toStyledString();
    } catch (const std::bad_alloc&) {
      allocations_left = -1;
    }
    // No transaction was left open.
    ASSERT_TRUE(SharingDB::Instance().Begin()) << call.method << " " << attempt;
    ASSERT_TRUE(SharingDB::Instance().Commit());
  }
}

Call CreateCall() {
  Call call = CallOf("create");
  call.arguments["project_name"] = "x";
  return call;
}

TEST_F(WebapiHandler, LackOfMemoryIsAFailureOrThrownOn) {
  RunOutOfMemory(CreateCall);
  RunOutOfMemory([] {
    Handle(CreateCall());
    return CallOf("list");
  });
  for (const char* method : {"set", "get", "sessions", "sign_out", "delete"}) {
    RunOutOfMemory([method] {
      Call call = CallOf(method);
      call.arguments["id"] = Handle(CreateCall()).document["data"]["link"]["id"];
      return call;
    });
  }
}

int CreatedLink() {
  Call call = CallOf("create");
  call.arguments["project_name"] = "x";
  return Handle(call).document["data"]["link"]["id"].asInt();
}

Call CallOfLink(const std::string& method, int id) {
  Call call = CallOf(method);
  call.arguments["id"] = id;
  return call;
}

std::string FailedEvent(const std::string& method, int link, int result, int by) {
  return "sharing event=" + method + " link=" + std::to_string(link) +
         " address=192.0.2.7 result=" + std::to_string(result) + " by=" + std::to_string(by);
}

TEST_F(WebapiHandler, FailureNamesTheLinkThatWasFound) {
  SharingDB& db = SharingDB::Instance();
  const int id = CreatedLink();
  ASSERT_TRUE(db.Execute("INSERT INTO session (session_id) VALUES ('s')"));
  ASSERT_TRUE(db.Execute(
      "CREATE TEMP TRIGGER t BEFORE DELETE ON entry BEGIN SELECT RAISE(ABORT, 'x'); END"));
  ASSERT_TRUE(db.Execute(
      "CREATE TEMP TRIGGER u BEFORE DELETE ON token BEGIN SELECT RAISE(ABORT, 'x'); END"));
  ASSERT_TRUE(db.Execute("INSERT INTO token (entry_id, session_id, timeout) SELECT " +
                         std::to_string(id) + ", id, 9999999999 FROM session"));
  for (const char* method : {"delete", "sign_out"}) {
    Call call = CallOfLink(method, id);
    EXPECT_EQ(EventOf(call), FailedEvent(method, id, 100, 2001));
    call.account = owner::Account{2002, "bob", false};  // whose it is not
    EXPECT_EQ(EventOf(call), FailedEvent(method, 0, 205, 2002));
  }
  EXPECT_TRUE(db.Execute("DROP TRIGGER t") && db.Execute("DROP TRIGGER u"));
  EXPECT_TRUE(db.Execute("DELETE FROM session"));
}

TEST_F(WebapiHandler, LockedFileNamesTheLinkThatWasFound) {
  const int id = CreatedLink();
  SharingDB other(kDatabase);
  ASSERT_TRUE(other.Execute("BEGIN IMMEDIATE"));
  EXPECT_EQ(EventOf(CallOfLink("delete", id)), FailedEvent("delete", id, 207, 2001));
  EXPECT_TRUE(other.Execute("ROLLBACK"));
}

TEST_F(WebapiHandler, DatabaseThatCannotBeUsedIsAFailure) {
  EXPECT_EQ(0, tuvo_test::RunInChildAs(tuvo_test::kNobody, [] {
              for (const char* method : {"get", "delete", "sessions", "sign_out", "set"}) {
                Call call = CallOf(method);
                call.arguments["id"] = 1;
                EXPECT_EQ(CodeOf(call), 100) << method;
              }
              for (const char* method : {"list", "delete_expired"}) {
                EXPECT_EQ(CodeOf(CallOf(method)), 100) << method;
              }
              Call call = CallOf("create");
              EXPECT_EQ(CodeOf(call), 201);  // told without it
              call.arguments["project_name"] = "x";
              EXPECT_EQ(CodeOf(call), 100);
              return 0;
            }));
}

}  // namespace
}  // namespace webapi
