// The digests when the libraries beneath them or the memory give out. This program puts functions
// of its own before those of the libraries, hence it is one of its own.
#include <dlfcn.h>
#include <gcrypt.h>
#include <gtest/gtest.h>
#define OPENSSL_SUPPRESS_DEPRECATED
#include <openssl/md5.h>
#include <tuvosharing/utils.h>

#include <cstdarg>
#include <new>
#include <string>
#include <vector>

#include "support/syslog_listener.h"

namespace {

std::string failing;             // the one function that fails
int failure = 0;                 // what it answers
unsigned int other_length = 0;   // when set, the length that libgcrypt tells of its digest
std::vector<std::string> calls;  // what was called, in order
void* room = nullptr;            // the last that was taken for a text, until it is freed

int Answer(const char* name) {
  calls.emplace_back(name);
  return failing == name ? failure : 1;
}

template <typename Function>
Function Real(const char* name) {
  return reinterpret_cast<Function>(dlsym(RTLD_NEXT, name));
}

}  // namespace

// The libraries' functions are looked up by name, among what this program exports first.
#define TUVO_FOUND __attribute__((visibility("default")))

extern "C" {

TUVO_FOUND int MD5_Init(MD5_CTX* context) {
  const int answer = Answer("MD5_Init");
  return answer == 1 ? Real<decltype(&MD5_Init)>("MD5_Init")(context) : answer;
}

TUVO_FOUND int MD5_Update(MD5_CTX* context, const void* data, size_t length) {
  const int answer = Answer("MD5_Update");
  return answer == 1 ? Real<decltype(&MD5_Update)>("MD5_Update")(context, data, length) : answer;
}

TUVO_FOUND int MD5_Final(unsigned char* digest, MD5_CTX* context) {
  const int answer = Answer("MD5_Final");
  return answer == 1 ? Real<decltype(&MD5_Final)>("MD5_Final")(digest, context) : answer;
}

TUVO_FOUND gcry_error_t gcry_control(enum gcry_ctl_cmds command, ...) {
  va_list arguments;
  va_start(arguments, command);
  const int argument = va_arg(arguments, int);
  va_end(arguments);
  const std::string name = command == GCRYCTL_DISABLE_SECMEM            ? "DISABLE_SECMEM"
                           : command == GCRYCTL_INITIALIZATION_FINISHED ? "INITIALIZATION_FINISHED"
                                                                        : "another command";
  calls.push_back(name + " " + std::to_string(argument));
  return Real<decltype(&gcry_control)>("gcry_control")(command, 0);
}

TUVO_FOUND unsigned int gcry_md_get_algo_dlen(int algo) {
  calls.push_back("length of " + std::string(gcry_md_algo_name(algo)));
  return other_length != 0 ? other_length
                           : Real<decltype(&gcry_md_get_algo_dlen)>("gcry_md_get_algo_dlen")(algo);
}

TUVO_FOUND void gcry_md_hash_buffer(int algo, void* digest, const void* buffer, size_t length) {
  calls.push_back(std::string(gcry_md_algo_name(algo)) + " of " +
                  std::string(static_cast<const char*>(buffer), length));
  Real<decltype(&gcry_md_hash_buffer)>("gcry_md_hash_buffer")(algo, digest, buffer, length);
}

}  // extern "C"

void* operator new[](std::size_t size, const std::nothrow_t& /*tag*/) noexcept {
  calls.push_back("room for " + std::to_string(size));
  if (failing == "new") {
    return nullptr;
  }
  try {
    room = ::operator new[](size);
    return room;
  } catch (const std::bad_alloc&) {
    return nullptr;
  }
}

void operator delete[](void* memory) noexcept {
  if (memory == room) {
    room = nullptr;
  }
  Real<void (*)(void*)>("_ZdaPv")(memory);
}

void operator delete[](void* memory, std::size_t /*size*/) noexcept {
  ::operator delete[](memory);
}

namespace {

using TUVO::sharing::MD5HashPassword;
using TUVO::sharing::Sha1WithSaltHashPassword;
using Calls = std::vector<std::string>;

class PasswordHashFailure : public testing::Test {
 protected:
  PasswordHashFailure() { Reset(""); }
  ~PasswordHashFailure() override { Reset(""); }

  static void Reset(const std::string& name) {
    failing = name;
    failure = 0;
    other_length = 0;
    calls.clear();
  }
};

TEST_F(PasswordHashFailure, EachFailingStepOfMd5FailsTheDigestAndLeavesTheOutputAlone) {
  for (const char* step : {"MD5_Init", "MD5_Update", "MD5_Final"}) {
    for (const int answer : {0, -1}) {
      Reset(step);
      failure = answer;
      std::string out = "kept";
      EXPECT_FALSE(MD5HashPassword("abc", out)) << step << " " << answer;
      EXPECT_EQ(out, "kept") << step;
      EXPECT_EQ(calls.back(), step);
    }
  }
}

TEST_F(PasswordHashFailure, Md5IsMadeOfOpensslsThreeSteps) {
  std::string out;
  EXPECT_TRUE(MD5HashPassword("abc", out));
  EXPECT_EQ(calls, (Calls{"MD5_Init", "MD5_Update", "MD5_Final"}));
}

TEST_F(PasswordHashFailure, AnEmptyPasswordAsksOpensslForNothing) {
  std::string out;
  EXPECT_FALSE(MD5HashPassword("", out));
  EXPECT_EQ(calls, Calls{});
}

TEST_F(PasswordHashFailure, Sha1MakesLibgcryptReadyBeforeEveryDigestThatItMakesInOneCall) {
  std::string out;
  const Calls once{"DISABLE_SECMEM 0", "INITIALIZATION_FINISHED 0", "length of SHA1", "SHA1 of abc",
                   "room for 41"};
  for (int i = 0; i < 2; ++i) {
    calls.clear();
    EXPECT_TRUE(Sha1WithSaltHashPassword("ab", "c", out));
    EXPECT_EQ(calls, once);
  }
}

TEST_F(PasswordHashFailure, TheRoomForSha1sTextIsFreed) {
  std::string out;
  EXPECT_TRUE(Sha1WithSaltHashPassword("ab", "c", out));
  EXPECT_EQ(calls.back(), "room for 41");
  EXPECT_EQ(room, nullptr);
}

TEST_F(PasswordHashFailure, Sha1WithoutMemoryFailsAndLeavesTheOutputAlone) {
  Reset("new");
  std::string out = "kept";
  EXPECT_FALSE(Sha1WithSaltHashPassword("ab", "c", out));
  EXPECT_EQ(out, "kept");
}

// There is room for 20 bytes; a libgcrypt that has no such digest tells 0.
TEST_F(PasswordHashFailure, ADigestOfAnotherLengthIsNotMade) {
  for (const unsigned int length : {19U, 21U, 64U}) {
    Reset("");
    other_length = length;
    std::string out = "kept";
    EXPECT_FALSE(Sha1WithSaltHashPassword("ab", "c", out));
    EXPECT_EQ(out, "kept");
    EXPECT_EQ(calls.back(), "length of SHA1");
  }
}

TEST_F(PasswordHashFailure, NoFailureIsLogged) {
  tuvo_test::SyslogListener listener;
  for (const char* step : {"MD5_Init", "MD5_Update", "MD5_Final", "new"}) {
    Reset(step);
    std::string out;
    MD5HashPassword("", out);
    MD5HashPassword("abc", out);
    Sha1WithSaltHashPassword("ab", "c", out);
  }
  EXPECT_EQ(listener.TakeTexts(), Calls{});
}

}  // namespace
