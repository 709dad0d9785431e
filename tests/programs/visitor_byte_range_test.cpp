#include "visitor/byte_range.h"

#include <gtest/gtest.h>

#include <string>
#include <tuple>

namespace visitor {

static bool operator==(const RangeRequest& a, const RangeRequest& b) {
  return std::tie(a.kind, a.offset, a.length) == std::tie(b.kind, b.offset, b.length);
}

static std::ostream& operator<<(std::ostream& out, const RangeRequest& range) {
  return out << range.kind << ' ' << range.offset << '+' << range.length;
}

namespace {

RangeRequest Part(std::int64_t offset, std::int64_t length) {
  return {RangeRequest::kPart, offset, length};
}

const RangeRequest kAll{};
const RangeRequest kNothing{RangeRequest::kUnsatisfiable, 0, 0};

TEST(VisitorByteRange, FirstAndLast) {
  EXPECT_EQ(ParseRange("bytes=0-0", 10), Part(0, 1));
  EXPECT_EQ(ParseRange("bytes=2-5", 10), Part(2, 4));
  EXPECT_EQ(ParseRange("bytes=9-9", 10), Part(9, 1));
}

TEST(VisitorByteRange, EndBeyondTheFileIsItsEnd) {
  EXPECT_EQ(ParseRange("bytes=8-10", 10), Part(8, 2));
  EXPECT_EQ(ParseRange("bytes=0-99999999999999999999999", 10), Part(0, 10));
}

TEST(VisitorByteRange, WithoutAnEnd) {
  EXPECT_EQ(ParseRange("bytes=4-", 10), Part(4, 6));
}

TEST(VisitorByteRange, Suffix) {
  EXPECT_EQ(ParseRange("bytes=-3", 10), Part(7, 3));
  EXPECT_EQ(ParseRange("bytes=-11", 10), Part(0, 10));
  EXPECT_EQ(ParseRange("bytes=-99999999999999999999999", 10), Part(0, 10));
}

TEST(VisitorByteRange, BytesThatAreNotThere) {
  EXPECT_EQ(ParseRange("bytes=10-", 10), kNothing);
  EXPECT_EQ(ParseRange("bytes=99999999999999999999999-", 10), kNothing);
  EXPECT_EQ(ParseRange("bytes=-0", 10), kNothing);
  EXPECT_EQ(ParseRange("bytes=0-", 0), kNothing);
  EXPECT_EQ(ParseRange("bytes=-5", 0), kNothing);
}

TEST(VisitorByteRange, WhatIsNotUnderstoodMeansTheWholeFile) {
  for (const char* header :
       {"", "bytes", "bytes=", "bytes=-", "bytes=5", "bytes=5-2", "bytes=a-b", "bytes=1-b",
        "bytes=0-1,3-4", "bytes=--3", "bytes=+1-2", "bytes=1 - 2", "lines=1-2", "byte=1-2"}) {
    EXPECT_EQ(ParseRange(header, 10), kAll) << header;
  }
}

TEST(VisitorByteRange, UnitIsReadInAnyCaseAndBlanksAroundAreNothing) {
  EXPECT_EQ(ParseRange(" Bytes= 1-2 ", 10), Part(1, 2));
}

TEST(VisitorByteRange, PositionsOfMoreThanThirtyTwoBits) {
  constexpr std::int64_t kSize = std::int64_t{1} << 40;
  EXPECT_EQ(ParseRange("bytes=1099511627770-", kSize), Part(1099511627770, 6));
}

// Whatever the header says, the part lies within the file.
TEST(VisitorByteRange, PartNeverLeavesTheFile) {
  for (std::int64_t size = 0; size < 6; ++size) {
    for (int first = 0; first < 8; ++first) {
      for (int last = 0; last < 8; ++last) {
        const RangeRequest range =
            ParseRange("bytes=" + std::to_string(first) + "-" + std::to_string(last), size);
        if (range.kind == RangeRequest::kPart) {
          EXPECT_GE(range.offset, 0);
          EXPECT_GE(range.length, 1);
          EXPECT_LE(range.offset + range.length, size);
        }
      }
    }
  }
}

}  // namespace
}  // namespace visitor
