#include "visitor/content_disposition.h"

#include <gtest/gtest.h>

#include <string>

namespace visitor {
namespace {

TEST(VisitorContentDisposition, PlainName) {
  EXPECT_EQ(AttachmentNamed("report 1.txt"),
            "attachment; filename=\"report 1.txt\"; filename*=UTF-8''report%201.txt");
}

TEST(VisitorContentDisposition, NameInOtherLetters) {
  EXPECT_EQ(AttachmentNamed("Ü日😀"),
            "attachment; filename=\"_________\"; "
            "filename*=UTF-8''%C3%9C%E6%97%A5%F0%9F%98%80");
}

TEST(VisitorContentDisposition, WhatCouldBendTheHeaderIsReplaced) {
  EXPECT_EQ(AttachmentNamed("a\"\\%\r\n;'*"),
            "attachment; filename=\"a_____;'*\"; filename*=UTF-8''a%22%5C%25%0D%0A%3B%27%2A");
}

TEST(VisitorContentDisposition, BytesThatAreNoUtf8AreReplaced) {
  const std::string replacement = "%EF%BF%BD";
  const auto encoded = [](const std::string& name) {
    const std::string value = AttachmentNamed(name);
    return value.substr(value.rfind('\'') + 1);
  };
  EXPECT_EQ(encoded("\xff"), replacement);
  EXPECT_EQ(encoded("a\xc3"), "a" + replacement);
  EXPECT_EQ(encoded("\xc0\xaf"), replacement + replacement);  // overlong '/'
  EXPECT_EQ(encoded("\xe0\x80\xaf"), replacement + replacement + replacement);
  EXPECT_EQ(encoded("\xed\xa0\x80"), replacement + replacement + replacement);  // a surrogate
  EXPECT_EQ(encoded("\xf4\x90\x80\x80"),
            replacement + replacement + replacement + replacement);  // beyond Unicode
  EXPECT_EQ(encoded("\xc3(\xc3\x9c"), replacement + "%28%C3%9C");
}

TEST(VisitorContentDisposition, EveryByteGivesVisibleAscii) {
  for (int c = 0; c < 256; ++c) {
    for (const char d : AttachmentNamed(std::string(1, static_cast<char>(c)))) {
      EXPECT_GE(d, ' ') << c;
      EXPECT_LT(d, '\x7f') << c;
    }
  }
}

}  // namespace
}  // namespace visitor
