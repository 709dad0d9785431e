#include "owner/link_store.h"

#include <gtest/gtest.h>
#include <sys/wait.h>
#include <tuvosharing/entry_db.h>
#include <tuvosharing/login.h>
#include <tuvosharing/sharing_db.h>
#include <unistd.h>

#include <ctime>
#include <vector>

namespace owner {
namespace {

using TUVO::sharing::db::EntryDB;
using TUVO::sharing::db::SharingDB;
using TUVO::sharing::record::Entry;

constexpr const char* kPath = "/usr/tuvo/etc/private/session/sharing.db";

Entry Link() {
  Entry link;
  link.set_project_name("album").set_owner_uid(2001).set_app(Json::objectValue);
  return link;
}

Error ErrorOf(const MaybeProblem& problem) {
  return problem ? problem->error : static_cast<Error>(0);
}

class OwnerLinkStore : public testing::Test {
 protected:
  // Every process opens the file for itself, as the programs do.
  void SetUp() override { db_ = std::make_unique<SharingDB>(kPath); }
  void TearDown() override { db_->Execute("DELETE FROM entry"); }

  Entry Stored(const Entry& link) {
    Entry stored = link;
    EXPECT_EQ(CreateLink(*db_, &stored), std::nullopt);
    return stored;
  }

  Entry Load(const Entry& link) {
    Entry loaded;
    EXPECT_EQ(FindLink(*db_, {link.get_id(), ""}, std::nullopt, &loaded), std::nullopt);
    return loaded;
  }

  bool IsThere(const Entry& link) {
    Entry loaded;
    return !FindLink(*db_, {link.get_id(), ""}, std::nullopt, &loaded);
  }

  std::unique_ptr<SharingDB> db_;
};

MaybeProblem SetTitle(Entry* link) {
  link->set_protect_title("new");
  return std::nullopt;
}

TEST_F(OwnerLinkStore, DrawsAHashWhenNoneIsChosen) {
  const Entry link = Stored(Link());
  EXPECT_EQ(link.get_hash().size(), 9U);
  EXPECT_NE(link.get_id(), 0);
}

TEST_F(OwnerLinkStore, TakesTheChosenHash) {
  const Entry link = Stored(Link().set_hash("my-photos"));
  EXPECT_EQ(Load(link).get_hash(), "my-photos");
}

TEST_F(OwnerLinkStore, RefusesAHashThatIsTaken) {
  Stored(Link().set_hash("my-photos"));
  Entry second = Link().set_hash("my-photos");
  const MaybeProblem problem = CreateLink(*db_, &second);
  EXPECT_EQ(ErrorOf(problem), Error::kHashTaken);
  EXPECT_EQ(problem->field, "hash");
}

TEST_F(OwnerLinkStore, HashOfARowThatDoesNotLoadIsTakenToo) {
  Stored(Link().set_hash("my-photos"));
  ASSERT_TRUE(db_->Execute("UPDATE entry SET data = 'x'"));
  Entry second = Link().set_hash("my-photos");
  EXPECT_EQ(ErrorOf(CreateLink(*db_, &second)), Error::kHashTaken);
}

TEST_F(OwnerLinkStore, HashesDifferByCase) {
  Stored(Link().set_hash("my-photos"));
  Stored(Link().set_hash("My-photos"));
}

TEST_F(OwnerLinkStore, FindsByRowAndByHash) {
  const Entry link = Stored(Link().set_hash("my-photos"));
  Entry found;
  EXPECT_EQ(FindLink(*db_, {link.get_id(), ""}, std::nullopt, &found), std::nullopt);
  EXPECT_EQ(found.get_hash(), "my-photos");
  EXPECT_EQ(FindLink(*db_, {0, "my-photos"}, std::nullopt, &found), std::nullopt);
  EXPECT_EQ(found.get_id(), link.get_id());
}

TEST_F(OwnerLinkStore, FindsNothingForOtherNames) {
  Stored(Link().set_hash("my-photos"));
  Entry found;
  EXPECT_EQ(ErrorOf(FindLink(*db_, {0, "other"}, std::nullopt, &found)), Error::kNoSuchLink);
  EXPECT_EQ(ErrorOf(FindLink(*db_, {0, "' OR '1'='1"}, std::nullopt, &found)), Error::kNoSuchLink);
  EXPECT_EQ(ErrorOf(FindLink(*db_, {4711, ""}, std::nullopt, &found)), Error::kNoSuchLink);
  EXPECT_EQ(ErrorOf(FindLink(*db_, {0, ""}, std::nullopt, &found)), Error::kNoSuchLink);
}

TEST_F(OwnerLinkStore, LinksOutsideOfTheScopeAreNotThere) {
  const Entry link = Stored(Link());
  Entry found;
  EXPECT_EQ(FindLink(*db_, {link.get_id(), ""}, 2001U, &found), std::nullopt);
  EXPECT_EQ(ErrorOf(FindLink(*db_, {link.get_id(), ""}, 2002U, &found)), Error::kNoSuchLink);
  EXPECT_EQ(ErrorOf(ChangeLink(*db_, {link.get_id(), ""}, 2002U, SetTitle, &found)),
            Error::kNoSuchLink);
  EXPECT_EQ(ErrorOf(DeleteLink(*db_, {link.get_id(), ""}, 2002U, &found)), Error::kNoSuchLink);
  EXPECT_EQ(Load(link).get_protect_title(), "");
}

TEST_F(OwnerLinkStore, UnusableDatabaseIsNoMissingLink) {
  SharingDB bad("/usr/tuvo/nosuchfolder/x.db");
  Entry link = Link();
  EXPECT_EQ(ErrorOf(FindLink(bad, {1, ""}, std::nullopt, &link)), Error::kInternal);
  EXPECT_EQ(ErrorOf(ChangeLink(bad, {1, ""}, std::nullopt, SetTitle, &link)), Error::kInternal);
  EXPECT_EQ(ErrorOf(DeleteLink(bad, {1, ""}, std::nullopt, &link)), Error::kInternal);
  link = Link();
  EXPECT_EQ(ErrorOf(CreateLink(bad, &link)), Error::kInternal);
  link = Link().set_hash("abc");
  EXPECT_EQ(ErrorOf(CreateLink(bad, &link)), Error::kInternal);
  int deleted = 0;
  EXPECT_EQ(ErrorOf(DeleteExpiredLinks(bad, std::nullopt, "", &deleted)), Error::kInternal);
  EXPECT_EQ(ErrorOf(CountExpiredLinks(bad, std::nullopt, "", &deleted)), Error::kInternal);
}

TEST_F(OwnerLinkStore, ChangeIsWrittenAndReturned) {
  const Entry link = Stored(Link());
  Entry after;
  EXPECT_EQ(ChangeLink(*db_, {link.get_id(), ""}, 2001U, SetTitle, &after), std::nullopt);
  EXPECT_EQ(after.get_protect_title(), "new");
  EXPECT_EQ(Load(link).get_protect_title(), "new");
}

TEST_F(OwnerLinkStore, ChangeThatIsRefusedWritesNothing) {
  const Entry link = Stored(Link());
  Entry after;
  EXPECT_EQ(ErrorOf(ChangeLink(
                *db_, {link.get_id(), ""}, std::nullopt,
                [](Entry* changed) {
                  changed->set_protect_title("new");
                  return Fault(Error::kConflict, "no");
                },
                &after)),
            Error::kConflict);
  EXPECT_EQ(Load(link).get_protect_title(), "");
}

TEST_F(OwnerLinkStore, HashCanBeChangedToAFreeOne) {
  const Entry link = Stored(Link());
  Entry after;
  EXPECT_EQ(ChangeLink(
                *db_, {link.get_id(), ""}, std::nullopt,
                [](Entry* changed) {
                  changed->set_hash("my-photos");
                  return MaybeProblem();
                },
                &after),
            std::nullopt);
  EXPECT_EQ(Load(link).get_hash(), "my-photos");
}

TEST_F(OwnerLinkStore, HashCannotBeChangedToATakenOne) {
  Stored(Link().set_hash("my-photos"));
  const Entry link = Stored(Link());
  Entry after;
  EXPECT_EQ(ErrorOf(ChangeLink(
                *db_, {link.get_id(), ""}, std::nullopt,
                [](Entry* changed) {
                  changed->set_hash("my-photos");
                  return MaybeProblem();
                },
                &after)),
            Error::kHashTaken);
  EXPECT_EQ(Load(link).get_hash(), link.get_hash());
}

TEST_F(OwnerLinkStore, UseCountedMeanwhileIsKept) {
  const Entry link = Stored(Link());
  bool first = true;
  Entry after;
  EXPECT_EQ(ChangeLink(
                *db_, {link.get_id(), ""}, std::nullopt,
                [&](Entry* changed) {
                  if (first) {
                    first = false;
                    EXPECT_TRUE(TUVO::TuvoSharingIncreaseUseCount(link.get_hash()));
                  }
                  changed->set_protect_title("new");
                  return MaybeProblem();
                },
                &after),
            std::nullopt);
  EXPECT_EQ(Load(link).get_use_count(), 1);
  EXPECT_EQ(Load(link).get_protect_title(), "new");
}

TEST_F(OwnerLinkStore, DeletedLinkIsGoneAndReturned) {
  const Entry link = Stored(Link());
  Entry gone;
  EXPECT_EQ(DeleteLink(*db_, {link.get_id(), ""}, 2001U, &gone), std::nullopt);
  EXPECT_EQ(gone.get_hash(), link.get_hash());
  EXPECT_FALSE(IsThere(link));
  EXPECT_EQ(ErrorOf(DeleteLink(*db_, {link.get_id(), ""}, 2001U, &gone)), Error::kNoSuchLink);
}

TEST_F(OwnerLinkStore, ExpiredLinksAreDeletedAndCounted) {
  const Entry live = Stored(Link());
  const Entry ended = Stored(Link().set_expire_at(1).set_auto_gc(false));
  const Entry used = Stored(Link().set_expire_times(2).set_use_count(2));
  int deleted = -1;
  EXPECT_EQ(DeleteExpiredLinks(*db_, std::nullopt, "", &deleted), std::nullopt);
  EXPECT_EQ(deleted, 2);
  EXPECT_TRUE(IsThere(live));
  EXPECT_FALSE(IsThere(ended));
  EXPECT_FALSE(IsThere(used));
}

TEST_F(OwnerLinkStore, NegativeEndsAndLimitsAreNone) {
  const Entry link = Stored(Link().set_expire_times(-1).set_expire_at(-5).set_use_count(3));
  int deleted = -1;
  EXPECT_EQ(DeleteExpiredLinks(*db_, std::nullopt, "", &deleted), std::nullopt);
  EXPECT_EQ(deleted, 0);
  EXPECT_TRUE(IsThere(link));
}

TEST_F(OwnerLinkStore, ExpiredLinksOfOthersStay) {
  const Entry mine = Stored(Link().set_expire_at(1));
  const Entry others = Stored(Link().set_expire_at(1).set_owner_uid(2002));
  int deleted = -1;
  EXPECT_EQ(DeleteExpiredLinks(*db_, 2001U, "", &deleted), std::nullopt);
  EXPECT_EQ(deleted, 1);
  EXPECT_FALSE(IsThere(mine));
  EXPECT_TRUE(IsThere(others));
}

TEST_F(OwnerLinkStore, ExpiredLinksOfOtherProjectsStay) {
  const Entry album = Stored(Link().set_expire_at(1));
  const Entry file = Stored(Link().set_expire_at(1).set_project_name("file"));
  int deleted = -1;
  EXPECT_EQ(DeleteExpiredLinks(*db_, std::nullopt, "album", &deleted), std::nullopt);
  EXPECT_EQ(deleted, 1);
  EXPECT_FALSE(IsThere(album));
  EXPECT_TRUE(IsThere(file));
}

TEST_F(OwnerLinkStore, NothingExpiredIsNoneDeleted) {
  Stored(Link());
  int deleted = -1;
  EXPECT_EQ(DeleteExpiredLinks(*db_, std::nullopt, "", &deleted), std::nullopt);
  EXPECT_EQ(deleted, 0);
}

TEST_F(OwnerLinkStore, CountingExpiredLinksDeletesNone) {
  const Entry ended = Stored(Link().set_expire_at(1).set_enabled(false));
  const Entry others = Stored(Link().set_expire_at(1).set_owner_uid(2002));
  Stored(Link());
  int count = -1;
  EXPECT_EQ(CountExpiredLinks(*db_, std::nullopt, "", &count), std::nullopt);
  EXPECT_EQ(count, 2);
  EXPECT_EQ(CountExpiredLinks(*db_, 2002U, "", &count), std::nullopt);
  EXPECT_EQ(count, 1);
  EXPECT_TRUE(IsThere(ended));
  EXPECT_TRUE(IsThere(others));
}

// Runs `body` in so many processes, each with a connection of its own; how many returned 0.
int Together(int processes, const std::function<int(SharingDB&, int)>& body) {
  std::vector<pid_t> children;
  for (int i = 0; i < processes; ++i) {
    const pid_t child = fork();
    if (child == 0) {
      SharingDB db(kPath);
      _exit(db.IsGood() ? body(db, i) : 9);
    }
    children.push_back(child);
  }
  int good = 0;
  for (const pid_t child : children) {
    int status = 0;
    waitpid(child, &status, 0);
    good += WIFEXITED(status) && WEXITSTATUS(status) == 0 ? 1 : 0;
  }
  return good;
}

TEST_F(OwnerLinkStore, OfManyThatChooseOneHashExactlyOneGetsIt) {
  db_.reset();
  EXPECT_EQ(Together(8,
                     [](SharingDB& db, int) {
                       Entry link = Link().set_hash("wanted");
                       const MaybeProblem problem = CreateLink(db, &link);
                       return !problem ? 0 : problem->error == Error::kHashTaken ? 1 : 2;
                     }),
            1);
  db_ = std::make_unique<SharingDB>(kPath);
}

TEST_F(OwnerLinkStore, ChangesOfManyToOneLinkAllStay) {
  const Entry link = Stored(Link());
  const int id = link.get_id();
  db_.reset();
  constexpr int kProcesses = 8;
  constexpr int kRounds = 20;
  const auto add = [id](SharingDB& db, int process) {
    for (int round = 0; round < kRounds; ++round) {
      Entry after;
      if (ChangeLink(
              db, {id, ""}, std::nullopt,
              [process](Entry* changed) {
                Json::Value app = changed->get_app();
                const std::string name = std::to_string(process);
                app[name] = app[name].asInt() + 1;
                changed->set_app(app);
                return MaybeProblem();
              },
              &after)) {
        return 1;
      }
    }
    return 0;
  };
  EXPECT_EQ(Together(kProcesses, add), kProcesses);
  db_ = std::make_unique<SharingDB>(kPath);
  const Json::Value app = Load(link).get_app();
  for (int process = 0; process < kProcesses; ++process) {
    EXPECT_EQ(app[std::to_string(process)].asInt(), kRounds) << process;
  }
}

}  // namespace
}  // namespace owner
