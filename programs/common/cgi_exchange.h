// A request by CGI: one for each process.
#ifndef PROGRAMS_COMMON_CGI_EXCHANGE_H_
#define PROGRAMS_COMMON_CGI_EXCHANGE_H_

#include "common/exchange.h"

namespace common {

// The body is standard input, the answer standard output.
class CgiExchange final : public Exchange {
 public:
  size_t Read(char* data, size_t size) override;
  bool Write(std::string_view bytes) override;

  // Web servers end the program (SIGTERM) also when the visitor has left. The closed pipe says so
  // as well, and leaves the program the time to tell.
  bool WriteFile(int fd, std::int64_t offset, std::int64_t length) override;

  // Web servers take the end of the output for the end of the answer, and end the program then
  // (SIGTERM); from here on the program ignores that, so that what it still does is not cut short.
  bool Finish() override;

 private:
  bool finished_ = false;
};

}  // namespace common

#endif  // PROGRAMS_COMMON_CGI_EXCHANGE_H_
