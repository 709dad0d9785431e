// A request by FastCGI.
#ifndef PROGRAMS_COMMON_FASTCGI_EXCHANGE_H_
#define PROGRAMS_COMMON_FASTCGI_EXCHANGE_H_

#include <fcgiapp.h>

#include "common/exchange.h"

namespace common {

// An accepted request, for as long as it is served.
class FastCgiExchange final : public Exchange {
 public:
  // `request` has been accepted and must outlive this.
  explicit FastCgiExchange(FCGX_Request* request);
  ~FastCgiExchange() override;

  size_t Read(char* data, size_t size) override;
  bool Write(std::string_view bytes) override;
  bool WriteFile(int fd, std::int64_t offset, std::int64_t length) override;

  // Also closes the connection, whatever the web server asked for: one that was kept open would
  // hold this process for its owner, while others wait. The request's variables are freed.
  bool Finish() override;

 private:
  FCGX_Request* request_;  // null once finished
};

}  // namespace common

#endif  // PROGRAMS_COMMON_FASTCGI_EXCHANGE_H_
