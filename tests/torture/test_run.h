// What an operation under torture runs its steps by, and how it judges its result.
#ifndef TARNWICK_TESTS_TORTURE_TEST_RUN_H_
#define TARNWICK_TESTS_TORTURE_TEST_RUN_H_

#include <pthread.h>

#include <exception>
#include <functional>
#include <new>
#include <string>

#include "tests/torture/injection.h"

// Threads: the thread under test alone.
class TestRun {
 public:
  explicit TestRun(int port) : port_(port) {}

  // The peer's, on 127.0.0.1.
  int Port() const { return port_; }

  // Runs a step of the library's, which the fault may strike. An exception out of it is a mistake.
  // A cancelled thread ends here at the latest: what the operation holds it must own.
  template <typename Step>
  void Run(Step step) {
    if (!RunMayThrow<NoException>(step)) return;
  }

  // The same for a step that may end with `Exception` for want of memory. Results: false when it
  // did.
  template <typename Exception, typename Step>
  bool RunMayThrow(Step step) {
    try {
      const Armed armed;
      step();
      if (t_injection.point.fault == Fault::kCancelled) pthread_testcancel();
      return true;
    } catch (const Exception&) {
      Expect(MayFail(), "threw without a reason");
    } catch (const std::exception& exception) {
      Expect(false, std::string("threw ") + exception.what());
    }
    return false;
  }

  // True once the run's fault has met a call.
  bool Struck() const { return t_injection.struck; }

  // True once the fault has met a call in a way that the operation need not survive: reads and
  // writes may always be short.
  bool MayFail() const { return Struck() && t_injection.point.fault != Fault::kShort; }

  // Notes a mistake when `right` is false.
  void Expect(bool right, const std::string& mistake);

  // Expects the good result, or after a fault the failure's.
  void ExpectEither(bool good, bool failure, const std::string& mistake) {
    Expect(good || (MayFail() && failure), mistake);
  }

  // All mistakes of the run; empty when there are none.
  const std::string& Mistakes() const { return mistakes_; }

 private:
  class NoException {};

  class Armed {
   public:
    Armed() { t_injection.armed = true; }
    ~Armed() { t_injection.armed = false; }
    Armed(const Armed&) = delete;
    Armed& operator=(const Armed&) = delete;
  };

  int port_;
  std::string mistakes_;
};

// Who serves an operation.
enum class PeerKind { kNone, kPlain, kTls };

// One operation of the library, from its preparation to the check of what it gave.
struct Operation {
  const char* name;
  PeerKind peer;
  std::function<void(TestRun&)> run;
  bool cold = false;  // tortured as the first operation of a process as well
  bool slow = false;  // makes a TLS handshake, which allocates thousands of times
};

#endif  // TARNWICK_TESTS_TORTURE_TEST_RUN_H_
