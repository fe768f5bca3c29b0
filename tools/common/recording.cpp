#include "tools/common/recording.h"

#include <fcntl.h>
#include <json/reader.h>
#include <json/value.h>

#include <cerrno>
#include <cstdio>
#include <cstring>
#include <memory>
#include <sstream>

#include "tools/common/json_output.h"
#include "tools/common/private_file.h"

namespace {

constexpr char kIndex[] = "exchanges.jsonl";

// What a recording may hold: one of a stranger must not fill the memory, nor name a device that has
// no end, nor wait for years.
constexpr size_t kMostBytes = size_t{256} << 20;
constexpr int64_t kLongestDelay = 86400000;

std::string FileName(int number, const char* kind) {
  char name[32];
  snprintf(name, sizeof(name), "%03d.%s", number, kind);
  return name;
}

Json::Value IndexLine(const RecordedExchange& exchange) {
  Json::Value line(Json::objectValue);
  line["number"] = exchange.number;
  line["connection"] = exchange.connection;
  line["tls"] = exchange.tls;
  line["host"] = exchange.host;
  line["port"] = exchange.port;
  line["method"] = exchange.method;
  line["target"] = exchange.target;
  line["request"] = FileName(exchange.number, "request");
  line["response"] = FileName(exchange.number, "response");
  Json::Value& pieces = line["pieces"] = Json::Value(Json::arrayValue);
  for (const RecordedPiece& piece : exchange.pieces) {
    Json::Value entry(Json::objectValue);
    entry["delay_ms"] = static_cast<Json::Int64>(piece.delay_ms);
    entry["bytes"] = static_cast<Json::UInt64>(piece.bytes);
    pieces.append(entry);
  }
  line["end"] = exchange.end;
  line["end_delay_ms"] = static_cast<Json::Int64>(exchange.end_delay_ms);
  return line;
}

bool IsKnownEnd(const std::string& end) {
  for (const char* known : {"close", "reset", "silent", "kept", "refused", "unreachable", "tls"}) {
    if (end == known) return true;
  }
  return false;
}

// The bytes of the file that the member names. A recording may come from a stranger.
bool ReadNamed(const tarnwick::UniqueFd& directory, const Json::Value& line, const char* member,
               std::string* bytes, std::string* error) {
  const std::string name = line.get(member, "").asString();
  if (name.empty() || name.find('/') != std::string::npos || name == ".." ||
      name.find('\0') != std::string::npos) {
    *error = std::string("\"") + member + "\" is no name of a file in the directory";
    return false;
  }
  return ReadRegularFile(directory, name, kMostBytes, bytes, error);
}

bool IsDelay(int64_t delay_ms) {
  return delay_ms >= 0 && delay_ms <= kLongestDelay;
}

bool ReadPieces(const Json::Value& line, RecordedExchange* exchange, std::string* error) {
  size_t left = exchange->response.size();
  for (const Json::Value& entry : line["pieces"]) {
    RecordedPiece piece;
    piece.delay_ms = entry.get("delay_ms", 0).asInt64();
    const uint64_t bytes = entry.get("bytes", 0).asUInt64();
    if (!IsDelay(piece.delay_ms)) {
      *error = "a delay is not between none and a day";
      return false;
    }
    if (bytes > left) break;
    piece.bytes = static_cast<size_t>(bytes);
    left -= piece.bytes;
    exchange->pieces.push_back(piece);
  }
  if (left == 0 && exchange->pieces.size() == line["pieces"].size()) return true;
  *error = "the pieces are not as long as the response";
  return false;
}

bool ReadExchange(const tarnwick::UniqueFd& directory, const Json::Value& line,
                  RecordedExchange* exchange, std::string* error) {
  exchange->number = line.get("number", 0).asInt();
  exchange->connection = line.get("connection", exchange->number).asInt();
  exchange->tls = line.get("tls", false).asBool();
  exchange->host = line.get("host", "").asString();
  exchange->port = line.get("port", 0).asInt();
  exchange->method = line.get("method", "").asString();
  exchange->target = line.get("target", "").asString();
  exchange->end = line.get("end", "close").asString();
  exchange->end_delay_ms = line.get("end_delay_ms", 0).asInt64();
  if (!IsKnownEnd(exchange->end)) {
    *error = "\"end\" is none of the known ends";
    return false;
  }
  if (!IsDelay(exchange->end_delay_ms)) {
    *error = "\"end_delay_ms\" is not between none and a day";
    return false;
  }
  return ReadNamed(directory, line, "request", &exchange->request, error) &&
         ReadNamed(directory, line, "response", &exchange->response, error) &&
         ReadPieces(line, exchange, error);
}

bool ParseLine(const tarnwick::UniqueFd& directory, const std::string& text,
               RecordedExchange* exchange, std::string* error) {
  const std::unique_ptr<Json::CharReader> reader(Json::CharReaderBuilder().newCharReader());
  Json::Value line;
  if (!reader->parse(text.data(), text.data() + text.size(), &line, error)) return false;
  if (!line.isObject() || !line["pieces"].isArray()) {
    *error = "no object with an array \"pieces\"";
    return false;
  }
  return ReadExchange(directory, line, exchange, error);
}

}  // namespace

bool WriteRecording(const std::string& directory, const std::vector<RecordedExchange>& exchanges,
                    std::string* error) {
  const tarnwick::UniqueFd opened = OpenPrivateDirectory(directory, error);
  if (!opened.Valid()) return false;
  std::string index;
  bool written = true;
  for (const RecordedExchange& exchange : exchanges) {
    written =
        written &&
        WritePrivateFile(opened, FileName(exchange.number, "request"), exchange.request, error) &&
        WritePrivateFile(opened, FileName(exchange.number, "response"), exchange.response, error);
    index += CompactJson(IndexLine(exchange)) + "\n";
  }
  if (written && WritePrivateFile(opened, kIndex, index, error)) return true;
  *error = directory + "/" + *error;
  return false;
}

bool ReadRecording(const std::string& directory, std::vector<RecordedExchange>* exchanges,
                   std::string* error) {
  const tarnwick::UniqueFd opened(open(directory.c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC));
  if (!opened.Valid()) {
    *error = directory + "/" + kIndex + ": " + std::strerror(errno);
    return false;
  }
  std::string text;
  if (!ReadRegularFile(opened, kIndex, kMostBytes, &text, error)) {
    *error = directory + "/" + *error;
    return false;
  }
  std::istringstream index(text);
  size_t total = 0;
  int number = 0;
  for (std::string line; std::getline(index, line);) {
    ++number;
    if (line.empty()) continue;
    RecordedExchange exchange;
    bool read = false;
    try {
      read = ParseLine(opened, line, &exchange, error);
    } catch (const Json::Exception& exception) {  // a member of another kind
      *error = exception.what();
    }
    total += exchange.request.size() + exchange.response.size();
    if (read && total > kMostBytes) {
      *error = "the recording is larger than 256 MiB";
      read = false;
    }
    if (!read) {
      *error = std::string(kIndex) + ":" + std::to_string(number) + ": " + *error;
      return false;
    }
    exchanges->push_back(exchange);
  }
  return true;
}
