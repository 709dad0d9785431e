// Standard output, on which a signal ends the waiting for a reader.
#ifndef PROGRAMS_CLI_STANDARD_OUTPUT_H_
#define PROGRAMS_CLI_STANDARD_OUTPUT_H_

#include <array>
#include <streambuf>
#include <string_view>

namespace cli {

// Writes all of `bytes`, waiting for a slow reader for as long as no signal came. False on an
// error, with errno. Throws Interruption.
bool WriteOutput(int fd, std::string_view bytes);

// For its lifetime std::cout writes as WriteOutput does. A stream knows no Interruption: std::cout
// is then bad, as after an error, and NotedSignal tells the two apart.
class StandardOutput : public std::streambuf {
 public:
  StandardOutput();
  ~StandardOutput() override;
  StandardOutput(const StandardOutput&) = delete;
  StandardOutput& operator=(const StandardOutput&) = delete;

 protected:
  int_type overflow(int_type byte) override;
  int sync() override;

 private:
  bool Empty();

  static constexpr std::size_t kSize = 65536;
  std::array<char, kSize> buffer_{};
  std::streambuf* former_;
};

}  // namespace cli

#endif  // PROGRAMS_CLI_STANDARD_OUTPUT_H_
