#include <gtest/gtest.h>
#include <internal/constant_time.h>
#include <sys/mman.h>
#include <unistd.h>

#include <string>
#include <string_view>

namespace {

using TUVO::sharing::internal::AreEqualInConstantTime;

TEST(ConstantTime, TheSameBytesAreEqual) {
  EXPECT_TRUE(AreEqualInConstantTime("", ""));
  EXPECT_TRUE(AreEqualInConstantTime("digest", std::string("digest")));
}

TEST(ConstantTime, ADifferenceCountsWhereverItIsAndInEveryBit) {
  const std::string text(40, 'a');
  for (size_t place = 0; place < text.size(); ++place) {
    for (unsigned int bit = 0; bit < 8; ++bit) {
      std::string other = text;
      other[place] = static_cast<char>(other[place] ^ static_cast<char>(1U << bit));
      EXPECT_FALSE(AreEqualInConstantTime(text, other)) << place << " " << bit;
      EXPECT_FALSE(AreEqualInConstantTime(other, text)) << place << " " << bit;
    }
  }
}

TEST(ConstantTime, TwoDifferencesDoNotCancelOut) {
  EXPECT_FALSE(AreEqualInConstantTime("aa", "bb"));
  EXPECT_FALSE(AreEqualInConstantTime("ab", "ba"));
}

TEST(ConstantTime, ZerosAreBytesLikeOthers) {
  using std::string_view_literals::operator""sv;
  EXPECT_TRUE(AreEqualInConstantTime("a\0b"sv, "a\0b"sv));
  EXPECT_FALSE(AreEqualInConstantTime("a\0b"sv, "a\0c"sv));
}

TEST(ConstantTime, OtherLengthsAreNotEqual) {
  EXPECT_FALSE(AreEqualInConstantTime("digest", "diges"));
  EXPECT_FALSE(AreEqualInConstantTime("digest", "digests"));
  EXPECT_FALSE(AreEqualInConstantTime("", "d"));
}

// The last byte lies where nothing may be read, so whoever gets there does not come back.
TEST(ConstantTime, ReadsToTheEndWhenTheFirstByteDiffers) {
  const auto page = static_cast<size_t>(sysconf(_SC_PAGESIZE));
  void* pages = mmap(nullptr, 2 * page, PROT_READ | PROT_WRITE, MAP_PRIVATE | MAP_ANONYMOUS, -1, 0);
  ASSERT_NE(pages, MAP_FAILED);
  char* text = static_cast<char*>(pages);
  ASSERT_EQ(mprotect(text + page, page, PROT_NONE), 0);
  const std::string other(page + 1, 'x');
  EXPECT_FALSE(AreEqualInConstantTime({text, page}, {other.data(), page})) << "all but the last";
  EXPECT_DEATH(AreEqualInConstantTime({text, page + 1}, other), "");
  munmap(pages, 2 * page);
}

}  // namespace
