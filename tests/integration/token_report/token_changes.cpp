// SPDX-License-Identifier: Apache-2.0

#include "token_changes.h"

#include "integration/reader_oracle/xml_mutation.h"

#include <algorithm>
#include <cstddef>
#include <string_view>
#include <vector>

namespace Reports {

using Testing::RandomSource;

namespace {

/// Where an element is in a text.
struct Element {
  std::size_t begin = 0;
  std::size_t nameEnd = 0;
  std::size_t tagEnd = 0; // after the start tag
  std::size_t contentEnd = 0;
  std::size_t end = 0;

  bool IsEmpty() const { return tagEnd == end; }
};

/// The elements of a text. Reads only tags, and skips end tags without a start tag. That is enough, because most texts
/// are well-formed.
std::vector<Element> ElementsOf(const std::string &xml) {
  std::vector<Element> elements;
  std::vector<std::size_t> open;
  for (std::size_t begin = xml.find('<'); begin != std::string::npos; begin = xml.find('<', begin + 1)) {
    const std::size_t close = xml.find('>', begin);
    if (close == std::string::npos) {
      break;
    }
    if (xml[begin + 1] == '?' || xml[begin + 1] == '!') {
      continue;
    }
    if (xml[begin + 1] == '/') {
      if (!open.empty()) {
        elements[open.back()].contentEnd = begin;
        elements[open.back()].end = close + 1;
        open.pop_back();
      }
      continue;
    }
    const std::size_t nameEnd = xml.find_first_of(" />\n", begin);
    elements.push_back({begin, nameEnd, close + 1, close + 1, close + 1});
    if (xml[close - 1] != '/') {
      open.push_back(elements.size() - 1);
    }
  }
  return elements;
}

Element AnyElement(const std::string &xml, RandomSource &random) {
  const std::vector<Element> elements = ElementsOf(xml);
  return elements.empty() ? Element() : elements[random.Below(elements.size())];
}

std::string TextOf(const std::string &xml, const Element &element) {
  return xml.substr(element.begin, element.end - element.begin);
}

constexpr std::string_view VALUES[] = {
    "",
    " ",
    "x",
    "2.0",
    "true",
    "0",
    "-1",
    "99999999999999999999",
    "_x",
    "2020-01-01T00:00:00.000Z",
    "2026-01-02T03:04:05.006Z", // the time of the tests
    "2026-01-02T03:04:05.007+00:00",
    "2030-01-01T00:00:00.000Z",
    "0001-01-01T00:00:00Z",
    "9999-12-31T23:59:59Z",
    "not a date",
    "alice@corp.example",
    "@corp.example",
    "alice",
    "corp.example\\Users",
    "corp.example\\",
    "http://schemas.xmlsoap.org/claims/UPN",
    "urn:oasis:names:tc:SAML:2.0:cm:bearer",
    "urn:oasis:names:tc:SAML:2.0:cm:holder-of-key",
    "urn:oasis:names:tc:SAML:2.0:cm:sender-vouches",
    "http://www.w3.org/2001/10/xml-exc-c14n#",
    "http://www.w3.org/2001/04/xmlenc#sha512",
    "http://www.w3.org/2000/09/xmldsig#sha1",
    "https://files.corp.example/",
    "AAAA",
    "#x",
    "&#x202E;&#x85;&#10;&#x1F600;",
    "\xE2\x80\xAE\xC2\x9B[31m",
};

/// A value. Some are so long that a report must cut them, in the middle of a character that must be escaped.
std::string AnyValue(RandomSource &random) {
  if (random.OnceIn(12)) {
    std::string value(1015 + random.Below(12), 'v');
    for (int i = 0; i < 40; ++i) {
      value += "\xE2\x80\xAE\xF0\x9F\x98\x80";
    }
    return value;
  }
  return std::string(random.OneOf(VALUES));
}

constexpr std::string_view NAMES[] = {"saml:Assertion",      "saml:Issuer",
                                      "saml:NameID",         "saml:Subject",
                                      "saml:Condition",      "saml:AudienceRestriction",
                                      "saml:Audience",       "saml:ProxyRestriction",
                                      "saml:Advice",         "saml:Attribute",
                                      "saml:AttributeValue", "ds:Signature",
                                      "ds:Reference",        "ds:Transform",
                                      "ds:Object",           "ds:X509Certificate",
                                      "unbound:a",           "a"};

constexpr std::string_view ATTRIBUTES[] = {
    "ID",         "Id",     "Version",   "IssueInstant", "NotBefore", "NotOnOrAfter", "Format",
    "Name",       "Method", "Algorithm", "Count",        "URI",       "xsi:type",     "xmlns",
    "xmlns:saml", "xml:id", "Type",      "unbound:a",    "a"};

constexpr std::string_view INSERTED[] = {"<!-- -->", "<?p d?>",  "text",    "<![CDATA[ ]]>", " ",
                                         "\n",       "\r\n",     "&#13;",   "<a/>",          "<a xmlns=\"urn:a\"/>",
                                         "&amp;",    "&#x202E;", "<a>b</a>"};

/// The attributes of a start tag, each from the white space before it to its closing quote.
std::vector<std::pair<std::size_t, std::size_t>> AttributesOf(const std::string &xml, const Element &element) {
  std::vector<std::pair<std::size_t, std::size_t>> attributes;
  std::size_t begin = element.nameEnd;
  for (;;) {
    const std::size_t quote = xml.find_first_of("\"'", begin);
    const std::size_t end = quote < element.tagEnd ? xml.find(xml[quote], quote + 1) : std::string::npos;
    if (end == std::string::npos || end >= element.tagEnd) {
      return attributes;
    }
    attributes.emplace_back(begin, end + 1);
    begin = end + 1;
  }
}

void ChangeAttribute(std::string &xml, RandomSource &random) {
  const Element element = AnyElement(xml, random);
  const auto attributes = AttributesOf(xml, element);
  const std::string added = " " + std::string(random.OneOf(ATTRIBUTES)) + "=\"" + AnyValue(random) + "\"";
  if (attributes.empty() || random.OnceIn(3)) {
    xml.insert(element.nameEnd, added);
    return;
  }
  const auto &[begin, end] = attributes[random.Below(attributes.size())];
  if (random.OnceIn(3)) {
    xml.erase(begin, end - begin);
    return;
  }
  const std::size_t quote = xml.find_first_of("\"'", begin);
  xml.replace(quote + 1, end - quote - 2, AnyValue(random));
}

void ChangeContent(std::string &xml, RandomSource &random) {
  const std::vector<Element> elements = ElementsOf(xml);
  std::vector<Element> leaves;
  std::copy_if(elements.begin(), elements.end(), std::back_inserter(leaves), [&xml](const Element &element) {
    return !element.IsEmpty() && xml.find('<', element.tagEnd) == element.contentEnd;
  });
  if (leaves.empty()) {
    return;
  }
  const Element &leaf = leaves[random.Below(leaves.size())];
  xml.replace(leaf.tagEnd, leaf.contentEnd - leaf.tagEnd, AnyValue(random));
}

void Rename(std::string &xml, RandomSource &random) {
  const Element element = AnyElement(xml, random);
  const std::string name(random.OneOf(NAMES));
  if (!element.IsEmpty()) {
    xml.replace(element.contentEnd, element.end - element.contentEnd, "</" + name + ">");
  }
  if (element.end > 0) {
    xml.replace(element.begin + 1, element.nameEnd - element.begin - 1, name);
  }
}

void MoveOrCopy(std::string &xml, const std::string &other, RandomSource &random) {
  const Element element = AnyElement(xml, random);
  const std::string text = random.OnceIn(4) ? TextOf(other, AnyElement(other, random)) : TextOf(xml, element);
  if (random.OnceIn(2)) {
    xml.erase(element.begin, element.end - element.begin);
  }
  const Element place = AnyElement(xml, random);
  xml.insert(random.OnceIn(2) ? place.begin : place.tagEnd, text);
}

void ChangeOnce(std::string &xml, const std::string &other, RandomSource &random) {
  const Element element = AnyElement(xml, random);
  switch (random.Below(9)) {
  case 0:
    xml.erase(element.begin, element.end - element.begin);
    return;
  case 1:
    xml.insert(element.begin, TextOf(xml, element));
    return;
  case 2:
    return MoveOrCopy(xml, other, random);
  case 3:
  case 4:
    return ChangeAttribute(xml, random);
  case 5:
    return ChangeContent(xml, random);
  case 6:
    return Rename(xml, random);
  case 7:
    xml.insert(random.OnceIn(2) ? element.tagEnd : element.end, random.OneOf(INSERTED));
    return;
  default:
    return Testing::Mutate(xml, other, random);
  }
}

} // namespace

std::string ChangeToken(std::string xml, const std::string &other, RandomSource &random) {
  for (std::size_t changes = random.OnceIn(3) ? 1 + random.Below(4) : 1; changes > 0; --changes) {
    ChangeOnce(xml, other, random);
  }
  return xml;
}

} // namespace Reports
