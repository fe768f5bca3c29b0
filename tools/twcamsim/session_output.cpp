// The response's way out.
#include <algorithm>

#include "tools/twcamsim/session.h"

// What is to be sent together goes out by one write.
bool Session::Play(const Steps& steps) {
  std::string bytes;
  for (const Step& step : steps) {
    if (step.action == Action::kSend) {
      bytes += step.bytes;
      continue;
    }
    if (!Send(bytes) || !PlayStep(step)) return false;
    bytes.clear();
  }
  return Send(bytes);
}

bool Session::PlayStep(const Step& step) {
  switch (step.action) {
    case Action::kSend:
      return Send(step.bytes);
    case Action::kPause: {
      const Io result = connection_.Pause(step.pause);
      return result == Io::kDone || End(result);
    }
    case Action::kStall:
      return StallUntilPeerLeaves();
    case Action::kClose:
      return CloseNow();
    case Action::kReset:
      return ResetNow();
  }
  return false;
}

bool Session::PlayMore(const Response& response) {
  for (std::string piece; response.more(&piece); piece.clear()) {
    if (!Send(piece)) return false;
    const Io result = connection_.Pause(response.interval);
    if (result != Io::kDone) return End(result);
  }
  return true;
}

bool Session::Send(const std::string& bytes) {
  if (behaviour_.output_limit < 0) return SendPaced(bytes);
  const int64_t left = behaviour_.output_limit - sent_;
  const int64_t size = std::min(left, static_cast<int64_t>(bytes.size()));
  sent_ += size;
  if (!SendPaced(bytes.substr(0, static_cast<size_t>(size)))) return false;
  if (size < left) return true;
  return behaviour_.reset_at_limit ? ResetNow() : CloseNow();
}

bool Session::SendPaced(const std::string& bytes) {
  const size_t piece = behaviour_.write_piece > 0 ? behaviour_.write_piece : bytes.size();
  for (size_t at = 0; at < bytes.size(); at += piece) {
    if (at > 0) {
      const Io paused = connection_.Pause(behaviour_.write_interval);
      if (paused != Io::kDone) return End(paused);
    }
    const Io result = connection_.Write(std::string_view(bytes).substr(at, piece), shared_->idle);
    if (result != Io::kDone) return End(result);
  }
  return true;
}
