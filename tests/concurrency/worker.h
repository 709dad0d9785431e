// One of many who use the database at once: its processes serve a few requests each.
#ifndef TESTS_CONCURRENCY_WORKER_H_
#define TESTS_CONCURRENCY_WORKER_H_

#include <string>

#include "concurrency/board.h"

namespace tuvo_test {

// The file of that number beside the database.
std::string NewFile(int number);

// Begins one process after another, each with the worker's identity and a few requests to serve,
// until the board says stop. Complains about whatever is not answered as it is to be.
void Work(Board& board, int number);

}  // namespace tuvo_test

#endif  // TESTS_CONCURRENCY_WORKER_H_
