// Recorded exchanges: what a client and a server said, with its timing, in a directory.
//
// The directory holds exchanges.jsonl, a JSON object a line, in the order of the exchanges, and the
// raw bytes that it names. Over TLS they are those inside:
//
//   {"number":1,"connection":1,"tls":false,"host":"192.0.2.7","port":80,"method":"GET",
//    "target":"/info.cgi","request":"001.request","response":"001.response",
//    "pieces":[{"delay_ms":12,"bytes":180},{"delay_ms":250,"bytes":4096}],
//    "end":"close","end_delay_ms":3}
//
//   connection    counts from 1; exchanges of one number went over one connection, one after
//                 another
//   request       as it was sent; credentials, cookies and secrets of its query may be masked, so
//                 its length is no more than near the real one
//   pieces        how the response arrived: each so many milliseconds after the one before it, the
//                 first after the last byte of the request; together they are the response file
//   end           what became of the connection after the last piece: "close" (the server closed
//                 it), "reset" (it did so by a reset), "silent" (it kept it open and sent nothing
//                 more, until the client gave up), "kept" (the client had all it wanted, or sent
//                 its next request over it), "refused" and "unreachable" (there was none; no bytes
//                 either), "tls" (the TLS handshake failed)
//   end_delay_ms  from the last piece to that end
//
// Whoever plays a recording back sends the n-th response to the n-th request that comes, whatever
// it asks, and begins again after the last.
#ifndef TARNWICK_TOOLS_COMMON_RECORDING_H_
#define TARNWICK_TOOLS_COMMON_RECORDING_H_

#include <cstddef>
#include <cstdint>
#include <string>
#include <vector>

struct RecordedPiece {
  int64_t delay_ms = 0;
  size_t bytes = 0;
};

struct RecordedExchange {
  int number = 0;
  int connection = 0;
  bool tls = false;
  std::string host;
  int port = 0;
  std::string method;
  std::string target;
  std::string request;   // bytes
  std::string response;  // bytes
  std::vector<RecordedPiece> pieces;
  std::string end;
  int64_t end_delay_ms = 0;
};

// Writes `exchanges` into `directory`, which is created when missing, for the caller alone; files
// of an earlier recording are replaced. A link, or a directory of another user, is refused.
// Results: false with the reason in `error`.
bool WriteRecording(const std::string& directory, const std::vector<RecordedExchange>& exchanges,
                    std::string* error);

// Reads a recording. A name of a file that leads out of the directory, a link or anything else that
// is no regular file, an unknown end, a delay of more than a day, pieces that do not add up to the
// response, and more than 256 MiB are errors.
// Results: false with the reason in `error`; `exchanges` is then to be thrown away.
bool ReadRecording(const std::string& directory, std::vector<RecordedExchange>* exchanges,
                   std::string* error);

#endif  // TARNWICK_TOOLS_COMMON_RECORDING_H_
