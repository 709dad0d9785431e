// The database that a target works on: the library's own instance, opened once, in the private
// /usr/tuvo of scripts/private-root.
#ifndef TESTS_FUZZ_LINKS_DATABASE_H_
#define TESTS_FUZZ_LINKS_DATABASE_H_

#include <tuvosharing/sharing_db.h>

#include <string>

namespace fuzz {

// Ends the process when the database cannot be used.
TUVO::sharing::db::SharingDB& Links();

// Runs statements of the target's own; ends the process when one fails.
void Run(const std::string& sql);

// `text` as a literal that holds every byte of it.
std::string Literal(const std::string& text);

// The cells of the column "c" that the statement returns, each followed by a line feed.
std::string Column(const std::string& sql);

// Tells two states of the file apart: how many rows this process has changed so far, and the
// schema.
std::string ChangesSoFar();

// All cells of the rows of a table, a line for each row; in those of links the owner's uid comes
// second.
std::string DumpEntries();
std::string DumpSessions();
std::string DumpTokens();

}  // namespace fuzz

#endif  // TESTS_FUZZ_LINKS_DATABASE_H_
