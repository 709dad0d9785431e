#include "owner/qr_code.h"

#include <qrencode.h>

#include <memory>

namespace owner {

namespace {

constexpr int kQuietZone = 4;  // modules on each side; readers count on them
constexpr unsigned int kDark = 1;

struct FreeCode {
  void operator()(QRcode* code) const { QRcode_free(code); }
};
using Code = std::unique_ptr<QRcode, FreeCode>;

bool IsDark(const QRcode& code, int x, int y) {
  return (code.data[y * code.width + x] & kDark) != 0;
}

// The dark modules, each run of them within a row as one rectangle.
std::string Path(const QRcode& code) {
  std::string path;
  for (int y = 0; y < code.width; ++y) {
    for (int x = 0; x < code.width; ++x) {
      if (!IsDark(code, x, y)) {
        continue;
      }
      const int begin = x;
      while (x < code.width && IsDark(code, x, y)) {
        ++x;
      }
      path += "M" + std::to_string(begin + kQuietZone) + " " + std::to_string(y + kQuietZone) +
              "h" + std::to_string(x - begin) + "v1h-" + std::to_string(x - begin) + "z";
    }
  }
  return path;
}

}  // namespace

std::string QrCodeSvg(const std::string& text) {
  if (text.empty() || text.find('\0') != std::string::npos) {
    return {};
  }
  const Code code(QRcode_encodeString8bit(text.c_str(), 0, QR_ECLEVEL_M));
  if (!code) {
    return {};
  }
  const std::string size = std::to_string(code->width + 2 * kQuietZone);
  return R"(<svg xmlns="http://www.w3.org/2000/svg" viewBox="0 0 )" + size + " " + size +
         R"(" shape-rendering="crispEdges"><path fill="#fff" d="M0 0h)" + size + "v" + size +
         "H0z" + R"("/><path fill="#000" d=")" + Path(*code) + R"("/></svg>)";
}

}  // namespace owner
