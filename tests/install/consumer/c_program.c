/* Uses every function that the library offers to C: a visitor with a link that does not exist. */
#include <stdio.h>
#include <string.h>
#include <tuvosharing/login.h>

static int expect(const char* what, int wanted, int got) {
  if (wanted != got) {
    fprintf(stderr, "%s: %d, not %d\n", what, got, wanted);
  }
  return wanted != got;
}

int main(void) {
  struct _tag_sharing_login_params visitor;
  char session[33];
  int failures = 0;

  memset(&visitor, 0, sizeof visitor);
  memset(session, 'x', sizeof session);
  failures +=
      expect("login without a link", -4, TuvoSharingLogin(session, sizeof session, &visitor, 0));
  failures += expect("length of the session identifier", 0, (int)strlen(session));
  visitor.sharing_id = "notthere1";
  visitor.sharing_sid = "nobody";
  failures += expect("login", -3, TuvoSharingLogin(session, sizeof session, &visitor, 1));
  failures += expect("check", -5, TuvoSharingIsAuthorized(&visitor));
  failures += expect("logout", 0, TuvoSharingLogout("notthere1", "nobody"));
  failures += expect("count", 0, TuvoSharingIncreaseUseCount("notthere1"));
  return failures;
}
