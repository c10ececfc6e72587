// SPDX-License-Identifier: Apache-2.0
// The echo service: which messages it accepts, with which proof, and which it refuses.

#include "echo_message.h"

namespace DevStsTest {
namespace {

constexpr const char *ESTABLISHED = "http://docs.oasis-open.org/wss/oasis-wss-saml-tokenprofile-1.1#SAMLV2.0";
constexpr const char *NO_PROOF =
    "the sender does not prove that it has the token's key: the message is not signed with "
    "it, and the connection has no client certificate with it";
constexpr const char *WRONG_SIGNATURE = "the message's signature is wrong, or made with another key than the token's";
constexpr const char *NOT_THE_TOKEN = "the signature's key reference does not refer to the token";
constexpr const char *NOT_COVERED =
    "the signature must cover the body and the timestamp, and nothing else but header blocks and the token";

class Echo : public testing::Test {
protected:
  explicit Echo(const std::vector<std::string> &arguments = {}) : m_service(arguments) {}

  /// A holder-of-key token for "client".
  Testing::TokenStandIn Acquire(const SsoClient::TokenSpec &spec = PlainSpec(), const std::string &target = "/sts") {
    return TokenIn(DevStsTest::Send(m_service, CertificateRequest(m_service, spec), target));
  }
  HttpAnswer Send(const std::string &text) { return SendToEcho(m_service, m_message, text); }
  HttpAnswer SendSigned() { return Send(m_message.Sign(m_service)); }
  /// Signs the message, and sends it with `from` replaced.
  HttpAnswer SendCorrupted(const std::string &from, const std::string &to) {
    return Send(Replaced(m_message.Sign(m_service), from, to));
  }

  Testing::DevSts m_service;
  const Testing::TokenStandIn m_token = Acquire();
  EchoMessage m_message = EchoMessage(m_token);
};

TEST_F(Echo, AnswersAProvenMessageWithItsBody) {
  const HttpAnswer answer = SendSigned();
  EXPECT_EQ(answer.status, 200);
  EXPECT_EQ(answer.body, EchoOf(m_message, m_token, "client@corp.example", "message-signature"));
  EXPECT_NE(answer.head.find("\r\nContent-Type: text/xml; charset=utf-8\r\n"), std::string::npos) << answer.head;
  EXPECT_NE(m_service.GetLog().find(" /echo: echoed for client@corp.example (message-signature)\n"), std::string::npos);
}

TEST_F(Echo, AnswersSoap12WithSoap12) {
  m_message.UseSoap12();
  const HttpAnswer answer = SendSigned();
  EXPECT_EQ(answer.status, 200);
  EXPECT_EQ(answer.body, EchoOf(m_message, m_token, "client@corp.example", "message-signature"));
  EXPECT_NE(answer.head.find("\r\nContent-Type: application/soap+xml; charset=utf-8\r\n"), std::string::npos)
      << answer.head;
}

TEST_F(Echo, KeepsNamespacesThatOnlyTheContentOfTheBodyUses) {
  m_message.body = "<a xmlns=\"urn:a\"><b kind=\"s:Fault\"> &amp; <![CDATA[<]]></b></a><c/>";
  const HttpAnswer answer = SendSigned();
  EXPECT_EQ(answer.body, EchoOf(m_message, m_token, "client@corp.example", "message-signature"));
}

TEST_F(Echo, AcceptsEachReferenceToTheToken) {
  const std::string id = m_token.GetId();
  const std::string certificate =
      Between(m_service.ReadStateFile("client.crt"), "-----BEGIN CERTIFICATE-----", "-----END CERTIFICATE-----");
  const std::vector<std::string> references = {
      ReferenceToToken(id, ESTABLISHED), Replaced(m_message.keyInfo, " wsse11:TokenType", " other"),
      "<wsse:SecurityTokenReference><wsse:Reference URI=\"#" + id + "\"/></wsse:SecurityTokenReference>",
      "<ds:X509Data><ds:X509Certificate>" + certificate + "</ds:X509Certificate></ds:X509Data>"};
  for (const std::string &keyInfo : references) {
    m_message.keyInfo = keyInfo;
    m_message.SetPeriod(0, 300);
    EXPECT_EQ(SendSigned().body, EchoOf(m_message, m_token, "client@corp.example", "message-signature")) << keyInfo;
  }
}

TEST_F(Echo, AcceptsSignedHeaderBlocksAndASignedToken) {
  m_message.blocks = "<t:Trace xmlns:t=\"urn:example:trace\" Id=\"trace\">5</t:Trace>";
  m_message.references = {"trace", "ts", m_token.GetId(), "body"};
  EXPECT_EQ(SendSigned().body, EchoOf(m_message, m_token, "client@corp.example", "message-signature"));
}

TEST_F(Echo, IgnoresBlocksForOtherReceivers) {
  m_message.blocks = "<w:Security xmlns:w=\"http://docs.oasis-open.org/wss/2004/01/"
                     "oasis-200401-wss-wssecurity-secext-1.0.xsd\" s:actor=\"urn:example:gateway\"/>"
                     "<x:Other xmlns:x=\"urn:x\" s:mustUnderstand=\"1\" s:actor=\"urn:example:gateway\"/>";
  EXPECT_EQ(SendSigned().status, 200);
}

TEST_F(Echo, AcceptsEachNameOfTheLastReceiver) {
  m_message.securityAttributes = " s:actor=\"\"";
  EXPECT_EQ(SendSigned().status, 200);
  m_message.UseSoap12().securityAttributes =
      " s:role=\"http://www.w3.org/2003/05/soap-envelope/role/ultimateReceiver\" s:mustUnderstand=\"true\"";
  EXPECT_EQ(SendSigned().status, 200);
}

TEST_F(Echo, AcceptsATokenForItsAudienceAndRefusesOneForAnother) {
  SsoClient::TokenSpec spec = PlainSpec();
  spec.audienceRestriction = {"https://files.corp.example/", "https://localhost/echo"};
  m_message = EchoMessage(Acquire(spec));
  EXPECT_EQ(SendSigned().status, 200);
  spec.audienceRestriction = {"https://files.corp.example/"};
  m_message = EchoMessage(Acquire(spec));
  EXPECT_TRUE(IsRefused(SendSigned(), "wsse:InvalidSecurityToken", "the token is for another audience"));
}

TEST_F(Echo, RefusesAMessageThatItHasReceivedBefore) {
  const std::string text = m_message.Sign(m_service);
  EXPECT_EQ(Send(text).status, 200);
  EXPECT_TRUE(IsRefused(Send(text), "wsse:InvalidSecurity", "the message was received before"));
  EXPECT_TRUE(IsRefused(Send(Replaced(text, "<ds:SignatureValue>", "<ds:SignatureValue> ")), "wsse:InvalidSecurity",
                        "the message was received before"));
  m_message.SetPeriod(1, 301);
  EXPECT_EQ(SendSigned().status, 200);
}

TEST_F(Echo, DoesNotRememberARefusedMessage) {
  const std::string text = m_message.Sign(m_service);
  EXPECT_TRUE(IsRefused(Send(Replaced(text, ">7<", ">8<")), "wsse:FailedCheck", WRONG_SIGNATURE));
  EXPECT_EQ(Send(text).status, 200);
}

TEST_F(Echo, RefusesWhatIsNotASignatureWithTheKeyOfTheToken) {
  EXPECT_TRUE(IsRefused(Send(m_message.Sign(m_service, "other-client")), "wsse:FailedCheck", WRONG_SIGNATURE));
  EXPECT_TRUE(IsRefused(Send(m_message.Write()), "wsse:FailedCheck", NO_PROOF));
  EXPECT_TRUE(IsRefused(SendCorrupted(m_message.expires, "2999" + m_message.expires.substr(4)), "wsse:InvalidSecurity",
                        "the timestamp's period is empty or too long"));
}

TEST_F(Echo, RefusesChangedTimestampsAndStaleOnes) {
  const std::string later = Tarvel::System::GetUtcDateTime().PlusSeconds(600).ToString();
  EXPECT_TRUE(IsRefused(SendCorrupted(m_message.expires, later), "wsse:FailedCheck", WRONG_SIGNATURE));
  m_message.SetPeriod(-400, -61);
  EXPECT_TRUE(IsRefused(SendSigned(), "wsu:MessageExpired", "the message has expired"));
  m_message.SetPeriod(90, 400);
  EXPECT_TRUE(IsRefused(SendSigned(), "wsse:InvalidSecurity", "the timestamp is in the future"));
  m_message.SetPeriod(-400, -30);
  EXPECT_EQ(SendSigned().status, 200);
}

TEST_F(Echo, RefusesAMessageWithoutACoveredPart) {
  for (const char *left : {"ts", "body"}) {
    m_message.references = {left};
    EXPECT_TRUE(IsRefused(SendSigned(), "wsse:InvalidSecurity", NOT_COVERED)) << left;
  }
  m_message.references = {"ts", "body", "inner"};
  m_message.body = "<m:Order xmlns:m=\"urn:example:orders\" Id=\"inner\"/>";
  EXPECT_TRUE(IsRefused(SendSigned(), "wsse:InvalidSecurity", NOT_COVERED));
}

// The signed body is still in the message, and still verifies, but it is not the body that the service reads.
TEST_F(Echo, RefusesASignedBodyInAnotherPlace) {
  const std::string text = m_message.Sign(m_service);
  const std::string body = "<s:Body" + Between(text, "<s:Body", "</s:Body>") + "</s:Body>";
  EXPECT_TRUE(IsRefused(Send(Replaced(text, body, "<s:Body><w>" + body + "</w></s:Body>")), "wsse:InvalidSecurity",
                        NOT_COVERED));
}

TEST_F(Echo, RefusesKeyReferencesToAnythingElse) {
  const std::string id = m_token.GetId();
  const std::string other =
      Between(m_service.ReadStateFile("other-client.crt"), "-----BEGIN CERTIFICATE-----", "-----END CERTIFICATE-----");
  const std::vector<std::string> references = {
      ReferenceToToken(id + "0", ESTABLISHED),
      ReferenceToToken(id, "urn:oasis:names:tc:SAML:1.0:assertion"),
      Replaced(m_message.keyInfo, "#SAMLID", "#SAMLAssertionID"),
      m_message.keyInfo + m_message.keyInfo,
      "<wsse:SecurityTokenReference><wsse:Reference URI=\"#body\"/></wsse:SecurityTokenReference>",
      "<ds:X509Data><ds:X509Certificate>" + other + "</ds:X509Certificate></ds:X509Data>",
      "<ds:KeyName>client</ds:KeyName>"};
  for (const std::string &keyInfo : references) {
    m_message.keyInfo = keyInfo;
    EXPECT_TRUE(IsRefused(SendSigned(), "wsse:SecurityTokenUnavailable", NOT_THE_TOKEN)) << keyInfo;
  }
}

TEST_F(Echo, RefusesTokensThatAreNotValid) {
  m_message = EchoMessage(Acquire(PlainSpec(), "/sts/fault/expired-token"));
  EXPECT_TRUE(IsRefused(SendSigned(), "wsse:InvalidSecurityToken", "the token has expired"));
  m_message = EchoMessage(Acquire(PlainSpec(), "/sts/fault/wrong-signer"));
  EXPECT_TRUE(IsRefused(SendSigned(), "wsse:InvalidSecurityToken", "the token is not signed by this service"));
  m_message = EchoMessage(Acquire(PlainSpec(), "/sts/fault/tampered-token"));
  EXPECT_TRUE(IsRefused(SendSigned(), "wsse:InvalidSecurityToken", "the token is not signed by this service"));
}

TEST_F(Echo, RefusesABearerToken) {
  m_message = EchoMessage(TokenIn(DevStsTest::Send(m_service, PasswordRequest())));
  EXPECT_TRUE(IsRefused(Send(m_message.Write()), "wsse:InvalidSecurityToken", "this service accepts no bearer token"));
}

TEST_F(Echo, RefusesOtherSecurityHeaders) {
  const std::string token = m_message.token;
  m_message.token = "";
  EXPECT_TRUE(IsRefused(SendSigned(), "wsse:InvalidSecurity", "the message has no token"));
  m_message.token = token + token;
  EXPECT_TRUE(IsRefused(Send(m_message.Write()), "wsse:InvalidSecurity",
                        "the identifier '" + m_token.GetId() + "' occurs twice"));
  m_message.token = token + TokenIn(DevStsTest::Send(m_service, PasswordRequest())).ToXml();
  EXPECT_TRUE(IsRefused(SendSigned(), "wsse:InvalidSecurity", "several Assertion in the security header"));
  m_message.token = token + "<wsse:UsernameToken/>";
  EXPECT_TRUE(
      IsRefused(SendSigned(), "wsse:UnsupportedSecurityToken", "the message has credentials other than its token"));
  m_message.token = token;
  m_message.securityAttributes = " s:actor=\"urn:example:gateway\"";
  EXPECT_TRUE(IsRefused(SendSigned(), "wsse:InvalidSecurity", "the message has no security header for this service"));
  m_message.securityAttributes = "";
  m_message.blocks = "<w:Security xmlns:w=\"http://docs.oasis-open.org/wss/2004/01/"
                     "oasis-200401-wss-wssecurity-secext-1.0.xsd\"/>";
  EXPECT_TRUE(
      IsRefused(SendSigned(), "wsse:InvalidSecurity", "the message has several security headers for this service"));
}

TEST_F(Echo, RefusesAnUnknownBlockThatMustBeUnderstood) {
  m_message.blocks = "<x:Other xmlns:x=\"urn:x\" s:mustUnderstand=\"1\"/>";
  EXPECT_TRUE(IsRefused(SendSigned(), "soapenv:MustUnderstand", "unknown header 'Other'"));
}

TEST_F(Echo, RefusesWhatIsNotAnEnvelopeOfTheMediaType) {
  EXPECT_TRUE(IsRefused(Send("<s/>"), "soapenv:Client", "not a SOAP 1.1 envelope"));
  EXPECT_TRUE(IsRefused(Send("<s>"), "soapenv:Client", "the message is not well-formed XML"));
  EXPECT_TRUE(IsRefused(Post(m_service, "", EchoMessage(m_token).UseSoap12().Sign(m_service), "/echo"),
                        "soapenv:Client", "not a SOAP 1.1 envelope"));
  EXPECT_TRUE(IsRefused(Send("<s:Envelope xmlns:s=\"" + m_message.soap + "\"><s:Body/></s:Envelope>"), "soapenv:Client",
                        "an envelope must contain one header and one body"));
  EXPECT_TRUE(
      IsRefused(SendCorrupted("<wsu:Created>", "<wsu:Made/><wsu:Created>"), "wsse:FailedCheck", WRONG_SIGNATURE));
  EXPECT_TRUE(IsRefused(SendCorrupted("<wsu:Created>" + m_message.created + "</wsu:Created>", ""),
                        "wsse:InvalidSecurity", "no wsu:Created"));
}

TEST_F(Echo, WritesFaultsOfSoap12) {
  m_message.UseSoap12();
  const HttpAnswer answer = Send(m_message.Write());
  EXPECT_EQ(answer.status, 400);
  EXPECT_EQ(answer.body,
            "<env:Envelope xmlns:env=\"http://www.w3.org/2003/05/soap-envelope\"><env:Body><env:Fault><env:Code>"
            "<env:Value>env:Sender</env:Value><env:Subcode><env:Value xmlns:wsse=\"http://docs.oasis-open.org/wss/2004/"
            "01/oasis-200401-wss-wssecurity-secext-1.0.xsd\">wsse:FailedCheck</env:Value></env:Subcode></env:Code>"
            "<env:Reason><env:Text xml:lang=\"en\">" +
                std::string(NO_PROOF) + "</env:Text></env:Reason></env:Fault></env:Body></env:Envelope>");
  m_message.blocks = "<x:Other xmlns:x=\"urn:x\" s:mustUnderstand=\"true\"/>";
  const HttpAnswer notUnderstood = SendSigned();
  EXPECT_EQ(notUnderstood.status, 500);
  EXPECT_EQ(Between(notUnderstood.body, "<env:Code>", "</env:Code>"), "<env:Value>env:MustUnderstand</env:Value>");
  const HttpAnswer notSoap = Send("<s/>");
  EXPECT_EQ(notSoap.status, 400);
  EXPECT_EQ(Between(notSoap.body, "<env:Code>", "</env:Code>"), "<env:Value>env:Sender</env:Value>");
  EXPECT_EQ(Between(notSoap.body, "<env:Text xml:lang=\"en\">", "<"), "not a SOAP 1.2 envelope");
}

TEST_F(Echo, AnswersOnlySoapPosts) {
  EXPECT_EQ(Post(m_service, "", m_message.Sign(m_service), "/echo", "application/json").status, 415);
  TlsClient client(m_service);
  client.Send("GET /echo HTTP/1.1\r\nHost: localhost\r\n\r\n");
  EXPECT_EQ(client.Receive().status, 405);
}

class EchoBearer : public Echo {
protected:
  EchoBearer() : Echo({"--echo-bearer"}) {}
};

TEST_F(EchoBearer, AcceptsABearerToken) {
  const Testing::TokenStandIn token = TokenIn(DevStsTest::Send(m_service, PasswordRequest()));
  m_message = EchoMessage(token);
  EXPECT_EQ(Send(m_message.Write()).body, EchoOf(m_message, token, "alice@corp.example", "bearer"));
  EXPECT_TRUE(IsRefused(SendSigned(), "wsse:SecurityTokenUnavailable",
                        "a bearer token has no key that could have signed the message"));
}

TEST_F(EchoBearer, StillRequiresTheProofOfAHolderOfKeyToken) {
  EXPECT_TRUE(IsRefused(Send(m_message.Write()), "wsse:FailedCheck", NO_PROOF));
}

class EchoOverMutualTls : public Echo {
protected:
  EchoOverMutualTls() : Echo({"--client-certificates"}) {}

  HttpAnswer SendAs(const std::string &identity, const std::string &text) {
    TlsClient client(m_service, identity);
    client.Send(PostBytes("", text, "/echo"));
    return client.Receive();
  }
};

TEST_F(EchoOverMutualTls, AcceptsTheCertificateOfTheTokenAsProof) {
  EXPECT_EQ(SendAs("client", m_message.Write()).body,
            EchoOf(m_message, m_token, "client@corp.example", "tls-certificate"));
  EXPECT_TRUE(IsRefused(SendAs("other-client", m_message.Write()), "wsse:FailedCheck", NO_PROOF));
  EXPECT_TRUE(IsRefused(Send(m_message.Write()), "wsse:FailedCheck", NO_PROOF));
}

TEST_F(EchoOverMutualTls, StillChecksASignature) {
  EXPECT_EQ(SendAs("other-client", m_message.Sign(m_service)).body,
            EchoOf(m_message, m_token, "client@corp.example", "message-signature"));
  EXPECT_TRUE(
      IsRefused(SendAs("client", m_message.Sign(m_service, "other-client")), "wsse:FailedCheck", WRONG_SIGNATURE));
}

TEST_F(EchoOverMutualTls, IssuesTokensAsBefore) {
  EXPECT_TRUE(IsIssued(DevStsTest::Send(m_service, PasswordRequest())));
}

} // namespace
} // namespace DevStsTest
