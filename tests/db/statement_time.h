// Statements that hold the current second.
#ifndef TESTS_DB_STATEMENT_TIME_H_
#define TESTS_DB_STATEMENT_TIME_H_

#include <gtest/gtest.h>

#include <ctime>
#include <functional>
#include <string>

namespace tuvo_test {

// Runs `issue` and expects `statement()` to be `wanted` with "NOW" in place of the second in which
// it was built.
inline void ExpectStatementOfNow(const std::function<bool()>& issue,
                                 const std::function<std::string()>& statement,
                                 const std::string& wanted) {
  const std::time_t before = std::time(nullptr);
  EXPECT_TRUE(issue());
  const std::time_t after = std::time(nullptr);
  const std::string issued = statement();
  bool found = false;
  for (std::time_t now = before; now <= after; ++now) {
    std::string text = wanted;
    text.replace(text.find("NOW"), 3, std::to_string(now));
    found = found || text == issued;
  }
  EXPECT_TRUE(found) << issued;
}

// Runs `body`, which is handed the current second, until that second lasted for the whole of it.
inline void WithinOneSecond(const std::function<void(std::time_t now)>& body) {
  std::time_t now = 0;
  do {
    now = std::time(nullptr);
    body(now);
  } while (std::time(nullptr) != now);
}

}  // namespace tuvo_test

#endif  // TESTS_DB_STATEMENT_TIME_H_
