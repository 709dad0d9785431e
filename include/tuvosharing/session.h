// One visitor's login session.
#ifndef TUVOSHARING_SESSION_H_
#define TUVOSHARING_SESSION_H_

#include <json/forwards.h>
#include <tuvosharing/export.h>

#include <ctime>
#include <map>
#include <memory>
#include <string>
#include <vector>

namespace TUVO::sharing {
namespace db {
class Row;
}

namespace record {

class Object;
class SessionPrivate;

// Who a visitor is from one request to the next, whatever the links. Times are seconds since the
// epoch.
class TUVOSHARING_API Session {
 public:
  // Not legal until its identifier, address and a timeout in the future are set; without a user.
  Session();
  // A copy is a session of its own, with the same id.
  Session(const Session& other);
  // The source stays usable, its texts empty and its numbers unchanged. Allocates, hence may throw
  // bad_alloc.
  Session(Session&& other);  // NOLINT(performance-noexcept-move-constructor)
  // The object that GetObject has given out stays the same one.
  Session& operator=(const Session& other);
  // The same; the source is left as by the move constructor.
  Session& operator=(Session&& other) noexcept;
  virtual ~Session();

  // The record as the stores see it; owned by this object.
  record::Object& GetObject();
  const record::Object& GetCObject() const;

  // The values of "session_id", "uid", "ip" and "timeout" as texts, in that order or by name.
  std::vector<std::string> GetFieldList() const;
  std::map<std::string, std::string> GetFieldMap() const;

  // True when identifier and address are set and the timeout lies in the future; else the first
  // reason is logged. Changes with the clock. A session without a user is legal.
  bool IsLegal() const;

  // Sets "session_id", "uid", "ip" and "timeout" (seconds) and leaves other members alone.
  // Precondition: `value` is null or an object.
  void ToJSON(Json::Value& value) const;

  // Loads a row and answers IsLegal(). Lack of memory raises std::bad_alloc and leaves everything
  // as it was.
  bool FromRow(const db::Row& row);

  // The row's id in its table, by which tokens refer to the session; 0 while it is not stored.
  int get_id() const;
  Session& set_id(int id);

  // The random identifier that the visitor's browser carries: a secret.
  std::string get_session_id() const;
  Session& set_session_id(const std::string& session_id);

  // The account that logged in; 4294967295 for none.
  unsigned int get_uid() const;
  void set_uid(unsigned int uid);

  // The visitor's address as text.
  std::string get_ip() const;
  Session& set_ip(const std::string& ip);

  // The moment, in seconds since the epoch, from which on the session is no longer valid.
  std::time_t get_timeout() const;
  void set_timeout(long timeout);

 private:
  std::unique_ptr<SessionPrivate> p_;
};

}  // namespace record
}  // namespace TUVO::sharing

#endif  // TUVOSHARING_SESSION_H_
