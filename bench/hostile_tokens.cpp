// SPDX-License-Identifier: Apache-2.0

#include "hostile_tokens.h"

#include "hostile_pieces.h"

#include <cstddef>
#include <string>
#include <string_view>

namespace Bench {

namespace {

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

} // namespace

// Long because each shape is an entry of its own.
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

// Long because each shape is an entry of its own.
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

void AddMostNodesOfToken(ShapeList &shapes) {
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

} // namespace Bench
