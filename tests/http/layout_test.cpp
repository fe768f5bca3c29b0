// Where the fields of the exported objects stand. Programs hold clients by value and derive from
// the sockets, so a field that moved would be read at its old place. Nothing here runs first: a
// wrong layout does not compile, on whichever architecture.
#include <gtest/gtest.h>

#include <cstddef>
#include <type_traits>

#include "tarnwick/log/twdebuglog.h"
#include "tests/http/http_test_util.h"
#include "tests/net/net_test_util.h"

namespace {

struct Field {
  size_t offset;
  size_t size;
  size_t alignment;
};

template <typename Type>
constexpr Field FieldAt(size_t offset) {
  // NOLINTNEXTLINE(bugprone-sizeof-expression): of a pointer its own size is meant.
  return {offset, sizeof(Type), alignof(Type)};
}

// The objects have bases and virtual functions, for which the compilers of both architectures know
// the places all the same.
#pragma GCC diagnostic ignored "-Winvalid-offsetof"
#define TEST_FIELD(type, name) FieldAt<decltype(type::name)>(offsetof(type, name))

// True when the fields stand one after the other from `begin` on, with no more room between them
// than alignment asks for.
template <size_t kCount>
constexpr bool StandInOrder(size_t begin, const Field (&fields)[kCount]) {
  size_t next = begin;
  for (const Field& field : fields) {
    const size_t place = (next + field.alignment - 1) / field.alignment * field.alignment;
    if (field.offset != place) return false;
    next = place + field.size;
  }
  return true;
}

constexpr size_t kVtable = sizeof(void*);

constexpr Field kSocketFields[] = {
    TEST_FIELD(ExposedSocket, m_sockFd),    TEST_FIELD(ExposedSocket, m_strHost),
    TEST_FIELD(ExposedSocket, m_port),      TEST_FIELD(ExposedSocket, m_timeout),
    TEST_FIELD(ExposedSocket, m_bBuffered), TEST_FIELD(ExposedSocket, m_bConnected),
    TEST_FIELD(ExposedSocket, m_bEOF),      TEST_FIELD(ExposedSocket, m_readBuf),
    TEST_FIELD(ExposedSocket, m_readPos),   TEST_FIELD(ExposedSocket, m_readLen),
    TEST_FIELD(ExposedSocket, m_srcAddr)};
static_assert(StandInOrder(kVtable, kSocketFields));
static_assert(sizeof(ExposedSocket::m_readBuf) == 65536);

// The two pointers of TLS are private; they fill what is after the base.
static_assert(sizeof(SSLSocket) ==
              (sizeof(TWSocket) + sizeof(void*) - 1) / sizeof(void*) * sizeof(void*) +
                  2 * sizeof(void*));

constexpr Field kClientFields[] = {TEST_FIELD(ExposedClient, m_pSocket),
                                   TEST_FIELD(ExposedClient, m_mapContent),
                                   TEST_FIELD(ExposedClient, m_connState),
                                   TEST_FIELD(ExposedClient, m_bHttps),
                                   TEST_FIELD(ExposedClient, m_bEncodeQuery),
                                   TEST_FIELD(ExposedClient, m_result),
                                   TEST_FIELD(ExposedClient, m_bBasicAuth),
                                   TEST_FIELD(ExposedClient, m_statusCode),
                                   TEST_FIELD(ExposedClient, m_port),
                                   TEST_FIELD(ExposedClient, m_strHost),
                                   TEST_FIELD(ExposedClient, m_strPath),
                                   TEST_FIELD(ExposedClient, m_strUser),
                                   TEST_FIELD(ExposedClient, m_strPassword),
                                   TEST_FIELD(ExposedClient, m_strCookie),
                                   TEST_FIELD(ExposedClient, m_strAuthenticate),
                                   TEST_FIELD(ExposedClient, m_strAuthorization),
                                   TEST_FIELD(ExposedClient, m_strTransferEncoding),
                                   TEST_FIELD(ExposedClient, m_strEncodeKeep),
                                   TEST_FIELD(ExposedClient, m_strCurlText),
                                   TEST_FIELD(ExposedClient, m_pRespBuf),
                                   TEST_FIELD(ExposedClient, m_respLen),
                                   TEST_FIELD(ExposedClient, m_httpVersion),
                                   TEST_FIELD(ExposedClient, m_pCurlRespFile)};
static_assert(StandInOrder(kVtable, kClientFields));

// libcurl's callbacks see the buffer and its length as one record.
static_assert(offsetof(ExposedClient, m_respLen) ==
              offsetof(ExposedClient, m_pRespBuf) + sizeof(char*));

// The level record: one byte, three reserved ones and 74 words leave no room for anything else.
static_assert(std::is_standard_layout_v<TWDbgLogCfg>);
static_assert(sizeof(TWDbgLogCfg) == 1 + 3 + 4 * LOG_CATEG_COUNT);
static_assert(sizeof(TWDbgLogCfg) == 300 && alignof(TWDbgLogCfg) == 4);

// The assertions above would not tell a hole from a field, were the check itself too kind.
TEST(StandInOrder, AFieldOutOfPlaceIsFound) {
  const Field swapped[] = {kSocketFields[0], kSocketFields[2], kSocketFields[1]};
  EXPECT_FALSE(StandInOrder(kVtable, swapped));
  Field moved[] = {kSocketFields[0], kSocketFields[1]};
  EXPECT_TRUE(StandInOrder(kVtable, moved));
  moved[1].offset += moved[1].alignment;
  EXPECT_FALSE(StandInOrder(kVtable, moved));
}

}  // namespace
