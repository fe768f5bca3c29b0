// A peer inside the process, for showing what an operation would send: it takes requests over the
// loopback interface and responds to each with an empty success, the first with a challenge when
// there is one.
#ifndef TARNWICK_TOOLS_TWHTTP_FAKE_PEER_H_
#define TARNWICK_TOOLS_TWHTTP_FAKE_PEER_H_

#include <netinet/in.h>

#include <mutex>
#include <string>
#include <thread>
#include <vector>

class FakePeer {
 public:
  // Throws std::system_error when it cannot listen.
  explicit FakePeer(std::string challenge);
  ~FakePeer();
  FakePeer(const FakePeer&) = delete;
  FakePeer& operator=(const FakePeer&) = delete;

  const sockaddr_in& Address() const { return address_; }

  // Ends it, when the operation is over. Results: the requests, in the order of their arrival.
  std::vector<std::string> Finish();

 private:
  void Accept();
  void Serve(int fd);
  void Take(const std::string& bytes, bool continued);
  std::string NextResponse();

  const std::string challenge_;
  std::mutex mutex_;
  std::vector<std::string> requests_;  // guarded by mutex_
  int listener_ = -1;
  sockaddr_in address_ = {};
  std::thread thread_;
};

#endif  // TARNWICK_TOOLS_TWHTTP_FAKE_PEER_H_
