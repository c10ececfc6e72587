// SPDX-License-Identifier: Apache-2.0

#include "generated_document.h"

#include <map>
#include <set>
#include <utility>

namespace Testing {

namespace {

constexpr std::size_t MAX_ELEMENTS = 14;
constexpr std::size_t MAX_DEPTH = 6;
// The canonicaliser's buffer has 4096 octets, and its table of prefixes 128 places: some documents exceed one or both.
constexpr std::size_t LONG_TEXT = 4080;
constexpr std::size_t SPREAD_OF_LONG_TEXTS = 32;
constexpr std::size_t MANY_PREFIXES = 17;
constexpr std::size_t SPREAD_OF_MANY_PREFIXES = 150;

constexpr std::string_view PREFIXES[] = {"a", "b", "n0", "_", "x-1.y", "\xC3\xA9", "A", "aa"};
constexpr std::string_view NAMESPACES[] = {"urn:a",      "urn:b", "http://example.com/?a=1;b='2'",
                                           "urn:%C3%BC", "URN:A", "urn:a:b"};
// libxml2 parses only namespace names that are URIs, and writes them without the escapes that the recommendation
// requires.
constexpr std::string_view ODD_NAMESPACES[] = {"urn:a?b&amp;c", "urn:&#38;", "http://example.com/?a=&amp;lt;"};
constexpr std::string_view LOCAL_NAMES[] = {"a", "b", "item", "B", "z.9", "_x", "\xD0\xB6"};
constexpr std::string_view TEXT_PIECES[] = {"text",         " ",
                                            "\n",           "\t",
                                            "\r\n",         "\r",
                                            "&amp;",        "&lt;",
                                            "&gt;",         ">",
                                            "\"",           "'",
                                            "&quot;",       "&apos;",
                                            "&#13;",        "&#xD;",
                                            "&#10;",        "&#9;",
                                            "&#x20;",       "\xC3\xA4",
                                            "\xE2\x82\xAC", "\xF0\x9F\x98\x80",
                                            "&#x1F600;",    "&#xE9;",
                                            "]]-",          "-"};
constexpr std::string_view CDATA_PIECES[] = {"x", "<", "&", "&amp;", ">", "]]-", "\r\n", "\"", "\xE2\x82\xAC", " "};
constexpr std::string_view COMMENT_PIECES[] = {"c", " ", "<", "&", ">", "\r\n", "\xC3\xA4", "- ", "\""};
constexpr std::string_view XML_ATTRIBUTES[] = {" xml:lang='en'", " xml:lang=\"de&#x9;\"", " xml:space='preserve'",
                                               " xml:base='http://example.org/'"};

class Generator {
public:
  Generator(RandomSource &random, NamespaceNames names)
      : m_random(random), m_names(names), m_isLong(random.OnceIn(32)), m_isCrowded(random.OnceIn(16)) {}

  GeneratedDocument Generate() {
    if (m_random.OnceIn(3)) {
      m_document.text += "<?xml version=\"1.0\"?>\r\n";
    }
    WriteOutside();
    WriteElement(1, {{"", ""}});
    WriteOutside();
    return std::move(m_document);
  }

private:
  using Scope = std::map<std::string, std::string, std::less<>>;

  void Put(std::string_view text) { m_document.text += text; }

  template <std::size_t COUNT>
  void PutPieces(const std::string_view (&pieces)[COUNT]) {
    for (std::size_t count = m_random.Below(4); count != 0; --count) {
      Put(m_random.OneOf(pieces));
    }
  }

  void WriteComment() {
    Put("<!--");
    PutPieces(COMMENT_PIECES);
    Put("c-->"); // so that no hyphen is at its end
  }

  void WriteInstruction() {
    Put("<?target");
    Put(m_random.OneOf({"", " ", " x", " data", "   data  with=\"x\" & <  "}));
    Put("?>");
  }

  void WriteOutside() {
    for (std::size_t count = m_random.Below(3); count != 0; --count) {
      if (m_random.OnceIn(2)) {
        WriteComment();
      } else {
        WriteInstruction();
      }
      Put(m_random.OneOf({"", "\n", " \r\n\t"}));
    }
  }

  void WriteText() {
    PutPieces(TEXT_PIECES);
    if (m_isLong && m_random.OnceIn(2)) {
      m_document.text.append(LONG_TEXT + m_random.Below(SPREAD_OF_LONG_TEXTS), 'x');
    }
  }

  void WriteCData() {
    Put("<![CDATA[");
    PutPieces(CDATA_PIECES);
    Put("x]]>");
  }

  void Declare(Scope &scope, std::string &tag, std::set<std::string, std::less<>> &declared) {
    const bool isDefault = m_random.OnceIn(3);
    DeclarePrefix(isDefault ? std::string() : std::string(m_random.OneOf(PREFIXES)), scope, tag, declared);
  }

  void DeclarePrefix(const std::string &prefix, Scope &scope, std::string &tag,
                     std::set<std::string, std::less<>> &declared) {
    if (!declared.insert(prefix).second) {
      return;
    }
    const std::string uri(prefix.empty() && m_random.OnceIn(3) ? std::string_view() : NamespaceName());
    scope[prefix] = uri;
    tag += prefix.empty() ? " xmlns" : " xmlns:" + prefix;
    tag += "=\"" + uri + "\"";
  }

  std::string_view NamespaceName() {
    const bool isOdd = m_names == NamespaceNames::ANY && m_random.OnceIn(3);
    return isOdd ? m_random.OneOf(ODD_NAMESPACES) : m_random.OneOf(NAMESPACES);
  }

  std::string AttributeValue() {
    std::string value;
    for (std::size_t count = m_random.Below(4); count != 0; --count) {
      const std::string_view piece = m_random.OneOf(TEXT_PIECES);
      if (piece != "\"") {
        value += piece;
      }
    }
    return "\"" + value + "\"";
  }

  void AddAttribute(const Scope &scope, std::string &tag, std::set<std::pair<std::string, std::string>> &names) {
    const std::string localName(m_random.OneOf(LOCAL_NAMES));
    auto binding = scope.begin();
    std::advance(binding, static_cast<std::ptrdiff_t>(m_random.Below(scope.size())));
    const std::string uri = binding->first.empty() ? std::string() : binding->second;
    if (!names.insert({uri, localName}).second) {
      return;
    }
    tag += " " + (binding->first.empty() ? localName : binding->first + ":" + localName) + "=" + AttributeValue();
  }

  std::string WriteStartTag(Scope &scope) {
    std::string attributes;
    std::set<std::string, std::less<>> declared;
    for (std::size_t count = m_random.Below(3); count != 0; --count) {
      Declare(scope, attributes, declared);
    }
    if (m_isCrowded && m_document.elements == 0) {
      for (std::size_t count = MANY_PREFIXES + m_random.Below(SPREAD_OF_MANY_PREFIXES); count != 0; --count) {
        DeclarePrefix("p" + std::to_string(m_random.Below(1000)), scope, attributes, declared);
      }
    }
    attributes += " ID=\"e" + std::to_string(m_document.elements++) + "\"";
    if (m_random.OnceIn(4)) {
      attributes += m_random.OneOf(XML_ATTRIBUTES);
    }
    std::set<std::pair<std::string, std::string>> names;
    for (std::size_t count = m_random.Below(4); count != 0; --count) {
      AddAttribute(scope, attributes, names);
    }
    auto binding = scope.begin();
    std::advance(binding, static_cast<std::ptrdiff_t>(m_random.Below(scope.size())));
    const std::string localName(m_random.OneOf(LOCAL_NAMES));
    const std::string name = binding->first.empty() ? localName : binding->first + ":" + localName;
    Put("<" + name + attributes + ">");
    return name;
  }

  // The depth is bounded by MAX_DEPTH.
  void WriteElement(std::size_t depth, Scope scope) {
    const std::string name = WriteStartTag(scope);
    for (std::size_t count = m_random.Below(6); count != 0; --count) {
      switch (m_random.Below(6)) {
      case 0:
        WriteText();
        break;
      case 1:
        WriteCData();
        break;
      case 2:
        WriteComment();
        break;
      case 3:
        WriteInstruction();
        break;
      default:
        if (depth < MAX_DEPTH && m_document.elements < MAX_ELEMENTS) {
          WriteElement(depth + 1, scope);
        }
      }
    }
    m_document.endOfRoot = m_document.text.size();
    Put("</" + name + ">");
  }

  RandomSource &m_random;
  const NamespaceNames m_names;
  const bool m_isLong;
  const bool m_isCrowded;
  GeneratedDocument m_document;
};

} // namespace

GeneratedDocument GenerateDocument(RandomSource &random, NamespaceNames names) {
  return Generator(random, names).Generate();
}

std::vector<std::string> GeneratePrefixList(RandomSource &random) {
  std::vector<std::string> prefixes;
  for (std::size_t count = random.Below(4); count != 0; --count) {
    prefixes.emplace_back(random.OnceIn(3) ? std::string_view("#default") : random.OneOf(PREFIXES));
  }
  return prefixes;
}

} // namespace Testing
