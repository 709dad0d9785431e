// Lines from a descriptor.
#ifndef PROGRAMS_CLI_LINE_READER_H_
#define PROGRAMS_CLI_LINE_READER_H_

#include <cstddef>
#include <string>

namespace cli {

class LineReader {
 public:
  // Does not own `fd`. A line may have `longest` bytes.
  LineReader(int fd, std::size_t longest) : fd_(fd), longest_(longest) {}

  // The next line without its line feed (a last one may lack it); false at the end. Throws Failure
  // when the line is too long or cannot be read, Interruption when a signal came.
  bool Next(std::string* line);

 private:
  bool Fill();

  int fd_;
  std::size_t longest_;
  std::string ahead_;
  std::size_t taken_ = 0;
  bool ended_ = false;
};

// Everything up to the end, at most `most` bytes. Throws as LineReader::Next.
std::string ReadAll(int fd, std::size_t most);

}  // namespace cli

#endif  // PROGRAMS_CLI_LINE_READER_H_
