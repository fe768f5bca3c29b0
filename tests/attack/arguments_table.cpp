// The tables as one, and whether a function is missing there.
#include <fstream>
#include <map>

#include "tests/attack/arguments_calls.h"

namespace {

// What the library exports besides functions, and is named in no table for that reason.
bool IsNoFunction(const std::string& symbol) {
  for (const char* start : {"typeinfo ", "vtable for ", "g_pDbgLogCfg", "TARNWICK_1"}) {
    if (symbol.rfind(start, 0) == 0) return true;
  }
  return false;
}

// Of another architecture, which a function of another argument's type has a line of its own for.
bool IsForeign(const std::string& line) {
  const std::string other = sizeof(void*) == 8 ? "arch-bits=32" : "arch-bits=64";
  return line.find(other) != std::string::npos;
}

void Erase(const std::string& part, std::string* text) {
  for (size_t at; (at = text->find(part)) != std::string::npos;) text->erase(at, part.size());
}

// `TWSocket::Connect` of ` (c++)"TWSocket::Connect()@TARNWICK_1" 1.0.0`.
std::string NameOf(const std::string& line) {
  const size_t quote = line.find('"');
  std::string name = line.substr(quote == std::string::npos ? 1 : quote + 1);
  name.resize(name.find('@'));
  Erase("[abi:cxx11]", &name);
  Erase("[abi:time64]", &name);
  return name.substr(0, name.find('('));
}

}  // namespace

std::vector<PublicCall> AllCalls() {
  std::vector<PublicCall> all;
  for (const auto table :
       {LogCalls, UtilsCalls, SettingsCalls, SocketCalls, ClientCalls, RequestCalls}) {
    for (const PublicCall& call : table()) all.push_back(call);
  }
  return all;
}

std::vector<std::string> MissingCalls(const std::vector<PublicCall>& calls,
                                      const std::string& path) {
  std::map<std::string, int> forms;
  std::ifstream file(path);
  for (std::string line; std::getline(file, line);) {
    if (line.empty() || line[0] != ' ' || IsForeign(line)) continue;
    const std::string name = NameOf(line);
    if (!IsNoFunction(name)) ++forms[name];
  }
  std::vector<std::string> missing;
  if (forms.empty()) missing.push_back(path + ": no functions");
  for (const PublicCall& call : calls) --forms[call.name];
  for (const auto& [name, count] : forms) {
    if (count > 0) missing.push_back(name);
  }
  return missing;
}
