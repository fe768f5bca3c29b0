// The server's side of TLS, record by record, for scripts of a plain scripted peer.
//
//   const auto tls = std::make_shared<ServerTls>(TLS1_3_VERSION);
//   ScriptedPeer peer({{SendRecords(tls, 1), Reset()}});  // resets after its ServerHello
#ifndef TARNWICK_TESTS_HOSTILE_SERVER_TLS_H_
#define TARNWICK_TESTS_HOSTILE_SERVER_TLS_H_

#include <gtest/gtest.h>
#include <openssl/evp.h>
#include <openssl/kdf.h>
#include <openssl/ssl.h>

#include <cstdint>
#include <memory>
#include <string>
#include <utility>
#include <vector>

#include "tests/support/peer_steps.h"
#include "tests/support/tls_identity.h"

// One certificate for all of them: a key takes long to make.
inline const TlsIdentity& SharedIdentity() {
  static const TlsIdentity identity{TlsOptions{}};
  return identity;
}

// A record of TLS as it travels.
inline std::string RawRecord(int type, const std::string& content, int version = 0x0303) {
  const std::string header = {static_cast<char>(type), static_cast<char>(version >> 8),
                              static_cast<char>(version), static_cast<char>(content.size() >> 8),
                              static_cast<char>(content.size())};
  return header + content;
}

inline constexpr int kChangeCipherRecord = 20;
inline constexpr int kAlertRecord = 21;
inline constexpr int kHandshakeRecord = 22;
inline constexpr int kDataRecord = 23;

// Threads: the peer's thread alone, once the peer has been made.
class ServerTls {
 public:
  // `version` is the only protocol that it speaks. `context` replaces the one with the usual
  // certificate and is freed here.
  explicit ServerTls(int version, SSL_CTX* context = nullptr)
      : context_(context != nullptr ? context : SharedIdentity().NewServerContext()) {
    SSL_CTX_set_min_proto_version(context_, version);
    SSL_CTX_set_max_proto_version(context_, version);
    // One cipher of TLS 1.2, whose records are made by hand below.
    SSL_CTX_set_cipher_list(context_, "ECDHE-ECDSA-AES128-GCM-SHA256:@SECLEVEL=0");
    ssl_ = SSL_new(context_);
    SSL_set_bio(ssl_, from_client_, to_client_);
    SSL_set_accept_state(ssl_);
  }

  ~ServerTls() {
    SSL_free(ssl_);
    SSL_CTX_free(context_);
  }

  ServerTls(const ServerTls&) = delete;
  ServerTls& operator=(const ServerTls&) = delete;

  SSL* Ssl() { return ssl_; }

  // The records of the handshake that have been made and not yet sent, in order.
  std::vector<std::string>& Queue() { return queue_; }

  // Makes more of the handshake. Results: 1 when it is done; 0 when the client's part is missing;
  // -1 when it failed.
  int MakeRecords() {
    const int result = SSL_do_handshake(ssl_);
    std::string output = TakeOutput();
    while (output.size() >= 5) {
      const size_t length =
          5 + 256 * static_cast<unsigned char>(output[3]) + static_cast<unsigned char>(output[4]);
      queue_.push_back(output.substr(0, length));
      output.erase(0, length);
    }
    if (result == 1) return 1;
    return SSL_get_error(ssl_, result) == SSL_ERROR_WANT_READ ? 0 : -1;
  }

  bool Feed(PeerConnection& peer, std::string* error) {
    std::string raw;
    const PeerConnection::Read read = peer.ReadRaw(&raw);
    if (read != PeerConnection::Read::kData) {
      *error = ReadName(read);
      return false;
    }
    BIO_write(from_client_, raw.data(), static_cast<int>(raw.size()));
    return true;
  }

  // What the operations on Ssl() have to send.
  std::string TakeOutput() {
    std::string output(BIO_ctrl_pending(to_client_), '\0');
    if (!output.empty()) BIO_read(to_client_, output.data(), static_cast<int>(output.size()));
    return output;
  }

  // A record of TLS 1.2 as it travels after the handshake, whatever its type and content.
  std::string Encrypted(int type, const std::string& content) {
    if (key_.empty()) DeriveKey();
    const std::string sequence = BigEndian(sequence_++, 8);
    const std::string bound = sequence + RawRecord(type, std::string(content.size(), '\0'));
    return RawRecord(type, sequence + Seal(sequence, bound.substr(0, 13), content));
  }

 private:
  static std::string BigEndian(uint64_t number, int bytes) {
    std::string text;
    for (int shift = 8 * (bytes - 1); shift >= 0; shift -= 8) {
      text += static_cast<char>(number >> shift);
    }
    return text;
  }

  static const unsigned char* Bytes(const std::string& text) {
    return reinterpret_cast<const unsigned char*>(text.data());
  }

  // The server's key and the fixed part of its nonce.
  void DeriveKey() {
    unsigned char master[SSL_MAX_MASTER_KEY_LENGTH];
    unsigned char seed[2 * SSL3_RANDOM_SIZE];
    const size_t length = SSL_SESSION_get_master_key(SSL_get_session(ssl_), master, sizeof(master));
    SSL_get_server_random(ssl_, seed, SSL3_RANDOM_SIZE);
    SSL_get_client_random(ssl_, seed + SSL3_RANDOM_SIZE, SSL3_RANDOM_SIZE);
    unsigned char block[40];  // both keys of 16 bytes, both nonces of 4
    size_t block_size = sizeof(block);
    EVP_PKEY_CTX* const kdf = EVP_PKEY_CTX_new_id(EVP_PKEY_TLS1_PRF, nullptr);
    EXPECT_EQ(EVP_PKEY_derive_init(kdf), 1);
    EVP_PKEY_CTX_set_tls1_prf_md(kdf, EVP_sha256());
    EVP_PKEY_CTX_set1_tls1_prf_secret(kdf, master, static_cast<int>(length));
    EVP_PKEY_CTX_add1_tls1_prf_seed(kdf, reinterpret_cast<const unsigned char*>("key expansion"),
                                    13);
    EVP_PKEY_CTX_add1_tls1_prf_seed(kdf, seed, sizeof(seed));
    EXPECT_EQ(EVP_PKEY_derive(kdf, block, &block_size), 1);
    EVP_PKEY_CTX_free(kdf);
    key_.assign(reinterpret_cast<char*>(block) + 16, 16);
    salt_.assign(reinterpret_cast<char*>(block) + 36, 4);
  }

  std::string Seal(const std::string& nonce, const std::string& bound, const std::string& content) {
    std::string sealed(content.size() + 16, '\0');
    unsigned char* const out = reinterpret_cast<unsigned char*>(sealed.data());
    int count = 0;
    EVP_CIPHER_CTX* const gcm = EVP_CIPHER_CTX_new();
    EVP_EncryptInit_ex(gcm, EVP_aes_128_gcm(), nullptr, Bytes(key_), Bytes(salt_ + nonce));
    EVP_EncryptUpdate(gcm, nullptr, &count, Bytes(bound), static_cast<int>(bound.size()));
    EVP_EncryptUpdate(gcm, out, &count, Bytes(content), static_cast<int>(content.size()));
    EVP_EncryptFinal_ex(gcm, out + content.size(), &count);
    EVP_CIPHER_CTX_ctrl(gcm, EVP_CTRL_GCM_GET_TAG, 16, out + content.size());
    EVP_CIPHER_CTX_free(gcm);
    return sealed;
  }

  SSL_CTX* context_;
  SSL* ssl_ = nullptr;
  BIO* from_client_ = BIO_new(BIO_s_mem());
  BIO* to_client_ = BIO_new(BIO_s_mem());
  std::vector<std::string> queue_;
  std::string key_;
  std::string salt_;
  uint64_t sequence_ = 1;  // the handshake's last message was the first record
};

using SharedTls = std::shared_ptr<ServerTls>;

// A step below TLS.
inline Step RawStep(const std::string& name,
                    std::function<bool(PeerConnection&, std::string*)> play) {
  return {name, std::move(play), false};
}

// Reads the client's first words.
inline Step AwaitHello(const SharedTls& tls) {
  return RawStep("AwaitHello()", [tls](PeerConnection& peer, std::string* error) {
    return tls->Feed(peer, error);
  });
}

// Sends the next `count` records of the handshake.
inline Step SendRecords(const SharedTls& tls, size_t count) {
  return RawStep("SendRecords()", [tls, count](PeerConnection& peer, std::string* error) {
    for (size_t sent = 0; sent < count;) {
      if (tls->Queue().empty()) {
        const int made = tls->MakeRecords();
        if (tls->Queue().empty() && (made != 0 || !tls->Feed(peer, error))) return false;
        continue;
      }
      if (!peer.SendRaw(tls->Queue().front())) return false;
      tls->Queue().erase(tls->Queue().begin());
      ++sent;
    }
    return true;
  });
}

// Sends all that the server says first; the client may go in the middle of it.
inline Step SendFirstFlight(const SharedTls& tls) {
  return RawStep("SendFirstFlight()", [tls](PeerConnection& peer, std::string* error) {
    while (tls->MakeRecords() == 0 && tls->Queue().empty()) {
      if (!tls->Feed(peer, error)) return false;
    }
    for (const std::string& record : tls->Queue()) {
      if (!peer.SendRaw(record)) break;
    }
    return true;
  });
}

// Sends the first half of the handshake's next record.
inline Step SendHalfARecord(const SharedTls& tls) {
  return RawStep("SendHalfARecord()", [tls](PeerConnection& peer, std::string* error) {
    while (tls->Queue().empty() && tls->MakeRecords() == 0 && tls->Queue().empty()) {
      if (!tls->Feed(peer, error)) return false;
    }
    const std::string record = tls->Queue().empty() ? "" : tls->Queue().front();
    if (record.empty()) return false;
    tls->Queue().front() = record.substr(record.size() / 2);
    return peer.SendRaw(record.substr(0, record.size() / 2));
  });
}

// Makes the rest of the handshake.
inline Step FinishHandshake(const SharedTls& tls) {
  return RawStep("FinishHandshake()", [tls](PeerConnection& peer, std::string* error) {
    for (;;) {
      const int made = tls->MakeRecords();
      for (const std::string& record : tls->Queue()) peer.SendRaw(record);
      tls->Queue().clear();
      if (made != 0) return made == 1;
      if (!tls->Feed(peer, error)) return false;
    }
  });
}

// Reads, after the handshake, up to the end of a request's head.
inline Step ExpectTlsRequest(const SharedTls& tls) {
  return RawStep("ExpectTlsRequest()", [tls](PeerConnection& peer, std::string* error) {
    std::string request;
    while (request.find("\r\n\r\n") == std::string::npos) {
      char bytes[4096];
      const int n = SSL_read(tls->Ssl(), bytes, sizeof(bytes));
      if (n > 0) request.append(bytes, static_cast<size_t>(n));
      if (n <= 0 && !tls->Feed(peer, error)) return false;
    }
    return true;
  });
}

// Sends what `make` returns at the time.
inline Step SendMade(const SharedTls& tls, std::function<std::string(ServerTls&)> make) {
  return RawStep("SendMade()", [tls, make](PeerConnection& peer, std::string*) {
    return peer.SendRaw(make(*tls));
  });
}

// Sends bytes as TLS does.
inline Step SendTls(const SharedTls& tls, const std::string& bytes) {
  return SendMade(tls, [bytes](ServerTls& server) {
    SSL_write(server.Ssl(), bytes.data(), static_cast<int>(bytes.size()));
    return server.TakeOutput();
  });
}

inline Step SendTlsCloseNotice(const SharedTls& tls) {
  return SendMade(tls, [](ServerTls& server) {
    SSL_shutdown(server.Ssl());
    return server.TakeOutput();
  });
}

// Closes, whatever the client has sent.
inline Step Drop() {
  return RawStep("Drop()", [](PeerConnection& peer, std::string*) {
    peer.TakeArrived();
    peer.Pending().clear();
    peer.CloseRaw();
    return true;
  });
}

#endif  // TARNWICK_TESTS_HOSTILE_SERVER_TLS_H_
