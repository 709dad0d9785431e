// Every call into the system, and every allocation, of the other operations that matter fails once:
// what they answer then, what is left behind, and whether the process can go on.
#include <json/value.h>
#include <tuvosharing/entry_db.h>
#include <tuvosharing/session_db.h>
#include <tuvosharing/sharing_db.h>
#include <tuvosharing/token_db.h>

#include <new>
#include <set>
#include <string>
#include <vector>

#include "db/test_files.h"
#include "faults/every_call.h"

namespace tuvo_test {
namespace {

using TUVO::sharing::db::EntryDB;
using TUVO::sharing::db::SessionDB;
using TUVO::sharing::db::SharingDB;
using TUVO::sharing::db::TokenDB;
using TUVO::sharing::record::Entry;
using TUVO::sharing::record::Session;

TEST_F(EveryCall, OfACheck) {
  const std::string hash = MakePasswordLink();
  const std::string id = LoggedIn(Visit(hash).Password("sesame"));
  const Visit visit = Visit(hash).Session(id);
  InLongProcess(visit, [&] {
    Observer observer;
    const auto row = [&] {
      return observer.Text(
          "SELECT session.id || ' ' || uid || ' ' || ip || ' ' || token.id || ' ' || entry_id "
          "FROM session JOIN token ON token.session_id = session.id");
    };
    const auto timeouts = [&] {
      return observer.Number("SELECT min(session.timeout, token.timeout) FROM session JOIN token");
    };
    const std::string before = row();
    long timeouts_before = timeouts();
    Sweep(
        "check", kCalls, [&] { return Check(visit); },
        [&](const Step& step) {
          const std::set<int> answers{1, -4, -5, -7};
          EXPECT_EQ(1U, answers.count(step.answer));
          observer.ExpectNothingHeld();
          EXPECT_EQ(before, row());
          EXPECT_LE(timeouts_before, timeouts());
          EXPECT_EQ(1, Check(visit)) << "the next one";
          timeouts_before = timeouts();
        });
    observer.ExpectWhole();
  });
}

TEST_F(EveryCall, OfACheckThatIsToBeRefused) {
  const std::string hash = MakePasswordLink();
  const std::string id = LoggedIn(Visit(hash).Password("sesame"));
  const Visit visit = Visit(hash).Session(id).From(kOtherAddress);
  SweepRefused("check, other address", visit, [&] { return Check(visit); }, {-4, -5, -7, -8});
}

TEST_F(EveryCall, OfALogout) {
  const std::string hash = MakeLink();
  const std::string id = LoggedIn(Visit(hash));
  InLongProcess(Visit(hash), [&] {
    Observer observer;
    const std::string remember = observer.Text(
        "SELECT entry_id || ',' || session_id || ',' || "
        "timeout FROM token");
    Sweep(
        "logout", kCalls, [&] { return TUVO::TuvoSharingLogout(hash, id) ? 1 : 0; },
        [&](const Step& step) {
          observer.ExpectNothingHeld();
          EXPECT_EQ(step.answer == 1 ? "0" : "1", observer.Text("SELECT COUNT(*) FROM token"));
          if (step.answer != 1) {
            EXPECT_TRUE(TUVO::TuvoSharingLogout(hash, id)) << "the next one";
          }
          observer.Text("INSERT INTO token VALUES (NULL," + remember + ")");
        });
    observer.ExpectWhole();
  });
}

TEST_F(EveryCall, OfCountingAUse) {
  const std::string hash = MakeLink();
  InLongProcess(Visit(), [&] {
    Observer observer;
    long before = 0;
    Sweep(
        "counting a use", kCalls, [&] { return TUVO::TuvoSharingIncreaseUseCount(hash) ? 1 : 0; },
        [&](const Step& step) {
          observer.ExpectNothingHeld();
          const long uses = observer.Number("SELECT use_count FROM entry");
          EXPECT_EQ(before + step.answer, uses);
          EXPECT_TRUE(TUVO::TuvoSharingIncreaseUseCount(hash)) << "the next one";
          before = uses + 1;
        });
    observer.ExpectWhole();
  });
}

// What gives the file back may fail as well.
TEST_F(EveryCall, OfCountingAUseOfALinkThatIsNotThere) {
  MakeLink();
  SweepRefused("counting a use, no link", Visit(),
               [] { return TUVO::TuvoSharingIncreaseUseCount("nobodys") ? 1 : 0; }, {0});
  EXPECT_EQ("0", Value("SELECT use_count FROM entry"));
}

TEST_F(EveryCall, OfThePurges) {
  MakeLink();
  InLongProcess(Visit(), [&] {
    Observer observer;
    const auto refill = [&] {
      observer.Text("INSERT INTO entry (hash, auto_gc, expire_at) VALUES ('old', 1, 1000)");
      observer.Text("INSERT INTO session (session_id, timeout) VALUES ('old', 1000)");
      observer.Text(
          "INSERT INTO token (entry_id, session_id, timeout) SELECT entry.id, "
          "session.id, 1000 FROM entry, session");
    };
    const auto left = [&] {
      return observer.Text(
          "SELECT (SELECT COUNT(*) FROM entry WHERE expire_at = 1000) + (SELECT COUNT(*) FROM "
          "session) + (SELECT COUNT(*) FROM token)");
    };
    const auto purge = [] {
      SharingDB& db = SharingDB::Instance();
      const bool tokens = TokenDB(db).PurgeExpired(1);
      const bool sessions = SessionDB(db).PurgeExpired(1);
      const bool links = EntryDB(db).PurgeExpired(1);
      return tokens && sessions && links ? 1 : 0;
    };
    refill();
    Sweep(
        "purge", kCalls,
        [&] {
          try {
            return purge();
          } catch (const std::bad_alloc&) {
            return 2;  // from the constructor of a store
          }
        },
        [&](const Step& step) {
          observer.ExpectNothingHeld();
          if (step.answer == 1) {
            EXPECT_EQ("0", left());
          } else {
            EXPECT_TRUE(step.answer == 0 || step.fault == kMemory);
          }
          EXPECT_EQ("1", observer.Text("SELECT COUNT(*) FROM entry WHERE expire_at = 0"));
          EXPECT_EQ(1, purge()) << "the next one";
          EXPECT_EQ("0", left());
          refill();
        });
    observer.ExpectWhole();
  });
}

TEST_F(EveryCall, OfCreatingALink) {
  InLongProcess(Visit(), [&] {
    Observer observer;
    Entry entry;
    entry.set_project_name("photo").set_owner_uid(kAlice).set_app(Json::objectValue);
    entry.set_protect_title(std::string(40000, '\''));  // escaped on the heap
    EntryDB entries(SharingDB::Instance());
    ASSERT_TRUE(entries.CreateWithHash(entry));
    const std::string data = observer.Text("SELECT data FROM entry");
    const auto create = [&] {
      entry.set_id(0);
      return entries.CreateWithHash(entry) ? 1 : 0;
    };
    long before = 1;
    Sweep("create", kCalls, create, [&](const Step& step) {
      // Any failure counts as a hash that is taken: the next attempt succeeds.
      EXPECT_EQ(1, step.answer);
      observer.ExpectNothingHeld();
      EXPECT_EQ(before + 1, observer.Number("SELECT COUNT(*) FROM entry"));
      EXPECT_EQ(std::to_string(entry.get_id()),
                observer.Text("SELECT id FROM entry WHERE hash = '" + entry.get_hash() + "'"));
      EXPECT_EQ(data, observer.Text("SELECT data FROM entry WHERE id = " +
                                    std::to_string(entry.get_id())));
      EXPECT_EQ(1, create()) << "the next one";
      observer.Text("DELETE FROM entry WHERE id > 1");
    });
    observer.ExpectWhole();
  });
}

TEST_F(EveryCall, OfUpdatingALink) {
  InLongProcess(Visit(), [&] {
    Observer observer;
    EntryDB entries(SharingDB::Instance());
    Entry entry;
    entry.set_project_name("photo").set_owner_uid(kAlice).set_app(Json::objectValue);
    ASSERT_TRUE(entries.CreateWithHash(entry));
    const auto stored = [&] {
      return observer.Text("SELECT hash || project_name || data FROM entry");
    };
    const std::string first = stored();
    entry.set_protect_title(std::string(40000, '\''));
    ASSERT_TRUE(entries.Update(entry));
    const std::string second = stored();
    Entry old = entry;
    old.set_protect_title("");
    ASSERT_TRUE(entries.Update(old));
    ASSERT_EQ(first, stored());
    Sweep(
        "update", kCalls, [&] { return entries.Update(entry) ? 1 : 0; },
        [&](const Step& step) {
          observer.ExpectNothingHeld();
          EXPECT_EQ(step.answer == 1 ? second : first, stored());
          EXPECT_TRUE(step.answer == 1 || step.Logged("update failed\n"));
          EXPECT_TRUE(entries.Update(old)) << "the next one";
        });
    observer.ExpectWhole();
  });
}

// What is read is right, or the answer is false and nothing was touched.
TEST_F(EveryCall, OfReadingLinks) {
  std::string hash;
  for (int i = 0; i < 3; ++i) {
    hash = MakeLink([&](Entry& entry) {
      entry.set_project_name("o'" + std::string(40, 'p'))
          .set_expire_times(i)
          .set_protect_title("t");
    });
  }
  const auto texts = [](const std::vector<Entry>& entries) {
    std::vector<std::vector<std::string>> all;
    for (const Entry& entry : entries) {
      all.push_back(entry.GetFieldList());
    }
    return all;
  };
  InLongProcess(Visit(), [&] {
    const EntryDB entries(SharingDB::Instance());
    Entry wanted;
    ASSERT_TRUE(entries.GetByHash(hash, wanted));
    std::vector<Entry> all;
    ASSERT_TRUE(entries.Query(all));
    ASSERT_EQ(3U, all.size());
    const auto all_texts = texts(all);
    const std::string project = "o'" + std::string(40, 'p');

    Entry entry;
    Sweep(
        "read by hash", kMemory | kFiles,
        [&] {
          {
            const NotCounted not_counted;
            entry = Entry();
          }
          return entries.GetByHash(hash, entry) ? 1 : 0;
        },
        [&](const Step& step) {
          const Entry& expected = step.answer == 1 ? wanted : Entry();
          EXPECT_EQ(expected.GetFieldList(), entry.GetFieldList());
          EXPECT_EQ(expected.get_id(), entry.get_id());
        });

    const std::string id = "id";
    const std::string column = "project_name";
    const std::string times = "expire_times";
    const std::string two = "2";
    const std::string none_of_them = "hash = 'none of the hashes that there are'";
    std::vector<Entry> found(1);
    Sweep(
        "query", kMemory | kFiles,
        [&] {
          entries.GetCondition().Where(column, project);
          entries.GetCondition().OrWhere(none_of_them);
          entries.GetCondition().OrderBy(column, true);
          entries.GetCondition().OrderBy(id, true);
          return entries.Query(found) ? 1 : 0;
        },
        [&](const Step& step) {
          EXPECT_EQ(step.answer == 1 ? 3U : 1U, found.size());
          EXPECT_TRUE(entries.GetCondition().IsEmpty());
          if (step.answer == 1) {
            EXPECT_EQ(all_texts, texts(found));
          }
          found.resize(1);
        });

    int count = 0;
    Sweep(
        "count", kMemory | kFiles,
        [&] {
          count = -1;
          entries.GetCondition().Where(times, two);
          entries.GetCondition().Where(column, project);
          return entries.Count(count) ? 1 : 0;
        },
        [&](const Step& step) {
          EXPECT_EQ(step.answer == 1 ? 1 : -1, count);
          EXPECT_TRUE(entries.GetCondition().IsEmpty());
        });
  });
}

// Nothing of a transaction is left open, whichever of its statements failed.
TEST_F(EveryCall, OfATransaction) {
  const std::string hash = MakeLink();
  InLongProcess(Visit(), [&] {
    Observer observer;
    SharingDB& db = SharingDB::Instance();
    const std::string table = "session";
    std::vector<std::string> values{"0", "1", "::1", "5"};
    long before = observer.Number("SELECT COUNT(*) FROM session");
    Sweep(
        "transaction", kCalls,
        [&] {
          if (!db.Begin()) {
            return 0;
          }
          const bool inserted = db.Insert(table, values);
          return db.Commit() && inserted ? 1 : 0;
        },
        [&](const Step& step) {
          observer.ExpectNothingHeld();
          EXPECT_EQ(before + step.answer, observer.Number("SELECT COUNT(*) FROM session"));
          EXPECT_TRUE(step.answer == 1 || step.fault != kMemory || !db.GetLastError().empty());
          before += step.answer;
          values[0] = std::to_string(before);
        });
  });
}

// The file is whole afterwards, or made whole by the next who opens it.
TEST_F(EveryCall, OfAFirstOpen) {
  InChild([] {
    const std::string path = kPrivateFolder + std::string("first.db");
    { const SharingDB warm(NewPath(path)); }  // what SQLite and others allocate once
    TakeLogged();
    const auto open = [&] {
      try {
        return SharingDB(path).IsGood() ? 1 : 0;
      } catch (const std::bad_alloc&) {
        return 2;  // from the constructor
      }
    };
    long lost = 0;
    Sweep(
        "first open", kCalls,
        [&] {
          {
            const NotCounted not_counted;
            NewPath(path);
          }
          const long blocks_before = BlocksAlive();
          const int answer = open();
          lost = BlocksAlive() - blocks_before;
          return answer;
        },
        [&](const Step& step) {
          EXPECT_EQ(0, lost) << "blocks of memory";
          EXPECT_TRUE(step.answer != 2 || step.fault == kMemory);
          EXPECT_TRUE(step.answer != 0 || !step.log.empty());
          EXPECT_TRUE(SharingDB(path).IsGood()) << "the next one";
          EXPECT_EQ("1:1 0660", OwnerAndMode(path));
          SqliteFile file(path);
          EXPECT_EQ("2", file.Value("PRAGMA user_version"));
          EXPECT_EQ("9", file.Value("SELECT COUNT(*) FROM sqlite_master WHERE type = 'index' AND "
                                    "sql IS NOT NULL"));
          if (step.fault != kMemory) {
            EXPECT_EQ("ok", file.Value("PRAGMA integrity_check"));
          }
        });
  });
}

// What it leaves in memory is not looked at above: checks at every failing call take no more of it
// the second time.
TEST_F(EveryCall, OfACheckLosesNoMemory) {
#ifdef __SANITIZE_ADDRESS__
  GTEST_SKIP() << "the sanitizer looks for leaks itself";
#endif
  const std::string hash = MakePasswordLink();
  const Visit visit = Visit(hash).Session(LoggedIn(Visit(hash).Password("sesame")));
  InLongProcess(visit, [&] {
    const auto round = [&] {
      FaultKind fault = kNoFault;
      long number = 0;
      do {
        ++number;
        FailAt(kMemory, number);
        Check(visit);
        fault = StopFailing();
        TakeLogged();
      } while (fault != kNoFault);
      return number;
    };
    round();
    const long before = BlocksAlive();
    const long number = round();
    // Caches of SQLite and of the C library may still grow a little.
    EXPECT_GT(number / 10, BlocksAlive() - before);
  });
}

}  // namespace
}  // namespace tuvo_test
