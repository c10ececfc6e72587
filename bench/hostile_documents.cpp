// SPDX-License-Identifier: Apache-2.0
// Long because it is a table: each call of AddDocument or AddToken is one shape.

#include "hostile_documents.h"

#include <algorithm>
#include <cstdint>
#include <functional>
#include <stdexcept>
#include <string_view>
#include <utility>

namespace Bench {

namespace {

constexpr std::size_t MANY = 250;  // just below the limit of 256: for attributes, declarations in scope, depth
constexpr std::size_t LONG = 4000; // just below the limit of 4,096 octets

/// The `index`th piece of a document.
using Piece = std::function<std::string(std::size_t index)>;

Piece Always(std::string text) {
  return [text = std::move(text)](std::size_t) { return text; };
}

/// Returns `begin`, as many pieces as fit into `octets`, and `end`.
std::string Fill(std::size_t octets, const std::string &begin, const Piece &piece, const std::string &end) {
  std::string text;
  text.reserve(octets);
  text = begin;
  for (std::size_t index = 0;; ++index) {
    const std::string next = piece(index);
    if (text.size() + next.size() + end.size() > octets) {
      break;
    }
    text += next;
  }
  return text += end;
}

/// A short name, a different one for each index.
std::string Name(std::size_t index) {
  std::string name = "n";
  for (; index > 0; index /= 36) {
    name += "0123456789abcdefghijklmnopqrstuvwxyz"[index % 36];
  }
  return name;
}

std::string Repeat(std::size_t count, const Piece &piece) {
  std::string text;
  for (std::size_t index = 0; index < count; ++index) {
    text += piece(index);
  }
  return text;
}

/// Returns `piece` with its `~` replaced by enough blanks that a document of 16 MiB has just fewer nodes and attributes
/// than the limit. One piece has `nodes` nodes and attributes.
Piece Thin(std::string piece, std::size_t nodes) {
  constexpr std::size_t OCTETS_A_NODE = 17;
  const std::size_t blanks = nodes * OCTETS_A_NODE - std::min(piece.size(), nodes * OCTETS_A_NODE);
  piece.replace(piece.find('~'), 1, blanks + 1, ' ');
  return Always(std::move(piece));
}

/// One of the prefixes that the 32-bit hash FNV-1a, with its halves combined, puts into the first of 128 buckets.
std::string CollidingPrefix(std::size_t index) {
  static const std::vector<std::string> prefixes = [] {
    constexpr std::uint32_t BUCKETS = 128;
    std::vector<std::string> colliding;
    for (std::size_t candidate = 0; colliding.size() < MANY; ++candidate) {
      const std::string name = Name(candidate);
      std::uint32_t hash = 2166136261U;
      for (const char character : name) {
        hash = (hash ^ static_cast<unsigned char>(character)) * 16777619U;
      }
      if (((hash ^ (hash >> 16)) & (BUCKETS - 1)) == 0) {
        colliding.push_back(name);
      }
    }
    return colliding;
  }();
  return prefixes[index % prefixes.size()];
}

/// Makes ` xmlns:NAME="URI"`, both from the index.
Piece Declaring(const Piece &prefix, const Piece &uri) {
  return [=](std::size_t index) { return " xmlns:" + prefix(index) + "=\"" + uri(index) + '"'; };
}

class ShapeList {
public:
  explicit ShapeList(const std::string &token) : m_token(token) {}

  /// A document of pieces in a document element; `begin` is its start tag.
  void AddDocument(std::string name, Piece piece, std::string begin = "<r>", std::string end = "</r>") {
    m_shapes.push_back({std::move(name), [begin = std::move(begin), piece = std::move(piece), end = std::move(end)](
                                             std::size_t octets) { return Fill(octets, begin, piece, end); }});
  }

  /// The token with pieces between `before` and `after`, in place of the first occurrence of the text `replaced`.
  void AddToken(std::string name, std::string_view replaced, std::string before, Piece piece, std::string after) {
    const std::size_t at = m_token.find(replaced);
    if (at == std::string::npos) {
      throw std::runtime_error("the token has no " + std::string(replaced));
    }
    AddDocument(std::move(name), std::move(piece), m_token.substr(0, at) + before,
                after + m_token.substr(at + replaced.size()));
  }

  std::vector<HostileShape> Take() { return std::move(m_shapes); }

private:
  const std::string &m_token;
  std::vector<HostileShape> m_shapes;
};

void AddNames(ShapeList &shapes) {
  shapes.AddDocument("different element names", [](std::size_t i) { return '<' + Name(i) + "/>"; });
  shapes.AddDocument("different long element names",
                     [](std::size_t i) { return '<' + Name(i) + std::string(LONG, 'e') + "/>"; });
  shapes.AddDocument("one long element name", Always('<' + std::string(LONG, 'e') + "/>"));
  shapes.AddDocument("multi-byte element names",
                     [](std::size_t i) { return "<\xC3\xA9" + Name(i) + "\xE4\xB8\x80/>"; });
  shapes.AddDocument("different attribute names", [](std::size_t i) {
    return "<a" + Repeat(MANY, [i](std::size_t j) { return ' ' + Name(i * MANY + j) + "=''"; }) + "/>";
  });
  shapes.AddDocument("many attributes of an element, of the same names each time",
                     Always("<a" + Repeat(MANY, [](std::size_t j) { return ' ' + Name(j) + "=''"; }) + "/>"));
  shapes.AddDocument("different instruction targets", [](std::size_t i) { return "<?" + Name(i) + "?>"; });
  shapes.AddDocument("different unbound prefixes", [](std::size_t i) { return '<' + Name(i) + ":a/>"; });
  shapes.AddDocument("different unbound prefixes of attributes",
                     [](std::size_t i) { return "<a " + Name(i) + ":a=''/>"; });
  shapes.AddDocument("many unbound prefixes of the attributes of an element", [](std::size_t i) {
    return "<a" + Repeat(MANY, [i](std::size_t j) { return ' ' + Name(i * MANY + j) + ":a=''"; }) + "/>";
  });
  shapes.AddDocument("long unbound prefixes",
                     [](std::size_t i) { return '<' + Name(i) + std::string(LONG, 'p') + ":a/>"; });
}

// Long because each shape is an entry of its own.
void AddNamespaces(ShapeList &shapes) {
  const std::string longUri = "urn:" + std::string(LONG, 'u');
  const std::string manyDeclarations = Repeat(MANY, Declaring(Name, Name));
  shapes.AddDocument("different prefixes, each bound",
                     [](std::size_t i) { return '<' + Name(i) + ":a xmlns:" + Name(i) + "='u'/>"; });
  shapes.AddDocument("different namespace names", [](std::size_t i) { return "<a xmlns='u:" + Name(i) + "'/>"; });
  shapes.AddDocument("different long namespace names",
                     [longUri](std::size_t i) { return "<a xmlns='" + longUri + Name(i) + "'/>"; });
  shapes.AddDocument("names by the first of many declarations", Always('<' + Name(0) + ":a/>"),
                     "<r" + manyDeclarations + '>');
  shapes.AddDocument(
      "names by each of many declarations", [](std::size_t i) { return '<' + Name(i % MANY) + ":a/>"; },
      "<r" + manyDeclarations + '>');
  shapes.AddDocument(
      "names by many declarations whose prefixes collide in a hash",
      [](std::size_t i) { return '<' + CollidingPrefix(i) + ":a/>"; },
      "<r" + Repeat(MANY, Declaring(CollidingPrefix, Name)) + '>');
  shapes.AddDocument("names deep below their declarations", Always('<' + Name(0) + ":a/>"),
                     "<r" + manyDeclarations + '>' + Repeat(MANY, Always("<d>")),
                     Repeat(MANY, Always("</d>")) + "</r>");
  shapes.AddDocument("unbound names deep below many declarations", Always("<x:a x:b=''/>"),
                     "<r" + manyDeclarations + '>' + Repeat(MANY, Always("<d>")),
                     Repeat(MANY, Always("</d>")) + "</r>");
  shapes.AddDocument("a long prefix, bound once", Always('<' + std::string(LONG, 'p') + ":a/>"),
                     "<r xmlns:" + std::string(LONG, 'p') + "='u'>");
  shapes.AddDocument("many declarations of each element", Always("<a" + manyDeclarations + "/>"));
  shapes.AddDocument("one prefix bound anew at each depth", [](std::size_t i) {
    return Repeat(MANY, [i](std::size_t j) { return "<a xmlns='u:" + Name(i + j) + "'>"; }) +
           Repeat(MANY, Always("</a>"));
  });
  // Attributes of one local name are the same when their prefixes are bound to the same namespace name.
  const std::string equalLocals = "<a" + Repeat(MANY, [](std::size_t j) { return ' ' + Name(j) + ":a=''"; }) + "/>";
  shapes.AddDocument("attributes of one local name in many namespaces", Always(equalLocals),
                     "<r" + manyDeclarations + '>');
  // As many attributes as are compared one by one.
  const std::string fewEqualLocals = "<a" + Repeat(8, [](std::size_t j) { return ' ' + Name(j) + ":a=''"; }) + "/>";
  shapes.AddDocument("few attributes of one local name below many declarations", Always(fewEqualLocals),
                     "<r" + manyDeclarations + '>');
  shapes.AddDocument("attributes of one local name in many namespaces of long names", Always(equalLocals),
                     "<r" + Repeat(MANY / 4, Declaring(Name, [&](std::size_t j) { return longUri + Name(j); })) +
                         Repeat(MANY - MANY / 4, [](std::size_t j) { return Declaring(Name, Name)(j + MANY / 4); }) +
                         '>');
  shapes.AddDocument("attributes of one local name, declared where they are", [longUri](std::size_t i) {
    return "<a" +
           Repeat(MANY / 2,
                  [&longUri, i](std::size_t j) {
                    return Declaring(Name, Always(longUri.substr(0, 60) + Name(i + j)))(j) + ' ' + Name(j) + ":a=''";
                  }) +
           "/>";
  });
}

void AddContent(ShapeList &shapes) {
  shapes.AddDocument("entity references", Always("&amp;"));
  shapes.AddDocument("decimal references", Always("&#65;"));
  shapes.AddDocument("hexadecimal references", Always("&#x10FFFF;"));
  shapes.AddDocument("references with many zeros", Always("&#x" + std::string(LONG, '0') + "41;"));
  shapes.AddDocument("comments", Always("<!---->"));
  shapes.AddDocument("instructions", Always("<?a?>"));
  shapes.AddDocument("CDATA sections", Always("<![CDATA[]]>"));
  shapes.AddDocument("CDATA sections between characters", Always("x<![CDATA[y]]>"));
  shapes.AddDocument("empty elements", Always("<a/>"));
  shapes.AddDocument("empty elements with an end tag", Always("<a></a>"));
  shapes.AddDocument("elements between characters", Always("<a/>x"));
  shapes.AddDocument("elements of two attributes", Always("<a b='' c=''/>"));
  shapes.AddDocument("blanks within tags", Always("<a" + std::string(LONG, ' ') + "/>"));
  shapes.AddDocument("deep content", Always(Repeat(MANY, Always("<a>")) + Repeat(MANY, Always("</a>"))));
  shapes.AddDocument("deep content of different names", [](std::size_t i) {
    return Repeat(MANY, [i](std::size_t j) { return '<' + Name(i + j) + '>'; }) +
           Repeat(MANY, [i](std::size_t j) { return "</" + Name(i + MANY - 1 - j) + '>'; });
  });
  shapes.AddDocument("carriage returns", Always("\r"));
  shapes.AddDocument("carriage returns and line feeds", Always("\r\n"));
  shapes.AddDocument("line feeds", Always("\n"));
  shapes.AddDocument("white space", Always(" "));
  shapes.AddDocument("closing brackets", Always("]] "));
  shapes.AddDocument("closing brackets in a row", Always("]"));
  shapes.AddDocument("closing brackets in a CDATA section", Always("]"), "<r><![CDATA[", "x]]></r>");
  shapes.AddDocument("hyphens in a comment", Always("- "), "<r><!--", "--></r>");
  shapes.AddDocument("question marks in an instruction", Always("?"), "<r><?a ", " ?></r>");
  shapes.AddDocument("characters of two octets", Always("\xC3\xA9"));
  shapes.AddDocument("characters of three octets", Always("\xE4\xB8\x80"));
  shapes.AddDocument("characters of four octets", Always("\xF0\x9F\x98\x80"));
  shapes.AddDocument("characters of one and of four octets", Always("a\xF0\x9F\x98\x80"));
  shapes.AddDocument("a long value", Always("v"), "<r a='", "'/>");
  shapes.AddDocument("a long value of references", Always("&lt;"), "<r a='", "'/>");
  shapes.AddDocument("a long value of line ends", Always("\r\n\t"), "<r a='", "'/>");
  shapes.AddDocument("short values of references", Always("<a b='&lt;'/>"));
}

void AddUnterminated(ShapeList &shapes) {
  shapes.AddDocument("a comment without end", Always("- "), "<r><!--", "");
  shapes.AddDocument("a CDATA section without end", Always("]] "), "<r><![CDATA[", "");
  shapes.AddDocument("an instruction without end", Always("? "), "<r><?a ", "");
  shapes.AddDocument("a tag without end", Always(" "), "<r", "");
  shapes.AddDocument("a value without end", Always("v "), "<r a='", "");
  shapes.AddDocument("a name without end", Always("n"), "<", "");
  shapes.AddDocument("a reference without end", Always("n"), "<r>&", "");
  shapes.AddDocument("nothing but less-than signs", Always("<"), "", "");
  shapes.AddDocument("content without end", Always("<a/>x"), "<r>", "");
  shapes.AddDocument("white space after the document element", Always(" "), "<r/>", "");
  shapes.AddDocument("comments before the document element", Always("<!---->"), "", "<r/>");
}

constexpr std::string_view NAME_ID = "alice@corp.example";
constexpr std::string_view VALUE = "<saml:AttributeValue>corp.example\\Administrators</saml:AttributeValue>";
constexpr std::string_view AUDIENCE = "<saml:Audience>https://files.corp.example/</saml:Audience>";
constexpr std::string_view AFTER_CONDITIONS = "<saml:AuthnStatement";
constexpr std::string_view IN_KEY_INFO = "<ds:X509Data>";
constexpr std::string_view DOCUMENT_START = "<saml:Assertion ";
constexpr std::string_view SIGNED_INFO = "<ds:SignatureMethod";
constexpr std::string_view DIGEST_VALUE = "<ds:DigestValue>";

std::string Before(std::string_view place) {
  return std::string(place);
}

/// What these shapes change is covered by a digest, but the signature over the digests stays genuine. So the verifier
/// digests every token of the right form.
/// Long because each shape is an entry of its own.
void AddSignedContent(ShapeList &shapes) {
  const std::string value(VALUE);
  shapes.AddToken("in a name: characters", NAME_ID, "a", Always("x"), "@corp.example");
  shapes.AddToken("in a name: references", NAME_ID, "a", Always("&lt;"), "@corp.example");
  shapes.AddToken("in a name: carriage returns", NAME_ID, "a", Always("&#13;"), "@corp.example");
  shapes.AddToken("in a name: signs to split at", NAME_ID, "a", Always("@"), "corp.example");
  shapes.AddToken("in a name: comments", NAME_ID, "a@corp.example", Always("<!---->"), "");
  shapes.AddToken("a long value of an attribute", "corp.example\\Administrators", "a\\", Always("x"), "");
  shapes.AddToken("many values of an attribute", VALUE, value,
                  Always("<saml:AttributeValue>a\\b</saml:AttributeValue>"), "");
  shapes.AddToken("many values of references", VALUE, value,
                  Always("<saml:AttributeValue>&#13;\\&#13;</saml:AttributeValue>"), "");
  shapes.AddToken("many values with a type", VALUE, value,
                  Always("<saml:AttributeValue xmlns:i='http://www.w3.org/2001/XMLSchema-instance' i:type='x'>a\\b"
                         "</saml:AttributeValue>"),
                  "");
  shapes.AddToken(
      "many values with many declarations", VALUE, value,
      Always("<saml:AttributeValue" + Repeat(MANY - 10, Declaring(Name, Always("u:"))) + ">a\\b</saml:AttributeValue>"),
      "");
  shapes.AddToken("comments between elements", AFTER_CONDITIONS, "", Always("<!---->"), Before(AFTER_CONDITIONS));
  shapes.AddToken("white space between elements", AFTER_CONDITIONS, "", Always(" \n"), Before(AFTER_CONDITIONS));
  shapes.AddToken("comments and white space between elements", AFTER_CONDITIONS, "", Always(" <!-- -->"),
                  Before(AFTER_CONDITIONS));
  shapes.AddToken(
      "many audiences", AUDIENCE, "", [](std::size_t i) { return "<saml:Audience>" + Name(i) + "</saml:Audience>"; },
      "");
  shapes.AddToken(
      "many audiences that begin alike", AUDIENCE, "",
      [](std::size_t i) { return "<saml:Audience>" + std::string(LONG / 4, 'a') + Name(i) + "</saml:Audience>"; }, "");
  shapes.AddToken("one audience many times", AUDIENCE, "", Always(std::string(AUDIENCE)), "");
  shapes.AddToken("many attributes", "<saml:Attribute Name=", "", Always("<saml:Attribute Name='a'/>"),
                  "<saml:Attribute Name=");
  const std::string advice = "<saml:Advice xmlns:r='http://www.rsa.com/names/2009/12/std-ext/SAML2.0'>";
  shapes.AddToken("many pieces of advice", AFTER_CONDITIONS, advice, Always("<r:RSAAdvice AdviceSource='a'/>"),
                  "</saml:Advice>" + Before(AFTER_CONDITIONS));
  shapes.AddToken("many attributes of advice", AFTER_CONDITIONS, advice + "<r:RSAAdvice AdviceSource='a'>",
                  Always("<saml:Attribute Name='a'/>"), "</r:RSAAdvice></saml:Advice>" + Before(AFTER_CONDITIONS));
  shapes.AddToken("deep content in advice", AFTER_CONDITIONS, advice,
                  Always(Repeat(MANY - 10, Always("<a>")) + Repeat(MANY - 10, Always("</a>"))),
                  "</saml:Advice>" + Before(AFTER_CONDITIONS));
  const std::string delegation =
      "<saml:Condition xmlns:d='urn:oasis:names:tc:SAML:2.0:conditions:delegation' "
      "xmlns:i='http://www.w3.org/2001/XMLSchema-instance' i:type='d:DelegationRestrictionType'>";
  shapes.AddToken("many delegates", "<saml:AudienceRestriction>", delegation,
                  Always("<d:Delegate DelegationInstant='2020-01-01T00:00:00Z'><saml:NameID "
                         "Format='http://schemas.xmlsoap.org/claims/UPN'>a@b</saml:NameID></d:Delegate>"),
                  "</saml:Condition><saml:AudienceRestriction>");
  shapes.AddToken("many unknown conditions", "<saml:AudienceRestriction>", "", Always("<a/>"),
                  "<saml:AudienceRestriction>");
  const std::string first = CollidingPrefix(0);
  shapes.AddToken("values by the first of many prefixes that collide in a hash", "<saml:AttributeStatement>",
                  "<saml:AttributeStatement xmlns:" + first + "='urn:oasis:names:tc:SAML:2.0:assertion'" +
                      Repeat(MANY - 10, [](std::size_t j) { return Declaring(CollidingPrefix, Always("u:"))(j + 1); }) +
                      "><saml:Attribute Name='a' NameFormat='urn:oasis:names:tc:SAML:2.0:attrname-format:uri'>",
                  Always('<' + first + ":AttributeValue>a</" + first + ":AttributeValue>"), "</saml:Attribute>");
}

/// Documents with as many nodes as the limit allows, which take the most memory.
/// Long because each shape is an entry of its own.
void AddMostNodes(ShapeList &shapes) {
  shapes.AddDocument("most elements", Thin("<a~/>", 1));
  shapes.AddDocument("most elements with an end tag", Thin("<a~></a>", 1));
  shapes.AddDocument("most elements with an attribute", Thin("<a b=''~/>", 2));
  shapes.AddDocument("most elements with a text", Thin("<a~>b</a>", 2));
  shapes.AddDocument("most comments", Thin("<!--~-->", 1));
  shapes.AddDocument("most instructions", Thin("<?a~?>", 1));
  shapes.AddToken("most values", "<saml:AttributeStatement>",
                  "<saml:AttributeStatement xmlns:s='urn:oasis:names:tc:SAML:2.0:assertion'><saml:Attribute Name='a'>",
                  Thin("<s:AttributeValue~>a</s:AttributeValue>", 2), "</saml:Attribute>");
  shapes.AddToken("most groups", "<saml:AttributeStatement>",
                  "<saml:AttributeStatement xmlns:s='urn:oasis:names:tc:SAML:2.0:assertion'>"
                  "<saml:Attribute Name='http://www.rsa.com/schemas/attr-names/2009/01/GroupIdentity'>",
                  Thin("<s:AttributeValue~>a\\b</s:AttributeValue>", 2), "</saml:Attribute>");
  shapes.AddToken("most attributes", "<saml:Attribute Name=", "", Thin("<saml:Attribute Name='a'~/>", 2),
                  "<saml:Attribute Name=");
  shapes.AddToken("most attributes with a reference in the name", "<saml:Attribute Name=", "",
                  Thin("<saml:Attribute Name='&#65;aaaa'~/>", 2), "<saml:Attribute Name=");
  shapes.AddToken("most elements where attributes belong", "<saml:Attribute Name=", "", Thin("<a~/>", 1),
                  "<saml:Attribute Name=");
  shapes.AddToken("most attributes without a name", "<saml:Attribute Name=", "", Thin("<saml:Attribute a=''~/>", 2),
                  "<saml:Attribute Name=");
  shapes.AddToken("most attributes with a value", "<saml:Attribute Name=", "",
                  Thin("<saml:Attribute Name='a'~><saml:AttributeValue>a</saml:AttributeValue></saml:Attribute>", 4),
                  "<saml:Attribute Name=");
  const std::string advice = "<saml:Advice xmlns:r='http://www.rsa.com/names/2009/12/std-ext/SAML2.0'>";
  shapes.AddToken("most pieces of advice", AFTER_CONDITIONS, advice, Thin("<r:RSAAdvice AdviceSource='a'~/>", 2),
                  "</saml:Advice>" + Before(AFTER_CONDITIONS));
  shapes.AddToken("most attributes of advice", AFTER_CONDITIONS, advice + "<r:RSAAdvice AdviceSource='a'>",
                  Thin("<saml:Attribute Name='a'~/>", 2), "</r:RSAAdvice></saml:Advice>" + Before(AFTER_CONDITIONS));
  shapes.AddToken("most transforms", "<ds:Transform ", "", Thin("<ds:Transform Algorithm='a'~/>", 2), "<ds:Transform ");
  shapes.AddToken("most references", "<ds:Reference ", "",
                  Thin("<ds:Reference URI=''~><ds:DigestMethod Algorithm=''/><ds:DigestValue>AA==</ds:DigestValue>"
                       "</ds:Reference>",
                       6),
                  "<ds:Reference ");
  shapes.AddToken("most references with transforms", "<ds:Reference ", "",
                  Thin("<ds:Reference URI=''~><ds:Transforms><ds:Transform Algorithm=''/></ds:Transforms>"
                       "<ds:DigestMethod Algorithm=''/><ds:DigestValue>AA==</ds:DigestValue></ds:Reference>",
                       9),
                  "<ds:Reference ");
  shapes.AddToken("most elements in a signature", IN_KEY_INFO, "", Thin("<a~/>", 1), Before(IN_KEY_INFO));
}

/// `ds:KeyInfo` may contain anything, and no digest covers it.
/// Long because each shape is an entry of its own.
void AddSignatureContent(ShapeList &shapes) {
  const std::string after(IN_KEY_INFO);
  shapes.AddToken(
      "in a signature: different element names", IN_KEY_INFO, "", [](std::size_t i) { return '<' + Name(i) + "/>"; },
      after);
  shapes.AddToken("in a signature: deep content", IN_KEY_INFO, "",
                  Always(Repeat(MANY - 10, Always("<a>")) + Repeat(MANY - 10, Always("</a>"))), after);
  shapes.AddToken(
      "in a signature: different identifiers", IN_KEY_INFO, "",
      [](std::size_t i) { return "<a ID='" + Name(i) + "'/>"; }, after);
  shapes.AddToken("in a signature: equal identifiers", IN_KEY_INFO, "", Always("<a ID='i'/>"), after);
  shapes.AddToken("in a signature: the identifier of the token", IN_KEY_INFO, "",
                  Always("<a a='_2454ad61-c2ac-c04f-0a20-fabf7f2bc96f'/>"), after);
  shapes.AddToken(
      "in a signature: the identifier of the token deep below many declarations", IN_KEY_INFO,
      "<r" + Repeat(MANY - 10, Declaring(Name, Name)) + '>' + Repeat(MANY - 10, Always("<d>")),
      Always("<a" +
             Repeat(MANY - 10,
                    [](std::size_t j) { return ' ' + Name(j) + ":Id='_2454ad61-c2ac-c04f-0a20-fabf7f2bc96f'"; }) +
             "/>"),
      Repeat(MANY - 10, Always("</d>")) + "</r>" + after);
  // The search for certificates compares names.
  const std::string manyDeclarations = Repeat(MANY - 10, Declaring(Name, Always("http://www.w3.org/2000/09/xmldsig#")));
  shapes.AddToken("in a signature: data by the first of many declarations", "<ds:KeyInfo>",
                  "<ds:KeyInfo" + manyDeclarations + '>', Always('<' + Name(0) + ":X509Data/>"), "");
  shapes.AddToken("in a signature: certificates by the first of many declarations", "<ds:X509Data>",
                  "<ds:X509Data" + manyDeclarations + '>', Always('<' + Name(0) + ":X509Certificate/>"), "");
  shapes.AddToken("in a signature: data without certificates", IN_KEY_INFO, "", Always("<ds:X509Data/>"), after);
  shapes.AddToken("in a signature: certificates", IN_KEY_INFO, after,
                  Always("<ds:X509Certificate>MIIC</ds:X509Certificate>"), "");
  shapes.AddToken("in a signature: a blank certificate", IN_KEY_INFO, after + "<ds:X509Certificate>", Always(" "),
                  "</ds:X509Certificate>");
  shapes.AddToken("in a signature: objects", "</ds:Signature>", "", Always("<ds:Object/>"), "</ds:Signature>");
  shapes.AddToken("in a signature: a long digest value", DIGEST_VALUE, Before(DIGEST_VALUE), Always("AAAA"), "");
  shapes.AddToken("in a signature: a blank digest value", DIGEST_VALUE, Before(DIGEST_VALUE), Always(" "), "");
  shapes.AddToken("in a signature: white space that is signed", SIGNED_INFO, "", Always(" "), Before(SIGNED_INFO));
  shapes.AddToken("in a signature: comments among what is signed", SIGNED_INFO, "", Always("<!---->"),
                  Before(SIGNED_INFO));
  shapes.AddToken("in a signature: references", "<ds:Reference ", "",
                  Always("<ds:Reference URI='#a'><ds:DigestMethod Algorithm='a'/><ds:DigestValue>AAAA</ds:DigestValue>"
                         "</ds:Reference>"),
                  "<ds:Reference ");
  shapes.AddToken("in a signature: transforms", "<ds:Transform ", "", Always("<ds:Transform Algorithm='a'/>"),
                  "<ds:Transform ");
  shapes.AddToken("in a signature: parameters of a transform",
                  "<ds:Transform Algorithm=\"http://www.w3.org/2001/10/xml-exc-c14n#\"/>",
                  "<ds:Transform Algorithm=\"http://www.w3.org/2001/10/xml-exc-c14n#\">", Always("<a/>"),
                  "</ds:Transform>");
  const std::string list = "<e:InclusiveNamespaces xmlns:e=\"http://www.w3.org/2001/10/xml-exc-c14n#\" PrefixList=\"";
  shapes.AddToken(
      "in a signature: a list of many prefixes",
      "<ds:Transform Algorithm=\"http://www.w3.org/2001/10/xml-exc-c14n#\"/>",
      "<ds:Transform Algorithm=\"http://www.w3.org/2001/10/xml-exc-c14n#\">" + list,
      [](std::size_t i) { return Name(i) + ' '; }, "\"/></ds:Transform>");
  shapes.AddToken("in a signature: a list of blanks",
                  "<ds:Transform Algorithm=\"http://www.w3.org/2001/10/xml-exc-c14n#\"/>",
                  "<ds:Transform Algorithm=\"http://www.w3.org/2001/10/xml-exc-c14n#\">" + list, Always(" "),
                  "\"/></ds:Transform>");
  shapes.AddToken("a long identifier", " ID=\"_", " ID=\"_", Always("i"), "");
  shapes.AddToken(
      "attributes of the token", DOCUMENT_START, Before(DOCUMENT_START),
      [](std::size_t i) { return 'a' + Name(i) + "='' "; }, "");
}

} // namespace

std::vector<HostileShape> MakeHostileShapes(const std::string &token) {
  ShapeList shapes(token);
  AddNames(shapes);
  AddNamespaces(shapes);
  AddContent(shapes);
  AddUnterminated(shapes);
  AddSignedContent(shapes);
  AddSignatureContent(shapes);
  AddMostNodes(shapes);
  return shapes.Take();
}

} // namespace Bench
