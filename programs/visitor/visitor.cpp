#include "visitor/visitor.h"

#include "visitor/events.h"
#include "visitor/login.h"
#include "visitor/logout.h"
#include "visitor/page_answers.h"
#include "visitor/visit.h"

namespace visitor {

Answer Handle(const Request& request, TUVOCGI* cgi) {
  if (request.method == Method::kOther) {
    return NoticeAnswer(Notice::kMethod);
  }
  if (request.route.place == Place::kNowhere) {
    return NoticeAnswer(Notice::kNotFound);
  }
  const bool logs_out = request.route.place == Place::kLogout;
  if (request.method != Method::kPost) {
    return logs_out ? LogoutPage(request) : Visit(request);
  }
  // Any web page could otherwise make its visitors' browsers try passwords here, until their
  // addresses are locked out.
  if (request.from_elsewhere) {
    LogRefusal(request.route.hash, kFromAnotherSite);
    return NoticeAnswer(Notice::kFromElsewhere);
  }
  return logs_out ? Logout(request) : Login(request, cgi);
}

}  // namespace visitor
