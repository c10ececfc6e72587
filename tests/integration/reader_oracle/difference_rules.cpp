// SPDX-License-Identifier: Apache-2.0

#include "comparison.h"

#include "readers.h"

#include "xml/characters.h"

#include <expat.h>
#include <libxml/xmlerror.h>

#include <algorithm>

namespace Testing {

namespace {

constexpr unsigned LIBXML2 = static_cast<unsigned>(Peer::LIBXML2);
constexpr unsigned EXPAT = static_cast<unsigned>(Peer::EXPAT);
constexpr unsigned EXPAT_WITH_NAMESPACES = static_cast<unsigned>(Peer::EXPAT_WITH_NAMESPACES);
constexpr unsigned BOTH_OF_EXPAT = EXPAT | EXPAT_WITH_NAMESPACES;
constexpr unsigned ALL = LIBXML2 | BOTH_OF_EXPAT;

constexpr std::size_t NPOS = std::string_view::npos;

bool OnlyWeRefuse(const Difference &difference) {
  return !difference.ours.isAccepted && difference.theirs.isAccepted;
}

bool OnlyTheyRefuse(const Difference &difference) {
  return difference.ours.isAccepted && !difference.theirs.isAccepted;
}

bool OnlyWeRefuseAs(const Difference &difference, std::string_view beginning, std::string_view end = "") {
  const std::string_view message = difference.ours.message;
  return OnlyWeRefuse(difference) && message.starts_with(beginning) && message.ends_with(end);
}

/// The document from where we refuse it.
std::string_view FromOurPosition(const Difference &difference) {
  std::string_view rest = difference.document;
  if (rest.starts_with("\xEF\xBB\xBF")) {
    rest.remove_prefix(3);
  }
  for (std::uint32_t line = 1; line < difference.ours.line; ++line) {
    rest.remove_prefix(std::min(rest.find('\n'), rest.size() - 1) + 1);
  }
  return rest.substr(std::min<std::size_t>(difference.ours.column - 1, rest.size()));
}

/// Whether `text` begins with a character beyond ASCII that can be in a name.
bool BeginsWithNameCharacter(std::string_view text) {
  if (text.empty() || static_cast<unsigned char>(text[0]) < 0x80) {
    return false;
  }
  std::size_t offset = 0;
  return Tarvel::Xml::ReadCharacter(text, offset) != Tarvel::Xml::NO_CHARACTER &&
         Tarvel::Xml::IsNcName("a" + std::string(text.substr(0, offset)));
}

bool IsDocumentType(const Difference &difference) {
  return OnlyWeRefuse(difference) && difference.theirs.hasDocumentType;
}

bool IsOtherVersion(const Difference &difference) {
  return OnlyWeRefuseAs(difference, "the XML version '", "' is not 1.0");
}

bool IsOtherEncoding(const Difference &difference) {
  return OnlyWeRefuseAs(difference, "the encoding '", "' is declared, only UTF-8 is accepted");
}

bool IsAsciiInNameOnly(const Difference &difference) {
  const std::string_view rest = FromOurPosition(difference);
  return OnlyWeRefuseAs(difference, "the document is declared as US-ASCII and is not") && !rest.empty() &&
         static_cast<unsigned char>(rest[0]) >= 0x80;
}

bool IsUtf16(const Difference &difference) {
  return OnlyWeRefuseAs(difference, "the document is UTF-16 or UTF-32");
}

bool IsTooDeep(const Difference &difference) {
  return OnlyWeRefuseAs(difference, "elements are nested deeper than 256");
}

bool HasTooManyAttributes(const Difference &difference) {
  return OnlyWeRefuseAs(difference, "an element has more than 256 attributes");
}

bool HasTooManyDeclarations(const Difference &difference) {
  return OnlyWeRefuseAs(difference, "more than 256 namespace declarations are in scope");
}

bool IsNameOfFifthEdition(const Difference &difference) {
  return OnlyTheyRefuse(difference) && difference.theirs.code == XML_ERROR_INVALID_TOKEN &&
         BeginsWithNameCharacter(difference.document.substr(difference.theirs.offset));
}

bool IsUnboundPrefix(const Difference &difference) {
  return OnlyTheyRefuse(difference) && difference.theirs.code == XML_ERROR_UNBOUND_PREFIX &&
         difference.libxml2.hasUnboundPrefix && difference.expat.hasUnboundPrefix;
}

bool IsNamespaceNameThatIsNoUri(const Difference &difference) {
  return OnlyWeRefuse(difference) && difference.ours.message.find("is not a valid URI") != std::string::npos &&
         difference.libxml2.code == XML_WAR_NS_URI;
}

bool IsNullByte(const Difference &difference) {
  return OnlyWeRefuseAs(difference, "the document holds a null byte") && FromOurPosition(difference)[0] == '\0';
}

bool IsPrefixXmlnsOnElement(const Difference &difference) {
  return OnlyWeRefuse(difference) && difference.expat.code == NAMESPACE_FAULT &&
         difference.expat.message == "the prefix xmlns is on an element";
}

bool IsSpaceMissingAfterEncoding(const Difference &difference) {
  const std::string_view before =
      difference.document.substr(0, difference.document.size() - FromOurPosition(difference).size());
  return OnlyWeRefuse(difference) && difference.expat.code == XML_ERROR_XML_DECL && before.find("encoding") != NPOS &&
         before.find("?>") == NPOS && (before.ends_with('"') || before.ends_with('\''));
}

/// expat knows ISO-8859-1, in which all octets are characters.
bool IsLatin1(const Difference &difference) {
  const std::string_view declaration = difference.document.substr(0, difference.document.find("?>"));
  return OnlyWeRefuseAs(difference, "the document is not UTF-8") &&
         static_cast<unsigned char>(FromOurPosition(difference)[0]) >= 0x80 &&
         declaration.find("encoding='ISO-8859-1'") != NPOS;
}

#if __has_include("xml/sax_session.h")
bool IsOfToday(const Difference &difference) {
  return OnlyTheyRefuse(difference) && (difference.expat.message == "the prefix xmlns is on an element" ||
                                        difference.expat.code == XML_ERROR_XML_DECL);
}
#endif

} // namespace

const std::vector<DifferenceRule> &DifferenceRules() {
  static const std::vector<DifferenceRule> rules {
    {"we refuse a document type declaration", ALL, IsDocumentType},
        {"we refuse a version other than 1.0", ALL, IsOtherVersion},
        {"we refuse a declared encoding other than UTF-8 and US-ASCII", ALL, IsOtherEncoding},
        {"we refuse octets beyond US-ASCII where that is declared", ALL, IsAsciiInNameOnly},
        {"we refuse UTF-16 and UTF-32", ALL, IsUtf16}, {"we refuse elements beyond the greatest depth", ALL, IsTooDeep},
        {"we refuse an element with too many attributes", ALL, HasTooManyAttributes},
        {"we refuse too many declarations in scope", ALL, HasTooManyDeclarations},
        {"expat knows the names of the fourth edition only", BOTH_OF_EXPAT, IsNameOfFifthEdition},
        {"expat refuses an unbound prefix", EXPAT_WITH_NAMESPACES, IsUnboundPrefix},
        {"expat does not judge whether a namespace name is a URI", BOTH_OF_EXPAT, IsNamespaceNameThatIsNoUri},
        {"libxml2 ends at a null byte", LIBXML2, IsNullByte},
        {"libxml2 takes the prefix xmlns on an element for an unbound one", LIBXML2, IsPrefixXmlnsOnElement},
        {"libxml2 needs no space after the encoding", LIBXML2, IsSpaceMissingAfterEncoding},
        {"expat reads ISO-8859-1", BOTH_OF_EXPAT, IsLatin1},
#if __has_include("xml/sax_session.h")
        {"today's parser", ALL, IsOfToday},
#endif
  };
  return rules;
}

} // namespace Testing
