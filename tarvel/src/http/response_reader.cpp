// SPDX-License-Identifier: Apache-2.0

#include "http/response_reader.h"

#include "core/wiped_growth.h"

#include <tarvel/core/secure_wipe.h>
#include <tarvel/core/string_util.h>

#include <boost/asio/buffer.hpp>
#include <boost/beast/http/basic_parser.hpp>
#include <boost/beast/http/error.hpp>

#include <algorithm>
#include <cstdint>
#include <optional>
#include <utility>

namespace Tarvel::Http {

namespace http = boost::beast::http;
using boost::beast::error_code;

namespace {

/// More than any server needs. A server that sends only interim responses is refused.
constexpr int MAX_INTERIM_RESPONSES = 16;

constexpr int SWITCHING_PROTOCOLS = 101;
constexpr int NO_CONTENT = 204;
constexpr int INTERNAL_SERVER_ERROR = 500; // its body is read, because SOAP 1.1 sends faults with this status

/// At most this much is reserved for a length that a server states; more is reserved as the bytes arrive.
constexpr std::size_t MAX_RESERVED_BYTES = 256 * 1024;

void CheckHeaderLength(std::size_t length) {
  if (length > MAX_HEADER_BYTES) {
    throw HttpException("the header is longer than " + std::to_string(MAX_HEADER_BYTES) + " bytes");
  }
}

void CheckBodyLength(std::uint64_t length) {
  if (length > MAX_BODY_BYTES) {
    throw HttpException("the body is longer than " + std::to_string(MAX_BODY_BYTES) + " bytes");
  }
}

[[noreturn]] void RefuseHeader(const std::string &reason) {
  throw HttpException("its header is not HTTP/1.x (" + reason + ")");
}

/// A server of another protocol may never send the end of a header, so its first bytes are checked.
void CheckBeginning(std::string_view header) {
  constexpr std::string_view BEGINNING = "HTTP/1.";
  const std::size_t length = std::min(header.size(), BEGINNING.size());
  if (header.substr(0, length) != BEGINNING.substr(0, length)) {
    RefuseHeader(make_error_code(http::error::bad_version).message());
  }
}

std::string DescribeStatus(const ResponseData &response) {
  return std::to_string(response.status) + (response.reason.empty() ? "" : " ") + StringUtil::Shorten(response.reason);
}

bool IsInterim(int status) noexcept {
  return status / 100 == 1 && status != SWITCHING_PROTOCOLS;
}

/// Whether the status is the whole answer, so that no body is read.
bool IsRefusal(int status) noexcept {
  return status / 100 != 2 && status != INTERNAL_SERVER_ERROR && !IsInterim(status);
}

bool IsAboutBody(const error_code &error) {
  return error == http::error::bad_content_length || error == http::error::multiple_content_length ||
         error == http::error::bad_transfer_encoding;
}

/// Adds the blank after the status code that Beast requires and many servers leave out.
void CompleteStatusLine(std::string &header) {
  constexpr std::string_view EXAMPLE = "HTTP/1.1 503";
  if (header.find("\r\n") == EXAMPLE.size()) {
    header.insert(EXAMPLE.size(), 1, ' ');
  }
}

} // namespace

/// Beast's parser for the status line and the fields. It never gets a byte of the body: in builds with assertions, its
/// body parser asserts conditions that a peer can violate.
class ResponseHeaderParser final : public http::basic_parser<false> {
public:
  ResponseHeaderParser() {
    header_limit(MAX_HEADER_BYTES);
    body_limit(boost::none); // the length is checked where the body is read
  }

  ResponseData &GetData() noexcept { return m_data; }

  bool IsChunked() const {
    CheckTransferCodings();
    return m_transferCodings > 0;
  }

  bool HasLength() const noexcept { return m_lengths > 0; }

private:
  void on_request_impl(http::verb, boost::beast::string_view, boost::beast::string_view, int, error_code &) override {}

  void on_response_impl(int code, boost::beast::string_view reason, int version, error_code &error) override {
    if (code < 100) {
      error = http::error::bad_status;
    }
    m_data.status = code;
    m_data.reason.assign(reason.data(), reason.size());
    m_isOld = version < 11;
  }

  void on_field_impl(http::field field, boost::beast::string_view name, boost::beast::string_view value,
                     error_code &) override {
    m_data.fields.emplace_back(std::string(name.data(), name.size()), std::string(value.data(), value.size()));
    m_lengths += field == http::field::content_length ? 1 : 0;
    if (field == http::field::transfer_encoding) {
      ++m_transferCodings;
      m_knowsCodings = m_knowsCodings && EqualsIgnoringCase(m_data.fields.back().second, "chunked");
    }
  }

  void on_header_impl(error_code &) override {}
  void on_body_init_impl(const boost::optional<std::uint64_t> &, error_code &) override {}
  std::size_t on_body_impl(boost::beast::string_view, error_code &) override { return 0; }
  void on_chunk_header_impl(std::uint64_t, boost::beast::string_view, error_code &) override {}
  std::size_t on_chunk_body_impl(std::uint64_t, boost::beast::string_view, error_code &) override { return 0; }
  void on_finish_impl(error_code &) override {}

  /// RFC 9112, section 6.1: a body in an unknown coding cannot be read, and a coding together with a length may
  /// be an attempt at request smuggling.
  void CheckTransferCodings() const {
    if (m_transferCodings == 0) {
      return;
    }
    if (m_lengths > 0) {
      throw HttpException("it has both a Content-Length and a Transfer-Encoding");
    }
    if (!m_knowsCodings || m_transferCodings > 1) {
      throw HttpException("its Transfer-Encoding is not \"chunked\"");
    }
    if (m_isOld) {
      throw HttpException("it has a Transfer-Encoding, which HTTP/1.0 does not know");
    }
  }

  ResponseData m_data;
  bool m_isOld = false;
  int m_lengths = 0;
  int m_transferCodings = 0;
  bool m_knowsCodings = true;
};

ResponseData::~ResponseData() {
  SecureWipe(body);
}

ResponseReader::ResponseReader(bool answersHead)
    : m_answersHead(answersHead), m_header(std::make_unique<ResponseHeaderParser>()) {}

ResponseReader::~ResponseReader() {
  // Bytes of a body may have arrived with those of the header.
  SecureWipe(m_pendingHeader);
}

void ResponseReader::Put(std::string_view bytes) {
  while (!bytes.empty() && !IsComplete()) {
    bytes.remove_prefix(m_stage == Stage::HEADER ? PutHeader(bytes) : PutBody(bytes));
  }
}

/// Uses all bytes, or those up to the header's end; returns how many. The header is parsed when it is complete, so that
/// the result does not depend on the pieces in which it arrives.
std::size_t ResponseReader::PutHeader(std::string_view bytes) {
  constexpr std::string_view END = "\r\n\r\n";
  const std::size_t known = m_pendingHeader.size();
  m_pendingHeader.append(bytes);
  CheckBeginning(m_pendingHeader);
  const std::size_t end = m_pendingHeader.find(END, known - std::min(known, END.size() - 1));
  if (end == std::string::npos) {
    CheckHeaderLength(m_pendingHeader.size());
    return bytes.size();
  }
  const std::size_t length = end + END.size();
  CheckHeaderLength(length);
  m_pendingHeader.resize(length);
  ParseHeader();
  m_pendingHeader.clear();
  return length - known;
}

void ResponseReader::ParseHeader() {
  CompleteStatusLine(m_pendingHeader);
  error_code error;
  m_header->put(boost::asio::buffer(m_pendingHeader), error);
  const bool isRefusal = IsRefusal(m_header->GetData().status);
  if (error && !(isRefusal && IsAboutBody(error))) {
    RefuseHeader(error.message());
  }
  if (isRefusal) {
    m_data = std::move(m_header->GetData());
    m_stage = Stage::COMPLETE;
    return;
  }
  FinishHeader();
}

void ResponseReader::FinishHeader() {
  if (IsInterim(m_header->GetData().status)) {
    if (++m_interimResponses > MAX_INTERIM_RESPONSES) {
      throw HttpException("it follows more than " + std::to_string(MAX_INTERIM_RESPONSES) + " interim responses");
    }
    m_header = std::make_unique<ResponseHeaderParser>();
    return;
  }
  ChooseBody();
  m_data = std::move(m_header->GetData());
  if (m_stage != Stage::COMPLETE) {
    CheckContentCoding();
  }
}

/// Decides how the body ends (RFC 9112, section 6.3), for the statuses whose body is read.
void ResponseReader::ChooseBody() {
  const int status = m_header->GetData().status;
  const bool isChunked = m_header->IsChunked();
  if (m_answersHead || status == NO_CONTENT) {
    m_stage = Stage::COMPLETE;
    return;
  }
  if (isChunked) {
    m_stage = Stage::BODY_IN_CHUNKS;
    return;
  }
  if (!m_header->HasLength()) {
    m_stage = Stage::BODY_TO_END;
    return;
  }
  const std::uint64_t length = m_header->content_length().value_or(0);
  CheckBodyLength(length);
  m_length = static_cast<std::size_t>(length);
  m_header->GetData().body.reserve(std::min(m_length, MAX_RESERVED_BYTES));
  m_stage = m_length == 0 ? Stage::COMPLETE : Stage::BODY_OF_LENGTH;
}

/// Every request states that it accepts no coding. Without this check, encoded content would be treated as text.
void ResponseReader::CheckContentCoding() const {
  for (const auto &[name, value] : m_data.fields) {
    if (EqualsIgnoringCase(name, "Content-Encoding") && !value.empty() && !EqualsIgnoringCase(value, "identity")) {
      throw HttpException("its content (status " + DescribeStatus(m_data) + ") is encoded as \"" +
                          StringUtil::Shorten(value) + "\", which was not asked for");
    }
  }
}

/// Uses all bytes, or those up to the body's end; returns how many.
std::size_t ResponseReader::PutBody(std::string_view bytes) {
  std::string &body = m_data.body;
  if (m_stage == Stage::BODY_IN_CHUNKS) {
    const std::size_t taken = m_chunks.Put(bytes, body);
    if (m_chunks.IsComplete()) {
      m_stage = Stage::COMPLETE;
    }
    return taken;
  }
  if (m_stage == Stage::BODY_TO_END) {
    CheckBodyLength(body.size() + bytes.size());
    AppendWiping(body, bytes);
    return bytes.size();
  }
  const std::string_view data = bytes.substr(0, m_length - body.size());
  AppendWiping(body, data);
  if (body.size() == m_length) {
    m_stage = Stage::COMPLETE;
  }
  return data.size();
}

void ResponseReader::PutEnd() {
  switch (m_stage) {
  case Stage::HEADER:
    throw HttpException(m_pendingHeader.empty() ? "the connection ended before it"
                                                : "the connection ended within its header");
  case Stage::BODY_OF_LENGTH:
    throw HttpException("the connection ended after " + std::to_string(m_data.body.size()) + " of the body's " +
                        std::to_string(m_length) + " bytes");
  case Stage::BODY_IN_CHUNKS:
    throw HttpException("the connection ended within the chunked body");
  case Stage::BODY_TO_END:
    m_stage = Stage::COMPLETE;
    return;
  case Stage::COMPLETE:
    return;
  }
}

ResponseData ResponseReader::Take() {
  return std::move(m_data);
}

} // namespace Tarvel::Http
