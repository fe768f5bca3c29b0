// What clients that wait for their next request keep in memory.
#ifndef TARNWICK_BENCH_IDLE_CLIENTS_H_
#define TARNWICK_BENCH_IDLE_CLIENTS_H_

// Prints the resident kilobytes of a further client after a small GET each.
int MeasureIdleClients(int count);

#endif  // TARNWICK_BENCH_IDLE_CLIENTS_H_
