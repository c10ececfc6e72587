// SPDX-License-Identifier: Apache-2.0
// Long because each function writes one kind of element of the standard's schema, and they belong together.

#include "generated_assertion.h"

#include <cstddef>
#include <set>
#include <string_view>
#include <vector>

namespace Testing {

namespace {

constexpr std::string_view SIGNATURE =
    "<ds:Signature xmlns:ds=\"http://www.w3.org/2000/09/xmldsig#\"><ds:SignedInfo>"
    "<ds:CanonicalizationMethod Algorithm=\"http://www.w3.org/2001/10/xml-exc-c14n#\"/>"
    "<ds:SignatureMethod Algorithm=\"http://www.w3.org/2001/04/xmldsig-more#rsa-sha256\"/><ds:Reference URI=\"#_g\">"
    "<ds:Transforms><ds:Transform Algorithm=\"http://www.w3.org/2000/09/xmldsig#enveloped-signature\"/>"
    "<ds:Transform Algorithm=\"http://www.w3.org/2001/10/xml-exc-c14n#\"/></ds:Transforms>"
    "<ds:DigestMethod Algorithm=\"http://www.w3.org/2001/04/xmlenc#sha256\"/><ds:DigestValue/></ds:Reference>"
    "</ds:SignedInfo><ds:SignatureValue/></ds:Signature>";

constexpr std::string_view TEXTS[] = {"a",
                                      "alice",
                                      "alice@corp.example",
                                      "Alice",
                                      "CORP\\alice",
                                      "urn:x",
                                      "x y",
                                      "https://a.example/",
                                      "0",
                                      "gr\xC3\xBCn",
                                      "\xE2\x80\xAE",
                                      "{}",
                                      "--",
                                      "]]",
                                      "\xF0\x9F\x98\x80"};
constexpr std::string_view URIS[] = {"urn:a", "urn:b", "https://files.corp.example/", "urn:x:A", "a", "#b", "\xC3\xBC"};
constexpr std::string_view FORMATS[] = {"urn:oasis:names:tc:SAML:1.1:nameid-format:unspecified",
                                        "urn:oasis:names:tc:SAML:1.1:nameid-format:emailAddress",
                                        "urn:oasis:names:tc:SAML:2.0:nameid-format:persistent",
                                        "urn:oasis:names:tc:SAML:2.0:nameid-format:transient",
                                        "http://schemas.xmlsoap.org/claims/UPN",
                                        "urn:x"};
// In ascending order. The time of the tests is between the fourth and the fifth.
constexpr std::string_view TIMES[] = {
    "2001-02-03T04:05:06.000Z", "2010-01-01T00:00:00.000Z", "2020-01-01T00:00:00.000Z", "2025-12-31T23:59:59.999Z",
    "2026-06-01T00:00:00.000Z", "2030-01-01T00:00:00.000Z", "2040-12-31T00:00:00.000Z", "2120-01-01T00:00:00.000Z"};
constexpr std::size_t FIRST_FUTURE = 4;
constexpr std::string_view BETWEEN[] = {"", "", "", " ", "\n  ", "<!-- c -->", "\t<!--ID='_g'-->\n"};

/// Builds the assertion from its first to its last element. Most functions are named after the element that they add.
class Writer {
public:
  explicit Writer(RandomSource &random) : m_random(random) {}

  GeneratedAssertion Write();

private:
  bool Maybe(std::size_t times = 2) { return m_random.OnceIn(times); }
  std::size_t UpTo(std::size_t most) { return m_random.Below(most + 1); }
  std::string Text() { return std::string(m_random.OneOf(TEXTS)); }
  std::string Uri() { return std::string(m_random.OneOf(URIS)); }
  void Between() { m_xml += m_random.OneOf(BETWEEN); }
  std::size_t Past() { return m_random.Below(FIRST_FUTURE); }
  std::size_t Future() { return FIRST_FUTURE + m_random.Below(std::size(TIMES) - FIRST_FUTURE); }

  void Refuse(std::string_view why) { m_refusal += m_refusal.empty() ? std::string(why) : std::string(); }

  void Attribute(std::string_view name, std::string_view value) {
    m_xml.append(" ").append(name).append("=\"").append(value).append("\"");
  }
  /// Adds an attribute to the XML, and its fact to `description`.
  void Fact(std::string &description, std::string_view name, std::string_view label, std::string_view value) {
    Attribute(name, value);
    description.append(" ").append(label).append(" {").append(value).append("}");
  }
  void Time(std::string &description, std::string_view name, std::string_view label, std::size_t index) {
    Attribute(name, TIMES[index]);
    description.append(" ").append(label).append(" ").append(TIMES[index]);
  }
  /// Adds an element with a text to the XML, and its fact to `description`.
  void Leaf(std::string &description, std::string_view name, std::string_view label, std::string_view text) {
    m_xml.append("<s:").append(name).append(">").append(text).append("</s:").append(name).append(">");
    description.append(" ").append(label).append(" {").append(text).append("}");
    Between();
  }

  std::string Name(std::string_view element, const std::string &value);
  void Subject();
  bool Confirmation();
  void Conditions();
  void Condition(bool &hasOneTimeUse, bool &hasProxy);
  std::string Audiences(std::size_t least);
  void Advice();
  void Statement();
  void AuthnStatement();
  void AttributeStatement();
  void Value();

  RandomSource &m_random;
  std::string m_xml;
  std::string m_refusal;
  std::string m_subject;
  std::string m_subjectName;
  std::string m_restrictions;
  std::string m_oneTimeUse;
  std::string m_proxy;
  std::string m_authn;
  std::string m_attributes;
};

/// Adds the element, and returns its description. The value is not escaped, so it must not contain a special character.
std::string Writer::Name(std::string_view element, const std::string &value) {
  std::string format;
  std::string qualifiers;
  m_xml.append("<s:").append(element);
  if (Maybe(6)) {
    m_xml += " xmlns:i=\"http://www.w3.org/2001/XMLSchema-instance\" i:type=\"s:NameIDType\"";
  }
  if (Maybe()) {
    Fact(format, "Format", "format", m_random.OneOf(FORMATS));
  }
  if (Maybe(3)) {
    Fact(qualifiers, "NameQualifier", "name-qualifier", Text());
  }
  if (Maybe(3)) {
    Fact(qualifiers, "SPNameQualifier", "sp-name-qualifier", Text());
  }
  if (Maybe(3)) {
    Fact(qualifiers, "SPProvidedID", "sp-provided-id", Text());
  }
  m_xml.append(">").append(value).append("</s:").append(element).append(">");
  Between();
  return " value {" + value + '}' + format + qualifiers + '\n';
}

void Writer::Subject() {
  m_xml += "<s:Subject>";
  Between();
  m_subjectName = Text();
  m_subject = "subject" + Name("NameID", m_subjectName);
  bool isUsable = false;
  for (std::size_t count = 1 + UpTo(3); count > 0; --count) {
    isUsable = Confirmation() || isUsable;
  }
  if (!isUsable) {
    Refuse("no usable confirmation");
  }
  m_xml += "</s:Subject>";
}

/// Adds a confirmation. Returns whether it can be used.
bool Writer::Confirmation() {
  const bool isBearer = !Maybe(4);
  const std::string method = isBearer ? "urn:oasis:names:tc:SAML:2.0:cm:bearer" : "urn:x:method";
  bool fits = isBearer;
  m_xml += "<s:SubjectConfirmation Method=\"" + method + "\"";
  m_subject += "confirmation {" + method + '}';
  if (Maybe(3)) {
    m_xml += "/>";
    m_subject += '\n';
    return fits;
  }
  m_xml += "><s:SubjectConfirmationData";
  if (Maybe(3)) {
    const std::size_t index = Maybe(4) ? Future() : Past();
    fits = fits && index < FIRST_FUTURE;
    Time(m_subject, "NotBefore", "not-before", index);
  }
  if (Maybe(3)) {
    const std::size_t index = Maybe(4) ? Past() : Future();
    fits = fits && index >= FIRST_FUTURE;
    Time(m_subject, "NotOnOrAfter", "not-on-or-after", index);
  }
  if (Maybe(3)) {
    Fact(m_subject, "Recipient", "recipient", Uri());
  }
  if (Maybe(3)) {
    Fact(m_subject, "InResponseTo", "in-response-to", "_r");
  }
  if (Maybe(3)) {
    Fact(m_subject, "Address", "address", Text());
  }
  m_xml += Maybe(3) ? " x:a=\"1\" xmlns:x=\"urn:x\"><x:b/>text<x:c></x:c>" : ">";
  m_xml += "</s:SubjectConfirmationData></s:SubjectConfirmation>";
  m_subject += '\n';
  Between();
  return fits;
}

std::string Writer::Audiences(std::size_t least) {
  std::set<std::string> audiences;
  for (std::size_t count = least + UpTo(2); count > 0; --count) {
    const std::string audience = Uri();
    m_xml += "<s:Audience>" + audience + "</s:Audience>";
    Between();
    audiences.insert(audience);
  }
  std::string description;
  for (const std::string &audience : audiences) {
    description += " {" + audience + '}';
  }
  return description + '\n';
}

void Writer::Condition(bool &hasOneTimeUse, bool &hasProxy) {
  switch (m_random.Below(12)) {
  case 0:
    m_xml += "<s:OneTimeUse/>";
    m_oneTimeUse = "one-time-use\n";
    if (hasOneTimeUse) {
      Refuse("OneTimeUse twice");
    }
    hasOneTimeUse = true;
    break;
  case 1: {
    const std::string count = std::to_string(UpTo(3));
    const bool hasCount = Maybe();
    m_xml += "<s:ProxyRestriction" + (hasCount ? " Count=\"" + count + "\">" : std::string(">"));
    m_proxy = "proxy" + (hasCount ? " count " + count : std::string()) + Audiences(0);
    m_xml += "</s:ProxyRestriction>";
    if (hasProxy) {
      Refuse("ProxyRestriction twice");
    }
    hasProxy = true;
    break;
  }
  case 2:
    if (Maybe(6)) {
      m_xml += "<s:Condition xmlns:i=\"http://www.w3.org/2001/XMLSchema-instance\" i:type=\"r:RenewRestrictionType\" "
               "xmlns:r=\"http://www.rsa.com/names/2009/12/std-ext/SAML2.0\" Count=\"1\"/>";
      if (m_refusal.empty() && m_xml.find("r:RenewRestrictionType") != m_xml.rfind("r:RenewRestrictionType")) {
        Refuse("RenewRestriction twice");
      }
    }
    break;
  default:
    m_xml += "<s:AudienceRestriction>";
    Between();
    m_restrictions += "audiences" + Audiences(1);
    m_xml += "</s:AudienceRestriction>";
  }
  Between();
}

void Writer::Conditions() {
  m_xml += "<s:Conditions";
  std::string ignored;
  if (Maybe(8)) {
    Time(ignored, "NotBefore", "", Future());
    Refuse("starts later");
  } else if (Maybe()) {
    Time(ignored, "NotBefore", "", Past());
  }
  if (Maybe(12)) {
    Refuse("no end");
  } else {
    Time(ignored, "NotOnOrAfter", "", Maybe(12) ? (Refuse("ended"), Past()) : Future());
  }
  m_xml += ">";
  Between();
  bool hasOneTimeUse = false;
  bool hasProxy = false;
  for (std::size_t count = UpTo(4); count > 0; --count) {
    Condition(hasOneTimeUse, hasProxy);
  }
  m_xml += "</s:Conditions>";
}

void Writer::Advice() {
  m_xml += "<s:Advice>";
  for (std::size_t count = UpTo(3); count > 0; --count) {
    Between();
    switch (m_random.Below(4)) {
    case 0:
      m_xml += "<s:AssertionIDRef>_a</s:AssertionIDRef>";
      break;
    case 1:
      m_xml += "<s:AssertionURIRef>urn:x</s:AssertionURIRef>";
      break;
    case 2:
      m_xml +=
          "<s:Assertion ID=\"_n" + std::to_string(m_xml.size()) +
          "\" Version=\"2.0\" IssueInstant=\"2020-01-01T00:00:00Z\"><s:Issuer>urn:x</s:Issuer><s:Subject><s:NameID>"
          "mallory</s:NameID></s:Subject></s:Assertion>";
      break;
    default:
      m_xml += "<x:any xmlns:x=\"urn:x\" ID=\"_h" + std::to_string(m_xml.size()) + "\">text<x:any/></x:any>";
    }
  }
  Between();
  m_xml += "</s:Advice>";
}

void Writer::AuthnStatement() {
  m_xml += "<s:AuthnStatement";
  const std::size_t instant = Past();
  Attribute("AuthnInstant", TIMES[instant]);
  m_authn += "authn " + std::string(TIMES[instant]);
  if (Maybe()) {
    Fact(m_authn, "SessionIndex", "session-index", Text());
  }
  if (Maybe(3)) {
    const bool isEnded = Maybe(12);
    Time(m_authn, "SessionNotOnOrAfter", "session-end", isEnded ? Past() : Future());
    if (isEnded) {
      Refuse("the session ended");
    }
  }
  m_xml += ">";
  if (Maybe(3)) {
    m_xml += "<s:SubjectLocality";
    if (Maybe()) {
      Fact(m_authn, "Address", "address", Text());
    }
    if (Maybe()) {
      Fact(m_authn, "DNSName", "dns-name", Text());
    }
    m_xml += "/>";
  }
  Between();
  m_xml += "<s:AuthnContext>";
  const bool hasClass = Maybe();
  if (hasClass) {
    Leaf(m_authn, "AuthnContextClassRef", "class", Uri());
  }
  if (!hasClass || Maybe()) {
    if (Maybe(3)) {
      m_xml += "<s:AuthnContextDecl><x:d xmlns:x=\"urn:x\"/></s:AuthnContextDecl>";
    } else {
      Leaf(m_authn, "AuthnContextDeclRef", "declaration", Uri());
    }
  }
  for (std::size_t count = UpTo(2); count > 0; --count) {
    Leaf(m_authn, "AuthenticatingAuthority", "authority", Uri());
  }
  m_xml += "</s:AuthnContext></s:AuthnStatement>";
  m_authn += '\n';
}

void Writer::Value() {
  const std::string text = Text();
  const std::string end = "</s:AttributeValue>";
  switch (m_random.Below(6)) {
  case 0:
    m_xml += "<s:AttributeValue/>";
    m_attributes += "text {}\n";
    return;
  case 1:
    m_xml += "<s:AttributeValue xmlns:i=\"http://www.w3.org/2001/XMLSchema-instance\" i:nil=\"" +
             std::string(Maybe() ? "true" : "1") + "\"/>";
    m_attributes += "nil {}\n";
    return;
  case 2:
    m_xml += "<s:AttributeValue xmlns:i=\"http://www.w3.org/2001/XMLSchema-instance\" i:type=\"e:string\" "
             "xmlns:e=\"http://www.w3.org/2001/XMLSchema\">" +
             text + end;
    m_attributes += "text {" + text + "}\n";
    return;
  case 3:
    m_xml += "<s:AttributeValue><!-- c --><y b='1' a='2'/>" + text + end;
    m_attributes += "xml {<s:AttributeValue xmlns:s=\"urn:oasis:names:tc:SAML:2.0:assertion\"><y a=\"2\" b=\"1\"></y>" +
                    text + end + "}\n";
    return;
  default:
    m_xml += "<s:AttributeValue>" + text + end;
    m_attributes += "text {" + text + "}\n";
  }
}

void Writer::AttributeStatement() {
  m_xml += "<s:AttributeStatement>";
  for (std::size_t count = 1 + UpTo(2); count > 0; --count) {
    Between();
    m_xml += "<s:Attribute";
    m_attributes += "attribute";
    Fact(m_attributes, "Name", "name", Text());
    if (Maybe()) {
      Fact(m_attributes, "NameFormat", "format", Uri());
    }
    if (Maybe()) {
      Fact(m_attributes, "FriendlyName", "friendly-name", Text());
    }
    m_xml += Maybe(5) ? " xmlns:x=\"urn:x\" x:foreign=\"1\">" : ">";
    m_attributes += '\n';
    for (std::size_t values = UpTo(3); values > 0; --values) {
      Between();
      Value();
    }
    m_xml += "</s:Attribute>";
  }
  m_xml += "</s:AttributeStatement>";
}

void Writer::Statement() {
  switch (m_random.Below(12)) {
  case 0:
    if (Maybe(4)) {
      m_xml +=
          "<s:AuthzDecisionStatement Resource=\"urn:x\" Decision=\"Deny\"><s:Action Namespace=\"urn:x\">a</s:Action>"
          "</s:AuthzDecisionStatement>";
      Refuse("AuthzDecisionStatement");
    }
    break;
  case 1:
  case 2:
  case 3:
  case 4:
  case 5:
    AuthnStatement();
    break;
  default:
    AttributeStatement();
  }
  Between();
}

GeneratedAssertion Writer::Write() {
  m_xml = "<s:Assertion xmlns:s=\"urn:oasis:names:tc:SAML:2.0:assertion\"";
  if (Maybe()) {
    m_xml += " xmlns:i=\"http://www.w3.org/2001/XMLSchema-instance\" i:type=\"s:AssertionType\"";
  }
  m_xml += " ID=\"_g\" Version=\"2.0\" IssueInstant=\"2020-01-01T00:00:00Z\">";
  Between();
  const std::string issuer = Name("Issuer", Text());
  m_xml += SIGNATURE;
  Between();
  Subject();
  Between();
  Conditions();
  Between();
  if (Maybe(3)) {
    Advice();
  }
  for (std::size_t count = UpTo(4); count > 0; --count) {
    Statement();
  }
  m_xml += "</s:Assertion>";
  return {m_xml,
          "issuer" + issuer + "issued 2020-01-01T00:00:00.000Z\n" + m_subject + m_restrictions + m_oneTimeUse +
              m_proxy + m_authn + m_attributes,
          m_refusal};
}

} // namespace

GeneratedAssertion GenerateAssertion(RandomSource &random) {
  return Writer(random).Write();
}

} // namespace Testing
