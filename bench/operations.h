// The measured operations, and beside each the floor that it is compared with.
#ifndef TARNWICK_BENCH_OPERATIONS_H_
#define TARNWICK_BENCH_OPERATIONS_H_

#include <cstddef>
#include <memory>
#include <string>
#include <vector>

#include "bench/measured.h"

// One operation with everything that it needs. Instructions are counted and times are taken in Run
// alone, so what is prepared in the constructor costs nothing.
class Operation {
 public:
  virtual ~Operation() = default;

  // Makes the operation `count` times.
  virtual void Run(int count) = 0;
};

struct Entry {
  std::string name;
  std::string floor;  // the operation it is compared with; empty for none
  int count;          // how often a counted run makes it
  size_t bytes;       // that one operation handles, for rates; 0 where they do not matter
  std::unique_ptr<Operation> (*make)();
};

template <typename T>
std::unique_ptr<Operation> Make() {
  return std::make_unique<T>();
}

void AddLogOperations(std::vector<Entry>* entries);
void AddRequestOperations(std::vector<Entry>* entries);
void AddHeadOperations(std::vector<Entry>* entries);
void AddBodyOperations(std::vector<Entry>* entries);
void AddEncodingOperations(std::vector<Entry>* entries);

#endif  // TARNWICK_BENCH_OPERATIONS_H_
