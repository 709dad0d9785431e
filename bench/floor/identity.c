#include "floor/identity.h"

#include <unistd.h>

#define SAME ((uid_t)-1)

int enter_system(void) {
  return setresgid(SAME, 1, SAME) == 0 ? setresuid(SAME, 1, SAME) : -1;
}

/* The last call changes nothing any more; the library makes it, so it belongs to the floor. */
int leave_system(void) {
  return setresuid(SAME, 0, SAME) == 0 && setresgid(SAME, 0, SAME) == 0 ? setresuid(SAME, 0, SAME)
                                                                        : -1;
}
