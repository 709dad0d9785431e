// The proof that one visitor session has been admitted to one link until a given time.
#ifndef TUVOSHARING_TOKEN_H_
#define TUVOSHARING_TOKEN_H_

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
class TokenPrivate;

// A row that binds a session to a link; without one a visitor has to log in. Times are seconds
// since the epoch.
class TUVOSHARING_API Token {
 public:
  // Not legal until its ids and a timeout in the future are set.
  Token();
  // A copy is a token of its own, with the same id.
  Token(const Token& other);
  // The source stays usable, with its numbers unchanged. Allocates, hence may throw bad_alloc.
  Token(Token&& other);  // NOLINT(performance-noexcept-move-constructor)
  // The object that GetObject has given out stays the same one.
  Token& operator=(const Token& other);
  // The same; the source is left as by the move constructor.
  Token& operator=(Token&& other) noexcept;
  virtual ~Token();

  // The record as the stores see it; owned by this object.
  record::Object& GetObject();
  const record::Object& GetCObject() const;

  // The values of "entry_id", "session_id" and "timeout" as texts, in that order or by name.
  std::vector<std::string> GetFieldList() const;
  std::map<std::string, std::string> GetFieldMap() const;

  // True when both ids are set and the timeout lies in the future; else the first reason is logged.
  // Changes with the clock.
  bool IsLegal() const;

  // Sets "entry_id", "session_id" and "timeout" (seconds) and leaves other members alone.
  // Precondition: `value` is null or an object.
  void ToJSON(Json::Value& value) const;

  // Loads a row and answers IsLegal(). Lack of memory raises std::bad_alloc and leaves everything
  // as it was.
  bool FromRow(const db::Row& row);

  // The row's id in its table; 0 while it is not stored.
  int get_id() const;
  Token& set_id(int id);

  // The id of the link.
  int get_entry_id() const;
  void set_entry_id(int entry_id);

  // The row id (not the random text) of the session.
  int get_session_id() const;
  void set_session_id(int session_id);

  // The moment, in seconds since the epoch, from which on the token is no longer valid.
  std::time_t get_timeout() const;
  void set_timeout(long timeout);

 private:
  std::unique_ptr<TokenPrivate> p_;
};

}  // namespace record
}  // namespace TUVO::sharing

#endif  // TUVOSHARING_TOKEN_H_
