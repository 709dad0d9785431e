// Random numbers and texts from the kernel's generator; fit for secrets.
#ifndef TUVOPLATFORM_RANDOM_H_
#define TUVOPLATFORM_RANDOM_H_

#include <tuvoplatform/export.h>

#include <string>

namespace TUVO::RANDOM {

// The 62 ASCII letters and digits.
TUVOPLATFORM_API extern const char* const POOL_ALPHA_NUMERIC;
// Those and '-' and '_': safe in a URL and in a cookie.
TUVOPLATFORM_API extern const char* const POOL_URL_FRIENDLY;

// Holds no state: every draw asks the kernel, so objects may be shared by threads and survive fork.
class TUVOPLATFORM_API TUVORandomBase {
 public:
  // A uniformly drawn integer from `low` to `high`, both included. Precondition: low <= high.
  // When the kernel's generator fails the answer is `high`: never use it for a secret.
  int random(int low, int high);

  // Replaces `out` by `length` characters, each drawn uniformly from the bytes of `pool`. Returns
  // false, with `out` empty, when the kernel's generator fails, `pool` is empty or there is no
  // memory for the text.
  bool getString(const std::string& pool, unsigned int length, std::string& out);
};

// What callers create. The class has no code in the platform library: whoever uses it carries its
// destructor and its type information.
class TUVORandom : public TUVORandomBase {
 public:
  virtual ~TUVORandom() = default;
};

}  // namespace TUVO::RANDOM

#endif  // TUVOPLATFORM_RANDOM_H_
