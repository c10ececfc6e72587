// SPDX-License-Identifier: Apache-2.0

#include "http/charset.h"

#include <gtest/gtest.h>

#include <string>

namespace Tarvel::Http {
namespace {

TEST(FindCharset, ReadsTheParameterInEachOfItsForms) {
  for (const char *const contentType :
       {"text/xml;charset=ISO-8859-1", "text/xml; charset=ISO-8859-1", "text/xml ; CharSet=\"ISO-8859-1\"",
        "text/xml;version=1;charset=ISO-8859-1;x=y", "text/xml;a=\"b;charset=wrong\";charset=ISO-8859-1",
        "text/xml;a=\"\\\";charset=wrong\" ; charset=ISO-8859-1 ", "text/xml;;x; charset=ISO-8859-1",
        "text/xml;charset=\"ISO\\-8859-1\"", ";charset=ISO-8859-1", "text/xml;charset=ISO-8859-1;charset=other",
        "text/xml\t;\tcharset\t=ISO-8859-1"}) {
    EXPECT_EQ(FindCharset(contentType), "ISO-8859-1") << contentType;
  }
}

TEST(FindCharset, ReturnsAnEmptyTextWithoutTheNameOfACharset) {
  for (const std::string &contentType :
       {std::string(), std::string("text/xml"), std::string("text/xml;"), std::string("text/xml;charset"),
        std::string("text/xml;charset="), std::string("text/xml;charset=\"\""), std::string("text/xml;charset=a b"),
        std::string("text/xml;charset=\"a b\""), std::string("text/xml;charset=\"<a>\""),
        std::string("text/xml;xcharset=a"), std::string("text/xml;charset=\xC3\xBC"),
        "text/xml;charset=" + std::string(41, 'a'), std::string("charset=utf-8")}) {
    EXPECT_EQ(FindCharset(contentType), "") << contentType;
  }
  EXPECT_EQ(FindCharset("text/xml;charset=" + std::string(40, 'a')), std::string(40, 'a'));
}

TEST(FindCharset, ReadsAQuotedStringWithoutEnd) {
  EXPECT_EQ(FindCharset("text/xml;charset=\"utf-8"), "utf-8");
  EXPECT_EQ(FindCharset("text/xml;charset=\""), "");
  EXPECT_EQ(FindCharset("text/xml;charset=\"\\"), "");
}

std::string Recoded(std::string body, const std::string &charset) {
  RecodeToUtf8(body, charset);
  return body;
}

TEST(RecodeToUtf8, ConvertsLatin1UnderEachOfItsNames) {
  for (const char *const name : {"ISO-8859-1", "iso-8859-1", "ISO_8859-1", "ISO_8859-1:1987", "iso-ir-100", "Latin1",
                                 "l1", "IBM819", "cp819", "csISOLatin1"}) {
    EXPECT_EQ(Recoded("<a>\xFC</a>", name), "<a>\xC3\xBC</a>") << name;
  }
}

TEST(RecodeToUtf8, ConvertsEachByte) {
  std::string latin1;
  std::string utf8;
  for (int byte = 0; byte < 256; ++byte) {
    latin1.push_back(static_cast<char>(byte));
    utf8 += byte < 0x80 ? std::string(1, static_cast<char>(byte))
                        : std::string{static_cast<char>(byte < 0xC0 ? 0xC2 : 0xC3),
                                      static_cast<char>(byte < 0xC0 ? byte : byte - 0x40)};
  }
  EXPECT_EQ(Recoded(latin1, "ISO-8859-1"), utf8);
}

TEST(RecodeToUtf8, ConvertsTheTextBeforeTheDeclaredEncoding) {
  EXPECT_EQ(Recoded("<?xml \xE1='1' encoding='latin1'?><a>\xFC</a>", "ISO-8859-1"),
            "<?xml \xC3\xA1='1' encoding='UTF-8'?><a>\xC3\xBC</a>");
}

TEST(RecodeToUtf8, LeavesUtf8Unchanged) {
  const std::string utf8 = "<?xml version='1.0' encoding='ISO-8859-1'?><a>\xC3\xBC</a>";
  EXPECT_EQ(Recoded(utf8, "ISO-8859-1"), utf8);
  EXPECT_EQ(Recoded("", "ISO-8859-1"), "");
  EXPECT_EQ(Recoded("<a/>", "ISO-8859-1"), "<a/>");
}

TEST(RecodeToUtf8, LeavesABodyOfAnyOtherCharsetUnchanged) {
  const std::string body = "<?xml version='1.0' encoding='ISO-8859-1'?><a>\xFC</a>";
  for (const char *const name : {"", "utf-8", "us-ascii", "windows-1252", "ISO-8859-15", "ISO-8859-2", "latin2"}) {
    EXPECT_EQ(Recoded(body, name), body) << name;
  }
}

TEST(RecodeToUtf8, ReplacesTheSameCharsetInTheXmlDeclaration) {
  const std::string rest = "?><a encoding=\"latin1\">\xFC</a>";
  const std::string utf8 = "?><a encoding=\"latin1\">\xC3\xBC</a>";
  for (const char *const start :
       {"<?xml version=\"1.0\" encoding=\"ISO-8859-1\"", "<?xml version=\"1.0\" encoding=\"iso_8859-1\"",
        "<?xml version='1.0' encoding='latin1'", "<?xml\nencoding\t=\r'l1' ",
        "<?xml version=\" encoding='latin1'\" encoding='CP819' standalone='yes'"}) {
    const std::string before = start;
    std::string after = before;
    for (const char *const name : {"ISO-8859-1", "iso_8859-1", "'l1'", "CP819", "='latin1'"}) {
      const std::size_t at = after.find(name);
      if (at != std::string::npos) {
        const bool isQuoted = name[0] == '\'';
        after.replace(at, std::string(name).size(), name[0] == '=' ? "='UTF-8'" : isQuoted ? "'UTF-8'" : "UTF-8");
        break;
      }
    }
    ASSERT_NE(after, before);
    EXPECT_EQ(Recoded(before + rest, "iso-8859-1"), after + utf8);
    EXPECT_EQ(Recoded(before + "?><a/>", "iso-8859-1"), after + "?><a/>");
  }
}

TEST(RecodeToUtf8, LeavesADeclarationOfAnotherEncodingAndABrokenOneUnchanged) {
  for (const char *const start :
       {"<?xml version=\"1.0\" encoding=\"windows-1252\"?>", "<?xml version=\"1.0\"?>", "<?xml encoding=\"latin1\"",
        "<?xml encoding=latin1?>", "<?xml encoding=\"latin1'?>", "<?xml encoding?>", "<?xml encoding", "<?xml",
        "<?xml ?>", "<?xml =\"latin1\"?>", " <?xml encoding=\"latin1\"?>", "<a encoding=\"latin1\"?>",
        "<?xmlx encoding='latin1' ?", "<?xml encoding=?>"}) {
    EXPECT_EQ(Recoded(std::string(start) + "\xFC", "latin1"), std::string(start) + "\xC3\xBC") << start;
  }
}

} // namespace
} // namespace Tarvel::Http
