// SPDX-License-Identifier: Apache-2.0

#include <tarvel/io/writer.h>

#include <utility>

namespace Tarvel {

namespace {

class StringWriterImpl final : public StringWriter {
public:
  void Write(std::string_view bytes) override { m_text += bytes; }
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
