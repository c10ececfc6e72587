// SPDX-License-Identifier: Apache-2.0
/// @file
/// HTTP responses: the outcome does not depend on the pieces in which a response arrives; limits are kept; and only the
/// documented exception is thrown.

#include "http/charset.h"
#include "http/response_reader.h"
#include "xml/characters.h"

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

/// The response in `bytes`; nullopt when it is refused.
std::optional<ResponseData> Read(std::string_view bytes, std::size_t pieceLength) {
  ResponseReader reader;
  try {
    while (!bytes.empty()) {
      const std::string_view piece = bytes.substr(0, pieceLength);
      reader.Put(piece);
      bytes.remove_prefix(piece.size());
    }
    reader.PutEnd();
    return reader.Take();
  } catch (const HttpException &refusal) {
    Require(*refusal.what() != '\0');
    return std::nullopt;
  }
}

/// A body that is declared as ISO-8859-1 becomes UTF-8, and not longer than recoding can make it.
void RequireUtf8Of(const ResponseData &response) {
  for (const auto &field : response.fields) {
    Require(Tarvel::Http::FindCharset(field.second).size() <= 40);
  }
  std::string recoded = response.body;
  Tarvel::Http::RecodeToUtf8(recoded, "ISO-8859-1");
  Require(Tarvel::Xml::FindInvalidUtf8(recoded) == std::string_view::npos);
  Require(recoded.size() <= 2 * response.body.size() + 3); // "UTF-8" in place of "l1"
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
  const std::optional<ResponseData> single = Read(bytes, 1);
  if (single) {
    RequireWithinLimits(*single);
    RequireUtf8Of(*single);
  }
  for (const std::size_t pieceLength : {size, std::size_t(3), std::size_t(100)}) {
    const std::optional<ResponseData> pieces = Read(bytes, pieceLength == 0 ? 1 : pieceLength);
    Require(pieces.has_value() == single.has_value());
    if (pieces) {
      Require(pieces->status == single->status);
      Require(pieces->reason == single->reason);
      Require(pieces->fields == single->fields);
      Require(pieces->body == single->body);
    }
  }
  return 0;
}
