// Watches the calls that the library makes of the platform's functions. All of them are carried
// out; single ones can be made to fail, where nothing real would make them.
//
// Linking this file into a test program puts it in front of the platform library. Calls that the
// platform makes of its own functions are not noted.
#ifndef TESTS_LOGIN_PLATFORM_SPY_H_
#define TESTS_LOGIN_PLATFORM_SPY_H_

#include <ctime>
#include <functional>
#include <map>
#include <optional>
#include <string>
#include <vector>

namespace tuvo_test {

// What TuvoCgiLogin was given last.
struct LoginCall {
  std::string user;
  std::string password;
  std::string client;
  int type;
  int flag;
  unsigned int reply_size;
  bool reply_was_zero;
};

struct PlatformSpy {
  std::vector<std::string> calls;  // the functions' names in order, with texts that matter
  LoginCall login;
  unsigned int address_size = 0;  // what TuvoCgiGetRemoteIP was given
  bool address_was_zero = false;

  // The function that fails, once `successes` calls of it went well; its answer is `answer`, or
  // null.
  std::string failing;
  int successes = 0;
  int answer = -1;
  // Runs out of memory instead.
  bool throws = false;

  // What happens when an account is about to log in; nothing if empty.
  std::function<void()> at_login;

  int threads = 0;  // how many threads were started

  // What TUVOUserLoginNameConvert makes of a name; names that are not here need no conversion.
  std::map<std::string, std::string> real_names;

  // What the next time() answers, in place of the clock; each call is `step` later than the last.
  std::optional<std::time_t> now;
  std::time_t step = 0;
};

// This process's.
PlatformSpy& Spy();

}  // namespace tuvo_test

#endif  // TESTS_LOGIN_PLATFORM_SPY_H_
