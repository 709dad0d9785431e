// Database files of the tests.
#ifndef TESTS_DB_TEST_FILES_H_
#define TESTS_DB_TEST_FILES_H_

#include <sys/stat.h>
#include <unistd.h>

#include <cstdio>
#include <string>

namespace tuvo_test {

// Where only the system identity may make files.
constexpr char kPrivateFolder[] = "/usr/tuvo/etc/private/session/";

inline bool Exists(const std::string& path) {
  struct stat st {};
  return lstat(path.c_str(), &st) == 0;
}

// `path`, with nothing of a database there.
inline std::string NewPath(const std::string& path) {
  for (const char* suffix : {"", "-wal", "-shm", "-journal"}) {
    unlink((path + suffix).c_str());
  }
  return path;
}

// "1:1 0660"
inline std::string OwnerAndMode(const std::string& path) {
  struct stat st {};
  if (stat(path.c_str(), &st) != 0) {
    return "no file";
  }
  char mode[8];
  std::snprintf(mode, sizeof mode, "%04o", static_cast<unsigned int>(st.st_mode & 07777U));
  return std::to_string(st.st_uid) + ":" + std::to_string(st.st_gid) + " " + mode;
}

inline void WriteFile(const std::string& path, const std::string& text) {
  FILE* file = std::fopen(path.c_str(), "wb");
  if (file != nullptr) {
    std::fwrite(text.data(), 1, text.size(), file);
    std::fclose(file);
  }
}

}  // namespace tuvo_test

#endif  // TESTS_DB_TEST_FILES_H_
