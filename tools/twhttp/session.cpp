#include "tools/twhttp/session.h"

#include <sys/stat.h>

#include <cerrno>
#include <cstdio>
#include <cstring>

#include "tarnwick/platform/unique.h"
#include "tools/common/terminal.h"
#include "tools/twhttp/hooks.h"

namespace {

bool ReadAll(FILE* file, std::string* text) {
  char piece[65536];
  for (size_t size; (size = std::fread(piece, 1, sizeof(piece), file)) > 0;) {
    text->append(piece, size);
  }
  return std::ferror(file) == 0;
}

bool ReadBodyFile(const std::string& path, std::string* body) {
  if (path == "-") return ReadAll(stdin, body);
  const tarnwick::UniqueFile file(std::fopen(path.c_str(), "re"));
  return file && ReadAll(file.get(), body);
}

// Whether the file is there. An upload is sent while it is read.
bool MayUpload(const std::string& path) {
  if (path.empty() || path == "-") return true;
  const tarnwick::UniqueFile file(std::fopen(path.c_str(), "re"));
  struct stat state = {};
  if (!file || fstat(fileno(file.get()), &state) != 0) return false;
  errno = EISDIR;
  return !S_ISDIR(state.st_mode);
}

bool SuitsOperation(const Options& options, const std::string& body) {
  const OperationId id = options.operation->id;
  if ((id != OperationId::kXmlPost && id != OperationId::kXmlPut) || IsXml(body)) return true;
  PrintError("twhttp", "the body to send is no well-formed XML");
  return false;
}

}  // namespace

bool LoadBody(const Options& options, std::string* body) {
  *body = options.body;
  if (options.body_file.empty() || options.operation->id == OperationId::kUpload) {
    if (MayUpload(options.body_file)) return SuitsOperation(options, *body);
  } else if (ReadBodyFile(options.body_file, body)) {
    return SuitsOperation(options, *body);
  }
  PrintError("twhttp", options.body_file + ": " + std::strerror(errno));
  return false;
}

void RunSession(Session* session, const std::string& body, const BodyWriter& write,
                const std::function<void()>& on_transfer, FakePeer* peer) {
  Hooks hooks;
  hooks.trace = &session->trace;
  hooks.peer = peer;
  hooks.port = session->options.target.port;
  hooks.on_transfer = on_transfer;
  SetWatchdog(GiveUpLimit(session->options));
  Observe(&hooks, [&] { session->outcome = RunOperation(session->options, body, write); });
  session->failure = Explain({session->options, session->outcome, session->trace, StopReason()});
}
