// QR codes.
#ifndef PROGRAMS_OWNER_QR_CODE_H_
#define PROGRAMS_OWNER_QR_CODE_H_

#include <string>

namespace owner {

// A whole SVG document, black on white with the quiet zone around it, that a camera reads as
// `text`. Empty when the text is empty, does not fit into a QR code (about 2300 bytes), or holds a
// zero byte.
std::string QrCodeSvg(const std::string& text);

}  // namespace owner

#endif  // PROGRAMS_OWNER_QR_CODE_H_
