// SPDX-License-Identifier: Apache-2.0

#include <tarvel/xml/security/canonicalizer.h>

#include "xml/security/canonical_form.h"

#include <tarvel/core/string_util.h>
#include <tarvel/xml/security/exceptions.h>

#include <utility>

namespace Tarvel::Xml::Security {

namespace {

class CanonicalizerImpl final : public Canonicalizer {
public:
  explicit CanonicalizerImpl(CanonicalizationMethod method) : m_method(std::move(method)) {}

  void Canonicalize(const Node &node, Writer &writer) const override {
    WriteCanonicalForm(node, m_method, nullptr, writer);
  }

private:
  const CanonicalizationMethod m_method;
};

} // namespace

Canonicalizer::~Canonicalizer() = default;

Ref<Canonicalizer> CreateCanonicalizer(std::string_view algorithmUri,
                                       const std::vector<std::string> &inclusivePrefixes) {
  CanonicalizationMethod method;
  if (!FindCanonicalizationMethod(algorithmUri, method)) {
    throw XmlSecurityException("The canonicalization algorithm \"" + StringUtil::Shorten(algorithmUri) +
                               "\" is not accepted");
  }
  if (!method.isExclusive && !inclusivePrefixes.empty()) {
    throw XmlSecurityException("The canonicalization algorithm \"" + StringUtil::Shorten(algorithmUri) +
                               "\" takes no list of inclusive namespaces");
  }
  SetInclusivePrefixes(method, inclusivePrefixes);
  return MakeRef<CanonicalizerImpl>(std::move(method));
}

} // namespace Tarvel::Xml::Security
