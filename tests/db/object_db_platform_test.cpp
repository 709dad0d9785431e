// A store whose connection, or whose memory, gives out in the middle: this program stands between
// the library and the platform.
#include <dlfcn.h>
#include <gtest/gtest.h>
#include <internal/base_db_private.h>
#include <tuvoplatform/database.h>
#include <tuvosharing/session_db.h>
#include <tuvosharing/sharing_db.h>

#include <cstdlib>
#include <functional>
#include <memory>
#include <new>
#include <string>
#include <tuple>
#include <vector>

#include "log_lines.h"
#include "store_records.h"
#include "support/class_layout.h"
#include "support/syslog_listener.h"
#include "test_files.h"

namespace tuvo_test {

using TUVO::sharing::db::BaseDB;
using TUVO::sharing::db::BaseDBPrivate;
auto MembersOf(const BaseDB&);
auto MembersOf(const BaseDBPrivate&);
template struct Reveal<BaseDB, &BaseDB::p_>;
template struct Reveal<BaseDBPrivate, &BaseDBPrivate::good_>;

}  // namespace tuvo_test

namespace {

std::function<void()> after_insert;
bool memory_is_out = false;

}  // namespace

extern "C" int TUVODBExecute(TUVODB* db, const char* sql, DBResult_tag** result) {
  const int code = reinterpret_cast<decltype(&TUVODBExecute)>(dlsym(RTLD_NEXT, "TUVODBExecute"))(
      db, sql, result);
  if (after_insert && std::string(sql).compare(0, 6, "INSERT") == 0) {
    after_insert();
  }
  return code;
}

void* operator new(std::size_t size, const std::nothrow_t& /*tag*/) noexcept {
  return memory_is_out ? nullptr : std::malloc(size != 0 ? size : 1);
}

void* operator new(std::size_t size) {
  void* memory = ::operator new(size, std::nothrow);
  if (memory == nullptr) {
    throw std::bad_alloc();
  }
  return memory;
}

void operator delete(void* memory) noexcept {
  std::free(memory);
}

void operator delete(void* memory, std::size_t /*size*/) noexcept {
  std::free(memory);
}

namespace {

using TUVO::sharing::db::SessionDB;
using TUVO::sharing::db::SharingDB;
using TUVO::sharing::record::Session;
using tuvo_test::BaseDB;
using tuvo_test::MembersOf;
using tuvo_test::SyslogListener;
using tuvo_test::TakeLines;

class ObjectDBPlatform : public testing::Test {
 protected:
  ObjectDBPlatform() : db_(tuvo_test::NewPath("/tmp/object platform.db")) {}
  ~ObjectDBPlatform() override { after_insert = nullptr; }

  bool& ConnectionIsGood() {
    BaseDB& base = db_;
    auto& connection = *(base.*std::get<0>(MembersOf(base)));
    return connection.*std::get<0>(MembersOf(connection));
  }

  SharingDB db_;
  SyslogListener listener_;
};

TEST_F(ObjectDBPlatform, ANewIdThatCannotBeLearntIsAFailureInSilence) {
  SessionDB store(db_);
  Session session = tuvo_test::LegalSession("visitor");
  session.set_id(500);
  after_insert = [this] { ConnectionIsGood() = false; };
  EXPECT_FALSE(store.Create(session));
  ConnectionIsGood() = true;
  EXPECT_EQ(session.get_id(), 500);
  EXPECT_EQ(TakeLines(listener_), std::vector<std::string>{});
  int count = 0;
  EXPECT_TRUE(store.Count(count));
  EXPECT_EQ(count, 1) << "the row is there all the same";
}

// A destructor that throws would end the process.
TEST_F(ObjectDBPlatform, AStoreEndsWithoutMemoryForItsCheckpoint) {
  auto store = std::make_unique<SessionDB>(db_);
  ASSERT_TRUE(db_.Execute("SELECT 'nothing since'"));
  memory_is_out = true;
  store.reset();
  memory_is_out = false;
  EXPECT_EQ(db_.GetLastQuery(), "SELECT 'nothing since'");
}

}  // namespace
