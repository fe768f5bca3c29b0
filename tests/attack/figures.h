// What a long attack costs the process, sampled while it runs.
#ifndef TARNWICK_TESTS_ATTACK_FIGURES_H_
#define TARNWICK_TESTS_ATTACK_FIGURES_H_

#include <cstddef>
#include <mutex>
#include <string>

// The process at one moment.
struct Footprint {
  long resident_kib = 0;
  long in_use_kib = 0;  // what malloc has given out; under the address sanitizer, its own malloc
  size_t descriptors = 0;
};

Footprint CurrentFootprint();

// The seconds that the calling thread has been ready to run, since its start, and had no processor:
// what a busy machine adds to a call. 0 where the kernel does not tell.
double SecondsWithoutProcessor();

// The call that took longest, and which one it was.
// Threads: any.
class LongestCall {
 public:
  void Add(double seconds, const std::string& name);

  double Seconds() const;
  std::string Name() const;

 private:
  mutable std::mutex mutex_;
  double seconds_ = 0;
  std::string name_ = "none";
};

// Prints one row of the table of figures at the end of an attack.
void PrintFigure(const char* name, const std::string& value);
void PrintFootprint(const char* moment, const Footprint& footprint);

#endif  // TARNWICK_TESTS_ATTACK_FIGURES_H_
