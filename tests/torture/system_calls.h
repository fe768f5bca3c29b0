// Traps the system calls of a thread.
//
// A filter in the kernel turns each system call of the thread, whoever makes it, into a signal of
// that thread; its handler asks the injection, and then makes the call, or gives an error in its
// place. So the C library's own calls are met as well: those of stdio, of the address look-up and
// of the temporary files. Left alone are the calls that cannot fail, or that are made while all
// signals are blocked, and those of the sanitizer's runtime.
#ifndef TARNWICK_TESTS_TORTURE_SYSTEM_CALLS_H_
#define TARNWICK_TESTS_TORTURE_SYSTEM_CALLS_H_

// Traps the calling thread's system calls from now on; a thread that it starts is trapped too, but
// has no faults. Nothing undoes it. Results: false when the kernel does not let it.
bool TrapSystemCalls();

#endif  // TARNWICK_TESTS_TORTURE_SYSTEM_CALLS_H_
