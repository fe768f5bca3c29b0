// The operations of the table, by the way that their bytes go, and what they share.
#ifndef TARNWICK_TESTS_OPERATIONS_PARTS_H_
#define TARNWICK_TESTS_OPERATIONS_PARTS_H_

#include <algorithm>
#include <memory>
#include <string>

#include "tests/operations/operations.h"

inline constexpr char kPeerHost[] = "127.0.0.1";
inline constexpr char kForm[] = "pan=3&tilt=-4";
inline constexpr char kEnvelope[] = "<Envelope><Body><Get/></Body></Envelope>";
inline constexpr char kSocketRequest[] = "GET /attack.cgi?a=1 HTTP/1.1\r\nHost: 127.0.0.1\r\n\r\n";

// The most that a loop over a response's data takes.
inline constexpr size_t kMostAttackText = 8 << 20;

// And a loop over its lines: without read-ahead each byte costs two system calls.
inline constexpr size_t kMostLines = 50000;

// Over the client's socket.
OperationOutcome GetBody(const Target& target);
OperationOutcome GetData(const Target& target);
OperationOutcome GetLines(const Target& target);
OperationOutcome LoginGet(const Target& target);
OperationOutcome GetTwice(const Target& target);
OperationOutcome GetHeadAgain(const Target& target);
OperationOutcome FormPost(const Target& target);
OperationOutcome Soap(const Target& target);
OperationOutcome SoapLogin(const Target& target);
OperationOutcome SoapXml(const Target& target);
OperationOutcome Upload(const Target& target);
OperationOutcome SecondRequest(const Target& target);
OperationOutcome JsonGet(const Target& target);
OperationOutcome JsonPost(const Target& target);

// Through libcurl.
OperationOutcome JsonGetOverTls(const Target& target);
OperationOutcome CurlGet(const Target& target);
OperationOutcome CurlPost(const Target& target);
OperationOutcome CurlGetToFile(const Target& target);
OperationOutcome CurlPostToFile(const Target& target);
OperationOutcome CurlForm(const Target& target);
OperationOutcome CurlFormDispatched(const Target& target);
OperationOutcome XmlGet(const Target& target);
OperationOutcome XmlPost(const Target& target);
OperationOutcome XmlPut(const Target& target);
OperationOutcome XmlDelete(const Target& target);
OperationOutcome CurlHandle(const Target& target);

// By the sockets alone.
OperationOutcome SocketData(const Target& target);
OperationOutcome SocketLines(const Target& target);
OperationOutcome SocketRaw(const Target& target);

std::unique_ptr<TWHttpClient> NewAttackedClient(const Target& target);

// Everything that a client tells of a response, beside its body.
void AskForHead(TWHttpClient& client, OperationOutcome* outcome);

// Reads to the end, or until a read fails.
template <typename Reader>
void ReadAll(Reader& reader, size_t piece, OperationOutcome* outcome) {
  std::string buf(piece, '\0');
  const int size = static_cast<int>(piece);
  int count;
  do {
    count = reader.ReadData(buf.data(), size);
    if (count < -1 || count > size) outcome->mistake = "ReadData: " + std::to_string(count);
    if (count > 0) outcome->text.append(buf, 0, static_cast<size_t>(count));
  } while (count > 0 && outcome->text.size() < kMostAttackText);
  outcome->has_text = count == 0;
}

// Lines to the end; every third one is pushed back and read again as data.
template <typename Reader>
void ReadLines(Reader& reader, size_t room, OperationOutcome* outcome) {
  std::string buf(room + 1, '\0');
  const int size = static_cast<int>(room + 1);
  size_t total = 0;
  for (unsigned line = 0; line < 400 && total < kMostLines; ++line) {
    const int length = reader.ReadToLineEnd(buf.data(), size);
    if (length < -1 || length >= size) outcome->mistake = "line of " + std::to_string(length);
    if (length < 0) return;
    if (buf[static_cast<size_t>(length)] != '\0') outcome->mistake = "a line without its end";
    total += static_cast<size_t>(length);
    if (length == 0 && !reader.HasDataToRead(0)) return;
    if (line % 3 != 0 || length == 0) continue;
    const int pushed = std::min(length, 1000);
    if (reader.RestoreData(buf.data(), pushed) == 0) reader.ReadData(buf.data(), pushed);
  }
}

#endif  // TARNWICK_TESTS_OPERATIONS_PARTS_H_
