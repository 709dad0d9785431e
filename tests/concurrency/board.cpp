#include "concurrency/board.h"

#include <unistd.h>

#include <algorithm>
#include <cstring>

namespace tuvo_test {

void Put(Name& name, const std::string& text) {
  name = {};
  std::copy_n(text.begin(), std::min(text.size(), name.size() - 1), name.begin());
}

const char* NameOf(Kind kind) {
  static constexpr std::array<const char*, kKinds> kNames{"opening", "login",  "check",  "logout",
                                                          "count",   "create", "change", "delete",
                                                          "purge",   "query",  "closing"};
  return kNames[kind];
}

void Complain(Board& board, const std::string& text) {
  const auto number = static_cast<std::size_t>(board.complaints++);
  if (number < board.complaint.size()) {
    const std::string line = "process " + std::to_string(getpid()) + ": " + text;
    std::strncpy(board.complaint[number].data(), line.c_str(), board.complaint[number].size() - 1);
  }
}

}  // namespace tuvo_test
