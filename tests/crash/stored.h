// What is found in the database after a crash.
#ifndef TESTS_CRASH_STORED_H_
#define TESTS_CRASH_STORED_H_

#include <tuvosharing/entry.h>

#include <string>
#include <vector>

namespace tuvo_test {

// Expects that the library opens the file as good, and that SQLite finds the whole of it in order,
// with the schema's current version. No process may have the file open that this one forked from or
// forks: it opens and closes it here.
void ExpectGood(const std::string& path);

// A link of several pages, so that a row that is half written shows: all of its texts tell its
// generation. No purge collects it.
TUVO::sharing::record::Entry BigLink(int generation);
void SetGeneration(TUVO::sharing::record::Entry& link, int generation);

// The generation of a link that is whole; -1 when its texts are not of one.
int GenerationOf(const TUVO::sharing::record::Entry& link);

// Every link in the file, loaded by the library.
std::vector<TUVO::sharing::record::Entry> StoredLinks(const std::string& path);

// The first value of the first row as a number, by SQLite itself.
long NumberIn(const std::string& path, const std::string& sql);

// Every value of every row of the three tables and of what SQLite keeps about their ids, as text.
std::string Contents(const std::string& path);

}  // namespace tuvo_test

#endif  // TESTS_CRASH_STORED_H_
