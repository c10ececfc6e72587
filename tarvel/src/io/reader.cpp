// SPDX-License-Identifier: Apache-2.0

#include <tarvel/io/reader.h>

#include "core/wiped_growth.h"

#include <tarvel/core/secure_wipe.h>

#include <array>
#include <utility>

namespace Tarvel {

namespace {

constexpr std::size_t CHUNK_LENGTH = 16 * 1024;

/// What is read may be a response with a token in it: it is overwritten, unless it was taken.
class StringReaderImpl final : public Reader {
public:
  explicit StringReaderImpl(std::string &&text) noexcept : m_text(std::move(text)) {}
  ~StringReaderImpl() override { SecureWipe(m_text); }

  std::size_t Read(char *buffer, std::size_t length) override {
    const std::size_t count = m_text.copy(buffer, length, m_position);
    m_position += count;
    return count;
  }

  std::string ReadToEnd(std::size_t) override {
    std::string rest = std::exchange(m_text, std::string());
    rest.erase(0, std::exchange(m_position, 0));
    return rest;
  }

private:
  std::string m_text;
  std::size_t m_position = 0;
};

} // namespace

Reader::~Reader() = default;

std::string Reader::ReadToEnd(std::size_t maximumBytes) {
  std::string text;
  std::array<char, CHUNK_LENGTH> chunk;
  try {
    while (text.size() <= maximumBytes) {
      const std::size_t count = Read(chunk.data(), chunk.size());
      if (count == 0) {
        break;
      }
      AppendWiping(text, {chunk.data(), count});
    }
  } catch (...) {
    SecureWipe(text);
    SecureWipe(chunk.data(), chunk.size());
    throw;
  }
  SecureWipe(chunk.data(), chunk.size());
  return text;
}

std::string Reader::GetDeclaredCharset() const {
  return {};
}

Ref<Reader> CreateStringReader(std::string text) {
  return MakeRef<StringReaderImpl>(std::move(text));
}

} // namespace Tarvel
