// An HTTP client for cameras, devices and web services, and one-call functions for JSON
// services.
//
// A JSON service, in one call:
//
//   Json::Value response;
//   int result = SendHttpGet(host, port, "api/info?full=1", response, 5, false);  // 0: success
//
// A device that asks for a login:
//
//   // At most 5 seconds a wait, with read-ahead; the login goes out when the device asks for it.
//   TWHttpClient client(host, port, "info.cgi", "admin", "secret", /*timeout=*/5, /*https=*/false,
//                       /*bufferedRead=*/true, /*encodeQuery=*/false, /*basicAuth=*/false,
//                       HTTP_VERSION_NONE, /*encodeKeep=*/"");
//   int status = 0;
//   std::string body;
//   if (client.SendRequest(HTTP_METHOD_GET, "") != HTTP_RET_OK) return "";  // not sent
//   if (client.CheckResponse(status) != HTTP_RET_OK) return "";             // `status` tells more
//   if (client.ReadBody(body) != HTTP_RET_OK) return "";                    // it broke off
//   return body;
//
// The message syntax is after RFC 7230, the logins are after RFC 2617; docs/deliberate.md has what
// differs.
//
// Failures are logged in category http, as source twhttp: at debug what a device may cause, such as
// "Connection failed!", "Write data faild." and, with libcurl's code or the status, "Failed to make
// http connection, return value=28"; at error memory that ran out, an option that libcurl refused
// to SendRequestByCurl, and a response file that was not written ("CURL Error(23): ..."). At debug2
// ReadBody and GetResp log the body, at debug3 each header line is logged. The socket adds lines of
// its own (twsocket.h); without TLS only the line of WriteFd, in category utils, has the error number
// of a failed write. At debug two messages show user and password that libcurl refused to take.
#ifndef TARNWICK_HTTP_TWHTTP_H_
#define TARNWICK_HTTP_TWHTTP_H_

#include <json/value.h>

#include <cstdint>
#include <cstdio>
#include <map>
#include <string>

#include "tarnwick/net/twsocket.h"
#include "tarnwick/platform/export.h"

namespace tarnwick {
struct RequestParts;
}
typedef struct _xmlDoc xmlDoc;  // libxml2's document

// The response headers that a client keeps.
enum HTTP_MAP_KEY : int {
  HTTP_CONTENT_TYPE = 0,    // Content-Type
  HTTP_CONTENT_LENGTH = 1,  // Content-Length
  HTTP_CONTENT_RANGE = 2,   // Content-Range
};

// The protocol version to send. The values are libcurl's.
enum HTTP_VERSION : int {
  // HTTP/1.0 on the socket GET, HTTP/1.1 on the form POST, libcurl's default in SendRequestByPost.
  // The other requests do not look at the version: SOAP and uploads are HTTP/1.1, libcurl chooses
  // for the rest, over TLS also HTTP/2.
  HTTP_VERSION_NONE = 0,
  HTTP_VERSION_1_0 = 1,  // HTTP/1.0
  HTTP_VERSION_1_1 = 2,  // HTTP/1.1
};

// The request method. Every value but 0 is taken for POST.
enum TW_HTTP_METHOD : int {
  HTTP_METHOD_GET = 0,   // GET
  HTTP_METHOD_POST = 1,  // POST
};

// Results of the client's operations, and of the last response (TWHttpClient::CheckResponse).
enum {
  HTTP_RET_OK = 0,            // success; a status from 200 to 299
  HTTP_RET_NOT_READY = 1,     // nothing sent yet, or the head is not read yet or malformed
  HTTP_RET_BAD_KEY = 2,       // no value of HTTP_MAP_KEY
  HTTP_RET_IO_ERROR = 3,      // connecting, writing or reading failed, or the status line is cut
  HTTP_RET_UNAUTHORIZED = 4,  // status 401
  HTTP_RET_BAD_RESPONSE = 5,  // no HTTP/1.0 or HTTP/1.1 response, or a status not listed here
  HTTP_RET_NO_CONTENT = 6,    // the response has no such header
  HTTP_RET_REDIRECT = 7,      // status 302, which is not followed
  HTTP_RET_URI_TOO_LONG = 8,  // status 414
  HTTP_RET_CERT_ERROR = 9,    // libcurl could not verify the server's certificate
};

// One client for one server, path and login.
//
// The socket operations connect anew for each request. The requests through libcurl have a handle
// each; they follow http_proxy, https_proxy, all_proxy and no_proxy, as curl(1) does, and those
// over the socket do not. Over the socket TLS checks no certificate, and Basic logins over plain
// HTTP can be read on the way.
// REQUIRES: no CR and LF in authorization, cookie and other strings; they go onto the wire as they
//   are.
// Errors: errno is not part of the results. When memory runs out, a request operation returns its
//   failure; constructors, functions that take or return a string by value, GetCookie and
//   GetHttpContent throw std::bad_alloc. No other exception leaves the library.
// Threads: one thread uses an object at a time; separate objects may run in separate threads.
// Cancellation: a thread may be cancelled (pthread_cancel, the deferred kind) in any operation, of
//   the one-call functions too. It ends at a wait for the peer, or after a name resolution, a TLS
//   handshake or a transfer through libcurl, which are not left in the middle. Nothing leaks, and
//   the client may then be destroyed, or used for another request.
// Blocks: each operation over the socket for the name resolution, which has no limit, then for the
//   client's time-out T at each wait for the peer, of which a slow one may need many. A write, and
//   the TLS handshake, have no limit. With read-ahead a silent peer holds an operation for
//
//     T       to connect
//     7 T     for a head, and for the body of a SOAP response after it
//     14 T    in ReadBody
//
// and for the double when it asks for a login. Without read-ahead 7 T is T and 14 T is 2 T; over
// TLS each is the double. docs/longest-call.md has the sums.
class TARNWICK_API TWHttpClient {
 public:
  // A client without a server. REQUIRES: Init before any other operation, which fails until then.
  TWHttpClient();

  // A client that is ready for use. The arguments mean what they mean for Init, in another order.
  TWHttpClient(std::string host, int port, std::string path, std::string user, std::string password,
               int timeout, bool https, bool bufferedRead, bool encodeQuery, bool basicAuth,
               HTTP_VERSION version, std::string encodeKeep);

  // Closes the connection and frees what the client owns; a response file stays open. Over TLS with
  // a negative time-out it waits while the peer does not take the close notice.
  virtual ~TWHttpClient();

  TWHttpClient(const TWHttpClient&) = delete;
  TWHttpClient& operator=(const TWHttpClient&) = delete;

  // Sets up the client and its socket.
  //
  // REQUIRES: one call for an object; a second one makes a second socket and does not release the
  //   first.
  // Arguments: `path` with its query, leading "/" are stripped; `host` a name or a dotted IPv4
  //   address; `timeout` in seconds for connecting and each wait of the socket operations, negative
  //   for none; `bufferedRead` reads ahead (wanted for speed; direct reading costs two system calls
  //   per byte of the head); `encodeQuery` percent-encodes the values of the query on the socket
  //   GET, but the characters of `encodeKeep`; `basicAuth` sends the login with the first GET
  //   instead of waiting to be asked; `https` uses TLS, on the socket without a check of the peer,
  //   and everywhere without a certificate of the client's own.
  void Init(std::string path, std::string host, int port, std::string user, std::string password,
            int timeout, bool bufferedRead, bool encodeQuery, bool basicAuth, HTTP_VERSION version,
            std::string encodeKeep, bool https);

  // Creates the socket: TLS when the client uses https. Init calls it. A socket that is there
  // already is not released.
  void InitSocket(int timeout, bool bufferedRead);

  // Sets the path of the next request; leading "/" are stripped.
  void SetPath(std::string path);

  // Sets the local source address of the next connection, in network byte order; 0 for none.
  // Without a socket nothing happens.
  void SetSocketRemoteAddr(unsigned int addr);

  // Writes headers and body of SendRequestByCurl's responses to `file`, from its current position;
  // null collects the body in memory again. Of the head, lines without a colon, as the status line
  // mostly is, and lines with "Transfer-Encoding:" are left out. After a success all has been
  // flushed; a write or a flush that fails makes the request fail, what failed with the stream
  // before does not.
  // REQUIRES: the caller keeps the file open during requests, and closes it afterwards.
  void SetCurlRespFile(FILE* file);

  // Sets the cookie to send, as it is. A response's head replaces it: with its last Set-Cookie,
  // or with nothing, so that the second request of a login has the one that the 401 brought. A
  // transfer through libcurl leaves it. SOAP requests, SendRequestByPost and the XML requests send
  // no cookie.
  // Results: 0.
  int SetCookie(std::string cookie);

  // Copies the cookie to `out`. Results: 0.
  int GetCookie(std::string& out);

  // The Transfer-Encoding of the last response that had one. ReadBody and GetResp decode by it, so
  // a plain body that follows a chunked one on the same client is not read rightly.
  std::string GetTransferEncoding();

  // Stores the status code of the last response over the socket in `status`, 0 when none was read.
  // Results: HTTP_RET_NOT_READY before the first request, then the outcome of the last one: of its
  //   response over the socket, or of the whole transfer through libcurl. A request that could not
  //   be written leaves both as they were; so does an upload, until GetResp reads its response.
  int CheckResponse(int& status);

  // Copies a header of the last response to `out`.
  // Results: HTTP_RET_OK; HTTP_RET_BAD_KEY; HTTP_RET_NOT_READY before a head was read, and after a
  //   transfer through libcurl that succeeded; HTTP_RET_NO_CONTENT when the response had no such
  //   header. After OpenRawDataUpload, which reads no head, it tells of the response before, or
  //   HTTP_RET_NO_CONTENT. `out` stays as it is after a failure.
  int GetHttpContent(HTTP_MAP_KEY key, std::string& out) const;

  // Reads from and writes to the connection after a response's head, or the head of an upload, as
  // TWSocket does.
  // Results: TWSocket's; -1 while no head has been read nor OpenRawDataUpload succeeded, and after
  //   a transfer through libcurl that succeeded.
  int ReadData(char* buf, int len);
  int WriteData(const char* buf, int len);

  // As TWSocket's, at any time. Without a socket: -1, -1 and false.
  int ReadToLineEnd(char* buf, int bufLen);
  int RestoreData(char* data, int len);
  bool HasDataToRead(int timeout);

  // Sends the request by method.
  //
  // HTTP_METHOD_GET: SendRequestByGet, with Basic authorization at once when the client was set up
  // so. When the response is a 401 whose challenge names Digest or else Basic, the GET is sent once
  // more with that login. Of several WWW-Authenticate lines the last one is the challenge, so a
  // server that offers Digest and then Basic gets Basic. `arg` is not used. Any other method:
  // SendRequestByPost(arg).
  // Results: those of the last request made. CheckResponse tells what the server responded: a
  //   second 401 comes back as HTTP_RET_OK here and HTTP_RET_UNAUTHORIZED there.
  int SendRequest(TW_HTTP_METHOD method, std::string arg);

  // Sends one GET over the client's socket and reads the head of the response; the body is left on
  // the connection for ReadBody or ReadData. A request of over 2,047 bytes is cut there. In
  // HTTP/1.0 it names no host: a server with several sites may respond for another one. In HTTP/1.1
  // it does not ask the server to close, and a body that is not chunked may then end by a time-out
  // only.
  //
  // Results: HTTP_RET_OK when the request was written, whatever the server responded;
  //   HTTP_RET_IO_ERROR when connecting or writing failed, with the last response's results as they
  //   were.
  int SendRequestByGet();

  // Sends one request through libcurl, which also follows its proxy settings, and over TLS takes
  // HTTP/2 where the server offers it, whatever the client's version.
  //
  // HTTP_METHOD_GET fetches host and path. Any other method posts the path as a form to the host's
  // root. The login is sent at once, by Basic. The body is collected in memory, for the one-call
  // functions, or written to the response file.
  // Arguments: `verifyPeer` false accepts any certificate and host name; `timeout` limits the whole
  //   transfer, in seconds, 0 does not, and a negative one fails. A name server that is silent may
  //   hold the call longer.
  // Results: HTTP_RET_OK after a status from 200 to 299; HTTP_RET_CERT_ERROR when the server's
  //   certificate could not be verified; HTTP_RET_IO_ERROR after anything else.
  int SendRequestByCurl(TW_HTTP_METHOD method, bool verifyPeer, int timeout);

  // Posts through libcurl over plain HTTP, in the client's version of it, logging in by Basic or
  // Digest as the server asks.
  //
  // The path is split at its first character out of `separators`: what precedes it is the
  // URL's path, what follows is the body; without such a character the body is empty. The
  // response's body is thrown away.
  // Results: HTTP_RET_OK after a status from 200 to 299; HTTP_RET_IO_ERROR after anything else.
  // Blocks without a limit.
  int SendRequestByPost(std::string separators);

  // Posts a form over the client's socket and reads the head of the response; the body is left on
  // the connection for ReadBody. `content` is encoded already. No login is sent. In HTTP/1.1 it
  // asks the server to close by "Connection: close;", which many servers ignore: ReadBody then
  // fails after three waits, with the whole body. Choose HTTP_VERSION_1_0 where the body is read.
  //
  // Results: HTTP_RET_OK when the whole request was written, whatever the server responded;
  //   HTTP_RET_IO_ERROR when connecting or writing failed.
  // Logs: a failed connect at info, with the content; a form that was not written whole at error.
  int SendRequestBySocketPost(std::string content);

  // Posts a SOAP envelope over the client's socket and reads the response's body, of the length
  // that the response announces, up to its first zero byte.
  //
  // Results: HTTP_RET_OK with the body in `response`, whatever the status: CheckResponse tells it.
  //   A read that ends early is a success, and `response` holds what came. HTTP_RET_IO_ERROR, with
  //   `response` as it was, for an empty `body`, when connecting, writing or reading failed, and
  //   for a response without a usable Content-Length, in chunks for example; CheckResponse tells
  //   its status, and GetHttpContent returns HTTP_RET_NO_CONTENT for HTTP_CONTENT_LENGTH.
  // Memory grows with what arrives: over 1 MiB, an announced length alone does not take any.
  int SendReqBySocketPost(const std::string& body, std::string& response);

  // As SendReqBySocketPost; when the response is a 401 whose challenge names Digest or else Basic,
  // the request is sent once more with that login. The challenge is that of SendRequest.
  //
  // Results: the outcome of the last response, as CheckResponse gives it, so HTTP_RET_OK only after
  //   a status from 200 to 299; HTTP_RET_IO_ERROR when the last exchange failed. `response` may
  //   then hold the body of the first.
  int SendAuthReqBySocketPost(const std::string& body, std::string& response);

  // As SendReqBySocketPost, with the response parsed as XML after all its CR and LF have been
  // removed.
  //
  // Results: those of SendReqBySocketPost. After HTTP_RET_OK `doc` is a new document, which the
  //   caller frees with xmlFreeDoc, or null when the response is not well-formed; what `doc`
  //   pointed to before is not freed. After a failure `doc` stays.
  int SendReqByXMLSocketPost(std::string body, xmlDoc*& doc);

  // Reads the body after a head that has been read: after SendRequestByGet, SendRequest with
  // HTTP_METHOD_GET and SendRequestBySocketPost, which have read the head themselves.
  //
  // A Transfer-Encoding of exactly "chunked" is decoded, also one that an earlier response of this
  // client had and the last one does not have; any other body ends where the server closes,
  // whatever length it announced.
  // Results: HTTP_RET_OK with the body in `body`: the whole of it, or what came of one that a
  //   closed connection, or a failed read in place of a chunk's size, has cut; HTTP_RET_IO_ERROR
  //   when another read failed, with what came before in `body`.
  int ReadBody(std::string& body);

  // Reads a whole response, the head first: after OpenRawDataUpload, or after a request that the
  // caller has written. After the senders that read the head themselves, call ReadBody instead;
  // here the body would be taken for a status line.
  //
  // Results: the body, as ReadBody gives it; the text {"error":true} when the head is no success,
  //   or where ReadBody fails. CheckResponse tells the outcome of the head.
  std::string GetResp();

  // Opens a streaming upload: connects and sends the head of a multipart POST of 128 GiB, so that
  // the server waits for whatever the caller writes. CheckResponse tells of the response before it,
  // until GetResp has read the upload's.
  //
  // The caller then writes the body with WriteData, with lines of the boundary
  // `-----------QUENMULTIPART_BOUNDARY-----------` and ends it by destroying the client. No login
  // is sent. Strict servers refuse the head for its "Cache-Control :no-cache" or its length.
  // GetResp has a response only of a server that responds before 128 GiB have come, and then
  // closes.
  // Results: HTTP_RET_OK; HTTP_RET_IO_ERROR when connecting or writing failed, which is logged at
  //   error.
  // Blocks for T to connect.
  int OpenRawDataUpload();

  // XML REST requests through libcurl over plain HTTP, with the body, where there is one, from
  // `doc`, which stays the caller's. A GET logs in by Basic or Digest as the server asks, the
  // others by Basic. The response's body is added to what earlier requests have collected, for
  // GetResponseXML.
  //
  // Arguments: `timeout` limits the whole transfer, in seconds, as in SendRequestByCurl; the others
  //   have no limit.
  // Results: HTTP_RET_OK after a status from 200 to 299; HTTP_RET_IO_ERROR after anything else.
  // SendReqByXMLPost sends at most 8,191 bytes of the document, indented. Without a document both
  // fail and send nothing.
  int SendReqByXMLGet(int timeout);
  int SendReqByXMLPost(xmlDoc*& doc);
  int SendReqByXMLPut(xmlDoc*& doc);
  int SendReqByXMLDelete();

  // Parses what the XML requests have collected, and empties it.
  //
  // Results: true with a new document in `doc`, which the caller frees with xmlFreeDoc; false when
  //   nothing was collected (`doc` stays) or it is not well-formed (`doc` becomes null).
  //
  // Here and in SendReqByXMLSocketPost libxml2's error handlers are told what is wrong with a
  // document, when the daemon has set them for the thread. Without one, where libxml2 writes to
  // standard error, nothing is written; stderr given to xmlSetGenericErrorFunc is no handler.
  bool GetResponseXML(xmlDoc*& doc);

  // Reads and parses the head of a response, after a request has been written.
  // Results: the code of the status: HTTP_RET_OK, HTTP_RET_UNAUTHORIZED, HTTP_RET_BAD_RESPONSE,
  //   HTTP_RET_REDIRECT or HTTP_RET_URI_TOO_LONG; HTTP_RET_NOT_READY without a request written, or
  //   after a header line without a name, or one of the names that are kept without a value;
  //   HTTP_RET_IO_ERROR after a failed read or half a status line; HTTP_RET_BAD_RESPONSE when it is
  //   no HTTP/1.0 or HTTP/1.1 response. The result is not kept: CheckResponse does not tell it.
  int CheckHttpResponse();

  // Reads and parses the header lines, 30 at most; what follows stays unread, in front of the body:
  // further lines, and of a head of exactly 30 lines the empty one, which makes a chunked body
  // empty.
  // Results: HTTP_RET_OK, HTTP_RET_NOT_READY or HTTP_RET_IO_ERROR, as above. What was parsed before
  //   a failure stays.
  int CheckContentType();

  // The Authorization header lines for the client's credentials, without the CRLF: Basic, and
  // Digest (after RFC 2617) for the last response's challenge. Digest is MD5 alone; MD5-sess is
  // computed as MD5. `body` is ignored, even for qop "auth-int". GenBasicAccessAuth throws
  // std::logic_error when memory for the encoding runs out.
  std::string GenBasicAccessAuth();
  std::string GenDigestAccessAuth(std::string method, std::string body);

  // The body that SendRequestByCurl collected from its last response, also from one that failed.
  std::string GetCurlText() const;

 protected:
  TWSocket* m_pSocket;  // owned
  std::map<HTTP_MAP_KEY, std::string> m_mapContent;
  int m_connState;  // 0 idle, 1 a request is written, 2 the head is read
  bool m_bHttps;
  bool m_bEncodeQuery;
  int m_result;
  bool m_bBasicAuth;
  int m_statusCode;
  int m_port;
  std::string m_strHost;
  std::string m_strPath;  // without leading "/"
  std::string m_strUser;
  std::string m_strPassword;
  std::string m_strCookie;
  std::string m_strAuthenticate;   // the challenge of the last response
  std::string m_strAuthorization;  // one header line for the next GET or SOAP POST, which drops it
  std::string m_strTransferEncoding;
  std::string m_strEncodeKeep;
  std::string m_strCurlText;
  char* m_pRespBuf;  // owned, from malloc; it and m_respLen are one record to libcurl's callbacks
  unsigned int m_respLen;  // bytes in m_pRespBuf
  HTTP_VERSION m_httpVersion;
  FILE* m_pCurlRespFile;  // not owned

 private:
  TARNWICK_LOCAL bool Reconnect();
  TARNWICK_LOCAL tarnwick::RequestParts Parts(const std::string& path) const;
  TARNWICK_LOCAL bool Authorize(const char* method);
  TARNWICK_LOCAL bool StoreHeader(const char* line);
  TARNWICK_LOCAL int ReadBodyFor(const char* operation, std::string* body);
};

// Fetches `path` from a JSON service over HTTP and parses the response into `result`. The request
// is one of HTTP/1.0 and names no host, so a server with several sites may respond for another one;
// chunks are not decoded. There is no argument for a login: here and in SendHttpsGet an empty one
// is sent by Basic.
//
// Arguments: `timeout` in seconds for connecting and each wait; `encodeQuery` percent-encodes the
//   values of the query; without it, line feeds are removed from the path instead.
// Results: 0 when the response is JSON whose member "success" is true; -1 when the request, the
//   status, a read or an empty body made it fail; -2 when the body is no JSON, or "success" is
//   missing or not true, and `result` may then hold a part of the response. -1 also when memory
//   runs out: the one-call functions throw nothing.
//
// Here and in SendHttpsGet a body that is nested more deeply than the thread's stack has room for
// is no JSON; a stack that is not the thread's own, a fiber's, is taken for one with room for 77
// levels.
// Blocks: as the client's GET, and then until the server closes: a silent one for 3 T, one that
//   keeps sending without a limit.
// Logs: at info a failed request, status or read, such as "Failed to check response[404]: 5"; at
//   error an empty body, and a body that is no such JSON. Here and in SendHttpsGet a body that
//   cannot be parsed is also logged whole, without category and level, whatever the levels are. Its
//   CR and LF are those of the log too, so that a device can write a whole forged line; in a scope
//   of TWRequestScope they are escaped.
// Threads: any; so the other two.
TARNWICK_API int SendHttpGet(const std::string& host, int port, std::string path,
                             Json::Value& result, int timeout, bool encodeQuery);

// Posts a form with a cookie; the response's body is not read.
//
// Arguments: `body` is encoded already; an empty `cookie` is left out, with a line in the log;
//   `timeout` in seconds for connecting and each wait.
// Results: 0 when the request was sent, whatever the server responded; -1 when it was not.
// Blocks: as the client's socket requests, until the response's head is there.
// Logs: at warn "[Warning] Cannot set balnk cookie"; at error a form that was not sent.
TARNWICK_API int SendHttpPost(const std::string& host, int port, const std::string& path,
                              const std::string& body, const std::string& cookie, int timeout);

// As SendHttpGet, over TLS through libcurl, with the certificate and host name verified. The
// version of HTTP is libcurl's choice, HTTP/2 where the server offers it, and chunks are decoded.
//
// Arguments: `timeout` limits the whole transfer, in seconds, as in SendRequestByCurl: 0 does not
//   limit it, and a negative one fails.
// Blocks: for that long; the name resolution takes as long as the resolver does.
// Results: 0; -1 when the transfer failed or the status is not from 200 to 299; -2 when the
//   certificate could not be verified; -3 when the body is no JSON, or "success" is missing or not
//   true. An empty body is a success and leaves `result` as it was.
TARNWICK_API int SendHttpsGet(const std::string& host, int port, const std::string& path,
                              Json::Value& result, int timeout);

#endif  // TARNWICK_HTTP_TWHTTP_H_
