// SPDX-License-Identifier: Apache-2.0

#include "proof/key_info_referral.h"

#include "compose/wire_names.h"
#include "model/namespaces.h"
#include "token/saml2_key_info.h"
#include "xml/node_filter_iterator.h"
#include "xml/strict_checks.h"

#include <tarvel/core/exception.h>

#include <memory>
#include <string>
#include <string_view>

namespace SsoClient {

namespace {

using Tarvel::Crypto::VerifyingKey;
using Tarvel::Xml::AsElement;
using Tarvel::Xml::Attribute;
using Tarvel::Xml::ElementNode;
using Tarvel::Xml::Node;

/// Only counts deviations.
class CountingSink final : public DeviationSink {
public:
  bool IsFull() const noexcept override { return true; }
  void Add(Deviation) override { Count(); }
  void Count() noexcept override { ++count; }

  std::size_t count = 0;
};

/// A cursor on `element`. The filter has no state, so one is enough.
NodeFilterIterator CursorOn(const ElementNode &element) {
  static const SkipWsAndCommentsFilter filter;
  return {&element, std::shared_ptr<const NodeFilter>(std::shared_ptr<void>(), &filter)};
}

/// What two parts together refer to.
KeyReferral Join(KeyReferral left, KeyReferral right) {
  if (left == right || right == KeyReferral::NOTHING) {
    return left;
  }
  if (left == KeyReferral::NOTHING) {
    return right;
  }
  const bool hasOtherToken = left == KeyReferral::OTHER_TOKEN || right == KeyReferral::OTHER_TOKEN;
  return hasOtherToken ? KeyReferral::OTHER_TOKEN : KeyReferral::SEVERAL;
}

/// What the child elements of `parent` together refer to.
template <typename Refer>
KeyReferral JoinChildren(const ElementNode &parent, const Refer &refer) {
  KeyReferral joined = KeyReferral::NOTHING;
  for (const Node *child = parent.GetFirstChild(); child; child = child->GetNextSibling()) {
    if (const ElementNode *const element = AsElement(child)) {
      joined = Join(joined, refer(*element));
    }
  }
  return joined;
}

/// Whether a value type or a token type is that of any version of SAML, in one of the spellings that are in use.
bool IsSamlType(std::string_view uri) {
  return uri.find("saml-token") != std::string_view::npos || uri.starts_with("urn:oasis:names:tc:SAML");
}

bool IsTypeOfToken(std::string_view tokenType) {
  return tokenType == WireNames::SAML_TOKEN_TYPE || tokenType == WireNames::SAML_TOKEN_TYPE_AS_PUBLISHED;
}

KeyReferral OtherThanToken(bool isSaml) {
  return isSaml ? KeyReferral::OTHER_TOKEN : KeyReferral::OTHER_KEY;
}

bool HasText(const ElementNode &element, const std::string &wanted) {
  CountingSink sink;
  std::string text;
  return RequireTextualContent(CursorOn(element), text, sink) && text == wanted;
}

/// What one child of a `wsse:SecurityTokenReference` refers to.
KeyReferral ReferTo(const ElementNode &child, const std::string &tokenId, bool isSaml) {
  const std::string_view valueType = GetTextAttribute(child, "ValueType");
  if (child.HasQName(Namespaces::WSSE, "KeyIdentifier") && valueType == WireNames::SAML_ID) {
    return HasText(child, tokenId) ? KeyReferral::TOKEN : KeyReferral::OTHER_TOKEN;
  }
  if (child.HasQName(Namespaces::WSSE, "Reference")) {
    const std::string_view uri = GetTextAttribute(child, "URI");
    if (uri.starts_with('#') && uri.substr(1) == tokenId) {
      return KeyReferral::TOKEN;
    }
  }
  return OtherThanToken(isSaml || IsSamlType(valueType) || child.FindChildElement("Assertion"));
}

KeyReferral ReferToToken(const ElementNode &reference, const std::string &tokenId) {
  const Attribute *const tokenType = reference.FindAttribute(Namespaces::WSSE11, "TokenType");
  const bool isSaml = tokenType && IsSamlType(tokenType->GetValue());
  const KeyReferral referral =
      JoinChildren(reference, [&](const ElementNode &child) { return ReferTo(child, tokenId, isSaml); });
  if (referral == KeyReferral::NOTHING) {
    return OtherThanToken(isSaml);
  }
  const bool isOfOtherType = tokenType && !IsTypeOfToken(tokenType->GetValue());
  return referral == KeyReferral::TOKEN && isOfOtherType ? KeyReferral::OTHER_TOKEN : referral;
}

bool StatesKey(const ElementNode &child) {
  return child.HasQName(Namespaces::DS, "X509Data") || child.HasQName(Namespaces::DS, "KeyValue");
}

/// Whether the key that `keyInfo` states is `key`. False if it cannot be read, or is more than one key.
bool HasKey(const ElementNode &keyInfo, const VerifyingKey &key) {
  CountingSink sink;
  ConfirmationDetails details;
  ParseKeyInfo(CursorOn(keyInfo), details, sink);
  if (sink.count != 0 || details.publicKey.empty()) {
    return false;
  }
  if (details.publicKey == key.GetSubjectPublicKey()) {
    return true;
  }
  try {
    return Tarvel::Crypto::IsSameKey(*Tarvel::Crypto::CreateVerifyingKey(details.publicKey), key);
  } catch (const Tarvel::Crypto::CryptoException &) { // a key of a kind that cannot be read is another key
    return false;
  }
}

} // namespace

KeyReferral FindKeyReferral(const ElementNode &signature, const SamlToken &token, const VerifyingKey *key) {
  bool isKeyRead = false;
  return JoinChildren(signature, [&](const ElementNode &keyInfo) {
    if (!keyInfo.HasQName(Namespaces::DS, "KeyInfo")) {
      return KeyReferral::NOTHING;
    }
    bool statesKey = false;
    const KeyReferral referral = JoinChildren(keyInfo, [&](const ElementNode &child) {
      if (child.HasQName(Namespaces::WSSE, "SecurityTokenReference")) {
        return ReferToToken(child, token.GetId());
      }
      const bool isKey = StatesKey(child);
      statesKey = statesKey || isKey;
      return isKey ? KeyReferral::NOTHING : KeyReferral::OTHER_KEY;
    });
    if (!statesKey) {
      return referral;
    }
    // Keys take long to read. A stranger can write tens of thousands of ds:KeyInfo, but no right signature has two of them.
    const bool isTokenKey = key && !isKeyRead && HasKey(keyInfo, *key);
    isKeyRead = true;
    return Join(referral, isTokenKey ? KeyReferral::TOKEN : KeyReferral::OTHER_KEY);
  });
}

} // namespace SsoClient
