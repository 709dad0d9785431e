// The store of sharing links: the table "entry".
#ifndef TUVOSHARING_ENTRY_DB_H_
#define TUVOSHARING_ENTRY_DB_H_

#include <tuvosharing/condition.h>
#include <tuvosharing/entry.h>
#include <tuvosharing/export.h>
#include <tuvosharing/token.h>

#include <memory>
#include <string>
#include <vector>

namespace TUVO::sharing::db {

class BaseDB;
class EntryDBPrivate;

// Short-lived: construct it for the operations at hand. Its destruction checkpoints the database's
// write-ahead log, so no Result of the same connection may then be half read. Operations answer
// true on success, and throw nothing: lack of memory is a failure.
class TUVOSHARING_API EntryDB {
 public:
  // `db` must outlive the store.
  explicit EntryDB(BaseDB& db);
  EntryDB(const EntryDB&) = delete;
  EntryDB& operator=(const EntryDB&) = delete;
  virtual ~EntryDB();

  // Inserts a row. A record that is not legal is refused, which is logged. On success `entry` has
  // its new id.
  bool Create(record::Entry& entry);
  // Writes every column of the row with the record's id; true also when there is no such row.
  bool Update(const record::Entry& entry);
  // Deletes a row, told by its id or by the record's; true also when there is no such row.
  bool Delete(int id);
  bool Delete(const record::Entry& entry);
  // Loads a row. False when there is none (`entry` untouched), and when it loads as not legal
  // (filled).
  bool GetById(int id, record::Entry& entry) const;

  // The filter of the next Count or Query, which clear it.
  Condition& GetCondition() const;
  // The number of rows; `count` is untouched on failure.
  bool Count(int& count) const;
  // Replaces `entries` by the rows that load as legal; untouched on failure.
  bool Query(std::vector<record::Entry>& entries) const;

  // Creates the link under a fresh random hash of 9 characters, growing by one after every third
  // failed attempt; gives up after 51. Any failed insert counts as a collision. In any case the
  // link keeps the last hash drawn.
  bool CreateWithHash(record::Entry& entry);

  // The link of that hash. False when there is none (`entry` untouched, so that a fresh one still
  // has id 0), and when it loads as not legal (filled).
  bool GetByHash(const std::string& hash, record::Entry& entry) const;

  // The link that the token admits to; as GetById.
  bool GetByToken(const record::Token& token, record::Entry& entry) const;

  // Deletes every link of one owner; true also when there is none.
  bool DeleteByOwnerUid(unsigned int uid);

  // With the given probability (whole per cent) deletes every link that may be collected
  // automatically and whose expiry lies in the past or whose limit of uses is reached. A call that
  // does nothing is a success.
  bool PurgeExpired(float probability);

  // Deletes the expired links, automatically collected or not, of one owner (4294967295: of any)
  // and one project (empty: of any).
  bool PurgeExpiredByOwnerProject(unsigned int uid, const std::string& project);

 private:
  std::unique_ptr<EntryDBPrivate> p_;
};

}  // namespace TUVO::sharing::db

#endif  // TUVOSHARING_ENTRY_DB_H_
