// Marks the names that leave the shared library; everything else is compiled with hidden
// visibility.
#ifndef TARNWICK_PLATFORM_EXPORT_H_
#define TARNWICK_PLATFORM_EXPORT_H_

#define TARNWICK_API __attribute__((visibility("default")))
#define TARNWICK_LOCAL __attribute__((visibility("hidden")))

#endif  // TARNWICK_PLATFORM_EXPORT_H_
