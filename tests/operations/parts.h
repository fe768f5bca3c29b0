// The functions of the table, by the way that their bytes go, and what they share.
#ifndef TARNWICK_TESTS_OPERATIONS_PARTS_H_
#define TARNWICK_TESTS_OPERATIONS_PARTS_H_

#include <libxml/tree.h>

#include <algorithm>
#include <memory>
#include <string>

#include "tests/operations/operations.h"

// Over the client's socket.
OperationResult GetBody(const OperationSettings& settings);
OperationResult GetData(const OperationSettings& settings);
OperationResult GetLines(const OperationSettings& settings);
OperationResult GetTwice(const OperationSettings& settings);
OperationResult GetHeadAgain(const OperationSettings& settings);
OperationResult LoginGet(const OperationSettings& settings);
OperationResult FormPost(const OperationSettings& settings);
OperationResult Soap(const OperationSettings& settings);
OperationResult SoapLogin(const OperationSettings& settings);
OperationResult SoapXml(const OperationSettings& settings);
OperationResult Upload(const OperationSettings& settings);
OperationResult SecondRequest(const OperationSettings& settings);
OperationResult JsonGet(const OperationSettings& settings);
OperationResult JsonPost(const OperationSettings& settings);

// Through libcurl.
OperationResult JsonGetOverTls(const OperationSettings& settings);
OperationResult CurlGet(const OperationSettings& settings);
OperationResult CurlPost(const OperationSettings& settings);
OperationResult CurlGetToFile(const OperationSettings& settings);
OperationResult CurlPostToFile(const OperationSettings& settings);
OperationResult CurlForm(const OperationSettings& settings);
OperationResult CurlLoginForm(const OperationSettings& settings);
OperationResult XmlGet(const OperationSettings& settings);
OperationResult XmlPost(const OperationSettings& settings);
OperationResult XmlPut(const OperationSettings& settings);
OperationResult XmlDelete(const OperationSettings& settings);
OperationResult CurlHandle(const OperationSettings& settings);

// By the sockets alone.
OperationResult Connect(const OperationSettings& settings);
OperationResult Reconnect(const OperationSettings& settings);
OperationResult KeepAlive(const OperationSettings& settings);
OperationResult Probe(const OperationSettings& settings);
OperationResult SocketExchange(const OperationSettings& settings);
OperationResult SocketData(const OperationSettings& settings);
OperationResult SocketLines(const OperationSettings& settings);
OperationResult SocketRaw(const OperationSettings& settings);

std::shared_ptr<ExposedClient> ClientOf(const OperationSettings& settings);

// Everything that a client tells of a response, beside its body.
void AskForHead(ExposedClient& client, OperationResult* result);

// A document that is freed at the end.
class OwnedDocument {
 public:
  OwnedDocument() = default;
  explicit OwnedDocument(const std::string& text);
  ~OwnedDocument() { xmlFreeDoc(document_); }
  OwnedDocument(const OwnedDocument&) = delete;
  OwnedDocument& operator=(const OwnedDocument&) = delete;

  xmlDoc*& Get() { return document_; }
  std::string Text() const;  // empty without a document

 private:
  xmlDoc* document_ = nullptr;
};

// The value that a JSON function has put in its place, if any.
void TakeValue(const Json::Value& value, OperationResult* result);

// Writes the bytes in pieces. Results: false when one was not written whole.
template <typename Writer>
bool WritePieces(const OperationSettings& settings, Writer& writer, const std::string& bytes,
                 OperationResult* result) {
  for (size_t sent = 0; sent < bytes.size();) {
    const int size = static_cast<int>(std::min(settings.piece, bytes.size() - sent));
    int count = -2;
    settings.Step([&] { count = writer.WriteData(bytes.data() + sent, size); });
    if (count < -1 || count > size) result->mistake = "WriteData: " + std::to_string(count);
    if (count != size) {
      result->read = -1;
      return false;
    }
    sent += static_cast<size_t>(count);
  }
  return true;
}

// Appends what one read of `size` bytes delivers. Results: false at the end and after a failure.
template <typename Reader>
bool ReadPiece(const OperationSettings& settings, Reader& reader, size_t size, std::string* text,
               OperationResult* result) {
  std::string buf(size, '\0');
  const int most = static_cast<int>(size);
  settings.Step([&] { result->read = reader.ReadData(buf.data(), most); });
  const int count = result->read;
  if (count < -1 || count > most) result->mistake = "ReadData: " + std::to_string(count);
  if (count > 0) text->append(buf, 0, static_cast<size_t>(count));
  return count > 0;
}

// Reads to the end, until a read fails, or enough bytes are there.
template <typename Reader>
void ReadPieces(const OperationSettings& settings, Reader& reader, OperationResult* result) {
  while (result->text.size() < settings.most &&
         ReadPiece(settings, reader, settings.piece, &result->text, result)) {
  }
  result->has_text = result->read == 0;
}

// Lines to the end; every third one is pushed back and read again as data.
template <typename Reader>
void ReadLines(const OperationSettings& settings, Reader& reader, OperationResult* result) {
  constexpr unsigned kMostLines = 400;
  // Without read-ahead each byte costs two system calls.
  const size_t most = std::min<size_t>(settings.most, 50000);
  std::string buf(settings.piece + 1, '\0');
  const int size = static_cast<int>(buf.size());
  size_t total = 0;
  for (unsigned line = 0; line < kMostLines && total < most; ++line) {
    settings.Step([&] { result->read = reader.ReadToLineEnd(buf.data(), size); });
    const int length = result->read;
    if (length < -1 || length >= size) result->mistake = "line of " + std::to_string(length);
    if (length < 0) return;
    if (buf[static_cast<size_t>(length)] != '\0') result->mistake = "a line without its end";
    total += static_cast<size_t>(length);
    bool more = true;
    if (length == 0) settings.Step([&] { more = reader.HasDataToRead(0); });
    if (!more) return;
    if (line % 3 != 0 || length == 0) continue;
    const int pushed = std::min(length, 1000);
    settings.Step([&] {
      if (reader.RestoreData(buf.data(), pushed) == 0) reader.ReadData(buf.data(), pushed);
    });
  }
}

#endif  // TARNWICK_TESTS_OPERATIONS_PARTS_H_
