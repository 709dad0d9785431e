#include "visitor/serve.h"

#include <json/value.h>
#include <syslog.h>

#include <cerrno>
#include <cstring>
#include <ctime>
#include <optional>
#include <string>

#include "common/redirect_target.h"
#include "visitor/file_answer.h"
#include "visitor/page_answers.h"
#include "visitor/shared_file.h"

namespace visitor {

namespace {

using TUVO::sharing::record::Entry;

constexpr const char* kFileProject = "file";
constexpr const char* kPathMember = "path";
constexpr int kFound = 302;

// A redirect without a target is none: rows of older programs may lack both members.
bool SendsOn(const Request& request, const Entry& entry) {
  if (entry.get_redirect_uri().empty()) {
    return false;
  }
  switch (entry.get_redirect_type()) {
    case Entry::REDIRECT_ALWAYS:
      return true;
    case Entry::REDIRECT_URLPARAM:
      return request.asks_redirect;
    default:
      return false;
  }
}

// Links are named by their row in the log: their hash is what opens them.
Answer Misconfigured(const Entry& entry, const char* what) {
  syslog(LOG_ERR, "serve:%d link %d has no usable %s", __LINE__, entry.get_id(), what);
  return NoticeAnswer(Notice::kMisconfigured);
}

void LogNoFile(const Entry& entry, const char* what) {
  const int error = errno;
  syslog(LOG_ERR, "serve:%d file of link %d %s: %s", __LINE__, entry.get_id(), what,
         std::strerror(error));
}

Answer SendOn(const Entry& entry) {
  const std::optional<std::string> target = common::RedirectTarget(entry.get_redirect_uri());
  if (!target) {
    return Misconfigured(entry, "redirect address");
  }
  Answer answer;
  answer.status = kFound;
  AddHeader(&answer, "Location", *target);
  return answer;
}

Answer ServeFile(const Request& request, const Entry& entry) {
  const Json::Value app = entry.get_app();
  if (!app.isObject() || !app[kPathMember].isString()) {
    return Misconfigured(entry, "path");
  }
  SharedFile file;
  switch (OpenShared(app[kPathMember].asString(), &file)) {
    case OpenResult::kGone:
      LogNoFile(entry, "is not there");
      return NoticeAnswer(Notice::kFileGone);
    case OpenResult::kNotReadable:
      LogNoFile(entry, "cannot be read");
      return NoticeAnswer(Notice::kFileNotReadable);
    case OpenResult::kOpened:
      break;
  }
  file.link = entry.get_id();
  return FileAnswer(request, std::move(file), std::time(nullptr));
}

}  // namespace

Answer Serve(const Request& request, const Entry& entry) {
  if (SendsOn(request, entry)) {
    return SendOn(entry);
  }
  if (entry.get_project_name() == kFileProject) {
    return ServeFile(request, entry);
  }
  const NoticeText& text = TextOf(Notice::kOtherApplication);
  const std::string logout = LogoutPath(request.route.hash);
  NoticePage page;
  page.heading = text.heading;
  page.text = text.text;
  page.link = logout;
  page.link_text = "Log out of this link";
  return PageAnswer(text.status, page);
}

}  // namespace visitor
