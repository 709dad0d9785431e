#include "cgi_multipart.h"

#include <gtest/gtest.h>

#include <string>
#include <string_view>

namespace tuvo_platform {
namespace {

constexpr char kBoundary[] = "XyZ";
constexpr char kRefused[] = "refused";

std::string Clean(std::string_view body) {
  size_t fields_left = 100;
  return CleanMultipart(body, kBoundary, &fields_left).value_or(kRefused);
}

// A part with its leading delimiter.
std::string Part(const std::string& headers, const std::string& value) {
  return "--XyZ\r\n" + headers + "\r\n\r\n" + value + "\r\n";
}

std::string Field(const std::string& name, const std::string& value) {
  return Part("Content-Disposition: form-data; name=\"" + name + "\"", value);
}

constexpr char kEnd[] = "--XyZ--\r\n";

TEST(CgiMultipart, FieldsAreKeptInOrder) {
  const std::string body = Field("a", "1") + Field("b", "two\r\nlines") + Field("a", "") + kEnd;
  EXPECT_EQ(Clean(body), body);
}

TEST(CgiMultipart, FilesAreLeftOut) {
  const std::string file = Part(
      "Content-Disposition: form-data; name=\"f\"; filename=\"x.txt\"\r\n"
      "Content-Type: text/plain",
      std::string("any\0bytes", 9));
  EXPECT_EQ(Clean(Field("a", "1") + file + Field("b", "2") + kEnd),
            Field("a", "1") + Field("b", "2") + kEnd);
}

TEST(CgiMultipart, EveryKindOfFileNameMakesAFile) {
  for (const char* parameter : {"filename=\"\"", "filename=x", "filename*=UTF-8''x",
                                "FILENAME=\"x\"", "filename=\"a\\\"b\""}) {
    const std::string file =
        Part(std::string("Content-Disposition: form-data; name=\"f\"; ") + parameter, "x");
    EXPECT_EQ(Clean(file + Field("b", "2") + kEnd), Field("b", "2") + kEnd) << parameter;
  }
}

TEST(CgiMultipart, FileNameBeforeTheNameDoesNotBecomeTheName) {
  EXPECT_EQ(Clean(Part("Content-Disposition: form-data; filename=\"a\"; name=\"b\"", "1") + kEnd),
            "");
}

TEST(CgiMultipart, HeadersAreFoundInAnyCaseAndOrder) {
  const std::string part =
      Part("Content-Type: text/plain\r\ncontent-disposition:FORM-DATA ;\tNAME = \"a\" ;x=y", "1");
  EXPECT_EQ(Clean(part + kEnd), Field("a", "1") + kEnd);
}

TEST(CgiMultipart, NameMayComeWithoutQuotes) {
  EXPECT_EQ(Clean(Part("Content-Disposition: form-data; name=a", "1") + kEnd),
            Field("a", "1") + kEnd);
}

TEST(CgiMultipart, NameInAnotherHeaderIsNotTheName) {
  EXPECT_EQ(
      Clean(Part("X-Other: name=\"evil\"\r\nContent-Disposition: form-data; name=\"a\"", "1") +
            kEnd),
      Field("a", "1") + kEnd);
}

TEST(CgiMultipart, LastLineEndMayBeMissing) {
  EXPECT_EQ(Clean(Field("a", "1") + "--XyZ--"), Field("a", "1") + kEnd);
}

TEST(CgiMultipart, FormWithoutFieldsIsEmpty) {
  EXPECT_EQ(Clean(kEnd), "");
  EXPECT_EQ(Clean("--XyZ--"), "");
}

TEST(CgiMultipart, MalformedBodiesAreRefused) {
  const std::string field = Field("a", "1");
  const std::string bodies[] = {
      "",
      "a=1",
      "\r\n" + field + kEnd,                     // text before the first delimiter
      field,                                     // no end
      field + "--XyZ",                           // nor here
      field + "--XyZ-",                          //
      field + "--XyZ--x",                        // text after the end
      field + kEnd + field,                      //
      field + kEnd + "\r\n",                     //
      field + "--XyZ \r\n" + kEnd,               // padded delimiter
      "--XyZ\r\n" + std::string(kEnd),           // no part between delimiters
      "--XyZ\r\n\r\n" + std::string(kEnd),       //
      "--XyZ\r\n\r\n1\r\n" + std::string(kEnd),  // no headers
      "--XyZ\r\nContent-Disposition: form-data; name=\"a\"\r\n" + std::string(kEnd),
      "--XyZ\nContent-Disposition: form-data; name=\"a\"\n\n1\n--XyZ--\n",
      Part("Content-Type: text/plain", "1") + kEnd,        // no disposition
      Part("Content-Disposition: form-data", "1") + kEnd,  // no name
      Part("Content-Disposition: form-data; name", "1") + kEnd,
      Part("Content-Disposition: form-data; name=\"a", "1") + kEnd,
      Part("Content-Disposition: form-data; name=\"a\"b", "1") + kEnd,
      Part("Content-Disposition: form-data; name=\"a\"; name=\"b\"", "1") + kEnd,
      Part("Content-Disposition: attachment; name=\"a\"", "1") + kEnd,
      Part("Content-Disposition: form-data; name=\"a\"\r\n"
           "Content-Disposition: form-data; name=\"b\"",
           "1") +
          kEnd,
      Part("Content-Disposition: form-data; name=\"a\\\"b\"", "1") + kEnd,  // a quote in the name
      Field("a", "1--XyZ") + kEnd,       // the delimiter inside a value
      Field("--XyZ", "1") + kEnd,        // and inside a name
      Field("a", "1\r\n--XyZa") + kEnd,  // a line that begins like one
  };
  for (const std::string& body : bodies) {
    EXPECT_EQ(Clean(body), kRefused) << body;
  }
}

TEST(CgiMultipart, ZeroBytesInFieldsAreRefused) {
  EXPECT_EQ(Clean(Field("a", std::string("x\0y", 3)) + kEnd), kRefused);
  EXPECT_EQ(Clean(Field(std::string("a\0", 2), "x") + kEnd), kRefused);
  EXPECT_EQ(Clean(Part(std::string("X: \0\r\nContent-Disposition: form-data; name=\"a\"", 46), "") +
                  kEnd),
            kRefused);
}

TEST(CgiMultipart, FilesCountAmongTheFields) {
  const std::string file = Part("Content-Disposition: form-data; name=\"f\"; filename=\"x\"", "x");
  size_t fields_left = 2;
  EXPECT_TRUE(CleanMultipart(file + Field("a", "1") + kEnd, kBoundary, &fields_left));
  EXPECT_EQ(fields_left, 0u);
  fields_left = 2;
  EXPECT_FALSE(
      CleanMultipart(file + Field("a", "1") + Field("b", "") + kEnd, kBoundary, &fields_left));
}

TEST(CgiMultipart, BoundaryIsFoundAmongTheParameters) {
  EXPECT_EQ(MultipartBoundary("multipart/form-data; boundary=----WebKitFormBoundaryAbC"),
            "----WebKitFormBoundaryAbC");
  EXPECT_EQ(MultipartBoundary("multipart/form-data;charset=utf-8;Boundary = \"a=b?c\" ; x=y"),
            "a=b?c");
  EXPECT_EQ(MultipartBoundary("multipart/form-data; boundary=" + std::string(70, 'x')),
            std::string(70, 'x'));
}

TEST(CgiMultipart, BadBoundariesAreRefused) {
  for (const std::string& parameters :
       {std::string(), std::string(";"), std::string("; boundary"), std::string("; boundary="),
        std::string("; boundary=\"\""), std::string("; boundary=\"a"),
        std::string("; boundary=a b"), std::string("; boundary=a\r\nb"),
        std::string("; boundary=\xc3\xa4"), std::string("; xboundary=a"),
        "; boundary=" + std::string(71, 'x')}) {
    EXPECT_FALSE(MultipartBoundary("multipart/form-data" + parameters)) << parameters;
  }
}

TEST(CgiMultipart, BoundaryOfDashesAloneIsRefused) {
  EXPECT_FALSE(MultipartBoundary("multipart/form-data; boundary=-"));
  EXPECT_FALSE(MultipartBoundary("multipart/form-data; boundary=\"" + std::string(70, '-') + "\""));
  EXPECT_EQ(MultipartBoundary("multipart/form-data; boundary=-x-"), "-x-");
}

}  // namespace
}  // namespace tuvo_platform
