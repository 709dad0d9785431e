#ifndef INTERNAL_SESSION_DB_PRIVATE_H_
#define INTERNAL_SESSION_DB_PRIVATE_H_

#include <tuvosharing/object_db.h>

#include <string>

namespace TUVO::sharing {
namespace record {
class Session;
}

namespace db {

// What SessionDB does; its operations are described there.
class SessionDBPrivate : public ObjectDB {
 public:
  explicit SessionDBPrivate(BaseDB& db);

  using ObjectDB::Delete;
  bool Delete(int id) override;

  bool CreateWithSessionId(record::Session& session);
  bool GetBySessionId(const std::string& sessionId, record::Session& session) const;
  bool DeleteBySessionId(const std::string& sessionId);
  bool PurgeExpired(float probability);
};

}  // namespace db
}  // namespace TUVO::sharing

#endif  // INTERNAL_SESSION_DB_PRIVATE_H_
