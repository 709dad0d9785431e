// The process environment of a program that may be installed set-user-id.
#ifndef PROGRAMS_COMMON_ENVIRONMENT_H_
#define PROGRAMS_COMMON_ENVIRONMENT_H_

#include <string>
#include <string_view>
#include <vector>

namespace common {

// Makes requests' variables the process's environment, one after another: the variables that the
// program names, and no other. A local user who starts the program by hand must not steer the
// libraries' time zone, temporary folders and the like while they run as somebody else, and nothing
// of one request may be left for the next. The texts are this object's own: setenv would leak each
// value that it replaces. One object at a time; at its end the environment is empty.
class RequestEnvironment {
 public:
  explicit RequestEnvironment(std::vector<std::string_view> names);
  ~RequestEnvironment();
  RequestEnvironment(const RequestEnvironment&) = delete;
  RequestEnvironment& operator=(const RequestEnvironment&) = delete;

  // Takes over from `variables` ("NAME=value" each, null at the end; null for none; may be the
  // environment itself). Of a POST the query string goes as well: what is typed into a form travels
  // in the body, and a password in an address, where logs and histories keep it, is not taken.
  // May throw std::bad_alloc; the environment is then empty.
  void Become(const char* const* variables);

 private:
  bool IsKept(std::string_view variable) const;

  const std::vector<std::string_view> names_;
  std::vector<std::string> texts_;
  std::vector<char*> pointers_;
};

}  // namespace common

#endif  // PROGRAMS_COMMON_ENVIRONMENT_H_
