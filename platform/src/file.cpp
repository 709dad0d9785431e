#include <fcntl.h>
#include <tuvoplatform/file.h>
#include <unistd.h>

#include <cerrno>

int TLIBCFileExist(const char* path) {
  struct stat st {};
  return TLIBCFileStat(path, 1, &st) == 0 ? 1 : 0;
}

int TLIBCFileTouch(const char* path) {
  if (path == nullptr) {
    errno = EINVAL;
    return -1;
  }
  // O_EXCL: an existing file is never opened. Closing it again would drop every lock that this
  // process holds on it, a database's among them.
  int fd = -1;
  do {
    fd = open(path, O_WRONLY | O_CREAT | O_EXCL | O_CLOEXEC | O_NOCTTY, S_IRUSR | S_IWUSR);
  } while (fd < 0 && errno == EINTR);
  if (fd >= 0) {
    close(fd);
    return 0;
  }
  if (errno != EEXIST) {
    return -1;
  }
  // A symbolic link that leads nowhere exists as a name but not as a file; it is not followed, so
  // that nobody who can plant one chooses where the file is made.
  struct stat st {};
  if (TLIBCFileStat(path, 1, &st) != 0) {
    return -1;
  }
  if (S_ISDIR(st.st_mode)) {
    errno = EISDIR;
    return -1;
  }
  return 0;
}

int TLIBCFileStat(const char* path, int /*kind*/, struct stat* st) {
  if (path == nullptr || st == nullptr) {
    errno = EINVAL;
    return -1;
  }
  return stat(path, st);
}

int TUVOFSAclChmod(const char* path, int /*share*/, unsigned int mode) {
  if (path == nullptr) {
    errno = EINVAL;
    return -1;
  }
  return chmod(path, mode);
}
