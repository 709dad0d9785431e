// The Range header.
#ifndef PROGRAMS_VISITOR_BYTE_RANGE_H_
#define PROGRAMS_VISITOR_BYTE_RANGE_H_

#include <cstdint>
#include <string_view>

namespace visitor {

// What a Range header makes of a file.
struct RangeRequest {
  enum Kind {
    kWhole,          // no range that is understood: all of the file is sent
    kPart,           // `length` bytes from `offset` on; length is at least 1
    kUnsatisfiable,  // the file has no such bytes
  };
  Kind kind = kWhole;
  std::int64_t offset = 0;
  std::int64_t length = 0;
};

// Reads a Range header for a file of `size` bytes. One range of bytes is understood; several, other
// units and malformed headers mean the whole file, as HTTP allows.
RangeRequest ParseRange(std::string_view header, std::int64_t size);

}  // namespace visitor

#endif  // PROGRAMS_VISITOR_BYTE_RANGE_H_
