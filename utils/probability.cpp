#include <tuvoplatform/random.h>
#include <tuvosharing/utils.h>

namespace TUVO::sharing {

bool IsProbabilityHit(float probability) {
  static RANDOM::TUVORandom random;
  const int r = random.random(0, 99);
  // Extended precision, so that the fraction is cut from the product of the number as the float
  // holds it: 0.29f, which lies below 0.29, acts as 28 %. Beyond the range of an int the conversion
  // would be undefined; what a probability can mean ends at 0 and 1 anyway.
  const long double threshold = static_cast<long double>(100.0F) * probability;
  if (!(threshold > 0.0L)) {
    return false;
  }
  if (threshold >= 100.0L) {
    return true;
  }
  return r < static_cast<int>(threshold);
}

}  // namespace TUVO::sharing
