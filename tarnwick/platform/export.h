// Marks the names that leave the shared library; everything else is compiled with hidden
// visibility.
#ifndef TARNWICK_PLATFORM_EXPORT_H_
#define TARNWICK_PLATFORM_EXPORT_H_

#define TARNWICK_API __attribute__((visibility("default")))

#endif  // TARNWICK_PLATFORM_EXPORT_H_
