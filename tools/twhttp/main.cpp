// twhttp: one request of the library, explained.
#include <sys/stat.h>
#include <unistd.h>

#include <cstdio>
#include <exception>
#include <optional>

#include "tools/common/json_output.h"
#include "tools/common/terminal.h"
#include "tools/twhttp/as_curl.h"
#include "tools/twhttp/fake_peer.h"
#include "tools/twhttp/hooks.h"
#include "tools/twhttp/progress.h"
#include "tools/twhttp/record.h"
#include "tools/twhttp/repeat.h"
#include "tools/twhttp/report.h"
#include "tools/twhttp/session.h"

namespace {

int ExitCode(FailureClass id) {
  return FactsOf(id).exit_code;
}

bool WriteOut(const std::string& bytes) {
  return std::fwrite(bytes.data(), 1, bytes.size(), stdout) == bytes.size() &&
         std::fflush(stdout) == 0;
}

// With TLS by libcurl the request is shown as it would be inside, where the port of the scheme is
// another one.
std::string WithTlsHost(const Options& options, const std::string& request) {
  constexpr int kHttpsPort = 443;
  const Target& target = options.target;
  const std::string name = target.port == kHttpsPort ? target.host : target.HostAndPort();
  const size_t begin = request.find("\r\nHost: ");
  if (begin == std::string::npos) return request;
  const size_t end = request.find("\r\n", begin + 2);
  return request.substr(0, begin) + "\r\nHost: " + name + request.substr(end);
}

int RunOffline(const Options& options, const std::string& body) {
  FakePeer peer(options.challenge);
  Session session(options);
  RunSession(
      &session, body, [](const std::string&) { return true; }, nullptr, &peer);
  const bool rewrite = options.target.https && options.operation->by_curl;
  for (const std::string& request : peer.Finish()) {
    if (!WriteOut(rewrite ? WithTlsHost(options, request) : request)) {
      return ExitCode(FailureClass::kLocalFile);
    }
  }
  return 0;
}

uint64_t UploadSize(const Options& options, const std::string& body) {
  struct stat status = {};
  const bool from_file = !options.body_file.empty() && options.body_file != "-" &&
                         options.operation->id == OperationId::kUpload;
  if (from_file && stat(options.body_file.c_str(), &status) == 0) {
    return static_cast<uint64_t>(status.st_size);
  }
  return body.size();
}

// Where the body goes to the same terminal, the line would tear it.
bool MayShowProgress(const Options& options) {
  const bool mixed = options.operation->Uses(kStream) && IsTerminal(STDOUT_FILENO);
  return IsTerminal(STDERR_FILENO) && !mixed && !options.json;
}

void Report(const Session& session) {
  const Options& options = session.options;
  if (options.json) {
    std::fprintf(stderr, "%s\n", CompactJson(ReportJson(session)).c_str());
    return;
  }
  const bool colour = MayColour(STDERR_FILENO);
  if (options.verbose) std::fputs(ExchangesText(session, colour).c_str(), stderr);
  // The causes of a malformed head are the same findings.
  const bool told = options.verbose || session.failure.id == FailureClass::kMalformedHead;
  if (!told) std::fputs(NotesText(session).c_str(), stderr);
  if (options.timings) std::fputs(TimingsText(session, colour).c_str(), stderr);
  if (session.failure.id != FailureClass::kNone) {
    std::fputs(FailureText(session, colour).c_str(), stderr);
  }
}

int Record(const Session& session) {
  std::string error;
  if (session.options.record.empty() ||
      WriteRecording(session.options.record, RecordingOf(session), &error)) {
    return 0;
  }
  PrintError("twhttp", error);
  return ExitCode(FailureClass::kLocalFile);
}

int RunOnce(const Options& options, const std::string& body) {
  Session session(options);
  std::optional<Progress> progress;
  if (MayShowProgress(options)) progress.emplace(&session.trace, UploadSize(options, body));
  bool written = true;
  const auto write = [&](const std::string& piece) {
    if (progress && IsTerminal(STDOUT_FILENO)) progress->Finish();
    return written = WriteOut(piece);
  };
  const auto on_transfer = [&] {
    if (progress) progress->Update();
  };
  RunSession(&session, body, write, on_transfer, nullptr);
  if (progress) progress->Finish();
  if (!written) session.failure.id = FailureClass::kLocalFile;
  Report(session);
  const int recorded = Record(session);
  const int code = ExitCode(session.failure.id);
  return code != 0 ? code : recorded;
}

int Run(int argc, char** argv) {
  Options options;
  int exit_code = 0;
  if (!ReadOptions(argc, argv, &options, &exit_code)) return exit_code;
  if (options.as_curl) {
    return WriteOut(AsCurl(options) + "\n") ? 0 : ExitCode(FailureClass::kLocalFile);
  }
  std::string body;
  if (!LoadBody(options, &body)) return ExitCode(FailureClass::kLocalFile);
  CatchInterrupts();
  if (options.offline) return RunOffline(options, body);
  return options.repeat > 1 ? RunRepeated(options, body) : RunOnce(options, body);
}

}  // namespace

int main(int argc, char** argv) {
  try {
    return Run(argc, argv);
  } catch (const std::exception& error) {
    PrintError("twhttp", error.what());
    return ExitCode(FailureClass::kOther);
  }
}
