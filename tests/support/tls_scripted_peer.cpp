#include "tests/support/tls_scripted_peer.h"

#include <gtest/gtest.h>
#include <openssl/bio.h>
#include <openssl/err.h>
#include <openssl/ssl.h>
#include <unistd.h>

namespace {

// TLS over memory: the raw bytes pass through this class, which may cut them as it likes.
class TlsConnection : public PeerConnection {
 public:
  TlsConnection(int fd, Transcript* transcript, std::function<bool()> stopped,
                const TlsIdentity& identity)
      : PeerConnection(fd, transcript, std::move(stopped)),
        context_(identity.NewServerContext()),
        ssl_(SSL_new(context_)),
        from_client_(BIO_new(BIO_s_mem())),
        to_client_(BIO_new(BIO_s_mem())) {
    SSL_set_bio(ssl_, from_client_, to_client_);
    SSL_set_accept_state(ssl_);
  }

  ~TlsConnection() override {
    SSL_free(ssl_);
    SSL_CTX_free(context_);
  }

  bool Handshake(std::string* error) override;
  bool SendRecordByteByByte(const std::string& bytes, std::string* error) override;
  bool SawCloseNotice() const override {
    return (SSL_get_shutdown(ssl_) & SSL_RECEIVED_SHUTDOWN) != 0;
  }
  bool Write(const std::string& bytes) override;
  void SendCloseNotice() override;
  void Close() override;

 protected:
  Read ReadDecoded(std::string* bytes) override;

 private:
  std::string TakeOutput();
  bool Flush() { return SendRaw(TakeOutput()); }
  Read FeedInput();
  void NoteError();

  SSL_CTX* context_;
  SSL* ssl_;
  BIO* from_client_;
  BIO* to_client_;
};

void TlsConnection::NoteError() {
  char text[256] = "no error in the queue";
  if (const unsigned long code = ERR_get_error()) ERR_error_string_n(code, text, sizeof(text));
  error_ = text;
}

std::string TlsConnection::TakeOutput() {
  std::string output(BIO_ctrl_pending(to_client_), '\0');
  if (!output.empty()) BIO_read(to_client_, output.data(), static_cast<int>(output.size()));
  return output;
}

PeerConnection::Read TlsConnection::FeedInput() {
  std::string raw;
  const Read read = ReadRaw(&raw);
  if (read == Read::kData) BIO_write(from_client_, raw.data(), static_cast<int>(raw.size()));
  return read;
}

bool TlsConnection::Handshake(std::string* error) {
  for (;;) {
    ERR_clear_error();
    const int result = SSL_do_handshake(ssl_);
    if (!Flush()) break;
    if (result == 1) return true;
    if (SSL_get_error(ssl_, result) != SSL_ERROR_WANT_READ) {
      NoteError();
      break;
    }
    const Read read = FeedInput();
    if (read == Read::kData) continue;
    error_ = ReadName(read);
    break;
  }
  *error = error_;
  return false;
}

PeerConnection::Read TlsConnection::ReadDecoded(std::string* bytes) {
  char buf[SSL3_RT_MAX_PLAIN_LENGTH];
  for (;;) {
    ERR_clear_error();
    const int n = SSL_read(ssl_, buf, sizeof(buf));
    if (n > 0) {
      transcript_->AddRecord(static_cast<size_t>(n));
      bytes->append(buf, static_cast<size_t>(n));
      return Read::kData;
    }
    const int error = SSL_get_error(ssl_, n);
    if (error == SSL_ERROR_ZERO_RETURN) return Read::kEof;
    if (error != SSL_ERROR_WANT_READ) {
      NoteError();
      return Read::kError;
    }
    const Read read = FeedInput();
    if (read != Read::kData) return read;
  }
}

bool TlsConnection::Write(const std::string& bytes) {
  ERR_clear_error();
  if (bytes.empty()) return true;
  if (SSL_write(ssl_, bytes.data(), static_cast<int>(bytes.size())) > 0) return Flush();
  NoteError();
  return false;
}

bool TlsConnection::SendRecordByteByByte(const std::string& bytes, std::string* error) {
  ERR_clear_error();
  SSL_write(ssl_, bytes.data(), static_cast<int>(bytes.size()));
  for (const char byte : TakeOutput()) {
    if (!SendRaw(std::string(1, byte))) {
      *error = ErrorText();
      return false;
    }
    constexpr useconds_t kBetweenBytes = 20;
    usleep(kBetweenBytes);
  }
  return true;
}

void TlsConnection::SendCloseNotice() {
  if (SSL_is_init_finished(ssl_) != 1) return;
  SSL_shutdown(ssl_);
  Flush();
}

void TlsConnection::Close() {
  TakeArrived();
  SendCloseNotice();
  CloseRaw();
}

}  // namespace

TlsScriptedPeer::TlsScriptedPeer(std::vector<Script> connections, TlsOptions tls,
                                 PeerOptions options)
    : TlsScriptedPeer(std::move(connections), options, std::make_shared<const TlsIdentity>(tls)) {}

TlsScriptedPeer::TlsScriptedPeer(std::vector<Script> connections, PeerOptions options,
                                 std::shared_ptr<const TlsIdentity> identity)
    : ScriptedPeer(std::move(connections), options,
                   [identity](int fd, Transcript* transcript, std::function<bool()> stopped) {
                     return std::make_unique<TlsConnection>(fd, transcript, std::move(stopped),
                                                            *identity);
                   }),
      identity_(std::move(identity)) {}
