// The steps of a scripted peer.
//
// A step that reads leaves what came after its part for the next step. Every step has the peer's
// deadline; one that cannot be played fails the test.
#ifndef TARNWICK_TESTS_SUPPORT_PEER_STEPS_H_
#define TARNWICK_TESTS_SUPPORT_PEER_STEPS_H_

#include <cstddef>
#include <functional>
#include <string>
#include <vector>

#include "tests/support/flag.h"
#include "tests/support/peer_connection.h"

struct Step {
  std::string name;

  // Plays it; on failure says in `*error` what went wrong.
  std::function<bool(PeerConnection&, std::string* error)> play;

  // Over TLS: the handshake comes before it, unless it has been made.
  bool needs_handshake = true;
};

using Script = std::vector<Step>;

// Reads up to and including `mark`.
Step ExpectUntil(const std::string& mark);

// Reads `count` bytes.
Step ExpectBytes(size_t count);

// Reads as many bytes as `text` has; they must be these.
Step ExpectExactly(const std::string& text);

// Reads one request: its head and, when the head names a Content-Length, the body.
Step ExpectRequest();

// The client closes, without a further byte. Over TLS a missing close notice is accepted.
Step ExpectEof();

// The client ends the connection, by closing or by a reset, after any bytes.
Step DiscardUntilEnd();

// Over TLS: the client sends its close notice before it closes.
Step ExpectCloseNotice();

// Send bytes at once, one at a time, or piece by piece; the small pieces travel in packets of their
// own.
Step Send(const std::string& bytes);
Step SendByteByByte(const std::string& bytes);
Step SendPieces(const std::vector<std::string>& pieces);

// Closes; over TLS with a close notice. Bytes that came and that no step took fail the test.
Step Close();

// Closes the sending direction alone.
Step ShutdownWrite();

// Ends the connection with a reset.
Step Reset();

// Holds the connection still until the flag is set, or until the test waits for the peer's end.
Step WaitFor(const Flag& flag);
Step StallUntilFinish();

// Tells the test that the script has come this far.
Step SetFlag(const Flag& flag);

// Sends bytes over and over, until the client closes, the connection breaks, or `most` bytes have
// gone.
Step SendEndlessly(const std::string& bytes, size_t most);

// Over TLS: makes the handshake now.
Step Handshake();

// Over TLS: sends the close notice and keeps the TCP connection open.
Step SendCloseNotice();

// Over TLS: closes the TCP connection without a close notice.
Step CloseWithoutNotice();

// Over TLS: bytes below TLS, such as garbage in place of a handshake or the client's first message.
Step SendRaw(const std::string& bytes);
Step ExpectRawBytes(size_t count);

// Over TLS: one record, whose raw bytes go out one at a time. At most 16,384 bytes.
Step SendRecordByteByByte(const std::string& bytes);

// A whole exchange: reads a request, sends `response`, closes.
Script Exchange(const std::string& response);

// As Exchange, with the response sent byte by byte or in pieces.
Script ExchangeByteByByte(const std::string& response);
Script ExchangeInPieces(const std::vector<std::string>& pieces);

// Reads a request and closes without a response.
Script RequestThenClose();

// Sends `bytes` without waiting for anything, closes.
Script SendThenClose(const std::string& bytes);

#endif  // TARNWICK_TESTS_SUPPORT_PEER_STEPS_H_
