// The database of sharing links, sessions and tokens.
#ifndef TUVOSHARING_SHARING_DB_H_
#define TUVOSHARING_SHARING_DB_H_

#include <tuvosharing/base_db.h>
#include <tuvosharing/export.h>

#include <memory>
#include <string>

namespace TUVO::sharing::db {

class SharingDBPrivate;

// A BaseDB whose schema was brought to the current version (2) on construction, by the numbered
// scripts in /usr/tuvo/share/tuvosharing/db_schema. A file of a newer schema is taken as it is.
class TUVOSHARING_API SharingDB : public BaseDB {
 public:
  // The process's one instance on SZF_SHARING_DB_PATH, opened on the first call and closed when the
  // process ends. The instance may not be good, and then stays so: ask IsGood. Fails as a call,
  // with std::bad_alloc, only for want of memory; the next call then tries again.
  static SharingDB& Instance();

  // Open SZF_SHARING_DB_PATH, or another file, created with mode 0660 when missing. Failures are
  // logged; ask IsGood.
  SharingDB();
  explicit SharingDB(const std::string& path);
  ~SharingDB() override;

  // True when the file is open and its schema current.
  bool IsGood() const;

  // As in BaseDB.
  bool IsRoot() const;
  bool MoveRootDB() const;

 private:
  std::unique_ptr<SharingDBPrivate> p_;
};

}  // namespace TUVO::sharing::db

#endif  // TUVOSHARING_SHARING_DB_H_
