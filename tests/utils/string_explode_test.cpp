#include <gtest/gtest.h>
#include <tuvosharing/utils.h>

#include <string>
#include <vector>

namespace {

using TUVO::sharing::StringExplode;
using Pieces = std::vector<std::string>;

// What the text splits into; the vector held something before.
Pieces Explode(const std::string& text, const char* separator) {
  Pieces out{"left", "over"};
  EXPECT_TRUE(StringExplode(out, text, separator));
  return out;
}

TEST(StringExplode, SplitsAtEveryOccurrence) {
  EXPECT_EQ(Explode("a,b,c", ","), (Pieces{"a", "b", "c"}));
}

TEST(StringExplode, LeavesOutEmptyPieces) {
  EXPECT_EQ(Explode("a,,b,", ","), (Pieces{"a", "b"}));
  EXPECT_EQ(Explode(",a", ","), (Pieces{"a"}));
  EXPECT_EQ(Explode("a,", ","), (Pieces{"a"}));
  EXPECT_EQ(Explode(",,,", ","), Pieces{});
}

TEST(StringExplode, AnEmptyTextGivesNoPieces) {
  EXPECT_EQ(Explode("", ","), Pieces{});
}

TEST(StringExplode, TheSeparatorIsOneUnitNotASetOfCharacters) {
  EXPECT_EQ(Explode("a::b", "::"), (Pieces{"a", "b"}));
  EXPECT_EQ(Explode("a:b", "::"), (Pieces{"a:b"}));
  EXPECT_EQ(Explode("a:b::c", "::"), (Pieces{"a:b", "c"}));
}

TEST(StringExplode, OccurrencesDoNotOverlap) {
  EXPECT_EQ(Explode("a:::b", "::"), (Pieces{"a", ":b"}));
  EXPECT_EQ(Explode("aaaaa", "aa"), (Pieces{"a"}));
}

TEST(StringExplode, WithoutAnOccurrenceTheWholeTextIsThePiece) {
  EXPECT_EQ(Explode("whole", ","), (Pieces{"whole"}));
  EXPECT_EQ(Explode("a", "longer than the text"), (Pieces{"a"}));
}

TEST(StringExplode, PiecesAreNotTrimmed) {
  EXPECT_EQ(Explode(" a , b ", ","), (Pieces{" a ", " b "}));
  EXPECT_EQ(Explode(", ,", ","), (Pieces{" "}));
}

TEST(StringExplode, ANulByteInTheTextIsAByteLikeAnother) {
  EXPECT_EQ(Explode(std::string("a\0b,c", 5), ","), (Pieces{std::string("a\0b", 3), "c"}));
}

TEST(StringExplode, ANullSeparatorFailsAndLeavesWhatWasThere) {
  Pieces out{"kept"};
  EXPECT_FALSE(StringExplode(out, "a,b", nullptr));
  EXPECT_EQ(out, (Pieces{"kept"}));
}

TEST(StringExplode, ASuccessReplacesWhatWasThere) {
  Pieces out{"old"};
  EXPECT_TRUE(StringExplode(out, "", ","));
  EXPECT_EQ(out, Pieces{});
}

}  // namespace
