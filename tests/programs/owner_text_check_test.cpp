#include "owner/text_check.h"

#include <gtest/gtest.h>

#include <string>

namespace owner {
namespace {

TEST(OwnerTextCheck, TextOfAnyScriptIsUtf8) {
  EXPECT_TRUE(IsUtf8(""));
  EXPECT_TRUE(IsUtf8("plain"));
  EXPECT_TRUE(IsUtf8("\xC3\xA9\xE2\x82\xAC\xF0\x9F\x98\x80"));
  EXPECT_TRUE(IsUtf8("\xF4\x8F\xBF\xBF"));
}

TEST(OwnerTextCheck, StrayAndMissingContinuationsAreNotUtf8) {
  EXPECT_FALSE(IsUtf8("\x80"));
  EXPECT_FALSE(IsUtf8("\xC3"));
  EXPECT_FALSE(IsUtf8("\xE2\x82"));
  EXPECT_FALSE(IsUtf8("\xC3y"));
  EXPECT_FALSE(IsUtf8("\xFF"));
}

TEST(OwnerTextCheck, OverlongFormsAreNotUtf8) {
  EXPECT_FALSE(IsUtf8("\xC0\xAF"));
  EXPECT_FALSE(IsUtf8("\xC1\xBF"));
  EXPECT_FALSE(IsUtf8("\xE0\x9F\xBF"));
  EXPECT_FALSE(IsUtf8("\xF0\x8F\xBF\xBF"));
}

TEST(OwnerTextCheck, SurrogatesAndWhatLiesBeyondTheLastCharacterAreNotUtf8) {
  EXPECT_TRUE(IsUtf8("\xED\x9F\xBF"));
  EXPECT_FALSE(IsUtf8("\xED\xA0\x80"));
  EXPECT_FALSE(IsUtf8("\xED\xBF\xBF"));
  EXPECT_TRUE(IsUtf8("\xEE\x80\x80"));
  EXPECT_FALSE(IsUtf8("\xF4\x90\x80\x80"));
}

TEST(OwnerTextCheck, ControlCharactersAreNotPlain) {
  EXPECT_TRUE(IsPlainText("a b~\xC2\xA0"));
  EXPECT_FALSE(IsPlainText(std::string("a\0b", 3)));
  EXPECT_FALSE(IsPlainText("\x1F"));
  EXPECT_FALSE(IsPlainText("\n"));
  EXPECT_FALSE(IsPlainText("\x7F"));
  EXPECT_FALSE(IsPlainText("\xC2\x80"));
  EXPECT_FALSE(IsPlainText("\xC2\x9F"));
}

TEST(OwnerTextCheck, WhatIsNotUtf8IsNotPlain) {
  EXPECT_FALSE(IsPlainText("\xFF"));
}

TEST(OwnerTextCheck, RepairReplacesEachStrayByteAndKeepsTheRest) {
  EXPECT_EQ(RepairedUtf8("a\xC3\xA9z"), "a\xC3\xA9z");
  EXPECT_EQ(RepairedUtf8("a\xFFz"), "a\xEF\xBF\xBDz");
  EXPECT_EQ(RepairedUtf8("\xE2\x82"), "\xEF\xBF\xBD\xEF\xBF\xBD");
}

}  // namespace
}  // namespace owner
