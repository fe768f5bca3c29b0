#include "fuzz/support/script.h"

#include <algorithm>
#include <cstdlib>
#include <cstring>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

namespace {

constexpr size_t kMostNumbers = 16;
constexpr size_t kMostConnections = 4;

struct Mark {
  std::string_view text;
  void (*apply)(Connection* connection, Event* event);
};

template <Event happened>
void Happens(Connection*, Event* event) {
  *event = happened;
}

template <Dial dial>
void Dials(Connection* connection, Event*) {
  connection->dial = dial;
}

template <Intake intake>
void Takes(Connection* connection, Event*) {
  connection->intake = intake;
}

constexpr Mark kMarks[] = {
    {"<<wait>>", Happens<Event::kWait>},     {"<<intr>>", Happens<Event::kIntr>},
    {"<<signal>>", Happens<Event::kSignal>}, {"<<strange>>", Happens<Event::kStrange>},
    {"<<broken>>", Happens<Event::kBroken>}, {"<<reset>>", Happens<Event::kReset>},
    {"<<stall>>", Happens<Event::kStall>},   {"<<close>>", Happens<Event::kClose>},
    {"<<late>>", Dials<Dial::kLate>},        {"<<refuse>>", Dials<Dial::kRefused>},
    {"<<lost>>", Dials<Dial::kLost>},        {"<<silent>>", Dials<Dial::kSilent>},
    {"<<halves>>", Takes<Intake::kHalves>},  {"<<nothing>>", Takes<Intake::kNothing>},
    {"<<full>>", Takes<Intake::kFullOnce>},  {"<<pipe>>", Takes<Intake::kBrokenPipe>},
};

const Mark* MarkAt(std::string_view text) {
  for (const Mark& mark : kMarks) {
    if (text.substr(0, mark.text.size()) == mark.text) return &mark;
  }
  return nullptr;
}

bool Ends(Event event) {
  return event == Event::kReset || event == Event::kStall || event == Event::kClose;
}

}  // namespace

Options::Options(std::string_view line) : line_(line) {
  const char* at = line_.c_str();
  while (*(at += std::strcspn(at, "0123456789")) != '\0' && numbers_.size() < kMostNumbers) {
    char* end = nullptr;
    numbers_.push_back(std::clamp(std::strtoul(at, &end, 10), 1ul, 70000ul));
    at = end;
  }
}

bool Options::Has(std::string_view word) const {
  return line_.find(word) != std::string::npos;
}

std::string_view TakeLine(std::string_view* text) {
  const size_t end = std::min(text->find('\n'), text->size());
  const std::string_view line = text->substr(0, end);
  text->remove_prefix(std::min(end + 1, text->size()));
  return line;
}

std::vector<Connection> ParseConnections(std::string_view text) {
  std::vector<Connection> connections(1);
  std::string bytes;
  while (!text.empty() && connections.size() <= kMostConnections) {
    const Mark* mark = text[0] == '<' ? MarkAt(text) : nullptr;
    if (mark == nullptr) {
      bytes += text[0];
      text.remove_prefix(1);
      continue;
    }
    text.remove_prefix(mark->text.size());
    Event event = Event::kNone;
    mark->apply(&connections.back(), &event);
    if (event == Event::kNone) continue;
    connections.back().pieces.push_back({std::exchange(bytes, ""), event});
    if (Ends(event)) connections.emplace_back();
  }
  connections.back().pieces.push_back({bytes, Event::kClose});
  return connections;
}
