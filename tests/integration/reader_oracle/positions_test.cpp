// SPDX-License-Identifier: Apache-2.0
// Where generated documents are refused: at the first invalid octet, or at the beginning of a construct that is wrong
// as a whole.

#include "comparison.h"
#include "generated_xml.h"
#include "readers.h"
#include "refusal_position.h"

#include "support/repetitions.h"

#include <gtest/gtest.h>

#include <libxml/xmlerror.h>

#include <cstdint>
#include <iostream>
#include <string>
#include <string_view>
#include <vector>

namespace {

using Testing::Escaped;
using Testing::Reading;
using Testing::ReadWithLibxml2;
using Testing::ReadWithPlatform;

constexpr std::size_t ALL_DOCUMENTS = 1'000'000;
const std::size_t DOCUMENTS = Testing::Repetitions<std::size_t>(ALL_DOCUMENTS, 20'000);
constexpr std::size_t MOST_FINDINGS = 20;

bool Is(const Reading &reading, std::string_view beginning, std::string_view end = "") {
  return std::string_view(reading.message).starts_with(beginning) && std::string_view(reading.message).ends_with(end);
}

/// Faults that libxml2 accepts; it reads on until it refuses something else.
bool IsAcceptedByLibxml2(const Reading &ours, const Reading &) {
  return Is(ours, "the XML version '", "' is not 1.0") ||
         Is(ours, "the encoding '", "' is declared, only UTF-8 is accepted") ||
         Is(ours, "the document is UTF-16 or UTF-32") || Is(ours, "the document is declared as US-ASCII and is not") ||
         Is(ours, "the document begins with two byte order marks") || Is(ours, "the XML declaration is malformed") ||
         Is(ours, "a name is longer than ") || Is(ours, "an element has the prefix 'xmlns'") ||
         Is(ours, "the namespace name '", "' is not a URI reference");
}

bool IsOfNamespaces(const Reading &theirs) {
  return theirs.code == XML_NS_ERR_XML_NAMESPACE || theirs.code == XML_NS_ERR_ATTRIBUTE_REDEFINED ||
         theirs.code == XML_WAR_NS_URI || theirs.code == XML_ERR_ATTRIBUTE_REDEFINED;
}

/// An attribute or a declaration that is wrong as a whole: libxml2 reports it at its end, or at the end of the tag.
bool IsWrongAttribute(const Reading &ours, const Reading &theirs) {
  return IsOfNamespaces(theirs) && (Is(ours, "the attribute '", "' occurs twice") ||
                                    Is(ours, "the attributes '", "' have the same local name in the same namespace") ||
                                    Is(ours, "the prefix '") || Is(ours, "the namespace of the prefix '"));
}

/// An end tag without a name or with another one: libxml2 reads on to its ">", and past white space.
bool IsWrongEndTag(const Reading &ours, const Reading &theirs) {
  return (theirs.code == XML_ERR_GT_REQUIRED || theirs.code == XML_ERR_TAG_NAME_MISMATCH) &&
         (Is(ours, "the element '", " has another end tag") || Is(ours, "'</' is not followed by a name") ||
          Is(ours, "a name has a colon that is not between a prefix and a local name"));
}

/// We refuse a document type declaration where it begins, and libxml2 refuses it within it.
bool IsDocumentType(const Reading &ours, const Reading &) {
  return Is(ours, "a document type declaration is not accepted");
}

struct LineRule {
  const char *name;
  bool (*applies)(const Reading &ours, const Reading &theirs);
};

constexpr LineRule WE_ARE_EARLIER[] = {{"libxml2 accepts that and refuses something else", IsAcceptedByLibxml2},
                                       {"an attribute or a declaration is reported where it begins", IsWrongAttribute},
                                       {"an end tag is reported where it begins", IsWrongEndTag},
                                       {"a document type declaration is reported where it begins", IsDocumentType}};

/// libxml2 checks declarations one by one before it has read the tag, and refuses some namespace names that we accept.
bool IsJudgedBeforeTheTagIsRead(const Reading &, const Reading &theirs) {
  return IsOfNamespaces(theirs);
}

/// We check the first four octets before all others.
bool IsNullByteAtBeginning(const Reading &ours, const Reading &) {
  return Is(ours, "the document is UTF-16 or UTF-32, or begins with a null byte");
}

constexpr LineRule WE_ARE_LATER[] = {
    {"libxml2 judges a declaration before it has read the tag", IsJudgedBeforeTheTagIsRead},
    {"the first four octets are judged before all others", IsNullByteAtBeginning}};

class LineComparison {
public:
  /// Whether the lines are the same, or a rule says why not.
  bool IsExplained(const Reading &ours, const Reading &theirs) {
    if (ours.line == theirs.line) {
      return true;
    }
    return ours.line < theirs.line ? Find(WE_ARE_EARLIER, ours, theirs, m_earlier)
                                   : Find(WE_ARE_LATER, ours, theirs, m_later);
  }

  void Report(bool isFull) const {
    Report(WE_ARE_EARLIER, m_earlier, isFull);
    Report(WE_ARE_LATER, m_later, isFull);
  }

private:
  template <std::size_t COUNT>
  static bool Find(const LineRule (&rules)[COUNT], const Reading &ours, const Reading &theirs,
                   std::vector<std::size_t> &counts) {
    counts.resize(COUNT);
    for (std::size_t i = 0; i < COUNT; ++i) {
      if (rules[i].applies(ours, theirs)) {
        ++counts[i];
        return true;
      }
    }
    return false;
  }

  template <std::size_t COUNT>
  static void Report(const LineRule (&rules)[COUNT], const std::vector<std::size_t> &counts, bool isFull) {
    for (std::size_t i = 0; i < COUNT; ++i) {
      const std::size_t count = counts.empty() ? 0 : counts[i];
      std::cout << count << " times " << rules[i].name << "\n";
      EXPECT_FALSE(isFull && count == 0) << "the rule never applies: " << rules[i].name;
    }
  }

  std::vector<std::size_t> m_earlier;
  std::vector<std::size_t> m_later;
};

TEST(PositionOfRefusal, IsOnTheLineThatLibxml2ReportsExceptForNamedDifferences) {
  LineComparison lines;
  std::size_t findings = 0;
  for (std::uint64_t seed = 0; seed < DOCUMENTS; ++seed) {
    const std::string document = Testing::GenerateXml(seed);
    const Reading ours = ReadWithPlatform(document);
    const Reading theirs = ReadWithLibxml2(document);
    if (ours.isAccepted || theirs.isAccepted || lines.IsExplained(ours, theirs)) {
      continue;
    }
    ADD_FAILURE() << "document " << seed << ": line " << theirs.line << " (" << theirs.code << " " << theirs.message
                  << "), where we say line " << ours.line << " (" << ours.message << "):\n"
                  << Escaped(document);
    ASSERT_LT(++findings, MOST_FINDINGS);
  }
  lines.Report(DOCUMENTS == ALL_DOCUMENTS);
}

TEST(PositionOfRefusal, IsAfterTextThatAWellFormedDocumentMayBeginWith) {
  std::size_t findings = 0;
  for (std::uint64_t seed = 0; seed < DOCUMENTS; ++seed) {
    const std::string document = Testing::GenerateXml(seed);
    const Reading ours = ReadWithPlatform(document);
    const std::string wrong = ours.isAccepted ? "" : Testing::DescribeWrongPosition(document, ours);
    if (!wrong.empty()) {
      ADD_FAILURE() << "document " << seed << ": " << wrong << "\n" << Escaped(document);
      ASSERT_LT(++findings, MOST_FINDINGS);
    }
  }
}

} // namespace
