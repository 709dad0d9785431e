#include <gtest/gtest.h>
#include <linux/audit.h>
#include <linux/filter.h>
#include <linux/seccomp.h>
#include <sys/prctl.h>
#include <sys/random.h>
#include <sys/resource.h>
#include <sys/syscall.h>
#include <sys/wait.h>
#include <tuvoplatform/random.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <atomic>
#include <cctype>
#include <cerrno>
#include <climits>
#include <cstddef>
#include <iterator>
#include <memory>
#include <set>
#include <string>
#include <thread>
#include <vector>

#include "support/child.h"

namespace {

// How the next calls for random bytes go: so many fail with EINTR first, and no more bytes than
// this are given in one call (0: as many as asked for).
std::atomic<int> interruptions{0};
std::atomic<size_t> at_most{0};
std::atomic<int> calls{0};

}  // namespace

// Stands in front of the C library's for this program and the library that it tests; the bytes are
// the kernel's own.
extern "C" __attribute__((visibility("default"))) ssize_t getrandom(void* buffer, size_t size,
                                                                    unsigned int flags) {
  ++calls;
  if (interruptions > 0) {
    --interruptions;
    errno = EINTR;
    return -1;
  }
  if (at_most != 0) {
    size = std::min(size, at_most.load());
  }
  return syscall(SYS_getrandom, buffer, size, flags);
}

namespace {

using TUVO::RANDOM::POOL_ALPHA_NUMERIC;
using TUVO::RANDOM::POOL_URL_FRIENDLY;
using TUVO::RANDOM::TUVORandom;
using TUVO::RANDOM::TUVORandomBase;
using tuvo_test::RunInChild;

double Count(const std::string& text, char c) {
  return static_cast<double>(std::count(text.begin(), text.end(), c));
}

class Random : public ::testing::Test {
 protected:
  Random() {
    interruptions = 0;
    at_most = 0;
    calls = 0;
  }

  std::string Draw(const std::string& pool, unsigned int length) {
    std::string text = "old";
    EXPECT_TRUE(random_.getString(pool, length, text));
    return text;
  }

  TUVORandom random_;
};

// Makes the kernel refuse random bytes to this process from now on.
bool RefuseRandomBytes(unsigned int error) {
  sock_filter filter[] = {
      BPF_STMT(BPF_LD | BPF_W | BPF_ABS, offsetof(seccomp_data, nr)),
      BPF_JUMP(BPF_JMP | BPF_JEQ | BPF_K, SYS_getrandom, 0, 1),
      BPF_STMT(BPF_RET | BPF_K, SECCOMP_RET_ERRNO | error),
      BPF_STMT(BPF_RET | BPF_K, SECCOMP_RET_ALLOW),
  };
  const sock_fprog program{static_cast<unsigned short>(std::size(filter)), filter};
  return prctl(PR_SET_NO_NEW_PRIVS, 1, 0, 0, 0) == 0 &&
         prctl(PR_SET_SECCOMP, SECCOMP_MODE_FILTER, &program) == 0;
}

TEST_F(Random, PoolsHoldTheirCharactersOnce) {
  std::string letters_and_digits;
  for (int c = 0; c < 128; ++c) {
    if (isalnum(c) != 0) {
      letters_and_digits.push_back(static_cast<char>(c));
    }
  }
  std::string pool = POOL_ALPHA_NUMERIC;
  std::sort(pool.begin(), pool.end());
  EXPECT_EQ(letters_and_digits, pool);
  EXPECT_EQ(62U, pool.size());
  EXPECT_EQ(std::string(POOL_ALPHA_NUMERIC) + "-_", POOL_URL_FRIENDLY);
}

TEST_F(Random, NumbersStayWithinTheirBoundsAndReachThem) {
  std::set<int> seen;
  for (int i = 0; i < 2000; ++i) {
    seen.insert(random_.random(-3, 4));
  }
  EXPECT_EQ((std::set<int>{-3, -2, -1, 0, 1, 2, 3, 4}), seen);
}

TEST_F(Random, WithoutAChoiceTheKernelIsNotAsked) {
  EXPECT_EQ(5, random_.random(5, 5));
  EXPECT_EQ(3, random_.random(9, 3));
  EXPECT_EQ(INT_MIN, random_.random(INT_MAX, INT_MIN));
  EXPECT_EQ(0, calls);
}

TEST_F(Random, AHashIsDrawnWithOneCallOfTheKernel) {
  Draw(POOL_ALPHA_NUMERIC, 9);
  EXPECT_EQ(1, calls);
}

TEST_F(Random, NumbersComeFromTheWholeRangeOfInt) {
  int negative = 0;
  for (int i = 0; i < 2000; ++i) {
    negative += random_.random(INT_MIN, INT_MAX) < 0 ? 1 : 0;
  }
  EXPECT_NEAR(1000, negative, 150);  // more than six standard deviations
}

TEST_F(Random, NumbersOfALargeRangeAreNotBiased) {
  // Three quarters of 2^32: a remainder of a 32-bit number would draw the lowest third twice as
  // often as the others.
  const int third = 1 << 30;
  const int low = INT_MIN;
  constexpr int kDraws = 30000;
  int lowest = 0;
  for (int i = 0; i < kDraws; ++i) {
    lowest += random_.random(low, low + third - 1 + third + third) < low + third ? 1 : 0;
  }
  EXPECT_NEAR(kDraws / 3, lowest, 500);  // six standard deviations
}

TEST_F(Random, PercentilesAreUniform) {
  constexpr int kDraws = 200000;
  std::array<int, 100> counts{};
  for (int i = 0; i < kDraws; ++i) {
    ++counts.at(static_cast<size_t>(random_.random(0, 99)));
  }
  double chi_square = 0;
  for (const int count : counts) {
    chi_square += (count - 2000.0) * (count - 2000.0) / 2000.0;
  }
  EXPECT_LT(chi_square, 200);  // 99 degrees of freedom: less than one run in ten million
}

TEST_F(Random, TextReplacesWhatWasThere) {
  EXPECT_EQ(9U, Draw(POOL_ALPHA_NUMERIC, 9).size());
  EXPECT_EQ("", Draw(POOL_ALPHA_NUMERIC, 0));
  EXPECT_EQ("aaaaa", Draw("a", 5));
}

TEST_F(Random, TextHoldsCharactersOfThePoolAlone) {
  const std::string text = Draw(POOL_URL_FRIENDLY, 5000);
  EXPECT_EQ(5000U, text.size());
  EXPECT_EQ(std::string::npos, text.find_first_not_of(POOL_URL_FRIENDLY));
}

TEST_F(Random, EveryByteOfThePoolCounts) {
  const std::string pool("\0\xff'a", 4);
  const std::string text = Draw(pool, 1000);
  EXPECT_EQ(std::string::npos, text.find_first_not_of(pool));
  for (const char c : pool) {
    EXPECT_NEAR(250, Count(text, c), 100);
  }
  const std::string uneven = Draw("aaab", 4000);  // by bytes, not by different characters
  EXPECT_NEAR(3000, Count(uneven, 'a'), 180);
}

TEST_F(Random, CharactersAreUniform) {
  // The remainder of a byte would draw the first 8 of the 62 characters a quarter more often.
  const std::string pool = POOL_ALPHA_NUMERIC;
  const std::string text = Draw(pool, 620000);
  double chi_square = 0;
  for (const char c : pool) {
    const double off = Count(text, c) - 10000.0;
    chi_square += off * off / 10000.0;
  }
  EXPECT_LT(chi_square, 145);  // 61 degrees of freedom: less than one run in a million
}

TEST_F(Random, NoTextIsDrawnTwice) {
  std::set<std::string> seen;
  for (int i = 0; i < 5000; ++i) {
    EXPECT_TRUE(seen.insert(Draw(POOL_ALPHA_NUMERIC, 9)).second);
  }
}

TEST_F(Random, EmptyPoolFailsWithAnEmptyText) {
  std::string text = "old";
  EXPECT_FALSE(random_.getString("", 5, text));
  EXPECT_EQ("", text);
}

TEST_F(Random, TextMayReplaceItsOwnPool) {
  std::string text = "ab";
  EXPECT_TRUE(random_.getString(text, 100, text));
  EXPECT_EQ(100U, text.size());
  EXPECT_EQ(std::string::npos, text.find_first_not_of("ab"));
}

TEST_F(Random, InterruptedAndShortReadsAreContinued) {
  interruptions = 5;
  at_most = 7;
  const std::string text = Draw(POOL_ALPHA_NUMERIC, 1000);
  EXPECT_EQ(1000U, text.size());
  EXPECT_GT(calls.load(), 5 + 500 / 7);
  // A part of the buffer that was never filled would be one character over and over.
  double chi_square = 0;
  for (const char* c = POOL_ALPHA_NUMERIC; *c != '\0'; ++c) {
    const double off = Count(text, *c) - 1000 / 62.0;
    chi_square += off * off / (1000 / 62.0);
  }
  EXPECT_LT(chi_square, 145);
}

TEST_F(Random, ForkedProcessesDrawDifferently) {
  Draw(POOL_ALPHA_NUMERIC, 3);  // leaves most of what was fetched unused
  int ends[2];
  ASSERT_EQ(0, pipe(ends));
  ASSERT_EQ(0, RunInChild([&] {
              const std::string text = Draw(POOL_ALPHA_NUMERIC, 32);
              return write(ends[1], text.data(), text.size()) == 32 ? 0 : 1;
            }));
  std::string other(32, '\0');
  ASSERT_EQ(32, read(ends[0], other.data(), other.size()));
  EXPECT_NE(other, Draw(POOL_ALPHA_NUMERIC, 32));
  close(ends[0]);
  close(ends[1]);
}

TEST_F(Random, ThreadsMayShareAnObject) {
  std::vector<std::set<std::string>> texts(4);
  std::vector<std::thread> threads;
  for (auto& mine : texts) {
    threads.emplace_back([&] {
      for (int i = 0; i < 500; ++i) {
        std::string text;
        EXPECT_TRUE(random_.getString(POOL_URL_FRIENDLY, 32, text));
        mine.insert(text);
        EXPECT_LE(random_.random(0, 9), 9);
      }
    });
  }
  std::set<std::string> all;
  for (size_t i = 0; i < threads.size(); ++i) {
    threads[i].join();
    all.insert(texts[i].begin(), texts[i].end());
  }
  EXPECT_EQ(2000U, all.size());
}

TEST_F(Random, FailingKernelGivesNoTextAndTheHighNumber) {
  for (const unsigned int error : {ENOSYS, EPERM}) {
    EXPECT_EQ(0, RunInChild([&] {
                EXPECT_TRUE(RefuseRandomBytes(error));
                std::string text = "old";
                EXPECT_FALSE(random_.getString(POOL_ALPHA_NUMERIC, 9, text));
                EXPECT_EQ("", text);
                EXPECT_EQ(99, random_.random(0, 99));
                EXPECT_EQ(-5, random_.random(INT_MIN, -5));
                return 0;
              }));
  }
}

TEST_F(Random, TextThatNoMemoryHoldsFails) {
#ifdef __SANITIZE_ADDRESS__
  GTEST_SKIP() << "the address sanitizer cannot live under a limit of the address space";
#endif
  std::string text = "old";
  EXPECT_EQ(0, RunInChild([&] {
              rlimit limit{1U << 30U, 1U << 30U};
              if (setrlimit(RLIMIT_AS, &limit) != 0) {
                return 1;
              }
              EXPECT_FALSE(random_.getString("ab", 4000000000U, text));
              EXPECT_EQ("", text);
              return 0;
            }));
}

TEST_F(Random, ObjectsAreDeletedThroughTheirClass) {
  const std::unique_ptr<TUVORandom> random = std::make_unique<TUVORandom>();
  TUVORandomBase& base = *random;
  EXPECT_EQ(1, base.random(1, 1));
}

}  // namespace
