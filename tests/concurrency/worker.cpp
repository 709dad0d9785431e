#include "concurrency/worker.h"

#include <tuvosharing/base_db.h>
#include <tuvosharing/login.h>
#include <tuvosharing/session_db.h>
#include <tuvosharing/sharing_db.h>
#include <tuvosharing/token_db.h>

#include <algorithm>
#include <chrono>
#include <cstdlib>
#include <ctime>
#include <optional>
#include <random>
#include <thread>
#include <vector>

#include "concurrency/crew.h"

namespace tuvo_test {

namespace {

using TUVO::sharing::db::EntryDB;
using TUVO::sharing::db::SessionDB;
using TUVO::sharing::db::SharingDB;
using TUVO::sharing::db::TokenDB;
using TUVO::sharing::record::Entry;
using TUVO::sharing::record::Session;

constexpr int kMostRequests = 8;  // of one process
constexpr int kFirstOwner = 3000;

// Measured from the end of the last request to the end of the process: the file is closed by what
// runs at exit.
std::optional<Measure> closing;

// One process of a worker.
class Process {
 public:
  Process(Board& board, int number)
      : board_(board),
        number_(number),
        worker_(board.worker[static_cast<std::size_t>(number)]),
        random_(static_cast<unsigned int>(FromEnvironment("TUVO_SEED", 0)) * 1000003U +
                static_cast<unsigned int>(number + kWorkers * worker_.served)) {}

  void Serve() {
    std::atexit([] { closing.reset(); });  // runs behind the closing of the database
    ServeAddress(AddressOf(number_));
    Open();
    for (int requests = 1 + Below(kMostRequests); requests > 0; --requests) {
      Request();
    }
    closing.emplace(board_.figure[kClosing]);
  }

 private:
  int Below(int end) { return static_cast<int>(random_() % static_cast<unsigned int>(end)); }

  void Expect(bool good, const std::string& text) {
    if (!good) {
      Complain(board_, text + ": " + SharingDB::Instance().GetLastError());
    }
  }
  void ExpectAnswer(int wanted, int answer, const std::string& text) {
    Expect(answer == wanted, text + " answered " + std::to_string(answer));
  }

  void Open() {
    const Measure measure(board_.figure[kOpening]);
    Expect(SharingDB::Instance().IsGood(), "not good");
  }

  void Request() {
    const int choice = Below(100);
    if (choice < 35) {
      LogIn();
    } else if (choice < 60) {
      CheckVisitor();
    } else if (choice < 68) {
      LogOut();
    } else if (choice < 73) {
      CountUse();
    } else if (choice < 80) {
      CreateLink();
    } else if (choice < 87) {
      ChangeOwnLink();
    } else if (choice < 90) {
      ChangePublicLink();
    } else if (choice < 92) {
      DeleteLink();
    } else if (choice < 94) {
      VisitOwnLink();
    } else if (choice < 98) {
      Purge();
    } else {
      Query();
    }
  }

  PublicLink& AnyPublicLink(int* number) {
    *number = Below(kPublicLinks);
    return board_.link[static_cast<std::size_t>(*number)];
  }

  // One of the latest, which have more than one token perhaps.
  OwnSession* AnySession() {
    constexpr int kLatest = 20;
    if (worker_.sessions == 0) {
      return nullptr;
    }
    const int back = 1 + Below(std::min(worker_.sessions, kLatest));
    return &worker_.session[static_cast<std::size_t>(worker_.sessions - back)];
  }

  OwnSession* NoteSession(const std::string& id) {
    OwnSession& session = worker_.session.at(static_cast<std::size_t>(worker_.sessions));
    Put(session.id, id);
    ++worker_.sessions;
    return &session;
  }

  void LogIn() {
    OwnSession* session = Below(2) == 0 ? AnySession() : nullptr;
    const std::string brought = session == nullptr ? "" : session->id.data();
    int number = 0;
    PublicLink& link = AnyPublicLink(&number);
    std::string id;
    int answer = 0;
    {
      const Measure measure(board_.figure[kLogin]);
      answer = Login(link.hash.data(), brought, id);
    }
    if (number == kLimitedLink && answer == -11) {
      Expect(id.empty(), "a session for who was refused");
      return;
    }
    ExpectAnswer(1, answer, "login");
    if (answer == 1) {
      ++link.uses;
      session = session == nullptr ? NoteSession(id) : session;
      session->admitted[static_cast<std::size_t>(number)] = true;
      Expect(id == session->id.data(), "another session than the one brought");
    }
  }

  void CheckVisitor() {
    int number = 0;
    const PublicLink& link = AnyPublicLink(&number);
    const OwnSession* session = AnySession();
    if (session != nullptr) {
      const Measure measure(board_.figure[kCheck]);
      ExpectAnswer(session->admitted[static_cast<std::size_t>(number)] ? 1 : -7,
                   Check(link.hash.data(), session->id.data()), "check");
    }
  }

  void LogOut() {
    int number = 0;
    const PublicLink& link = AnyPublicLink(&number);
    OwnSession* session = AnySession();
    if (session == nullptr || !session->admitted[static_cast<std::size_t>(number)]) {
      return;
    }
    const Measure measure(board_.figure[kLogout]);
    const bool done = TUVO::TuvoSharingLogout(link.hash.data(), session->id.data());
    Expect(done, "logout");
    session->admitted[static_cast<std::size_t>(number)] = !done;
  }

  void CountUse() {
    PublicLink& link = board_.link[static_cast<std::size_t>(Below(kLimitedLink))];
    const Measure measure(board_.figure[kCount]);
    const bool done = TUVO::TuvoSharingIncreaseUseCount(link.hash.data());
    Expect(done, "count");
    link.uses += done ? 1 : 0;
  }

  Entry NewOwnLink() const {
    Entry link = OpenLink();
    link.set_owner_uid(static_cast<unsigned int>(kFirstOwner + number_));
    return link;
  }

  void CreateLink() {
    Entry link = NewOwnLink();
    const int kind = Below(4);  // 0: to be collected, 1: expired but not to be collected
    if (kind < 2) {
      link.set_expire_at(std::time(nullptr) - 10).set_auto_gc(kind == 0);
    }
    bool done = false;
    {
      const Measure measure(board_.figure[kCreate]);
      done = EntryDB(SharingDB::Instance()).CreateWithHash(link);
    }
    Expect(done, "create");
    if (!done || kind == 0) {
      return;
    }
    OwnLink& own = worker_.own_link.at(static_cast<std::size_t>(worker_.own_links));
    Put(own.hash, link.get_hash());
    own.id = link.get_id();
    own.expired = kind == 1;
    own.there = true;
    ++worker_.own_links;
  }

  // One that is there; the latest more probably, as those before were deleted.
  OwnLink* AnyOwnLink() {
    for (int attempt = 0; attempt < 5 && worker_.own_links > 0; ++attempt) {
      OwnLink& link = worker_.own_link[static_cast<std::size_t>(Below(worker_.own_links))];
      if (link.there) {
        return &link;
      }
    }
    return nullptr;
  }

  void ChangeOwnLink() {
    OwnLink* own = AnyOwnLink();
    if (own == nullptr) {
      return;
    }
    const Measure measure(board_.figure[kChange]);
    EntryDB links(SharingDB::Instance());
    Entry link;
    const bool read = links.GetByHash(own->hash.data(), link);
    Expect(read && link.get_id() == own->id, "own link");
    link.set_protect_title(std::to_string(own->title + 1));
    const bool done = read && links.Update(link);
    Expect(done, "change");
    own->title += done ? 1 : 0;
  }

  // While the visitors count their uses in the same row.
  void ChangePublicLink() {
    if (number_ >= kPublicLinks) {
      return;
    }
    PublicLink& link = board_.link[static_cast<std::size_t>(number_)];
    const std::string title = std::to_string(link.title + 1);
    const Measure measure(board_.figure[kChange]);
    const bool done = ChangeLink(link.hash.data(), Reading::kAfterAWrite,
                                 [&](Entry& entry) { entry.set_protect_title(title); });
    Expect(done, "change of a link in use");
    link.title += done ? 1 : 0;
  }

  void DeleteLink() {
    OwnLink* own = AnyOwnLink();
    if (own == nullptr) {
      return;
    }
    const Measure measure(board_.figure[kDelete]);
    const bool done = EntryDB(SharingDB::Instance()).Delete(own->id);
    Expect(done, "delete");
    own->there = !done;
  }

  // A visitor of the worker's own link, sent away by its owner.
  void VisitOwnLink() {
    OwnLink* own = AnyOwnLink();
    if (own == nullptr || own->expired) {
      return;
    }
    std::string id;
    const int answer = Login(own->hash.data(), "", id);
    ExpectAnswer(1, answer, "login to an own link");
    if (answer != 1) {
      return;
    }
    NoteSession(id);
    ++own->uses;
    ExpectAnswer(1, Check(own->hash.data(), id), "check of an own link");
    Entry link;
    EntryDB(SharingDB::Instance()).GetByHash(own->hash.data(), link);
    Expect(TokenDB(SharingDB::Instance()).PurgeByEntry(link), "purge by link");
    ExpectAnswer(-7, Check(own->hash.data(), id), "check of who was sent away");
  }

  void Purge() {
    SharingDB& db = SharingDB::Instance();
    const Measure measure(board_.figure[kPurge]);
    switch (Below(4)) {
      case 0:
        Expect(StoreShortSession(db) && SessionDB(db).PurgeExpired(1), "purge of sessions");
        break;
      case 1:
        Expect(TokenDB(db).PurgeExpired(1), "purge of tokens");
        break;
      case 2:
        Expect(EntryDB(db).PurgeExpired(1), "purge of links");
        break;
      default:
        PurgeOwn(db);
    }
  }

  // For the purges to have something to find.
  static bool StoreShortSession(SharingDB& db) {
    Session session;
    session.set_ip("192.0.2.99").set_timeout(std::time(nullptr) + 3);
    return SessionDB(db).CreateWithSessionId(session);
  }

  void PurgeOwn(SharingDB& db) {
    const auto owner = static_cast<unsigned int>(kFirstOwner + number_);
    const bool done = EntryDB(db).PurgeExpiredByOwnerProject(owner, "");
    Expect(done, "purge by owner");
    for (int i = 0; done && i < worker_.own_links; ++i) {
      OwnLink& link = worker_.own_link[static_cast<std::size_t>(i)];
      link.there = link.there && !link.expired;
    }
  }

  void Query() {
    const auto begin = worker_.own_link.begin();
    const auto there = std::count_if(begin, begin + worker_.own_links,
                                     [](const OwnLink& link) { return link.there; });
    const Measure measure(board_.figure[kQuery]);
    const EntryDB links(SharingDB::Instance());
    links.GetCondition().Where("owner_uid", std::to_string(kFirstOwner + number_));
    links.GetCondition().Where("auto_gc", "0");
    std::vector<Entry> found;
    Expect(links.Query(found), "query");
    Expect(static_cast<long>(found.size()) == there,
           "found " + std::to_string(found.size()) + " of " + std::to_string(there) + " links");
  }

  Board& board_;
  const int number_;
  Worker& worker_;
  std::mt19937 random_;
};

// All at once meet a file that is new or of an old version.
void OpenNewFile(Board& board, int number) {
  {
    const Measure measure(board.figure[kOpening]);
    SharingDB db(NewFile(number));
    Session session;
    session.set_ip("192.0.2.1").set_timeout(std::time(nullptr) + 1000);
    if (!db.IsGood() || !SessionDB(db).CreateWithSessionId(session)) {
      Complain(board, "new file: " + db.GetLastError());
    }
  }
  ++board.new_file_by;
}

}  // namespace

std::string NewFile(int number) {
  return std::string(kSharingFolder) + "/new" + std::to_string(number) + ".db";
}

void Work(Board& board, int number) {
  Worker& worker = board.worker[static_cast<std::size_t>(number)];
  int new_file = 0;
  while (!board.stop) {
    ++board.running;
    if (board.pause) {
      --board.running;
      std::this_thread::sleep_for(std::chrono::milliseconds(1));
      continue;
    }
    const int newest = board.new_file;
    const int status = Wait(Start(IdsOf(number), [&] {
      if (newest != new_file) {
        OpenNewFile(board, newest);
      }
      Process(board, number).Serve();
      return 0;
    }));
    if (status != 0) {
      Complain(board, "a process ended with " + std::to_string(status));
    }
    new_file = newest;
    ++worker.served;
    --board.running;
  }
}

}  // namespace tuvo_test
