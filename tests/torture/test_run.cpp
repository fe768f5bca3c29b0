#include "tests/torture/test_run.h"

void TestRun::Expect(bool right, const std::string& mistake) {
  if (right) return;
  mistakes_ += mistake;
  mistakes_ += "; ";
}
