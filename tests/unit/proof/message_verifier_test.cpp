// SPDX-License-Identifier: Apache-2.0

#include <ssoclient/proof/message_verifier.h>

#include "proof/replay_check.h"
#include "support/data_file.h"
#include "support/fixed_environment.h"
#include "support/parsed_document.h"
#include "support/throws_message.h"
#include "xml/xml_text.h"

#include <tarvel/core/exception.h>

#include <gtest/gtest.h>

#include <memory>
#include <string>
#include <vector>

namespace {

using namespace SsoClient;
using Tarvel::InvalidArgumentException;
using Tarvel::Ref;
using Tarvel::System::DateTime;
using Tarvel::Xml::Document;

Ref<const Tarvel::Crypto::Certificate> CertificateOf(const std::string &name) {
  return Tarvel::Crypto::LoadCertificates(Testing::DataPath("tokens/" + name + ".crt")).front();
}

TokenVerifier Tokens() {
  return TokenVerifier({CertificateOf("sts-rsa")});
}

std::string MessageOf(const std::string &name) {
  return Testing::ReadDataFile("messages/attacks/" + name + ".xml");
}

/// Remembers what it was asked.
class CountingGuard final : public ReplayGuard {
public:
  Answer Remember(const MessageIdentifier &identifier, const DateTime &until) override {
    identifiers.push_back(identifier);
    lastUntil = until;
    return answer;
  }

  Answer answer = Answer::FIRST;
  std::vector<MessageIdentifier> identifiers;
  DateTime lastUntil;
};

/// In all of these tests the time is 2026-01-02T03:04:05.006Z.
class MessageVerifierTest : public ::testing::Test {
protected:
  static VerifiedMessage Verify(const std::string &name, const MessageVerifierOptions &options = {}) {
    return MessageVerifier(Tokens(), options).Verify(MessageOf(name));
  }

private:
  const Testing::FixedEnvironment m_clock;
};

void ExpectRefusedOptions(const MessageVerifierOptions &options, const std::string &message) {
  EXPECT_THROWS_MESSAGE(MessageVerifier(Tokens(), options), InvalidArgumentException, "Invalid argument : " + message);
}

TEST_F(MessageVerifierTest, RefusesOptionsThatContradictEachOther) {
  MessageVerifierOptions tolerance;
  tolerance.clockToleranceSec = -1;
  ExpectRefusedOptions(tolerance, "MessageVerifierOptions::clockToleranceSec must not be negative, but is -1");
  MessageVerifierOptions age;
  age.maxAgeSec = 0;
  ExpectRefusedOptions(age, "MessageVerifierOptions::maxAgeSec must be positive, but is 0");
  MessageVerifierOptions part;
  part.requiredParts = {{"urn:a", ""}};
  ExpectRefusedOptions(part, "MessageVerifierOptions::requiredParts has a part without a local name");
  MessageVerifierOptions guard;
  guard.replayGuard = std::make_shared<CountingGuard>();
  guard.requireTimestamp = false;
  ExpectRefusedOptions(guard, "MessageVerifierOptions::replayGuard needs requireTimestamp");
}

TEST_F(MessageVerifierTest, ReturnsTheTokenTheBodyAndTheDates) {
  const VerifiedMessage message = Verify("genuine-soap11");
  EXPECT_EQ("alice", message.token->GetSubject().name);
  EXPECT_EQ(ProofKind::MESSAGE_SIGNATURE, message.proof);
  EXPECT_EQ("Body", message.body->GetLocalName());
  EXPECT_EQ(message.document->GetDocumentElement(), message.body->GetParent());
  EXPECT_EQ(DateTime("2026-01-02T03:04:00Z"), message.created.value());
  EXPECT_EQ(DateTime("2026-01-02T03:09:00Z"), message.expires.value());
  EXPECT_EQ(ReplayProtection::NOT_GUARDED, message.replay);
}

TEST_F(MessageVerifierTest, ListsTheCoveredElements) {
  const VerifiedMessage message = Verify("genuine-soap11");
  ASSERT_EQ(2u, message.covered.size());
  EXPECT_EQ("/s:Envelope/s:Header/wsse:Security/wsu:Timestamp", message.covered[0].path);
  EXPECT_EQ("/s:Envelope/s:Body", message.covered[1].path);
  EXPECT_EQ(message.body, message.covered[1].element);
  EXPECT_FALSE(message.covered[1].omitted);
  EXPECT_TRUE(message.IsCovered(*message.body));
  EXPECT_TRUE(message.IsCovered(*message.body->FindChildElement("Pay")->FindChildElement("To")));
  EXPECT_FALSE(message.IsCovered(*message.document->GetDocumentElement()));
  EXPECT_FALSE(message.IsCovered(*message.document->GetDocumentElement()->FindChildElement("Header")));
}

TEST_F(MessageVerifierTest, DoesNotListTheSignatureThatACoveredElementOmits) {
  for (const char *const name : {"genuine-envelope-covered", "genuine-document-covered"}) {
    const VerifiedMessage message = Verify(name);
    ASSERT_EQ(1u, message.covered.size()) << name;
    const Tarvel::Xml::ElementNode *const envelope = message.document->GetDocumentElement();
    const Tarvel::Xml::ElementNode *const security = envelope->FindChildElement("Header")->FindChildElement("Security");
    const Tarvel::Xml::ElementNode *const signature = security->FindChildElement("Signature");
    EXPECT_EQ(envelope, message.covered[0].element) << name;
    EXPECT_EQ(signature, message.covered[0].omitted) << name;
    EXPECT_TRUE(message.IsCovered(*security)) << name;
    EXPECT_FALSE(message.IsCovered(*signature)) << name;
    EXPECT_FALSE(message.IsCovered(*signature->FindChildElement("KeyInfo"))) << name;
  }
}

TEST_F(MessageVerifierTest, VerifiesAMessageThatIsParsedAlready) {
  Ref<Document> document;
  ParseXML(MessageOf("genuine-soap12"), document);
  const VerifiedMessage message = MessageVerifier(Tokens()).Verify(Ref<const Document>(document));
  EXPECT_EQ(document.get(), message.document.get());
  EXPECT_THROWS_MESSAGE(MessageVerifier(Tokens()).Verify(Ref<const Document>()), InvalidArgumentException,
                        "Invalid argument : there is no message to verify");
}

TEST_F(MessageVerifierTest, CoversNothingWithoutASignature) {
  MessageVerifierOptions options;
  options.acceptBearer = true;
  options.replayGuard = std::make_shared<CountingGuard>();
  const VerifiedMessage message = Verify("bearer", options);
  EXPECT_EQ(ProofKind::BEARER, message.proof);
  EXPECT_TRUE(message.covered.empty());
  EXPECT_FALSE(message.IsCovered(*message.body));
  EXPECT_EQ(ReplayProtection::NOT_GUARDED, message.replay);
}

TEST_F(MessageVerifierTest, PrefersTheSignatureToTheTlsCertificate) {
  const MessageVerifier verifier{Tokens()};
  const auto holder = CertificateOf("holder");
  const auto other = CertificateOf("other");
  EXPECT_EQ(ProofKind::TLS_CERTIFICATE, verifier.Verify(MessageOf("tls"), holder.get()).proof);
  EXPECT_EQ(ProofKind::MESSAGE_SIGNATURE, verifier.Verify(MessageOf("genuine-soap11"), holder.get()).proof);
  EXPECT_EQ(ProofKind::MESSAGE_SIGNATURE, verifier.Verify(MessageOf("genuine-soap11"), other.get()).proof);
}

TEST_F(MessageVerifierTest, ListsTheTokenIfItIsCovered) {
  MessageVerifierOptions options;
  options.requireTokenCovered = true;
  const VerifiedMessage message = Verify("genuine-token-covered", options);
  ASSERT_EQ(3u, message.covered.size());
  EXPECT_EQ("/s:Envelope/s:Header/wsse:Security/saml:Assertion", message.covered[1].path);
}

TEST_F(MessageVerifierTest, AsksTheGuardWithTheDigestOfSignedInfoAndTheTimeAtWhichTheMessageIsStale) {
  const auto guard = std::make_shared<CountingGuard>();
  MessageVerifierOptions options;
  options.replayGuard = guard;
  EXPECT_EQ(ReplayProtection::GUARDED, Verify("genuine-soap11", options).replay);
  EXPECT_EQ(DateTime("2026-01-02T03:10:00Z"), guard->lastUntil);
  Verify("genuine-without-type", options);            // the same signature, but another KeyInfo
  Verify("genuine-header-for-another-role", options); // the same message, but with more that is not signed
  Verify("genuine-part", options);
  ASSERT_EQ(4u, guard->identifiers.size());
  EXPECT_EQ(guard->identifiers[0], guard->identifiers[1]);
  EXPECT_EQ(guard->identifiers[0], guard->identifiers[2]);
  EXPECT_NE(guard->identifiers[0], guard->identifiers[3]);
}

TEST_F(MessageVerifierTest, RefusesWhatTheGuardRefuses) {
  const auto guard = std::make_shared<CountingGuard>();
  MessageVerifierOptions options;
  options.replayGuard = guard;
  guard->answer = ReplayGuard::Answer::REPEATED;
  EXPECT_THROWS_MESSAGE(Verify("genuine-soap11", options), RepeatedMessageException, "The message was received before");
  guard->answer = ReplayGuard::Answer::UNAVAILABLE;
  EXPECT_THROWS_MESSAGE(Verify("genuine-soap11", options), ReplayGuardException,
                        "The replay guard is full or cannot be reached, so the message is refused");
}

TEST_F(MessageVerifierTest, DoesNotAskTheGuardAboutMessagesThatAreRefused) {
  const auto guard = std::make_shared<CountingGuard>();
  MessageVerifierOptions options;
  options.replayGuard = guard;
  for (const char *const name : {"body-changed", "body-not-signed", "two-bodies", "expired", "no-signature"}) {
    EXPECT_THROW(Verify(name, options), InvalidMessageException) << name;
  }
  EXPECT_TRUE(guard->identifiers.empty());
}

TEST_F(MessageVerifierTest, ExplainsWithoutTheGuard) {
  const auto guard = std::make_shared<CountingGuard>();
  MessageVerifierOptions options;
  options.replayGuard = guard;
  EXPECT_TRUE(MessageVerifier(Tokens(), options).Explain(MessageOf("genuine-soap11")).accepted);
  EXPECT_TRUE(guard->identifiers.empty());
}

} // namespace
