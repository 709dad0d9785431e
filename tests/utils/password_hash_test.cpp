#include <gtest/gtest.h>
#include <tuvosharing/utils.h>

#include <atomic>
#include <string>
#include <thread>
#include <vector>

#include "support/child.h"

namespace {

using TUVO::sharing::MD5HashPassword;
using TUVO::sharing::Sha1WithSaltHashPassword;

constexpr char kMd5OfAbc[] = "900150983cd24fb0d6963f7d28e17f72";
constexpr char kSha1OfAbc[] = "a9993e364706816aba3e25717850c26c9cd0d89d";
constexpr char kSha1OfNothing[] = "da39a3ee5e6b4b0d3255bfef95601890afd80709";

std::string Md5(const std::string& password) {
  std::string out = "before";
  EXPECT_TRUE(MD5HashPassword(password, out));
  return out;
}

std::string Sha1(const std::string& password, const std::string& salt) {
  std::string out = "before";
  EXPECT_TRUE(Sha1WithSaltHashPassword(password, salt, out));
  return out;
}

TEST(MD5HashPassword, GivesTheStandardDigestInLowerCase) {
  EXPECT_EQ(Md5("abc"), kMd5OfAbc);
  EXPECT_EQ(Md5("message digest"), "f96b697d7cb7938d525a2f31aaf161d0");
  // Bytes below 16 keep their leading zero.
  EXPECT_EQ(Md5("a"), "0cc175b9c0f1b6a831c399e269772661");
}

TEST(MD5HashPassword, RefusesAnEmptyPasswordAndLeavesTheOutputAlone) {
  std::string out = "kept";
  EXPECT_FALSE(MD5HashPassword("", out));
  EXPECT_EQ(out, "kept");
}

TEST(MD5HashPassword, EveryByteCounts) {
  EXPECT_EQ(Md5(std::string("\0", 1)), "93b885adfe0da089cdf634904fd59f71");
  EXPECT_NE(Md5(std::string("a\0b", 3)), Md5("a"));
  EXPECT_EQ(Md5("\xff\xfe"), "f3b25701fe362ec84616a93a45ce9998");
}

TEST(MD5HashPassword, MayWriteOverThePasswordItself) {
  std::string text = "abc";
  EXPECT_TRUE(MD5HashPassword(text, text));
  EXPECT_EQ(text, kMd5OfAbc);
}

TEST(Sha1WithSaltHashPassword, GivesTheStandardDigestInLowerCase) {
  EXPECT_EQ(Sha1("abc", ""), kSha1OfAbc);
}

TEST(Sha1WithSaltHashPassword, TheDigestIsOfThePasswordAndThenTheSalt) {
  EXPECT_EQ(Sha1("ab", "c"), kSha1OfAbc);
  EXPECT_EQ(Sha1("", "abc"), kSha1OfAbc);
  EXPECT_NE(Sha1("c", "ab"), kSha1OfAbc);
}

TEST(Sha1WithSaltHashPassword, BothMayBeEmpty) {
  EXPECT_EQ(Sha1("", ""), kSha1OfNothing);
}

TEST(Sha1WithSaltHashPassword, EveryByteCounts) {
  EXPECT_EQ(Sha1(std::string("\0", 1), ""), "5ba93c9db0cff93f52b521d7420e43f6eda2784f");
  EXPECT_EQ(Sha1(std::string("a\0b", 3), "x"), Sha1("a", std::string("\0bx", 3)));
}

TEST(Sha1WithSaltHashPassword, MayWriteOverItsArguments) {
  std::string text = "ab";
  EXPECT_TRUE(Sha1WithSaltHashPassword(text, "c", text));
  EXPECT_EQ(text, kSha1OfAbc);
}

// The first calls of a process, which make libgcrypt ready, are among them.
TEST(PasswordHash, ThreadsMayMakeDigestsAtTheSameTime) {
  EXPECT_EQ(tuvo_test::RunInChild([] {
              std::vector<std::thread> threads;
              std::atomic<int> right{0};
              for (int i = 0; i < 8; ++i) {
                threads.emplace_back([&right] {
                  for (int round = 0; round < 500; ++round) {
                    std::string md5;
                    std::string sha1;
                    right += MD5HashPassword("abc", md5) && md5 == kMd5OfAbc ? 1 : 0;
                    right +=
                        Sha1WithSaltHashPassword("ab", "c", sha1) && sha1 == kSha1OfAbc ? 1 : 0;
                  }
                });
              }
              for (std::thread& thread : threads) {
                thread.join();
              }
              EXPECT_EQ(right, 8000);
              return 0;
            }),
            0);
}

TEST(Sha1WithSaltHashPassword, IsTheSameEveryTime) {
  EXPECT_EQ(Sha1("password", "salted"), Sha1("password", "salted"));
  EXPECT_EQ(Sha1("password", "salted").size(), 40U);
}

}  // namespace
