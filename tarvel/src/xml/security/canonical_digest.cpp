// SPDX-License-Identifier: Apache-2.0

#include "xml/security/canonical_digest.h"

#include <tarvel/io/writer.h>

namespace Tarvel::Xml::Security {

namespace {

class DigestWriter final : public Writer {
public:
  explicit DigestWriter(Crypto::DigestAlgorithm algorithm) : m_digest(algorithm) {}

  void Write(std::string_view bytes) override { m_digest.Update(bytes); }
  void Finish(std::uint8_t *out) { m_digest.Finish(out); }

private:
  Crypto::Digest m_digest;
};

} // namespace

DigestValue DigestCanonicalForm(const Node &apex, const CanonicalizationMethod &method, const Node *omitted,
                                Crypto::DigestAlgorithm algorithm) {
  DigestWriter writer(algorithm);
  WriteCanonicalForm(apex, method, omitted, writer);
  DigestValue value{};
  writer.Finish(value.data());
  return value;
}

} // namespace Tarvel::Xml::Security
