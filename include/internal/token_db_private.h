#ifndef INTERNAL_TOKEN_DB_PRIVATE_H_
#define INTERNAL_TOKEN_DB_PRIVATE_H_

#include <tuvosharing/object_db.h>

#include <string>

namespace TUVO::sharing {
namespace record {
class Entry;
class Session;
class Token;
}  // namespace record

namespace db {

// What TokenDB does; its operations are described there.
class TokenDBPrivate : public ObjectDB {
 public:
  explicit TokenDBPrivate(BaseDB& db);

  using ObjectDB::Delete;
  bool Delete(int id) override;

  bool GetBySessionEntry(const record::Session& session, const record::Entry& entry,
                         record::Token& token) const;
  bool PurgeByEntry(const record::Entry& entry);
  bool PurgeExpired(float probability);
};

}  // namespace db
}  // namespace TUVO::sharing

#endif  // INTERNAL_TOKEN_DB_PRIVATE_H_
