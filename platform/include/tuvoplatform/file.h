// The platform's file helpers.
#ifndef TUVOPLATFORM_FILE_H_
#define TUVOPLATFORM_FILE_H_

#include <sys/stat.h>
#include <tuvoplatform/export.h>

// On 32-bit systems there are two layouts of struct stat; the library writes the one for large
// files.
#if __SIZEOF_LONG__ == 4 && (!defined(_FILE_OFFSET_BITS) || _FILE_OFFSET_BITS != 64)
#error "compile with -D_FILE_OFFSET_BITS=64"
#endif

#ifdef __cplusplus
extern "C" {
#endif

// 1 when something exists at `path` (symbolic links followed), 0 otherwise, also when the caller
// may not look.
TUVOPLATFORM_API int TLIBCFileExist(const char* path);

// Creates an empty file, mode 0600 (less what the umask takes), owned by the effective identity; an
// existing file is left as it is and not even opened. A folder at `path` fails with EISDIR, a
// symbolic link that leads nowhere with ENOENT. Returns 0, or -1 with errno set.
TUVOPLATFORM_API int TLIBCFileTouch(const char* path);

// Fills `*st` from the file at `path`. `kind` selects what is asked for; 1 (owner, mode, size and
// times) is the only kind and every value is taken as it. Returns 0, or -1 with errno set.
TUVOPLATFORM_API int TLIBCFileStat(const char* path, int kind, struct stat* st);

// Sets the permission bits of the file at `path`. `share` names the share whose access lists apply
// on systems that have such; -1 means none. Returns 0, or -1 with errno set.
TUVOPLATFORM_API int TUVOFSAclChmod(const char* path, int share, unsigned int mode);

#ifdef __cplusplus
}
#endif

#endif  // TUVOPLATFORM_FILE_H_
