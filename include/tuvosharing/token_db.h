// The store of access tokens: the table "token".
#ifndef TUVOSHARING_TOKEN_DB_H_
#define TUVOSHARING_TOKEN_DB_H_

#include <tuvosharing/condition.h>
#include <tuvosharing/entry.h>
#include <tuvosharing/export.h>
#include <tuvosharing/session.h>
#include <tuvosharing/token.h>

#include <memory>
#include <string>
#include <vector>

namespace TUVO::sharing::db {

class BaseDB;
class TokenDBPrivate;

// Short-lived: construct it for the operations at hand. Its destruction checkpoints the database's
// write-ahead log, so no Result of the same connection may then be half read. Operations answer
// true on success, and throw nothing: lack of memory is a failure.
class TUVOSHARING_API TokenDB {
 public:
  // `db` must outlive the store.
  explicit TokenDB(BaseDB& db);
  TokenDB(const TokenDB&) = delete;
  TokenDB& operator=(const TokenDB&) = delete;
  virtual ~TokenDB();

  // Inserts a row. A record that is not legal is refused, which is logged. On success `token` has
  // its new id.
  bool Create(record::Token& token);
  // Writes every column of the row with the record's id; true also when there is no such row.
  bool Update(const record::Token& token);
  // Deletes a row, told by its id or by the record's; true also when there is no such row.
  bool Delete(int id);
  bool Delete(const record::Token& token);
  // Loads a row. False when there is none (`token` untouched), and when it loads as not legal
  // (filled).
  bool GetById(int id, record::Token& token) const;

  // The filter of the next Count or Query, which clear it.
  Condition& GetCondition() const;
  // The number of rows; `count` is untouched on failure.
  bool Count(int& count) const;
  // Replaces `tokens` by the rows that load as legal; untouched on failure.
  bool Query(std::vector<record::Token>& tokens) const;

  // The token that binds the session to the link. False when there is none (`token` untouched, so
  // that a fresh one still has id 0), and when it loads as not legal, expired for one (filled).
  bool GetBySessionEntry(const record::Session& session, const record::Entry& entry,
                         record::Token& token) const;

  // Deletes every token of one link; true also when there is none.
  bool PurgeByEntry(const record::Entry& entry);

  // With the given probability (whole per cent) deletes every token whose timeout lies in the past.
  // A call that does nothing is a success.
  bool PurgeExpired(float probability);

 private:
  std::unique_ptr<TokenDBPrivate> p_;
};

}  // namespace TUVO::sharing::db

#endif  // TUVOSHARING_TOKEN_DB_H_
