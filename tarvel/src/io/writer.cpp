// SPDX-License-Identifier: Apache-2.0

#include <tarvel/io/writer.h>

#include <tarvel/core/secret_text.h>

namespace Tarvel {

namespace {

class StringWriterImpl final : public StringWriter {
public:
  void Write(std::string_view bytes) override { m_text.Append(bytes); }
  const std::string &GetText() const override { return m_text.Get(); }
  std::string TakeText() override { return m_text.Take(); }

private:
  SecretText m_text; // may be a request that contains a password
};

} // namespace

Writer::~Writer() = default;

StringWriter::~StringWriter() = default;

Ref<StringWriter> CreateStringWriter() {
  return MakeRef<StringWriterImpl>();
}

} // namespace Tarvel
