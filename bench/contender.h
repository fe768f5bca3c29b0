// The works that are compared, and the contenders that do them.
//
// A source file of a contender registers itself:
//
//   void AddPoco(Registry* registry) { registry->Add("url_encode_64", "Poco", ...); }
//   const Family kPoco(AddPoco);
//
// so that a peer whose package is missing is a file that is not built.
#ifndef TARNWICK_BENCH_CONTENDER_H_
#define TARNWICK_BENCH_CONTENDER_H_

#include <cstddef>
#include <functional>
#include <memory>
#include <string>
#include <vector>

#include "bench/measured.h"

enum class Unit { kNanoseconds, kBytes };

struct Work {
  const char* section;
  const char* name;
  Unit unit;
  size_t bytes;  // that one operation handles, for rates; 0 where they say nothing
  int count;     // operations of a round; 0: as many as fill the round's time
  bool apart;    // each measurement in a process of its own: memory is looked at, or a peer leaves
                 // threads
  int counted;   // operations whose instructions and system calls are counted; 0: none, because
                 // their number is not the same each time or tells nothing
};

const std::vector<Work>& AllWorks();

// One way to do one work, with everything that it needs. What the constructor prepares costs
// nothing.
class Contender {
 public:
  virtual ~Contender() = default;

  // Does the work `count` times. Results: what one of them cost, in the work's unit.
  // Ends the program when the outcome is wrong: nobody is to be fast that way.
  virtual double Measure(int count) = 0;

  // Does the work `count` times and nothing else, in this process, where instructions and system
  // calls are counted.
  virtual void Count(int count) { Measure(count); }
};

// A contender whose cost is the time that Run takes.
class TimedContender : public Contender {
 public:
  double Measure(int count) final;
  void Count(int count) final { Run(count); }

 protected:
  virtual void Run(int count) = 0;
};

class Registry {
 public:
  using Maker = std::function<std::unique_ptr<Contender>()>;
  struct Entry {
    std::string contender;
    Maker make;
  };

  // REQUIRES: a name of AllWorks, and one of the contenders in registry.cpp.
  void Add(const std::string& work, const std::string& contender, Maker make);

  // `operation` is called count times, and its time is what counts.
  void AddTimed(const std::string& work, const std::string& contender,
                std::function<void(int count)> operation);

  // The contenders of a work: floors first, then the library, then the peers.
  std::vector<Entry> Of(const std::string& work) const;

  // Names of contenders that do not do a single work: their packages were missing.
  std::vector<std::string> LeftOut() const;

 private:
  struct Registered {
    std::string work;
    Entry entry;
  };
  std::vector<Registered> m_entries;
};

// Makes a file's contenders known before main begins.
struct Family {
  explicit Family(void (*add)(Registry*));
};

// What all families have registered.
const Registry& AllContenders();

// The two floors, the library and the peers, by the names of the tables.
constexpr char kFloor[] = "floor";        // the bare system calls, or one plain pass
constexpr char kRequired[] = "required";  // the system calls that the interface asks for
constexpr char kLibrary[] = "library";

#endif  // TARNWICK_BENCH_CONTENDER_H_
