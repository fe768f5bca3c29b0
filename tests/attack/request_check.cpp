#include "tests/attack/request_check.h"

#include <algorithm>
#include <cstdlib>
#include <cstring>
#include <map>

namespace {

constexpr char kHeadEnd[] = "\r\n\r\n";

// A GET over the socket is cut there; see docs/limits.md.
constexpr size_t kMostOfAGet = 2047;

const char* const kNames[] = {"User-Agent",     "Cookie",       "Authorization",
                              "Host",           "Content-Type", "Connection",
                              "Content-Length", "Accept",       "Accept-Encoding"};

constexpr char kOddLine[] = "Cache-Control :no-cache";  // of an upload

bool IsCutGet(const std::string& bytes, const AttackedOperation& operation) {
  return !operation.curl && bytes.size() == kMostOfAGet && bytes.compare(0, 4, "GET ") == 0 &&
         bytes.find(kHeadEnd) == std::string::npos;
}

size_t BodyLength(const std::string& head) {
  constexpr char kName[] = "\r\nContent-Length: ";
  const size_t found = head.find(kName);
  return found == std::string::npos ? 0
                                    : strtoul(head.c_str() + found + strlen(kName), nullptr, 10);
}

std::string RequestLineProblem(const std::string& line, const AttackedOperation& operation) {
  const std::string start = operation.request;
  if (line.compare(0, start.size(), start) != 0) return "request line";
  if (std::count(line.begin(), line.end(), ' ') != 2) return "blanks of the request line";
  const std::string version = line.substr(line.rfind(' ') + 1);
  return version == "HTTP/1.0" || version == "HTTP/1.1" ? "" : "version of the request line";
}

bool HasLineBreak(const std::string& text) {
  return text.find_first_of(std::string("\r\n\0", 3)) != std::string::npos;
}

std::string HeaderProblem(const std::string& line, std::map<std::string, int>* seen) {
  if (line == kOddLine) return "";
  const size_t colon = line.find(": ");
  const std::string name = line.substr(0, colon);
  const bool known = std::find(std::begin(kNames), std::end(kNames), name) != std::end(kNames);
  if (colon == std::string::npos || !known) return "unknown header line";
  return ++(*seen)[name] > 1 ? "header twice" : "";
}

// The complete lines of a head, or of the beginning of one.
std::string HeadProblem(const std::string& head, const AttackedOperation& operation) {
  std::map<std::string, int> seen;
  bool first = true;
  for (size_t at = 0;;) {
    const size_t end = head.find("\r\n", at);
    const std::string line = head.substr(at, end == std::string::npos ? end : end - at);
    // A line feed or a zero byte counts in a line that broke off as well.
    if (line.find_first_of(std::string("\n\0", 2)) != std::string::npos) return "line with a break";
    if (end == std::string::npos) return "";
    if (line.empty()) return "";
    if (HasLineBreak(line)) return "line with a break";
    const std::string problem =
        first ? RequestLineProblem(line, operation) : HeaderProblem(line, &seen);
    if (!problem.empty()) return problem + " [" + line.substr(0, 200) + "]";
    first = false;
    at = end + 2;
  }
}

}  // namespace

bool IsWholeRequest(const std::string& bytes, const AttackedOperation& operation) {
  if (IsCutGet(bytes, operation)) return true;
  const size_t end = bytes.find(kHeadEnd);
  if (end == std::string::npos) return false;
  return operation.upload || bytes.size() >= RequestLength(bytes, operation);
}

size_t RequestLength(const std::string& bytes, const AttackedOperation& operation) {
  const size_t end = bytes.find(kHeadEnd);
  if (end == std::string::npos || operation.upload) return bytes.size();
  return end + strlen(kHeadEnd) + BodyLength(bytes.substr(0, end));
}

std::string RequestProblem(const std::string& bytes, const AttackedOperation& operation,
                           int* requests) {
  for (size_t at = 0; at < bytes.size();) {
    ++*requests;
    const std::string rest = bytes.substr(at);
    const std::string problem = HeadProblem(rest, operation);
    if (!problem.empty()) return "request " + std::to_string(*requests) + ": " + problem;
    if (!IsWholeRequest(rest, operation)) return "";
    at += RequestLength(rest, operation);
  }
  return "";
}
