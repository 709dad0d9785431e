// Watches the calls that the library makes of the platform's functions. All of them are carried
// out; single ones can be made to fail, where nothing real would make them.
//
// Linking this file into a test program puts it in front of the platform library. Calls that the
// platform makes of its own functions are not noted.
#ifndef TESTS_LOGIN_PLATFORM_SPY_H_
#define TESTS_LOGIN_PLATFORM_SPY_H_

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

  // The function that fails, once `successes` calls of it went well; -1 (null) is its answer.
  std::string failing;
  int successes = 0;
  // Runs out of memory instead.
  bool throws = false;
};

// This process's.
PlatformSpy& Spy();

}  // namespace tuvo_test

#endif  // TESTS_LOGIN_PLATFORM_SPY_H_
