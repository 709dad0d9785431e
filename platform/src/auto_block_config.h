// The configuration of the auto-block service.
#ifndef PLATFORM_SRC_AUTO_BLOCK_CONFIG_H_
#define PLATFORM_SRC_AUTO_BLOCK_CONFIG_H_

#include <cstdint>
#include <string>

namespace tuvo_platform {

// Each from 1 to 2147483647.
struct AutoBlockLimits {
  int64_t failures = 10;
  int64_t window_seconds = 300;
  int64_t block_seconds = 1800;
};

// Reads the lines `name = value` of the file at `path`; '#' begins a comment, unknown names are
// passed over and the last of several equal names counts. What is missing, or out of range, or no
// number, stays at its default; so does everything when the file cannot be read.
AutoBlockLimits ReadAutoBlockLimits(const std::string& path);

}  // namespace tuvo_platform

#endif  // PLATFORM_SRC_AUTO_BLOCK_CONFIG_H_
