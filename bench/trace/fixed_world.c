/* Preloaded where instructions are counted: a clock that stands still and random bytes that are the
 * same every time, so that two counts differ only when the code does. */
#include <stdint.h>
#include <sys/random.h>
#include <time.h>

time_t time(time_t* out) {
  const time_t now = 1800000000;
  if (out != NULL) {
    *out = now;
  }
  return now;
}

ssize_t getrandom(void* bytes, size_t size, unsigned int flags) {
  static uint64_t state = 1;
  unsigned char* at = bytes;
  (void)flags;
  for (size_t i = 0; i < size; ++i) {
    state = state * UINT64_C(6364136223846793005) + UINT64_C(1442695040888963407);
    at[i] = (unsigned char)(state >> 56);
  }
  return (ssize_t)size;
}
