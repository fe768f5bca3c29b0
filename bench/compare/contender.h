// The works that are compared, and the contenders that do them.
//
// A source file of a contender registers itself:
//
//   void AddPoco(Registry* registry) { registry->Add("url_encode_64", "Poco", ...); }
//   const Family kPoco(AddPoco);
//
// so that a peer whose package is missing is a file that is not built.
#ifndef TARNWICK_BENCH_COMPARE_CONTENDER_H_
#define TARNWICK_BENCH_COMPARE_CONTENDER_H_

#include <cstddef>
#include <functional>
#include <memory>
#include <string>
#include <vector>

enum class Unit { kNanoseconds, kBytes };

struct Work {
  const char* section;
  const char* name;
  Unit unit;
  size_t bytes;  // that one operation handles, for rates; 0 where they say nothing
  int count;     // operations of a round; 0: as many as fill the round's time
  bool apart;    // each measurement in a process of its own: memory is looked at, or a peer leaves
                 // threads behind
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
};

// A contender whose cost is the time that Run takes.
class TimedContender : public Contender {
 public:
  double Measure(int count) final;

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

// Takes what an operation has computed, so that the compiler cannot leave it out, and makes it look
// at memory anew afterwards.
inline void Use(const void* result) {
  asm volatile("" : : "g"(result) : "memory");
}

// Ends the program with a line to stderr.
[[noreturn]] void Fail(const char* contender, const std::string& what);

// The same when `good` is false. It stands in what is measured, so it makes no text before.
inline void Expect(bool good, const char* contender, const char* what) {
  if (!good) Fail(contender, what);
}

#endif  // TARNWICK_BENCH_COMPARE_CONTENDER_H_
