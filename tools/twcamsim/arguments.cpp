#include "tools/twcamsim/arguments.h"

#include <CLI/CLI.hpp>
#include <algorithm>
#include <set>

#include "tools/common/completion.h"
#include "tools/common/parser.h"
#include "tools/common/units.h"

namespace {

using std::chrono::milliseconds;

// A validator that also stores: CLI11 has no type for spans.
CLI::Option* AddSpan(CLI::App* app, const std::string& name, milliseconds* span,
                     const std::string& meaning) {
  return app
      ->add_option_function<std::string>(
          name,
          [name, span](const std::string& text) {
            const std::optional<milliseconds> parsed = ParseSpan(text);
            if (!parsed || parsed->count() <= 0) {
              throw CLI::ValidationError(name, "\"" + text + "\" is no span like 90s or 10m");
            }
            *span = *parsed;
          },
          meaning)
      ->type_name("SPAN");
}

void AddServing(CLI::App* app, Arguments* arguments) {
  app->add_option(
         "-e,--endpoint", arguments->endpoints,
         "Serve this profile at an address of its own; may come several times. Without it, "
         "one endpoint of each profile is served.")
      ->type_name("PROFILE[,OPTION=VALUE]")
      ->take_all()
      ->allow_extra_args(false);
  app->add_option("-f,--fault", arguments->faults,
                  "Give all endpoints this fault; may come several times.")
      ->type_name("NAME[=ARG[,ARG]]")
      ->take_all()
      ->allow_extra_args(false);
  app->add_option("--replay", arguments->replay,
                  "Play back a recording; the same as --endpoint replay,dir=DIR.")
      ->type_name("DIR");
  app->add_option("--listen", arguments->listen,
                  "Listen at this IPv4 address; 127.0.0.1 when it is not given.")
      ->type_name("ADDRESS");
  app->add_option("--seed", arguments->seed,
                  "Choose nonces and random cuts by this number, so that they come again.")
      ->type_name("NUMBER");
}

void AddFiles(CLI::App* app, Arguments* arguments) {
  app->add_option(
         "--dir", arguments->dir,
         "Write the authority's certificate, ca.pem, into this directory and leave it there; "
         "otherwise into one that goes away at the end.")
      ->type_name("DIR");
  app->add_option("--journal", arguments->journal,
                  "Append a JSON line for each connection to this file; - is standard output.")
      ->type_name("FILE");
  app->add_option("--access", arguments->access,
                  "Append a line \"METHOD PATH STATUS\" for each response to this file.")
      ->type_name("FILE");
}

void AddLimits(CLI::App* app, Arguments* arguments) {
  AddSpan(app, "--idle", &arguments->idle,
          "Close a connection on which nothing comes for so long; 60s when it is not given.");
  AddSpan(app, "--hold", &arguments->hold,
          "End a stall for good after that span; 1h when it is not given.");
  AddSpan(app, "--for", &arguments->run_for,
          "End by itself after that span; otherwise at SIGTERM or SIGINT.");
}

void AddLists(CLI::App* app, Arguments* arguments) {
  app->add_flag("--list-faults", arguments->list_faults, "List the faults and end.");
  app->add_flag("--list-profiles", arguments->list_profiles, "List the profiles and end.");
  app->add_flag("--list-logins", arguments->list_logins,
                "List the styles of authentication and end.");
  app->add_flag("--json", arguments->json, "Make the lists JSON, one object a line.");
}

CompletionWords Words() {
  CompletionWords words;
  for (const FaultType& type : FaultTypes()) words["--fault"].emplace_back(type.name);
  for (const ProfileType& type : ProfileTypes()) words["--endpoint"].emplace_back(type.name);
  return words;
}

bool AddGlobalFaults(const Arguments& arguments, Endpoint* endpoint, std::string* error) {
  for (const std::string& text : arguments.faults) {
    Fault fault;
    if (!ParseFault(text, '=', ',', &fault, error)) return false;
    endpoint->faults.push_back(fault);
  }
  return true;
}

// Two endpoints of one name would be one in the journal.
void MakeNamesUnique(const std::vector<std::unique_ptr<Endpoint>>& endpoints) {
  std::set<std::string> names;
  for (const auto& endpoint : endpoints) {
    const std::string name = endpoint->name;
    for (int i = 2; !names.insert(endpoint->name).second; ++i) {
      endpoint->name = name + "-" + std::to_string(i);
    }
  }
}

bool CheckTlsFaults(const std::vector<std::unique_ptr<Endpoint>>& endpoints, std::string* error) {
  const bool any_tls = std::any_of(endpoints.begin(), endpoints.end(),
                                   [](const auto& endpoint) { return endpoint->tls; });
  for (const auto& endpoint : endpoints) {
    for (const Fault& fault : endpoint->faults) {
      if (!fault.type->needs_tls || any_tls) continue;
      *error = std::string("fault ") + fault.type->name +
               " needs an endpoint with TLS: --endpoint PROFILE,tls";
      return false;
    }
  }
  return true;
}

}  // namespace

std::optional<int> ParseArguments(int argc, char** argv, Arguments* arguments) {
  CLI::App app(
      "A camera that behaves, and one that does not: serves the profiles of simulated "
      "devices with the faults that are asked for.",
      "twcamsim");
  AddVersionFlag(&app);
  AddServing(&app, arguments);
  AddFiles(&app, arguments);
  AddLimits(&app, arguments);
  AddLists(&app, arguments);
  AddCompletion(&app);
  return ParseArguments(&app, Words(), argc, argv);
}

bool MakeEndpoints(const Arguments& arguments, std::vector<std::unique_ptr<Endpoint>>* endpoints,
                   std::string* error) {
  std::vector<std::string> texts = arguments.endpoints;
  if (!arguments.replay.empty()) texts.push_back("replay,dir=" + arguments.replay);
  for (const std::string& text : texts.empty() ? DefaultEndpoints() : texts) {
    std::unique_ptr<Endpoint> endpoint = ParseEndpoint(text, error);
    if (!endpoint || !AddGlobalFaults(arguments, endpoint.get(), error)) return false;
    if (endpoint->host.empty()) endpoint->host = arguments.listen;
    endpoint->index = static_cast<int>(endpoints->size());
    endpoints->push_back(std::move(endpoint));
  }
  MakeNamesUnique(*endpoints);
  return CheckTlsFaults(*endpoints, error);
}
