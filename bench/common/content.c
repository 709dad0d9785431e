#include "common/content.h"

#include <stddef.h>

#define BEFORE_PASSWORD \
  "{\"app\":{\"path\":\"/exports/public/report.pdf\"},\"enable_match_ip\":true,"
#define LISTS                                                                                      \
  "\"private_data\":{},\"protect_extra_groups\":[],\"protect_extra_users\":[],\"protect_gids\":[]" \
  ","
#define AFTER_TYPE ",\"redirect_type\":\"none\",\"redirect_uri\":\"\"}"

static const char kOpen[] = BEFORE_PASSWORD LISTS
    "\"protect_password\":\"\",\"protect_password_algo\":\"default\",\"protect_password_salt\":"
    "\"\","
    "\"protect_title\":\"\",\"protect_type\":\"none\",\"protect_uids\":[]" AFTER_TYPE;

/* The digest is that of BENCH_PASSWORD with the salt behind it. */
static const char kPassword[] = BEFORE_PASSWORD LISTS
    "\"protect_password\":\"6ad0c8d2f3b2b961916e48ed52c54f8fcdf4c73f\","
    "\"protect_password_algo\":\"default\",\"protect_password_salt\":\"Ab3dE9\","
    "\"protect_title\":\"\",\"protect_type\":\"password\",\"protect_uids\":[]" AFTER_TYPE;

static const char kUser[] = BEFORE_PASSWORD LISTS
    "\"protect_password\":\"\",\"protect_password_algo\":\"default\",\"protect_password_salt\":"
    "\"\","
    "\"protect_title\":\"\",\"protect_type\":\"user\",\"protect_uids\":[2001]" AFTER_TYPE;

/* The step and the two factors of the generator known as splitmix64. */
uint64_t bench_mix(uint64_t i) {
  uint64_t z = (i + 1) * UINT64_C(0x9e3779b97f4a7c15);
  z = (z ^ (z >> 30)) * UINT64_C(0xbf58476d1ce4e5b9);
  z = (z ^ (z >> 27)) * UINT64_C(0x94d049bb133111eb);
  return z ^ (z >> 31);
}

static void write_text(uint64_t seed, char* text, size_t length, size_t letters) {
  static const char kLetters[] = "0123456789ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz-_";
  uint64_t bits = seed;
  for (size_t at = 0; at < length; ++at) {
    if (at % 10 == 0) {
      bits = bench_mix(seed + at);
    }
    text[at] = kLetters[bits % letters];
    bits /= letters;
  }
  text[length] = '\0';
}

void bench_hash(uint64_t i, char hash[BENCH_HASH_SIZE]) {
  write_text(i << 8, hash, BENCH_HASH_SIZE - 1, 62);
}

void bench_session(uint64_t i, char session[BENCH_SESSION_SIZE]) {
  write_text((i << 8) + 128, session, BENCH_SESSION_SIZE - 1, 64);
}

unsigned int bench_owner(uint64_t i, uint64_t links) {
  const uint64_t owners = links > BENCH_LINKS_PER_OWNER ? links / BENCH_LINKS_PER_OWNER : 1;
  return BENCH_FIRST_OWNER + (unsigned int)(i % owners);
}

const char* bench_data(uint64_t i) {
  switch (i % BENCH_KINDS) {
    case BENCH_WITH_PASSWORD:
      return kPassword;
    case BENCH_FOR_USER:
      return kUser;
    default:
      return kOpen;
  }
}
