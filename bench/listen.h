// The listening socket of the servers.
#ifndef TARNWICK_BENCH_LISTEN_H_
#define TARNWICK_BENCH_LISTEN_H_

// Listens on 127.0.0.1. Results: the socket, which programs that are started do not get, and its
// port. Ends the program when there is none.
int ListenOnLoopback(int* port);

#endif  // TARNWICK_BENCH_LISTEN_H_
