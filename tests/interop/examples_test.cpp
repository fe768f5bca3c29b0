// The examples, one program an operation, against the servers.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <set>
#include <utility>

#include "tests/interop/certificates.h"
#include "tests/interop/servers.h"

#ifdef TARNWICK_EXAMPLES_FOLDER

namespace {

using ::testing::AllOf;
using ::testing::HasSubstr;
using ::testing::Matcher;

struct ExampleCase {
  const char* program;
  WebServer& (*server)();
  const char* port;
  std::vector<std::string> arguments;  // after host and port
  Matcher<std::string> output;
  int code = 0;
};

const std::vector<ExampleCase>& Cases() {
  static const std::vector<ExampleCase> cases = {
      {"op_get", Apache, "PORT", {"cgi/text.cgi?zoom=3"}, HasSubstr("query zoom=3\n")},
      {"op_get", Apache, "PORT", {"digest/text.cgi"}, HasSubstr("wants a login\n"), 1},
      {"op_get", Apache, "PORT", {"moved"}, HasSubstr("has moved\n"), 1},
      {"op_login_get",
       Lighttpd,
       "PORT",
       {"digest/text.cgi", kUser, kPassword},
       HasSubstr("user operator\n")},
      {"op_login_get",
       Apache,
       "PORT",
       {"basic/text.cgi", kUser, "gate-8"},
       HasSubstr("password is wrong\n"),
       1},
      {"op_login_post", Apache, "PORT", {"digest/json.cgi?pan=3", kUser, kPassword}, "done\n"},
      {"op_login_post",
       Apache,
       "PORT",
       {"digest/json.cgi?pan=3", kUser, "gate-8"},
       HasSubstr("not taken\n"),
       1},
      {"op_form_post",
       Lighttpd,
       "PORT",
       {"cgi/text.cgi", "pan=3", "session=41"},
       AllOf(HasSubstr("cookie session=41\n"), HasSubstr("body pan=3\n"))},
      {"op_soap", Apache, "PORT", {"cgi/xml.cgi"}, HasSubstr("<GetPresets/>")},
      {"op_soap", Apache, "PORT", {"cgi/xml.cgi?fault"}, HasSubstr("status 500\n"), 1},
      {"op_soap_login",
       Apache,
       "PORT",
       {"digest/xml.cgi", kUser, kPassword},
       HasSubstr("user=\"operator\"")},
      {"op_soap_xml", Apache, "PORT", {"cgi/xml.cgi"}, "root: reply\n"},
      {"op_curl_get",
       Apache,
       "TLS_PORT",
       {"basic/text.cgi", kUser, kPassword},
       HasSubstr("user operator\n")},
      {"op_curl_post", Apache, "PORT", {"pan=3"}, HasSubstr("\"body\":\"pan=3\"")},
      {"op_download", Nginx, "PORT", {"missing", "/dev/null"}, HasSubstr("download failed"), 1},
      {"op_xml", Apache, "PORT", {"GET", "digest/xml.cgi", kUser, kPassword}, "response: reply\n"},
      {"op_xml", Apache, "PORT", {"POST", "basic/xml.cgi", kUser, kPassword}, "response: reply\n"},
      {"op_xml", Nginx, "PORT", {"PUT", "store/preset.xml", kUser, kPassword}, "done\n"},
      {"op_xml", Nginx, "PORT", {"DELETE", "store/preset.xml", kUser, kPassword}, "done\n"},
      {"op_second_request",
       Apache,
       "KEEP_PORT",
       {"cgi/text.cgi", "cgi/text.cgi?second"},
       HasSubstr("query second\n")},
      {"op_upload", Lighttpd, "PORT", {"cgi/count.cgi", "/proc/self/exe"}, HasSubstr(" closed\n")},
      {"op_json", Nginx, "PORT", {"success.json"}, "{\"server\":\"nginx\",\"success\":true}\n"},
      {"op_json", Nginx, "PORT", {"byte"}, HasSubstr("is no JSON\n"), 1},
      {"op_json", Apache, "TLS_PORT", {"cgi/json.cgi", "tls"}, HasSubstr("\"success\":true")},
      {"op_json_post",
       Apache,
       "PORT",
       {"cgi/json.cgi", "name", "north gate"},
       "sent: name=north%20gate\n"},
  };
  return cases;
}

// Runs an example; `output` receives what it writes to standard output and error.
ChildResult RunExample(const std::string& program, const std::vector<std::string>& arguments,
                       std::string* output) {
  std::vector<std::string> example = {TARNWICK_EXAMPLES_FOLDER "/" + program};
  example.insert(example.end(), arguments.begin(), arguments.end());
  std::vector<std::string> command = {"/bin/sh", "-c", "exec \"$0\" \"$@\" 2>&1"};
  for (std::string& word : Runnable(example)) command.push_back(std::move(word));
  return RunProgram(command, output);
}

TEST(Examples, DoWhatTheySay) {
  const TrustedAuthority trusted(Certificates().CaFile());
  for (const ExampleCase& c : Cases()) {
    std::vector<std::string> arguments = {"127.0.0.1", std::to_string(c.server().Port(c.port))};
    arguments.insert(arguments.end(), c.arguments.begin(), c.arguments.end());
    std::string output;
    const ChildResult result = RunExample(c.program, arguments, &output);
    EXPECT_EQ(result.code, c.code) << c.program << ": " << output;
    EXPECT_THAT(output, c.output) << c.program;
  }
}

TEST(Examples, DownloadIntoAFile) {
  const TempDir folder;
  std::string output;
  const ChildResult result = RunExample(
      "op_download", {"127.0.0.1", std::to_string(Nginx().Port()), "large", folder.File("large")},
      &output);
  EXPECT_EQ(result.code, 0) << output;
  const std::string file = ReadFile(folder.File("large"));
  const size_t body = file.find("\r\n\r\n") + 4;
  EXPECT_TRUE(file.substr(body) == ReadFile(Nginx().File("www/large")));
  EXPECT_EQ(output, std::to_string(file.size()) + " bytes\n");
}

TEST(Examples, ExplainTheirArguments) {
  std::set<std::string> programs;
  for (const ExampleCase& c : Cases()) programs.insert(c.program);
  for (const std::string& program : programs) {
    std::string output;
    const ChildResult result = RunExample(program, {}, &output);
    EXPECT_EQ(result.code, 2) << program;
    EXPECT_THAT(output, HasSubstr("usage: " + program + " HOST PORT ")) << program;
  }
}

}  // namespace

#endif  // TARNWICK_EXAMPLES_FOLDER
