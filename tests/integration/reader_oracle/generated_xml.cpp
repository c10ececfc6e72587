// SPDX-License-Identifier: Apache-2.0

#include "generated_xml.h"

#include "xml_mutation.h"
#include "xml_pieces.h"

#include <algorithm>
#include <cstddef>
#include <cstdio>
#include <initializer_list>
#include <string_view>
#include <vector>

namespace Testing {

namespace {

constexpr std::size_t MAX_DEPTH = 5;
constexpr std::size_t MAX_ELEMENTS = 10;

std::string Utf8(std::uint32_t c) {
  std::string text;
  if (c < 0x80) {
    text += static_cast<char>(c);
    return text;
  }
  if (c >= 0x10000) {
    text += static_cast<char>(0xF0 | (c >> 18));
    text += static_cast<char>(0x80 | ((c >> 12) & 0x3F));
  } else if (c >= 0x800) {
    text += static_cast<char>(0xE0 | (c >> 12));
  }
  if (c >= 0x800) {
    text += static_cast<char>(0x80 | ((c >> 6) & 0x3F));
  } else {
    text += static_cast<char>(0xC0 | (c >> 6));
  }
  text += static_cast<char>(0x80 | (c & 0x3F));
  return text;
}

class Generator {
public:
  explicit Generator(RandomSource &random)
      : m_random(random), m_oddity(OneNumberOf({0, 0, 0, 150, 60, 25, 8})), m_isNarrow(random.OnceIn(8)) {}

  std::string Generate() {
    if (m_random.OnceIn(12)) {
      Put(m_random.OnceIn(3) ? m_random.OneOf(MARKS) : MARKS[0]);
    }
    if (m_random.OnceIn(3)) {
      PutDeclaration();
    }
    PutOutside();
    PutElement(1);
    PutOutside();
    if (IsOdd()) {
      Put(OneNumberOf({0, 1}) == 0 ? "text" : "<again/>");
    }
    return std::move(m_text);
  }

private:
  void Put(std::string_view text) { m_text += text; }

  std::size_t OneNumberOf(std::initializer_list<std::size_t> numbers) {
    return *(numbers.begin() + m_random.Below(numbers.size()));
  }

  /// Whether to write something that is probably wrong here.
  bool IsOdd() { return m_oddity != 0 && m_random.OnceIn(m_oddity); }

  template <std::size_t COUNT>
  void PutPieces(const std::string_view (&pieces)[COUNT], std::size_t most = 3) {
    for (std::size_t count = m_random.Below(most + 1); count != 0; --count) {
      Put(m_random.OneOf(pieces));
    }
  }

  std::string_view Space() {
    if (IsOdd()) {
      return m_random.OneOf(NO_SPACES);
    }
    return m_random.OnceIn(4) ? m_random.OneOf(SPACES) : " "sv;
  }

  void PutOptionalSpace() {
    if (m_random.OnceIn(6)) {
      Put(m_random.OneOf(SPACES));
    }
  }

  template <std::size_t COUNT>
  std::uint32_t Boundary(const std::uint32_t (&boundaries)[COUNT]) {
    const std::uint32_t boundary = boundaries[m_random.Below(COUNT)];
    return boundary + static_cast<std::uint32_t>(m_random.Below(3)) - (boundary > 0 ? 1 : 0);
  }

  std::string Name() {
    if (m_isNarrow) {
      return std::string(NAMES[m_random.Below(2)]);
    }
    if (IsOdd()) {
      return std::string(m_random.OneOf(ODD_NAMES));
    }
    if (IsOdd() || m_random.OnceIn(40)) {
      const std::string character = Utf8(Boundary(NAME_BOUNDARIES));
      return m_random.OnceIn(2) ? character : std::string(m_random.OneOf(NAMES)) + character + "z";
    }
    return std::string(m_random.OneOf(NAMES));
  }

  std::string Prefix() { return std::string(m_isNarrow ? PREFIXES[m_random.Below(3)] : m_random.OneOf(PREFIXES)); }

  std::string QualifiedName() {
    if (m_isNarrow && m_random.OnceIn(2)) {
      return Prefix() + ":" + Name();
    }
    if (m_random.OnceIn(3) && !m_declared.empty()) {
      return m_declared[m_random.Below(m_declared.size())] + ":" + Name();
    }
    return m_random.OnceIn(40) ? Prefix() + ":" + Name() : Name();
  }

  void PutCharacter() {
    const std::uint32_t character = Boundary(CHARACTER_BOUNDARIES);
    char reference[32];
    switch (m_random.Below(5)) {
    case 0:
      std::snprintf(reference, sizeof reference, "&#%u;", character);
      return Put(reference);
    case 1:
      std::snprintf(reference, sizeof reference, m_random.OnceIn(2) ? "&#x%X;" : "&#x0%x;", character);
      return Put(reference);
    case 2:
      return Put(m_random.OneOf(INVALID_UTF8));
    default:
      return Put(Utf8(character));
    }
  }

  void PutText() {
    PutPieces(TEXT_PIECES);
    if (IsOdd()) {
      Put(m_random.OneOf(ODD_TEXT_PIECES));
    }
    if (IsOdd() || m_random.OnceIn(30)) {
      PutCharacter();
    }
  }

  void PutInstruction() {
    const std::string target = Name();
    Put("<?" + target);
    if (!m_random.OnceIn(3)) {
      Put(Space());
      PutPieces(DATA_PIECES);
      if (IsOdd()) {
        PutCharacter();
      }
    }
    Put(IsOdd() ? "?" : "?>");
  }

  void PutComment() {
    Put("<!--");
    const std::size_t begin = m_text.size();
    PutPieces(COMMENT_PIECES);
    if (IsOdd()) {
      PutCharacter();
    }
    if (m_oddity == 0 || !m_random.OnceIn(m_oddity)) { // a comment that is not odd must not have two hyphens
      RemoveRuns(begin);
    }
    Put(IsOdd() ? "--" : "-->");
  }

  void RemoveRuns(std::size_t begin) {
    for (std::size_t i = begin; i < m_text.size(); ++i) {
      if (m_text[i] == '-' && (i + 1 == m_text.size() || m_text[i + 1] == '-')) {
        m_text[i] = '+';
      }
    }
  }

  void PutCData() {
    Put("<![CDATA[");
    PutPieces(CDATA_PIECES);
    if (IsOdd()) {
      PutCharacter();
    }
    Put(IsOdd() ? "]]" : "]]>");
  }

  void PutOutside() {
    for (std::size_t count = m_random.OnceIn(2) ? 0 : m_random.Below(4); count != 0; --count) {
      switch (m_random.Below(IsOdd() ? 5 : 3)) {
      case 0:
        Put(m_random.OneOf(SPACES));
        break;
      case 1:
        PutComment();
        break;
      case 2:
        PutInstruction();
        break;
      case 3:
        Put(m_random.OnceIn(2) ? "<!DOCTYPE a>" : "<!DOCTYPE a [<!ENTITY e 'x'>]>");
        break;
      default:
        Put(m_random.OnceIn(2) ? "&#32;" : "<![CDATA[]]>");
      }
    }
  }

  void PutDeclaration() {
    const bool isOdd = IsOdd() || m_random.OnceIn(4);
    Put(isOdd && m_random.OnceIn(12) ? "<?XML" : "<?xml");
    Put(isOdd && m_random.OnceIn(2) ? m_random.OneOf(VERSIONS) : VERSIONS[m_random.Below(4)]);
    Put(isOdd ? m_random.OneOf(ENCODINGS) : ENCODINGS[m_random.Below(6)]);
    Put(isOdd && m_random.OnceIn(2) ? m_random.OneOf(STANDALONES) : STANDALONES[m_random.Below(4)]);
    Put(isOdd && m_random.OnceIn(2) ? m_random.OneOf(DECLARATION_ENDS) : DECLARATION_ENDS[m_random.Below(3)]);
  }

  void PutValue(std::string_view value) {
    const char quote = value.find('"') == std::string_view::npos && m_random.OnceIn(2) ? '"' : '\'';
    m_text += quote;
    for (const char character : value) {
      if (character != quote) {
        m_text += character;
      }
    }
    m_text += IsOdd() ? '"' : quote;
  }

  std::string AttributeValue() {
    const std::size_t begin = m_text.size();
    PutText();
    std::string value = m_text.substr(begin);
    m_text.resize(begin);
    return value;
  }

  void PutAttribute(const std::string &name, std::string_view value) {
    Put(Space());
    Put(name);
    PutOptionalSpace();
    Put(IsOdd() ? "" : "=");
    PutOptionalSpace();
    PutValue(value);
  }

  struct WrittenAttribute {
    std::string name;
    std::string value;
  };

  void AddDeclarations(std::vector<WrittenAttribute> &attributes) {
    for (std::size_t count = m_random.OnceIn(2) ? 0 : m_random.Below(4); count != 0; --count) {
      const std::string prefix = m_random.OnceIn(4) ? "" : Prefix();
      const bool isOddName = IsOdd() || m_random.OnceIn(16);
      if (Add(prefix.empty() ? "xmlns" : "xmlns:" + prefix,
              isOddName    ? m_random.OneOf(ODD_NAMESPACES)
              : m_isNarrow ? NAMESPACES[m_random.Below(2)]
                           : m_random.OneOf(NAMESPACES),
              attributes) &&
          !prefix.empty()) {
        m_declared.push_back(prefix);
      }
    }
  }

  void AddAttributes(std::vector<WrittenAttribute> &attributes) {
    for (std::size_t count = m_random.Below(m_random.OnceIn(20) ? 24 : 4); count != 0; --count) {
      Add(QualifiedName(), AttributeValue(), attributes);
    }
    if (m_random.OnceIn(30)) {
      Add("xmlns:xml", "http://www.w3.org/XML/1998/namespace", attributes);
    }
  }

  /// Adds an attribute; only rarely one whose name exists already.
  bool Add(const std::string &name, std::string_view value, std::vector<WrittenAttribute> &attributes) {
    const bool isTwice = std::any_of(attributes.begin(), attributes.end(),
                                     [&](const WrittenAttribute &other) { return other.name == name; });
    if (isTwice && !IsOdd()) {
      return false;
    }
    const auto place = static_cast<std::ptrdiff_t>(m_random.Below(attributes.size() + 1));
    attributes.insert(attributes.begin() + place, {name, std::string(value)});
    return true;
  }

  /// @return the name.
  std::string PutStartTag() {
    std::vector<WrittenAttribute> attributes;
    AddDeclarations(attributes);
    std::string name = QualifiedName();
    AddAttributes(attributes);
    Put("<" + name);
    for (const WrittenAttribute &attribute : attributes) {
      PutAttribute(attribute.name, attribute.value);
    }
    if (m_random.OnceIn(12)) {
      Put(m_random.OneOf(XML_ATTRIBUTES));
    }
    PutOptionalSpace();
    return name;
  }

  // The depth is bounded by MAX_DEPTH.
  void PutElement(std::size_t depth) {
    ++m_elements;
    const std::size_t outside = m_declared.size();
    const std::string name = PutStartTag();
    if (m_random.OnceIn(4)) {
      Put(IsOdd() ? "/ >" : "/>");
      m_declared.resize(outside);
      return;
    }
    Put(">");
    for (std::size_t count = m_random.Below(5); count != 0; --count) {
      PutContent(depth);
    }
    Put("</" + (IsOdd() ? Name() : name));
    PutOptionalSpace();
    Put(IsOdd() ? " a='1'>" : ">");
    m_declared.resize(outside);
  }

  void PutContent(std::size_t depth) {
    switch (m_random.Below(9)) {
    case 0:
      return PutCData();
    case 1:
      return PutComment();
    case 2:
      return PutInstruction();
    case 3:
    case 4:
    case 5:
      return PutText();
    default:
      if (depth < MAX_DEPTH && m_elements < MAX_ELEMENTS) {
        PutElement(depth + 1);
      }
    }
  }

  RandomSource &m_random;
  const std::size_t m_oddity; // one in this many pieces is odd; 0: none
  const bool m_isNarrow;      // few prefixes, namespaces and names, so that they coincide
  std::size_t m_elements = 0;
  std::vector<std::string> m_declared; // prefixes in scope
  std::string m_text;
};

std::string TokenSoup(RandomSource &random) {
  std::string text = random.OnceIn(2) ? "<a>" : "";
  for (std::size_t count = 1 + random.Below(12); count != 0; --count) {
    text += random.OneOf(TOKENS);
  }
  return text + (text.size() > 2 && random.OnceIn(2) ? "</a>" : "");
}

std::string Repeated(std::string_view text, std::size_t count) {
  std::string repeated;
  for (; count != 0; --count) {
    repeated += text;
  }
  return repeated;
}

/// At a limit of the platform, one below it or one above.
std::string AtLimit(RandomSource &random) {
  const std::size_t count = 255 + random.Below(3);
  switch (random.Below(4)) {
  case 0:
    return Repeated("<a>", count) + Repeated("</a>", count);
  case 1: {
    std::string tag = "<a";
    for (std::size_t i = 0; i < count; ++i) {
      tag += (random.OnceIn(2) ? " a" : " xmlns:a") + std::to_string(i) + "='x:'";
    }
    return tag + "/>";
  }
  case 2: {
    std::string tags;
    for (std::size_t i = 0; i < count; i += 16) {
      tags += "<a";
      for (std::size_t k = i; k < i + 16 && k < count; ++k) {
        tags += " xmlns:a" + std::to_string(k) + "='x:'";
      }
      tags += ">";
    }
    return tags + Repeated("</a>", (count + 15) / 16);
  }
  default: {
    const std::string name(4094 + random.Below(4), 'n');
    return random.OnceIn(2) ? "<" + name + "/>" : "<?" + name + "?><a " + name + "='" + name + "'/>";
  }
  }
}

/// For ASCII; each other octet becomes a separate character.
std::string ToUtf16(std::string_view text, RandomSource &random) {
  const bool isBigEndian = random.OnceIn(2);
  std::string recoded = random.OnceIn(3) ? "" : isBigEndian ? "\xFE\xFF" : "\xFF\xFE";
  for (const char octet : text) {
    recoded += isBigEndian ? '\0' : octet;
    recoded += isBigEndian ? octet : '\0';
  }
  return recoded;
}

} // namespace

std::string GenerateXml(std::uint64_t seed) {
  RandomSource random(seed);
  if (random.OnceIn(2000)) {
    return AtLimit(random);
  }
  std::string text = random.OnceIn(12) ? TokenSoup(random) : Generator(random).Generate();
  if (random.OnceIn(400)) {
    text = random.OnceIn(8) ? std::string(EBCDIC) : ToUtf16(text, random);
  }
  if (random.OnceIn(3)) {
    const std::string other = random.OnceIn(4) ? Generator(random).Generate() : TokenSoup(random);
    for (std::size_t count = 1 + random.Below(random.OnceIn(3) ? 4 : 1); count != 0; --count) {
      Mutate(text, other, random);
    }
  }
  return text;
}

} // namespace Testing
