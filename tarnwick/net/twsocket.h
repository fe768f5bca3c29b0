// An IPv4 TCP client connection with time-outs, keep-alive, read-ahead and push-back.
//
//   auto socket = std::make_unique<TWSocket>("192.0.2.7", 80, 5, true);
//   if (socket->Connect() != 0) return -1;  // the log says why
//   socket->WriteData("HELO\n", 5);
//   char line[128];
//   int length = socket->ReadToLineEnd(line, sizeof(line));
//
// Failures are logged in category socket, as source twsocket (twdebuglog.h tells what that is): at
// info what a peer or a network may cause, such as "Reach end of file!", at error what the system
// refused; at debug3 how many bytes a large read delivered. A write that failed is logged by
// WriteFd.
#ifndef TARNWICK_NET_TWSOCKET_H_
#define TARNWICK_NET_TWSOCKET_H_

#include <string>

#include "tarnwick/platform/export.h"

struct addrinfo;
namespace tarnwick {
class SocketAccess;
}

// One connection at a time to one host and port; it may be connected again and again.
//
// The object is large (a 64 KiB buffer lies inside it): create it on the heap. A class that derives
// from it replaces DoSelect, _Read and _Write, and may be compiled with -fno-rtti and
// -fno-exceptions.
// Errors: errno is EAGAIN after a wait of ReadData that passed, EPIPE or ECONNRESET when the peer
//   is gone, which raises no SIGPIPE, EMFILE or ENOMEM without a descriptor or memory. The
//   constructors and SetSocketInfo throw std::bad_alloc when memory runs out.
// Threads: one thread uses an object at a time; separate objects may run in separate threads.
// Cancellation: a thread may be cancelled (pthread_cancel, the deferred kind) in any operation. It
//   ends at a wait for the peer, or after a name resolution or a call of OpenSSL, which are not
//   left in the middle. Nothing leaks, and the object may then be destroyed, disconnected or
//   connected again.
class TARNWICK_API TWSocket {
 public:
  // What a wait is for.
  enum SELECT_TYPE {
    SELECT_READ = 0,   // bytes to read, or the end of the stream
    SELECT_WRITE = 1,  // room to write
  };

  // A socket without a host. REQUIRES: SetSocketInfo before Connect.
  TWSocket();

  // Arguments: `host` is a name or a dotted IPv4 address; `port` the TCP port; `timeout` the limit
  //   in seconds of connecting and of each wait, negative for blocking without a limit; `buffered`
  //   chooses reads through the read-ahead buffer, which line reading should have.
  TWSocket(const std::string& host, int port, int timeout, bool buffered);

  // Closes the descriptor. Does not call Disconnect.
  virtual ~TWSocket();

  TWSocket(const TWSocket&) = delete;
  TWSocket& operator=(const TWSocket&) = delete;

  // Connects; an open connection is closed first.
  //
  // Results: 0; negative on failure, when IsConnected() is false and the descriptor may still be
  //   open until the next Disconnect. errno is ETIMEDOUT when the time-out passed, ECONNREFUSED
  //   when nobody listens, or another one of connect(2); it says nothing when the name was not
  //   resolved.
  // Blocks for the name resolution, which has no limit here, and then for `timeout` seconds at
  //   most. A `timeout` of 0 connects only where the connection completes at once.
  // Logs: "Scoket getaddrinfo incomplete." alone when the name has no IPv4 address, "Socket connect
  //   failed." alone without a time-out. With a time-out every other failed attempt ends with
  //   "Socket connect timeout (N)", whatever the reason; the line before it tells more: "Socket
  //   connection failed with error [N]." when the host refused (111) or another error number came
  //   back, "Socket connect timeout." when nobody answered, "Socket connected." when the system
  //   refused at once, for want of a route for example (the text is kept as it is).
  virtual int Connect();

  // Makes the descriptor non-blocking when the time-out is zero or positive, blocking when it is
  // negative. Connect calls it. Results: always 0.
  virtual int PostConnect();

  // Closes the connection, if there is one, and in buffered mode forgets what was read ahead; in
  // direct mode that stays, unread. IsEOF() stays. Does not wait.
  virtual void Disconnect();

  // Waits until the descriptor can be read or written, or has an exceptional condition.
  //
  // Results: positive when it is ready; 0 when the time-out passed, and at once on a blocking
  //   connection; -1 on error or without a descriptor. Callers go on to the read or write after 0.
  // Blocks for the time-out of the socket.
  virtual int DoSelect(SELECT_TYPE type);

  // One raw read of at most `len` bytes. Results: as read(2).
  virtual int _Read(void* buf, unsigned int len);

  // One raw write of all `len` bytes. Results: the bytes written; see WriteFd.
  virtual int _Write(const void* buf, unsigned int len);

  // Sets host, port, time-out and mode for the next connection and closes an open one. With
  // `buffered` what was read ahead is forgotten; without, it stays unread.
  void SetSocketInfo(const std::string& host, int port, int timeout, bool buffered);

  // Sets, in spite of its name, the local source address to bind before connecting, in network byte
  // order; 0 for none.
  // An address that cannot be bound is logged and ignored.
  void SetRemoteAddr(unsigned int addr);

  // The connect sequence without PostConnect: the descriptor stays blocking. Results: 0 or -1.
  int ConnectSocket();

  // True from a successful connect until Disconnect, SetSocketInfo, a buffered read that failed
  // with nothing delivered, or a TLS write that failed. Other failures leave it as it is.
  bool IsConnected() const { return m_bConnected; }

  // True when the last read met the end of the stream.
  bool IsEOF() const { return m_bEOF; }

  // Switches TCP keep-alive on or off for the current connection.
  //
  // Arguments: `enable` 0 or 1; `idle` and `interval` in seconds and `count` in probes, as tcp(7)
  //   defines them; they are not applied when `enable` is 0.
  // Results: 0; -1 when an option was refused (the earlier ones stay applied).
  int SetKeepAliveOpt(int enable, int idle, int interval, int count);

  // Reads up to `len` bytes.
  //
  // Direct mode delivers what one read gives. Buffered mode delivers `len` bytes, and fewer only
  // when the stream ends or an error comes after some bytes.
  // Results: the bytes delivered; 0 at the end of the stream, when IsEOF() becomes true; -1 on an
  //   error or time-out that came before any byte, on a wait that failed, which loses the bytes
  //   before it, when `len` is negative, and when it is positive and `buf` null.
  // State: a buffered read that failed clears IsConnected(), a wait that failed does not; the
  //   descriptor stays open.
  // Blocks for the time-out at each wait. In direct mode that is one wait. A buffered read of fewer
  // than 1,024 bytes waits seven times when nothing comes. One of 1,024 bytes or more waits once
  // when nothing comes; when some bytes came, it waits twice for the rest while 1,024 or more are
  // missing, else once.
  int ReadData(char* buf, int len);

  // Writes `len` bytes.
  //
  // Results: the bytes written: fewer than `len`, and 0 too, when a plain connection failed; -1
  //   when there is nothing to write or no descriptor, and when TLS failed, which clears
  //   IsConnected().
  // Blocks without a limit while the peer takes nothing.
  int WriteData(const char* buf, int len);

  // Reads a line of at most bufLen - 1 characters into `buf` and terminates it with a zero byte.
  //
  // A line feed, the end of the stream, or a carriage return and whatever byte follows it end the
  // line; the ending is not stored. A longer line is cut: its bufLen-th character is lost, and the
  // next read begins after that.
  // Results: the length stored; -1 when a read failed, when the stream ended after a carriage
  //   return, and when `buf` is null or `bufLen` not positive; `buf` is then not terminated.
  // Blocks as a read of one byte does, for each byte that is missing.
  int ReadToLineEnd(char* buf, int bufLen);

  // Pushes `len` bytes back: the next reads return them before what is buffered already.
  //
  // Results: 0; -1, with the buffer untouched, when `data` is null, `len` is negative, or `len` and
  //   the unread bytes exceed 65,536. After a read there is room for 1,024 bytes, until some are
  //   pushed back. In direct mode nothing happens and the result is 0.
  int RestoreData(char* data, int len);

  // True when the descriptor becomes readable, or has an exceptional condition, within `timeout`
  // seconds, its own. What is in the read-ahead buffer is ignored; a negative `timeout` returns
  // false at once.
  bool HasDataToRead(int timeout);

 protected:
  static constexpr int kReadBufSize = 65536;  // bytes

  int m_sockFd;  // -1: none
  std::string m_strHost;
  int m_port;
  int m_timeout;  // seconds; negative: blocking
  bool m_bBuffered;
  bool m_bConnected;
  bool m_bEOF;
  char m_readBuf[kReadBufSize];

 private:
  // In the byte that alignment leaves free here.
  bool m_bBufferIsHidden : 1;  // no derived class sees the buffer, so nobody clears it
  bool m_bStreamEnded : 1;     // TLS's close notice has come, so no read waits

 protected:
  int m_readPos;           // first unread byte in m_readBuf
  int m_readLen;           // unread bytes from there
  unsigned int m_srcAddr;  // network byte order; 0: not bound

 private:
  // net/socket_access.h: what the library's own client may do besides.
  friend class tarnwick::SocketAccess;
  friend class SSLSocket;
  struct HiddenBuffer {};
  TARNWICK_LOCAL explicit TWSocket(HiddenBuffer hidden);

  TARNWICK_LOCAL void CloseFd();
  TARNWICK_LOCAL void ClearReadBuf();
  TARNWICK_LOCAL int BindRemoteAddr();
  TARNWICK_LOCAL bool ConnectWithTimeout(const struct addrinfo* address);

  TARNWICK_LOCAL int ReadDirect(char* buf, int len);
  TARNWICK_LOCAL int ReadBuffered(char* buf, int len);
  TARNWICK_LOCAL int ConsumeBuffered(char* buf, int len);
  TARNWICK_LOCAL int ConsumeLineBody(char* buf, int room);
  TARNWICK_LOCAL bool ConsumeLineEnding();
  TARNWICK_LOCAL bool ReadUnbuffered(char* buf, int len, int* done);
  TARNWICK_LOCAL bool ShouldRetryRead(int retries);
  TARNWICK_LOCAL bool WaitReadable();
  TARNWICK_LOCAL void OnEndOfStream();
  TARNWICK_LOCAL void LogFailedRead();
};

#endif  // TARNWICK_NET_TWSOCKET_H_
