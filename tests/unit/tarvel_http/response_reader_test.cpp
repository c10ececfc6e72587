// SPDX-License-Identifier: Apache-2.0

#include "http/response_reader.h"

#include "support/throws_message.h"

#include <gtest/gtest.h>

#include <cstddef>
#include <ostream>
#include <string>
#include <string_view>

namespace Tarvel::Http {
namespace {

/// Feeds `bytes` in pieces of `pieceLength` and then the end of the connection.
ResponseData ReadWhole(std::string_view bytes, std::size_t pieceLength) {
  ResponseReader reader;
  for (std::size_t position = 0; position < bytes.size(); position += pieceLength) {
    reader.Put(bytes.substr(position, pieceLength));
  }
  reader.PutEnd();
  EXPECT_TRUE(reader.IsComplete());
  return reader.Take();
}

constexpr std::size_t WHOLE = 1 << 30;

struct ValidResponse {
  std::string bytes;
  int status;
  std::string reason;
  std::string body;
};

void PrintTo(const ValidResponse &valid, std::ostream *out) {
  *out << testing::PrintToString(valid.bytes);
}

class ResponseReaderAccepts : public testing::TestWithParam<ValidResponse> {};

TEST_P(ResponseReaderAccepts, InPiecesOfAnyLength) {
  const ValidResponse &expected = GetParam();
  for (const std::size_t length : {WHOLE, std::size_t(1), std::size_t(2), std::size_t(7)}) {
    const ResponseData response = ReadWhole(expected.bytes, length);
    EXPECT_EQ(response.status, expected.status) << length;
    EXPECT_EQ(response.reason, expected.reason) << length;
    EXPECT_EQ(response.body, expected.body) << length;
  }
}

std::string Repeat(const std::string &text, int times) {
  std::string all;
  for (int i = 0; i < times; ++i) {
    all += text;
  }
  return all;
}

const std::string OK = "HTTP/1.1 200 OK\r\n";
const std::string CHUNKED = OK + "Transfer-Encoding: chunked\r\n\r\n";
const std::string LENGTH_5 = OK + "Content-Length: 5\r\n\r\n";

INSTANTIATE_TEST_SUITE_P(
    Framing, ResponseReaderAccepts,
    testing::Values(ValidResponse{LENGTH_5 + "hello", 200, "OK", "hello"},
                    ValidResponse{OK + "content-length:  5 \r\n\r\nhello", 200, "OK", "hello"},
                    ValidResponse{OK + "Content-Length: 005\r\n\r\nhello", 200, "OK", "hello"},
                    ValidResponse{OK + "Content-Length: 5\r\nContent-Length: 5\r\n\r\nhello", 200, "OK", "hello"},
                    ValidResponse{OK + "Content-Length: 5, 5\r\n\r\nhello", 200, "OK", "hello"},
                    ValidResponse{OK + "Content-Length: 0\r\n\r\n", 200, "OK", ""},
                    ValidResponse{OK + "\r\nto the end", 200, "OK", "to the end"},
                    ValidResponse{OK + "\r\n", 200, "OK", ""},
                    ValidResponse{"HTTP/1.0 200 OK\r\n\r\nto the end", 200, "OK", "to the end"},
                    ValidResponse{"HTTP/1.0 200 OK\r\nContent-Length: 5\r\n\r\nhello", 200, "OK", "hello"},
                    ValidResponse{CHUNKED + "5\r\nhello\r\n0\r\n\r\n", 200, "OK", "hello"},
                    ValidResponse{CHUNKED + "2\r\nhe\r\n3\r\nllo\r\n0\r\n\r\n", 200, "OK", "hello"},
                    ValidResponse{CHUNKED + "0\r\n\r\n", 200, "OK", ""},
                    ValidResponse{CHUNKED + "0000005\r\nhello\r\n000\r\n\r\n", 200, "OK", "hello"},
                    ValidResponse{CHUNKED + "A\r\n0123456789\r\n0\r\n\r\n", 200, "OK", "0123456789"},
                    ValidResponse{CHUNKED + "a\r\n01234\r\n789\r\n0\r\n\r\n", 200, "OK", "01234\r\n789"},
                    ValidResponse{CHUNKED + "5;name=value\r\nhello\r\n0;x\r\n\r\n", 200, "OK", "hello"},
                    ValidResponse{CHUNKED + "5 ;\t\"quoted\"\r\nhello\r\n0\r\n\r\n", 200, "OK", "hello"},
                    ValidResponse{CHUNKED + "5\r\nhello\r\n0\r\nTrailer: x\r\nContent-Length: 9\r\n\r\n", 200, "OK",
                                  "hello"},
                    ValidResponse{OK + "transfer-encoding: Chunked\r\n\r\n0\r\n\r\n", 200, "OK", ""}));

INSTANTIATE_TEST_SUITE_P(
    Statuses, ResponseReaderAccepts,
    testing::Values(ValidResponse{"HTTP/1.1 204 No Content\r\n\r\n", 204, "No Content", ""},
                    ValidResponse{"HTTP/1.1 204 No Content\r\nContent-Length: 5\r\n\r\n", 204, "No Content", ""},
                    ValidResponse{"HTTP/1.1 304 Not Modified\r\nContent-Length: 5\r\n\r\n", 304, "Not Modified", ""},
                    ValidResponse{"HTTP/1.1 404 \r\nContent-Length: 0\r\n\r\n", 404, "", ""},
                    ValidResponse{"HTTP/1.1 503\r\nContent-Length: 0\r\n\r\n", 503, "", ""},
                    ValidResponse{"HTTP/1.0 200\r\nContent-Length: 2\r\n\r\nok", 200, "", "ok"},
                    ValidResponse{"HTTP/1.1 100\r\n\r\nHTTP/1.1 200\r\nContent-Length: 2\r\n\r\nok", 200, "", "ok"},
                    ValidResponse{"HTTP/1.1 500 Internal Server Error\r\nContent-Length: 1\r\n\r\nx", 500,
                                  "Internal Server Error", "x"},
                    ValidResponse{"HTTP/1.1 999 Odd\r\nContent-Length: 0\r\n\r\n", 999, "Odd", ""},
                    ValidResponse{"HTTP/1.1 101 Switching Protocols\r\nUpgrade: x\r\n\r\n\x01\x02", 101,
                                  "Switching Protocols", ""},
                    ValidResponse{"HTTP/1.1 100 Continue\r\n\r\n" + LENGTH_5 + "hello", 200, "OK", "hello"},
                    ValidResponse{"HTTP/1.1 100 Continue\r\n\r\nHTTP/1.1 103 Early Hints\r\nLink: x\r\n\r\n"
                                  "HTTP/1.1 404 Not Found\r\nContent-Length: 0\r\n\r\n",
                                  404, "Not Found", ""},
                    ValidResponse{Repeat("HTTP/1.1 100 Continue\r\n\r\n", 16) + LENGTH_5 + "hello", 200, "OK", "hello"},
                    ValidResponse{OK + "Content-Encoding: identity\r\nContent-Length: 1\r\n\r\nx", 200, "OK", "x"},
                    ValidResponse{OK + "Content-Encoding:\r\nContent-Length: 1\r\n\r\nx", 200, "OK", "x"},
                    ValidResponse{OK + "Content-Encoding: gzip\r\nContent-Length: 0\r\n\r\n", 200, "OK", ""}));

// After a status other than 2xx and 500, neither the body nor the headers about its length and coding matter.
INSTANTIATE_TEST_SUITE_P(
    RefusedStatuses, ResponseReaderAccepts,
    testing::Values(
        ValidResponse{"HTTP/1.1 404 Not Found\r\nContent-Length: 4\r\n\r\nnone", 404, "Not Found", ""},
        ValidResponse{"HTTP/1.1 404 Not Found\r\nContent-Encoding: deflate\r\nContent-Length: 1\r\n\r\nx", 404,
                      "Not Found", ""},
        ValidResponse{"HTTP/1.1 503 Service Unavailable\r\nContent-Length: 100\r\n\r\ncut", 503, "Service Unavailable",
                      ""},
        ValidResponse{"HTTP/1.1 503 Down\r\nContent-Length: 17000000\r\n\r\nx", 503, "Down", ""},
        ValidResponse{"HTTP/1.1 503 Down\r\nTransfer-Encoding: gzip, chunked\r\n\r\nx", 503, "Down", ""},
        ValidResponse{"HTTP/1.1 503 Down\r\nTransfer-Encoding: chunked\r\n\r\nno chunk", 503, "Down", ""},
        ValidResponse{"HTTP/1.1 503 Down\r\nTransfer-Encoding: identity\r\nContent-Length: 1\r\n\r\nx", 503, "Down",
                      ""},
        ValidResponse{"HTTP/1.0 503 Down\r\nTransfer-Encoding: chunked\r\n\r\n", 503, "Down", ""},
        ValidResponse{"HTTP/1.1 503 Down\r\nContent-Length: many\r\n\r\nx", 503, "Down", ""},
        ValidResponse{"HTTP/1.1 503 Down\r\nContent-Length: 1\r\nContent-Length: 2\r\n\r\nx", 503, "Down", ""},
        ValidResponse{"HTTP/1.1 503 Down\r\nContent-Length: 1\r\nTransfer-Encoding: chunked\r\n\r\nx", 503, "Down", ""},
        ValidResponse{"HTTP/1.1 304 Not Modified\r\nContent-Length: many\r\n\r\n", 304, "Not Modified", ""},
        ValidResponse{"HTTP/1.1 301 Moved\r\n\r\nto the end", 301, "Moved", ""},
        ValidResponse{"HTTP/1.1 501 Not Implemented\r\nContent-Length: 1\r\n\r\n", 501, "Not Implemented", ""},
        ValidResponse{"HTTP/1.1 499 \r\nContent-Length: 1\r\n\r\n", 499, "", ""},
        ValidResponse{"HTTP/1.1 100 Continue\r\n\r\nHTTP/1.1 503 Down\r\nContent-Length: many\r\n\r\n", 503, "Down",
                      ""}));

struct InvalidResponse {
  std::string bytes;
  std::string message;
};

void PrintTo(const InvalidResponse &invalid, std::ostream *out) {
  *out << testing::PrintToString(invalid.bytes.substr(0, 200));
}

class ResponseReaderRefuses : public testing::TestWithParam<InvalidResponse> {};

TEST_P(ResponseReaderRefuses, InPiecesOfAnyLength) {
  const InvalidResponse &invalid = GetParam();
  for (const std::size_t length : {WHOLE, std::size_t(1), std::size_t(5)}) {
    EXPECT_THROWS_MESSAGE(ReadWhole(invalid.bytes, length), HttpException, invalid.message) << length;
  }
}

std::string NotHttp(const std::string &reason) {
  return "its header is not HTTP/1.x (" + reason + ")";
}

const std::string IN_HEADER = "the connection ended within its header";

INSTANTIATE_TEST_SUITE_P(
    NotHttp, ResponseReaderRefuses,
    testing::Values(InvalidResponse{"", "the connection ended before it"}, InvalidResponse{"H", IN_HEADER},
                    InvalidResponse{"HTTP/1.1 200 OK", IN_HEADER}, InvalidResponse{"HTTP/1.1 200 OK\r\n", IN_HEADER},
                    InvalidResponse{"HTTP/1.1 200 OK\r\nContent-Length: 5\r\n", IN_HEADER},
                    InvalidResponse{"HTTP/1.1 100 Continue\r\n\r\n", "the connection ended before it"},
                    InvalidResponse{"HTTP/1.1 100 Continue\r\n\r\nH", IN_HEADER},
                    InvalidResponse{"HTTP/1.1 503", IN_HEADER}, InvalidResponse{"HTTP/1.1 503\r\n", IN_HEADER},
                    InvalidResponse{"HTTP/1.1 503 Down\r\nContent-Length: 5\r\n", IN_HEADER},
                    InvalidResponse{"HTTP/1.1 503 Down\r\nContent-Length: many\r\n", IN_HEADER},
                    InvalidResponse{"HTTP/1.1 503 Down\r\nNo colon\r\n\r\n", NotHttp("bad field")},
                    InvalidResponse{"HTTP/1.1 100 Continue\r\nContent-Length: many\r\n\r\n",
                                    NotHttp("bad Content-Length")},
                    InvalidResponse{"HTTP/1.1 20\r\n\r\n", NotHttp("bad status")},
                    InvalidResponse{"HTTP/1.1 503\n\r\n\r\n", NotHttp("bad status")},
                    InvalidResponse{"SSH-2.0-OpenSSH_9.2p1\r\n", NotHttp("bad version")},
                    InvalidResponse{"HTTP/2.0 200 OK\r\n\r\n", NotHttp("bad version")},
                    InvalidResponse{"HTTP/0.9 200 OK\r\n\r\n", NotHttp("bad version")},
                    InvalidResponse{"HTTP/1.2 200 OK\r\n\r\n", NotHttp("bad version")},
                    InvalidResponse{"ICY 200 OK\r\n\r\n", NotHttp("bad version")},
                    InvalidResponse{"<html><body>not HTTP at all</body></html>", NotHttp("bad version")},
                    InvalidResponse{"\x15\x03\x03\x00\x02\x02\x28 and more", NotHttp("bad version")},
                    InvalidResponse{"\r\n" + LENGTH_5 + "hello", NotHttp("bad version")},
                    InvalidResponse{"HTTP/1.1 20 OK\r\n\r\n", NotHttp("bad status")},
                    InvalidResponse{"HTTP/1.1 000 OK\r\n\r\n", NotHttp("bad status")},
                    InvalidResponse{"HTTP/1.1 099 OK\r\n\r\n", NotHttp("bad status")},
                    InvalidResponse{"HTTP/1.1 2000 OK\r\n\r\n", NotHttp("bad status")},
                    InvalidResponse{"HTTP/1.1 abc OK\r\n\r\n", NotHttp("bad status")},
                    InvalidResponse{"HTTP/1.1 -20 OK\r\n\r\n", NotHttp("bad status")},
                    InvalidResponse{"HTTP/1.1 200 O\x01K\r\n\r\n", NotHttp("bad reason")},
                    InvalidResponse{"HTTP/1.1 200 OK\n\n\r\n\r\n", NotHttp("bad reason")},
                    InvalidResponse{OK + "No colon\r\n\r\n", NotHttp("bad field")},
                    InvalidResponse{OK + "Space : x\r\n\r\n", NotHttp("bad field")},
                    InvalidResponse{OK + ": x\r\n\r\n", NotHttp("bad field")},
                    InvalidResponse{OK + "A: b\x01\r\n\r\n", NotHttp("bad value")},
                    InvalidResponse{OK + std::string("A: b\0c\r\n\r\n", 10), NotHttp("bad value")}));

INSTANTIATE_TEST_SUITE_P(
    Lengths, ResponseReaderRefuses,
    testing::Values(
        InvalidResponse{LENGTH_5 + "hell", "the connection ended after 4 of the body's 5 bytes"},
        InvalidResponse{LENGTH_5, "the connection ended after 0 of the body's 5 bytes"},
        InvalidResponse{OK + "Content-Length: -5\r\n\r\nhello", NotHttp("bad Content-Length")},
        InvalidResponse{OK + "Content-Length: +5\r\n\r\nhello", NotHttp("bad Content-Length")},
        InvalidResponse{OK + "Content-Length: 0x5\r\n\r\nhello", NotHttp("bad Content-Length")},
        InvalidResponse{OK + "Content-Length: 5.0\r\n\r\nhello", NotHttp("bad Content-Length")},
        InvalidResponse{OK + "Content-Length: five\r\n\r\nhello", NotHttp("bad Content-Length")},
        InvalidResponse{OK + "Content-Length:\r\n\r\nhello", NotHttp("bad Content-Length")},
        InvalidResponse{OK + "Content-Length: 5 5\r\n\r\nhello", NotHttp("bad Content-Length")},
        InvalidResponse{OK + "Content-Length: 99999999999999999999\r\n\r\n", NotHttp("bad Content-Length")},
        InvalidResponse{OK + "Content-Length: 5\r\nContent-Length: 6\r\n\r\nhello", NotHttp("multiple Content-Length")},
        InvalidResponse{OK + "Content-Length: 5, 6\r\n\r\nhello", NotHttp("multiple Content-Length")},
        InvalidResponse{OK + "Content-Length: 16777217\r\n\r\n", "the body is longer than 16777216 bytes"},
        InvalidResponse{OK + "Content-Length: 5\r\nTransfer-Encoding: chunked\r\n\r\n0\r\n\r\n",
                        NotHttp("bad Transfer-Encoding")},
        InvalidResponse{OK + "Transfer-Encoding: chunked\r\nContent-Length: 5\r\n\r\n0\r\n\r\n",
                        NotHttp("bad Content-Length")},
        InvalidResponse{OK + "Transfer-Encoding: identity\r\nContent-Length: 5\r\n\r\nhello",
                        "it has both a Content-Length and a Transfer-Encoding"},
        InvalidResponse{OK + "Transfer-Encoding: gzip\r\n\r\nhello", "its Transfer-Encoding is not \"chunked\""},
        InvalidResponse{OK + "Transfer-Encoding: gzip, chunked\r\n\r\n0\r\n\r\n",
                        "its Transfer-Encoding is not \"chunked\""},
        InvalidResponse{OK + "Transfer-Encoding: chunked, gzip\r\n\r\n0\r\n\r\n",
                        "its Transfer-Encoding is not \"chunked\""},
        InvalidResponse{OK + "Transfer-Encoding: gzip\r\nTransfer-Encoding: chunked\r\n\r\n0\r\n\r\n",
                        "its Transfer-Encoding is not \"chunked\""},
        InvalidResponse{OK + "Transfer-Encoding: chunked\r\nTransfer-Encoding: chunked\r\n\r\n0\r\n\r\n",
                        NotHttp("bad Transfer-Encoding")},
        InvalidResponse{OK + "Transfer-Encoding: xchunked\r\n\r\n0\r\n\r\n",
                        "its Transfer-Encoding is not \"chunked\""},
        InvalidResponse{"HTTP/1.0 200 OK\r\nTransfer-Encoding: chunked\r\n\r\n0\r\n\r\n",
                        "it has a Transfer-Encoding, which HTTP/1.0 does not know"},
        InvalidResponse{"HTTP/1.1 204 No Content\r\nContent-Length: 1\r\nTransfer-Encoding: chunked\r\n\r\n",
                        NotHttp("bad Transfer-Encoding")}));

const std::string BROKEN = "the chunked body is broken: ";
const std::string NO_SIZE = BROKEN + "a chunk without a size";
const std::string NO_NUMBER = BROKEN + "a size that is not a hexadecimal number";
const std::string NO_LINE_FEED = BROKEN + "a carriage return without a line feed";
const std::string TOO_LONG = BROKEN + "a chunk longer than its size";
const std::string CONTROL = BROKEN + "a control character in an extension or the trailer";
const std::string CUT = "the connection ended within the chunked body";

INSTANTIATE_TEST_SUITE_P(
    Chunks, ResponseReaderRefuses,
    testing::Values(
        InvalidResponse{CHUNKED, CUT}, InvalidResponse{CHUNKED + "5", CUT}, InvalidResponse{CHUNKED + "5\r\nhel", CUT},
        InvalidResponse{CHUNKED + "5\r\nhello", CUT}, InvalidResponse{CHUNKED + "5\r\nhello\r\n", CUT},
        InvalidResponse{CHUNKED + "5\r\nhello\r\n0\r\n", CUT}, InvalidResponse{CHUNKED + "0\r\n\r", CUT},
        InvalidResponse{CHUNKED + "0\r\nTrailer: x\r\n", CUT}, InvalidResponse{CHUNKED + "\r\n", NO_SIZE},
        InvalidResponse{CHUNKED + "hello", NO_SIZE}, InvalidResponse{CHUNKED + "-5\r\n", NO_SIZE},
        InvalidResponse{CHUNKED + " 5\r\nhello", NO_SIZE}, InvalidResponse{CHUNKED + ";x\r\n", NO_SIZE},
        InvalidResponse{CHUNKED + "0x5\r\nhello", NO_NUMBER}, InvalidResponse{CHUNKED + "5g\r\nhello", NO_NUMBER},
        InvalidResponse{CHUNKED + "5\nhello\r\n0\r\n\r\n", NO_NUMBER},
        InvalidResponse{CHUNKED + "5\rhello", NO_LINE_FEED}, InvalidResponse{CHUNKED + "5\r\nhello\rX", NO_LINE_FEED},
        InvalidResponse{CHUNKED + "4\r\nhello\r\n0\r\n\r\n", TOO_LONG},
        InvalidResponse{CHUNKED + "6\r\nhello\r\n0\r\n\r\n", TOO_LONG},
        InvalidResponse{CHUNKED + "5;a\nb\r\nhello", CONTROL},
        InvalidResponse{CHUNKED + "0\r\nA: b\nC: d\r\n", CONTROL}, InvalidResponse{CHUNKED + "0\r\n\rX", NO_LINE_FEED},
        InvalidResponse{CHUNKED + "0\r\nA\rX", NO_LINE_FEED},
        InvalidResponse{CHUNKED + "1000001\r\n", "the body is longer than 16777216 bytes"},
        InvalidResponse{CHUNKED + "1\r\nx\r\n1000000\r\n", "the body is longer than 16777216 bytes"},
        InvalidResponse{CHUNKED + "ffffffffffffffff\r\n", "the body is longer than 16777216 bytes"},
        InvalidResponse{CHUNKED + "10000000000000000000000000000000005\r\nhello",
                        "the body is longer than 16777216 bytes"},
        InvalidResponse{CHUNKED + "1;" + std::string(65537, 'x'),
                        "the extensions and the trailer of the chunked body are longer than 65536 bytes"},
        InvalidResponse{CHUNKED + std::string(65537, '0'),
                        "the extensions and the trailer of the chunked body are longer than 65536 bytes"},
        InvalidResponse{CHUNKED + "0\r\n" + std::string(65537, 'x'),
                        "the extensions and the trailer of the chunked body are longer than 65536 bytes"}));

const std::string HEADER_LIMIT = "the header is longer than 65536 bytes";

INSTANTIATE_TEST_SUITE_P(
    Limits, ResponseReaderRefuses,
    testing::Values(
        InvalidResponse{OK + "A: " + std::string(65536, 'x') + "\r\n\r\n", HEADER_LIMIT},
        InvalidResponse{OK + Repeat("A: b\r\n", 20000) + "\r\n", HEADER_LIMIT},
        InvalidResponse{"HTTP/1.1 200 " + std::string(65536, 'x') + "\r\n\r\n", HEADER_LIMIT},
        InvalidResponse{Repeat("HTTP/1.1 100 Continue\r\n\r\n", 17), "it follows more than 16 interim responses"},
        InvalidResponse{"HTTP/1.1 100 Continue\r\nA: " + std::string(65536, 'x') + "\r\n\r\n", HEADER_LIMIT},
        InvalidResponse{"HTTP/1.1 100 Continue\r\n\r\n" + OK + "A: " + std::string(65536, 'x') + "\r\n\r\n",
                        HEADER_LIMIT}));

INSTANTIATE_TEST_SUITE_P(
    Encodings, ResponseReaderRefuses,
    testing::Values(InvalidResponse{OK + "Content-Encoding: gzip\r\nContent-Length: 3\r\n\r\n\x1f\x8b\x08",
                                    "its content (status 200 OK) is encoded as \"gzip\", which was not asked for"},
                    InvalidResponse{OK + "content-encoding: br\r\nTransfer-Encoding: chunked\r\n\r\n0\r\n\r\n",
                                    "its content (status 200 OK) is encoded as \"br\", which was not asked for"},
                    InvalidResponse{"HTTP/1.1 500 Oh\r\nContent-Encoding: deflate\r\nContent-Length: 1\r\n\r\nx",
                                    "its content (status 500 Oh) is encoded as \"deflate\", which was not asked for"}));

TEST(ResponseReader, IgnoresBytesAfterTheEndInPiecesOfAnyLength) {
  const std::string noContent = "HTTP/1.1 204 No Content\r\n\r\n";
  const std::string refused = "HTTP/1.1 404 Not Found\r\nContent-Length: 4\r\n\r\n";
  struct Case {
    std::string response;
    std::string body;
  };
  for (const Case &whole : {Case{LENGTH_5 + "hello", "hello"}, Case{noContent, ""}, Case{CHUNKED + "0\r\n\r\n", ""},
                            Case{OK + "Content-Length: 0\r\n\r\n", ""}, Case{refused, ""}}) {
    for (const std::string &rest :
         {std::string("\r\n"), std::string("x"), LENGTH_5 + "world", std::string(70000, 'x')}) {
      EXPECT_EQ(ReadWhole(whole.response + rest, WHOLE).body, whole.body) << whole.response;
      EXPECT_EQ(ReadWhole(whole.response + rest, 1).body, whole.body) << whole.response;
      EXPECT_EQ(ReadWhole(whole.response + rest, whole.response.size()).body, whole.body) << whole.response;
    }
  }
}

TEST(ResponseReader, IsCompleteAtTheEndOfTheHeaderOfARefusedStatus) {
  for (const std::string &header : {std::string("HTTP/1.1 503 Down\r\nContent-Length: 5\r\n\r\n"),
                                    std::string("HTTP/1.1 404\r\nTransfer-Encoding: chunked\r\n\r\n"),
                                    std::string("HTTP/1.1 301 Moved\r\nContent-Length: -1\r\n\r\n")}) {
    ResponseReader reader;
    reader.Put(header.substr(0, header.size() - 1));
    EXPECT_FALSE(reader.IsComplete());
    reader.Put("\n");
    EXPECT_TRUE(reader.IsComplete());
  }
}

TEST(ResponseReader, KeepsTheFieldsOfARefusedStatusUpToAnInvalidLength) {
  const HeaderFields all{{"Retry-After", "5"}, {"Content-Length", "70000000"}, {"Set-Cookie", "a=b"}};
  EXPECT_EQ(
      ReadWhole("HTTP/1.1 503 Down\r\nRetry-After: 5\r\nContent-Length: 70000000\r\nSet-Cookie: a=b\r\n\r\n", WHOLE)
          .fields,
      all);
  const HeaderFields some{{"Retry-After", "5"}};
  EXPECT_EQ(
      ReadWhole("HTTP/1.1 503 Down\r\nRetry-After: 5\r\nContent-Length: many\r\nSet-Cookie: a=b\r\n\r\n", WHOLE).fields,
      some);
}

TEST(ResponseReader, LimitsTheHeaderOfEachInterimResponseSeparately) {
  const std::string start = "HTTP/1.1 103 Early Hints\r\nA: ";
  const std::string interim = start + std::string(MAX_HEADER_BYTES - start.size() - 4, 'x') + "\r\n\r\n";
  const std::string finalStart = OK + "Content-Length: 5\r\nA: ";
  const std::string header = finalStart + std::string(MAX_HEADER_BYTES - finalStart.size() - 4, 'x') + "\r\n\r\n";
  EXPECT_EQ(ReadWhole(Repeat(interim, 16) + header + "hello", 16384).body, "hello");
}

TEST(ResponseReader, RefusesEachPrefixOfAResponseWithALength) {
  for (const std::string &bytes : {LENGTH_5 + "hello", CHUNKED + "2;x=y\r\nhe\r\n3\r\nllo\r\n0\r\nTrailer: x\r\n\r\n",
                                   "HTTP/1.1 100 Continue\r\n\r\n" + LENGTH_5 + "hello"}) {
    EXPECT_EQ(ReadWhole(bytes, WHOLE).body, "hello");
    for (std::size_t length = 0; length < bytes.size(); ++length) {
      EXPECT_THROW(ReadWhole(bytes.substr(0, length), WHOLE), HttpException) << length;
    }
  }
}

TEST(ResponseReader, KeepsTheOrderOfTheFieldsAndDropsTrailers) {
  const ResponseData response =
      ReadWhole(OK + "Set-Cookie: a=b\r\nSET-COOKIE: c=d\r\nFolded: one\r\n two\r\nTransfer-Encoding: chunked\r\n\r\n"
                     "0\r\nSet-Cookie: e=f\r\n\r\n",
                WHOLE);
  const HeaderFields expected{
      {"Set-Cookie", "a=b"}, {"SET-COOKIE", "c=d"}, {"Folded", "one two"}, {"Transfer-Encoding", "chunked"}};
  EXPECT_EQ(response.fields, expected);
}

TEST(ResponseReader, AcceptsAHeaderAndABodyOfExactlyTheLimits) {
  const std::string start = OK + "Content-Length: 16777216\r\nA: ";
  const std::string header = start + std::string(MAX_HEADER_BYTES - start.size() - 4, 'x') + "\r\n\r\n";
  ASSERT_EQ(header.size(), MAX_HEADER_BYTES);
  EXPECT_EQ(ReadWhole(header + std::string(MAX_BODY_BYTES, 'x'), 16384).body.size(), MAX_BODY_BYTES);
}

TEST(ResponseReader, LimitsABodyThatEndsWithTheConnection) {
  ResponseReader reader;
  reader.Put(OK + "\r\n");
  reader.Put(std::string(MAX_BODY_BYTES, 'x'));
  EXPECT_THROWS_MESSAGE(reader.Put("x"), HttpException, "the body is longer than 16777216 bytes");
}

TEST(ResponseReader, RefusesEndlessChunksAtTheLimit) {
  ResponseReader reader;
  reader.Put(CHUNKED);
  std::size_t total = 0;
  const std::string chunk = "10000\r\n" + std::string(65536, 'x') + "\r\n";
  const auto feed = [&] {
    for (; total < 2 * MAX_BODY_BYTES; total += 65536) {
      reader.Put(chunk);
    }
  };
  EXPECT_THROWS_MESSAGE(feed(), HttpException, "the body is longer than 16777216 bytes");
  EXPECT_EQ(total, MAX_BODY_BYTES);
}

TEST(ResponseReader, ExpectsNoBodyForAnAnswerToHead) {
  ResponseReader reader(true);
  reader.Put(LENGTH_5);
  EXPECT_TRUE(reader.IsComplete());
}

} // namespace
} // namespace Tarvel::Http
