#include <grp.h>
#include <pwd.h>
#include <tuvoplatform/account.h>

#include <cerrno>
#include <cstddef>
#include <cstdlib>
#include <cstring>
#include <exception>
#include <limits>
#include <memory>
#include <string>
#include <vector>

namespace {

// All bits set means "no id" to every system call that takes one; an account database that holds it
// is not believed.
constexpr unsigned int kNoId = std::numeric_limits<unsigned int>::max();

// What is larger than the largest buffer is a broken source, not followed without end.
constexpr std::size_t kFirstBuffer = 1024;
constexpr std::size_t kLargestBuffer = std::size_t{64} << 20U;
// Far beyond what any account is called. The system's own look-ups keep names on the stack, and
// some end the process when there is no room (nss_systemd does at four mebibytes).
constexpr std::size_t kLongestName = 1024;
constexpr int kFirstGroups = 64;
constexpr int kMostGroups = 1 << 20;

struct FreeUser {
  void operator()(TUVOUSER* user) const { TUVOUserFree(user); }
};
struct FreeGroup {
  void operator()(TUVOGROUP* group) const { TUVOGroupFree(group); }
};
struct FreeHash {
  void operator()(TLIBSZHASH* hash) const { TLIBCSzHashFree(hash); }
};

// One entry of the database with the memory its texts lie in.
template <typename Record>
struct Entry {
  Record record{};
  std::vector<char> memory;
};

template <typename Key>
bool IsNobodys(Key /*id*/) {
  return false;
}
bool IsNobodys(const char* name) {
  return strnlen(name, kLongestName + 1) > kLongestName;
}

// Asks one of getpwnam_r, getpwuid_r, getgrnam_r and getgrgid_r. False when there is no such entry,
// when the database cannot be read, or when the entry is larger than kLargestBuffer.
template <typename Key, typename Record>
bool Find(int (*query)(Key, Record*, char*, std::size_t, Record**), Key key, Entry<Record>* entry) {
  if (IsNobodys(key)) {
    return false;
  }
  std::size_t size = kFirstBuffer;
  while (size <= kLargestBuffer) {
    entry->memory.resize(size);
    Record* found = nullptr;
    const int error = query(key, &entry->record, entry->memory.data(), size, &found);
    if (error == ERANGE) {
      size *= 2;
    } else if (error != EINTR) {
      return error == 0 && found != nullptr;
    }
  }
  return false;
}

// A copy as the free functions expect it; null when out of memory.
char* CopyText(const char* text) {
  return strdup(text != nullptr ? text : "");
}

template <typename Key>
bool FindUser(int (*query)(Key, passwd*, char*, std::size_t, passwd**), Key key,
              Entry<passwd>* entry) {
  return Find(query, key, entry) && entry->record.pw_uid != kNoId;
}

template <typename Key>
bool FindGroup(int (*query)(Key, group*, char*, std::size_t, group**), Key key,
               Entry<group>* entry) {
  return Find(query, key, entry) && entry->record.gr_gid != kNoId;
}

template <typename Key>
int GetUser(int (*query)(Key, passwd*, char*, std::size_t, passwd**), Key key, TUVOUSER** user) {
  Entry<passwd> entry;
  if (!FindUser(query, key, &entry)) {
    return -1;
  }
  std::unique_ptr<TUVOUSER, FreeUser> copy(new TUVOUSER{});
  copy->szName = CopyText(entry.record.pw_name);
  copy->nUid = entry.record.pw_uid;
  copy->nGid = entry.record.pw_gid;
  if (copy->szName == nullptr) {
    return -1;
  }
  *user = copy.release();
  return 0;
}

// The gids of all groups of an account; empty when they could not be read.
std::vector<gid_t> GroupsOf(const passwd& account) {
  std::vector<gid_t> gids;
  for (int count = kFirstGroups; count <= kMostGroups;) {
    gids.resize(static_cast<std::size_t>(count));
    const int room = count;
    if (getgrouplist(account.pw_name, account.pw_gid, gids.data(), &count) >= 0) {
      gids.resize(static_cast<std::size_t>(count));
      return gids;
    }
    // `count` is now what was needed; somebody may add a group before the next try, hence doubling.
    if (count < 2 * room) {
      count = 2 * room;
    }
  }
  return {};
}

std::vector<std::string> NamesOf(const std::vector<gid_t>& gids) {
  std::vector<std::string> names;
  for (const gid_t gid : gids) {
    Entry<group> entry;
    if (FindGroup(getgrgid_r, gid, &entry)) {
      names.emplace_back(entry.record.gr_name);
    }
  }
  return names;
}

TLIBSZHASH* MakeHash(const std::vector<std::string>& texts) {
  std::unique_ptr<TLIBSZHASH, FreeHash> hash(new TLIBSZHASH{});
  hash->rgszItem = new char* [texts.size() + 1] {};
  for (const std::string& text : texts) {
    char* copy = CopyText(text.c_str());
    if (copy == nullptr) {
      return nullptr;
    }
    hash->rgszItem[hash->nItem++] = copy;
  }
  return hash.release();
}

// Runs `body`, whose only exception is a lack of memory, and turns that into `failure`.
template <typename Body, typename Failure>
auto Guarded(const Body& body, Failure failure) -> decltype(body()) {
  try {
    return body();
  } catch (const std::exception&) {
    return failure;
  }
}

}  // namespace

// cppcheck-suppress constParameter  ; the platform fixes the type
int TUVOUserLoginNameConvert(const char* name, char* real, unsigned int /*size*/) {
  return name != nullptr && real != nullptr ? 0 : -1;
}

int TUVOUserGet(const char* name, TUVOUSER** user) {
  if (user == nullptr) {
    return -1;
  }
  *user = nullptr;
  if (name == nullptr) {
    return -1;
  }
  return Guarded([&] { return GetUser(getpwnam_r, name, user); }, -1);
}

int TUVOUserGetByUID(unsigned int uid, TUVOUSER** user) {
  if (user == nullptr) {
    return -1;
  }
  *user = nullptr;
  return Guarded([&] { return GetUser(getpwuid_r, uid, user); }, -1);
}

void TUVOUserFree(TUVOUSER* user) {
  if (user != nullptr) {
    std::free(user->szName);
    delete user;
  }
}

int TUVOGroupGetGID(const char* name, unsigned int* gid) {
  if (name == nullptr || gid == nullptr) {
    return -1;
  }
  return Guarded(
      [&] {
        Entry<group> entry;
        if (!FindGroup(getgrnam_r, name, &entry)) {
          return -1;
        }
        *gid = entry.record.gr_gid;
        return 0;
      },
      -1);
}

int TUVOGroupGetByGID(unsigned int gid, TUVOGROUP** group) {
  if (group == nullptr) {
    return -1;
  }
  *group = nullptr;
  return Guarded(
      [&] {
        Entry<::group> entry;
        if (!FindGroup(getgrgid_r, gid, &entry)) {
          return -1;
        }
        std::unique_ptr<TUVOGROUP, FreeGroup> copy(new TUVOGROUP{});
        copy->szName = CopyText(entry.record.gr_name);
        copy->nGid = entry.record.gr_gid;
        if (copy->szName == nullptr) {
          return -1;
        }
        *group = copy.release();
        return 0;
      },
      -1);
}

void TUVOGroupFree(TUVOGROUP* group) {
  if (group != nullptr) {
    std::free(group->szName);
    delete group;
  }
}

TLIBSZHASH* TLIBGroupInfoHashGet(const char* user, int kind, int flags) {
  constexpr int kNames = 1;
  constexpr int kAllSources = 0;
  if (user == nullptr || kind != kNames || flags != kAllSources) {
    return nullptr;
  }
  return Guarded(
      [&]() -> TLIBSZHASH* {
        Entry<passwd> account;
        if (!FindUser(getpwnam_r, user, &account)) {
          return nullptr;
        }
        const std::vector<gid_t> gids = GroupsOf(account.record);
        return gids.empty() ? nullptr : MakeHash(NamesOf(gids));
      },
      nullptr);
}

void TLIBCSzHashFree(TLIBSZHASH* hash) {
  if (hash != nullptr) {
    for (int i = 0; i < hash->nItem; ++i) {
      std::free(hash->rgszItem[i]);
    }
    delete[] hash->rgszItem;
    delete hash;
  }
}
