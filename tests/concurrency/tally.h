// What a run of the tests that go on for as long as is wanted comes to. scripts/soak adds it up.
#ifndef TESTS_CONCURRENCY_TALLY_H_
#define TESTS_CONCURRENCY_TALLY_H_

namespace tuvo_test {

struct Tally {
  long requests;   // of the public interface; some are several calls
  long failures;   // of them answered what nothing explains
  long lost_rows;  // acknowledged, and not as they were acknowledged: gone, older, or there again
  long kills;      // processes that were killed
  long over_admissions;  // beyond a link's limit of uses
};

// Prints it in one line, "tally: requests 1 failures 0 lost 0 kills 0 over-admissions 0".
void Tell(const Tally& tally);

}  // namespace tuvo_test

#endif  // TESTS_CONCURRENCY_TALLY_H_
