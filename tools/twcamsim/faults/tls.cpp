// Faults of TLS; they do nothing on a plain endpoint.
#include "tools/twcamsim/faults.h"

namespace {

using BehaviourHook = void (*)(Behaviour*, const FaultContext&);

FaultType Make(const char* name, const char* meaning, BehaviourHook hook,
               std::vector<ArgumentRule> rules = {}) {
  FaultHooks hooks;
  hooks.behaviour = hook;
  return {name, "tls", std::move(rules), meaning, hooks, true};
}

template <TlsOpening kOpening>
void Open(Behaviour* to, const FaultContext&) {
  to->tls = kOpening;
}

template <CertificateKind kKind>
void Show(Behaviour* to, const FaultContext&) {
  to->certificate = kKind;
}

std::vector<FaultType> HandshakeFaults() {
  return {
      Make("tls-stall", "accepts TCP and never responds to the handshake",
           Open<TlsOpening::kStall>),
      Make("tls-garbage", "responds to the handshake with bytes that are no TLS",
           Open<TlsOpening::kGarbage>),
      Make("tls-plain", "serves HTTP without TLS on the port of TLS", Open<TlsOpening::kPlain>),
      Make("tls-close", "closes after the client's first message", Open<TlsOpening::kClose>),
      Make("tls-reset", "resets after the client's first message", Open<TlsOpening::kReset>),
      Make("tls-cut", "closes in the middle of its own part of the handshake",
           Open<TlsOpening::kCut>),
      Make("tls-alert", "refuses the handshake with that alert (40: handshake_failure)",
           [](Behaviour* to, const FaultContext& context) {
             to->tls = TlsOpening::kAlert;
             to->tls_alert = static_cast<int>(context.Number(0));
           },
           {{"NUMBER", "40", 1, 255}}),
      Make("tls-old", "speaks TLS 1.1 at most",
           [](Behaviour* to, const FaultContext&) { to->old_tls = true; }),
      Make("no-close-notice", "closes without TLS's close notice",
           [](Behaviour* to, const FaultContext&) { to->close_notice = false; }),
  };
}

std::vector<FaultType> CertificateFaults() {
  return {
      Make("cert-expired", "the certificate was valid until last year",
           Show<CertificateKind::kExpired>),
      Make("cert-not-yet", "the certificate is valid from next year on",
           Show<CertificateKind::kNotYet>),
      Make("cert-foreign", "the certificate comes from another authority than the printed one",
           Show<CertificateKind::kForeign>),
      Make("cert-wrong-name", "the certificate is for another host",
           Show<CertificateKind::kWrongName>),
      Make("cert-self-signed", "the certificate is its own authority",
           Show<CertificateKind::kSelfSigned>),
  };
}

}  // namespace

std::vector<FaultType> TlsFaults() {
  std::vector<FaultType> types = HandshakeFaults();
  for (FaultType& type : CertificateFaults()) types.push_back(std::move(type));
  return types;
}
