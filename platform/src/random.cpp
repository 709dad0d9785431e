#include <sys/random.h>
#include <sys/types.h>
#include <tuvoplatform/random.h>

#include <array>
#include <cerrno>
#include <cstddef>
#include <cstdint>
#include <exception>
#include <limits>
#include <random>
#include <system_error>
#include <utility>

namespace TUVO::RANDOM {

const char* const POOL_ALPHA_NUMERIC =
    "0123456789ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz";
const char* const POOL_URL_FRIENDLY =
    "0123456789ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz-_";

namespace {

// Fills `size` bytes from the kernel's generator; throws std::system_error when it fails.
void FillFromKernel(void* bytes, std::size_t size) {
  auto* at = static_cast<char*>(bytes);
  while (size != 0) {
    const ssize_t got = getrandom(at, size, 0);
    if (got > 0) {
      at += got;
      size -= static_cast<std::size_t>(got);
    } else if (got == 0 || errno != EINTR) {
      throw std::system_error(errno, std::generic_category(), "getrandom");
    }
  }
}

// The kernel's generator as the standard distributions want it. An object lives for one draw: what
// it has fetched and not used is gone afterwards, so no fork can hand it to two processes.
class KernelBits {
 public:
  using result_type = std::uint32_t;
  static constexpr result_type min() { return 0; }
  static constexpr result_type max() { return std::numeric_limits<result_type>::max(); }

  result_type operator()() {
    if (next_ == words_.size()) {
      FillFromKernel(words_.data(), sizeof words_);
      next_ = 0;
    }
    return words_[next_++];
  }

 private:
  // 256 bytes: the kernel gives that many without being interrupted.
  std::array<result_type, 64> words_{};
  std::size_t next_ = words_.size();
};

}  // namespace

int TUVORandomBase::random(int low, int high) {
  if (low >= high) {
    return high;
  }
  try {
    KernelBits bits;
    return std::uniform_int_distribution<int>(low, high)(bits);
  } catch (const std::exception&) {
    return high;
  }
}

bool TUVORandomBase::getString(const std::string& pool, unsigned int length, std::string& out) {
  if (pool.empty()) {
    out.clear();
    return false;
  }
  try {
    KernelBits bits;
    std::uniform_int_distribution<std::size_t> index(0, pool.size() - 1);
    std::string text;  // not `out` itself, which may be `pool`
    text.reserve(length);
    while (text.size() < length) {
      text.push_back(pool[index(bits)]);
    }
    out = std::move(text);
    return true;
  } catch (const std::exception&) {  // also a length that no memory holds
    out.clear();
    return false;
  }
}

}  // namespace TUVO::RANDOM
