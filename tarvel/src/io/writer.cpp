// SPDX-License-Identifier: Apache-2.0

#include <tarvel/io/writer.h>

#include "core/wiped_growth.h"

#include <tarvel/core/secure_wipe.h>

#include <utility>

namespace Tarvel {

namespace {

/// What is written may be a request with a password in it, so no copy of it is left behind in the heap: neither the text
/// that was not taken, nor the shorter memory that it outgrew.
class StringWriterImpl final : public StringWriter {
public:
  ~StringWriterImpl() override { SecureWipe(m_text); }

  void Write(std::string_view bytes) override { AppendWiping(m_text, bytes); }
  const std::string &GetText() const override { return m_text; }
  std::string TakeText() override { return std::exchange(m_text, std::string()); }

private:
  std::string m_text;
};

} // namespace

Writer::~Writer() = default;

StringWriter::~StringWriter() = default;

Ref<StringWriter> CreateStringWriter() {
  return MakeRef<StringWriterImpl>();
}

} // namespace Tarvel
