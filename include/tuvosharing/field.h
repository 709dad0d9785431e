// The text of one column of one row, and what it converts to.
#ifndef TUVOSHARING_FIELD_H_
#define TUVOSHARING_FIELD_H_

#include <tuvosharing/export.h>

#include <sstream>
#include <string>

namespace TUVO::sharing::db {

// One value, without its NULL: that one reads as the empty text.
class TUVOSHARING_API Field {
 public:
  // Holds a copy of the text.
  explicit Field(const std::string& value);
  // A copy has the text alone; its conversions start afresh.
  Field(const Field& other);
  Field& operator=(const Field& other);
  virtual ~Field();

  // Loads the text for the next extraction. The state that an earlier extraction left stays: a
  // second numeric conversion on the same object gives the default once the first has read to the
  // end of the text, or has failed. Take a fresh Field for each conversion.
  void Clear();

  // Standard stream extraction: leading white space is skipped, what follows the number is not
  // looked at ("12abc" is 12), and an unsigned conversion of "-1" wraps. `def` when no number is
  // there or it does not fit.
  int AsInt(int def);
  unsigned int AsUInt(unsigned int def);
  long AsTime(long def);  // seconds since the epoch
  float AsFloat(float def);

  // True exactly when the text is "1". `def` is never used.
  bool AsBool(bool def);

  // The text itself, valid as long as this object. `def` is never used.
  const std::string& AsString(const std::string& def) const;

 private:
  template <typename T>
  T Extract(T def);

  std::string value_;
  std::stringstream stream_;
};

}  // namespace TUVO::sharing::db

#endif  // TUVOSHARING_FIELD_H_
