// How fast the authorisation check is without a web server: N processes with the ids that
// a set-user-id web program has, each checking the same visitor again and again.
//
//   in_process HASH SESSION PROCESSES SECONDS
//
// Prints a line of JSON: how many checks and how many of them were refused, the seconds that
// passed, the processes' CPU seconds, and the 99th percentile of a check in milliseconds.
#include <fcntl.h>
#include <grp.h>
#include <sys/resource.h>
#include <sys/wait.h>
#include <tuvosharing/login.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <iostream>
#include <string>
#include <vector>

namespace {

using Clock = std::chrono::steady_clock;

constexpr unsigned int kWebServer = 33;  // www-data
constexpr int kSuccess = 1;
constexpr double kRareShare = 0.99;

struct Pipe {
  int out = -1;
  int in = -1;
};

struct Check {
  float milliseconds = 0;
  bool refused = false;
};

[[noreturn]] void Fail(const char* what) {
  std::perror(what);
  _exit(1);
}

Pipe NewPipe() {
  std::array<int, 2> ends{};
  if (pipe2(ends.data(), O_CLOEXEC) != 0) {
    Fail("pipe");
  }
  return {ends[0], ends[1]};
}

// Root is left as the saved id, to which the library returns for its own moments.
void TakeWebProgramIds() {
  if (setgroups(0, nullptr) != 0 || setresgid(kWebServer, kWebServer, 0) != 0 ||
      setresuid(kWebServer, kWebServer, 0) != 0) {
    Fail("ids");
  }
}

Check CheckOnce(const _tag_sharing_login_params& params) {
  const auto begin = Clock::now();
  const bool refused = TUVO::TuvoSharingIsAuthorized(&params) != kSuccess;
  return {std::chrono::duration<float, std::milli>(Clock::now() - begin).count(), refused};
}

void WriteAll(int fd, const std::vector<Check>& checks) {
  const char* data = reinterpret_cast<const char*>(checks.data());
  size_t left = checks.size() * sizeof(Check);
  while (left > 0) {
    const ssize_t count = write(fd, data, left);
    if (count <= 0) {
      Fail("write");
    }
    data += count;
    left -= static_cast<size_t>(count);
  }
}

std::vector<Check> ReadAll(int fd) {
  std::string bytes;
  std::array<char, 65536> piece{};
  for (;;) {
    const ssize_t count = read(fd, piece.data(), piece.size());
    if (count < 0) {
      Fail("read");
    }
    if (count == 0) {
      break;
    }
    bytes.append(piece.data(), static_cast<size_t>(count));
  }
  std::vector<Check> checks(bytes.size() / sizeof(Check));
  std::copy_n(bytes.data(), checks.size() * sizeof(Check), reinterpret_cast<char*>(checks.data()));
  return checks;
}

// One process: the first check opens the database and does not count; the others begin when the
// parent closes `start`.
[[noreturn]] void Work(const _tag_sharing_login_params& params, double seconds, int start,
                       int result) {
  TakeWebProgramIds();
  if (CheckOnce(params).refused) {
    std::cerr << "the visitor is not admitted\n";
    _exit(1);
  }
  char nothing = 0;
  if (read(start, &nothing, 1) != 0) {
    Fail("start");
  }
  std::vector<Check> checks;
  const auto end = Clock::now() + std::chrono::duration<double>(seconds);
  while (Clock::now() < end) {
    checks.push_back(CheckOnce(params));
  }
  WriteAll(result, checks);
  _exit(0);
}

double CpuOfChildren() {
  rusage usage{};
  getrusage(RUSAGE_CHILDREN, &usage);
  const auto seconds = [](const timeval& time) {
    return static_cast<double>(time.tv_sec) + static_cast<double>(time.tv_usec) / 1e6;
  };
  return seconds(usage.ru_utime) + seconds(usage.ru_stime);
}

bool AllEndedWell(int processes) {
  bool well = true;
  for (int count = 0; count < processes; ++count) {
    int status = 0;
    well = wait(&status) > 0 && WIFEXITED(status) && WEXITSTATUS(status) == 0 && well;
  }
  return well;
}

float Percentile(std::vector<Check>* checks, double share) {
  if (checks->empty()) {
    return 0;
  }
  const auto at = static_cast<size_t>(static_cast<double>(checks->size() - 1) * share);
  const auto place = checks->begin() + static_cast<std::ptrdiff_t>(at);
  std::nth_element(checks->begin(), place, checks->end(), [](const Check& one, const Check& other) {
    return one.milliseconds < other.milliseconds;
  });
  return place->milliseconds;
}

int Run(const _tag_sharing_login_params& params, int processes, double seconds) {
  const Pipe start = NewPipe();
  std::vector<int> results;
  for (int count = 0; count < processes; ++count) {
    const Pipe result = NewPipe();
    const pid_t child = fork();
    if (child < 0) {
      Fail("fork");
    }
    if (child == 0) {
      close(start.in);
      Work(params, seconds, start.out, result.in);
    }
    close(result.in);
    results.push_back(result.out);
  }
  close(start.in);
  std::vector<Check> checks;
  for (const int result : results) {
    const std::vector<Check> some = ReadAll(result);
    checks.insert(checks.end(), some.begin(), some.end());
  }
  if (!AllEndedWell(processes)) {
    return 1;
  }
  const auto refused =
      std::count_if(checks.begin(), checks.end(), [](const Check& check) { return check.refused; });
  std::cout << "{\"requests\": " << checks.size() << ", \"failures\": " << refused
            << ", \"seconds\": " << seconds << ", \"cpu_seconds\": " << CpuOfChildren()
            << ", \"p99_ms\": " << Percentile(&checks, kRareShare) << "}\n";
  return 0;
}

}  // namespace

int main(int argc, char** argv) {
  constexpr int kWords = 5;
  constexpr int kDecimal = 10;
  if (argc != kWords) {
    std::cerr << "usage: in_process HASH SESSION PROCESSES SECONDS\n";
    return 2;
  }
  setenv("REMOTE_ADDR", "127.0.0.1", 1);
  _tag_sharing_login_params params{};
  params.sharing_id = argv[1];
  params.sharing_sid = argv[2];
  const int processes = static_cast<int>(std::strtol(argv[3], nullptr, kDecimal));
  return Run(params, processes, std::strtod(argv[4], nullptr));
}
