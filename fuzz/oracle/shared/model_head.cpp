#include "fuzz/oracle/shared/model_head.h"

#include <algorithm>
#include <climits>
#include <cstdlib>
#include <string>
#include <vector>

namespace {

constexpr int kLine = 2048;
constexpr int kMostLines = 30;

std::string Lower(std::string text) {
  for (char& c : text) {
    if (c >= 'A' && c <= 'Z') c = static_cast<char>(c - 'A' + 'a');
  }
  return text;
}

std::string WithoutSpaces(std::string text) {
  while (!text.empty() && text.front() == ' ') text.erase(0, 1);
  while (!text.empty() && text.back() == ' ') text.pop_back();
  return text;
}

// Reads a line as a text, which ends at its first zero byte. Results: its length with what follows
// the zero byte, or -1.
int ReadText(ModelSocket* socket, std::string* line) {
  const int length = socket->ReadLine(kLine, line);
  *line = std::string(line->c_str());
  return length;
}

std::vector<std::string> WordsOf(const std::string& line) {
  std::vector<std::string> words(1);
  for (const char c : line) {
    if (c != ' ') {
      words.back() += c;
    } else if (!words.back().empty()) {
      words.emplace_back();
    }
  }
  if (words.back().empty()) words.pop_back();
  return words;
}

int ResultOf(int status) {
  if (status >= 200 && status <= 299) return 0;
  if (status == 401) return 4;
  if (status == 414) return 8;
  if (status == 302) return 7;
  return 5;
}

// A number that no int holds is the nearest one that it does, so that it never looks like a status.
int LeadingNumber(const std::string& word) {
  const long number = std::strtol(word.c_str(), nullptr, 10);
  return static_cast<int>(std::clamp(number, long{INT_MIN}, long{INT_MAX}));
}

bool IsDelimiter(char c) {
  return c == ' ' || c == ':' || c == ';' || c == '=';
}

void Keep(ModelHead* head, const ModelField& field, const std::string& value) {
  if (field.key >= 0) head->kept.emplace(field.key, WithoutSpaces(value));
  if (field.name == "set-cookie") {
    const size_t end = value.find(';');
    head->cookie = end == std::string::npos ? "" : WithoutSpaces(value.substr(0, end + 1));
  }
  if (field.name == "www-authenticate") head->challenge = value;
  if (field.name == "transfer-encoding") head->encoding = WithoutSpaces(value);
}

// Results: 0, or 1 for a line without name or value.
int KeepLine(ModelHead* head, const std::string& line) {
  size_t begin = 0;
  while (begin < line.size() && IsDelimiter(line[begin])) ++begin;
  if (begin == line.size()) return 1;
  size_t end = begin;
  while (end < line.size() && !IsDelimiter(line[end])) ++end;
  const std::string name = Lower(line.substr(begin, end - begin));
  for (const ModelField& field : ModelFields()) {
    if (name.rfind(field.name, 0) != 0) continue;
    if (end + 1 >= line.size()) return 1;
    Keep(head, field, line.substr(end + 1));
    return 0;
  }
  return 0;
}

int ReadHeaderLines(ModelSocket* socket, ModelHead* head) {
  head->kept.clear();
  head->cookie.clear();
  head->challenge.clear();
  for (int i = 0; i < kMostLines; ++i) {
    std::string line;
    const int length = ReadText(socket, &line);
    if (length < 0) return 3;
    if (length == 0) break;
    if (KeepLine(head, line) != 0) return 1;
  }
  head->state = 2;
  return 0;
}

}  // namespace

const std::vector<ModelField>& ModelFields() {
  static const std::vector<ModelField> fields = {
      {"content-type", 0}, {"content-length", 1},    {"content-range", 2},
      {"set-cookie", -1},  {"www-authenticate", -1}, {"transfer-encoding", -1},
  };
  return fields;
}

int ReadModelHead(ModelSocket* socket, ModelHead* head) {
  head->status = 0;
  if (head->state != 1) return 1;
  std::string line;
  if (ReadText(socket, &line) < 0) return 3;
  const std::vector<std::string> words = WordsOf(line);
  if (words.empty()) return 3;
  const std::string version = words[0].substr(0, 8);
  if (version != "HTTP/1.0" && version != "HTTP/1.1") return 5;
  if (words.size() < 2) return 3;
  head->status = LeadingNumber(words[1]);
  const int result = ReadHeaderLines(socket, head);
  return result != 0 ? result : ResultOf(head->status);
}
