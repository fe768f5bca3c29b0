// The simulated camera of tools/twcamsim, as a process of its own.
#ifndef TARNWICK_TESTS_LONGEST_CALL_CAMERA_H_
#define TARNWICK_TESTS_LONGEST_CALL_CAMERA_H_

#include <memory>
#include <string>
#include <vector>

#include "tests/support/files.h"
#include "tests/support/process.h"

// One process serves all endpoints. It ends with this object, and by itself after two minutes.
// REQUIRES: it is made while no other thread runs.
class SimulatedCamera {
 public:
  // Starts `program` with these endpoints, in the words of its command line, and waits until it
  // listens. A stall for good ends after `hold` seconds.
  SimulatedCamera(const std::string& program, const std::vector<std::string>& endpoints, int hold);
  ~SimulatedCamera();
  SimulatedCamera(const SimulatedCamera&) = delete;
  SimulatedCamera& operator=(const SimulatedCamera&) = delete;

  // False when it did not start.
  bool Serves() const { return !ports_.empty(); }

  // The port of the i-th endpoint.
  int Port(size_t i) const { return ports_[i]; }

 private:
  TempDir folder_;  // for the authority's certificate
  std::unique_ptr<Child> process_;
  std::vector<int> ports_;
};

#endif  // TARNWICK_TESTS_LONGEST_CALL_CAMERA_H_
