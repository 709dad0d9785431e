#include "visitor/content_type.h"

#include <gtest/gtest.h>

#include <sstream>

namespace visitor {
namespace {

constexpr const char* kList =
    "# types\n"
    "text/plain\t\ttxt text  LOG\n"
    "application/gzip gz # not txt2\n"
    "application/x-nothing\n"
    "not a type bad1\n"
    "a/b/c bad2\n"
    "text/html html";

std::string TypeOf(const char* name) {
  std::istringstream list(kList);
  return ContentTypeOf(name, list);
}

TEST(VisitorContentType, IsThatOfTheLastExtension) {
  EXPECT_EQ(TypeOf("a.txt"), "text/plain");
  EXPECT_EQ(TypeOf("a.tar.gz"), "application/gzip");
  EXPECT_EQ(TypeOf("a.gz.html"), "text/html");
}

TEST(VisitorContentType, CaseDoesNotMatter) {
  EXPECT_EQ(TypeOf("A.TXT"), "text/plain");
  EXPECT_EQ(TypeOf("a.log"), "text/plain");
}

TEST(VisitorContentType, UnknownNamesAreBytes) {
  for (const char* name : {"", "a", ".txt", "a.", "a.xyz", "a.txt2", "txt", "a.b c"}) {
    EXPECT_EQ(TypeOf(name), "application/octet-stream") << name;
  }
}

TEST(VisitorContentType, WordsThatAreNoTypeAreNotTaken) {
  EXPECT_EQ(TypeOf("a.bad1"), "application/octet-stream");
  EXPECT_EQ(TypeOf("a.bad2"), "application/octet-stream");
}

TEST(VisitorContentType, MissingListIsNoError) {
  std::istringstream empty;
  EXPECT_EQ(ContentTypeOf("a.txt", empty), "application/octet-stream");
}

TEST(VisitorContentType, SystemsListIsRead) {
  EXPECT_EQ(ContentTypeOf("a.pdf"), "application/pdf");
}

}  // namespace
}  // namespace visitor
