// SPDX-License-Identifier: Apache-2.0

#include "token/saml2_details.h"

#include "model/namespaces.h"
#include "token/saml2_form.h"
#include "xml/node_filter_iterator.h"

#include <ssoclient/exceptions.h>
#include <tarvel/io/writer.h>
#include <tarvel/xml/security/canonicalizer.h>
#include <tarvel/xml/security/exceptions.h>

#include <string_view>
#include <utility>

namespace SsoClient {

namespace {

using Tarvel::Xml::AsElement;
using Tarvel::Xml::AsText;
using Tarvel::Xml::Attribute;
using Tarvel::Xml::ElementNode;
using Tarvel::Xml::Node;
using Tarvel::Xml::Security::Canonicalizer;

/// Receives the canonical forms one after the other. Together they have a limit: each repeats the namespaces that it
/// uses, so they can be much longer than the document.
class ValueWriter final : public Tarvel::Writer {
public:
  void Write(std::string_view bytes) override {
    if (bytes.size() > m_left) {
      throw ParseException("The attribute values that contain elements are too long");
    }
    m_left -= bytes.size();
    m_text += bytes;
  }

  std::string TakeText() { return std::exchange(m_text, std::string()); }

private:
  std::string m_text;
  std::size_t m_left = MAX_XML_VALUE_BYTES;
};

bool HasElement(const ElementNode &value) {
  for (const Node *child = value.GetFirstChild(); child; child = child->GetNextSibling()) {
    if (AsElement(child)) {
      return true;
    }
  }
  return false;
}

bool IsNil(const ElementNode &value) {
  const Attribute *const nil = value.FindAttribute(Namespaces::XSI, "nil");
  return nil && (nil->GetValue() == "true" || nil->GetValue() == "1");
}

/// The text that the parsers read or, if there is only white space, that white space.
std::string TextOf(const ElementNode &element) {
  const SkipWsAndCommentsFilter filter;
  std::string whiteSpace;
  for (const Node *child = element.GetFirstChild(); child; child = child->GetNextSibling()) {
    if (const Tarvel::Xml::TextNode *const text = AsText(child)) {
      if (filter.Accept(*text)) {
        return std::string(text->GetValue());
      }
      whiteSpace += text->GetValue();
    }
  }
  return whiteSpace;
}

/// Reads the values of attributes.
class ValueReader {
public:
  AttributeValue Read(const ElementNode &element) {
    AttributeValue value;
    value.isNil = IsNil(element);
    value.isXml = HasElement(element);
    value.text = value.isXml ? CanonicalText(element) : TextOf(element);
    return value;
  }

private:
  std::string CanonicalText(const ElementNode &element) {
    if (!m_canonicalizer) {
      m_canonicalizer =
          Tarvel::Xml::Security::CreateCanonicalizer(Tarvel::Xml::Security::CanonicalizationUri::EXCLUSIVE);
    }
    m_canonicalizer->Canonicalize(element, m_writer);
    return m_writer.TakeText();
  }

  Tarvel::Ref<Canonicalizer> m_canonicalizer; // made when the first value needs it
  ValueWriter m_writer;
};

SamlAttribute ReadAttribute(const ElementNode &element, ValueReader &reader) {
  SamlAttribute attribute;
  attribute.name = ReadOptionalText(element, "Name").value_or(std::string());
  attribute.nameFormat = ReadOptionalText(element, "NameFormat");
  attribute.friendlyName = ReadOptionalText(element, "FriendlyName");
  for (const Node *child = element.GetFirstChild(); child; child = child->GetNextSibling()) {
    if (const ElementNode *const value = AsElement(child)) {
      attribute.values.push_back(reader.Read(*value));
    }
  }
  return attribute;
}

/// Empties the values with a signature. It could be that of a bearer token, which a report must not repeat. The token may
/// be there as elements, or as their text.
void RemoveSignatures(std::vector<SamlAttribute> &attributes) {
  for (SamlAttribute &attribute : attributes) {
    for (AttributeValue &value : attribute.values) {
      if (value.text.find("SignatureValue") != std::string::npos) {
        value.text.clear();
      }
    }
  }
}

} // namespace

NameId ReadNameId(const ElementNode &element) {
  return {TextOf(element), ReadOptionalText(element, "Format"), ReadOptionalText(element, "NameQualifier"),
          ReadOptionalText(element, "SPNameQualifier"), ReadOptionalText(element, "SPProvidedID")};
}

std::vector<SamlAttribute> ReadAttributes(const AttributeStatementType &statement) {
  ValueReader reader;
  std::vector<SamlAttribute> attributes;
  attributes.reserve(statement.attributes.size());
  for (const AttributeType &attribute : statement.attributes) {
    attributes.push_back(ReadAttribute(*attribute.element, reader));
  }
  return attributes;
}

TokenDetails TakeDetails(Saml2Assertion &assertion) {
  if (assertion.common.AttributeStatement) {
    assertion.details.attributes = ReadAttributes(*assertion.common.AttributeStatement);
  }
  return std::move(assertion.details);
}

TokenDetails TakeDetailsOfClaims(Saml2Assertion &assertion) {
  try {
    TokenDetails details = TakeDetails(assertion);
    RemoveSignatures(details.attributes);
    return details;
  } catch (const ParseException &) {
    return std::move(assertion.details);
  } catch (const Tarvel::Xml::Security::XmlSecurityException &) {
    return std::move(assertion.details);
  }
}

} // namespace SsoClient
