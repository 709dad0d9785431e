#include "visitor/visit.h"

#include <tuvosharing/login.h>

#include "visitor/events.h"
#include "visitor/link.h"
#include "visitor/page_answers.h"
#include "visitor/serve.h"

namespace visitor {

namespace {

int IsAuthorized(const Request& request) {
  _tag_sharing_login_params params{};
  params.sharing_id = request.route.hash.c_str();
  params.sharing_sid = request.session_id.c_str();
  return TUVO::TuvoSharingIsAuthorized(&params);
}

}  // namespace

Answer Visit(const Request& request) {
  if (request.session_id.empty()) {
    return FormAnswer(request, {});  // a first visit: nothing was refused
  }
  const int code = IsAuthorized(request);
  if (code != 1) {
    LogRefusal(request.route.hash, code);
    return RefusalAnswer(request, RefusedVisit(code));
  }
  TUVO::sharing::record::Entry entry;
  if (!LoadLink(request.route.hash, &entry)) {
    return NoticeAnswer(Notice::kNotFound);
  }
  return Serve(request, entry);
}

}  // namespace visitor
