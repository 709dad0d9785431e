// Answers that are pages.
#ifndef PROGRAMS_VISITOR_PAGE_ANSWERS_H_
#define PROGRAMS_VISITOR_PAGE_ANSWERS_H_

#include <string>
#include <string_view>

#include "visitor/answer.h"
#include "visitor/notices.h"
#include "visitor/page.h"
#include "visitor/refusal.h"
#include "visitor/request.h"

namespace visitor {

// A notice; with the headers that its status demands.
Answer NoticeAnswer(Notice notice);

// A page of the status 200 or another, from its parts.
Answer PageAnswer(int status, const NoticePage& page);

// The form of the request's link, under the status 403 and with a complaint on top when there is
// one; when no login can succeed, the notice that says so. `user_name` is put into the form again.
Answer FormAnswer(const Request& request, std::string_view complaint,
                  std::string_view user_name = {});

// The answer to a refusal: FormAnswer or NoticeAnswer.
Answer RefusalAnswer(const Request& request, const Refusal& refusal,
                     std::string_view user_name = {});

}  // namespace visitor

#endif  // PROGRAMS_VISITOR_PAGE_ANSWERS_H_
