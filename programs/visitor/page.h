// The HTML of the program's pages. No scripts, nothing loaded from elsewhere, one small style.
#ifndef PROGRAMS_VISITOR_PAGE_H_
#define PROGRAMS_VISITOR_PAGE_H_

#include <string>
#include <string_view>

namespace visitor {

// The style of all pages, and its SHA-256 digest in base64, by which the pages' policy lets it and
// nothing else apply.
extern const std::string_view kPageStyle;
extern const std::string_view kPageStyleDigest;

// What a form asks for.
enum class Ask { kNothing, kPassword, kAccount };

// A form that admits a visitor to a link.
struct AdmissionForm {
  Ask ask = Ask::kNothing;
  std::string_view title;       // the link's own, may be empty
  std::string_view action;      // where the form goes
  std::string_view complaint;   // why the last attempt failed, may be empty
  std::string_view user_name;   // typed last time, may be empty
  bool keeps_redirect = false;  // the request had the parameter "redirect", which is to survive
};

// A page that says something.
struct NoticePage {
  std::string_view heading;
  std::string_view text;
  std::string_view link;  // an address to go on to, may be empty
  std::string_view link_text;
  std::string_view button;  // a button that posts to `action`, may be empty
  std::string_view action;
};

// Whole documents. Every text is escaped here.
std::string FormHtml(const AdmissionForm& form);
std::string NoticeHtml(const NoticePage& page);

}  // namespace visitor

#endif  // PROGRAMS_VISITOR_PAGE_H_
