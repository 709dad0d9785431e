#include "sharingurl/request.h"

#include <gtest/gtest.h>

#include <string>
#include <vector>

namespace sharingurl {
namespace {

using Arguments = std::vector<std::string>;

// Empty when the arguments can be used.
std::string Problem(const Arguments& arguments) {
  const auto request = ReadRequest(arguments);
  const std::string* problem = std::get_if<std::string>(&request);
  return problem != nullptr ? *problem : "";
}

TEST(SharingUrlRequest, ArgumentsAreReadInOrder) {
  const Request request = std::get<Request>(ReadRequest({"photo", "9443", "1", "nas:80", "a-B_9"}));
  EXPECT_EQ(request.port, 9443);
  EXPECT_TRUE(request.https);
  ASSERT_TRUE(request.instead);
  EXPECT_EQ(request.instead->host, "nas");
  EXPECT_EQ(request.instead->port, 80);
  EXPECT_EQ(request.hash, "a-B_9");
}

TEST(SharingUrlRequest, AnEmptyAddressIsNone) {
  const Request request = std::get<Request>(ReadRequest({"photo", "0", "0", "", "abc"}));
  EXPECT_EQ(request.port, 0);
  EXPECT_FALSE(request.https);
  EXPECT_FALSE(request.instead);
}

TEST(SharingUrlRequest, FiveArgumentsAreNeeded) {
  Arguments arguments;
  for (const char* next : {"photo", "0", "1", "", "abc"}) {
    EXPECT_EQ(Problem(arguments), "five arguments are needed");
    arguments.emplace_back(next);
  }
  EXPECT_EQ(Problem(arguments), "");
  arguments.emplace_back("");
  EXPECT_EQ(Problem(arguments), "five arguments are needed");
}

TEST(SharingUrlRequest, AnyProjectIsTakenButNoControlCharacters) {
  EXPECT_EQ(Problem({"", "0", "1", "", "abc"}), "");
  EXPECT_EQ(Problem({"M\xc3\xbcll <er> \xff", "0", "1", "", "abc"}), "");
  for (const char c : {'\0', '\n', '\x1b', '\x1f', '\x7f'}) {
    EXPECT_EQ(Problem({std::string("a") + c, "0", "1", "", "abc"}),
              "the project has a control character in its name");
  }
}

TEST(SharingUrlRequest, ThePortIsChecked) {
  EXPECT_EQ(Problem({"p", "65535", "1", "", "abc"}), "");
  for (const char* port : {"", "65536", "-1", "-0", "80x", "2147483648"}) {
    EXPECT_EQ(Problem({"p", port, "1", "", "abc"}), "the port is none of 0 to 65535") << port;
  }
}

TEST(SharingUrlRequest, HttpsIsADigit) {
  for (const char* https : {"", "2", "true", "01", "1 "}) {
    EXPECT_EQ(Problem({"p", "0", https, "", "abc"}), "the third argument is neither 0 nor 1")
        << https;
  }
}

TEST(SharingUrlRequest, AnAddressThatIsNoneIsNotTakenForEmpty) {
  for (const char* address : {" ", "nas/x", "ftp://nas", "nas\nevil"}) {
    EXPECT_EQ(Problem({"p", "0", "1", address, "abc"}),
              "the fourth argument is neither empty nor a host or address")
        << address;
  }
}

TEST(SharingUrlRequest, TheHashIsChecked) {
  for (const char* hash : {"", "ab", "abc/", "abc\n", "ab c", "../abc", "abc?"}) {
    EXPECT_EQ(Problem({"p", "0", "1", "", hash}),
              "the hash is not 3 to 64 letters, digits, - and _")
        << hash;
  }
  EXPECT_EQ(Problem({"p", "0", "1", "", std::string(64, 'a')}), "");
  EXPECT_NE(Problem({"p", "0", "1", "", std::string(65, 'a')}), "");
}

}  // namespace
}  // namespace sharingurl
