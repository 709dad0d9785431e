// What the workers of ManyProcesses have in common: what was acknowledged to each, what took how
// long, and what went wrong. Lies in memory that all processes share, so it outlives them.
#ifndef TESTS_CONCURRENCY_BOARD_H_
#define TESTS_CONCURRENCY_BOARD_H_

#include <array>
#include <atomic>
#include <cstddef>
#include <string>

#include "concurrency/figure.h"
#include "concurrency/visitors.h"

namespace tuvo_test {

constexpr int kWorkers = 32;
constexpr int kPublicLinks = 8;
constexpr int kLimitedLink = kPublicLinks - 1;  // the one with a limit of uses
constexpr int kLimit = 20;
constexpr int kMaxOwnLinks = 20000;
constexpr int kMaxSessions = 100000;

using Name = std::array<char, kNameRoom>;

void Put(Name& name, const std::string& text);

// A link that only one worker writes to.
struct OwnLink {
  Name hash;
  int id;
  int title;
  int uses;
  bool expired;  // and not to be collected automatically
  bool there;
};

// A session that only one worker uses.
struct OwnSession {
  Name id;
  std::array<bool, kPublicLinks> admitted;
};

// What one worker was told is done; written by the worker's one process, after the call's answer.
struct Worker {
  int served;  // processes so far
  int own_links;
  int sessions;
  std::array<OwnLink, kMaxOwnLinks> own_link;
  std::array<OwnSession, kMaxSessions> session;
};

// A link that everybody uses, and whose title the worker of the same number changes.
struct PublicLink {
  Name hash;
  std::atomic<int> uses;
  std::atomic<int> title;
};

enum Kind {
  kOpening,
  kLogin,
  kCheck,
  kLogout,
  kCount,
  kCreate,
  kChange,
  kDelete,
  kPurge,
  kQuery,
  kClosing,
  kKinds
};

const char* NameOf(Kind kind);

struct Board {
  std::array<Worker, kWorkers> worker;
  std::array<PublicLink, kPublicLinks> link;
  std::array<Figure, kKinds> figure;

  std::atomic<bool> pause;       // no process is to be begun
  std::atomic<bool> stop;        // nor later
  std::atomic<int> running;      // processes that have files open
  std::atomic<int> new_file;     // the number of the file that every worker is to open as well
  std::atomic<int> new_file_by;  // how many have

  std::atomic<int> complaints;
  std::array<std::array<char, 300>, 20> complaint;
};

// Notes that something went wrong that must not.
void Complain(Board& board, const std::string& text);

}  // namespace tuvo_test

#endif  // TESTS_CONCURRENCY_BOARD_H_
