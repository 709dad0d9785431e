#ifndef INTERNAL_TOKEN_PRIVATE_H_
#define INTERNAL_TOKEN_PRIVATE_H_

#include <tuvosharing/object.h>

#include <ctime>
#include <map>
#include <string>
#include <vector>

namespace TUVO::sharing::record {

// What Token holds; its operations are described there.
class TokenPrivate : public Object {
 public:
  std::vector<std::string> GetFieldList() const override;
  std::map<std::string, std::string> GetFieldMap() const override;
  bool IsLegal() const override;
  void ToJSON(Json::Value& value) const override;
  bool FromRow(const db::Row& row) override;

 private:
  friend class Token;

  int entry_id_ = 0;
  int session_id_ = 0;
  std::time_t timeout_ = 0;
};

}  // namespace TUVO::sharing::record

#endif  // INTERNAL_TOKEN_PRIVATE_H_
