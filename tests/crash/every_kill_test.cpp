// A process is killed at every call by which it changes files or locks: what is found after, and
// whether others can go on.
#include <gtest/gtest.h>
#include <sys/stat.h>
#include <tuvoplatform/auto_block.h>
#include <tuvosharing/login.h>
#include <tuvosharing/session_db.h>
#include <tuvosharing/sharing_db.h>
#include <unistd.h>

#include <array>
#include <functional>
#include <stdexcept>
#include <string>
#include <vector>

#include "concurrency/crew.h"
#include "concurrency/visitors.h"
#include "crash/kill_sweep.h"
#include "crash/stored.h"
#include "db/sqlite_file.h"
#include "db/test_files.h"

namespace tuvo_test {
namespace {

using TUVO::sharing::db::EntryDB;
using TUVO::sharing::db::SessionDB;
using TUVO::sharing::db::SharingDB;
using TUVO::sharing::record::Entry;

constexpr char kAutoBlockFile[] = "/usr/tuvo/etc/private/session/autoblock.db";
constexpr int kVisitors = 20;

int LogIn(const std::string& hash, const char* password) {
  _tag_sharing_login_params params{hash.c_str(), password, nullptr, nullptr, nullptr};
  std::string session_id;
  return TUVO::TuvoSharingLogin(session_id, &params, false);
}

long Number(const std::string& sql) {
  return NumberIn(kSharingFile, sql);
}

// What a login writes, step by step.
struct Traces {
  long uses, sessions, tokens;
};

Traces TracesNow() {
  return {Number("SELECT use_count FROM entry"), Number("SELECT COUNT(*) FROM session"),
          Number("SELECT COUNT(*) FROM token")};
}

// From `before` on the steps were done in their order, as far as the process came: all of them when
// it was told so.
void ExpectSteps(const Traces& before, bool acknowledged) {
  const Traces now = TracesNow();
  const long use = now.uses - before.uses;
  const long session = now.sessions - before.sessions;
  const long token = now.tokens - before.tokens;
  EXPECT_TRUE(0 <= token && token <= session && session <= use && use <= 1)
      << use << ' ' << session << ' ' << token;
  EXPECT_TRUE(!acknowledged || token == 1);
  EXPECT_EQ(now.tokens, Number("SELECT COUNT(*) FROM token JOIN session ON session.id = "
                               "token.session_id JOIN entry ON entry.id = entry_id"));
}

// A file that a program of an older schema left, with one link in it or, of version 0, nothing.
void LayOldFile(int version) {
  SqliteFile file(NewPath(kSharingFile));
  if (version == 0) {
    file.Execute("VACUUM");
  } else {
    file.Execute(SchemaScript(1));
    file.Execute(
        "INSERT INTO entry VALUES (NULL, 'old', 'photo', 1, 2001, 0, 0, 0, 7, 0, "
        "'{\"app\":{},\"protect_type\":\"none\",\"private_data\":{}}')");
  }
  if (chown(kSharingFile, 1, 1) != 0) {
    throw std::runtime_error("chown");
  }
}

class EveryKill : public testing::Test {
 protected:
  EveryKill() { ClearSharingFolder(); }

  static void SweepLogin(const std::string& name, const std::string& hash, const char* password) {
    Traces before = TracesNow();
    KillSweep sweep;
    sweep.name = name;
    sweep.prepare = [&] { before = TracesNow(); };
    sweep.begin = [] { ServeAddress(AddressOf(0)); };
    sweep.operation = [&](const Acknowledge& acknowledge) {
      if (LogIn(hash, password) == 1) {
        acknowledge();
      }
    };
    sweep.examine = [&](bool acknowledged) {
      ExpectGood(kSharingFile);
      ExpectSteps(before, acknowledged);
    };
    SweepKills(sweep);
  }

  static void SweepOpening(const std::string& name, const std::function<void()>& prepare,
                           long links) {
    KillSweep sweep;
    sweep.name = name;
    sweep.prepare = prepare;
    sweep.operation = [](const Acknowledge& acknowledge) {
      if (SharingDB::Instance().IsGood()) {
        acknowledge();
      }
    };
    sweep.examine = [&](bool /*acknowledged*/) {
      ExpectGood(kSharingFile);
      EXPECT_EQ(links, Number("SELECT COUNT(*) FROM entry WHERE hash = 'old' AND use_count = 7"));
      EXPECT_EQ(9, Number("SELECT COUNT(*) FROM sqlite_master WHERE type = 'index' AND sql != ''"));
    };
    SweepKills(sweep);
  }
};

TEST_F(EveryKill, OfALoginToAnOpenLink) {
  SweepLogin("login, open link", StoreLink([](Entry&) {}), nullptr);
}

TEST_F(EveryKill, OfALoginToALinkWithAPassword) {
  const std::string hash = StoreLink([](Entry& link) {
    link.set_protect_type(Entry::PROTECT_PASSWORD)
        .set_protect_password("sesame", true, Entry::ENCRYPT_ALGO_DEFAULT);
  });
  SweepLogin("login, password link", hash, "sesame");
}

// The use is counted before the visitor is in: dying in between uses one up and admits nobody.
TEST_F(EveryKill, OfALoginToALinkWithALimitNeverAdmitsOneTooMany) {
  const std::string hash = StoreLink([](Entry& link) { link.set_expire_times(1); });
  KillSweep sweep;
  sweep.name = "login, link with a limit";
  sweep.prepare = [] {
    SqliteFile file(kSharingFile);
    file.Execute("UPDATE entry SET use_count = 0; DELETE FROM session");
  };
  sweep.begin = [] { ServeAddress(AddressOf(0)); };
  sweep.operation = [&](const Acknowledge& acknowledge) {
    if (LogIn(hash, nullptr) == 1) {
      acknowledge();
    }
  };
  sweep.examine = [&](bool acknowledged) {
    ExpectGood(kSharingFile);
    ExpectSteps({0, 0, 0}, acknowledged);
    const bool used = Number("SELECT use_count FROM entry") == 1;
    const int next = Wait(Start(kRoot, [&] {
      ServeAddress(AddressOf(1));
      const int answer = LogIn(hash, nullptr);
      return answer == (used ? -11 : 1) ? 0 : 1;
    }));
    EXPECT_EQ(0, next);
    EXPECT_EQ(1, Number("SELECT use_count FROM entry"));
  };
  SweepKills(sweep);
}

// What is held against an address is in a file of its own.
TEST_F(EveryKill, OfALoginWithAWrongPasswordLosesNoFailureThatWasCounted) {
  const std::string hash = StoreLink([](Entry& link) {
    link.set_protect_type(Entry::PROTECT_PASSWORD)
        .set_protect_password("sesame", true, Entry::ENCRYPT_ALGO_DEFAULT);
  });
  const auto failures = [] {
    const std::string tables = "SELECT COUNT(*) FROM sqlite_master WHERE name = 'failure'";
    return Exists(kAutoBlockFile) && NumberIn(kAutoBlockFile, tables) == 1
               ? NumberIn(kAutoBlockFile, "SELECT COUNT(*) FROM failure")
               : 0;
  };
  KillSweep sweep;
  sweep.name = "login, wrong password";
  sweep.prepare = [] { NewPath(kAutoBlockFile); };
  sweep.begin = [] { ServeAddress(AddressOf(0)); };
  sweep.operation = [&](const Acknowledge& acknowledge) {
    if (LogIn(hash, "simsim") == -9) {
      acknowledge();
    }
  };
  sweep.examine = [&](bool acknowledged) {
    ExpectGood(kSharingFile);
    EXPECT_EQ(0, Number("SELECT COUNT(*) FROM token"));
    const long counted = failures();
    EXPECT_TRUE(counted == 1 || (!acknowledged && counted == 0)) << counted;
    const int next = Wait(Start(kRoot, [&] {
      ServeAddress(AddressOf(0));
      return LogIn(hash, "simsim") == -9 ? 0 : 1;
    }));
    EXPECT_EQ(0, next);
    EXPECT_EQ(counted + 1, failures());
    EXPECT_EQ("ok", SqliteFile(kAutoBlockFile).Value("PRAGMA integrity_check"));
  };
  SweepKills(sweep);
}

TEST_F(EveryKill, OfACreate) {
  StoreLink([](Entry&) {});
  const Shared<std::array<char, kNameRoom>> hash;
  std::size_t before = 0;
  KillSweep sweep;
  sweep.name = "create";
  sweep.prepare = [&] { before = StoredLinks(kSharingFile).size(); };
  sweep.operation = [&](const Acknowledge& acknowledge) {
    Entry link = BigLink(3);
    if (EntryDB(SharingDB::Instance()).CreateWithHash(link)) {
      link.get_hash().copy(hash->data(), kNameRoom - 1);
      acknowledge();
    }
  };
  sweep.examine = [&](bool acknowledged) {
    ExpectGood(kSharingFile);
    const std::vector<Entry> links = StoredLinks(kSharingFile);
    const std::size_t made = links.size() - before;
    EXPECT_TRUE(made == 1 || (!acknowledged && made == 0)) << made;
    EXPECT_TRUE(made == 0 || GenerationOf(links.back()) == 3);
    EXPECT_TRUE(!acknowledged || links.back().get_hash() == hash->data());
  };
  SweepKills(sweep);
}

TEST_F(EveryKill, OfAChange) {
  const std::string hash = StoreLink([](Entry& link) { SetGeneration(link, 0); });
  int generation = 0;
  KillSweep sweep;
  sweep.name = "change";
  sweep.operation = [&](const Acknowledge& acknowledge) {
    if (ChangeLink(hash, Reading::kAfterAWrite,
                   [&](Entry& link) { SetGeneration(link, generation + 1); })) {
      acknowledge();
    }
  };
  sweep.examine = [&](bool acknowledged) {
    ExpectGood(kSharingFile);
    const int now = GenerationOf(StoredLinks(kSharingFile).at(0));
    EXPECT_TRUE(now == generation + 1 || (!acknowledged && now == generation)) << now;
    generation = now;
  };
  SweepKills(sweep);
}

TEST_F(EveryKill, OfADeleteLeavesTheLinkWithItsTokensOrNothing) {
  const std::string hash = StoreLink([](Entry&) {});
  const std::string lay =
      "INSERT OR IGNORE INTO entry VALUES (77, 'gone', 'photo', 1, 2001, 0, 0, 0, 0, 0, "
      "'{\"app\":{}}'); DELETE FROM session; "
      "WITH RECURSIVE n(i) AS (SELECT 1 UNION ALL SELECT i + 1 FROM n WHERE i < " +
      std::to_string(kVisitors) +
      ") INSERT INTO session SELECT NULL, 's' || i, 4294967295, '192.0.2.1', 9999999999 FROM n; "
      "INSERT INTO token SELECT NULL, 77, id, 9999999999 FROM session;";
  KillSweep sweep;
  sweep.name = "delete";
  sweep.prepare = [&] { SqliteFile(kSharingFile).Execute(lay); };
  sweep.operation = [](const Acknowledge& acknowledge) {
    if (EntryDB(SharingDB::Instance()).Delete(77)) {
      acknowledge();
    }
  };
  sweep.examine = [](bool acknowledged) {
    ExpectGood(kSharingFile);
    const long link = Number("SELECT COUNT(*) FROM entry WHERE id = 77");
    EXPECT_EQ(link * kVisitors, Number("SELECT COUNT(*) FROM token"));
    EXPECT_EQ(kVisitors, Number("SELECT COUNT(*) FROM session"));
    EXPECT_TRUE(!acknowledged || link == 0);
  };
  SweepKills(sweep);
}

TEST_F(EveryKill, OfAPurgeTakesAllThatIsOverOrNothing) {
  StoreLink([](Entry&) {});
  const std::string lay =
      "DELETE FROM session; "
      "WITH RECURSIVE n(i) AS (SELECT 1 UNION ALL SELECT i + 1 FROM n WHERE i < " +
      std::to_string(2 * kVisitors) +
      ") INSERT INTO session SELECT NULL, 's' || i, 4294967295, '192.0.2.1', "
      "CASE WHEN i % 2 THEN 9999999999 ELSE 1 END FROM n; "
      "INSERT INTO token SELECT NULL, (SELECT id FROM entry), id, 9999999999 FROM session;";
  KillSweep sweep;
  sweep.name = "purge";
  sweep.prepare = [&] { SqliteFile(kSharingFile).Execute(lay); };
  sweep.operation = [](const Acknowledge& acknowledge) {
    if (SessionDB(SharingDB::Instance()).PurgeExpired(1)) {
      acknowledge();
    }
  };
  sweep.examine = [](bool acknowledged) {
    ExpectGood(kSharingFile);
    const long over = Number("SELECT COUNT(*) FROM session WHERE timeout = 1");
    EXPECT_TRUE(over == 0 || (!acknowledged && over == kVisitors)) << over;
    EXPECT_EQ(kVisitors, Number("SELECT COUNT(*) FROM session WHERE timeout != 1"));
    EXPECT_EQ(kVisitors + over, Number("SELECT COUNT(*) FROM token"));
  };
  SweepKills(sweep);
}

// Nobody but the owner can have read it, even where the process died before the file had its mode.
TEST_F(EveryKill, OfAFirstOpen) {
  KillSweep sweep;
  sweep.name = "first open";
  sweep.prepare = ClearSharingFolder;
  sweep.operation = [](const Acknowledge& acknowledge) {
    if (SharingDB::Instance().IsGood()) {
      acknowledge();
    }
  };
  sweep.examine = [](bool acknowledged) {
    ExpectGood(kSharingFile);
    EXPECT_EQ(0, Number("SELECT COUNT(*) FROM entry"));
    const std::string mode = OwnerAndMode(kSharingFile);
    EXPECT_TRUE(mode == "1:1 0660" || (!acknowledged && mode == "1:1 0600")) << mode;
  };
  SweepKills(sweep);
}

TEST_F(EveryKill, OfAMigrationFromVersion0) {
  SweepOpening(
      "migration from 0", [] { LayOldFile(0); }, 0);
}

TEST_F(EveryKill, OfAMigrationFromVersion1) {
  SweepOpening(
      "migration from 1", [] { LayOldFile(1); }, 1);
}

// The last close folds the log back into the file and removes it.
TEST_F(EveryKill, OfALastClose) {
  StoreLink([](Entry&) {});
  long sessions = 0;
  KillSweep sweep;
  sweep.name = "last close";
  sweep.begin = [] {
    for (const char* address : {"'192.0.2.1'", "'192.0.2.2'", "'192.0.2.3'"}) {
      SharingDB::Instance().Execute(
          std::string("INSERT INTO session VALUES (NULL, NULL, 0, ") + address + ", 9999999999)",
          nullptr);
    }
  };
  sweep.operation = [](const Acknowledge& acknowledge) { acknowledge(); };
  sweep.examine = [&](bool acknowledged) {
    EXPECT_TRUE(acknowledged);
    ExpectGood(kSharingFile);
    sessions += 3;
    EXPECT_EQ(sessions, Number("SELECT COUNT(*) FROM session"));
  };
  SweepKills(sweep);
}

// A process that serves one login after another, as others die beside it.
class Survivor {
 public:
  explicit Survivor(const std::string& hash) {
    if (pipe(orders_.data()) != 0 || pipe(answers_.data()) != 0) {
      throw std::runtime_error("pipe");
    }
    pid_ = Start(kRoot, [&] { return Serve(hash); });
    Login();  // it has the file open from now on
  }
  ~Survivor() {
    close(orders_[1]);
    EXPECT_EQ(0, Wait(pid_));
    for (const int fd : {orders_[0], answers_[0], answers_[1]}) {
      close(fd);
    }
  }
  Survivor(const Survivor&) = delete;
  Survivor& operator=(const Survivor&) = delete;

  int Login() {
    int answer = 0;
    const bool told =
        write(orders_[1], "", 1) == 1 && read(answers_[0], &answer, sizeof answer) == sizeof answer;
    return told ? answer : 0;
  }

 private:
  int Serve(const std::string& hash) {
    close(orders_[1]);
    ServeAddress(AddressOf(1));
    char order = 0;
    while (read(orders_[0], &order, 1) == 1) {
      const int answer = LogIn(hash, nullptr);
      if (write(answers_[1], &answer, sizeof answer) != sizeof answer) {
        return 1;
      }
    }
    return 0;
  }

  std::array<int, 2> orders_{};
  std::array<int, 2> answers_{};
  pid_t pid_ = 0;
};

// Nobody opens the file anew then: what the dead one left in the memory that all share, and its
// locks, must not stop the others.
TEST_F(EveryKill, OfALoginBesideAProcessThatGoesOn) {
  const std::string hash = StoreLink([](Entry&) {});
  Survivor survivor(hash);
  Traces before = TracesNow();
  KillSweep sweep;
  sweep.name = "login beside another process";
  sweep.prepare = [&] { before = TracesNow(); };
  sweep.begin = [] { ServeAddress(AddressOf(0)); };
  sweep.operation = [&](const Acknowledge& acknowledge) {
    if (LogIn(hash, nullptr) == 1) {
      acknowledge();
    }
  };
  sweep.examine = [&](bool acknowledged) {
    EXPECT_EQ(1, survivor.Login());
    ExpectGood(kSharingFile);
    ExpectSteps({before.uses + 1, before.sessions + 1, before.tokens + 1}, acknowledged);
  };
  SweepKills(sweep);
}

}  // namespace
}  // namespace tuvo_test
