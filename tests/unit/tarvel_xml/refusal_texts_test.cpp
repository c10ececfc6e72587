// SPDX-License-Identifier: Apache-2.0
// Each reason for refusing a document: its text, the position of the first wrong byte, and its row in the troubleshooting
// page.

#include "xml/refusals.h"

#include "support/data_file.h"
#include "support/throws_message.h"
#include "support/xml_tree.h"

#include <tarvel/xml/parser.h>

#include <gtest/gtest.h>

#include <algorithm>
#include <iterator>
#include <set>
#include <string>
#include <vector>

namespace Tarvel::Xml {
namespace {

using ::Testing::ParseDocument;
using ::Testing::ReadDataFile;
using namespace std::string_literals;

struct Case {
  Refusal refusal;
  std::string document;
  std::vector<std::string> found; // in the text, in this order
  unsigned line;
  unsigned column;
};

std::string Repeat(const std::string &text, std::size_t count) {
  std::string repeated;
  for (std::size_t i = 0; i < count; ++i) {
    repeated += text;
  }
  return repeated;
}

std::string Numbered(const std::string &before, std::size_t count, const std::string &after) {
  std::string text;
  for (std::size_t i = 0; i < count; ++i) {
    text.append(before).append(std::to_string(i)).append(after);
  }
  return text;
}

/// The text of a refusal, with `found` in its numbered places.
std::string FillIn(Refusal refusal, const std::vector<std::string> &found) {
  std::string text(REFUSAL_TEXTS[static_cast<std::size_t>(refusal)]);
  for (std::size_t i = 0; i < found.size(); ++i) {
    const std::string place = "%" + std::to_string(i + 1);
    EXPECT_NE(text.find(place), std::string::npos) << text;
    text.replace(text.find(place), place.size(), found[i]);
  }
  return text;
}

std::vector<Case> GetCases() {
  using R = Refusal;
  return {
      {R::DOCUMENT_TOO_LONG, "<a>\n" + std::string(MAX_DOCUMENT_BYTES, 'x'), {}, 2, 16777213},
      {R::TOO_DEEP, Repeat("<a>", 256) + "\n <b", {}, 2, 2},
      {R::TOO_MANY_ATTRIBUTES, "<a>\n<b" + Numbered(" x", 257, "=''") + "?", {}, 2, 1},
      {R::TOO_MANY_DECLARATIONS, "<a" + Numbered(" xmlns:x", 256, "='u'") + ">\n<b xmlns=''/>", {}, 2, 1},
      {R::TOO_MANY_NODES, "<a>" + Repeat("<b/>", 1048575) + "\n", {}, 1, 4194304},
      {R::NAME_TOO_LONG, "<a>\n</" + std::string(4097, 'a') + ">", {}, 2, 3},
      {R::NAME_TOO_LONG, "<a " + std::string(4097, 'b') + "=''/>", {}, 1, 4},
      {R::NAME_TOO_LONG, "<?" + std::string(4097, 'b') + "?><a/>", {}, 1, 3},

      {R::OTHER_UNICODE_ENCODING, "\xFE\xFF\0<\0a"s, {}, 1, 1},
      {R::BEGINS_WITH_NULL, "<\0a\0"s, {}, 1, 2},
      {R::BEGINS_WITH_NULL, "<a>\0"s, {}, 1, 4},
      {R::TWO_BYTE_ORDER_MARKS, "\xEF\xBB\xBF\xEF\xBB\xBF<a/>", {}, 1, 1},
      {R::OTHER_ENCODING_DECLARED, "<?xml version='1.0'\nencoding='latin1'?><a/>", {"latin1"}, 2, 11},
      {R::OTHER_ENCODING_DECLARED, "<?xml version='1.0' encoding=''?><a/>", {""}, 1, 31},
      {R::NOT_UTF8, "<a>\n\xC3\xA4\xC3</a>", {}, 2, 3},
      {R::NOT_UTF8, "<a\xC3", {}, 1, 3},
      {R::NOT_UTF8, "<a x='\xE2\x82'/>", {}, 1, 7},
      {R::NOT_UTF8, "<a><!--\xFF--></a>", {}, 1, 8},
      {R::NOT_UTF8, "<a><?t \xFF?></a>", {}, 1, 8},
      {R::NOT_UTF8, "<a><![CDATA[\xFF]]></a>", {}, 1, 13},
      {R::NOT_US_ASCII, "<?xml version='1.0' encoding='us-ascii'?>\n<a>\xC3\xA4</a>", {}, 2, 4},
      {R::NOT_US_ASCII, "<?xml version='1.0' encoding='us-ascii'?>\n<a\xC3\xA4/>", {}, 2, 3},
      {R::NULL_BYTE, "<a>\n\0</a>"s, {}, 2, 1},
      {R::NULL_BYTE, "<ab \0/>"s, {}, 1, 5},
      {R::FORBIDDEN_CHARACTER, "<a>\n\x0B</a>", {"U+000B"}, 2, 1},
      {R::FORBIDDEN_CHARACTER, "<a x='\xEF\xBF\xBF'/>", {"U+FFFF"}, 1, 7},
      {R::FORBIDDEN_CHARACTER, "<a \x1F/>", {"U+001F"}, 1, 4},

      {R::OTHER_VERSION, "\xEF\xBB\xBF<?xml version='1.1'?><a/>", {"1.1"}, 1, 16},
      {R::MALFORMED_DECLARATION, "<?xml?><a/>", {}, 1, 6},
      {R::MALFORMED_DECLARATION, "<?xml ?><a/>", {}, 1, 7},
      {R::MALFORMED_DECLARATION, "<?xml encoding='UTF-8'?><a/>", {}, 1, 7},
      {R::MALFORMED_DECLARATION, "<?xml version '1.0'?><a/>", {}, 1, 15},
      {R::MALFORMED_DECLARATION, "<?xml version=1.0?><a/>", {}, 1, 15},
      {R::MALFORMED_DECLARATION, "<?xml version='1.0\"?><a/>", {}, 1, 19},
      {R::MALFORMED_DECLARATION, "<?xml version='1.0'encoding='UTF-8'?><a/>", {}, 1, 20},
      {R::MALFORMED_DECLARATION, "<?xml version='1.0' standalone='no' encoding='UTF-8'?><a/>", {}, 1, 37},
      {R::MALFORMED_DECLARATION, "<?xml version='1.0' ><a/>", {}, 1, 21},
      {R::NEITHER_YES_NOR_NO, "<?xml version='1.0' standalone='YES'?><a/>", {"YES"}, 1, 33},
      {R::ENDS_IN_DECLARATION, "<?xml", {}, 1, 6},
      {R::ENDS_IN_DECLARATION, "<?xml version='1.0", {}, 1, 19},
      {R::ENDS_IN_DECLARATION, "<?xml version='1.0' ", {}, 1, 21},
      {R::LATE_DECLARATION, "\n<?xml version='1.0'?><a/>", {}, 2, 1},

      {R::EMPTY_DOCUMENT, "", {}, 1, 1},
      {R::EMPTY_DOCUMENT, "\xEF\xBB\xBF", {}, 1, 1},
      {R::NO_ELEMENT, "<!--c-->\n", {}, 2, 1},
      {R::NO_ELEMENT, "<?xml version='1.0'?>", {}, 1, 22},
      {R::DOCUMENT_TYPE, "<!--c-->\n <!DOCTYPE a><a/>", {}, 2, 2},
      {R::DOCUMENT_TYPE, "<a>\n<!DOCTYPE a></a>", {}, 2, 1},
      {R::TEXT_BEFORE_ELEMENT, "\n{}", {}, 2, 1},
      {R::TEXT_BEFORE_ELEMENT, "<!--c-->&lt;<a/>", {}, 1, 9},
      {R::CONTENT_AFTER_ELEMENT, "<a/>\n<b/>", {}, 2, 1},
      {R::CONTENT_AFTER_ELEMENT, "<a/></a>", {}, 1, 5},
      {R::CONTENT_AFTER_ELEMENT, "<a></a>\n x", {}, 2, 2},
      {R::CDATA_OUTSIDE_ELEMENT, "<![CDATA[]]><a/>", {}, 1, 1},
      {R::CDATA_OUTSIDE_ELEMENT, "<a/>\n<![CDATA[]]>", {}, 2, 1},
      {R::ELEMENT_NOT_CLOSED, "<a>\n<p:b>\n", {"p:b", "2"}, 3, 1},

      {R::NO_NAME_AFTER_LESS_THAN, "<a>\n< b/></a>", {}, 2, 2},
      {R::NO_NAME_AFTER_LESS_THAN, "<-/>", {}, 1, 2},
      {R::NO_NAME_AFTER_LESS_THAN, "<\xC2\xB7/>", {}, 1, 2},
      {R::UNKNOWN_MARKUP, "<a>\n<!-x--></a>", {}, 2, 3},
      {R::UNKNOWN_MARKUP, "<a><!", {}, 1, 6},
      {R::NOT_QUALIFIED_NAME, "<a>\n<b:c:d/></a>", {}, 2, 5},
      {R::NOT_QUALIFIED_NAME, "<:b/>", {}, 1, 2},
      {R::NOT_QUALIFIED_NAME, "<b:/>", {}, 1, 4},
      {R::NOT_QUALIFIED_NAME, "<b:-c/>", {}, 1, 4},
      {R::NOT_QUALIFIED_NAME, "<a :b=''/>", {}, 1, 4},
      {R::NOT_QUALIFIED_NAME, "<a></b:c:d>", {}, 1, 9},
      {R::NOT_AN_ATTRIBUTE, "<a\n\"/>", {}, 2, 1},
      {R::NOT_AN_ATTRIBUTE, "<a?/>", {}, 1, 3},
      {R::NOT_AN_ATTRIBUTE, "<a <b/>", {}, 1, 4},
      {R::NO_SPACE_BEFORE_ATTRIBUTE, "<a x=''\ny=''z=''/>", {}, 2, 5},
      {R::ATTRIBUTE_WITHOUT_VALUE, "<a\nx />", {"x"}, 2, 3},
      {R::ATTRIBUTE_WITHOUT_VALUE, "<a p:x>", {"p:x"}, 1, 7},
      {R::VALUE_NOT_QUOTED, "<a x=\n1/>", {"x"}, 2, 1},
      {R::LESS_THAN_IN_VALUE, "<a x='\n<'/>", {"x"}, 2, 1},
      {R::SLASH_IN_START_TAG, "<a\n/ >", {}, 2, 2},
      {R::SLASH_IN_START_TAG, "<a//>", {}, 1, 4},
      {R::ATTRIBUTE_TWICE, "<a x='1'\n y='' x='1'/>", {"x"}, 2, 7},
      {R::ATTRIBUTE_TWICE, "<a xmlns:x='u' xmlns:x='u'/>", {"xmlns:x"}, 1, 16},
      {R::ATTRIBUTE_TWICE, "<a" + Numbered(" x", 9, "=''") + "\nx3='' x1=''/>", {"x3"}, 2, 1},
      {R::NO_NAME_IN_END_TAG, "<a>\n</ a>", {}, 2, 3},
      {R::MORE_IN_END_TAG, "<a></a\nx>", {}, 2, 1},
      {R::MORE_IN_END_TAG, "<a></a/>", {}, 1, 7},
      {R::END_TAG_WITHOUT_START_TAG, "\n</a>", {}, 2, 1},
      {R::OTHER_END_TAG, "<a>\n<b>\n</a>", {"b", "2"}, 3, 1},
      {R::OTHER_END_TAG, "<p:a></a>", {"p:a", "1"}, 1, 6},
      {R::ENDS_IN_START_TAG, "<", {}, 1, 2},
      {R::ENDS_IN_START_TAG, "<a\n", {}, 2, 1},
      {R::ENDS_IN_START_TAG, "<a:", {}, 1, 4},
      {R::ENDS_IN_START_TAG, "<a/", {}, 1, 4},
      {R::ENDS_IN_START_TAG, "<a x", {}, 1, 5},
      {R::ENDS_IN_START_TAG, "<a x=", {}, 1, 6},
      {R::ENDS_IN_VALUE, "<a x='\n", {"x"}, 2, 1},
      {R::ENDS_IN_END_TAG, "<a></", {}, 1, 6},
      {R::ENDS_IN_END_TAG, "<ab></a", {}, 1, 8},
      {R::ENDS_IN_END_TAG, "<a></a ", {}, 1, 8},

      {R::CDATA_END_IN_TEXT, "<a>\n]]]></a>", {}, 2, 2},
      {R::NO_REFERENCE, "<a>\n& </a>", {}, 2, 2},
      {R::NO_REFERENCE, "<a x='&;'/>", {}, 1, 8},
      {R::NO_DIGITS_IN_REFERENCE, "<a>&#;</a>", {}, 1, 6},
      {R::NO_DIGITS_IN_REFERENCE, "<a>&#x;</a>", {}, 1, 7},
      {R::NO_DIGITS_IN_REFERENCE, "<a>&#X41;</a>", {}, 1, 6},
      {R::NO_DIGITS_IN_REFERENCE, "<a>&#A;</a>", {}, 1, 6},
      {R::NO_SEMICOLON, "<a>&lt </a>", {}, 1, 7},
      {R::NO_SEMICOLON, "<a x='&#65x;'/>", {}, 1, 11},
      {R::NO_SEMICOLON, "<a>&p:lt;</a>", {}, 1, 6},
      {R::UNKNOWN_ENTITY, "<a>\n&nbsp;</a>", {"nbsp"}, 2, 1},
      {R::UNKNOWN_ENTITY, "<a x='&LT;'/>", {"LT"}, 1, 7},
      {R::FORBIDDEN_REFERENCE, "<a>\n&#x0;</a>", {"&#x0;"}, 2, 1},
      {R::FORBIDDEN_REFERENCE, "<a>&#65534;</a>", {"&#65534;"}, 1, 4},
      {R::FORBIDDEN_REFERENCE, "<a>&#4294967361;</a>", {"&#4294967361;"}, 1, 4}, // would be 'A' in 32 bits
      {R::FORBIDDEN_REFERENCE, "<a>&#x110000;</a>", {"&#x110000;"}, 1, 4},
      {R::ENDS_IN_REFERENCE, "<a>&", {}, 1, 5},
      {R::ENDS_IN_REFERENCE, "<a>&lt", {}, 1, 7},
      {R::ENDS_IN_REFERENCE, "<a>&#", {}, 1, 6},
      {R::ENDS_IN_REFERENCE, "<a>&#65", {}, 1, 8},
      {R::ENDS_IN_CDATA, "<a><![CDATA[\n]]", {}, 2, 3},

      {R::TWO_HYPHENS_IN_COMMENT, "<a><!--\n-- --></a>", {}, 2, 1},
      {R::TWO_HYPHENS_IN_COMMENT, "<a><!-- ---></a>", {}, 1, 9},
      {R::ENDS_IN_COMMENT, "<!--\n-", {}, 2, 2},
      {R::ENDS_IN_COMMENT, "<!----", {}, 1, 7},
      {R::NO_TARGET, "<a><? t?></a>", {}, 1, 6},
      {R::RESERVED_TARGET, "<a>\n<?XmL t?></a>", {"XmL"}, 2, 3},
      {R::COLON_IN_TARGET, "<a><?p:t?></a>", {}, 1, 7},
      {R::COLON_IN_TARGET, "<a><?:t?></a>", {}, 1, 6},
      {R::NO_SPACE_AFTER_TARGET, "<a><?t=?></a>", {}, 1, 7},
      {R::NO_SPACE_AFTER_TARGET,
       "<a><?t?"
       "?></a>",
       {},
       1,
       7},
      {R::ENDS_IN_INSTRUCTION, "<?t d\n?", {}, 2, 2},
      {R::ENDS_IN_INSTRUCTION, "<a><?xml", {}, 1, 9},
      {R::ENDS_IN_INSTRUCTION, "<?", {}, 1, 3},

      {R::XMLNS_ELEMENT, "<a>\n<xmlns:b/></a>", {}, 2, 2},
      {R::XMLNS_DECLARED, "<a x=''\nxmlns:xmlns='urn:a'/>", {}, 2, 1},
      {R::XML_BOUND_TO_OTHER, "<a xmlns:xml=''/>", {}, 1, 4},
      {R::XML_NAMESPACE_BOUND, "<a xmlns='http://www.w3.org/XML/1998/namespac&#101;'/>", {}, 1, 4},
      {R::XMLNS_NAMESPACE_BOUND, "<a xmlns='http://www.w3.org/2000/xmlns/'/>", {}, 1, 4},
      {R::PREFIX_UNDECLARED, "<a xmlns:p='urn:a'><b\nxmlns:p=''/></a>", {"p"}, 2, 1},
      {R::NOT_A_URI_REFERENCE, "<a xmlns='urn:a'\nxmlns:p='urn:a&#32;'/>", {"urn:a "}, 2, 1},
      {R::NOT_A_URI_REFERENCE, "<a xmlns='&#13;&#10;\xC3\xA4&#127; '/>", {"??\xC3\xA4? "}, 1, 4},
      {R::SAME_NAMESPACE_AND_NAME, "<a xmlns:p='u' xmlns:q='u' p:x=''\nq:x=''/>", {"p:x", "q:x"}, 2, 1},
      {R::SAME_NAMESPACE_AND_NAME, "<r xmlns:p='&#117;'><a xmlns:q='u' p:x='' q:x=''/></r>", {"p:x", "q:x"}, 1, 43},
      {R::SAME_NAMESPACE_AND_NAME,
       "<a xmlns:p='u' xmlns:q='u'" + Numbered(" x", 9, "=''") + " q:x='' p:x=''/>",
       {"q:x", "p:x"},
       1,
       89},
  };
}

TEST(Refusals, HaveATextAndThePositionOfTheFirstWrongByte) {
  for (const Case &refused : GetCases()) {
    SCOPED_TRACE(refused.document.substr(0, 100));
    EXPECT_THROWS_MESSAGE(ParseDocument(refused.document), XMLParseException,
                          FillIn(refused.refusal, refused.found) + " at line " + std::to_string(refused.line) +
                              ", column " + std::to_string(refused.column));
  }
}

TEST(Refusals, AreAllTested) {
  std::set<Refusal> tested;
  for (const Case &refused : GetCases()) {
    tested.insert(refused.refusal);
  }
  EXPECT_EQ(tested.size(), REFUSAL_COUNT);
}

TEST(Refusals, HaveDifferentTexts) {
  const std::set<std::string_view> texts(std::begin(REFUSAL_TEXTS), std::end(REFUSAL_TEXTS));
  EXPECT_EQ(texts.size(), REFUSAL_COUNT);
}

/// The first cell of each row of the table in the part of the page that begins with `heading`.
std::vector<std::string> ReadMessages(const std::string &page, const std::string &heading) {
  std::vector<std::string> messages;
  const std::size_t begin = page.find(heading);
  EXPECT_NE(begin, std::string::npos);
  const std::string part = page.substr(begin, page.find("\n## ", begin) - begin);
  const std::string rowBegin = "\n| `";
  for (std::size_t row = part.find(rowBegin); row != std::string::npos; row = part.find(rowBegin, row + 1)) {
    const std::size_t text = row + rowBegin.size();
    messages.push_back(part.substr(text, part.find("` |", text) - text));
  }
  return messages;
}

TEST(Refusals, AreListedForUsersInTheOrderOfTheCode) {
  std::vector<std::string> texts;
  for (std::size_t i = 0; i < REFUSAL_COUNT; ++i) {
    const std::size_t places =
        static_cast<std::size_t>(std::count(REFUSAL_TEXTS[i].begin(), REFUSAL_TEXTS[i].end(), '%'));
    texts.push_back(FillIn(static_cast<Refusal>(i), std::vector<std::string>(places, "…")));
  }
  EXPECT_EQ(ReadMessages(ReadDataFile("../../docs/troubleshooting.md"), "## The document ("), texts);
}

TEST(Refusals, ReportTheFirstDuplicateOfManyAttributes) {
  const std::string many = Numbered(" x", 20, "=''");
  EXPECT_THROWS_MESSAGE(ParseDocument("<a" + many + "\nx7=''\nx3=''/>"), XMLParseException,
                        "the attribute 'x7' occurs twice at line 2, column 1");
  EXPECT_THROWS_MESSAGE(ParseDocument("<a" + many + "\nx7='' x7=''\nx3=''/>"), XMLParseException,
                        "the attribute 'x7' occurs twice at line 2, column 1");
}

TEST(Refusals, ReportTheFirstAttributeWithTheNamespaceAndLocalNameOfAnother) {
  for (const std::string &more : {""s, Numbered(" x", 20, "=''")}) {
    const std::string start = "<a xmlns:p='u' xmlns:q='v' xmlns:r='v' xmlns:s='u'" + more;
    EXPECT_NO_THROW(ParseDocument(start + " o:y='' p:y='' q:y='' y=''/>"));
    EXPECT_THROWS_MESSAGE(ParseDocument(start + "\no:y='' p:y='' q:y='' s:y=''/>"), XMLParseException,
                          "the attributes 'p:y' and 's:y' have the same local name in the same namespace at line 2, "
                          "column 22");
    EXPECT_THROWS_MESSAGE(ParseDocument("<r xmlns:s='u'>" + start + "\np:y='' q:y='' r:y='' s:y=''/></r>"),
                          XMLParseException,
                          "the attributes 'q:y' and 'r:y' have the same local name in the same namespace at line 2, "
                          "column 15");
    EXPECT_THROWS_MESSAGE(ParseDocument(start + "\nq:y='' p:y='' s:y='' r:y=''/>"), XMLParseException,
                          "the attributes 'p:y' and 's:y' have the same local name in the same namespace at line 2, "
                          "column 15");
  }
}

TEST(Refusals, DoNotConcernWhatOnlyLooksWrong) {
  // Different namespaces, unbound prefixes, and a default namespace, which does not apply to attributes.
  const std::string many = Numbered(" x", 20, "=''");
  for (const std::string &more : {""s, many}) {
    EXPECT_NO_THROW(ParseDocument("<a xmlns:p='u' xmlns:q='U' p:x='' q:x=''" + more + "/>"));
    EXPECT_NO_THROW(ParseDocument("<a p:x='' q:x=''" + more + "/>"));
    EXPECT_NO_THROW(ParseDocument("<a xmlns:p='u' xmlns='u' p:x='' x=''" + more + "/>"));
    EXPECT_NO_THROW(ParseDocument("<r xmlns:p='u'><a xmlns:p='v' xmlns:q='u' p:x='' q:x=''" + more + "/></r>"));
    EXPECT_NO_THROW(ParseDocument("<r><b xmlns:p='u'/><a xmlns:q='u' p:x='' q:x=''" + more + "/></r>"));
    EXPECT_NO_THROW(ParseDocument("<a xml:x='' xmlns:q='u' q:x=''" + more + "/>"));
  }
  EXPECT_NO_THROW(ParseDocument("<?xml\tversion\n=\r\"1.0\" encoding = 'utf-8' standalone='yes' ?><a/>"));
  EXPECT_NO_THROW(ParseDocument("<?xml version='1.0' standalone='no'?><a/>"));
  EXPECT_NO_THROW(ParseDocument("<?xml-a?><?xmla?><?xm?><?xml\xC3\xA4?><a/>"));
  EXPECT_NO_THROW(ParseDocument("<a xmlns='' xmlns:p='%20' xmlns:q='#' xmlns:r='?'/>"));
  EXPECT_NO_THROW(ParseDocument("<a>]] >]><![CDATA[]]]]>></a>"));
  EXPECT_NO_THROW(ParseDocument("<a><!-- - -> <!- &x; ]]> --><?t ? > &x; ]]>?></a>"));
}

} // namespace
} // namespace Tarvel::Xml
