#include "visitor/page.h"

#include <tuvosharing/keys.h>

#include <algorithm>
#include <iterator>
#include <utility>

#include "visitor/html.h"
#include "visitor/route.h"

namespace visitor {

// The owner's page (programs/web/owner.css) has the same colours, type and spacing.
const std::string_view kPageStyle =
    ":root{color-scheme:light dark;--ground:#f4f6f8;--surface:#fff;--text:#1b2026;--line:#d3d9df;"
    "--edge:#76818c;--link:#1a5fb4;--danger:#b0182b;--danger-ground:#fbeaec}"
    "@media(prefers-color-scheme:dark){:root{--ground:#14181c;--surface:#1d2329;--text:#e7ebef;"
    "--line:#37414b;--edge:#7f8a95;--link:#8ab8f2;--danger:#ff9aa5;--danger-ground:#3a1d22}}"
    "*{box-sizing:border-box}"
    "body{margin:0;padding:1rem;font:1rem/1.5 system-ui,sans-serif;background:var(--ground);"
    "color:var(--text)}"
    "main{max-width:26rem;margin:min(12vh,4rem) auto 0;padding:1.5rem 2rem 2rem;"
    "border:1px solid var(--line);border-radius:.75rem;background:var(--surface)}"
    "h1{margin:0 0 .75rem;font-size:1.35rem;line-height:1.3;overflow-wrap:anywhere}"
    "p{margin:0 0 1rem}"
    "main>:last-child{margin-bottom:0}"
    "label{display:block;margin:0 0 .2rem;font-weight:600}"
    "input{display:block;width:100%;margin:0 0 1rem;padding:.6rem;font:inherit;color:inherit;"
    "border:1px solid var(--edge);border-radius:.4rem;background:var(--surface)}"
    "button{width:100%;padding:.65rem;font:inherit;font-weight:600;border:1px solid transparent;"
    "border-radius:.4rem;background:#1a5fb4;color:#fff;cursor:pointer}"
    "button:hover{background:#154d92}"
    "a{color:var(--link)}"
    ":focus-visible{outline:3px solid var(--link);outline-offset:2px}"
    ".complaint~form input{border-color:var(--danger)}"
    ".complaint{padding:.6rem .8rem;border-left:.3rem solid var(--danger);"
    "background:var(--danger-ground)}";
const std::string_view kPageStyleDigest = "J3rhe3fgLH9eEeCCxXd9KPsI36IyHQaQvuwP8xTjFQo=";

namespace {

constexpr std::string_view kUntitled = "Shared link";
constexpr std::string_view kComplaintId = "complaint";

struct Range {
  char32_t first;
  char32_t last;
};

// Blanks, controls and what shapes other characters without being seen itself.
constexpr Range kInvisible[] = {
    {0x00, 0x20},       {0x7f, 0xa0},       {0xad, 0xad},     {0x34f, 0x34f},   {0x61c, 0x61c},
    {0x115f, 0x1160},   {0x1680, 0x1680},   {0x17b4, 0x17b5}, {0x180b, 0x180f}, {0x2000, 0x200f},
    {0x2028, 0x202f},   {0x205f, 0x206f},   {0x2800, 0x2800}, {0x3000, 0x3000}, {0x3164, 0x3164},
    {0xfe00, 0xfe0f},   {0xfeff, 0xfeff},   {0xffa0, 0xffa0}, {0xfff0, 0xfffb}, {0x1bca0, 0x1bca3},
    {0x1d173, 0x1d17a}, {0xe0000, 0xe0fff},
};

bool IsVisible(char32_t character) {
  return std::none_of(std::begin(kInvisible), std::end(kInvisible), [character](Range range) {
    return range.first <= character && character <= range.last;
  });
}

// The character of UTF-8 at the start of a text, and how long it is; a stray byte is one by itself.
std::pair<char32_t, size_t> FirstCharacter(std::string_view text) {
  const auto byte = [text](size_t at) { return static_cast<unsigned char>(text[at]); };
  const unsigned char lead = byte(0);
  const size_t length = lead >= 0xf0 ? 4 : lead >= 0xe0 ? 3 : lead >= 0xc0 ? 2 : 1;
  if (length == 1 || length > text.size()) {
    return {lead < 0x80 ? lead : U'\ufffd', 1};
  }
  char32_t character = lead & (0x7fU >> length);
  for (size_t at = 1; at < length; ++at) {
    character = character << 6U | (byte(at) & 0x3fU);
  }
  return {character, length};
}

// A heading that shows nothing leaves visitors, and screen readers above all, without one.
bool HasVisible(std::string_view text) {
  while (!text.empty()) {
    const auto [character, length] = FirstCharacter(text);
    if (IsVisible(character)) {
      return true;
    }
    text.remove_prefix(length);
  }
  return false;
}

std::string Document(std::string_view title, const std::string& content) {
  return "<!DOCTYPE html>\n<html lang=\"en\">\n<head>\n<meta charset=\"utf-8\">\n"
         "<meta name=\"viewport\" content=\"width=device-width, initial-scale=1\">\n<title>" +
         HtmlEscape(title) + "</title>\n<style>" + std::string(kPageStyle) +
         "</style>\n</head>\n<body>\n<main>\n<h1>" + HtmlEscape(title) + "</h1>\n" + content +
         "</main>\n</body>\n</html>\n";
}

std::string Paragraph(std::string_view text) {
  return "<p>" + HtmlEscape(text) + "</p>\n";
}

// Read out at once by screen readers, and again with the fields that refer to it.
std::string Complaint(std::string_view text) {
  return "<p class=\"complaint\" id=\"" + std::string(kComplaintId) + "\" role=\"alert\">" +
         HtmlEscape(text) + "</p>\n";
}

std::string FormStart(std::string_view action) {
  return "<form method=\"post\" action=\"" + HtmlEscape(action) + "\">\n";
}

std::string Button(std::string_view text, bool focused) {
  return std::string("<button type=\"submit\"") + (focused ? " autofocus" : "") + ">" +
         HtmlEscape(text) + "</button>\n";
}

struct Field {
  std::string_view name;
  std::string_view label;
  std::string_view attributes;  // type and autocompletion
  std::string_view value;
  bool focused = false;
};

std::string Labelled(const Field& field, bool has_complaint) {
  const std::string name = HtmlEscape(field.name);
  std::string html = "<label for=\"" + name + "\">" + HtmlEscape(field.label) +
                     "</label>\n<input id=\"" + name + "\" name=\"" + name + "\" " +
                     std::string(field.attributes) + " required";
  if (!field.value.empty()) {
    html += " value=\"" + HtmlEscape(field.value) + "\"";
  }
  if (has_complaint) {
    html += " aria-describedby=\"" + std::string(kComplaintId) + "\" aria-invalid=\"true\"";
  }
  return html + (field.focused ? " autofocus>\n" : ">\n");
}

std::string Fields(const AdmissionForm& form) {
  const bool complains = !form.complaint.empty();
  if (form.ask == Ask::kPassword) {
    return Labelled({TUVO::sharing::SZK_PASSWORD_, "Password",
                     "type=\"password\" autocomplete=\"current-password\"", "", true},
                    complains);
  }
  if (form.ask == Ask::kAccount) {
    const bool knows_name = !form.user_name.empty();
    return Labelled({TUVO::sharing::SZK_ZOR_USERNAME, "Account name",
                     "type=\"text\" autocomplete=\"username\" autocapitalize=\"none\" "
                     "spellcheck=\"false\"",
                     form.user_name, !knows_name},
                    complains) +
           Labelled({TUVO::sharing::SZK_ZOR_PASSWORD, "Account password",
                     "type=\"password\" autocomplete=\"current-password\"", "", knows_name},
                    complains);
  }
  return {};
}

std::string_view Instruction(Ask ask) {
  switch (ask) {
    case Ask::kPassword:
      return "This link is protected. Type the password that you were given with it.";
    case Ask::kAccount:
      return "This link is for certain accounts. Sign in with yours.";
    default:
      return "Somebody shared this with you.";
  }
}

}  // namespace

std::string FormHtml(const AdmissionForm& form) {
  std::string content =
      form.complaint.empty() ? Paragraph(Instruction(form.ask)) : Complaint(form.complaint);
  content += FormStart(form.action) + Fields(form);
  if (form.keeps_redirect) {
    content +=
        "<input type=\"hidden\" name=\"" + std::string(kRedirectParameter) + "\" value=\"1\">\n";
  }
  content += Button("Open", form.ask == Ask::kNothing) + "</form>\n";
  return Document(HasVisible(form.title) ? form.title : kUntitled, content);
}

std::string NoticeHtml(const NoticePage& page) {
  std::string content = Paragraph(page.text);
  if (!page.button.empty()) {
    content += FormStart(page.action) + Button(page.button, true) + "</form>\n";
  }
  if (!page.link.empty()) {
    content +=
        "<p><a href=\"" + HtmlEscape(page.link) + "\">" + HtmlEscape(page.link_text) + "</a></p>\n";
  }
  return Document(page.heading, content);
}

}  // namespace visitor
