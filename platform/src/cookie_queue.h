// Set-Cookie lines that wait for the program to send its headers.
#ifndef PLATFORM_SRC_COOKIE_QUEUE_H_
#define PLATFORM_SRC_COOKIE_QUEUE_H_

#include <cstdio>
#include <string>
#include <string_view>
#include <vector>

namespace tuvo_platform {

class CookieQueue {
 public:
  // Queues a cookie, in place of one with the same name and path. Returns false, with the queue as
  // it was, when the name is no token (RFC 6265), the value holds anything but cookie octets, or
  // the path does not begin with '/' or holds ';', a control character or anything beyond ASCII:
  // with such a text a client could add attributes, or headers, of its own.
  bool Set(std::string_view name, std::string_view value, std::string_view path);

  // Writes the lines of the cookies called `name` (null: of all) in their order and forgets them.
  // Returns their number; -1 on a write error, the cookies then stay queued.
  int Write(const char* name, bool secure, std::FILE* out);

 private:
  struct Cookie {
    std::string name;
    std::string value;
    std::string path;
  };

  std::vector<Cookie> cookies_;
};

}  // namespace tuvo_platform

#endif  // PLATFORM_SRC_COOKIE_QUEUE_H_
