// A program that uses the sharing database in every way once, for tests that watch a whole run.
// Exits with 0 when everything succeeded.
#include <tuvosharing/keys.h>
#include <tuvosharing/session_db.h>
#include <tuvosharing/sharing_db.h>

#include <ctime>

using TUVO::sharing::db::SessionDB;
using TUVO::sharing::db::SharingDB;
using TUVO::sharing::record::Session;

int main() {
  SharingDB& db = SharingDB::Instance();
  if (!db.IsGood() || db.IsRoot()) {
    return 1;
  }
  SessionDB sessions(db);
  Session session;
  session.set_ip("192.0.2.1").set_timeout(std::time(nullptr) + 1000);
  return sessions.CreateWithSessionId(session) && sessions.Delete(session) && db.Vacuum() ? 0 : 1;
}
