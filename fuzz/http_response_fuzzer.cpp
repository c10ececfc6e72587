// SPDX-License-Identifier: Apache-2.0
/// @file
/// HTTP responses: whatever the pieces in which a response comes, the outcome is the same; limits hold; and nothing but
/// the documented exception comes out.

#include "http/response_reader.h"

#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <optional>
#include <string>
#include <string_view>

namespace {

using Tarvel::Http::HttpException;
using Tarvel::Http::ResponseData;
using Tarvel::Http::ResponseReader;

void Require(bool condition) {
  if (!condition) {
    std::abort();
  }
}

/// What came of `bytes`; none for a refusal. Bytes after the end are refused only as far as they have come, so only what
/// stands before them is fed.
struct Outcome {
  std::optional<ResponseData> response;
  std::size_t taken = 0;
};

Outcome Read(std::string_view bytes, std::size_t pieceLength) {
  Outcome outcome;
  ResponseReader reader;
  try {
    while (outcome.taken < bytes.size() && !reader.IsComplete()) {
      const std::string_view piece = bytes.substr(outcome.taken, pieceLength);
      reader.Put(piece);
      outcome.taken += piece.size();
    }
    reader.PutEnd();
    outcome.response = reader.Take();
  } catch (const HttpException &refusal) {
    Require(*refusal.what() != '\0');
  }
  return outcome;
}

void RequireWithinLimits(const ResponseData &response) {
  Require(response.status >= 100 && response.status <= 999);
  Require(response.body.size() <= Tarvel::Http::MAX_BODY_BYTES);
  std::size_t header = response.reason.size();
  for (const auto &[name, value] : response.fields) {
    Require(Tarvel::Http::IsToken(name));
    header += name.size() + value.size();
  }
  Require(header <= Tarvel::Http::MAX_HEADER_BYTES);
}

} // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t *data, std::size_t size) {
  const std::string_view bytes(reinterpret_cast<const char *>(data), size);
  const Outcome single = Read(bytes, 1);
  if (single.response) {
    RequireWithinLimits(*single.response);
  }
  for (const std::size_t pieceLength : {size, std::size_t(3), std::size_t(100)}) {
    // After its last byte a response is complete, and the pieces below must not reach beyond it.
    const Outcome pieces =
        Read(single.response ? bytes.substr(0, single.taken) : bytes, pieceLength == 0 ? 1 : pieceLength);
    Require(pieces.response.has_value() == single.response.has_value());
    if (pieces.response) {
      Require(pieces.response->status == single.response->status);
      Require(pieces.response->reason == single.response->reason);
      Require(pieces.response->fields == single.response->fields);
      Require(pieces.response->body == single.response->body);
    }
  }
  return 0;
}
