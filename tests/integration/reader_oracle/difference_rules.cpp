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

/// The rest of the document from the place where we refuse it.
std::string_view FromOurPosition(const Difference &difference) {
  const Reading &ours = difference.ours;
  const std::size_t offset = OffsetOf(difference.document, ours.line, ours.column);
  return difference.document.substr(std::min(offset, difference.document.size()));
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
  return difference.theirs.hasDocumentType &&
         OnlyWeRefuseAs(difference, "a document type declaration is not accepted") &&
         FromOurPosition(difference).starts_with("<!DOCTYPE");
}

std::string_view BeforeOurPosition(const Difference &difference) {
  return difference.document.substr(0, difference.document.size() - FromOurPosition(difference).size());
}

bool ContainsIgnoringCase(std::string_view text, std::string_view lowerCase) {
  const auto isSame = [](char written, char lower) {
    return (written >= 'A' && written <= 'Z' ? written | 0x20 : written) == lower;
  };
  return std::search(text.begin(), text.end(), lowerCase.begin(), lowerCase.end(), isSame) != text.end();
}

/// Whether we refuse a quoted value in the XML declaration that is neither `one` nor `other`, whatever its case.
bool IsOtherValueInDeclaration(const Difference &difference, std::string_view one, std::string_view other) {
  const std::string_view before = BeforeOurPosition(difference);
  const std::string_view rest = FromOurPosition(difference);
  const std::string_view value = rest.substr(0, rest.find_first_of("'\""));
  const bool isInDeclaration = before.substr(0, 10).find("<?xml") != NPOS && before.find("?>") == NPOS;
  const bool isOneOfThem = (value.size() == one.size() && ContainsIgnoringCase(value, one)) ||
                           (value.size() == other.size() && ContainsIgnoringCase(value, other));
  return isInDeclaration && !isOneOfThem && (before.ends_with('\'') || before.ends_with('"'));
}

bool IsOtherVersion(const Difference &difference) {
  return OnlyWeRefuseAs(difference, "the XML version '", "' is not 1.0") &&
         IsOtherValueInDeclaration(difference, "1.0", "1.0");
}

bool IsOtherEncoding(const Difference &difference) {
  return OnlyWeRefuseAs(difference, "the encoding '", "' is declared, only UTF-8 is accepted") &&
         IsOtherValueInDeclaration(difference, "utf-8", "us-ascii");
}

bool DeclaresAscii(std::string_view document) {
  const std::string_view declaration = document.substr(0, document.find("?>"));
  const std::string_view begin = declaration.substr(declaration.starts_with("\xEF\xBB\xBF") ? 3 : 0).substr(0, 6);
  return begin.starts_with("<?xml") && begin.find_first_of(" \t\r\n") == 5 &&
         ContainsIgnoringCase(declaration, "us-ascii");
}

bool IsBeyondAscii(const Difference &difference) {
  const std::string_view rest = FromOurPosition(difference);
  return OnlyWeRefuseAs(difference, "the document is declared as US-ASCII and is not") && !rest.empty() &&
         static_cast<unsigned char>(rest[0]) >= 0x80 && DeclaresAscii(difference.document);
}

bool IsUtf16(const Difference &difference) {
  const std::string_view document = difference.document;
  return OnlyWeRefuseAs(difference, "the document is UTF-16 or UTF-32") &&
         (document.starts_with("\xFF\xFE") || document.starts_with("\xFE\xFF") ||
          document.substr(0, 4).find('\0') != NPOS);
}

bool IsNameTooLong(const Difference &difference) {
  constexpr std::size_t LONGEST = 4096;
  const std::string_view rest = FromOurPosition(difference);
  return OnlyWeRefuseAs(difference, "a name is longer than 4096 bytes") && rest.size() > LONGEST &&
         rest.substr(0, LONGEST + 1).find_first_of("<>/=?&;\"' \t\r\n") == NPOS;
}

bool IsTooDeep(const Difference &difference) {
  const std::string_view before = BeforeOurPosition(difference);
  return OnlyWeRefuseAs(difference, "elements are nested deeper than 256") &&
         std::count(before.begin(), before.end(), '<') >= 256 && FromOurPosition(difference).starts_with('<');
}

bool HasTooManyAttributes(const Difference &difference) {
  const std::string_view rest = FromOurPosition(difference);
  const std::string_view tag = rest.substr(0, rest.find('<', 1));
  return OnlyWeRefuseAs(difference, "an element has more than 256 attributes") &&
         std::count(tag.begin(), tag.end(), '=') > 256;
}

bool HasTooManyDeclarations(const Difference &difference) {
  std::size_t declarations = 0;
  for (std::size_t place = difference.document.find("xmlns"); place != NPOS; ++declarations) {
    place = difference.document.find("xmlns", place + 1);
  }
  return OnlyWeRefuseAs(difference, "more than 256 namespace declarations are in scope") && declarations > 256;
}

bool IsNameOfFifthEdition(const Difference &difference) {
  return OnlyTheyRefuse(difference) && difference.theirs.code == XML_ERROR_INVALID_TOKEN &&
         (difference.libxml2.isAccepted || difference.libxml2.code == XML_WAR_NS_URI) &&
         !DeclaresAscii(difference.document) &&
         BeginsWithNameCharacter(
             difference.document.substr(std::min(difference.theirs.offset, difference.document.size())));
}

bool IsUnboundPrefix(const Difference &difference) {
  return OnlyTheyRefuse(difference) && difference.theirs.code == XML_ERROR_UNBOUND_PREFIX &&
         difference.expat.hasUnboundPrefix && (difference.libxml2.hasUnboundPrefix || !difference.libxml2.isAccepted);
}

/// The part of a message between its first quotation mark and its last.
std::string_view QuotedIn(std::string_view message) {
  const std::size_t begin = message.find('\'') + 1;
  return message.substr(begin, message.rfind('\'') - begin);
}

std::string_view AuthorityOf(std::string_view uri) {
  const std::size_t begin = uri.find("//");
  return begin == NPOS ? std::string_view() : uri.substr(begin + 2, uri.find_first_of("/?#", begin + 2) - begin - 2);
}

bool HasAddressInBrackets(const Difference &difference) {
  return OnlyWeRefuseAs(difference, "the namespace name '", "' is not a URI reference") &&
         AuthorityOf(QuotedIn(difference.ours.message)).find('[') != NPOS;
}

bool HasBracketInFragment(const Difference &difference) {
  const std::string_view uri = QuotedIn(difference.ours.message);
  return OnlyWeRefuseAs(difference, "the namespace name '", "' is not a URI reference") &&
         uri.find_first_of("[]", std::min(uri.find('#'), uri.size())) != NPOS;
}

bool IsInvalidNamespaceName(const Difference &difference) {
  return OnlyWeRefuseAs(difference, "the namespace name '", "' is not a URI reference") &&
         (difference.libxml2.code == XML_WAR_NS_URI || HasAddressInBrackets(difference) ||
          HasBracketInFragment(difference));
}

bool HasPortThatIsNotAnInt(const Difference &difference) {
  if (!OnlyTheyRefuse(difference) || difference.theirs.code != XML_WAR_NS_URI) {
    return false;
  }
  const std::string_view authority = AuthorityOf(QuotedIn(difference.theirs.message));
  const std::string_view port = authority.substr(std::min(authority.rfind(':'), authority.size()));
  return port == ":" || (port.size() > 10 && port.find_first_not_of("0123456789", 1) == NPOS);
}

bool IsEbcdic(const Difference &difference) {
  return OnlyWeRefuseAs(difference, "text comes before the document element") &&
         difference.document.starts_with("\x4C\x6F\xA7\x94"); // "<?xm"
}

bool IsNullByte(const Difference &difference) {
  return OnlyWeRefuseAs(difference, "the document holds a null byte") && FromOurPosition(difference).starts_with('\0');
}

bool IsPrefixXmlnsOnElement(const Difference &difference) {
  return OnlyWeRefuseAs(difference, "an element has the prefix 'xmlns'") &&
         FromOurPosition(difference).starts_with("xmlns:");
}

bool IsSpaceMissingAfterEncoding(const Difference &difference) {
  const std::string_view before = BeforeOurPosition(difference);
  return OnlyWeRefuse(difference) && difference.expat.code == XML_ERROR_XML_DECL && before.find("encoding") != NPOS &&
         before.find("?>") == NPOS && (before.ends_with('"') || before.ends_with('\''));
}

} // namespace

const std::vector<DifferenceRule> &DifferenceRules() {
  static const std::vector<DifferenceRule> rules{
      {"we refuse a document type declaration", ALL, IsDocumentType},
      {"we refuse a version other than 1.0", ALL, IsOtherVersion},
      {"we refuse a declared encoding other than UTF-8 and US-ASCII", ALL, IsOtherEncoding},
      {"we refuse octets beyond US-ASCII where that is declared", ALL, IsBeyondAscii},
      {"we refuse UTF-16 and UTF-32", ALL, IsUtf16},
      {"we refuse elements beyond the greatest depth", ALL, IsTooDeep},
      {"we refuse an element with too many attributes", ALL, HasTooManyAttributes},
      {"we refuse too long names", ALL, IsNameTooLong},
      {"we refuse too many declarations in scope", ALL, HasTooManyDeclarations},
      {"expat knows the names of the fourth edition only", BOTH_OF_EXPAT, IsNameOfFifthEdition},
      {"expat refuses an unbound prefix", EXPAT_WITH_NAMESPACES, IsUnboundPrefix},
      {"expat does not judge whether a namespace name is a URI", BOTH_OF_EXPAT, IsInvalidNamespaceName},
      {"libxml2 reads EBCDIC", LIBXML2, IsEbcdic},
      {"libxml2 ends at a null byte", LIBXML2, IsNullByte},
      {"libxml2 takes the prefix xmlns on an element for an unbound one", LIBXML2, IsPrefixXmlnsOnElement},
      {"libxml2 takes anything in brackets for an address in a namespace name", LIBXML2, HasAddressInBrackets},
      {"libxml2 accepts brackets in the fragment of a namespace name", LIBXML2, HasBracketInFragment},
      {"libxml2 wants a port that is an int in a namespace name", LIBXML2, HasPortThatIsNotAnInt},
      {"libxml2 needs no space after the encoding", LIBXML2, IsSpaceMissingAfterEncoding},
  };
  return rules;
}

} // namespace Testing
