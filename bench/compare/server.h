// The one server that all contenders talk to: a process each for plain connections and for TLS.
#ifndef TARNWICK_BENCH_COMPARE_SERVER_H_
#define TARNWICK_BENCH_COMPARE_SERVER_H_

// Starts both. They end with this process. REQUIRES: no threads yet.
void StartServers();

// The port that it listens at on 127.0.0.1. Known to programs that this one starts, too.
int ServerPort(bool tls);

#endif  // TARNWICK_BENCH_COMPARE_SERVER_H_
