/* The frame that library and floor are measured in, the same for both. */
#ifndef BENCH_COMMON_MEASURE_H_
#define BENCH_COMMON_MEASURE_H_

#include <stddef.h>
#include <stdint.h>

#include "common/content.h"

#ifdef __cplusplus
extern "C" {
#endif

/* What an operation is done on. */
struct bench_target {
  uint64_t links; /* so many the database was made with */
  uint64_t turn;  /* the how-manieth operation it is, of all processes on one database */
  uint64_t link;  /* the number of the link, chosen as the row says */
};

/* Does the operation once; 0 on success. */
typedef int (*bench_operation)(const struct bench_target* target);

/* Which links a row's operations are done on: any of a kind, or one after another, for operations
 * that can be done on a link only once. */
enum bench_choice { BENCH_ANY, BENCH_EACH_ONCE };

struct bench_row {
  const char* name;
  enum bench_choice choice;
  enum bench_kind kind;
  bench_operation operation;
};

/* For operations that keep what they were given: how many bytes it takes. Printed when not 0. */
extern uint64_t bench_kept_bytes;

/* Opens what the operations need, before anything is measured; 0 on success. */
typedef int (*bench_prepare)(void);

/* The programs' main: runs the row that the arguments name and prints what it took as one JSON
 * object. `rows` ends with a row without a name. Returns the exit status.
 *
 *   PROGRAM ROW LINKS ITERATIONS WARM-UP FIRST-TURN */
int bench_main(int argc, char** argv, const struct bench_row* rows, bench_prepare prepare);

#ifdef __cplusplus
}
#endif

#endif /* BENCH_COMMON_MEASURE_H_ */
