// Running one statement, with the patience that sharing a file among processes takes.
#ifndef PLATFORM_SRC_DATABASE_STATEMENT_H_
#define PLATFORM_SRC_DATABASE_STATEMENT_H_

#include <memory>

#include "database_result.h"

struct sqlite3;

namespace tuvo_platform {

// Runs the first statement of the zero-terminated `sql` to its end and points `*tail` behind it.
// When it can return rows, `*rows` is replaced by what it returned; otherwise, and on failure,
// `*rows` stays. Returns SQLITE_OK, or the code of the failure with its text in sqlite3_errmsg.
// Throws std::bad_alloc or std::length_error when the rows do not fit; the statement is then over.
int RunStatement(sqlite3* sqlite, const char* sql, const char** tail,
                 std::unique_ptr<DBResult_tag>* rows);

}  // namespace tuvo_platform

#endif  // PLATFORM_SRC_DATABASE_STATEMENT_H_
