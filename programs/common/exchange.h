// One request and its answer, whatever protocol a web server speaks.
#ifndef PROGRAMS_COMMON_EXCHANGE_H_
#define PROGRAMS_COMMON_EXCHANGE_H_

#include <cstddef>
#include <cstdint>
#include <string_view>

namespace common {

// The request's variables are in the environment; this is its body, and the way back. The answer is
// written as CGI has it: header lines, an empty line, a body.
class Exchange {
 public:
  Exchange() = default;
  virtual ~Exchange() = default;
  Exchange(const Exchange&) = delete;
  Exchange& operator=(const Exchange&) = delete;

  // Stores up to `size` further bytes of the request's body and returns how many; 0 at its end and
  // on an error. A form's body has been read once a TuvoCgiInit has succeeded.
  virtual size_t Read(char* data, size_t size) = 0;

  // Writes all of `bytes`. False when they did not get out: the visitor has left.
  virtual bool Write(std::string_view bytes) = 0;

  // Writes `length` bytes of the file `fd`, beginning at `offset`, in pieces, so that memory stays
  // small whatever the length. False also when the file has become shorter meanwhile.
  virtual bool WriteFile(int fd, std::int64_t offset, std::int64_t length) = 0;

  // The answer is complete: nobody waits for what the program still does, and nothing can be read
  // or written any more. False when the end did not get out.
  virtual bool Finish() = 0;
};

}  // namespace common

#endif  // PROGRAMS_COMMON_EXCHANGE_H_
