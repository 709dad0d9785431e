#include "common/measure.h"
#include "common/content.h"

#include <inttypes.h>
#include <stdio.h>
#include <stdlib.h>
#include <string.h>
#include <sys/resource.h>
#include <time.h>

uint64_t bench_kept_bytes = 0;

static int64_t nanoseconds(clockid_t clock) {
  struct timespec now;
  clock_gettime(clock, &now);
  return (int64_t)now.tv_sec * 1000000000 + now.tv_nsec;
}

/* User and system time of the process. The kernel counts it in nanoseconds, getrusage cuts it. */
static int64_t cpu_nanoseconds(void) {
  return nanoseconds(CLOCK_PROCESS_CPUTIME_ID);
}

/* A value of /proc/self/status, in KiB. Not ru_maxrss: that begins with the peak of the process
 * that started this one. */
static long status_kib(const char* name) {
  char line[256];
  long value = -1;
  FILE* status = fopen("/proc/self/status", "r");
  if (status == NULL) {
    return -1;
  }
  while (value < 0 && fgets(line, sizeof line, status) != NULL) {
    if (strncmp(line, name, strlen(name)) == 0) {
      value = strtol(line + strlen(name), NULL, 10);
    }
  }
  fclose(status);
  return value;
}

static uint64_t link_of(const struct bench_row* row, uint64_t links, uint64_t turn) {
  const uint64_t of_kind = links / BENCH_KINDS;
  const uint64_t chosen = row->choice == BENCH_ANY ? bench_mix(turn) % of_kind : turn % of_kind;
  return chosen * BENCH_KINDS + row->kind;
}

/* Its name tells callgrind where to count, so it is a function of its own. */
__attribute__((noinline)) int bench_loop(const struct bench_row* row, uint64_t links,
                                         uint64_t first, uint64_t count) {
  for (uint64_t turn = first; turn < first + count; ++turn) {
    const struct bench_target target = {links, turn, link_of(row, links, turn)};
    if (row->operation(&target) != 0) {
      fprintf(stderr, "%s: operation %" PRIu64 " failed\n", row->name, turn);
      return -1;
    }
  }
  return 0;
}

static int measure(const struct bench_row* row, uint64_t links, uint64_t count, uint64_t warm_up,
                   uint64_t first) {
  const long base = status_kib("VmRSS:");
  for (uint64_t turn = first; turn < first + warm_up; ++turn) {
    const struct bench_target target = {links, turn, link_of(row, links, turn)};
    if (row->operation(&target) != 0) {
      fprintf(stderr, "%s: warm-up %" PRIu64 " failed\n", row->name, turn);
      return 1;
    }
  }
  const int64_t cpu = cpu_nanoseconds();
  const int64_t wall = nanoseconds(CLOCK_MONOTONIC);
  if (bench_loop(row, links, first + warm_up, count) != 0) {
    return 1;
  }
  const int64_t wall_end = nanoseconds(CLOCK_MONOTONIC);
  const int64_t cpu_end = cpu_nanoseconds();
  printf("{\"row\": \"%s\", \"links\": %" PRIu64 ", \"iterations\": %" PRIu64
         ", \"wall_ns\": %" PRId64 ", \"cpu_ns\": %" PRId64
         ", \"base_kib\": %ld, \"peak_kib\": %ld, \"kept_bytes\": %" PRIu64 "}\n",
         row->name, links, count, wall_end - wall, cpu_end - cpu, base, status_kib("VmHWM:"),
         bench_kept_bytes);
  return 0;
}

static const struct bench_row* find(const struct bench_row* rows, const char* name) {
  while (rows->name != NULL && strcmp(rows->name, name) != 0) {
    ++rows;
  }
  return rows->name != NULL ? rows : NULL;
}

static uint64_t number(const char* text) {
  return strtoull(text, NULL, 10);
}

int bench_main(int argc, char** argv, const struct bench_row* rows, bench_prepare prepare) {
  const struct bench_row* row = argc == 6 ? find(rows, argv[1]) : NULL;
  if (row == NULL || number(argv[2]) < BENCH_KINDS) {
    fprintf(stderr, "usage: %s ROW LINKS ITERATIONS WARM-UP FIRST-TURN\nrows:", argv[0]);
    for (; rows->name != NULL; ++rows) {
      fprintf(stderr, " %s", rows->name);
    }
    fputc('\n', stderr);
    return 2;
  }
  if (prepare() != 0) {
    fprintf(stderr, "cannot open the database\n");
    return 1;
  }
  return measure(row, number(argv[2]), number(argv[3]), number(argv[4]), number(argv[5]));
}
