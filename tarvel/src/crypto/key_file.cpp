// SPDX-License-Identifier: Apache-2.0

#include "crypto/key_file.h"

#include <tarvel/core/string_util.h>
#include <tarvel/io/file_reader.h>

namespace Tarvel::Crypto {

namespace {

constexpr std::size_t MAX_FILE_BYTES = std::size_t{16} << 20;

} // namespace

SecretText ReadKeyFile(const std::string &path) {
  SecretText text(OpenFile(path)->ReadToEnd(MAX_FILE_BYTES));
  if (text.Get().size() > MAX_FILE_BYTES) {
    throw CryptoException(StringUtil::Shorten(path) + ": file is longer than " + std::to_string(MAX_FILE_BYTES) +
                          " bytes");
  }
  return text;
}

} // namespace Tarvel::Crypto
