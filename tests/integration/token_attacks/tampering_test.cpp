// SPDX-License-Identifier: Apache-2.0
// One change to one field of a genuine token, each caught by the first check that can.

#include "outcome.h"

#include <gtest/gtest.h>

#include <string>

namespace Attacks {
namespace {

constexpr const char *CHANGED = "Failed to verify signature: token might have been tampered with.";

struct Change {
  const char *field;
  const char *from;
  const char *to;
  const char *exceptionClass = "InvalidSignatureException";
  const char *message = CHANGED;
};

// A change without a class and a message here is noticed only by the check of the signature.
const Change CHANGES[] = {
    {"Version", "Version=\"2.0\"", "Version=\"2.1\"", "ParseException", "Invalid token version"},
    {"Id", "ID=\"_", "ID=\"_0", "ParseException", "Token's signature must cover the entire token"},
    {"IssueInstant", "IssueInstant=\"2020", "IssueInstant=\"2021"},
    {"Issuer", ">sts@corp.example<", ">sts@evil.example<"},
    {"IssuerFormat", "claims/UPN\">sts", "claims/UPn\">sts"},
    {"Subject", ">alice@", ">admin@"},
    {"SubjectDomain", ">alice@corp.example", ">alice@evil.example"},
    {"SubjectLetterCase", ">alice@", ">Alice@"},
    {"SubjectBlankAfter", ">alice@corp.example<", ">alice@corp.example <"},
    {"ConfirmationMethod", "cm:holder-of-key", "cm:sender-vouches", "ParseException",
     "Unknown subject confirmation method: 'urn:oasis:names:tc:SAML:2.0:cm:sender-vouches'"},
    {"DelegateId", ">backup@corp.example</saml:NameID><saml:SubjectConfirmationData",
     ">gateway@corp.example</saml:NameID><saml:SubjectConfirmationData", "ParseException",
     "The SubjectConfirmation delegate id does not match the id of the last delegate"},
    {"NotBefore", "NotBefore=\"2020-01-01T00:00:00.000Z\"", "NotBefore=\"2019-01-01T00:00:00.000Z\""},
    {"NotOnOrAfter", "NotOnOrAfter=\"2120", "NotOnOrAfter=\"2121"},
    {"NotOnOrAfterMilliseconds", "NotOnOrAfter=\"2120-01-01T00:00:00.000Z", "NotOnOrAfter=\"2120-01-01T00:00:00.001Z"},
    {"NotOnOrAfterSameInstantOtherText", "NotOnOrAfter=\"2120-01-01T00:00:00.000Z",
     "NotOnOrAfter=\"2120-01-01T00:00:00Z"},
    {"Audience", "https://files.corp.example/", "https://evil.corp.example/"},
    {"AudienceRemoved", "<saml:Audience>https://files.corp.example/</saml:Audience>", ""},
    {"AudienceRestrictionRemoved",
     "<saml:AudienceRestriction><saml:Audience>https://files.corp.example/</saml:Audience>"
     "<saml:Audience>https://mail.corp.example/</saml:Audience></saml:AudienceRestriction>",
     ""},
    {"Delegate", "<saml:NameID Format=\"http://schemas.xmlsoap.org/claims/UPN\">gateway@",
     "<saml:NameID Format=\"http://schemas.xmlsoap.org/claims/UPN\">wayward@"},
    {"DelegationInstant", "DelegationInstant=\"2020-01-01T00:00:01.250Z\"",
     "DelegationInstant=\"2020-01-01T00:00:01.251Z\""},
    {"ProxyCount", "<saml:ProxyRestriction Count=\"3\"", "<saml:ProxyRestriction Count=\"4\""},
    {"ProxyRestrictionRemoved", "<saml:ProxyRestriction Count=\"3\"/>", ""},
    {"RenewCount", "Count=\"5\"", "Count=\"50\""},
    {"RenewExpired", "RenewExpired=\"false\"", "RenewExpired=\"true\""},
    {"AdviceSource", "urn:corp.example:mapper", "urn:corp.example:Mapper"},
    {"AdviceAttributeName", "urn:corp.example:advice:color", "urn:corp.example:advice:colour"},
    {"AdviceValue", ">green<", ">black<"},
    {"AdviceValueOrder", "green</saml:AttributeValue><saml:AttributeValue>blue",
     "blue</saml:AttributeValue><saml:AttributeValue>green"},
    {"AuthnInstant", "AuthnInstant=\"2020", "AuthnInstant=\"2021"},
    {"AuthnContextClass", "classes:PasswordProtectedTransport", "classes:X509"},
    {"Group", "corp.example\\Users", "corp.example\\Admin"},
    {"GroupAdded", "<saml:AttributeValue>corp.example\\Users",
     "<saml:AttributeValue>corp.example\\Root</saml:AttributeValue><saml:AttributeValue>corp.example\\Users"},
    {"GroupRemoved", "<saml:AttributeValue>corp.example\\Users</saml:AttributeValue>", ""},
    {"Solution", ">TRUE<", ">FALSE<"},
    {"FirstName", ">Alice<", ">Malice<"},
    {"LastName", ">Liddell<", ">Mallory<"},
    {"AttributeName", "claims/givenname", "claims/surname"},
    {"AttributeFriendlyName", "FriendlyName=\"surname\"", "FriendlyName=\"Surname\""},
    {"UnknownAttribute", ">ignored<", ">noticed<"},
    {"WhiteSpaceBetweenElements", "</saml:Issuer>", "</saml:Issuer> "},
    {"AttributeAdded", "<saml:Subject>", "<saml:Subject Mine=\"1\">", "ParseException",
     "Unexpected attributes on element 'saml:Subject'"},
    {"ElementAdded", "</saml:Assertion>", "<saml:AuthnStatement/></saml:Assertion>", "ParseException",
     "Unexpected elements under Assertion"},
    {"PrefixRenamedOnOneElement", "<saml:AuthnContext>", "<saml:AuthnContext xmlns:saml=\"urn:x\">", "ParseException",
     "Element 'saml:AuthnContext' has unexpected namespace"},
    {"ProcessingInstructionAdded", "<saml:Subject>", "<?x?><saml:Subject>", "ParseException",
     "Expected element 'Subject' not found."},
};

class Tampering : public testing::TestWithParam<Change> {};

TEST_P(Tampering, IsRefused) {
  const Change &change = GetParam();
  const Outcome outcome = TryToken(Replaced(ReadToken("full"), change.from, change.to));
  EXPECT_EQ((Outcome{change.exceptionClass, change.message}), outcome);
}

INSTANTIATE_TEST_SUITE_P(Field, Tampering, testing::ValuesIn(CHANGES),
                         [](const auto &change) { return std::string(change.param.field); });

TEST(TamperingBearer, ConfirmationEndThatNoLongerCoversTheTokenIsRefused) {
  const std::string xml = Replaced(ReadToken("bearer"), "Data NotOnOrAfter=\"2120", "Data NotOnOrAfter=\"2119");
  EXPECT_EQ((Outcome{"ParseException", "Invalid token subject validity"}), TryToken(xml));
}

TEST(TamperingBearer, RemovingTheKeyFromAHolderOfKeyTokenIsRefused) {
  std::string xml = ReadToken("holder-of-key");
  const std::size_t begin = xml.find("<saml:SubjectConfirmationData");
  const std::string end = "</saml:SubjectConfirmationData>";
  xml.replace(begin, xml.find(end) + end.size() - begin,
              "<saml:SubjectConfirmationData NotOnOrAfter=\"2120-01-01T00:00:00.000Z\"/>");
  xml = Replaced(xml, "cm:holder-of-key", "cm:bearer");
  EXPECT_EQ((Outcome{"InvalidSignatureException", CHANGED}), TryToken(xml));
}

TEST(TamperingHarmless, ChangesThatTheCanonicalFormDoesNotShowKeepTheTokenValid) {
  const std::string genuine = ReadToken("full");
  const Outcome expected = TryToken(genuine);
  ASSERT_TRUE(expected.IsAccepted()) << expected;
  const std::pair<const char *, const char *> harmless[] = {
      {"<saml:Subject>", "<!-- comment --><saml:Subject>"},
      {"<saml:Subject>", "<saml:Subject   >"},
      {"Version=\"2.0\"", "Version='2.0'"},
      {">alice@", ">&#97;lice@"},
      {">alice@", "><![CDATA[alice]]>@"},
      {"<saml:ProxyRestriction Count=\"3\"/>", "<saml:ProxyRestriction Count=\"3\"></saml:ProxyRestriction>"},
  };
  for (const auto &[from, to] : harmless) {
    EXPECT_EQ(expected, TryToken(Replaced(genuine, from, to))) << to;
  }
}

} // namespace
} // namespace Attacks
