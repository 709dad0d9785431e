#include "webapi/http_request.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <cstdlib>
#include <cstring>
#include <map>

namespace webapi {
namespace {

constexpr const char* kBody = R"({"api":"A","version":1,"method":"m","x":2})";

// A body in pieces of few bytes, as a network brings it; counts what is read of it.
class Body : public common::Exchange {
 public:
  explicit Body(std::string text) : text_(std::move(text)) {}

  size_t Read(char* data, size_t size) override {
    const size_t count = std::min({size, size_t{5}, text_.size() - read_});
    std::memcpy(data, text_.data() + read_, count);
    read_ += count;
    return count;
  }
  bool Write(std::string_view /*bytes*/) override { return true; }
  bool WriteFile(int /*fd*/, std::int64_t /*offset*/, std::int64_t /*length*/) override {
    return true;
  }
  bool Finish() override { return true; }

  size_t read() const { return read_; }

 private:
  std::string text_;
  size_t read_ = 0;
};

class WebapiHttpRequest : public testing::Test {
 protected:
  WebapiHttpRequest() {
    clearenv();
    Set({{"REQUEST_METHOD", "POST"},
         {"CONTENT_TYPE", "application/json"},
         {"CONTENT_LENGTH", std::to_string(std::strlen(kBody))},
         {"REMOTE_ADDR", "::ffff:192.0.2.1"},
         {"REMOTE_USER", "alice"},
         {"HTTP_HOST", "nas"},
         {"SERVER_PORT", "5000"}});
  }

  static void Set(const std::map<std::string, std::string>& variables) {
    for (const auto& [name, value] : variables) {
      setenv(name.c_str(), value.c_str(), 1);
    }
  }

  // Reads the request; the code of the problem, or 0.
  int Read(const std::string& body = kBody) {
    Body exchange(body);
    call_ = Call();
    const owner::MaybeProblem problem = ReadHttpCall(exchange, &call_);
    read_ = exchange.read();
    return problem ? static_cast<int>(problem->error) : 0;
  }

  Call call_;
  size_t read_ = 0;
};

TEST_F(WebapiHttpRequest, PostsBodyIsTheRequest) {
  ASSERT_EQ(Read(), 0);
  EXPECT_EQ(call_.api, "A");
  EXPECT_EQ(call_.arguments["x"], 2);
  EXPECT_FALSE(call_.texts);
  EXPECT_TRUE(call_.may_change);
}

TEST_F(WebapiHttpRequest, GetsQueryIsTheRequest) {
  for (const char* method : {"GET", "HEAD"}) {
    Set({{"REQUEST_METHOD", method}, {"QUERY_STRING", "api=A&version=1&method=m&x=2"}});
    ASSERT_EQ(Read(), 0);
    EXPECT_EQ(call_.arguments["x"], "2");
    EXPECT_TRUE(call_.texts);
    EXPECT_FALSE(call_.may_change);
    EXPECT_EQ(read_, 0U);
  }
}

TEST_F(WebapiHttpRequest, OtherMethodsAreNotUnderstood) {
  for (const char* method : {"PUT", "DELETE", "OPTIONS", "get", "POST ", ""}) {
    Set({{"REQUEST_METHOD", method}});
    EXPECT_EQ(Read(), 107) << method;
  }
  unsetenv("REQUEST_METHOD");
  EXPECT_EQ(Read(), 107);
}

TEST_F(WebapiHttpRequest, CircumstancesAreTheWebServers) {
  ASSERT_EQ(Read(), 0);
  EXPECT_EQ(call_.address, "192.0.2.1");
  EXPECT_EQ(call_.place.port, 5000);
  EXPECT_FALSE(call_.place.https);
  EXPECT_TRUE(call_.same_origin);
  ASSERT_TRUE(call_.account);
  EXPECT_EQ(call_.account->uid, 2001U);
}

TEST_F(WebapiHttpRequest, HttpsIsAnyValueButOff) {
  const std::map<std::string, bool> rows = {{"on", true}, {"1", true}, {"off", false}, {"", false}};
  for (const auto& [text, https] : rows) {
    Set({{"HTTPS", text}});
    ASSERT_EQ(Read(), 0);
    EXPECT_EQ(call_.place.https, https) << text;
  }
}

TEST_F(WebapiHttpRequest, PortThatIsNoneIsTheUsualOne) {
  for (const char* port : {"", "x", "-1", "65536", "99999999999999999999", "80 "}) {
    Set({{"SERVER_PORT", port}});
    ASSERT_EQ(Read(), 0);
    EXPECT_EQ(call_.place.port, 0) << port;
  }
  Set({{"SERVER_PORT", "65535"}});
  ASSERT_EQ(Read(), 0);
  EXPECT_EQ(call_.place.port, 65535);
}

TEST_F(WebapiHttpRequest, AccountIsOneThatTheSystemKnows) {
  for (const char* user : {"", "no-such", "alice\n", "2001"}) {
    Set({{"REMOTE_USER", user}});
    ASSERT_EQ(Read(), 0);
    EXPECT_FALSE(call_.account) << user;
  }
  unsetenv("REMOTE_USER");
  ASSERT_EQ(Read(), 0);
  EXPECT_FALSE(call_.account);
}

TEST_F(WebapiHttpRequest, AddressThatIsNoneIsEmpty) {
  Set({{"REMOTE_ADDR", "x\ny"}});
  ASSERT_EQ(Read(), 0);
  EXPECT_EQ(call_.address, "");
}

TEST_F(WebapiHttpRequest, OriginOfAnotherSiteIsNoticed) {
  Set({{"HTTP_ORIGIN", "http://nas"}});
  ASSERT_EQ(Read(), 0);
  EXPECT_TRUE(call_.same_origin);
  Set({{"HTTP_ORIGIN", "null"}});
  ASSERT_EQ(Read(), 0);
  EXPECT_FALSE(call_.same_origin);
  unsetenv("HTTP_ORIGIN");
  Set({{"HTTP_SEC_FETCH_SITE", "cross-site"}});
  ASSERT_EQ(Read(), 0);
  EXPECT_FALSE(call_.same_origin);
}

TEST_F(WebapiHttpRequest, BodyIsReadOnlyWhenItIsDeclaredAsJson) {
  for (const char* type : {"", "text/plain", "application/x-www-form-urlencoded",
                           "multipart/form-data", "application/jsonp", "json"}) {
    Set({{"CONTENT_TYPE", type}});
    EXPECT_EQ(Read(), 108) << type;
    EXPECT_EQ(read_, 0U);
  }
  for (const char* type : {"application/json", "APPLICATION/JSON", "application/json;charset=utf-8",
                           "application/json ; charset=utf-8"}) {
    Set({{"CONTENT_TYPE", type}});
    EXPECT_EQ(Read(), 0) << type;
  }
}

TEST_F(WebapiHttpRequest, BodyIsReadOnlyWhenItIsNotTooLarge) {
  for (const char* length : {"262145", "4294967296", "99999999999999999999999"}) {
    Set({{"CONTENT_LENGTH", length}});
    EXPECT_EQ(Read(), 110) << length;
    EXPECT_EQ(read_, 0U);
  }
  const std::string body = kBody + std::string(kLargestRequest - std::strlen(kBody), ' ');
  Set({{"CONTENT_LENGTH", "262144"}});
  EXPECT_EQ(Read(body), 0);
}

TEST_F(WebapiHttpRequest, LengthIsANumber) {
  for (const char* length : {"", "-1", "x", "43 ", "+43", "0x2b"}) {
    Set({{"CONTENT_LENGTH", length}});
    EXPECT_EQ(Read(), 101) << length;
  }
  unsetenv("CONTENT_LENGTH");
  EXPECT_EQ(Read(), 101);
}

TEST_F(WebapiHttpRequest, BodyIsAsLongAsAnnounced) {
  Set({{"CONTENT_LENGTH", std::to_string(std::strlen(kBody) + 1)}});
  EXPECT_EQ(Read(), 101);
  Set({{"CONTENT_LENGTH", std::to_string(std::strlen(kBody))}});
  EXPECT_EQ(Read(std::string(kBody) + "behind"), 0);
  EXPECT_EQ(read_, std::strlen(kBody));
}

TEST_F(WebapiHttpRequest, BodyIsOneJsonObject) {
  for (const std::string body : {"", "[]", "{", "{}", "{\"api\":1}", "{} x"}) {
    Set({{"CONTENT_LENGTH", std::to_string(body.size())}});
    EXPECT_EQ(Read(body), 101) << body;
  }
}

}  // namespace
}  // namespace webapi
