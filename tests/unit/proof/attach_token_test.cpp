// SPDX-License-Identifier: Apache-2.0

#include "support/fixed_environment.h"
#include "support/sample_message.h"
#include "support/token_stand_in.h"
#include "support/xml_tree.h"
#include "unit/proof/unchanged_message.h"

#include <ssoclient/proof/sign_message.h>
#include <tarvel/xml/parser.h>

#include <gtest/gtest.h>

namespace SsoClient {
namespace {

using namespace Testing;

const std::string TIMESTAMP = "<wsu:Timestamp xmlns:wsu=\"" + WSU +
                              "\"><wsu:Created>2026-01-02T03:04:05.006Z</wsu:Created>"
                              "<wsu:Expires>2026-01-02T03:09:05.006Z</wsu:Expires></wsu:Timestamp>";
const std::string TOKEN = "<t:Token xmlns:t=\"urn:t\" ID=\"_t\"></t:Token>";
const std::string BODY = "<s:Body><m:Pay xmlns:m=\"urn:m\">7</m:Pay></s:Body>";

class AttachTokenTest : public testing::Test {
protected:
  std::string Attach(const std::string &envelope, const SecurityHeaderOptions &options = {}) const {
    return AttachToken(envelope, m_token, options);
  }

  const FixedEnvironment m_environment;
  const TokenStandIn m_token{"_t", TOKEN, SamlToken::BEARER};
};

std::string NewSecurity(const std::string &attributes) {
  return "<wsse:Security xmlns:wsse=\"" + WSSE + "\"" + attributes + ">" + TIMESTAMP + TOKEN + "</wsse:Security>";
}

TEST_F(AttachTokenTest, AddsAHeaderWithTimestampAndTokenToAnEnvelopeWithoutHeader) {
  EXPECT_EQ(Attach(SampleEnvelope(BODY)),
            SampleEnvelope("<s:Header>" + NewSecurity(" s:mustUnderstand=\"1\"") + "</s:Header>" + BODY));
  EXPECT_EQ(Attach(SampleEnvelope(BODY, SOAP12)),
            SampleEnvelope("<s:Header>" + NewSecurity(" s:mustUnderstand=\"true\"") + "</s:Header>" + BODY, SOAP12));
}

TEST_F(AttachTokenTest, AddsTheSecurityHeaderBeforeTheOtherHeaderBlocks) {
  const std::string blocks = "<a:To xmlns:a=\"urn:a\">you</a:To>";
  EXPECT_EQ(Attach(SampleEnvelope("<s:Header>" + blocks + "</s:Header>" + BODY)),
            SampleEnvelope("<s:Header>" + NewSecurity(" s:mustUnderstand=\"1\"") + blocks + "</s:Header>" + BODY));
}

TEST_F(AttachTokenTest, WritesActorAndRole) {
  SecurityHeaderOptions options;
  options.role = " urn:next ";
  options.mustUnderstand = false;
  EXPECT_EQ(Attach(SampleEnvelope(BODY), options),
            SampleEnvelope("<s:Header>" + NewSecurity(" s:actor=\"urn:next\"") + "</s:Header>" + BODY));
  EXPECT_EQ(Attach(SampleEnvelope(BODY, SOAP12), options),
            SampleEnvelope("<s:Header>" + NewSecurity(" s:role=\"urn:next\"") + "</s:Header>" + BODY, SOAP12));
}

TEST_F(AttachTokenTest, WritesNoAttributeForTheLastReceiver) {
  SecurityHeaderOptions options;
  options.mustUnderstand = false;
  for (const char *const role : {"", " ", "http://www.w3.org/2003/05/soap-envelope/role/ultimateReceiver"}) {
    options.role = role;
    EXPECT_EQ(Attach(SampleEnvelope(BODY, SOAP12), options),
              SampleEnvelope("<s:Header>" + NewSecurity("") + "</s:Header>" + BODY, SOAP12));
  }
}

TEST_F(AttachTokenTest, ExtendsTheHeaderForTheRoleAndKeepsWhatItHas) {
  const std::string attributes = " s:actor=\"\" s:mustUnderstand=\"0\" x=\"1\"";
  const std::string content = "<u:Timestamp><u:Created>2020</u:Created></u:Timestamp><!--c-->";
  EXPECT_EQ(Attach(SampleMessage(SampleSecurity(content, attributes))),
            SampleMessage(SampleSecurity(TOKEN + content, attributes)));
}

TEST_F(AttachTokenTest, AddsATimestampToAHeaderWithoutOne) {
  EXPECT_EQ(Attach(SampleMessage(SampleSecurity("<o:X></o:X>"))),
            SampleMessage(SampleSecurity(TIMESTAMP + TOKEN + "<o:X></o:X>")));
}

TEST_F(AttachTokenTest, LeavesTheHeaderForAnotherRoleAlone) {
  const std::string other = SampleSecurity("<u:Timestamp></u:Timestamp>", " s:actor=\"urn:other\"");
  EXPECT_EQ(Attach(SampleMessage(other)), SampleMessage(NewSecurity(" s:mustUnderstand=\"1\"") + other));
  SecurityHeaderOptions options;
  options.role = "urn:other";
  EXPECT_EQ(Attach(SampleMessage(other), options),
            SampleMessage(SampleSecurity(TOKEN + "<u:Timestamp></u:Timestamp>", " s:actor=\"urn:other\"")));
}

TEST_F(AttachTokenTest, DeclaresAPrefixForTheAttributesOfAnEnvelopeInTheDefaultNamespace) {
  const std::string attributes = " xmlns:soapenv=\"" + SOAP11 + "\" soapenv:mustUnderstand=\"1\"";
  const std::string token = "<t:Token xmlns:t=\"urn:t\" ID=\"_t\" xmlns=\"\"></t:Token>";
  EXPECT_EQ(Attach("<Envelope xmlns=\"" + SOAP11 + "\"><Body></Body></Envelope>"),
            "<Envelope xmlns=\"" + SOAP11 + "\"><Header><wsse:Security xmlns:wsse=\"" + WSSE + "\"" + attributes + ">" +
                TIMESTAMP + token + "</wsse:Security></Header><Body></Body></Envelope>");
}

TEST_F(AttachTokenTest, KeepsTheMeaningOfEveryPrefixOfTheEnvelope) {
  const std::string text =
      "<wsse:Envelope xmlns:wsse=\"" + SOAP12 +
      "\" xmlns:wsu=\"urn:u\" xmlns:ds=\"urn:d\" wsu:x=\"1\"><wsse:Body></wsse:Body></wsse:Envelope>";
  EXPECT_EQ(Attach(text),
            "<wsse:Envelope xmlns:wsse=\"" + SOAP12 +
                "\" xmlns:wsu=\"urn:u\" xmlns:ds=\"urn:d\" wsu:x=\"1\"><wsse:Header><wsse:Security xmlns:wsse=\"" +
                WSSE + "\" xmlns:wsse1=\"" + SOAP12 + "\" wsse1:mustUnderstand=\"true\">" + TIMESTAMP + TOKEN +
                "</wsse:Security></wsse:Header><wsse:Body></wsse:Body></wsse:Envelope>");
}

TEST_F(AttachTokenTest, KeepsCommentsInstructionsCharactersAndWhiteSpace) {
  const std::string before = "<?xml version=\"1.0\" encoding=\"UTF-8\"?>\n<!--one--><?two three?>\n<?four?>\n"
                             "<s:Envelope xmlns:s=\"" +
                             SOAP11 +
                             "\">\n <s:Body a='&quot;&#10;'><![CDATA[<&]]>\xC3\xBC&#13;<?p i?></s:Body> "
                             "<!--in--></s:Envelope>\n<!--five-->";
  EXPECT_EQ(
      Attach(before),
      "<!--one-->\n<?two three?>\n<?four?>\n" +
          SampleEnvelope("<s:Header>" + NewSecurity(" s:mustUnderstand=\"1\"") +
                         "</s:Header>\n <s:Body a=\"&quot;&#xA;\">&lt;&amp;\xC3\xBC&#xD;<?p i?></s:Body> <!--in-->") +
          "\n<!--five-->");
}

TEST_F(AttachTokenTest, UsesTheLifetime) {
  SecurityHeaderOptions options;
  options.lifetimeSec = 1;
  EXPECT_NE(Attach(SampleEnvelope(BODY), options).find("<wsu:Expires>2026-01-02T03:04:06.006Z<"), std::string::npos);
  options.lifetimeSec = 86400;
  EXPECT_NE(Attach(SampleEnvelope(BODY), options).find("<wsu:Expires>2026-01-03T03:04:05.006Z<"), std::string::npos);
}

TEST_F(AttachTokenTest, ChangesAParsedMessageInPlace) {
  const auto document = ParseDocument(SampleMessage(""));
  const auto *const body = document->GetDocumentElement()->FindChildElement("Body");
  AttachToken(*document, m_token);
  EXPECT_EQ(WriteElement(*document->GetDocumentElement()), Attach(SampleMessage("")));
  EXPECT_EQ(document->GetDocumentElement()->FindChildElement("Body"), body);
}

TEST_F(AttachTokenTest, AcceptsABodyCloseToTheLimitOfTheParser) {
  const std::string text(Tarvel::Xml::MAX_DOCUMENT_BYTES - 4096, 'x');
  const std::string message = Attach(SampleEnvelope("<s:Body>" + text + "</s:Body>"));
  EXPECT_NE(message.find("<s:Body>" + text + "</s:Body>"), std::string::npos);
}

TEST_F(AttachTokenTest, AttachesATokenThatATokenServiceIssued) {
  const auto token = SampleToken("tokens/bearer");
  const std::string message = AttachToken(SampleEnvelope(BODY), *token);
  const auto document = ParseDocument(message);
  const auto *const security = document->GetDocumentElement()->FindChildElement("Header")->FindChildElement("Security");
  const auto *const assertion = security->FindChildElement("Assertion");
  EXPECT_EQ(WriteElement(*assertion), WriteElement(*ParseDocument(token->ToXml())->GetDocumentElement()));
}

/// Checks that the message is refused with that text and stays as it was.
testing::AssertionResult Refuses(const std::string &message, const std::string &text, const SamlToken &token,
                                 const SecurityHeaderOptions &options = {}) {
  return RefusesUnchanged<InvalidMessageException>(
      message, [&](Tarvel::Xml::Document &document) { AttachToken(document, token, options); }, text);
}

TEST_F(AttachTokenTest, RefusesWhatIsNotAnEnvelope) {
  const struct {
    std::string message;
    const char *text;
  } cases[] = {
      {"<Envelope/>", "The envelope is neither of SOAP 1.1 nor of SOAP 1.2"},
      {"<s:Body xmlns:s=\"" + SOAP11 + "\"/>", "The message is not a SOAP envelope"},
      {SampleEnvelope(""), "The envelope has no body"},
      {SampleEnvelope("<s:Body/><s:Body/>"), "The envelope has two bodies"},
      {SampleEnvelope("<s:Header/><s:Header/><s:Body/>"), "The envelope has two headers"},
      {SampleEnvelope("<s:Body/><s:Header/>"), "The envelope has its header after its body"},
      {SampleEnvelope("<s:Body/><x/>"), "The envelope has content outside of its header and its body"},
  };
  for (const auto &[message, text] : cases) {
    EXPECT_TRUE(Refuses(message, text, m_token)) << message;
  }
}

TEST_F(AttachTokenTest, RefusesADocumentWithoutElement) {
  const auto document = ParseDocument("<a/>");
  ParseDocument("<b/>")->GetDocumentElement()->AppendChild(document->GetDocumentElement());
  EXPECT_THROWS_MESSAGE(AttachToken(*document, m_token), InvalidMessageException, "The message is not a SOAP envelope");
}

TEST_F(AttachTokenTest, RefusesTextThatIsNotXml) {
  EXPECT_THROWS_MESSAGE(Attach("no XML"), Tarvel::Xml::XMLParseException,
                        "text comes before the document element at line 1, column 1");
}

TEST_F(AttachTokenTest, RefusesTwoHeadersForTheRole) {
  const std::string two = SampleMessage(SampleSecurity("") + SampleSecurity("", " s:actor=\"\""));
  EXPECT_TRUE(Refuses(two, "The message has two security headers for the last receiver", m_token));
  SecurityHeaderOptions options;
  options.role = "urn:r";
  const std::string actor = " s:actor=\"urn:r\"";
  EXPECT_TRUE(Refuses(SampleMessage(SampleSecurity("", actor) + SampleSecurity("", actor)),
                      "The message has two security headers for the role 'urn:r'", m_token, options));
}

TEST_F(AttachTokenTest, RefusesTwoTimestamps) {
  EXPECT_TRUE(Refuses(SampleMessage(SampleSecurity("<u:Timestamp/><u:Timestamp/>")),
                      "The security header has two timestamps", m_token));
}

TEST_F(AttachTokenTest, RefusesAMessageThatHasAnIdentifierOfTheToken) {
  const std::string text = "The message already has an element with the identifier '_t' of the token";
  for (const std::string &attribute : std::vector<std::string>{"Id", "ID", "xml:id", "xmlns:w=\"" + WSU + "\" w:Id"}) {
    const std::string message = SampleEnvelope("<s:Body><x " + attribute + "=\"_t\"/></s:Body>");
    EXPECT_TRUE(Refuses(message, text, m_token)) << message;
  }
  EXPECT_TRUE(Refuses(Attach(SampleMessage("")), text, m_token));
  const TokenStandIn nested("_t", "<t ID=\"_t\"><u Id=\"_u\"/></t>", SamlToken::BEARER);
  EXPECT_TRUE(Refuses(SampleMessage("<x Id=\"_u\"/>"),
                      "The message already has an element with the identifier '_u' of the token", nested));
  EXPECT_NO_THROW(Attach(SampleMessage("<x id=\"_t\" s:Id=\"_t\" y=\"_t\"/>")));
}

TEST_F(AttachTokenTest, RefusesAHolderOfKeyToken) {
  const TokenStandIn holder("_t", TOKEN, SamlToken::HOLDER_OF_KEY);
  EXPECT_THROWS_MESSAGE(AttachToken(SampleMessage(""), holder), Tarvel::InvalidArgumentException,
                        "Invalid argument : a holder-of-key token needs a proof of its key: use SignMessage");
}

TEST_F(AttachTokenTest, RefusesALifetimeThatIsNotPositive) {
  for (const std::int64_t lifetime : {std::int64_t(0), std::int64_t(-1)}) {
    SecurityHeaderOptions options;
    options.lifetimeSec = lifetime;
    EXPECT_THROWS_MESSAGE(Attach(SampleMessage(""), options), Tarvel::InvalidArgumentException,
                          "Invalid argument : the lifetime of a message must be positive, not " +
                              std::to_string(lifetime) + " seconds");
  }
}

TEST_F(AttachTokenTest, LeavesTheMessageAsItWasWhenTheRoleCannotBeWritten) {
  SecurityHeaderOptions options;
  options.role = "urn:\x01";
  for (const std::string &message : {SampleEnvelope(BODY), SampleMessage("")}) {
    EXPECT_TRUE(RefusesUnchanged<Tarvel::InvalidArgumentException>(
        message, [&](Tarvel::Xml::Document &document) { AttachToken(document, m_token, options); },
        "Invalid argument : the value of the attribute 's:actor' holds the character U+0001 at byte 5, which XML 1.0 "
        "cannot carry"));
  }
}

} // namespace
} // namespace SsoClient
