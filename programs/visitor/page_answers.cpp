#include "visitor/page_answers.h"

#include "common/redirect_target.h"
#include "visitor/link.h"

namespace visitor {

namespace {

using TUVO::sharing::record::Entry;

// The auto-block service's default time; how long it still is, it does not tell.
constexpr std::string_view kBlockSeconds = "1800";

// What a page's form may lead to: browsers hold the redirects that follow a form to it as well.
constexpr std::string_view kOwnForms = "'self'";
constexpr std::string_view kFormsLeadingAway = "'self' http: https:";

Answer HtmlAnswer(int status, std::string html, std::string_view form_targets = kOwnForms) {
  Answer answer;
  answer.status = status;
  answer.body = std::move(html);
  AddHeader(&answer, "Content-Type", "text/html; charset=utf-8");
  AddHeader(&answer, "Content-Security-Policy",
            "default-src 'none'; style-src 'sha256-" + std::string(kPageStyleDigest) +
                "'; form-action " + std::string(form_targets) +
                "; frame-ancestors 'none'; base-uri 'none'");
  return answer;
}

Ask AskOf(const Entry& entry) {
  switch (entry.get_protect_type()) {
    case Entry::PROTECT_PASSWORD:
      return Ask::kPassword;
    case Entry::PROTECT_USER:
      return Ask::kAccount;
    default:
      return Ask::kNothing;
  }
}

bool LeadsAway(const Entry& entry) {
  return entry.get_redirect_type() != Entry::REDIRECT_NONE &&
         common::NamesHost(entry.get_redirect_uri());
}

}  // namespace

Answer PageAnswer(int status, const NoticePage& page) {
  return HtmlAnswer(status, NoticeHtml(page));
}

Answer NoticeAnswer(Notice notice) {
  const NoticeText& text = TextOf(notice);
  NoticePage page;
  page.heading = text.heading;
  page.text = text.text;
  Answer answer = PageAnswer(text.status, page);
  if (notice == Notice::kBlocked) {
    AddHeader(&answer, "Retry-After", kBlockSeconds);
  } else if (notice == Notice::kMethod) {
    AddHeader(&answer, "Allow", "GET, HEAD, POST");
  }
  return answer;
}

Answer FormAnswer(const Request& request, std::string_view complaint, std::string_view user_name) {
  Entry entry;
  switch (LookUpLink(request.route.hash, &entry)) {
    case LinkState::kNone:
      return NoticeAnswer(Notice::kNotFound);
    case LinkState::kUsedUp:
      return NoticeAnswer(Notice::kUsedUp);
    case LinkState::kFailure:
      return NoticeAnswer(Notice::kFailure);
    case LinkState::kOpen:
      break;
  }
  const std::string title = entry.get_protect_title();
  const std::string action = LinkPath(request.route.hash);
  AdmissionForm form;
  form.ask = AskOf(entry);
  form.title = title;
  form.action = action;
  form.complaint = complaint;
  form.user_name = user_name;
  form.keeps_redirect = request.asks_redirect;
  constexpr int kOk = 200;
  constexpr int kForbidden = 403;
  return HtmlAnswer(complaint.empty() ? kOk : kForbidden, FormHtml(form),
                    LeadsAway(entry) ? kFormsLeadingAway : kOwnForms);
}

Answer RefusalAnswer(const Request& request, const Refusal& refusal, std::string_view user_name) {
  return refusal.complaint.empty() ? NoticeAnswer(refusal.notice)
                                   : FormAnswer(request, refusal.complaint, user_name);
}

}  // namespace visitor
