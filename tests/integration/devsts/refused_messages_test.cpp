// SPDX-License-Identifier: Apache-2.0
// Messages that are out of date, have missing or wrong credentials, ask for more than they prove, or are malformed.

#include "messages.h"

#include "support/data_file.h"

namespace DevStsTest {
namespace {

using std::chrono::seconds;

/// The service's default for how far clocks may differ.
constexpr seconds TOLERANCE(60);
/// How long the library's messages are valid.
constexpr seconds MESSAGE_LIFE(600);
/// Long enough that delays of a busy machine do not matter.
constexpr seconds MARGIN(30);

constexpr const char *WST = "http://docs.oasis-open.org/ws-sx/ws-trust/200512";

class RefusedMessages : public testing::Test {
protected:
  HttpAnswer SendText(const std::string &text) { return Post(m_service, SsoClient::Request::ISSUE, text); }
  HttpAnswer SendCorrupted(const std::string &from, const std::string &to) {
    return SendText(Replaced(PasswordRequest().body, from, to));
  }

  /// Sends a signed request that was made with the client's clock ahead by this much.
  HttpAnswer SendMadeAhead(seconds ahead) {
    const ShiftedClock clock(ahead);
    return Send(m_service, CertificateRequest(m_service));
  }

  Testing::DevSts m_service;
};

using Timestamps = RefusedMessages;

TEST_F(Timestamps, StaleMessage) {
  EXPECT_TRUE(IsRefused(SendMadeAhead(-MESSAGE_LIFE - TOLERANCE - seconds(1)), "wsu:MessageExpired",
                        "the message has expired"));
}

TEST_F(Timestamps, EarlyMessage) {
  EXPECT_TRUE(IsRefused(SendMadeAhead(TOLERANCE + MARGIN), "wsse:InvalidSecurity", "the timestamp is in the future"));
}

TEST_F(Timestamps, OffByLessThanTheToleranceIsAccepted) {
  EXPECT_TRUE(IsIssued(SendMadeAhead(TOLERANCE - MARGIN)));
  EXPECT_TRUE(IsIssued(SendMadeAhead(-MESSAGE_LIFE - TOLERANCE + MARGIN)));
}

TEST(TimestampTolerance, IsWhatTheServiceIsStartedWith) {
  const Testing::DevSts service({"--tolerance", "600"});
  const ShiftedClock clock(seconds(600) - MARGIN);
  EXPECT_TRUE(IsIssued(Send(service, PasswordRequest())));
}

TEST_F(Timestamps, UnsignedMessagesAreCheckedToo) {
  const ShiftedClock clock(-MESSAGE_LIFE - TOLERANCE - seconds(1));
  EXPECT_TRUE(IsRefused(Send(m_service, PasswordRequest()), "wsu:MessageExpired", "the message has expired"));
}

TEST_F(Timestamps, MissingTimestamp) {
  EXPECT_TRUE(IsRefused(SendText(Without(PasswordRequest().body, "<wsu:Timestamp ", "</wsu:Timestamp>")),
                        "wsse:InvalidSecurity", "no timestamp"));
}

TEST_F(Timestamps, TimestampThatIsNotADate) {
  const std::string text = PasswordRequest().body;
  EXPECT_TRUE(IsRefused(SendText(Replaced(text, Between(text, "<wsu:Created>", "<"), "today")), "wsse:InvalidSecurity",
                        "Created of the timestamp is not a UTC date"));
}

TEST_F(Timestamps, PeriodOfYears) {
  const std::string text = PasswordRequest().body;
  EXPECT_TRUE(IsRefused(SendText(Replaced(text, Between(text, "<wsu:Expires>", "<"), "2999-01-01T00:00:00Z")),
                        "wsse:InvalidSecurity", "the timestamp's period is empty or too long"));
}

TEST_F(Timestamps, PeriodThatEndsBeforeItBegins) {
  const std::string text = PasswordRequest().body;
  EXPECT_TRUE(IsRefused(SendText(Replaced(text, Between(text, "<wsu:Expires>", "<"), "2001-01-01T00:00:00Z")),
                        "wsse:InvalidSecurity", "the timestamp's period is empty or too long"));
}

using Credentials = RefusedMessages;

TEST_F(Credentials, WrongPassword) {
  EXPECT_TRUE(IsRefused(Send(m_service, PasswordRequest("alice@corp.example", "builder")), "wst:FailedAuthentication",
                        "unknown user or wrong password"));
}

TEST_F(Credentials, EmptyPassword) {
  EXPECT_TRUE(IsRefused(Send(m_service, PasswordRequest("alice@corp.example", "")), "wst:FailedAuthentication",
                        "unknown user or wrong password"));
}

// The same text as for a wrong password, so that the message does not reveal which users exist.
TEST_F(Credentials, UnknownUser) {
  EXPECT_TRUE(IsRefused(Send(m_service, PasswordRequest("nobody@corp.example", "")), "wst:FailedAuthentication",
                        "unknown user or wrong password"));
}

TEST_F(Credentials, PasswordDigest) {
  EXPECT_TRUE(IsRefused(SendCorrupted("#PasswordText", "#PasswordDigest"), "wsse:UnsupportedSecurityToken",
                        "a password must be given as text"));
}

TEST_F(Credentials, None) {
  EXPECT_TRUE(IsRefused(SendText(Without(PasswordRequest().body, "<wsse:UsernameToken ", "</wsse:UsernameToken>")),
                        "wst:FailedAuthentication", "the message does not say who sent it"));
}

TEST_F(Credentials, UnknownKind) {
  EXPECT_TRUE(IsRefused(SendCorrupted("<wsse:UsernameToken ", "<wsse:Kerberos/><wsse:UsernameToken "),
                        "wsse:UnsupportedSecurityToken", "unknown element in the security header: 'Kerberos'"));
}

TEST_F(Credentials, PasswordIsNeitherAnsweredNorLogged) {
  Send(m_service, PasswordRequest("alice@corp.example", "very secret indeed"));
  const HttpAnswer answer = Send(m_service, PasswordRequest());
  EXPECT_EQ(answer.body.find("wonderland"), std::string::npos);
  const std::string log = m_service.GetLog();
  EXPECT_NE(log.find("refused, wst:FailedAuthentication"), std::string::npos) << log;
  EXPECT_EQ(log.find("very secret indeed"), std::string::npos) << log;
  EXPECT_EQ(log.find("wonderland"), std::string::npos) << log;
}

TEST_F(Credentials, LogShowsControlCharactersAsText) {
  Send(m_service, CertificateRequest(m_service), "/sts/fault/none\x1b[2J");
  Post(m_service, SsoClient::Request::ISSUE,
       Replaced(PasswordRequest().body, "<wst:RequestType>", "<wst:RequestType>\xc2\x9b&#10;"));
  const std::string log = m_service.GetLog();
  EXPECT_NE(log.find("\\xC2\\x9B\\x0A"), std::string::npos) << log;
}

using Proof = RefusedMessages;

// What the library sends when a delegated holder-of-key token is asked for by password.
TEST_F(Proof, HolderOfKeyWithoutSignature) {
  SsoClient::TokenSpec spec = PlainSpec();
  spec.delegateTo = std::string("bob@corp.example");
  SsoClient::Request request;
  BuilderFor(m_service, "client").BuildUserPassTokenRequest("alice@corp.example", "wonderland", spec, request);
  EXPECT_TRUE(IsRefused(Send(m_service, request), "wst:InvalidRequest",
                        "the request asks for a holder-of-key token without proof of a key"));
}

TEST_F(Proof, KeyTypeChangedToHolderOfKey) {
  EXPECT_TRUE(IsRefused(SendCorrupted("/Bearer<", "/PublicKey<"), "wst:InvalidRequest",
                        "the request asks for a holder-of-key token without proof of a key"));
}

TEST_F(Proof, UseKeyThatRefersToAnotherSignature) {
  const std::string text = CertificateRequest(m_service).body;
  EXPECT_TRUE(IsRefused(SendText(Replaced(text, " Id=\"holderOfKeyProofSignature\"", " Id=\"otherSignature\"")),
                        "wst:InvalidRequest", "wst:UseKey does not refer to the message's signature"));
}

using Malformed = RefusedMessages;

constexpr const char *NOT_WELL_FORMED = "the message is not well-formed XML";
constexpr const char *HAS_DOCTYPE = "a SOAP message must not contain a document type declaration";

TEST_F(Malformed, NotXml) {
  EXPECT_TRUE(IsRefused(SendText("wonderland"), "soapenv:Client", NOT_WELL_FORMED));
  EXPECT_TRUE(IsRefused(SendText(""), "soapenv:Client", NOT_WELL_FORMED));
  EXPECT_TRUE(IsRefused(SendText(std::string("<a>\0</a>", 8)), "soapenv:Client", NOT_WELL_FORMED));
}

TEST_F(Malformed, EveryTruncation) {
  const std::string text = PasswordRequest().body;
  TlsClient client(m_service);
  for (std::size_t length = 0; length < text.size(); ++length) {
    client.Send(PostBytes(SsoClient::Request::ISSUE, text.substr(0, length)));
    ASSERT_TRUE(IsRefused(client.Receive(), "soapenv:Client", NOT_WELL_FORMED)) << length;
  }
}

TEST_F(Malformed, UnboundPrefix) {
  EXPECT_TRUE(
      IsRefused(SendCorrupted("<wst:TokenType>", "<wst:TokenType x:y=\"\">"), "soapenv:Client", NOT_WELL_FORMED));
}

TEST_F(Malformed, UndefinedEntity) {
  EXPECT_TRUE(IsRefused(SendCorrupted("wonderland", "&wonderland;"), "soapenv:Client", NOT_WELL_FORMED));
}

TEST_F(Malformed, DocumentTypeDeclaration) {
  EXPECT_TRUE(IsRefused(SendText("<!DOCTYPE Envelope>" + PasswordRequest().body), "soapenv:Client", HAS_DOCTYPE));
}

TEST_F(Malformed, EntityOfAFileIsNotRead) {
  const std::string path = m_service.PathOf("client.crt");
  const std::string text = "<!DOCTYPE e [<!ENTITY f SYSTEM \"file://" + path + "\">]>" +
                           Replaced(PasswordRequest().body, "wonderland", "&f;");
  EXPECT_TRUE(IsRefused(SendText(text), "soapenv:Client", HAS_DOCTYPE));
}

TEST_F(Malformed, EntityThatGrowsIsNotExpanded) {
  EXPECT_TRUE(
      IsRefused(SendText(Testing::ReadDataFile("attacks/dtd-billion-laughs.xml")), "soapenv:Client", HAS_DOCTYPE));
}

TEST_F(Malformed, DepthOfAHundredThousandLevels) {
  std::string deep;
  for (int i = 0; i < 100000; ++i) {
    deep += "<a>";
  }
  EXPECT_TRUE(IsRefused(SendText(deep), "soapenv:Client", NOT_WELL_FORMED));
}

TEST_F(Malformed, NotAnEnvelope) {
  EXPECT_TRUE(IsRefused(SendText("<html/>"), "soapenv:Client", "not a SOAP 1.1 envelope"));
}

TEST_F(Malformed, EnvelopeOfSoap12) {
  EXPECT_TRUE(
      IsRefused(SendCorrupted("http://schemas.xmlsoap.org/soap/envelope/", "http://www.w3.org/2003/05/soap-envelope"),
                "soapenv:Client", "not a SOAP 1.1 envelope"));
}

TEST_F(Malformed, NoSecurityHeader) {
  EXPECT_TRUE(IsRefused(SendText(Without(PasswordRequest().body, "<wsse:Security ", "</wsse:Security>")),
                        "wsse:InvalidSecurity", "the message must have one security header and no other"));
}

TEST_F(Malformed, EmptyBody) {
  EXPECT_TRUE(
      IsRefused(SendText(Without(PasswordRequest().body, "<wst:RequestSecurityToken ", "</wst:RequestSecurityToken>")),
                "wst:InvalidRequest", "the body must contain one element"));
}

TEST_F(Malformed, UnknownRequestType) {
  EXPECT_TRUE(IsRefused(SendCorrupted("/Issue<", "/Cancel<"), "wst:InvalidRequest",
                        std::string("unsupported request type '") + WST + "/Cancel'"));
}

TEST_F(Malformed, UnknownKeyType) {
  EXPECT_TRUE(IsRefused(SendCorrupted("/Bearer<", "/SymmetricKey<"), "wst:InvalidRequest",
                        std::string("unsupported key type '") + WST + "/SymmetricKey'"));
}

TEST_F(Malformed, ActionOfAnotherOperation) {
  EXPECT_TRUE(IsRefused(Post(m_service, SsoClient::Request::RENEW, PasswordRequest().body), "wst:InvalidRequest",
                        "the SOAPAction does not match the message"));
  EXPECT_TRUE(IsRefused(Post(m_service, "", PasswordRequest().body), "wst:InvalidRequest",
                        "the SOAPAction does not match the message"));
}

TEST_F(Malformed, CommentThatSplitsAText) {
  EXPECT_TRUE(IsRefused(SendCorrupted("alice@corp.example", "alice@corp.example<!-- -->.evil"), "wst:InvalidRequest",
                        "Username must contain only text"));
}

TEST_F(Malformed, ElementThatOccursTwice) {
  EXPECT_TRUE(IsRefused(SendCorrupted("<wst:Delegatable>", "<wst:Delegatable>true</wst:Delegatable><wst:Delegatable>"),
                        "wst:InvalidRequest", "several wst:Delegatable"));
}

TEST_F(Malformed, LifetimeOfAThousandYears) {
  const std::string text = PasswordRequest().body;
  const std::string lifetime = Between(text, "<wst:Lifetime ", "</wst:Lifetime>");
  const std::string longer = Replaced(lifetime, Between(lifetime, "<wsu:Expires>", "<"), "3026-01-01T00:00:00Z");
  EXPECT_TRUE(IsRefused(SendText(Replaced(text, lifetime, longer)), "wst:InvalidTimeRange",
                        "the lifetime is malformed, empty or too long"));
}

TEST_F(Malformed, DelegateWithoutDomain) {
  SsoClient::TokenSpec spec = PlainSpec();
  spec.delegateTo = std::string("bob");
  SsoClient::Request request;
  SsoClient::RequestBuilderImpl(boost::none)
      .BuildUserPassTokenRequest("alice@corp.example", "wonderland", spec, request);
  EXPECT_TRUE(
      IsRefused(Send(m_service, request), "wst:InvalidRequest", "the delegate 'bob' is not of the form name@domain"));
}

TEST_F(Malformed, ServiceStillAnswersAfterAllOfThis) {
  SendText("wonderland");
  SendText("<!DOCTYPE e>");
  EXPECT_TRUE(IsIssued(Send(m_service, PasswordRequest())));
}

} // namespace
} // namespace DevStsTest
