#ifndef INTERNAL_ENTRY_DB_PRIVATE_H_
#define INTERNAL_ENTRY_DB_PRIVATE_H_

#include <tuvosharing/object_db.h>

#include <string>

namespace TUVO::sharing {
namespace record {
class Entry;
}

namespace db {

// What EntryDB does; its operations are described there.
class EntryDBPrivate : public ObjectDB {
 public:
  explicit EntryDBPrivate(BaseDB& db);

  using ObjectDB::Delete;
  bool Delete(int id) override;

  bool CreateWithHash(record::Entry& entry);
  bool GetByHash(const std::string& hash, record::Entry& entry) const;
  bool DeleteByOwnerUid(unsigned int uid);
  bool PurgeExpired(float probability);
  bool PurgeExpiredByOwnerProject(unsigned int uid, const std::string& project);
};

}  // namespace db
}  // namespace TUVO::sharing

#endif  // INTERNAL_ENTRY_DB_PRIVATE_H_
