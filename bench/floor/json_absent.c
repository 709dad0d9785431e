#include "floor/json.h"

/* The rows of lists are not for the floor that is built with this. */
int parse_json(const char* text, size_t length) {
  (void)text;
  (void)length;
  return -1;
}
