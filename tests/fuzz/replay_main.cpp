// Meets every file of the given folders with the target function, without libFuzzer: so that the
// kept inputs and the targets go on fitting the code between two rounds of fuzzing.
#include <grp.h>
#include <unistd.h>

#include <algorithm>
#include <cstdio>
#include <cstdlib>
#include <exception>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <stdexcept>
#include <string>
#include <vector>

#include "target.h"

namespace {

std::vector<std::filesystem::path> FilesIn(const std::filesystem::path& folder) {
  std::vector<std::filesystem::path> files;
  for (const auto& entry : std::filesystem::directory_iterator(folder)) {
    files.push_back(entry.path());
  }
  std::sort(files.begin(), files.end());
  return files;
}

struct Input {
  std::string name;
  std::string bytes;
};

Input Read(const std::filesystem::path& path) {
  std::ifstream file(path, std::ios::binary);
  Input input{path.filename(), {std::istreambuf_iterator<char>(file), {}}};
  if (!file.is_open() || file.bad()) {
    throw std::runtime_error("cannot read " + path.string());
  }
  return input;
}

// The targets run as the system account, so that the library need not switch. The files are read
// before: the project may lie below a folder that is root's alone.
void BecomeSystem() {
  if (setgroups(0, nullptr) != 0 || setresgid(1, 1, 1) != 0 || setresuid(1, 1, 1) != 0) {
    throw std::runtime_error("cannot become the system account");
  }
}

int Run(int argc, char* argv[]) {
  std::vector<Input> inputs;
  for (int i = 1; i < argc; ++i) {
    for (const std::filesystem::path& path : FilesIn(argv[i])) {
      inputs.push_back(Read(path));
    }
  }
  BecomeSystem();
  for (const Input& input : inputs) {
    std::printf("%s\n", input.name.c_str());  // the last one before an end without a word
    std::fflush(stdout);
    LLVMFuzzerTestOneInput(reinterpret_cast<const std::uint8_t*>(input.bytes.data()),
                           input.bytes.size());
  }
  LLVMFuzzerTestOneInput(nullptr, 0);
  std::printf("%zu inputs\n", inputs.size());
  return inputs.empty() ? EXIT_FAILURE : EXIT_SUCCESS;
}

}  // namespace

int main(int argc, char* argv[]) {
  try {
    return Run(argc, argv);
  } catch (const std::exception& error) {
    std::fprintf(stderr, "%s\n", error.what());
    return EXIT_FAILURE;
  }
}
