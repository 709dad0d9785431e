#ifndef INTERNAL_SESSION_PRIVATE_H_
#define INTERNAL_SESSION_PRIVATE_H_

#include <internal/user_id.h>
#include <tuvosharing/object.h>

#include <ctime>
#include <map>
#include <string>
#include <vector>

namespace TUVO::sharing::record {

// What Session holds; its operations are described there. The identifier is the base's key.
class SessionPrivate : public Object {
 public:
  std::vector<std::string> GetFieldList() const override;
  std::map<std::string, std::string> GetFieldMap() const override;
  bool IsLegal() const override;
  void ToJSON(Json::Value& value) const override;
  bool FromRow(const db::Row& row) override;

 private:
  friend class Session;

  unsigned int uid_ = UID_ERR;
  std::string ip_;
  std::time_t timeout_ = 0;
};

}  // namespace TUVO::sharing::record

#endif  // INTERNAL_SESSION_PRIVATE_H_
