// SPDX-License-Identifier: Apache-2.0

#include <ssoclient/service_dialect.h>

#include "support/throws_message.h"

#include <tarvel/core/exception.h>

#include <gtest/gtest.h>

#include <string>
#include <utility>
#include <vector>

namespace SsoClient {
namespace {

const std::string WSSE = "http://docs.oasis-open.org/wss/2004/01/oasis-200401-wss-wssecurity-secext-1.0.xsd";
const std::string WST = "http://docs.oasis-open.org/ws-sx/ws-trust/200512";
const std::string SOAP11 = "http://schemas.xmlsoap.org/soap/envelope/";
const std::string SOAP12 = "http://www.w3.org/2003/05/soap-envelope";

void ExpectRefused(const ServiceDialect &dialect, const std::string &reason) {
  EXPECT_THROWS_MESSAGE(CheckServiceDialect(dialect), Tarvel::InvalidArgumentException,
                        "Invalid argument : ServiceDialect::" + reason);
}

ServiceDialect AppliesTo(const std::string &address) {
  ServiceDialect dialect;
  dialect.appliesTo = address;
  return dialect;
}

ServiceDialect OfTokenType(const std::string &type) {
  ServiceDialect dialect;
  dialect.tokenType = type;
  return dialect;
}

ServiceDialect WithFault(const std::string &namespaceUri, const std::string &localName) {
  ServiceDialect dialect;
  dialect.credentialFaults = {{"urn:a", "B"}, {namespaceUri, localName}};
  return dialect;
}

TEST(GetServiceDialect, ReturnsADialectThatPassesTheCheckForEachName) {
  EXPECT_EQ(GetDialectNames(), (std::vector<std::string>{"default", "cxf"}));
  for (const std::string &name : GetDialectNames()) {
    EXPECT_NO_THROW(CheckServiceDialect(GetServiceDialect(name))) << name;
  }
}

TEST(GetServiceDialect, ReturnsTheDefaultsForDefault) {
  const ServiceDialect dialect = GetServiceDialect("default");
  EXPECT_FALSE(dialect.declaresCharset);
  EXPECT_FALSE(dialect.appliesTo);
  EXPECT_FALSE(dialect.addressing);
  EXPECT_EQ(dialect.delegatable, ServiceDialect::Statement::ALWAYS);
  EXPECT_EQ(dialect.renewing, ServiceDialect::Statement::ALWAYS);
  EXPECT_EQ(dialect.useKey, ServiceDialect::UseKey::REFERENCE);
  EXPECT_EQ(dialect.delegation, ServiceDialect::Delegation::DELEGATE_TO);
  EXPECT_EQ(dialect.tokenType, "");
  EXPECT_FALSE(dialect.standardTokenTypeReference);
  EXPECT_TRUE(dialect.credentialFaults.empty());
  EXPECT_FALSE(dialect.acceptsAnyResponse);
}

TEST(GetServiceDialect, ReturnsWhatCxfNeeds) {
  const ServiceDialect dialect = GetServiceDialect("cxf");
  EXPECT_TRUE(dialect.declaresCharset);
  EXPECT_FALSE(dialect.appliesTo);
  EXPECT_FALSE(dialect.addressing);
  EXPECT_EQ(dialect.delegatable, ServiceDialect::Statement::NEVER);
  EXPECT_EQ(dialect.renewing, ServiceDialect::Statement::ALWAYS);
  EXPECT_EQ(dialect.useKey, ServiceDialect::UseKey::CERTIFICATE);
  EXPECT_EQ(dialect.delegation, ServiceDialect::Delegation::ON_BEHALF_OF);
  EXPECT_EQ(dialect.tokenType, "");
  EXPECT_TRUE(dialect.standardTokenTypeReference);
  ASSERT_EQ(dialect.credentialFaults.size(), 1u);
  EXPECT_EQ(dialect.credentialFaults[0].namespaceUri, WSSE);
  EXPECT_EQ(dialect.credentialFaults[0].localName, "FailedAuthentication");
  EXPECT_FALSE(dialect.acceptsAnyResponse);
}

TEST(GetServiceDialect, RefusesAnotherNameAndListsTheNames) {
  EXPECT_THROWS_MESSAGE(GetServiceDialect("CXF"), Tarvel::InvalidArgumentException,
                        "Invalid argument : unknown dialect \"CXF\"; the dialects are default, cxf");
  EXPECT_THROWS_MESSAGE(GetServiceDialect("a\nb"), Tarvel::InvalidArgumentException,
                        "Invalid argument : unknown dialect \"a\\u000Ab\"; the dialects are default, cxf");
  EXPECT_THROWS_MESSAGE(GetServiceDialect(""), Tarvel::InvalidArgumentException,
                        "Invalid argument : unknown dialect \"\"; the dialects are default, cxf");
}

TEST(CheckServiceDialect, AcceptsAbsoluteUris) {
  for (const char *const uri : {"urn:a", "https://service.example", "a:b", "A+.-9:?", "x:#",
                                "x://[::1]:8443/a;b=c,d?e=f&g='h'*(i)!$@~_-.#j/k?l", "x:%00%aF",
                                "urn:uuid:00000000-0000-4000-8000-000000000001", "x:/", "mailto:sso@corp.example"}) {
    EXPECT_NO_THROW(CheckServiceDialect(AppliesTo(uri))) << uri;
    EXPECT_NO_THROW(CheckServiceDialect(OfTokenType(uri))) << uri;
    EXPECT_NO_THROW(CheckServiceDialect(WithFault(uri, "Denied"))) << uri;
  }
}

TEST(CheckServiceDialect, RefusesWhatIsNotAnAbsoluteUri) {
  for (const char *const text : {"a",
                                 "service.example",
                                 "/path",
                                 "//service.example",
                                 "https:",
                                 ":",
                                 ":a",
                                 "1a:b",
                                 "+a:b",
                                 "a_b:c",
                                 "a b:c",
                                 "urn:a b",
                                 " urn:a",
                                 "urn:a ",
                                 "urn:\xC3\xA4",
                                 "urn:<a>",
                                 "urn:\"a\"",
                                 "urn:a\\b",
                                 "urn:a^b",
                                 "urn:`a",
                                 "urn:{a}",
                                 "urn:a|b",
                                 "urn:a#b#c",
                                 "urn:%",
                                 "urn:%4",
                                 "urn:%4g",
                                 "urn:%g4",
                                 "urn:a%",
                                 "urn:\x7F"}) {
    const std::string quoted =
        std::string(" is not an absolute URI: \"") + (text == std::string("urn:\x7F") ? "urn:\\u007F" : text) + '"';
    ExpectRefused(AppliesTo(text), "appliesTo" + quoted);
    ExpectRefused(OfTokenType(text), "tokenType" + quoted);
    ExpectRefused(WithFault(text, "Denied"), "credentialFaults: the namespace" + quoted);
  }
  ExpectRefused(AppliesTo(""), "appliesTo is not an absolute URI: \"\"");
  ExpectRefused(AppliesTo(std::string("urn:a\0b", 7)), "appliesTo is not an absolute URI: \"urn:a\\u0000b\"");
  ExpectRefused(AppliesTo(std::string(2000, 'a')),
                "appliesTo is not an absolute URI: \"" + std::string(1024, 'a') + "... (976 more bytes)\"");
}

TEST(CheckServiceDialect, RefusesTokenTypesThatThisClientCannotRead) {
  for (const char *const type :
       {"urn:oasis:names:tc:SAML:1.0:assertion", "urn:oasis:names:tc:SAML:1.1:assertion",
        "http://docs.oasis-open.org/wss/oasis-wss-saml-token-profile-1.1#SAMLV1.1",
        "http://docs.oasis-open.org/wss/oasis-wss-saml-token-profile-1.0#SAMLAssertion-1.1",
        "http://docs.oasis-open.org/wss/2004/01/oasis-2004-01-saml-token-profile-1.0#SAMLAssertion-1.1",
        "http://docs.oasis-open.org/wss/2004/01/oasis-200401-wss-saml-token-profile-1.0#SAMLAssertionID",
        "http://docs.oasis-open.org/ws-sx/ws-secureconversation/200512/sct", "urn:ietf:params:oauth:token-type:jwt",
        "http://docs.oasis-open.org/ws-sx/ws-trust/200512/RSTR/Status"}) {
    ExpectRefused(OfTokenType(type),
                  std::string("tokenType asks for tokens that this client cannot read, which are not SAML 2.0: \"") +
                      type + '"');
  }
  for (const char *const type : {"urn:oasis:names:tc:SAML:2.0:assertion",
                                 "http://docs.oasis-open.org/wss/oasis-wss-saml-token-profile-1.1#SAMLV2.0",
                                 "http://docs.oasis-open.org/wss/oasis-wss-saml-tokenprofile-1.1#SAMLV2.0"}) {
    EXPECT_NO_THROW(CheckServiceDialect(OfTokenType(type))) << type;
  }
}

TEST(CheckServiceDialect, RefusesACredentialFaultWithoutNamespaceOrLocalName) {
  ExpectRefused(WithFault("", "Denied"), "credentialFaults has a fault without namespace: {\"\", \"Denied\"}");
  ExpectRefused(WithFault("urn:a", ""), "credentialFaults has a fault without local name: {\"urn:a\", \"\"}");
  ExpectRefused(WithFault("", ""), "credentialFaults has a fault without namespace: {\"\", \"\"}");
}

TEST(CheckServiceDialect, RefusesACredentialFaultWhoseNameIsNotALocalName) {
  for (const char *const name : {"ns1:Denied", " Denied", "De nied", "Denied\t"}) {
    const std::string shown = name == std::string("Denied\t") ? "Denied\\u0009" : name;
    ExpectRefused(WithFault("urn:a", name), "credentialFaults: not a local name: \"" + shown + '"');
  }
}

TEST(CheckServiceDialect, RefusesAFaultThatServicesAlsoReportForOtherReasons) {
  const std::vector<std::pair<std::string, std::string>> general = {
      {SOAP11, "Client"},
      {SOAP11, "Server"},
      {SOAP11, "VersionMismatch"},
      {SOAP11, "MustUnderstand"},
      {SOAP12, "Sender"},
      {SOAP12, "Receiver"},
      {SOAP12, "VersionMismatch"},
      {SOAP12, "MustUnderstand"},
      {SOAP12, "DataEncodingUnknown"},
      {WSSE, "InvalidSecurity"},
      {WST, "RequestFailed"},
      {WST, "InvalidRequest"},
      {WST, "BadRequest"},
      {"http://ws.apache.org/wss4j", "SecurityError"},
  };
  for (const auto &[namespaceUri, localName] : general) {
    std::string shown = "{\"";
    shown.append(namespaceUri).append("\", \"").append(localName).append("\"}");
    ExpectRefused(WithFault(namespaceUri, localName),
                  "credentialFaults has a general fault, which would make other failures refused credentials: " +
                      shown);
    EXPECT_NO_THROW(CheckServiceDialect(WithFault("urn:other", localName))) << localName;
    EXPECT_NO_THROW(CheckServiceDialect(WithFault(namespaceUri, localName + ".Authentication"))) << localName;
  }
}

TEST(CheckServiceDialect, RefusesValuesThatAreNotInTheirEnumeration) {
  for (const int value : {-1, 3}) {
    const std::string reason = " is not a value of its enumeration: " + std::to_string(value);
    ServiceDialect delegatable;
    delegatable.delegatable = static_cast<ServiceDialect::Statement>(value);
    ExpectRefused(delegatable, "delegatable" + reason);
    ServiceDialect renewing;
    renewing.renewing = static_cast<ServiceDialect::Statement>(value);
    ExpectRefused(renewing, "renewing" + reason);
    ServiceDialect useKey;
    useKey.useKey = static_cast<ServiceDialect::UseKey>(value);
    ExpectRefused(useKey, "useKey" + reason);
    ServiceDialect delegation;
    delegation.delegation = static_cast<ServiceDialect::Delegation>(value);
    ExpectRefused(delegation, "delegation" + reason);
  }
}

TEST(CheckServiceDialect, AcceptsEveryValueOfEachEnumeration) {
  for (const int value : {0, 1, 2}) {
    ServiceDialect dialect;
    dialect.delegatable = dialect.renewing = static_cast<ServiceDialect::Statement>(value);
    dialect.useKey = static_cast<ServiceDialect::UseKey>(value);
    dialect.delegation = static_cast<ServiceDialect::Delegation>(value);
    EXPECT_NO_THROW(CheckServiceDialect(dialect)) << value;
  }
}

} // namespace
} // namespace SsoClient
