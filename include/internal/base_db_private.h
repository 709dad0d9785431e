#ifndef INTERNAL_BASE_DB_PRIVATE_H_
#define INTERNAL_BASE_DB_PRIVATE_H_

#include <tuvoplatform/database.h>

#include <map>
#include <string>
#include <vector>

namespace TUVO::sharing::db {

class Result;

// What BaseDB does; its operations are described there.
class BaseDBPrivate {
 public:
  BaseDBPrivate(std::string path, unsigned int mode);
  BaseDBPrivate(const BaseDBPrivate&) = delete;
  BaseDBPrivate& operator=(const BaseDBPrivate&) = delete;
  virtual ~BaseDBPrivate();

  bool IsGood() const;
  bool Execute(const std::string& sql, Result* result);
  bool Begin();
  bool Commit();
  bool Insert(const std::string& table, const std::vector<std::string>& values);
  bool Update(const std::string& table, const std::map<std::string, std::string>& fields, int id);
  bool Delete(const std::string& table, int id);
  std::string Escape(const std::string& text) const;
  bool GetLastInsertId(int& id) const;
  std::string GetLastError() const;
  std::string GetLastQuery() const;
  bool ExecuteWALCheckPoint();
  bool IsRoot() const;
  bool MoveRootDB() const;

  // Whether a transaction is open, whoever began it.
  bool IsInTransaction() const;

  // What `operation` answers; false, with a reason in the last error, when it throws: the texts
  // that it makes did not fit, or one could not be escaped.
  template <typename Operation>
  bool Answer(Operation operation);

 private:
  explicit BaseDBPrivate(std::string path);
  bool Create(unsigned int mode) const;
  bool Connect();
  bool Init();
  bool ExecuteIfGood(const std::string& sql, DBResult_tag** rows);
  bool ExecuteAsSystem(const std::string& sql, DBResult_tag** rows);

  bool good_ = true;
  std::string path_;
  TUVODB* handle_ = nullptr;
  std::string last_error_;
  std::string last_query_;
};

}  // namespace TUVO::sharing::db

#endif  // INTERNAL_BASE_DB_PRIVATE_H_
