// The store of visitor sessions: the table "session".
#ifndef TUVOSHARING_SESSION_DB_H_
#define TUVOSHARING_SESSION_DB_H_

#include <tuvosharing/condition.h>
#include <tuvosharing/export.h>
#include <tuvosharing/session.h>

#include <memory>
#include <string>
#include <vector>

namespace TUVO::sharing::db {

class BaseDB;
class SessionDBPrivate;

// Short-lived: construct it for the operations at hand. Its destruction checkpoints the database's
// write-ahead log, so no Result of the same connection may then be half read. Operations answer
// true on success, and throw nothing: lack of memory is a failure.
class TUVOSHARING_API SessionDB {
 public:
  // `db` must outlive the store.
  explicit SessionDB(BaseDB& db);
  SessionDB(const SessionDB&) = delete;
  SessionDB& operator=(const SessionDB&) = delete;
  virtual ~SessionDB();

  // Inserts a row. A record that is not legal is refused, which is logged. On success `session` has
  // its new id.
  bool Create(record::Session& session);
  // Writes every column of the row with the record's id; true also when there is no such row.
  bool Update(const record::Session& session);
  // Deletes a row, told by its id or by the record's; true also when there is no such row.
  bool Delete(int id);
  bool Delete(const record::Session& session);
  // Loads a row. False when there is none (`session` untouched), and when it loads as not legal
  // (filled).
  bool GetById(int id, record::Session& session) const;

  // The filter of the next Count or Query, which clear it.
  Condition& GetCondition() const;
  // The number of rows; `count` is untouched on failure.
  bool Count(int& count) const;
  // Replaces `sessions` by the rows that load as legal; untouched on failure.
  bool Query(std::vector<record::Session>& sessions) const;

  // Creates the session under a fresh random identifier of 32 characters; gives up after 51
  // attempts. Any failed insert counts as a collision. In any case the session keeps the last
  // identifier drawn.
  bool CreateWithSessionId(record::Session& session);

  // The session of that identifier. False when there is none (`session` untouched, so that a fresh
  // one still has id 0), and when it loads as not legal, expired for one (filled).
  bool GetBySessionId(const std::string& sessionId, record::Session& session) const;

  // Deletes a session and, through the schema, its tokens; true also when there is none.
  bool DeleteBySessionId(const std::string& sessionId);

  // With the given probability (whole per cent) deletes every session whose timeout lies in the
  // past. A call that does nothing is a success.
  bool PurgeExpired(float probability);

 private:
  std::unique_ptr<SessionDBPrivate> p_;
};

}  // namespace TUVO::sharing::db

#endif  // TUVOSHARING_SESSION_DB_H_
