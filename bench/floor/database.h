/* The database as the library uses it, without the library: SQLite's C API and nothing around it.
 */
#ifndef BENCH_FLOOR_DATABASE_H_
#define BENCH_FLOOR_DATABASE_H_

#include <sqlite3.h>

extern sqlite3* database;

/* Opens the file with the connection's settings; 0 on success. Closed when the process exits. */
int open_database(void);

/* What is done with a row. */
typedef void (*on_row)(sqlite3_stmt* statement);

/* Runs all statements of `sql` under the system account, calls `row` (may be null) for each row,
 * and folds the log back when it has become long; 0 on success. */
int run(const char* sql, on_row row);

/* The same with a text made as printf would. */
int runf(on_row row, const char* format, ...) __attribute__((format(printf, 2, 3)));

/* What the end of every store does. */
int checkpoint(void);

#endif /* BENCH_FLOOR_DATABASE_H_ */
