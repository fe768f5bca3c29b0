// The system calls that the interface asks of a client with a time-out, in plain C.
#ifndef TARNWICK_BENCH_REQUIRED_CALLS_H_
#define TARNWICK_BENCH_REQUIRED_CALLS_H_

#include <sys/types.h>

#include <cstddef>

// A read into the read-ahead buffer, and a body's piece.
constexpr size_t kReadAhead = 64512;
constexpr size_t kBodyPiece = 8192;

// socket; fcntl twice, connect, select, getsockopt, fcntl; the name is resolved, which makes no call
// for a dotted address. The descriptor is blocking. Results: the descriptor.
int RequiredConnect(int port);

// ioctl: from here on the descriptor does not block.
void RequiredNonBlocking(int fd);

// select for reading or writing, with the exceptional set
void RequiredWait(int fd, bool forReading);

// select, read
ssize_t RequiredRead(int fd, char* to, size_t room);

// select, write until all is written
void RequiredWrite(int fd, const char* bytes, size_t size);

#endif  // TARNWICK_BENCH_REQUIRED_CALLS_H_
