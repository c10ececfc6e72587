// SPDX-License-Identifier: Apache-2.0

#include <tarvel/xml/parser.h>

#include "support/data_file.h"
#include "support/throws_message.h"
#include "support/xml_tree.h"

#include <tarvel/core/exception.h>

#include <gtest/gtest.h>

#include <memory>
#include <string>

namespace Tarvel::Xml {
namespace {

using ::Testing::ParseDocument;
using ::Testing::ReadDataFile;
using namespace std::string_literals;

struct Refused {
  std::string text;
  std::string message;
};

void ExpectRefused(const std::vector<Refused> &cases) {
  for (const Refused &refused : cases) {
    SCOPED_TRACE(refused.text);
    EXPECT_THROWS_MESSAGE(ParseDocument(refused.text), XMLParseException, refused.message);
  }
}

TEST(XMLParseException, ReportsLineAndColumn) {
  const XMLParseException exception("not readable", 3, 14);
  EXPECT_STREQ(exception.what(), "not readable at line 3, column 14");
  EXPECT_EQ(exception.GetLine(), 3u);
  EXPECT_EQ(exception.GetColumn(), 14u);
}

TEST(XMLParseException, KeepsItsClassAndPlaceWhenClonedAndThrown) {
  const std::unique_ptr<Exception> clone(XMLParseException("not readable", 3, 14).Clone());
  try {
    clone->Throw();
  } catch (const XMLParseException &thrown) {
    EXPECT_STREQ(thrown.what(), "not readable at line 3, column 14");
    EXPECT_EQ(thrown.GetLine(), 3u);
    return;
  }
  FAIL() << "not thrown as its own class";
}

TEST(ParseDocument, RefusesADocumentTypeDeclaration) {
  const std::string message = "a document type declaration is not accepted at line 1, column 1";
  ExpectRefused({
      {"<!DOCTYPE a><a/>", message},
      {"<!DOCTYPE a []><a/>", message},
      {"<!DOCTYPE a SYSTEM 'file:///etc/passwd'><a/>", message},
      {"<!DOCTYPE a PUBLIC '-//X//Y' 'http://127.0.0.1:1/a.dtd'><a/>", message},
      {"<?xml version='1.0'?>\n <!--c--><!DOCTYPE a><a/>",
       "a document type declaration is not accepted at line 2, column 10"},
  });
}

TEST(ParseDocument, RefusesEntityExpansionAttacks) {
  const std::string message = "a document type declaration is not accepted at line 1, column 1";
  std::string laughs = "<!DOCTYPE a [<!ENTITY l0 'ha'>";
  for (int i = 1; i < 10; ++i) {
    const std::string inner = "&l" + std::to_string(i - 1) + ";";
    laughs += "<!ENTITY l" + std::to_string(i) + " '" + inner + inner + inner + inner + inner + inner + "'>";
  }
  ExpectRefused({
      {laughs + "]><a>&l9;</a>", message},
      {"<!DOCTYPE a [<!ENTITY x '" + std::string(100'000, 'x') + "'>]><a>&x;&x;&x;&x;</a>", message},
      {"<!DOCTYPE a [<!ENTITY x SYSTEM 'file:///etc/passwd'>]><a>&x;</a>", message},
      {"<!DOCTYPE a [<!ENTITY % x SYSTEM 'http://127.0.0.1:1/x'> %x;]><a/>", message},
      {"<!DOCTYPE a [<!ATTLIST a x CDATA 'default'>]><a/>", message},
  });
}

TEST(ParseDocument, RefusesUndefinedEntities) {
  ExpectRefused({
      {"<a>&x;</a>", "the entity 'x' is not defined at line 1, column 4"},
      {"<a>\n&nbsp;</a>", "the entity 'nbsp' is not defined at line 2, column 1"},
      {"<a x='&x;'/>", "the entity 'x' is not defined at line 1, column 7"},
      {"<a xmlns='&x;'/>", "the entity 'x' is not defined at line 1, column 11"},
  });
}

TEST(ParseDocument, RefusesEncodingsOtherThanUtf8) {
  ExpectRefused({
      {"\xFF\xFE<\0a\0/\0>\0"s, "the document is UTF-16 or UTF-32, only UTF-8 is accepted at line 1, column 1"},
      {"\xFE\xFF\0<\0a\0/\0>"s, "the document is UTF-16 or UTF-32, only UTF-8 is accepted at line 1, column 1"},
      {"\xFF\xFE\0\0<\0\0\0"s, "the document is UTF-16 or UTF-32, only UTF-8 is accepted at line 1, column 1"},
      {"\0\0\xFE\xFF\0\0\0<"s, "the document is UTF-16 or UTF-32, only UTF-8 is accepted at line 1, column 1"},
      {"<\0a\0/\0>\0"s,
       "the document is UTF-16 or UTF-32, or begins with a null byte; only UTF-8 is accepted at line 1, column 2"},
      {"\0<\0a\0/\0>"s,
       "the document is UTF-16 or UTF-32, or begins with a null byte; only UTF-8 is accepted at line 1, column 1"},
      {"<?xml version='1.0' encoding='ISO-8859-1'?><a/>",
       "the encoding 'ISO-8859-1' is declared, only UTF-8 is accepted at line 1, column 31"},
      {"\xEF\xBB\xBF<?xml version='1.0'\n\tencoding = \"UTF-16\"?><a/>",
       "the encoding 'UTF-16' is declared, only UTF-8 is accepted at line 2, column 14"},
      {"<?xml version='1.0' encoding='UTF-7'?><a/>",
       "the encoding 'UTF-7' is declared, only UTF-8 is accepted at line 1, column 31"},
      {"<?xml version='1.0' encoding='no such encoding'?><a/>",
       "the encoding 'no such encoding' is declared, only UTF-8 is accepted at line 1, column 31"},
      {"<?xml version='1.0' encoding='US-ASCII'?><a>\xC3\xA4</a>",
       "the document is declared as US-ASCII and is not at line 1, column 45"},
  });
}

TEST(ParseDocument, RefusesBytesThatAreNotUtf8) {
  const std::string message = "the document is not UTF-8 at line 1, column 4";
  const char *const sequences[] = {"\x80",
                                   "\xC3",
                                   "\xC3(",
                                   "\xC0\x80",
                                   "\xC1\xBF",
                                   "\xE2\x82",
                                   "\xE0\x9F\xBF",
                                   "\xED\xA0\x80",
                                   "\xED\xBF\xBF",
                                   "\xF0\x9F\x98",
                                   "\xF0\x8F\xBF\xBF",
                                   "\xF4\x90\x80\x80",
                                   "\xF5\x80\x80\x80",
                                   "\xFF",
                                   "\xFE"};
  for (const std::string sequence : sequences) {
    ExpectRefused({{"<a>" + sequence + "</a>", message}});
  }
  ExpectRefused(
      {{"<a>\n<!-- " + std::string(500, 'x') + "\xFF --></a>", "the document is not UTF-8 at line 2, column 506"}});
}

TEST(ParseDocument, RefusesNullBytes) {
  ExpectRefused({
      {"<a>x\0y</a>"s, "the document holds a null byte at line 1, column 5"},
      {"<a>\n</a>\0"s, "the document holds a null byte at line 2, column 5"},
  });
}

TEST(ParseDocument, RefusesCharactersThatXmlCannotCarry) {
  ExpectRefused({
      {"<a>\x01</a>", "the document holds a character that XML 1.0 cannot carry (U+0001) at line 1, column 4"},
      {"<a>\x1F</a>", "the document holds a character that XML 1.0 cannot carry (U+001F) at line 1, column 4"},
      {"<a>\xEF\xBF\xBF</a>", "the document holds a character that XML 1.0 cannot carry (U+FFFF) at line 1, column 4"},
      {"<a>\xEF\xBF\xBE</a>", "the document holds a character that XML 1.0 cannot carry (U+FFFE) at line 1, column 4"},
      {"<a>&#0;</a>", "a reference is to a character that XML 1.0 cannot carry (&#0;) at line 1, column 4"},
      {"<a>&#x1;</a>", "a reference is to a character that XML 1.0 cannot carry (&#x1;) at line 1, column 4"},
      {"<a>&#xD800;</a>", "a reference is to a character that XML 1.0 cannot carry (&#xD800;) at line 1, column 4"},
  });
}

TEST(ParseDocument, RefusesXmlVersionsOtherThan10) {
  ExpectRefused({
      {"<?xml version='1.1'?><a/>", "the XML version '1.1' is not 1.0 at line 1, column 16"},
      {"<?xml version='2.0'?><a/>", "the XML version '2.0' is not 1.0 at line 1, column 16"},
      {"<?xml version=''?><a/>", "the XML version '' is not 1.0 at line 1, column 16"},
  });
}

TEST(ParseDocument, RefusesWhatIsNotWellFormed) {
  ExpectRefused({
      {"", "the document is empty at line 1, column 1"},
      {" \n ", "the document has no element at line 2, column 2"},
      {"no XML", "text comes before the document element at line 1, column 1"},
      {"<a>", "the element 'a' of line 1 is not closed where the document ends at line 1, column 4"},
      {"<a><b></a></b>", "the element 'b' of line 1 has another end tag at line 1, column 7"},
      {"<a/><b/>",
       "something other than comments and processing instructions follows the document element at line 1, column 5"},
      {"<a/>text",
       "something other than comments and processing instructions follows the document element at line 1, column 5"},
      {"<a x='1' x='2'/>", "the attribute 'x' occurs twice at line 1, column 10"},
      {"<a x=1/>", "the value of the attribute 'x' is not in quotation marks at line 1, column 6"},
      {"<a x/>", "the attribute 'x' has no value at line 1, column 5"},
      {"<a x='1'y='2'/>", "white space is missing before an attribute at line 1, column 9"},
      {"<a x='<'/>", "the value of the attribute 'x' holds '<' at line 1, column 7"},
      {"<a>]]></a>", "text holds ']]>' at line 1, column 4"},
      {"<a>&</a>", "'&' does not begin a reference at line 1, column 5"},
      {"<a><!-- -- --></a>", "a comment holds '--' at line 1, column 9"},
      {"<a><?xml version='1.0'?></a>",
       "an XML declaration is not at the beginning of the document at line 1, column 4"},
      {"<1/>", "'<' is not followed by a name at line 1, column 2"},
  });
}

TEST(ParseDocument, RefusesNamespaceErrorsExceptUnboundPrefixes) {
  ExpectRefused({
      {"<a xmlns:p='' p:x='1'/>", "the prefix 'p' is bound to the empty namespace name at line 1, column 4"},
      {"<a xmlns:p='urn:a' xmlns:p='urn:b'/>", "the attribute 'xmlns:p' occurs twice at line 1, column 20"},
      {"<a xmlns='urn:a' xmlns='urn:b'/>", "the attribute 'xmlns' occurs twice at line 1, column 18"},
      {"<a xmlns:p='urn:a' xmlns:q='urn:a' p:x='' q:x=''/>",
       "the attributes 'p:x' and 'q:x' have the same local name in the same namespace at line 1, column 43"},
      {"<a xmlns:xml='urn:a'/>", "the prefix 'xml' is bound to another namespace than its own at line 1, column 4"},
      {"<a xmlns:p='http://www.w3.org/XML/1998/namespace'/>",
       "the namespace of the prefix 'xml' is bound to another prefix or is the default at line 1, column 4"},
      {"<a xmlns='http://www.w3.org/XML/1998/namespace'/>",
       "the namespace of the prefix 'xml' is bound to another prefix or is the default at line 1, column 4"},
      {"<a xmlns:xmlns='http://www.w3.org/2000/xmlns/'/>", "the prefix 'xmlns' is declared at line 1, column 4"},
      {"<a xmlns:p='http://www.w3.org/2000/xmlns/'/>",
       "the namespace of the prefix 'xmlns' is declared at line 1, column 4"},
      {"<a xmlns='not a URI'/>", "the namespace name 'not a URI' is not a URI reference at line 1, column 4"},
      {"<a:b:c xmlns:a='urn:a'/>",
       "a name has a colon that is not between a prefix and a local name at line 1, column 5"},
      {"<:a/>", "a name has a colon that is not between a prefix and a local name at line 1, column 2"},
      {"<a><?p:t?></a>", "the target of a processing instruction has a colon at line 1, column 7"},
  });
}

TEST(ParseDocument, ShortensWhatItFoundAtACharacterBoundary) {
  std::string name = "x";
  for (int i = 0; i < 5000; ++i) {
    name += "\xC3\xA4";
  }
  try {
    ParseDocument("<a>&" + name + ";</a>");
    FAIL() << "accepted";
  } catch (const XMLParseException &exception) {
    EXPECT_EQ(std::string(exception.what()),
              "the entity '" + name.substr(0, 1023) + "... (8978 more bytes)' is not defined at line 1, column 4");
  }
}

TEST(ParseDocument, RefusesEveryPrefixOfADocument) {
  const std::string sample = "\xEF\xBB\xBF<?xml version='1.0' encoding='UTF-8'?>\n<!--c--><p:a xmlns:p='urn:a&amp;b' "
                             "xmlns=\"urn:d\" x='&#x20AC;'>"
                             "\xF0\x9F\x98\x80 &lt; <![CDATA[<&]]]]><?t d?><b/>\r\n</p:a>";
  ASSERT_NO_THROW(ParseDocument(sample));
  for (std::size_t length = 0; length < sample.size(); ++length) {
    EXPECT_THROW(ParseDocument(sample.substr(0, length)), XMLParseException) << sample.substr(0, length);
  }
}

TEST(ParseDocument, RefusesEveryPrefixOfAToken) {
  const std::string token = ReadDataFile("tokens/bearer.xml");
  const std::size_t end = token.rfind('>');
  ASSERT_NE(end, std::string::npos);
  ASSERT_NO_THROW(ParseDocument(token.substr(0, end + 1)));
  for (std::size_t length = 0; length <= end; ++length) {
    EXPECT_THROW(ParseDocument(token.substr(0, length)), XMLParseException) << length;
  }
}

TEST(ParseDocument, ParsesOrThrowsXMLParseExceptionForEveryChangedByteOfAToken) {
  std::string token = ReadDataFile("tokens/bearer.xml");
  ASSERT_FALSE(token.empty());
  std::size_t refused = 0;
  for (std::size_t offset = 0; offset < token.size(); ++offset) {
    const char original = token[offset];
    for (const char changed : {'<', '&', '"', '\0', '\xC3', ']'}) {
      token[offset] = changed;
      try {
        ParseDocument(token);
      } catch (const XMLParseException &exception) {
        ++refused;
        EXPECT_GE(exception.GetLine(), 1u);
        EXPECT_GE(exception.GetColumn(), 1u);
      }
    }
    token[offset] = original;
  }
  EXPECT_GE(refused, 3 * token.size()); // null, half a character and "&" are allowed nowhere, "<" hardly anywhere
}

} // namespace
} // namespace Tarvel::Xml
