#include "tools/twcamsim/lists.h"

#include <fmt/format.h>
#include <json/value.h>

#include "tools/common/json_output.h"
#include "tools/twcamsim/endpoint.h"

namespace {

bool PrintText(const std::string& text) {
  return std::fwrite(text.data(), 1, text.size(), stdout) == text.size() &&
         std::fflush(stdout) == 0;
}

Json::Value Named(const char* name, const char* meaning) {
  Json::Value value(Json::objectValue);
  value["name"] = name;
  value["meaning"] = meaning;
  return value;
}

Json::Value FaultRecord(const FaultType& type) {
  Json::Value value = Named(type.name, type.meaning);
  value["group"] = type.group;
  value["tls"] = type.needs_tls;
  value["arguments"] = ArgumentsText(type);
  value["standards"] = Json::Value(Json::arrayValue);
  for (const ArgumentRule& rule : type.rules) {
    value["standards"].append(rule.default_value ? Json::Value(rule.default_value) : Json::Value());
  }
  return value;
}

Json::Value OptionRecords(const std::vector<ProfileOption>& options) {
  Json::Value list(Json::arrayValue);
  for (const ProfileOption& option : options) {
    Json::Value value = Named(option.name, option.meaning);
    value["argument"] = option.argument;
    list.append(value);
  }
  return list;
}

std::string OptionLine(const ProfileOption& option) {
  const std::string name =
      option.argument[0] == '\0' ? option.name : fmt::format("{}={}", option.name, option.argument);
  return fmt::format("    {:<22}  {}\n", name, option.meaning);
}

}  // namespace

bool ListFaults(bool json) {
  std::string text, group;
  for (const FaultType& type : FaultTypes()) {
    if (json && !PrintJsonLine(FaultRecord(type))) return false;
    if (group != type.group) text += fmt::format("{}{}\n", group.empty() ? "" : "\n", type.group);
    group = type.group;
    const std::string arguments = ArgumentsText(type);
    const std::string name = type.name + (arguments.empty() ? "" : "=" + arguments);
    text += fmt::format("  {:<32}  {}\n", name, type.meaning);
  }
  return json || PrintText(text);
}

bool ListProfiles(bool json) {
  std::string text;
  for (const ProfileType& type : ProfileTypes()) {
    Json::Value value = Named(type.name, type.meaning);
    value["login"] = type.authentication;
    value["options"] = OptionRecords(type.options);
    if (json && !PrintJsonLine(value)) return false;
    text += fmt::format("{:<12}  {}\n", type.name, type.meaning);
    for (const ProfileOption& option : type.options) text += OptionLine(option);
  }
  text += "\nEvery profile takes:\n";
  for (const ProfileOption& option : CommonOptions()) text += OptionLine(option);
  return json || PrintText(text);
}

bool ListLogins(bool json) {
  std::string text;
  for (const AuthenticationStyle& style : AuthenticationStyles()) {
    if (json && !PrintJsonLine(Named(style.name.c_str(), style.meaning.c_str()))) return false;
    text += fmt::format("{:<28}  {}\n", style.name, style.meaning);
  }
  return json || PrintText(text);
}
