#include "login/c_visit.h"

#include <stddef.h>
#include <tuvosharing/login.h>

#define OFFSET(member) (unsigned int)offsetof(struct _tag_sharing_login_params, member)

struct c_params_layout get_c_params_layout(void) {
  struct c_params_layout layout = {
      OFFSET(sharing_id),   OFFSET(password),
      OFFSET(zor_username), OFFSET(zor_password),
      OFFSET(sharing_sid),  (unsigned int)sizeof(struct _tag_sharing_login_params)};
  return layout;
}

struct c_visit make_c_visit(const char* hash, const char* password) {
  struct c_visit visit = {"", 0, 0, 0, 0, 0};
  struct _tag_sharing_login_params params = {hash, password, 0, 0, 0};
  visit.login = TuvoSharingLogin(visit.session_id, sizeof visit.session_id, &params, 0);
  params.sharing_sid = visit.session_id;
  visit.check = TuvoSharingIsAuthorized(&params);
  visit.count = TuvoSharingIncreaseUseCount(hash);
  visit.logout = TuvoSharingLogout(hash, visit.session_id);
  visit.check_after_logout = TuvoSharingIsAuthorized(&params);
  return visit;
}
