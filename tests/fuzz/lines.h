// How a fuzz target reads its input: as lines of text, so that the kept inputs can be written, read
// and changed by hand, and still say every byte.
#ifndef TESTS_FUZZ_LINES_H_
#define TESTS_FUZZ_LINES_H_

#include <cstddef>
#include <cstdint>
#include <string>
#include <string_view>

namespace fuzz {

class Lines {
 public:
  // The bytes stay the caller's.
  Lines(const std::uint8_t* data, std::size_t size);

  bool AtEnd() const { return rest_.empty(); }

  // The next line as it is; the empty text when there is none.
  std::string_view Raw();

  // The next line with its escapes replaced: \n, \r, \t, \\ and \x with two hexadecimal digits. Any
  // other backslash stands for itself.
  std::string Text();

  // The next line as a decimal number; 0 when it is none, or is none that fits.
  std::int64_t Number();

  // The next line as a number from 0 to `count` - 1, whatever it holds.
  std::size_t Choice(std::size_t count);

  // Whether the next line is "1".
  bool Flag() { return Raw() == "1"; }

  // All that follows, line ends included.
  std::string_view Rest();

 private:
  std::string_view rest_;
};

}  // namespace fuzz

#endif  // TESTS_FUZZ_LINES_H_
