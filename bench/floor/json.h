/* The JSON parsing that a list cannot do without, for the rows of lists alone. The floor is built
 * with it and without: a first request's floor is to load nothing but SQLite. */
#ifndef BENCH_FLOOR_JSON_H_
#define BENCH_FLOOR_JSON_H_

#include <stddef.h>

#ifdef __cplusplus
extern "C" {
#endif

/* Parses a document with the library's settings and drops it; 0 on success. */
int parse_json(const char* text, size_t length);

#ifdef __cplusplus
}
#endif

#endif /* BENCH_FLOOR_JSON_H_ */
