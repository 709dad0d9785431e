#ifndef INTERNAL_SHARING_DB_PRIVATE_H_
#define INTERNAL_SHARING_DB_PRIVATE_H_

namespace TUVO::sharing::db {

class SharingDB;

// Brings the schema of a database up to date, once, on construction.
class SharingDBPrivate {
 public:
  // `db` outlives this object.
  explicit SharingDBPrivate(SharingDB* db);

  bool IsMigrated() const { return migrated_; }

 private:
  // Runs the scripts from the stored version up to the current one. Steps done stay done.
  bool Migration();
  // Runs the script of one version.
  bool MigrateTo(int version);

  SharingDB* pdb_;
  bool migrated_;
};

}  // namespace TUVO::sharing::db

#endif  // INTERNAL_SHARING_DB_PRIVATE_H_
