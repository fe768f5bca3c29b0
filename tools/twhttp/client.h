// The client of the tool: what subclasses of the library's client reach.
#ifndef TARNWICK_TOOLS_TWHTTP_CLIENT_H_
#define TARNWICK_TOOLS_TWHTTP_CLIENT_H_

#include <string>

#include "tarnwick/http/twhttp.h"
#include "tools/twhttp/options.h"

class ToolClient : public TWHttpClient {
 public:
  // `https` may differ from the target's, for showing what TLS would carry.
  ToolClient(const Options& options, bool https)
      : TWHttpClient(options.target.host, options.target.port, options.target.path,
                     options.target.user, options.target.password, options.timeout, https,
                     options.buffered, options.encode_query, options.basic_first, options.version,
                     options.encode_keep) {
    if (!options.cookie.empty()) SetCookie(options.cookie);
    if (options.source != 0) SetSocketRemoteAddr(options.source);
  }

  // What the XML requests have collected so far.
  std::string Collected() const {
    return m_pRespBuf != nullptr ? std::string(m_pRespBuf, m_respLen) : std::string();
  }

  // Connects and sends `request` as it is; GetResp reads the response.
  int SendAsItIs(const std::string& request) {
    if (m_pSocket->Connect() != 0) return HTTP_RET_IO_ERROR;
    const int size = static_cast<int>(request.size());
    return m_pSocket->WriteData(request.data(), size) == size ? HTTP_RET_OK : HTTP_RET_IO_ERROR;
  }
};

#endif  // TARNWICK_TOOLS_TWHTTP_CLIENT_H_
