// The one server that all contenders talk to: a process each for plain connections and for TLS.
#ifndef TARNWICK_BENCH_SERVER_H_
#define TARNWICK_BENCH_SERVER_H_

// Starts both, for this process and those that it starts. They end with it.
void StartServers();

// The port that the server listens at on 127.0.0.1. Starts it when nobody has.
int ServerPort(bool tls);

#endif  // TARNWICK_BENCH_SERVER_H_
