// The platform's database interface: one SQLite file behind an opaque-enough handle, results held
// as text. Every function may be called from one thread at a time for one handle. A child made by
// fork inherits SQLite's notes on the locks of its parent, which are wrong for it: while a handle
// is open, fork only to exec.
#ifndef TUVOPLATFORM_DATABASE_H_
#define TUVOPLATFORM_DATABASE_H_

#include <tuvoplatform/export.h>

#ifdef __cplusplus
extern "C" {
#endif

struct sqlite3;

// What every connection handle begins with: the SQLite connection it holds, for the few SQLite
// calls that this interface has no function for. The caller never closes `sqlite`.
typedef struct TUVODB_tag {
  struct sqlite3* sqlite;  // the connection of SQLite's own
} TUVODB;

// The rows of one statement, as text. Freed with TUVODBFreeResult.
typedef struct DBResult_tag DBResult;

// Opens (creating it if missing) the SQLite file at `path`. The first three texts name a server, a
// user and a password in other database kinds; for a file they are empty and not looked at.
// A statement that finds the file locked waits up to 10 seconds for it; one that SQLite refuses at
// once although waiting helps (a change of the journal mode) is tried again for as long. Inside an
// open transaction nothing is tried again: only its owner can start it over.
// Returns a handle owned by the caller (TUVODBClose), null when the file cannot be opened. Whether
// it is a database shows at the first statement.
TUVOPLATFORM_API TUVODB* TUVODBConnect(const char* host, const char* user, const char* password,
                                       const char* path);

// Runs every statement of the zero-terminated `sql`, each finished before the next begins.
// Returns 0 on success, -1 on the first statement that fails; later ones are not run, and a
// transaction that this very text opened is rolled back (one that was open before stays open). A
// null handle or text fails.
// `*result` receives the rows of the last statement that can return rows, also when it returned
// none; null when there was no such statement and on failure. The caller owns it. `result` may be
// null when the rows are of no interest.
TUVOPLATFORM_API int TUVODBExecute(TUVODB* db, const char* sql, struct DBResult_tag** result);

// Text of the last failed statement of this connection, empty when none failed yet. Never null;
// valid until the next call on the handle. A null handle gives a text too.
TUVOPLATFORM_API const char* TUVODBErrorGet(TUVODB* db);

// Steps to the next row (the first one, on the first call) and stores its index in `*row`.
// Returns 0, or -1 when there are no more rows or an argument is null; `*row` is then left alone.
TUVOPLATFORM_API int TUVODBFetchRow(struct DBResult_tag* result, unsigned int* row);

// The text of column `name` in row `row`: zero-terminated, owned by the result, never null. NULL
// values, unknown columns, rows out of range and a null result read as the empty text; a value that
// holds a zero reads as far as the zero. Names are compared byte by byte; of equal ones the first
// column counts.
TUVOPLATFORM_API const char* TUVODBFetchField(struct DBResult_tag* result, unsigned int row,
                                              const char* name);

// For who reads row after row: the rows before `row` read as empty texts from now on, and texts of
// theirs that were handed out are no longer valid. Frees the memory that held nothing else. A null
// result is accepted.
TUVOPLATFORM_API void TUVODBForgetRows(struct DBResult_tag* result, unsigned int row);

// Frees a result; null is accepted.
TUVOPLATFORM_API void TUVODBFreeResult(struct DBResult_tag* result);

// Writes `text` (`length` bytes) for use between single quotes: every single quote doubled.
// `db` is not used and may be null. The text is zero-terminated when there is room for the zero;
// a result that fills `size` exactly is not.
// Returns the number of bytes written without the zero, -1 when `size` is too small (or an
// argument is null); `out` is then unspecified.
TUVOPLATFORM_API int TUVODBEscapeStringEX2(TUVODB* db, char* out, unsigned int size,
                                           const char* text, unsigned int length);

// Told between the steps of a copy: `left` of `total` pages are still to be copied. Another answer
// than 0 ends the copying.
typedef int (*TUVODBBackupProgress)(void* context, unsigned int left, unsigned int total);

// Copies the whole database behind `from` to the new file `to`, as it is at one moment: other
// connections may go on writing where the journal mode lets them beside a reader (WAL). Nothing may
// exist at `to` before; the file gets the mode 0600 (less what the umask takes) and belongs to the
// effective identity. It is complete by itself, without companions, and has the journal mode of
// `from`. `progress` may be null. No transaction may be open on `from`.
// Returns 0, or -1 with the reason in TUVODBErrorGet(from); `to` is then not there, or is what was
// there before.
TUVOPLATFORM_API int TUVODBBackup(TUVODB* from, const char* to, TUVODBBackupProgress progress,
                                  void* context);

// Closes the connection and frees the handle; an open transaction is rolled back. Null is accepted.
TUVOPLATFORM_API void TUVODBClose(TUVODB* db);

#ifdef __cplusplus
}
#endif

#endif  // TUVOPLATFORM_DATABASE_H_
