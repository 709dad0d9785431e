#include <fcntl.h>
#include <spawn.h>
#include <sys/wait.h>
#include <tuvoplatform/process.h>
#include <unistd.h>

#include <cerrno>
#include <csignal>
#include <cstdarg>
#include <cstdio>
#include <cstring>
#include <exception>
#include <memory>
#include <mutex>
#include <unordered_map>
#include <utility>
#include <vector>

#include "pipe.h"

namespace {

using tuvo_platform::Descriptor;
using tuvo_platform::Pipe;

struct CloseStream {
  // Closing what could not be used is no failure worth reporting.
  void operator()(FILE* stream) const { static_cast<void>(std::fclose(stream)); }
};
using Stream = std::unique_ptr<FILE, CloseStream>;

// Which child belongs to which stream.
class Children {
 public:
  void Add(FILE* stream, pid_t pid) {
    const std::lock_guard<std::mutex> lock(mutex_);
    pids_[stream] = pid;
  }

  // Forgets the stream and returns its child, -1 for a stream that is not known.
  pid_t Take(FILE* stream) {
    const std::lock_guard<std::mutex> lock(mutex_);
    const auto found = pids_.find(stream);
    if (found == pids_.end()) {
      return -1;
    }
    const pid_t pid = found->second;
    pids_.erase(found);
    return pid;
  }

 private:
  std::mutex mutex_;
  std::unordered_map<FILE*, pid_t> pids_;
};

// Never destroyed: streams may be closed while the process is already leaving.
Children& AllChildren() {
  static auto& children = *new Children;
  return children;
}

// What posix_spawn is to do between fork and exec. Keeps the first error of its steps.
class SpawnPlan {
 public:
  SpawnPlan() {
    Note(posix_spawn_file_actions_init(&actions_));
    Note(posix_spawnattr_init(&attributes_));
  }
  ~SpawnPlan() {
    posix_spawn_file_actions_destroy(&actions_);
    posix_spawnattr_destroy(&attributes_);
  }
  SpawnPlan(const SpawnPlan&) = delete;
  SpawnPlan& operator=(const SpawnPlan&) = delete;

  void Connect(int fd, int target) {
    Note(posix_spawn_file_actions_adddup2(&actions_, fd, target));
  }

  void OpenNull(int target) {
    const int direction = target == STDIN_FILENO ? O_RDONLY : O_WRONLY;
    Note(posix_spawn_file_actions_addopen(&actions_, target, "/dev/null", direction, 0));
  }

  // The child starts with no signal blocked, and dies of a broken pipe, whatever is set up here.
  void ResetSignals() {
    sigset_t none;
    sigset_t broken_pipe;
    sigemptyset(&none);
    sigemptyset(&broken_pipe);
    sigaddset(&broken_pipe, SIGPIPE);
    Note(posix_spawnattr_setsigmask(&attributes_, &none));
    Note(posix_spawnattr_setsigdefault(&attributes_, &broken_pipe));
    Note(posix_spawnattr_setflags(&attributes_, POSIX_SPAWN_SETSIGMASK | POSIX_SPAWN_SETSIGDEF));
  }

  // Starts the program. Returns 0 or the error.
  int Run(const char* path, const char* const argv[], pid_t* pid) const {
    if (error_ != 0) {
      return error_;
    }
    return posix_spawn(pid, path, &actions_, &attributes_, const_cast<char* const*>(argv), environ);
  }

 private:
  void Note(int error) {
    if (error_ == 0) {
      error_ = error;
    }
  }

  posix_spawn_file_actions_t actions_{};
  posix_spawnattr_t attributes_{};
  int error_ = 0;
};

bool ReachesChild(int fd) {
  const int flags = fcntl(fd, F_GETFD);
  return flags >= 0 && (flags & FD_CLOEXEC) == 0;
}

// Starts the program with `child_end` as its standard input or output. Returns 0 or the error.
int Start(const char* path, const char* const argv[], const Descriptor& child_end, int target,
          pid_t* pid) {
  SpawnPlan plan;
  plan.ResetSignals();
  plan.Connect(child_end.get(), target);
  for (int fd = STDIN_FILENO; fd <= STDERR_FILENO; ++fd) {
    // A standard descriptor is never left closed: the first file that the child opens would get
    // its number, and with it the child's messages.
    if (fd != target && (fd == STDIN_FILENO || !ReachesChild(fd))) {
      plan.OpenNull(fd);
    }
  }
  return plan.Run(path, argv, pid);
}

FILE* Open(const char* path, bool reads, const char* const argv[]) {
  Pipe pipe;
  if (!tuvo_platform::MakePipe(&pipe)) {
    return nullptr;
  }
  Descriptor& own_end = reads ? pipe.read : pipe.write;
  const Descriptor& child_end = reads ? pipe.write : pipe.read;
  Stream stream(tuvo_platform::OpenPipeStream(std::move(own_end), reads ? "r" : "w"));
  if (stream == nullptr) {
    return nullptr;
  }
  // Entered before the child exists: from then on nothing may fail that would lose it.
  AllChildren().Add(stream.get(), -1);
  pid_t pid = -1;
  const int error = Start(path, argv, child_end, reads ? STDOUT_FILENO : STDIN_FILENO, &pid);
  if (error != 0) {
    AllChildren().Take(stream.get());
    stream.reset();
    errno = error;
    return nullptr;
  }
  AllChildren().Add(stream.get(), pid);
  return stream.release();
}

}  // namespace

// NOLINTNEXTLINE(cert-dcl50-cpp): the interface is C's, with the arguments in the call itself
FILE* TLIBCPopen(const char* path, const char* mode, ...) {
  std::va_list arguments;
  va_start(arguments, mode);
  FILE* stream = nullptr;
  try {
    std::vector<const char*> argv{path};
    do {
      argv.push_back(va_arg(arguments, const char*));
    } while (argv.back() != nullptr);
    stream = TLIBCPopenv(path, mode, argv.data());
  } catch (const std::exception&) {
    errno = ENOMEM;
  }
  va_end(arguments);
  return stream;
}

FILE* TLIBCPopenv(const char* path, const char* mode, const char* const argv[]) {
  const bool reads = mode != nullptr && std::strcmp(mode, "r") == 0;
  const bool writes = mode != nullptr && std::strcmp(mode, "w") == 0;
  if (path == nullptr || argv == nullptr || argv[0] == nullptr || reads == writes) {
    errno = EINVAL;
    return nullptr;
  }
  try {
    return Open(path, reads, argv);
  } catch (const std::exception&) {
    errno = ENOMEM;
    return nullptr;
  }
}

int TLIBCPclose(FILE* stream) {
  const pid_t pid = AllChildren().Take(stream);
  if (pid < 0) {
    errno = EINVAL;
    return -1;
  }
  // First the stream: a child that reads it ends only at its end. What the child did not take is
  // told by its status.
  static_cast<void>(std::fclose(stream));
  int status = 0;
  while (waitpid(pid, &status, 0) < 0) {
    if (errno != EINTR) {
      return -1;
    }
  }
  return status;
}
