// SPDX-License-Identifier: Apache-2.0
// Canonical forms that fill the canonicaliser's buffer and its table of namespaces, and the escapes that other
// implementations leave out. The expected forms are written by hand.

#include "documents.h"

#include <tarvel/xml/security/canonicalizer.h>

#include <gtest/gtest.h>

#include <string>

namespace {

namespace Uri = Tarvel::Xml::Security::CanonicalizationUri;
using Testing::CanonicalDocument;
using Testing::CanonicalForm;

constexpr std::size_t BUFFER_BYTES = 4096; // of the canonicaliser's output

/// Has each kind of piece that is written: tags, attributes, escapes, one character, a processing instruction, a comment.
const std::string PIECES =
    R"(<a xmlns="urn:a" xmlns:p="urn:p?a&amp;b" b="&quot;&#xA;" p:c="d">&lt;e&gt;f<?g h?><!--i--><p:j></p:j></a>k)";

// Each document is canonical: wherever the buffer is full, the canonical form is the document itself.
TEST(Canonicalize, WritesEachPieceAcrossTheEndOfTheBuffer) {
  for (const std::size_t buffers : {std::size_t{1}, std::size_t{2}}) {
    for (std::size_t before = buffers * BUFFER_BYTES - PIECES.size() - 4; before <= buffers * BUFFER_BYTES + 1;
         ++before) {
      const std::string text = "<r>" + std::string(before - 3, 'x') + PIECES + "</r>";
      ASSERT_TRUE(text == CanonicalDocument(text, Uri::INCLUSIVE_WITH_COMMENTS)) << before;
    }
  }
}

// A text that is at least as long as the buffer is written directly, without the buffer.
TEST(Canonicalize, WritesATextAsLongAsTheBuffer) {
  for (std::size_t before = 0; before <= 2; ++before) {
    for (std::size_t length = BUFFER_BYTES - 8; length <= BUFFER_BYTES + 8; ++length) {
      const std::string text = "<r>" + std::string(before, 'x') + "<a></a>" + std::string(length, 'y') + "<a></a></r>";
      ASSERT_TRUE(text == CanonicalDocument(text, Uri::EXCLUSIVE)) << before << " " << length;
    }
  }
}

TEST(Canonicalize, FillsTheBufferOneCharacterAtATime) {
  std::string text = "<r>";
  for (std::size_t count = 0; count < 2 * BUFFER_BYTES; ++count) {
    text += count % 2 == 0 ? "&amp;" : "x";
  }
  text += "</r>";
  EXPECT_TRUE(text == CanonicalDocument(text, Uri::INCLUSIVE));
}

/// "p" and a number of three digits, so that the prefixes are in order.
std::string Prefix(std::size_t number) {
  const std::string digits = std::to_string(number);
  return "p" + std::string(3 - digits.size(), '0') + digits;
}

constexpr std::size_t MANY_PREFIXES = 200; // more than the table has buckets, so some collide

TEST(Canonicalize, FindsEachOfManyPrefixesInScope) {
  std::string declarations;
  std::string uses;
  std::string expected;
  for (std::size_t number = 0; number < MANY_PREFIXES; ++number) {
    const std::string declaration = " xmlns:" + Prefix(number) + "=\"urn:" + std::to_string(number) + "\"";
    declarations = declaration + declarations;
    uses += "<" + Prefix(number) + ":a></" + Prefix(number) + ":a>";
    expected += "<" + Prefix(number) + ":a" + declaration + "></" + Prefix(number) + ":a>";
  }
  EXPECT_EQ("<r>" + expected + "</r>", CanonicalDocument("<r" + declarations + ">" + uses + "</r>", Uri::EXCLUSIVE));
}

TEST(Canonicalize, SortsManyPrefixesThatOneElementDeclares) {
  std::string reversed;
  std::string sorted;
  for (std::size_t number = 0; number < MANY_PREFIXES; ++number) {
    const std::string declaration = " xmlns:" + Prefix(number) + "=\"urn:" + std::to_string(number) + "\"";
    reversed = declaration + reversed;
    sorted += declaration;
  }
  EXPECT_EQ("<r" + sorted + "></r>", CanonicalDocument("<r" + reversed + "/>", Uri::INCLUSIVE));
}

TEST(Canonicalize, ForgetsThePrefixesOfAnElementThatHasEnded) {
  std::string inner;
  std::string innerCanonical;
  for (std::size_t number = 0; number < MANY_PREFIXES; ++number) {
    const std::string name = Prefix(number);
    inner += "<" + name + ":a xmlns:" + name + "=\"urn:inner\"/><" + name + ":a/>";
    innerCanonical += "<" + name + ":a xmlns:" + name + "=\"urn:inner\"></" + name + ":a><" + name +
                      ":a xmlns:" + name + "=\"urn:outer\"></" + name + ":a>";
  }
  std::string declarations;
  for (std::size_t number = 0; number < MANY_PREFIXES; ++number) {
    declarations += " xmlns:" + Prefix(number) + "=\"urn:outer\"";
  }
  EXPECT_EQ("<r>" + innerCanonical + "</r>",
            CanonicalDocument("<r" + declarations + ">" + inner + "</r>", Uri::EXCLUSIVE));
}

// Canonical XML 1.0, section 2.3: a namespace node is written like an attribute.
TEST(Canonicalize, EscapesANamespaceNameLikeAnAttributeValue) {
  const std::string canonical = "<p:r xmlns=\"urn:a?b&amp;c='\" xmlns:p=\"urn:p?x&amp;y\"><s></s></p:r>";
  EXPECT_EQ(canonical, CanonicalDocument(canonical, Uri::INCLUSIVE));
  EXPECT_EQ("<p:r xmlns:p=\"urn:p?x&amp;y\"><s xmlns=\"urn:a?b&amp;c='\"></s></p:r>",
            CanonicalDocument(canonical, Uri::EXCLUSIVE));
}

// A parser may refuse such a name; a tree that was not parsed may have it.
TEST(Canonicalize, EscapesEachSpecialCharacterOfANamespaceName) {
  Tarvel::Ref<Tarvel::Xml::ElementNode> element;
  Tarvel::Xml::CreateElementNode("p", "r", element);
  element->DefineAttribute("xmlns:p", "urn:&<>\"'\t\n\r");
  EXPECT_EQ("<p:r xmlns:p=\"urn:&amp;&lt;>&quot;'&#x9;&#xA;&#xD;\"></p:r>", CanonicalForm(*element, Uri::INCLUSIVE));
  EXPECT_EQ("<p:r xmlns:p=\"urn:&amp;&lt;>&quot;'&#x9;&#xA;&#xD;\"></p:r>", CanonicalForm(*element, Uri::EXCLUSIVE));
}

/// An element whose text and attribute are `before` plain characters, `character` and `after` plain characters.
Tarvel::Ref<Tarvel::Xml::ElementNode> ElementWith(std::size_t before, char character, std::size_t after) {
  const std::string value = std::string(before, 'x') + character + std::string(after, 'y');
  Tarvel::Ref<Tarvel::Xml::ElementNode> element;
  Tarvel::Xml::CreateElementNode("", "r", element);
  element->DefineAttribute("a", value);
  Tarvel::Ref<Tarvel::Xml::TextNode> text;
  Tarvel::Xml::CreateTextNode(text);
  text->SetValue(value);
  element->AppendChild(text.get());
  return element;
}

struct EscapedCharacter {
  char character;
  const char *inText;
  const char *inAttribute;
};

// Octets are checked in blocks of 16, so every position in two blocks and in the rest is tried.
TEST(Canonicalize, EscapesACharacterAtEveryPositionOfAValue) {
  constexpr std::size_t LONGEST = 36;
  for (const EscapedCharacter &escaped :
       {EscapedCharacter{'&', "&amp;", "&amp;"}, EscapedCharacter{'<', "&lt;", "&lt;"},
        EscapedCharacter{'>', "&gt;", ">"}, EscapedCharacter{'"', "\"", "&quot;"},
        EscapedCharacter{'\t', "\t", "&#x9;"}, EscapedCharacter{'\n', "\n", "&#xA;"},
        EscapedCharacter{'\r', "&#xD;", "&#xD;"}, EscapedCharacter{'\'', "'", "'"}}) {
    for (std::size_t before = 0; before < LONGEST; ++before) {
      for (std::size_t after = 0; before + after < LONGEST; ++after) {
        const std::string x(before, 'x');
        const std::string y(after, 'y');
        ASSERT_EQ("<r a=\"" + x + escaped.inAttribute + y + "\">" + x + escaped.inText + y + "</r>",
                  CanonicalForm(*ElementWith(before, escaped.character, after), Uri::EXCLUSIVE));
      }
    }
  }
}

TEST(Canonicalize, EscapesEachOfManyCharactersInOneValue) {
  const std::string value(40, '<');
  std::string escaped;
  for (std::size_t i = 0; i < value.size(); ++i) {
    escaped += "&lt;";
  }
  const auto element = ElementWith(0, 'x', 0);
  element->DefineAttribute("a", value);
  EXPECT_EQ("<r a=\"" + escaped + "\">x</r>", CanonicalForm(*element, Uri::EXCLUSIVE));
}

TEST(Canonicalize, LooksUpAPrefixAgainWhereItsMeaningChanges) {
  const std::string document = "<a:r xmlns:a=\"urn:1\"><a:e xmlns:a=\"urn:2\"><a:f></a:f></a:e><a:g></a:g></a:r>";
  EXPECT_EQ(document, CanonicalDocument(document, Uri::EXCLUSIVE));
  EXPECT_EQ(document, CanonicalDocument(document, Uri::INCLUSIVE));
}

TEST(Canonicalize, ForgetsAnUnusedDeclarationWhereItsElementEnds) {
  EXPECT_EQ("<r><e></e><a:f xmlns:a=\"urn:1\"></a:f></r>",
            CanonicalDocument("<r xmlns:a=\"urn:1\"><e xmlns:a=\"urn:2\"/><a:f/></r>", Uri::EXCLUSIVE));
}

TEST(Canonicalize, KeepsDataOfOneCharacterInAProcessingInstruction) {
  EXPECT_EQ("<?a b?>\n<r><?c d?><?e f g?><?h?></r>\n<?i j?>",
            CanonicalDocument("<?a b?><r><?c   d?><?e f g?><?h ?></r><?i\nj?>", Uri::INCLUSIVE));
}

} // namespace
