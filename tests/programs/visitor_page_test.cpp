#include "visitor/page.h"

#include <gtest/gtest.h>

#include <string>

namespace visitor {
namespace {

bool Holds(const std::string& text, const std::string& part) {
  return text.find(part) != std::string::npos;
}

AdmissionForm Form(Ask ask) {
  AdmissionForm form;
  form.ask = ask;
  form.action = "/sharing/abc";
  return form;
}

TEST(VisitorPage, FormGoesToTheLink) {
  const std::string html = FormHtml(Form(Ask::kNothing));
  EXPECT_TRUE(Holds(html, "<form method=\"post\" action=\"/sharing/abc\">"));
  EXPECT_TRUE(Holds(html, "<button type=\"submit\" autofocus>Open</button>"));
  EXPECT_FALSE(Holds(html, "<input"));
  EXPECT_TRUE(Holds(html, "<h1>Shared link</h1>"));
}

TEST(VisitorPage, TitleThatShowsNothingIsReplaced) {
  AdmissionForm form = Form(Ask::kNothing);
  for (const char* title :
       {" ", "\t\n", u8"\u200b\u200d", u8"\u00a0", u8"\u202e", u8"\u3164\u2800", u8"\U000e0041"}) {
    form.title = title;
    EXPECT_TRUE(Holds(FormHtml(form), "<h1>Shared link</h1>")) << title;
  }
}

TEST(VisitorPage, TitleThatShowsSomethingIsKept) {
  AdmissionForm form = Form(Ask::kNothing);
  for (const char* title :
       {"a", " \xc2\xa1 ", u8"\u200b\u6771", u8"\U0001f30d", "\xff", "\xe2\x80"}) {
    form.title = title;
    EXPECT_TRUE(Holds(FormHtml(form), std::string("<h1>") + title + "</h1>")) << title;
  }
}

TEST(VisitorPage, PasswordFieldHasALabelAndTheFocus) {
  const std::string html = FormHtml(Form(Ask::kPassword));
  EXPECT_TRUE(Holds(html, "<label for=\"password\">Password</label>"));
  EXPECT_TRUE(Holds(html, "<input id=\"password\" name=\"password\" type=\"password\""));
  EXPECT_TRUE(Holds(html, " autofocus>"));
  EXPECT_FALSE(Holds(html, "aria-invalid"));
}

TEST(VisitorPage, AccountFormStartsWithTheFieldThatIsStillEmpty) {
  AdmissionForm form = Form(Ask::kAccount);
  EXPECT_TRUE(Holds(FormHtml(form), "spellcheck=\"false\" required autofocus>"));
  form.user_name = "alice";
  const std::string html = FormHtml(form);
  EXPECT_TRUE(Holds(html, "spellcheck=\"false\" required value=\"alice\">"));
  EXPECT_TRUE(Holds(html, "autocomplete=\"current-password\" required autofocus>"));
}

TEST(VisitorPage, ComplaintIsAnnouncedAndBelongsToTheFields) {
  AdmissionForm form = Form(Ask::kPassword);
  form.complaint = "No <good>";
  const std::string html = FormHtml(form);
  EXPECT_TRUE(Holds(html, "id=\"complaint\" role=\"alert\">No &lt;good&gt;</p>"));
  EXPECT_TRUE(Holds(html, "aria-describedby=\"complaint\" aria-invalid=\"true\""));
}

TEST(VisitorPage, EveryTextIsEscaped) {
  AdmissionForm form = Form(Ask::kAccount);
  form.title = "<t>";
  form.action = "\"><a>";
  form.complaint = "<c>";
  form.user_name = "\"><u>";
  NoticePage page;
  page.heading = "<h>";
  page.text = "<x>";
  page.link = "\"><l>";
  page.link_text = "<k>";
  page.button = "<b>";
  page.action = "\"><a>";
  for (const std::string& html : {FormHtml(form), NoticeHtml(page)}) {
    for (const char* markup : {"<t>", "<a>", "<c>", "<u>", "<x>", "<l>", "<k>", "<b>"}) {
      EXPECT_FALSE(Holds(html, markup)) << markup;
    }
  }
  EXPECT_FALSE(Holds(NoticeHtml(page), "<h>"));
}

TEST(VisitorPage, RedirectParameterIsKeptInTheForm) {
  AdmissionForm form = Form(Ask::kNothing);
  EXPECT_FALSE(Holds(FormHtml(form), "redirect"));
  form.keeps_redirect = true;
  EXPECT_TRUE(Holds(FormHtml(form), "<input type=\"hidden\" name=\"redirect\" value=\"1\">"));
}

TEST(VisitorPage, NoticeHasNoFormWithoutAButton) {
  NoticePage page;
  page.heading = "Heading";
  page.text = "Text";
  EXPECT_FALSE(Holds(NoticeHtml(page), "<form"));
  EXPECT_FALSE(Holds(NoticeHtml(page), "<a "));
}

}  // namespace
}  // namespace visitor
