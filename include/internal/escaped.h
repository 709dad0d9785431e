// Texts for statements that must not be run without them.
#ifndef INTERNAL_ESCAPED_H_
#define INTERNAL_ESCAPED_H_

#include <exception>
#include <string>

namespace TUVO::sharing::db {

class EscapeFailed : public std::exception {
 public:
  const char* what() const noexcept override { return "escape failed"; }
};

// `text` as `db` (anything with Escape) escapes it. Throws EscapeFailed where Escape can only
// answer the empty text: a statement with that in the text's place would lose data, or find other
// rows.
template <typename Database>
std::string Escaped(const Database& db, const std::string& text) {
  std::string escaped = db.Escape(text);
  // Of a text that begins with a zero nothing is left by right.
  if (escaped.empty() && !text.empty() && text.front() != '\0') {
    throw EscapeFailed();
  }
  return escaped;
}

}  // namespace TUVO::sharing::db

#endif  // INTERNAL_ESCAPED_H_
