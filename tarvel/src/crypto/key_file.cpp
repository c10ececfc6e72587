// SPDX-License-Identifier: Apache-2.0

#include "crypto/key_file.h"

#include <tarvel/core/string_util.h>
#include <tarvel/io/file_reader.h>

namespace Tarvel::Crypto {

namespace {

constexpr std::size_t MAX_FILE_BYTES = std::size_t{16} << 20;

} // namespace

KeyFileText::KeyFileText(const std::string &path) : m_text(OpenFile(path)->ReadToEnd(MAX_FILE_BYTES)) {
  if (m_text.size() > MAX_FILE_BYTES) {
    SecureWipe(m_text);
    throw CryptoException(StringUtil::Shorten(path) + ": file is longer than " + std::to_string(MAX_FILE_BYTES) +
                          " bytes");
  }
}

} // namespace Tarvel::Crypto
