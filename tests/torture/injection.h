// Which allocation or system call of the thread under test fails, and how.
//
// The program defines malloc and operator new itself and traps the thread's system calls in the
// kernel (see allocations.cpp and system_calls.h). So the calls of libcurl, OpenSSL, libxml2,
// jsoncpp and of the C and C++ libraries on behalf of an operation are met like the library's own.
// Peers run in processes of their own and never meet it.
#ifndef TARNWICK_TESTS_TORTURE_INJECTION_H_
#define TARNWICK_TESTS_TORTURE_INJECTION_H_

// What happens at the chosen call.
enum class Fault {
  kNone,               // nothing: counts the calls
  kAllocation,         // the n-th allocation fails
  kAllocationsFrom,    // the n-th allocation and all later ones fail
  kAllFromAllocation,  // the n-th allocation fails, and from there on every call and allocation
  kCall,               // the n-th system call fails with its usual error
  kAllFromCall,        // the n-th system call fails, and from there on every call and allocation
  kInterrupted,        // the n-th system call fails with EINTR
  kTryAgain,           // the n-th system call fails with EAGAIN
  kShort,              // the n-th system call, when it moves bytes, moves one
  kCancelled,          // the n-th system call finds the thread cancelled
};

// Those of a usual sweep. A cancelled thread has a sweep of its own: the address sanitizer does not
// know that its frames are left.
constexpr Fault kFaults[] = {
    Fault::kAllocation,  Fault::kAllocationsFrom, Fault::kAllFromAllocation, Fault::kCall,
    Fault::kAllFromCall, Fault::kInterrupted,     Fault::kTryAgain,          Fault::kShort};

// The name for the command line and the messages; a Fault by its name, kNone when there is none.
const char* FaultName(Fault fault);
Fault FaultNamed(const char* name);

// True for the faults that count allocations; the others count system calls.
bool CountsAllocations(Fault fault);

// One run's fault. Calls are numbered from 1.
struct FaultPoint {
  Fault fault;
  long number;
};

// A system call, or a library call that stands for one, as the fault meets it.
struct CallKind {
  const char* name;
  int error;          // errno of its usual failure
  int length;         // index of the argument that says how many bytes it moves; -1: moves none
  bool done_anyway;   // does its work even when it reports a failure, as close does
  bool only_signals;  // fails for no other reason than a signal
};

struct Verdict {
  enum Kind { kPass, kFail, kFailDone, kShort } kind;
  int error;
};

// The thread under test. Plain data, because allocations come here before any constructor has run.
struct Injection {
  bool counting_blocks;  // this is the thread under test
  bool armed;            // the library's code is running, not the test's
  FaultPoint point;
  bool struck;              // the fault has met a call
  const char* struck_name;  // that call
  long allocations;         // since the run's start, failed ones included
  long calls;
  long blocks;         // allocated less released by this thread, armed or not
  bool unlink_failed;  // a file that the operation would have removed may be left
  bool write_failed;   // a log line of more than one write may be cut
};
extern __thread Injection t_injection;  // thread_local would be asked for its initialisation

// Starts a run: zeroes the counts and sets the fault.
void StartRun(const FaultPoint& point);

// For the interposed calls of the armed thread: the next call's fate.
bool NextAllocationFails();
Verdict NextCall(const CallKind& kind);

#endif  // TARNWICK_TESTS_TORTURE_INJECTION_H_
