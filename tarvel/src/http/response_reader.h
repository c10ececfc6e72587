// SPDX-License-Identifier: Apache-2.0
/// @file
/// Reads one whole response from the bytes of a connection.

#pragma once

#include "http/chunked_body.h"
#include "http/header_syntax.h"

#include <tarvel/http/user_agent.h>

#include <cstddef>
#include <memory>
#include <string>
#include <string_view>

namespace Tarvel::Http {

/// The body is secret, and the destructor wipes it. The body is not a `SecretText`, because it is passed on as a string
/// without a copy, which might be 16 MiB long.
struct ResponseData {
  ResponseData() = default;
  ResponseData(const ResponseData &) = delete;
  ResponseData &operator=(const ResponseData &) = delete;
  ResponseData(ResponseData &&) noexcept = default;
  ResponseData &operator=(ResponseData &&) noexcept = default; ///< the old body must be empty: it is not wiped
  ~ResponseData();

  int status = 0;
  std::string reason;
  HeaderFields fields; ///< of the header; those of a trailer are dropped
  std::string body;
};

class ResponseHeaderParser;

/// Reads the final response to one request, in pieces of any size, and skips interim ones (1xx except 101). It is
/// strict where leniency would let two parties read the same bytes differently, or treat a part as the whole. With a
/// status other than 2xx and 500 the response is complete after its header, whatever the header says about a body. The
/// messages of the exceptions are parts of sentences, which the caller completes. After an exception the reader must
/// not be used again.
class ResponseReader {
public:
  /// @param answersHead whether the request's method is HEAD, so that no body follows whatever the header says.
  explicit ResponseReader(bool answersHead = false);
  ResponseReader(const ResponseReader &) = delete;
  ResponseReader &operator=(const ResponseReader &) = delete;
  ~ResponseReader();

  /// Reads the next bytes of the connection. Bytes after the response's end are dropped: every request asks the server
  /// to close the connection after the response.
  /// @throws HttpException when the bytes are not a response, contradict themselves, or are over a limit.
  void Put(std::string_view bytes);

  /// Must be called at the orderly end of the connection, which also ends a body without a length.
  /// @throws HttpException when the response is not complete at that point.
  void PutEnd();

  bool IsComplete() const noexcept { return m_stage == Stage::COMPLETE; }

  /// Whether the response is complete when the connection ends.
  bool EndsWithConnection() const noexcept { return m_stage == Stage::BODY_TO_END; }

  /// The response that was read. Must be called once, when the response is complete.
  ResponseData Take();

private:
  enum class Stage { HEADER, BODY_OF_LENGTH, BODY_IN_CHUNKS, BODY_TO_END, COMPLETE };

  std::size_t PutHeader(std::string_view bytes);
  std::size_t PutBody(std::string_view bytes);
  void FinishHeader();
  void ParseHeader();
  void ChooseBody();
  void CheckContentCoding() const;

  const bool m_answersHead;
  Stage m_stage = Stage::HEADER;
  std::unique_ptr<ResponseHeaderParser> m_header;
  std::string m_pendingHeader; // of the response that is being read
  int m_interimResponses = 0;
  std::size_t m_length = 0; // of the body, if the header states it
  ChunkedBodyDecoder m_chunks;
  ResponseData m_data;
};

} // namespace Tarvel::Http
