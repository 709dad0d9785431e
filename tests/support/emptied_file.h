// A file of the system that is empty for the time of a scope, in the test's own mount namespace
// alone.
#ifndef TESTS_SUPPORT_EMPTIED_FILE_H_
#define TESTS_SUPPORT_EMPTIED_FILE_H_

#include <gtest/gtest.h>
#include <sys/mount.h>

#include <cstdlib>
#include <stdexcept>
#include <string>

namespace tuvo_test {

class EmptiedFile {
 public:
  // Throws std::runtime_error when it cannot be done, or not without the host's seeing it.
  explicit EmptiedFile(const std::string& path) : path_(path) {
    if (std::getenv("TUVO_PRIVATE_ROOT") == nullptr ||
        mount("/dev/null", path_.c_str(), nullptr, MS_BIND, nullptr) != 0) {
      throw std::runtime_error("cannot empty " + path_ + "; run under scripts/private-root");
    }
  }
  ~EmptiedFile() { EXPECT_EQ(umount(path_.c_str()), 0) << path_; }
  EmptiedFile(const EmptiedFile&) = delete;
  EmptiedFile& operator=(const EmptiedFile&) = delete;

 private:
  const std::string path_;
};

}  // namespace tuvo_test

#endif  // TESTS_SUPPORT_EMPTIED_FILE_H_
