#include <gtest/gtest.h>
#include <sys/resource.h>
#include <tuvosharing/utils.h>

#include <csignal>
#include <string>
#include <vector>

#include "support/child.h"
#include "support/syslog_listener.h"

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
  EXPECT_EQ(Explode(",", ","), Pieces{});
}

TEST(StringExplode, AnEmptyTextGivesNoPieces) {
  EXPECT_EQ(Explode("", ","), Pieces{});
}

TEST(StringExplode, TheSeparatorIsOneUnitNotASetOfCharacters) {
  EXPECT_EQ(Explode("a::b", "::"), (Pieces{"a", "b"}));
  EXPECT_EQ(Explode("a:b", "::"), (Pieces{"a:b"}));
  EXPECT_EQ(Explode("a:b::c", "::"), (Pieces{"a:b", "c"}));
  EXPECT_EQ(Explode("a::b:c", "::"), (Pieces{"a", "b:c"}));
  EXPECT_EQ(Explode("a,b;c", ",;"), (Pieces{"a,b;c"}));
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

TEST(StringExplode, ANullSeparatorFailsInSilenceAndLeavesWhatWasThere) {
  tuvo_test::SyslogListener listener;
  Pieces out{"kept"};
  EXPECT_FALSE(StringExplode(out, "a,b", nullptr));
  EXPECT_EQ(out, (Pieces{"kept"}));
  EXPECT_EQ(listener.TakeTexts(), Pieces{});
}

// Nobody passes one, and it is not guarded against: it matches at the beginning for ever. The
// system ends the child after a second of computing.
TEST(StringExplode, AnEmptySeparatorNeverComesBack) {
  EXPECT_EQ(tuvo_test::RunInChild([] {
              rlimit limit{};
              limit.rlim_cur = limit.rlim_max = 1;
              EXPECT_EQ(setrlimit(RLIMIT_CPU, &limit), 0);
              limit.rlim_cur = limit.rlim_max = 0;
              EXPECT_EQ(setrlimit(RLIMIT_CORE, &limit), 0);
              Pieces out;
              StringExplode(out, "a,b", "");
              return 0;
            }),
            256 + SIGKILL);
}

TEST(StringExplode, ASuccessReplacesWhatWasThere) {
  Pieces out{"old"};
  EXPECT_TRUE(StringExplode(out, "", ","));
  EXPECT_EQ(out, Pieces{});
}

}  // namespace
