#include "tools/twcamsim/faults.h"

#include <fmt/format.h>

#include <charconv>

#include "tools/common/text.h"

namespace {

std::vector<std::string> Split(const std::string& text, char separator) {
  std::vector<std::string> parts;
  for (size_t at = 0;;) {
    const size_t end = text.find(separator, at);
    parts.push_back(text.substr(at, end - at));
    if (end == std::string::npos) return parts;
    at = end + 1;
  }
}

const FaultType* FindFault(const std::string& name) {
  for (const FaultType& type : FaultTypes()) {
    if (name == type.name) return &type;
  }
  return nullptr;
}

std::string UnknownFault(const std::string& name) {
  std::vector<std::string> names;
  for (const FaultType& type : FaultTypes()) names.emplace_back(type.name);
  const std::string hint = DidYouMean(name, names);
  const std::string text = fmt::format("there is no fault \"{}\"", name);
  return text + "; " + (hint.empty() ? "--list-faults shows them" : hint);
}

bool ParseArgument(const ArgumentRule& rule, const std::string& text, FaultArgument* argument) {
  argument->text = text;
  if (rule.least == rule.most) return !text.empty();
  const auto [end, code] =
      std::from_chars(text.data(), text.data() + text.size(), argument->number);
  return code == std::errc() && end == text.data() + text.size() &&
         argument->number >= rule.least && argument->number <= rule.most;
}

std::string WrongArgument(const FaultType& type, const ArgumentRule& rule,
                          const std::string& text) {
  if (rule.least == rule.most) return fmt::format("fault {}: {} is empty", type.name, rule.name);
  return fmt::format("fault {}: {} is \"{}\", not a number from {} to {}", type.name, rule.name,
                     text, rule.least, rule.most);
}

bool ParseArguments(const FaultType& type, const std::vector<std::string>& texts, Fault* fault,
                    std::string* error) {
  if (texts.size() > type.rules.size()) {
    *error = fmt::format("fault {} takes {} argument(s), not {}", type.name, type.rules.size(),
                         texts.size());
    return false;
  }
  for (size_t i = 0; i < type.rules.size(); ++i) {
    const ArgumentRule& rule = type.rules[i];
    if (i >= texts.size() && !rule.default_value) {
      *error = fmt::format("fault {} needs {}", type.name, rule.name);
      return false;
    }
    const std::string text = i < texts.size() ? texts[i] : rule.default_value;
    FaultArgument argument;
    if (!ParseArgument(rule, text, &argument)) {
      *error = WrongArgument(type, rule, text);
      return false;
    }
    fault->arguments.push_back(argument);
  }
  return true;
}

}  // namespace

const std::vector<FaultType>& FaultTypes() {
  static const std::vector<FaultType> kTypes = [] {
    std::vector<FaultType> types;
    for (const auto part : {ConnectionFaults, TlsFaults, TimingFaults, LengthFaults, ChunkFaults,
                            HeadFaults, AuthenticationFaults, BodyFaults}) {
      for (FaultType& type : part()) types.push_back(std::move(type));
    }
    return types;
  }();
  return kTypes;
}

std::string ArgumentsText(const FaultType& type) {
  std::string text, closing;
  for (const ArgumentRule& rule : type.rules) {
    if (rule.default_value) {
      text += "[";
      closing += "]";
    }
    text += (&rule == type.rules.data() ? "" : ",") + std::string(rule.name);
  }
  return text + closing;
}

bool ParseFault(const std::string& text, char assign, char separator, Fault* fault,
                std::string* error) {
  const size_t end = text.find(assign);
  const std::string name = text.substr(0, end);
  fault->type = FindFault(name);
  fault->text = text;
  if (!fault->type) {
    *error = UnknownFault(name);
    return false;
  }
  std::vector<std::string> texts;
  if (end != std::string::npos) texts = Split(text.substr(end + 1), separator);
  return ParseArguments(*fault->type, texts, fault, error);
}
