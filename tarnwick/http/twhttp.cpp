// The client object: its settings, its socket and its accessors.
#include "tarnwick/http/twhttp.h"

#include <algorithm>
#include <cstdlib>
#include <iterator>
#include <utility>

#include "tarnwick/http/kept_fields.h"
#include "tarnwick/http/request_parts.h"
#include "tarnwick/net/socket_access.h"
#include "tarnwick/net/sslsocket.h"

using namespace tarnwick;

namespace {

std::string WithoutLeadingSlashes(std::string path) {
  path.erase(0, path.find_first_not_of('/'));
  return path;
}

bool IsContentKey(HTTP_MAP_KEY key) {
  return std::any_of(std::begin(kKeptFields), std::end(kKeptFields), [key](const KeptField& field) {
    return field.as == KeptAs::kContent && field.key == key;
  });
}

}  // namespace

TWHttpClient::TWHttpClient()
    : m_pSocket(nullptr),
      m_connState(0),
      m_bHttps(false),
      m_bEncodeQuery(false),
      m_result(HTTP_RET_NOT_READY),
      m_bBasicAuth(false),
      m_statusCode(0),
      m_port(0),
      m_pRespBuf(nullptr),
      m_respLen(0),
      m_httpVersion(HTTP_VERSION_NONE),
      m_pCurlRespFile(nullptr) {}

TWHttpClient::TWHttpClient(std::string host, int port, std::string path, std::string user,
                           std::string password, int timeout, bool https, bool bufferedRead,
                           bool encodeQuery, bool basicAuth, HTTP_VERSION version,
                           std::string encodeKeep)
    : TWHttpClient() {
  Init(std::move(path), std::move(host), port, std::move(user), std::move(password), timeout,
       bufferedRead, encodeQuery, basicAuth, version, std::move(encodeKeep), https);
}

TWHttpClient::~TWHttpClient() {
  std::free(m_pRespBuf);
  if (m_pSocket == nullptr) return;
  m_pSocket->Disconnect();
  delete m_pSocket;
  m_pSocket = nullptr;
}

void TWHttpClient::Init(std::string path, std::string host, int port, std::string user,
                        std::string password, int timeout, bool bufferedRead, bool encodeQuery,
                        bool basicAuth, HTTP_VERSION version, std::string encodeKeep, bool https) {
  m_strHost = std::move(host);
  m_port = port;
  m_strUser = std::move(user);
  m_strPassword = std::move(password);
  m_result = HTTP_RET_NOT_READY;
  m_connState = 0;
  m_statusCode = 0;
  m_strCookie.clear();
  m_bHttps = https;
  m_bEncodeQuery = encodeQuery;
  m_bBasicAuth = basicAuth;
  m_httpVersion = version;
  m_strEncodeKeep = std::move(encodeKeep);
  m_pRespBuf = nullptr;
  m_respLen = 0;
  m_pCurlRespFile = nullptr;
  SetPath(std::move(path));
  InitSocket(timeout, bufferedRead);
}

void TWHttpClient::InitSocket(int timeout, bool bufferedRead) {
  // A socket that is there already is not released: a subclass may have handed it out. Init is for
  // one call an object.
  m_pSocket = m_bHttps ? new SSLSocket() : SocketAccess::MakePlain();
  m_pSocket->SetSocketInfo(m_strHost, m_port, timeout, bufferedRead);
}

bool TWHttpClient::Reconnect() {
  return m_pSocket != nullptr && m_pSocket->Connect() == 0;
}

// What the next request to `path` is made of. REQUIRES: `path` outlives it.
RequestParts TWHttpClient::Parts(const std::string& path) const {
  return {m_strHost,          m_port,        path,    m_strUser, m_strPassword, m_strCookie,
          m_strAuthorization, m_httpVersion, m_bHttps};
}

void TWHttpClient::SetPath(std::string path) {
  m_strPath = WithoutLeadingSlashes(std::move(path));
}

void TWHttpClient::SetSocketRemoteAddr(unsigned int addr) {
  if (m_pSocket != nullptr) m_pSocket->SetRemoteAddr(addr);
}

void TWHttpClient::SetCurlRespFile(FILE* file) {
  m_pCurlRespFile = file;
}

int TWHttpClient::SetCookie(std::string cookie) {
  m_strCookie = cookie;
  return 0;
}

int TWHttpClient::GetCookie(std::string& out) {
  out = m_strCookie;
  return 0;
}

std::string TWHttpClient::GetTransferEncoding() {
  return m_strTransferEncoding;
}

std::string TWHttpClient::GetCurlText() const {
  return m_strCurlText;
}

int TWHttpClient::CheckResponse(int& status) {
  status = m_statusCode;
  return m_result;
}

int TWHttpClient::GetHttpContent(HTTP_MAP_KEY key, std::string& out) const {
  if (!IsContentKey(key)) return HTTP_RET_BAD_KEY;
  if (m_connState != 2) return HTTP_RET_NOT_READY;
  const auto found = m_mapContent.find(key);
  if (found == m_mapContent.end()) return HTTP_RET_NO_CONTENT;
  out = found->second;
  return HTTP_RET_OK;
}

int TWHttpClient::ReadData(char* buf, int len) {
  if (m_connState != 2 || m_pSocket == nullptr) return -1;
  return m_pSocket->ReadData(buf, len);
}

int TWHttpClient::WriteData(const char* buf, int len) {
  if (m_connState != 2 || m_pSocket == nullptr) return -1;
  return m_pSocket->WriteData(buf, len);
}

int TWHttpClient::ReadToLineEnd(char* buf, int bufLen) {
  return m_pSocket != nullptr ? m_pSocket->ReadToLineEnd(buf, bufLen) : -1;
}

int TWHttpClient::RestoreData(char* data, int len) {
  return m_pSocket != nullptr ? m_pSocket->RestoreData(data, len) : -1;
}

bool TWHttpClient::HasDataToRead(int timeout) {
  return m_pSocket != nullptr && m_pSocket->HasDataToRead(timeout);
}
