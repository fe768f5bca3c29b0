// What an endpoint does to a connection apart from what it says on it.
#ifndef TARNWICK_TOOLS_TWCAMSIM_BEHAVIOUR_H_
#define TARNWICK_TOOLS_TWCAMSIM_BEHAVIOUR_H_

#include <chrono>
#include <cstddef>
#include <cstdint>

enum class Listening { kAccept, kRefuse, kBlackHole };

enum class Opening { kServe, kClose, kReset, kNeverRead };

enum class TlsOpening {
  kHandshake,
  kStall,    // accepts TCP and says nothing
  kGarbage,  // responds with bytes that are no TLS
  kPlain,    // serves HTTP without TLS
  kClose,    // closes after the client's first message
  kReset,
  kAlert,  // refuses with a fatal alert
  kCut,    // closes in the middle of its own part of the handshake
};

enum class CertificateKind { kGood, kExpired, kNotYet, kForeign, kWrongName, kSelfSigned };

enum class AfterRequest { kAnswer, kClose, kReset, kStall };

struct Behaviour {
  Listening listening = Listening::kAccept;
  Opening opening = Opening::kServe;
  std::chrono::milliseconds accept_delay{0};

  TlsOpening tls = TlsOpening::kHandshake;
  CertificateKind certificate = CertificateKind::kGood;
  int tls_alert = 40;  // handshake_failure
  bool old_tls = false;
  bool close_notice = true;

  AfterRequest after_request = AfterRequest::kAnswer;
  int64_t request_limit = -1;  // closes after that many bytes of the request
  size_t read_piece = 0;       // reads so many bytes each read_interval; 0: as fast as they come
  std::chrono::milliseconds read_interval{0};

  int64_t output_limit = -1;  // ends the connection after that many bytes of output
  bool reset_at_limit = false;
  size_t write_piece = 0;  // sends so many bytes each write_interval; 0: all at once
  std::chrono::milliseconds write_interval{0};
};

#endif  // TARNWICK_TOOLS_TWCAMSIM_BEHAVIOUR_H_
