#include "owner/qr_code.h"

#include <gtest/gtest.h>
#include <stdlib.h>
#include <unistd.h>

#include <array>
#include <cstdio>
#include <fstream>
#include <regex>
#include <string>
#include <vector>

namespace owner {
namespace {

constexpr int kScale = 4;

// The picture that the document describes, in modules; true is dark.
std::vector<std::vector<bool>> Draw(const std::string& svg) {
  std::smatch found;
  EXPECT_TRUE(std::regex_search(svg, found, std::regex(R"re(viewBox="0 0 (\d+) (\d+)")re")));
  EXPECT_EQ(found[1], found[2]);
  const size_t size = std::stoul(found[1]);
  std::vector<std::vector<bool>> picture(size, std::vector<bool>(size));
  const std::regex run(R"(M(\d+) (\d+)h(\d+)v1h-(\d+)z)");
  for (std::sregex_iterator it(svg.begin(), svg.end(), run), end; it != end; ++it) {
    for (size_t i = 0; i < std::stoul((*it)[3]); ++i) {
      picture.at(std::stoul((*it)[2])).at(std::stoul((*it)[1]) + i) = true;
    }
  }
  return picture;
}

// What a reader of such codes sees in it.
std::string Read(const std::string& svg) {
  const auto picture = Draw(svg);
  const std::string path = "/tmp/qr_code_test.pgm";
  std::ofstream file(path);
  file << "P2\n" << picture.size() * kScale << ' ' << picture.size() * kScale << "\n1\n";
  for (size_t y = 0; y < picture.size() * kScale; ++y) {
    for (size_t x = 0; x < picture.size() * kScale; ++x) {
      file << (picture[y / kScale][x / kScale] ? "0 " : "1 ");
    }
    file << '\n';
  }
  file.close();
  FILE* reader =
      popen(("zbarimg --nodbus --quiet --raw -Sdisable -Sqrcode.enable " + path).c_str(), "r");
  std::array<char, 4096> text{};
  const size_t length = fread(text.data(), 1, text.size(), reader);
  pclose(reader);
  return {text.data(), length > 0 ? length - 1 : 0};
}

TEST(OwnerQrCode, IsReadBackAsTheAddress) {
  if (access("/usr/bin/zbarimg", X_OK) != 0) {
    GTEST_SKIP() << "the package zbar-tools is missing";
  }
  for (const std::string& text : {std::string("https://nas.example.org/sharing/Ab3dE5fG7"),
                                  "http://[2001:db8::1]:8080/sharing/" + std::string(64, 'Z')}) {
    EXPECT_EQ(Read(QrCodeSvg(text)), text);
  }
}

TEST(OwnerQrCode, HasAQuietZoneOfFourModules) {
  const auto picture = Draw(QrCodeSvg("https://nas.example.org/sharing/Ab3dE5fG7"));
  for (size_t i = 0; i < picture.size(); ++i) {
    for (size_t edge = 0; edge < 4; ++edge) {
      EXPECT_FALSE(picture[edge][i] || picture[i][edge] || picture[picture.size() - 1 - edge][i] ||
                   picture[i][picture.size() - 1 - edge]);
    }
  }
  EXPECT_TRUE(picture[4][4]);
}

TEST(OwnerQrCode, IsAWholeDocumentWithoutScriptOrReference) {
  const std::string svg = QrCodeSvg("x");
  EXPECT_EQ(svg.rfind("<svg xmlns=\"http://www.w3.org/2000/svg\"", 0), 0U);
  EXPECT_EQ(svg.substr(svg.size() - 6), "</svg>");
  EXPECT_EQ(svg.find("href"), std::string::npos);
}

TEST(OwnerQrCode, TextIsNeverPartOfTheDocument) {
  EXPECT_EQ(QrCodeSvg("<script>").find("script"), std::string::npos);
}

TEST(OwnerQrCode, WhatDoesNotFitHasNone) {
  EXPECT_EQ(QrCodeSvg(""), "");
  EXPECT_EQ(QrCodeSvg(std::string(5000, 'x')), "");
  EXPECT_EQ(QrCodeSvg(std::string("a\0b", 3)), "");
}

}  // namespace
}  // namespace owner
