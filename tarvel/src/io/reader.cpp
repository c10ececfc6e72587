// SPDX-License-Identifier: Apache-2.0

#include <tarvel/io/reader.h>

#include <tarvel/core/secret_text.h>
#include <tarvel/core/secure_wipe.h>

#include <array>
#include <utility>

namespace Tarvel {

namespace {

constexpr std::size_t CHUNK_LENGTH = 16 * 1024;

/// Memory for one read. The destructor overwrites it.
struct Chunk {
  Chunk() = default;
  Chunk(const Chunk &) = delete;
  Chunk &operator=(const Chunk &) = delete;
  ~Chunk() { SecureWipe(bytes.data(), bytes.size()); }

  std::array<char, CHUNK_LENGTH> bytes;
};

class StringReaderImpl final : public Reader {
public:
  explicit StringReaderImpl(std::string &&text) noexcept : m_text(std::move(text)) {}

  std::size_t Read(char *buffer, std::size_t length) override {
    const std::size_t count = m_text.Get().copy(buffer, length, m_position);
    m_position += count;
    return count;
  }

  std::string ReadToEnd(std::size_t) override {
    std::string rest = m_text.Take();
    rest.erase(0, std::exchange(m_position, 0));
    return rest;
  }

private:
  SecretText m_text; // may be a response that contains a token
  std::size_t m_position = 0;
};

} // namespace

Reader::~Reader() = default;

std::string Reader::ReadToEnd(std::size_t maximumBytes) {
  SecretText text;
  Chunk chunk;
  while (text.Get().size() <= maximumBytes) {
    const std::size_t count = Read(chunk.bytes.data(), chunk.bytes.size());
    if (count == 0) {
      break;
    }
    text.Append({chunk.bytes.data(), count});
  }
  return text.Take();
}

std::string Reader::GetDeclaredCharset() const {
  return {};
}

Ref<Reader> CreateStringReader(std::string text) {
  return MakeRef<StringReaderImpl>(std::move(text));
}

} // namespace Tarvel
