#include "crash/writers.h"

#include <tuvosharing/entry_db.h>
#include <tuvosharing/login.h>
#include <tuvosharing/session_db.h>
#include <tuvosharing/sharing_db.h>
#include <tuvosharing/token_db.h>
#include <unistd.h>

#include <algorithm>
#include <chrono>
#include <cstdio>
#include <ctime>
#include <random>
#include <string>
#include <thread>

#include "concurrency/visitors.h"
#include "crash/file_calls.h"
#include "crash/stored.h"

namespace tuvo_test {

namespace {

using TUVO::sharing::db::EntryDB;
using TUVO::sharing::db::SessionDB;
using TUVO::sharing::db::SharingDB;
using TUVO::sharing::db::TokenDB;
using TUVO::sharing::record::Entry;
using TUVO::sharing::record::Session;

constexpr unsigned int kFirstOwner = 3000;

void Put(Id& id, const std::string& text) {
  id.fill(0);
  text.copy(id.data(), kIdRoom - 1);
}

// On an idle machine a transaction is over in less time than it takes to be killed. Here and there
// a process stops for a moment between two of its calls, so that many are killed right there.
void Linger(const FileAction& /*action*/) {
  static std::minstd_rand random(static_cast<unsigned int>(getpid()));
  constexpr unsigned int kOneOf = 32;
  if (random() % kOneOf == 0) {
    std::this_thread::sleep_for(std::chrono::microseconds(300));
  }
}

class Writer {
 public:
  Writer(Record& record, int number, unsigned int seed)
      : record_(record),
        number_(number),
        own_(record.writer.at(static_cast<std::size_t>(number))),
        random_(seed) {}

  void Run() {
    ServeAddress(AddressOf(number_));
    WatchFiles(Linger);
    Expect(SharingDB::Instance().IsGood(), "open");
    while (!record_.stop) {
      ++record_.calls;
      Call();
      own_.doing = kNothing;
    }
  }

 private:
  void Call() {
    switch (Below(12)) {
      case 0:
      case 1:
        return Create();
      case 2:
      case 3:
        return Change();
      case 4:
        return Delete();
      case 5:
        return CountUse();
      case 6:
        return VisitOwnLink();
      case 7:
      case 8:
        return VisitLimitedLink();
      case 9:
        return LogOut();
      case 10:
        return SendAllOut();
      default:
        return Purge();
    }
  }

  int Below(int end) { return static_cast<int>(random_() % static_cast<unsigned int>(end)); }

  void Expect(bool good, const char* call) {
    if (!good && record_.failed_calls++ == 0) {
      std::snprintf(record_.failure.data(), record_.failure.size(), "%s: %s", call,
                    SharingDB::Instance().GetLastError().c_str());
    }
  }

  // One of the latest that are there; null when there is none.
  WrittenLink* AnyLink() {
    constexpr int kLatest = 6;
    for (int attempt = 0; attempt < kLatest && own_.links > 0; ++attempt) {
      const int index = own_.links - 1 - Below(std::min(own_.links, kLatest));
      WrittenLink& link = own_.link_at[static_cast<std::size_t>(index)];
      if (link.there) {
        own_.link = index;
        return &link;
      }
    }
    return nullptr;
  }

  void Create() {
    Entry link = BigLink(1);
    link.set_owner_uid(OwnerOf(number_));
    own_.doing = kCreating;
    const bool done = EntryDB(SharingDB::Instance()).CreateWithHash(link);
    Expect(done, "create");
    if (done) {
      WrittenLink& written = own_.link_at.at(static_cast<std::size_t>(own_.links));
      Put(written.hash, link.get_hash());
      written.generation = 1;
      written.uses = 0;
      written.there = true;
      ++own_.links;
    }
  }

  void Change() {
    WrittenLink* link = AnyLink();
    if (link == nullptr) {
      return;
    }
    own_.doing = kChanging;
    const bool done = ChangeLink(link->hash.data(), Reading::kAfterAWrite,
                                 [&](Entry& entry) { SetGeneration(entry, link->generation + 1); });
    Expect(done, "change");
    link->generation += done ? 1 : 0;
  }

  void Delete() {
    WrittenLink* link = AnyLink();
    Entry entry;
    if (link == nullptr) {
      return;
    }
    own_.doing = kDeleting;
    EntryDB links(SharingDB::Instance());
    const bool done = links.GetByHash(link->hash.data(), entry) && links.Delete(entry);
    Expect(done, "delete");
    link->there = !done;
  }

  void CountUse() {
    WrittenLink* link = AnyLink();
    if (link == nullptr) {
      return;
    }
    own_.doing = kCounting;
    const bool done = TUVO::TuvoSharingIncreaseUseCount(link->hash.data());
    Expect(done, "count");
    link->uses += done ? 1 : 0;
  }

  void Note(const std::string& session, int link) {
    Visit& visit = own_.visit_at.at(static_cast<std::size_t>(own_.visits));
    Put(visit.session, session);
    visit.link = link;
    visit.inside = true;
    ++own_.visits;
  }

  void VisitOwnLink() {
    WrittenLink* link = AnyLink();
    if (link == nullptr) {
      return;
    }
    own_.doing = kVisiting;
    std::string session;
    const bool done = Login(link->hash.data(), "", session) == 1;
    Expect(done, "login");
    if (done) {
      ++link->uses;
      Note(session, own_.link);
    }
  }

  void VisitLimitedLink() {
    own_.link = -1;
    own_.doing = kVisiting;
    std::string session;
    const int answer = Login(record_.limited_link.data(), "", session);
    Expect(answer == 1 || answer == -11, "login, limited link");
    if (answer == 1) {
      ++own_.admitted;
      Note(session, -1);
    }
  }

  void LogOut() {
    if (own_.visits == 0) {
      return;
    }
    constexpr int kLatest = 8;
    own_.visit = own_.visits - 1 - Below(std::min(own_.visits, kLatest));
    Visit& visit = own_.visit_at[static_cast<std::size_t>(own_.visit)];
    if (!visit.inside || (visit.link >= 0 && !LinkOf(visit).there)) {
      return;
    }
    const Id& hash = visit.link < 0 ? record_.limited_link : LinkOf(visit).hash;
    own_.doing = kLoggingOut;
    const bool done = TUVO::TuvoSharingLogout(hash.data(), visit.session.data());
    Expect(done, "logout");
    visit.inside = !done;
  }

  const WrittenLink& LinkOf(const Visit& visit) const {
    return own_.link_at[static_cast<std::size_t>(visit.link)];
  }

  void SendAllOut() {
    WrittenLink* link = AnyLink();
    Entry entry;
    if (link == nullptr) {
      return;
    }
    own_.doing = kAllOut;
    SharingDB& db = SharingDB::Instance();
    const bool done =
        EntryDB(db).GetByHash(link->hash.data(), entry) && TokenDB(db).PurgeByEntry(entry);
    Expect(done, "sign out");
    for (int i = 0; done && i < own_.visits; ++i) {
      Visit& visit = own_.visit_at[static_cast<std::size_t>(i)];
      visit.inside = visit.inside && visit.link != own_.link;
    }
  }

  // What is over is nobody's; it may be there or not.
  void Purge() {
    SharingDB& db = SharingDB::Instance();
    Entry over = BigLink(1);
    over.set_expire_at(std::time(nullptr) - 10).set_auto_gc(true);
    Session session;
    session.set_ip("192.0.2.99").set_timeout(std::time(nullptr) + 2);
    Expect(EntryDB(db).CreateWithHash(over), "create for a purge");
    Expect(SessionDB(db).CreateWithSessionId(session), "session for a purge");
    Expect(
        EntryDB(db).PurgeExpired(1) && SessionDB(db).PurgeExpired(1) && TokenDB(db).PurgeExpired(1),
        "purge");
  }

  Record& record_;
  const int number_;
  WriterRecord& own_;
  std::mt19937 random_;
};

}  // namespace

unsigned int OwnerOf(int writer) {
  return kFirstOwner + static_cast<unsigned int>(writer);
}

void Write(Record& record, int writer, unsigned int seed) {
  Writer(record, writer, seed).Run();
}

}  // namespace tuvo_test
