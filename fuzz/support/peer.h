// One end of a connection that exists in memory only. It does the same on the same calls, so the
// library may talk to one peer and the model that judges it to another.
#ifndef TARNWICK_FUZZ_SUPPORT_PEER_H_
#define TARNWICK_FUZZ_SUPPORT_PEER_H_

#include <cstddef>
#include <string>
#include <vector>

#include "fuzz/support/script.h"

class Peer {
 public:
  // `sizes`: how much each read returns at most, over and over; whatever is there when empty.
  Peer(Connection connection, std::vector<size_t> sizes);

  Dial HowToDial() const { return connection_.dial; }

  // Waits for something to read, as select does.
  // Results: 1; 0 for a time-out; -1 with errno, EINTR among others. `strange` becomes true when
  //   it is 1 without anything being ready.
  int Wait(bool* strange);

  // As read and write do, errno included.
  long Read(char* buf, size_t len);
  long Write(const char* buf, size_t len);

  // Everything that Write took.
  const std::string& Written() const { return written_; }

  // The sizes that Read was called with, in order: "64512 64512 2000 ".
  const std::string& Reads() const { return reads_; }

 private:
  long Fail(int error);
  void NextPiece();
  long ReadAtEvent();
  bool Happens(Event event) const;
  const Piece& Now() const { return connection_.pieces[piece_]; }

  Connection connection_;
  std::vector<size_t> sizes_;
  size_t piece_ = 0;
  size_t offset_ = 0;  // in the piece's bytes
  std::string written_;
  bool was_full_ = false;
  size_t reads_made_ = 0;
  std::string reads_;
};

#endif  // TARNWICK_FUZZ_SUPPORT_PEER_H_
