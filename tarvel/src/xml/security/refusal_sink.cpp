// SPDX-License-Identifier: Apache-2.0

#include "xml/security/refusal_sink.h"

#include <tarvel/xml/security/exceptions.h>

namespace Tarvel::Xml::Security {

namespace {

class Thrower final : public RefusalSink {
public:
  SignatureReport::Refusal &Add(SignatureRule, const std::string &message, const ElementNode *) override {
    throw XmlSecurityException(message);
  }
};

} // namespace

RefusalSink &ThrowingSink() noexcept {
  static Thrower sink;
  return sink;
}

} // namespace Tarvel::Xml::Security
