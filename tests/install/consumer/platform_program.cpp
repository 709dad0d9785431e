// Uses the platform layer alone, without the library: an account, a random text, a database file.
#include <tuvoplatform/tuvoplatform.h>

#include <iostream>
#include <string>

namespace {

int failures = 0;

void Expect(bool condition, const char* what) {
  if (!condition) {
    std::cerr << "failed: " << what << '\n';
    ++failures;
  }
}

}  // namespace

int main() {
  static_assert(sizeof(off_t) == 8, "files may be larger than 2 GB");
  TUVOUSER* user = nullptr;
  Expect(TUVOUserGet("root", &user) == 0 && user->nUid == 0, "the account root");
  TUVOUserFree(user);

  std::string text;
  TUVO::RANDOM::TUVORandom random;
  Expect(random.getString(TUVO::RANDOM::POOL_URL_FRIENDLY, 12, text) && text.size() == 12,
         "a random text");

  TUVODB* database = TUVODBConnect("", "", "", ":memory:");
  Expect(database != nullptr, "a database");
  DBResult* rows = nullptr;
  unsigned int row = 0;
  Expect(TUVODBExecute(database, "SELECT 6 * 7 AS answer", &rows) == 0 &&
             TUVODBFetchRow(rows, &row) == 0 &&
             std::string(TUVODBFetchField(rows, row, "answer")) == "42",
         "a row of it");
  TUVODBFreeResult(rows);
  TUVODBClose(database);
  return failures;
}
