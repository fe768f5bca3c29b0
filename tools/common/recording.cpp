#include "tools/common/recording.h"

#include <json/reader.h>
#include <json/value.h>

#include <cerrno>
#include <cstdio>
#include <cstring>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <memory>

#include "tools/common/json_output.h"

namespace {

constexpr char kIndex[] = "exchanges.jsonl";

bool Fail(std::string* error, const std::string& path) {
  *error = path + ": " + std::strerror(errno);
  return false;
}

bool WriteBytes(const std::string& path, const std::string& bytes, std::string* error) {
  std::ofstream file(path, std::ios::binary | std::ios::trunc);
  file.write(bytes.data(), static_cast<std::streamsize>(bytes.size()));
  file.close();
  return file ? true : Fail(error, path);
}

bool ReadBytes(const std::string& path, std::string* bytes, std::string* error) {
  std::ifstream file(path, std::ios::binary);
  if (!file) return Fail(error, path);
  bytes->assign(std::istreambuf_iterator<char>(file), {});
  return true;
}

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
    entry["delay_ms"] = static_cast<Json::Int64>(piece.delayMs);
    entry["bytes"] = static_cast<Json::UInt64>(piece.bytes);
    pieces.append(entry);
  }
  line["end"] = exchange.end;
  line["end_delay_ms"] = static_cast<Json::Int64>(exchange.endDelayMs);
  return line;
}

bool IsKnownEnd(const std::string& end) {
  for (const char* known : {"close", "reset", "silent", "kept", "refused", "unreachable", "tls"}) {
    if (end == known) return true;
  }
  return false;
}

// The bytes of the file that the member names. A recording may come from a stranger.
bool ReadNamed(const std::string& folder, const Json::Value& line, const char* member,
               std::string* bytes, std::string* error) {
  const std::string name = line.get(member, "").asString();
  if (name.empty() || name.find('/') != std::string::npos || name == "..") {
    *error = std::string("\"") + member + "\" is no name of a file in the folder";
    return false;
  }
  return ReadBytes(folder + "/" + name, bytes, error);
}

bool ReadPieces(const Json::Value& line, RecordedExchange* exchange, std::string* error) {
  size_t total = 0;
  for (const Json::Value& entry : line["pieces"]) {
    RecordedPiece piece;
    piece.delayMs = entry.get("delay_ms", 0).asInt64();
    piece.bytes = static_cast<size_t>(entry.get("bytes", 0).asUInt64());
    total += piece.bytes;
    exchange->pieces.push_back(piece);
  }
  if (total == exchange->response.size()) return true;
  *error = "the pieces are not as long as the response";
  return false;
}

bool ReadExchange(const std::string& folder, const Json::Value& line, RecordedExchange* exchange,
                  std::string* error) {
  exchange->number = line.get("number", 0).asInt();
  exchange->connection = line.get("connection", exchange->number).asInt();
  exchange->tls = line.get("tls", false).asBool();
  exchange->host = line.get("host", "").asString();
  exchange->port = line.get("port", 0).asInt();
  exchange->method = line.get("method", "").asString();
  exchange->target = line.get("target", "").asString();
  exchange->end = line.get("end", "close").asString();
  exchange->endDelayMs = line.get("end_delay_ms", 0).asInt64();
  if (!IsKnownEnd(exchange->end)) {
    *error = "\"end\" is none of the known ends";
    return false;
  }
  return ReadNamed(folder, line, "request", &exchange->request, error) &&
         ReadNamed(folder, line, "response", &exchange->response, error) &&
         ReadPieces(line, exchange, error);
}

bool ParseLine(const std::string& folder, const std::string& text, RecordedExchange* exchange,
               std::string* error) {
  const std::unique_ptr<Json::CharReader> reader(Json::CharReaderBuilder().newCharReader());
  Json::Value line;
  if (!reader->parse(text.data(), text.data() + text.size(), &line, error)) return false;
  if (!line.isObject() || !line["pieces"].isArray()) {
    *error = "no object with an array \"pieces\"";
    return false;
  }
  return ReadExchange(folder, line, exchange, error);
}

}  // namespace

bool WriteRecording(const std::string& folder, const std::vector<RecordedExchange>& exchanges,
                    std::string* error) {
  std::error_code code;
  std::filesystem::create_directories(folder, code);
  if (code) {
    *error = folder + ": " + code.message();
    return false;
  }
  std::string index;
  for (const RecordedExchange& exchange : exchanges) {
    const std::string base = folder + "/";
    if (!WriteBytes(base + FileName(exchange.number, "request"), exchange.request, error) ||
        !WriteBytes(base + FileName(exchange.number, "response"), exchange.response, error)) {
      return false;
    }
    index += CompactJson(IndexLine(exchange)) + "\n";
  }
  return WriteBytes(folder + "/" + kIndex, index, error);
}

bool ReadRecording(const std::string& folder, std::vector<RecordedExchange>* exchanges,
                   std::string* error) {
  std::ifstream index(folder + "/" + kIndex);
  if (!index) return Fail(error, folder + "/" + kIndex);
  int number = 0;
  for (std::string text; std::getline(index, text);) {
    ++number;
    if (text.empty()) continue;
    RecordedExchange exchange;
    bool read = false;
    try {
      read = ParseLine(folder, text, &exchange, error);
    } catch (const Json::Exception& exception) {  // a member of another kind
      *error = exception.what();
    }
    if (!read) {
      *error = std::string(kIndex) + ":" + std::to_string(number) + ": " + *error;
      return false;
    }
    exchanges->push_back(exchange);
  }
  return true;
}
