// Bytes to a descriptor, all of them.
#ifndef PROGRAMS_COMMON_STREAM_H_
#define PROGRAMS_COMMON_STREAM_H_

#include <cstdint>
#include <string_view>

namespace common {

// Writes all of `bytes` to `fd`, however small the pieces it takes. False on an error, with errno.
bool WriteAll(int fd, std::string_view bytes);

// Copies `length` bytes of the file `from`, beginning at `offset`, to `to`; in pieces, so that
// memory stays small whatever the length. False on an error, and when the file has become shorter.
bool CopyAll(int from, std::int64_t offset, std::int64_t length, int to);

}  // namespace common

#endif  // PROGRAMS_COMMON_STREAM_H_
