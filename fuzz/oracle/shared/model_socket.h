// How a socket reads, told once more in the plainest way: the oracle of the line reader, and what
// the other oracles read their bytes with.
#ifndef TARNWICK_FUZZ_ORACLE_SHARED_MODEL_SOCKET_H_
#define TARNWICK_FUZZ_ORACLE_SHARED_MODEL_SOCKET_H_

#include <cstddef>
#include <deque>
#include <string>
#include <vector>

#include "fuzz/support/peer.h"
#include "fuzz/support/script.h"

class ModelSocket {
 public:
  // `timeout` in seconds, negative for blocking; `sizes` as of Wire.
  ModelSocket(int timeout, bool buffered, std::vector<Connection> connections,
              std::vector<size_t> sizes);

  int Connect();
  void Disconnect();
  void SetUp(bool buffered);

  // Results as TWSocket's; `out` is what stands in the caller's buffer then. ReadLine's `out` has
  // no terminating zero.
  int Read(int len, std::string* out);
  int ReadLine(int bufLen, std::string* out);
  int Restore(const std::string& data);
  int Write(const std::string& data);
  bool HasData(int timeout);

  int Timeout() const { return timeout_; }
  bool ReadsAhead() const { return buffered_; }
  bool IsOpen() const { return open_; }
  bool IsConnected() const { return connected_; }
  bool IsEof() const { return eof_; }
  std::string Unread() const { return ahead_.substr(next_); }
  const std::deque<Peer>& Dialled() const { return dialled_; }

 private:
  int Wait(int timeout);
  long RawRead(size_t len, std::string* out);
  int ReadDirect(int len, std::string* out);
  int ReadBuffered(size_t len, std::string* out);
  int ReadLarge(size_t len, std::string* out);
  bool Failed();
  void ForgetAhead();

  int timeout_;
  bool buffered_;
  std::vector<Connection> connections_;
  std::vector<size_t> sizes_;
  std::deque<Peer> dialled_;
  bool open_ = false;
  bool connected_ = false;
  bool eof_ = false;
  std::string ahead_;
  size_t next_ = 0;  // the first unread byte of ahead_
};

#endif  // TARNWICK_FUZZ_ORACLE_SHARED_MODEL_SOCKET_H_
