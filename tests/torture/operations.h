// The operations under torture, by the folder of the library that they belong to.
#ifndef TARNWICK_TESTS_TORTURE_OPERATIONS_H_
#define TARNWICK_TESTS_TORTURE_OPERATIONS_H_

#include <string>
#include <vector>

#include "tests/torture/test_run.h"

std::vector<Operation> LogOperations();
std::vector<Operation> UtilsOperations();
std::vector<Operation> ClientOperations();
std::vector<Operation> PeerOperationsUnderTorture();

// The operations of tests/operations that are neither tortured nor left out, each with a blank in
// front; empty for none.
std::string OperationsWithoutTorture();

// Operations with a mistake of their own, which the torture must find, and words of its message;
// null for one that must pass.
struct PlantedOperation {
  Operation operation;
  const char* found;
  int limit_seconds = 10;
  Fault first = Fault::kAllocation;
};
std::vector<PlantedOperation> PlantedOperations();

#endif  // TARNWICK_TESTS_TORTURE_OPERATIONS_H_
