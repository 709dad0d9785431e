#include "cgi_request.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <map>
#include <string>
#include <string_view>

namespace tuvo_platform {
namespace {

using std::string_literals::operator""s;

// A request as a web server would hand it over; notes how much of the body was asked for.
class Request {
 public:
  Request& Set(const std::string& name, const std::string& value) {
    environment_[name] = value;
    return *this;
  }

  // A body with its type and its true length.
  Request& Body(const std::string& type, const std::string& body) {
    body_ = body;
    return Set("CONTENT_TYPE", type).Set("CONTENT_LENGTH", std::to_string(body.size()));
  }

  std::optional<CgiRequest> Parse() {
    return ParseCgiRequest(
        [this](const char* name) -> std::optional<std::string_view> {
          const auto found = environment_.find(name);
          if (found == environment_.end()) {
            return std::nullopt;
          }
          return found->second;
        },
        [this](char* data, size_t length) -> size_t {
          largest_read_ = std::max(largest_read_, length);
          const size_t count = std::min({length, chunk_, body_.size() - taken_});
          std::copy_n(body_.data() + taken_, count, data);
          taken_ += count;
          return count;
        });
  }

  // The value of a parameter, "(none)" without it, "(refused)" for a request that does not parse.
  std::string Param(const char* name) {
    const std::optional<CgiRequest> request = Parse();
    if (!request) {
      return "(refused)";
    }
    const char* value = FindCgiField(request->fields, name);
    return value == nullptr ? "(none)" : value;
  }

  void set_chunk(size_t chunk) { chunk_ = chunk; }
  size_t taken() const { return taken_; }
  size_t largest_read() const { return largest_read_; }

 private:
  std::map<std::string, std::string> environment_;
  std::string body_;
  size_t chunk_ = 4096;
  size_t taken_ = 0;
  size_t largest_read_ = 0;
};

constexpr char kUrlEncoded[] = "application/x-www-form-urlencoded";
constexpr char kMultipart[] = "multipart/form-data; boundary=XyZ";

Request Get(const std::string& query) {
  return Request().Set("REQUEST_METHOD", "GET").Set("QUERY_STRING", query);
}

Request Post(const std::string& type, const std::string& body) {
  return Request().Set("REQUEST_METHOD", "POST").Body(type, body);
}

std::string MultipartField(const std::string& name, const std::string& value) {
  return "--XyZ\r\nContent-Disposition: form-data; name=\"" + name + "\"\r\n\r\n" + value + "\r\n";
}

const std::string kMultipartEnd = "--XyZ--\r\n";

TEST(CgiRequest, QueryStringIsDecoded) {
  Request request = Get("name=J%C3%BCrgen+M&empty=&bare&a=b=c");
  EXPECT_EQ(request.Param("name"), "J\xc3\xbcrgen M");
  EXPECT_EQ(request.Param("empty"), "");
  EXPECT_EQ(request.Param("bare"), "");
  EXPECT_EQ(request.Param("a"), "b=c");
  EXPECT_EQ(request.Param("other"), "(none)");
}

TEST(CgiRequest, NamesAreDecodedAndComparedExactly) {
  EXPECT_EQ(Get("%5Fsid=1").Param("_sid"), "1");
  EXPECT_EQ(Get("_SID=1").Param("_sid"), "(none)");
}

TEST(CgiRequest, FirstOfEqualNamesWins) {
  EXPECT_EQ(Get("a=1&a=2").Param("a"), "1");
}

TEST(CgiRequest, SemicolonDoesNotEndAValue) {
  EXPECT_EQ(Get("password=a;b").Param("password"), "a;b");
  EXPECT_EQ(Post(kUrlEncoded, "password=a;b").Param("password"), "a;b");
}

TEST(CgiRequest, LastFieldWithoutEqualsSignIsKept) {
  EXPECT_EQ(Get("a=1&b").Param("b"), "");
}

TEST(CgiRequest, UrlEncodedBodyIsRead) {
  Request request = Post(kUrlEncoded, "user=alice&password=a%26b%3D%2B+c%25");
  EXPECT_EQ(request.Param("user"), "alice");
  request = Post(kUrlEncoded, "user=alice&password=a%26b%3D%2B+c%25");
  EXPECT_EQ(request.Param("password"), "a&b=+ c%");
}

TEST(CgiRequest, TypesAreComparedWithoutParametersAndCase) {
  EXPECT_EQ(Post("Application/X-WWW-Form-UrlEncoded ; charset=UTF-8", "a=1").Param("a"), "1");
  EXPECT_EQ(Post("MULTIPART/Form-Data; boundary=\"XyZ\"", MultipartField("a", "1") + kMultipartEnd)
                .Param("a"),
            "1");
}

TEST(CgiRequest, BodyWithoutTypeIsUrlEncoded) {
  EXPECT_EQ(Post("", "a=1").Param("a"), "1");
}

TEST(CgiRequest, PutHasABodyToo) {
  EXPECT_EQ(Request().Set("REQUEST_METHOD", "PUT").Body(kUrlEncoded, "a=1").Param("a"), "1");
}

TEST(CgiRequest, BodyInPiecesIsReadWhole) {
  Request request = Post(kUrlEncoded, "a=1&b=" + std::string(1000, 'x'));
  request.set_chunk(7);
  EXPECT_EQ(request.Param("b"), std::string(1000, 'x'));
}

TEST(CgiRequest, MultipartBodyIsRead) {
  const std::string body = MultipartField("a", "%41+b;c") +
                           "--XyZ\r\nContent-Disposition: form-data; name=\"f\"; "
                           "filename=\"f.bin\"\r\nContent-Type: application/octet-stream\r\n\r\n" +
                           "\0\1\2\r\n"s + "\r\n" + MultipartField("b", "1\r\n2") + kMultipartEnd;
  EXPECT_EQ(Post(kMultipart, body).Param("a"), "%41+b;c");
  EXPECT_EQ(Post(kMultipart, body).Param("b"), "1\r\n2");
  EXPECT_EQ(Post(kMultipart, body).Param("f"), "(none)");
}

TEST(CgiRequest, BoundaryOfManyKindsOfCharactersIsUnderstood) {
  const std::string boundary = "----'()+_,-./:=?Az09--";
  const std::string body =
      "--" + boundary + "\r\nContent-Disposition: form-data; name=\"a\"\r\n\r\n1\r\n--" + boundary +
      "\r\nContent-Disposition: form-data; name=\"b\"\r\n\r\n\r\n--" + boundary + "--\r\n";
  EXPECT_EQ(Post("multipart/form-data; boundary=\"" + boundary + "\"", body).Param("a"), "1");
  EXPECT_EQ(Post("multipart/form-data; boundary=\"" + boundary + "\"", body).Param("b"), "");
}

TEST(CgiRequest, MultipartOfFilesAloneHasNoFields) {
  const std::string body =
      "--XyZ\r\nContent-Disposition: form-data; name=\"f\"; filename=\"f\"\r\n\r\nx\r\n" +
      kMultipartEnd;
  const std::optional<CgiRequest> request = Post(kMultipart, body).Parse();
  ASSERT_TRUE(request);
  EXPECT_TRUE(request->fields.empty());
}

TEST(CgiRequest, BodyFieldsComeBeforeQueryFields) {
  EXPECT_EQ(Post(kUrlEncoded, "a=body").Set("QUERY_STRING", "a=query&b=2").Param("a"), "body");
  EXPECT_EQ(Post(kUrlEncoded, "a=body").Set("QUERY_STRING", "a=query&b=2").Param("b"), "2");
  EXPECT_EQ(Post(kMultipart, MultipartField("a", "body") + kMultipartEnd)
                .Set("QUERY_STRING", "a=query")
                .Param("a"),
            "body");
}

TEST(CgiRequest, OtherMethodsHaveNoBodyRead) {
  for (const char* method : {"GET", "HEAD", "DELETE", "OPTIONS", "post", "POSTX", ""}) {
    Request request =
        Request().Set("REQUEST_METHOD", method).Set("QUERY_STRING", "b=2").Body(kUrlEncoded, "a=1");
    EXPECT_EQ(request.Param("a"), "(none)") << method;
    EXPECT_EQ(request.Param("b"), "2") << method;
    EXPECT_EQ(request.taken(), 0u) << method;
  }
}

TEST(CgiRequest, OtherMethodsLengthsAreNotLookedAt) {
  EXPECT_EQ(Get("b=2").Set("CONTENT_LENGTH", "no number").Param("b"), "2");
  EXPECT_EQ(Get("b=2").Set("CONTENT_LENGTH", "10485760").Param("b"), "2");
}

TEST(CgiRequest, BodiesOfOtherTypesAreLeftUnread) {
  for (const char* type : {"application/json", "text/plain", "application/x-www-form-urlencodedx",
                           "multipart/form-datax; boundary=XyZ", "multipart/mixed; boundary=XyZ"}) {
    Request request = Post(type, "a=1").Set("QUERY_STRING", "b=2");
    EXPECT_EQ(request.Param("a"), "(none)") << type;
    EXPECT_EQ(request.Param("b"), "2") << type;
    EXPECT_EQ(request.taken(), 0u) << type;
  }
}

TEST(CgiRequest, NothingBeyondTheContentLengthIsRead) {
  Request request = Post(kUrlEncoded, "a=1&b=2").Set("CONTENT_LENGTH", "3");
  EXPECT_EQ(request.Param("b"), "(none)");
  EXPECT_EQ(request.taken(), 3u);
}

TEST(CgiRequest, MissingOrEmptyContentLengthIsNoBody) {
  EXPECT_EQ(Post(kUrlEncoded, "a=1").Set("CONTENT_LENGTH", "").Param("a"), "(none)");
  EXPECT_EQ(Request().Set("REQUEST_METHOD", "POST").Set("CONTENT_TYPE", kUrlEncoded).Param("a"),
            "(none)");
}

TEST(CgiRequest, BadContentLengthsAreRefused) {
  for (const char* length : {"-1", "+3", " 3", "3 ", "3x", "0x3", "3.0", "x",
                             "18446744073709551619", "99999999999999999999999999"}) {
    Request request = Post(kUrlEncoded, "a=1").Set("CONTENT_LENGTH", length);
    EXPECT_FALSE(request.Parse()) << length;
    EXPECT_EQ(request.taken(), 0u) << length;
  }
}

TEST(CgiRequest, BodyShorterThanItsLengthIsRefused) {
  EXPECT_FALSE(Post(kUrlEncoded, "a=1").Set("CONTENT_LENGTH", "4").Parse());
  EXPECT_FALSE(Post(kMultipart, MultipartField("a", "1") + kMultipartEnd)
                   .Set("CONTENT_LENGTH", "1000")
                   .Parse());
}

TEST(CgiRequest, UrlEncodedBodyUpToItsLimitIsAccepted) {
  const std::string value(kMaxUrlEncodedBody - 2, 'x');
  EXPECT_EQ(Post(kUrlEncoded, "a=" + value).Param("a"), value);
  Request over = Post(kUrlEncoded, "a=" + value + "x");
  EXPECT_FALSE(over.Parse());
  EXPECT_EQ(over.taken(), 0u);
}

TEST(CgiRequest, MultipartBodyUpToItsLimitIsAccepted) {
  const size_t frame = (MultipartField("a", "") + kMultipartEnd).size();
  const std::string value(kMaxMultipartBody - frame, 'x');
  EXPECT_EQ(Post(kMultipart, MultipartField("a", value) + kMultipartEnd).Param("a"), value);
  Request over = Post(kMultipart, MultipartField("a", value + "x") + kMultipartEnd);
  EXPECT_FALSE(over.Parse());
  EXPECT_EQ(over.taken(), 0u);
}

TEST(CgiRequest, HugeBodyIsRefusedUnread) {
  for (const char* type : {kUrlEncoded, kMultipart, ""}) {
    Request request = Post(type, "a=1").Set("CONTENT_LENGTH", "10485760");
    EXPECT_FALSE(request.Parse()) << type;
    EXPECT_EQ(request.largest_read(), 0u) << type;
  }
}

TEST(CgiRequest, QueryStringUpToItsLimitIsAccepted) {
  const std::string value(kMaxQueryString - 2, 'x');
  EXPECT_EQ(Get("a=" + value).Param("a"), value);
  EXPECT_FALSE(Get("a=" + value + "x").Parse());
}

TEST(CgiRequest, CookieHeaderUpToItsLimitIsAccepted) {
  const std::string value(kMaxCookieHeader - 2, 'x');
  const std::optional<CgiRequest> request = Get("").Set("HTTP_COOKIE", "a=" + value).Parse();
  ASSERT_TRUE(request);
  EXPECT_EQ(FindCgiField(request->cookies, "a"), value);
  EXPECT_FALSE(Get("").Set("HTTP_COOKIE", "a=" + value + "x").Parse());
}

TEST(CgiRequest, FieldsOfBodyAndQueryShareOneLimit) {
  std::string body;
  for (size_t i = 0; i < kMaxFields - 1; ++i) {
    body += "a=" + std::to_string(i) + "&";
  }
  const std::optional<CgiRequest> full = Post(kUrlEncoded, body).Set("QUERY_STRING", "b").Parse();
  ASSERT_TRUE(full);
  EXPECT_EQ(full->fields.size(), kMaxFields);
  EXPECT_FALSE(Post(kUrlEncoded, body).Set("QUERY_STRING", "b&c").Parse());
  EXPECT_FALSE(Get(body + "b&c").Parse());
}

TEST(CgiRequest, ZeroBytesAreRefusedWhereTheyEnter) {
  EXPECT_FALSE(Get("a=x%00y").Parse());
  EXPECT_FALSE(Get("a%00=x").Parse());
  EXPECT_FALSE(Get("a=\0"s).Parse());
  EXPECT_FALSE(Post(kUrlEncoded, "a=%00").Parse());
  EXPECT_FALSE(Post(kUrlEncoded, "a=\0"s).Parse());
  EXPECT_FALSE(Post(kMultipart, MultipartField("a", "x\0y"s) + kMultipartEnd).Parse());
  EXPECT_FALSE(Get("").Set("HTTP_COOKIE", "a=x\0y"s).Parse());
}

TEST(CgiRequest, BadEscapesAreRefused) {
  EXPECT_FALSE(Get("a=%").Parse());
  EXPECT_FALSE(Post(kUrlEncoded, "a=%4").Parse());
  EXPECT_FALSE(Post(kUrlEncoded, "a=1").Set("QUERY_STRING", "a=%zz").Parse());
}

TEST(CgiRequest, MalformedMultipartIsRefused) {
  EXPECT_FALSE(Post(kMultipart, "a=1").Parse());
  EXPECT_FALSE(Post(kMultipart, "").Parse());
  EXPECT_FALSE(Post(kMultipart, MultipartField("a", "1")).Parse());
  EXPECT_FALSE(Post("multipart/form-data", MultipartField("a", "1") + kMultipartEnd).Parse());
  EXPECT_FALSE(
      Post("multipart/form-data; boundary=", MultipartField("a", "1") + kMultipartEnd).Parse());
}

TEST(CgiRequest, WithoutMethodThereIsAnEmptyRequest) {
  Request request = Request()
                        .Set("QUERY_STRING", "a=%00")
                        .Set("HTTP_COOKIE", std::string(100000, 'x'))
                        .Set("HTTPS", "on")
                        .Body(kUrlEncoded, "a=1");
  const std::optional<CgiRequest> parsed = request.Parse();
  ASSERT_TRUE(parsed);
  EXPECT_TRUE(parsed->fields.empty());
  EXPECT_TRUE(parsed->cookies.empty());
  EXPECT_FALSE(parsed->https);
  EXPECT_EQ(request.taken(), 0u);
}

TEST(CgiRequest, HttpsIsOnOrOne) {
  for (const char* value : {"on", "ON", "1"}) {
    EXPECT_TRUE(Get("").Set("HTTPS", value).Parse()->https) << value;
  }
  for (const char* value : {"", "off", "0", "yes", "11"}) {
    EXPECT_FALSE(Get("").Set("HTTPS", value).Parse()->https) << value;
  }
  EXPECT_FALSE(Get("").Parse()->https);
}

TEST(CgiRequest, CookiesAreParsed) {
  const std::optional<CgiRequest> request =
      Get("").Set("HTTP_COOKIE", "id=\"abc\"; id=def; sharing_sid=%41").Parse();
  ASSERT_TRUE(request);
  EXPECT_STREQ(FindCgiField(request->cookies, "id"), "abc");
  EXPECT_STREQ(FindCgiField(request->cookies, "sharing_sid"), "%41");
  EXPECT_EQ(FindCgiField(request->cookies, "other"), nullptr);
}

TEST(CgiRequest, AnyByteButZeroSurvivesBothEncodings) {
  std::string all;
  std::string escaped;
  for (int c = 1; c < 256; ++c) {
    char hex[4];
    std::snprintf(hex, sizeof hex, "%%%02x", c);
    escaped += hex;
    all.push_back(static_cast<char>(c));
  }
  EXPECT_EQ(Post(kUrlEncoded, "a=" + escaped).Param("a"), all);
  EXPECT_EQ(Post(kMultipart, MultipartField("a", all) + kMultipartEnd).Param("a"), all);
}

}  // namespace
}  // namespace tuvo_platform
