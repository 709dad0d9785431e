// What one process of these tests does through the public interface: everything on the process's
// one database, as a web program does.
#ifndef TESTS_CONCURRENCY_VISITORS_H_
#define TESTS_CONCURRENCY_VISITORS_H_

#include <tuvosharing/entry.h>
#include <tuvosharing/entry_db.h>

#include <functional>
#include <string>

namespace tuvo_test {

constexpr char kSharingFolder[] = "/usr/tuvo/etc/private/session";
constexpr char kSharingFile[] = "/usr/tuvo/etc/private/session/sharing.db";

// Room for a hash or a session identifier and its zero, in memory that processes share.
constexpr std::size_t kNameRoom = 40;

// Removes what earlier tests left; no process may have a file open.
void ClearSharingFolder();

// Makes this process serve a visitor from `address`.
void ServeAddress(const std::string& address);
std::string AddressOf(int process);

// A link open to everybody that no purge collects.
TUVO::sharing::record::Entry OpenLink();

// Stores a link from a process of its own, and returns its hash: a process that is to fork others
// must not have the file open. Throws when that failed.
std::string StoreLink(const std::function<void(TUVO::sharing::record::Entry&)>& change);

// As the login API's functions. A null or empty identifier is none.
int Login(const std::string& hash, const std::string& brought, std::string& session_id);
int Check(const std::string& hash, const std::string& session_id);

// How an owner's program has the file for itself from the first reading on.
enum class Reading {
  kFirst,       // reads, then writes; begins anew when somebody else wrote in between
  kAfterAWrite  // begins with a write that changes nothing, and so waits for its turn
};

// Reads the link, changes it and writes it back, in one transaction. False when that failed for
// another reason than that somebody else was writing.
bool ChangeLink(const std::string& hash, Reading reading,
                const std::function<void(TUVO::sharing::record::Entry&)>& change);

}  // namespace tuvo_test

#endif  // TESTS_CONCURRENCY_VISITORS_H_
