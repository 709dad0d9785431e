#include "concurrency/tally.h"

#include <cstdio>

namespace tuvo_test {

void Tell(const Tally& tally) {
  std::printf("tally: requests %ld failures %ld lost %ld kills %ld over-admissions %ld\n",
              tally.requests, tally.failures, tally.lost_rows, tally.kills, tally.over_admissions);
}

}  // namespace tuvo_test
