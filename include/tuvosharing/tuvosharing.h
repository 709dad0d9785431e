// The whole library.
#ifndef TUVOSHARING_TUVOSHARING_H_
#define TUVOSHARING_TUVOSHARING_H_

#include <tuvosharing/base_db.h>
#include <tuvosharing/condition.h>
#include <tuvosharing/entry.h>
#include <tuvosharing/entry_db.h>
#include <tuvosharing/export.h>
#include <tuvosharing/field.h>
#include <tuvosharing/keys.h>
#include <tuvosharing/login.h>
#include <tuvosharing/object.h>
#include <tuvosharing/object_db.h>
#include <tuvosharing/result.h>
#include <tuvosharing/row.h>
#include <tuvosharing/send_webapi.h>
#include <tuvosharing/session.h>
#include <tuvosharing/session_db.h>
#include <tuvosharing/sharing_db.h>
#include <tuvosharing/sharing_url.h>
#include <tuvosharing/token.h>
#include <tuvosharing/token_db.h>
#include <tuvosharing/user_group.h>
#include <tuvosharing/utils.h>

#endif  // TUVOSHARING_TUVOSHARING_H_
