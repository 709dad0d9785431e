// The platform's command-line tools, as real programs that a test puts into the private /usr/tuvo.
#ifndef TESTS_UTILS_TOOL_H_
#define TESTS_UTILS_TOOL_H_

#include <sys/wait.h>
#include <syslog.h>

#include <cerrno>
#include <csignal>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <stdexcept>
#include <string>
#include <vector>

namespace tuvo_test {

inline void WriteFile(const std::string& path, const std::string& text) {
  std::ofstream file(path, std::ios::binary | std::ios::trunc);
  if (!(file << text).flush()) {
    throw std::runtime_error("cannot write " + path);
  }
}

// The program at `path`, gone when the object is. Without one of the two functions there is none.
class Tool {
 public:
  explicit Tool(std::string path) : path_(std::move(path)) { std::filesystem::remove(path_); }
  ~Tool() { std::filesystem::remove(path_); }
  Tool(const Tool&) = delete;
  Tool& operator=(const Tool&) = delete;

  // The tool records its arguments and prints `output`, whatever bytes it has.
  void Prints(const std::string& output) {
    WriteFile("/tmp/tool-output", output);
    std::filesystem::remove("/tmp/tool-arguments");
    std::filesystem::copy_file(TUVO_RECORDING_TOOL, path_,
                               std::filesystem::copy_options::overwrite_existing);
  }

  // The tool is a shell script.
  void Runs(const std::string& script) {
    WriteFile(path_, "#!/bin/sh\n" + script + "\n");
    std::filesystem::permissions(path_, static_cast<std::filesystem::perms>(0755));
  }

  const std::string& path() const { return path_; }

 private:
  std::string path_;
};

// The arguments of the tool that ran last, its own name first. Empty when none ran.
inline std::vector<std::string> ToolArguments() {
  std::ifstream file("/tmp/tool-arguments", std::ios::binary);
  const std::string text{std::istreambuf_iterator<char>(file), {}};
  std::vector<std::string> arguments;
  for (size_t at = 0; at < text.size(); at += arguments.back().size() + 1) {
    arguments.emplace_back(text.c_str() + at);
  }
  return arguments;
}

// Connects to the system log, whose descriptor is then among those that are counted.
inline void OpenLogNow() {
  openlog(nullptr, LOG_NDELAY, LOG_USER);
}

inline size_t OpenDescriptors() {
  const std::filesystem::directory_iterator folder("/proc/self/fd");
  return static_cast<size_t>(std::distance(begin(folder), end(folder)));
}

// Whether this process has a child, running or not waited for.
inline bool HasChildren() {
  siginfo_t child{};
  return waitid(P_ALL, 0, &child, WEXITED | WNOHANG | WNOWAIT) == 0 || errno != ECHILD;
}

}  // namespace tuvo_test

#endif  // TESTS_UTILS_TOOL_H_
