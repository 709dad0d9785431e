// A folder of a test's own, gone with the test.
#ifndef TESTS_PLATFORM_TEMP_FOLDER_H_
#define TESTS_PLATFORM_TEMP_FOLDER_H_

#include <cstdlib>
#include <filesystem>
#include <stdexcept>
#include <string>
#include <system_error>

namespace tuvo_test {

class TempFolder {
 public:
  TempFolder() {
    char path[] = "/tmp/platform-test-XXXXXX";
    if (mkdtemp(path) == nullptr) {
      throw std::runtime_error("cannot make a folder in /tmp");
    }
    path_ = path;
  }
  ~TempFolder() {
    std::error_code ignored;
    std::filesystem::remove_all(path_, ignored);
  }
  TempFolder(const TempFolder&) = delete;
  TempFolder& operator=(const TempFolder&) = delete;

  const std::string& path() const { return path_; }

  // The path of `name` in the folder.
  std::string operator/(const std::string& name) const { return path_ + "/" + name; }

 private:
  std::string path_;
};

}  // namespace tuvo_test

#endif  // TESTS_PLATFORM_TEMP_FOLDER_H_
