// How much stack a call takes.
#ifndef TARNWICK_TESTS_SUPPORT_STACK_USE_H_
#define TARNWICK_TESTS_SUPPORT_STACK_USE_H_

#include <cstddef>
#include <functional>

// Runs `body` in a thread of its own, on a stack of a known pattern.
// Results: the bytes from the stack's top to the deepest one that was overwritten, the thread's own
//   block with the thread-local storage of all libraries included.
size_t StackUsedBy(const std::function<void()>& body);

#endif  // TARNWICK_TESTS_SUPPORT_STACK_USE_H_
