/* What the databases of the measurements hold. Link, session and token number `i` (from 0) have the
 * id i + 1 and belong together, and their random-looking texts follow from the number, so that
 * every program knows them without looking, and every machine has the same database. */
#ifndef BENCH_COMMON_CONTENT_H_
#define BENCH_COMMON_CONTENT_H_

#include <stdint.h>

#ifdef __cplusplus
extern "C" {
#endif

#define BENCH_DATABASE "/usr/tuvo/etc/private/session/sharing.db"
#define BENCH_AUTO_BLOCK "/usr/tuvo/etc/private/session/autoblock.db"
#define BENCH_ADDRESS "192.0.2.1"
#define BENCH_NETWORK BENCH_ADDRESS /* what auto-block counts the address under */
#define BENCH_PROJECT "files"
#define BENCH_PASSWORD "sesame"
#define BENCH_NOBODY 4294967295U

/* Of each run of so many links the first two are open, the third has a password, the last is for
 * accounts. */
#define BENCH_KINDS 4U
enum bench_kind { BENCH_OPEN = 0, BENCH_OPEN_TOO = 1, BENCH_WITH_PASSWORD = 2, BENCH_FOR_USER = 3 };

/* Every owner has so many links. */
#define BENCH_LINKS_PER_OWNER 200U
#define BENCH_FIRST_OWNER 10000U

enum { BENCH_HASH_SIZE = 10, BENCH_SESSION_SIZE = 33 };

/* A number that looks random and follows from `i` alone. */
uint64_t bench_mix(uint64_t i);

/* Writes the hash of link `i`, or the identifier of session `i`, and a zero. */
void bench_hash(uint64_t i, char hash[BENCH_HASH_SIZE]);
void bench_session(uint64_t i, char session[BENCH_SESSION_SIZE]);

/* The owner of link `i` among `links` of them. */
unsigned int bench_owner(uint64_t i, uint64_t links);

/* The column "data" of link `i`, byte by byte as the library writes it. */
const char* bench_data(uint64_t i);

#ifdef __cplusplus
}
#endif

#endif /* BENCH_COMMON_CONTENT_H_ */
