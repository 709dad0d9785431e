// Escaping of texts for SQL literals.
#include <tuvoplatform/database.h>

#include <limits>

int TUVODBEscapeStringEX2(TUVODB* /*db*/, char* out, unsigned int size, const char* text,
                          unsigned int length) {
  // The length of the result has to fit the return value.
  constexpr unsigned int kLongest = std::numeric_limits<int>::max();
  if (out == nullptr || text == nullptr) {
    return -1;
  }
  const unsigned int room = size < kLongest ? size : kLongest;
  unsigned int written = 0;
  for (unsigned int i = 0; i < length; ++i) {
    const unsigned int needed = text[i] == '\'' ? 2 : 1;
    if (room - written < needed) {
      return -1;
    }
    if (needed == 2) {
      out[written++] = '\'';
    }
    out[written++] = text[i];
  }
  // Callers pass buffers of exactly twice the text's length: without room for the zero it is left
  // away rather than refused.
  if (written < size) {
    out[written] = '\0';
  }
  return static_cast<int>(written);
}
