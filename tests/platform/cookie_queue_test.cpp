#include "cookie_queue.h"

#include <gtest/gtest.h>

#include <cstdio>
#include <cstdlib>
#include <string>

namespace tuvo_platform {
namespace {

struct Written {
  int result = 0;
  std::string text;
};

Written Write(CookieQueue* queue, const char* name = nullptr, bool secure = false) {
  Written written;
  char* data = nullptr;
  size_t size = 0;
  std::FILE* out = open_memstream(&data, &size);
  written.result = queue->Write(name, secure, out);
  std::fclose(out);
  written.text.assign(data, size);
  std::free(data);
  return written;
}

TEST(CookieQueue, LineHasItsAttributes) {
  CookieQueue queue;
  ASSERT_TRUE(queue.Set("id", "abc", "/"));
  const Written written = Write(&queue);
  EXPECT_EQ(written.result, 1);
  EXPECT_EQ(written.text, "Set-Cookie: id=abc; Path=/; HttpOnly; SameSite=Lax\r\n");
}

TEST(CookieQueue, SecureIsAddedUnderHttps) {
  CookieQueue queue;
  ASSERT_TRUE(queue.Set("id", "abc", "/x"));
  EXPECT_EQ(Write(&queue, nullptr, true).text,
            "Set-Cookie: id=abc; Path=/x; HttpOnly; SameSite=Lax; Secure\r\n");
}

TEST(CookieQueue, WrittenCookiesAreForgotten) {
  CookieQueue queue;
  ASSERT_TRUE(queue.Set("id", "abc", "/"));
  Write(&queue);
  const Written again = Write(&queue);
  EXPECT_EQ(again.result, 0);
  EXPECT_EQ(again.text, "");
}

TEST(CookieQueue, OnlyTheNamedCookieIsWrittenAndForgotten) {
  CookieQueue queue;
  ASSERT_TRUE(queue.Set("a", "1", "/"));
  ASSERT_TRUE(queue.Set("b", "2", "/"));
  ASSERT_TRUE(queue.Set("a", "3", "/other"));
  EXPECT_EQ(Write(&queue, "c").result, 0);
  const Written named = Write(&queue, "a");
  EXPECT_EQ(named.result, 2);
  EXPECT_EQ(named.text,
            "Set-Cookie: a=1; Path=/; HttpOnly; SameSite=Lax\r\n"
            "Set-Cookie: a=3; Path=/other; HttpOnly; SameSite=Lax\r\n");
  EXPECT_EQ(Write(&queue).text, "Set-Cookie: b=2; Path=/; HttpOnly; SameSite=Lax\r\n");
}

TEST(CookieQueue, SameNameAndPathReplaces) {
  CookieQueue queue;
  ASSERT_TRUE(queue.Set("a", "1", "/"));
  ASSERT_TRUE(queue.Set("a", "2", "/"));
  EXPECT_EQ(Write(&queue).text, "Set-Cookie: a=2; Path=/; HttpOnly; SameSite=Lax\r\n");
}

TEST(CookieQueue, EveryCookieOctetIsAccepted) {
  CookieQueue queue;
  std::string octets;
  for (char c = '!'; c <= '~'; ++c) {
    if (std::string("\",;\\").find(c) == std::string::npos) {
      octets.push_back(c);
    }
  }
  ASSERT_EQ(octets.size(), 90u);
  EXPECT_TRUE(queue.Set("a", octets, "/"));
  EXPECT_TRUE(queue.Set("b", "", "/"));
}

TEST(CookieQueue, BadTextsAreRefusedAndChangeNothing) {
  CookieQueue queue;
  ASSERT_TRUE(queue.Set("a", "1", "/"));
  for (const char* value :
       {"x y", "x;y", "x,y", "x\"y", "x\\y", "x\r\nSet-Cookie: b=2", "x\ty", "\x7f", "\xc3\xa4"}) {
    EXPECT_FALSE(queue.Set("a", value, "/")) << value;
  }
  for (const char* name : {"", "a b", "a=b", "a;b", "a\r\n", "a:b", "a/b", "\"a\"", "\xc3\xa4"}) {
    EXPECT_FALSE(queue.Set(name, "1", "/")) << name;
  }
  for (const char* path : {"", "x", "/;Domain=x", "/\r\nX: y", "/\t", "/\x7f", "/\xc3\xa4"}) {
    EXPECT_FALSE(queue.Set("a", "2", path)) << path;
  }
  EXPECT_EQ(Write(&queue).text, "Set-Cookie: a=1; Path=/; HttpOnly; SameSite=Lax\r\n");
}

TEST(CookieQueue, WriteErrorKeepsTheCookies) {
  CookieQueue queue;
  ASSERT_TRUE(queue.Set("a", "1", "/"));
  std::FILE* full = std::fopen("/dev/full", "w");
  ASSERT_NE(full, nullptr);
  EXPECT_EQ(queue.Write(nullptr, false, full), -1);
  std::fclose(full);
  EXPECT_EQ(Write(&queue).result, 1);
}

}  // namespace
}  // namespace tuvo_platform
