/* Starts a program again and again and prints what one start took, from exec to exit:
 *
 *   bench_launch TIMES PROGRAM [ARGUMENT...]
 *
 * The programs' output goes to /dev/null. */
#include <fcntl.h>
#include <inttypes.h>
#include <spawn.h>
#include <stdint.h>
#include <stdio.h>
#include <stdlib.h>
#include <string.h>
#include <sys/resource.h>
#include <sys/wait.h>
#include <time.h>
#include <unistd.h>

extern char** environ;

static int64_t now_ns(void) {
  struct timespec now;
  clock_gettime(CLOCK_MONOTONIC, &now);
  return (int64_t)now.tv_sec * 1000000000 + now.tv_nsec;
}

static int64_t ns(struct timeval time) {
  return (int64_t)time.tv_sec * 1000000000 + (int64_t)time.tv_usec * 1000;
}

/* Starts and awaits the program once; 0 when it ended with 0. */
static int start(char** command, const posix_spawn_file_actions_t* files, struct rusage* usage) {
  pid_t pid = 0;
  int status = 0;
  const int error = posix_spawn(&pid, command[0], files, NULL, command, environ);
  if (error != 0) {
    fprintf(stderr, "%s: %s\n", command[0], strerror(error));
    return -1;
  }
  if (wait4(pid, &status, 0, usage) != pid || status != 0) {
    fprintf(stderr, "%s failed\n", command[0]);
    return -1;
  }
  return 0;
}

int main(int argc, char** argv) {
  if (argc < 3) {
    fprintf(stderr, "usage: %s TIMES PROGRAM [ARGUMENT...]\n", argv[0]);
    return 2;
  }
  const long times = strtol(argv[1], NULL, 10);
  posix_spawn_file_actions_t files;
  posix_spawn_file_actions_init(&files);
  posix_spawn_file_actions_addopen(&files, STDOUT_FILENO, "/dev/null", O_WRONLY, 0);
  int64_t cpu = 0;
  long peak = 0;
  const int64_t begin = now_ns();
  for (long i = 0; i < times; ++i) {
    struct rusage usage;
    if (start(argv + 2, &files, &usage) != 0) {
      return 1;
    }
    cpu += ns(usage.ru_utime) + ns(usage.ru_stime);
    peak = usage.ru_maxrss > peak ? usage.ru_maxrss : peak;
  }
  printf("{\"iterations\": %ld, \"wall_ns\": %" PRId64 ", \"cpu_ns\": %" PRId64
         ", \"base_kib\": 0, \"peak_kib\": %ld, \"kept_bytes\": 0}\n",
         times, now_ns() - begin, cpu, peak);
  return 0;
}
