// The platform's user and group database: on plain Linux the system's own, any NSS source, read
// through its reentrant calls. The id 4294967295 means "none" to the system and is never found, by
// name either. Null arguments are answered like a name that does not exist.
#ifndef TUVOPLATFORM_ACCOUNT_H_
#define TUVOPLATFORM_ACCOUNT_H_

#include <tuvoplatform/export.h>

#ifdef __cplusplus
extern "C" {
#endif

// A user record, freed with TUVOUserFree. The name and the uid are the first two members.
typedef struct TUVOUSER {
  char* szName;       // the account's real name
  unsigned int nUid;  // its uid
  unsigned int nGid;  // the account's primary group
} TUVOUSER;

// A group record, freed with TUVOGroupFree.
typedef struct TUVOGROUP_tag {
  char* szName;       // the group's name
  unsigned int nGid;  // its gid
} TUVOGROUP;

// A list of texts, freed with TLIBCSzHashFree. Items keep their order and are never null.
typedef struct TLIBSZHASH_tag {
  int nItem;        // the number of texts
  char** rgszItem;  // the texts, zero-terminated
} TLIBSZHASH;

// Converts the name that a person typed into the account's real name. Returns the length of the
// converted name in `real`, 0 when the name needs no conversion (`real` is then untouched; always
// so on plain Linux), -1 on an error (a null argument).
TUVOPLATFORM_API int TUVOUserLoginNameConvert(const char* name, char* real, unsigned int size);

// Look an account up by name or by uid. Return 0 with `*user` owned by the caller, -1 when there is
// no such account or the database could not be read; `*user` is then null.
TUVOPLATFORM_API int TUVOUserGet(const char* name, TUVOUSER** user);
TUVOPLATFORM_API int TUVOUserGetByUID(unsigned int uid, TUVOUSER** user);

// Frees a user record; null is accepted.
TUVOPLATFORM_API void TUVOUserFree(TUVOUSER* user);

// Stores the gid of the named group in `*gid`. Returns 0, -1 (`*gid` untouched) when there is none.
TUVOPLATFORM_API int TUVOGroupGetGID(const char* name, unsigned int* gid);

// Look a group up by gid. Returns 0 with `*group` owned by the caller, -1 and null otherwise.
TUVOPLATFORM_API int TUVOGroupGetByGID(unsigned int gid, TUVOGROUP** group);

// Frees a group record; null is accepted.
TUVOPLATFORM_API void TUVOGroupFree(TUVOGROUP* group);

// The names of all groups of an account, its primary group among them; groups whose gid has no name
// are left out. `kind` 1 asks for names and `flags` 0 for all sources: the only values defined.
// Returns a list owned by the caller, null when there is no such account, on an error and for other
// values.
TUVOPLATFORM_API TLIBSZHASH* TLIBGroupInfoHashGet(const char* user, int kind, int flags);

// Frees a list of texts; null is accepted.
TUVOPLATFORM_API void TLIBCSzHashFree(TLIBSZHASH* hash);

#ifdef __cplusplus
}
#endif

#endif  // TUVOPLATFORM_ACCOUNT_H_
