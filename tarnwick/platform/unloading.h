// Tells a library that is unloaded (dlclose) from a process that ends.
#ifndef TARNWICK_PLATFORM_UNLOADING_H_
#define TARNWICK_PLATFORM_UNLOADING_H_

namespace tarnwick {

// Whether a destructor of the library runs because it is unloaded. At the end of the process other
// threads go on, may be in a log call, and need what the library has; the kernel takes it
// afterwards.
// REQUIRES: called by a function with the attribute `destructor`.
bool IsBeingUnloaded();

}  // namespace tarnwick

#endif  // TARNWICK_PLATFORM_UNLOADING_H_
