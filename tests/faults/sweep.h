// Runs an operation again and again in one process that goes on, each time with another of its
// calls failing, until it runs through without.
#ifndef TESTS_FAULTS_SWEEP_H_
#define TESTS_FAULTS_SWEEP_H_

#include <functional>
#include <string>
#include <vector>

#include "faults/fault_points.h"

namespace tuvo_test {

// One run of the operation.
struct Step {
  long number;                   // of the call that was to fail, from 1
  FaultKind fault;               // kNoFault: there was no such call any more
  int answer;                    // what the operation returned
  std::vector<std::string> log;  // what was logged meanwhile

  bool Logged(const std::string& piece) const;
};

// What the operation answers when a std::exception left it.
constexpr int kThrew = -1000;

// Sweeps over the calls of these kinds. After each run expects that nothing was thrown, that the
// effective ids and the open file descriptors are what they were, calls `examine`, and gives up
// after a few unmet expectations. Prints how many calls there were of each kind.
void Sweep(const std::string& name, unsigned int kinds, const std::function<int()>& operation,
           const std::function<void(const Step&)>& examine);

// The descriptors that are open now.
std::vector<int> OpenDescriptors();

}  // namespace tuvo_test

#endif  // TESTS_FAULTS_SWEEP_H_
