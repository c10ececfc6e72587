// SPDX-License-Identifier: Apache-2.0

#include <ssoclient/proof/http_proof.h>

#include "support/data_file.h"
#include "unit/proof/http_proof_fixture.h"

#include <tarvel/xml/parser.h>

#include <gtest/gtest.h>

#include <algorithm>
#include <memory>
#include <string>
#include <thread>
#include <utility>
#include <vector>

namespace {

using namespace SsoClient;
using Testing::FieldOf;
using Testing::NOT_GENUINE;
using Testing::ReadHttpRequest;
using Testing::UnsignedRequest;
using Testing::VerifyHttpProofTest;

using Names = std::vector<std::string>;

TEST_F(VerifyHttpProofTest, AcceptsWhatOtherProgramsSigned) {
  const Names usual{"@method", "@target-uri", "authorization", "content-digest"};
  for (const char *const name : {"rsa", "p256", "p384", "key-value"}) {
    const VerifiedHttpRequest verified = Verify(ReadHttpRequest(name));
    EXPECT_EQ(verified.covered, usual) << name;
    EXPECT_EQ(verified.proof, ProofKind::MESSAGE_SIGNATURE);
    EXPECT_EQ(verified.replay, ReplayProtection::NOT_GUARDED);
    EXPECT_EQ(verified.created.ToString(), "2026-01-02T03:04:05.000Z");
    ASSERT_TRUE(verified.token);
    EXPECT_EQ(verified.token->GetConfirmationMethod(), SamlToken::HOLDER_OF_KEY);
  }
  EXPECT_EQ(Verify(ReadHttpRequest("rsa")).token->ToXml(), Testing::ReadDataFile("tokens/holder-of-key.xml"));
}

TEST_F(VerifyHttpProofTest, AcceptsEveryCoverOfTheTarget) {
  EXPECT_EQ(Verify(ReadHttpRequest("get")).covered, (Names{"authorization", "@target-uri", "@method"}));
  EXPECT_EQ(Verify(ReadHttpRequest("parts-of-target")).covered,
            (Names{"@query", "@path", "@authority", "@scheme", "authorization", "@method"}));
  options.requiredHeaders = {"X-Part"};
  EXPECT_EQ(
      Verify(ReadHttpRequest("request-target")).covered,
      (Names{"@method", "@request-target", "@authority", "@scheme", "authorization", "x-part", "content-digest"}));
}

TEST_F(VerifyHttpProofTest, AcceptsARequestThatWasOnlyReordered) {
  HttpRequest request = ReadHttpRequest("request-target");
  std::swap(request.headers.front(), request.headers.back());
  FieldOf(request, "Other") = "\xC3\xA4, not covered";
  FieldOf(request, "X-Part") = " one\t";
  EXPECT_NO_THROW(Verify(request));
}

TEST_F(VerifyHttpProofTest, RefusesEveryChangeOfWhatIsCovered) {
  const HttpRequest genuine = ReadHttpRequest("request-target");
  const auto expectRefusal = [&](auto change) {
    HttpRequest request = genuine;
    change(request);
    ExpectRefusal<InvalidProofException>(request, NOT_GENUINE);
  };
  expectRefusal([](HttpRequest &request) { request.method = "PUT"; });
  expectRefusal([](HttpRequest &request) { request.method = "post"; });
  expectRefusal([](HttpRequest &request) { request.targetUri = "https://service.example/pay?to=eve"; });
  expectRefusal([](HttpRequest &request) { request.targetUri = "http://service.example/pay?to=bob"; });
  expectRefusal([](HttpRequest &request) { request.targetUri = "https://service2.example/pay?to=bob"; });
  expectRefusal([](HttpRequest &request) { FieldOf(request, "x-part") = "two three"; });
  expectRefusal([](HttpRequest &request) { request.headers.emplace_back("X-PART", ""); });
  expectRefusal([](HttpRequest &request) {
    std::string &input = FieldOf(request, "Signature-Input");
    input.replace(input.find("1767323045"), 10, "1767323046");
  });
  expectRefusal([](HttpRequest &request) { FieldOf(request, "Signature-Input") += ";more"; });
  expectRefusal([](HttpRequest &request) {
    std::string &input = FieldOf(request, "Signature-Input");
    input.replace(input.find("\"@method\" "), 10, "");
    input.insert(input.find("\"@authority\""), "\"@method\" ");
  });
}

TEST_F(VerifyHttpProofTest, RefusesChangedContent) {
  HttpRequest request = ReadHttpRequest("rsa");
  request.body = "{\"amount\": 13}";
  const std::string message = "The content of the request does not have the digest sha-256 of Content-Digest";
  ExpectRefusal<InvalidProofException>(request, message);
  request.body = boost::none;
  ExpectRefusal<InvalidProofException>(request, message);
  request.body = "";
  ExpectRefusal<InvalidProofException>(request, message);
}

TEST_F(VerifyHttpProofTest, RefusesContentThatIsNotCovered) {
  const std::string message = "The signature does not cover the content: Content-Digest is not covered";
  HttpRequest request = ReadHttpRequest("get");
  request.body = "added";
  ExpectRefusal<InvalidMessageException>(request, message);
  request.headers.emplace_back("Content-Digest", "sha-256=:AQID:");
  ExpectRefusal<InvalidMessageException>(request, message);
  request.body = "";
  EXPECT_NO_THROW(Verify(request));
}

TEST_F(VerifyHttpProofTest, ChecksEveryDigestOfTheContent) {
  UnsignedRequest request;
  FieldOf(request.request, "Content-Digest") = "md5=:AQID:";
  ExpectRefusal<InvalidMessageException>(request.Sign(),
                                         "Content-Digest has neither a digest sha-256 nor a digest sha-512");
  FieldOf(request.request, "Content-Digest") = "sha-256=:rCn5jU+6Rc/A9NciVbN04ZsEhp79DdojzWFvbSEC8pU=:, sha-512=:AQID:";
  ExpectRefusal<InvalidProofException>(request.Sign(),
                                       "The content of the request does not have the digest sha-512 of Content-Digest");
}

TEST_F(VerifyHttpProofTest, RefusesATokenWithoutAUsableKey) {
  UnsignedRequest request;
  FieldOf(request.request, "Authorization") = Testing::TokenField("tokens/bearer.xml");
  ExpectRefusal<InvalidProofException>(
      request.Sign(), "The token is a bearer token, which has no key whose possession could be proved");
  FieldOf(request.request, "Authorization") = Testing::TokenField("http/holder-p521.xml");
  request.key = "crypto/p521.key";
  request.hash = Tarvel::Crypto::HashAlgorithm::SHA512;
  ExpectRefusal<InvalidProofException>(request.Sign(), "No signature by the token's key is accepted: there is no HTTP "
                                                       "signature algorithm for keys on the curve P-521");
  FieldOf(request.request, "Authorization") = Testing::TokenField("http/holder-rsa1024.xml");
  request.key = "crypto/rsa1024.key";
  request.hash = Tarvel::Crypto::HashAlgorithm::SHA256;
  ExpectRefusal<InvalidProofException>(
      request.Sign(),
      "No signature by the token's key is accepted: the RSA key has only 1024 bits; 2048 are the minimum");
}

TEST_F(VerifyHttpProofTest, PassesOnTheRefusalOfTheToken) {
  UnsignedRequest request;
  const auto with = [&](const std::string &token) {
    FieldOf(request.request, "Authorization") = Testing::TokenField(token);
    return request.Sign();
  };
  EXPECT_THROW(Verify(with("tokens/expired.xml")), ParseException);
  EXPECT_THROW(Verify(with("tokens/signed-by-other.xml")), InvalidSignatureException);
  EXPECT_THROW(Verify(with("crypto/message.txt")), Tarvel::Xml::XMLParseException);
}

TEST_F(VerifyHttpProofTest, RefusesATokenFieldOfAnotherForm) {
  const HttpRequest genuine = ReadHttpRequest("rsa");
  const std::string value = Testing::TokenField("tokens/holder-of-key.xml");
  const auto expectRefusal = [&](const std::string &field, const std::string &message) {
    HttpRequest request = genuine;
    FieldOf(request, "Authorization") = field;
    ExpectRefusal<InvalidMessageException>(request, message);
  };
  const std::string form = "The header field Authorization does not have the form of a token";
  const std::string base64 = "The token in the header field Authorization is not in canonical Base64";
  expectRefusal("saml" + value.substr(4), form);
  expectRefusal("SAM", form);
  expectRefusal("", form);
  expectRefusal("SAML  " + value.substr(5), base64);
  expectRefusal(value + "=", base64);
  expectRefusal(value + ", " + value, base64);
  HttpRequest twice = genuine;
  twice.headers.emplace_back("authorization", value);
  ExpectRefusal<InvalidMessageException>(twice, "The request has more than one header field Authorization");
  twice = genuine;
  twice.headers.erase(twice.headers.begin() + 1);
  ExpectRefusal<InvalidMessageException>(twice, "The request has no header field Authorization");
}

TEST_F(VerifyHttpProofTest, ReadsTheTokenInTheFormOfTheOptions) {
  UnsignedRequest request;
  std::string &value = FieldOf(request.request, "Authorization");
  std::string encoded = value.substr(5);
  encoded.erase(encoded.find_last_not_of('=') + 1);
  std::replace(encoded.begin(), encoded.end(), '+', '-');
  std::replace(encoded.begin(), encoded.end(), '/', '_');
  value = "token=\"" + encoded + '"';
  request.request.headers.front().first = "X-Token";
  request.components = "\"@method\" \"@target-uri\" \"x-token\" \"content-digest\"";
  options.tokenHeader = {"x-Token", "token=\"", "\"", TokenHeader::Encoding::BASE64URL};
  EXPECT_NO_THROW(Verify(request.Sign()));
  options.tokenHeader.after = "'";
  ExpectRefusal<InvalidMessageException>(request.Sign(), "The header field x-Token does not have the form of a token");
  options.tokenHeader.after = "\"";
  options.tokenHeader.encoding = TokenHeader::Encoding::BASE64;
  ExpectRefusal<InvalidMessageException>(request.Sign(),
                                         "The token in the header field x-Token is not in canonical Base64");
  options.tokenHeader.before = value;
  ExpectRefusal<InvalidMessageException>(request.Sign(), "The header field x-Token does not have the form of a token");
}

TEST_F(VerifyHttpProofTest, RefusesEveryPrefixOfItsFields) {
  const auto isRefused = [this](const HttpRequest &request) {
    try {
      Verify(request);
      return false;
    } catch (const SsoException &) {
      return true;
    } catch (const Tarvel::Xml::XMLParseException &) { // of a token
      return true;
    }
  };
  const HttpRequest genuine = ReadHttpRequest("rsa");
  for (const char *const name : {"Authorization", "Content-Digest", "Signature-Input", "Signature"}) {
    HttpRequest request = genuine;
    const std::string whole = FieldOf(request, name);
    const std::size_t step = whole.size() > 1000 ? 97 : 1; // a token is long
    for (std::size_t length = 0; length < whole.size(); length += step) {
      FieldOf(request, name) = whole.substr(0, length);
      EXPECT_TRUE(isRefused(request)) << name << " of " << length << " octets";
    }
  }
}

TEST_F(VerifyHttpProofTest, RefusesOptionsThatAreNotValid) {
  const HttpRequest request = ReadHttpRequest("rsa");
  options.clockToleranceSec = -1;
  ExpectRefusal<Tarvel::InvalidArgumentException>(
      request, "Invalid argument : HttpProofOptions::clockToleranceSec must not be negative, but is -1");
  options = {};
  options.maxAgeSec = 0;
  ExpectRefusal<Tarvel::InvalidArgumentException>(
      request, "Invalid argument : HttpProofOptions::maxAgeSec must be positive, but is 0");
  options = {};
  options.requiredHeaders = {"Host", "a b"};
  ExpectRefusal<Tarvel::InvalidArgumentException>(
      request,
      "Invalid argument : HttpProofOptions::requiredHeaders has a text that is not the name of a header field");
  options = {};
  options.tokenHeader.name = "";
  ExpectRefusal<Tarvel::InvalidArgumentException>(
      request, "Invalid argument : TokenHeader::name is not the name of a header field");
  for (const char *const name : {"Signature", "signature-input", "Content-digest"}) {
    options.tokenHeader.name = name;
    ExpectRefusal<Tarvel::InvalidArgumentException>(
        request, "Invalid argument : TokenHeader::name must not be Signature, Signature-Input or Content-Digest");
  }
  options.tokenHeader = {};
  options.tokenHeader.before = "a\n";
  ExpectRefusal<Tarvel::InvalidArgumentException>(
      request, "Invalid argument : TokenHeader::before and TokenHeader::after must be printable ASCII");
  for (const auto &[before, after] : {std::pair{" a", ""}, std::pair{"", "a "}}) {
    options.tokenHeader.before = before;
    options.tokenHeader.after = after;
    ExpectRefusal<Tarvel::InvalidArgumentException>(
        request, "Invalid argument : A header field can neither begin nor end with a blank");
  }
}

/// Records what it is asked.
class RecordingGuard final : public ReplayGuard {
public:
  Answer Remember(const MessageIdentifier &identifier, const Tarvel::System::DateTime &until) override {
    identifiers.push_back(identifier);
    lastUntil = until;
    return answer;
  }

  Answer answer = Answer::FIRST;
  std::vector<MessageIdentifier> identifiers;
  Tarvel::System::DateTime lastUntil;
};

TEST_F(VerifyHttpProofTest, AsksTheGuardLast) {
  const auto guard = std::make_shared<RecordingGuard>();
  options.replayGuard = guard;
  HttpRequest request = ReadHttpRequest("rsa");
  request.method = "PUT";
  ExpectRefusal<InvalidProofException>(request, NOT_GENUINE);
  EXPECT_TRUE(guard->identifiers.empty());
  EXPECT_EQ(Verify(ReadHttpRequest("rsa")).replay, ReplayProtection::GUARDED);
  EXPECT_EQ(guard->lastUntil.ToString(), "2026-01-02T03:10:05.000Z");
  Verify(ReadHttpRequest("parts-of-target")); // with `expires`
  EXPECT_EQ(guard->lastUntil.ToString(), "2026-01-02T03:05:10.000Z");
  guard->answer = ReplayGuard::Answer::REPEATED;
  ExpectRefusal<RepeatedMessageException>(ReadHttpRequest("rsa"), "The message was received before");
  guard->answer = ReplayGuard::Answer::UNAVAILABLE;
  ExpectRefusal<ReplayGuardException>(ReadHttpRequest("rsa"),
                                      "The replay guard is full or cannot be reached, so the message is refused");
}

TEST_F(VerifyHttpProofTest, IdentifiesARequestByWhatItsKeySigned) {
  const auto guard = std::make_shared<RecordingGuard>();
  options.replayGuard = guard;
  UnsignedRequest recipe;
  HttpRequest request = recipe.Sign();
  Verify(request);
  request.headers.emplace_back("Other", "x");
  std::string &input = FieldOf(request, "Signature-Input");
  input = "new= (" + input.substr(input.find('(') + 1);
  input.erase(4, 1).insert(5, "  ").insert(input.find(';') + 1, " ");
  FieldOf(request, "Signature").replace(0, 5, "new");
  Verify(request); // the same signature, written in another way
  recipe.parameters += ";nonce=\"1\"";
  Verify(recipe.Sign());
  recipe.parameters = ";created=1767323045";
  Verify(recipe.Sign());
  ASSERT_EQ(guard->identifiers.size(), 4U);
  EXPECT_EQ(guard->identifiers[0], guard->identifiers[1]);
  EXPECT_NE(guard->identifiers[0], guard->identifiers[2]);
  EXPECT_NE(guard->identifiers[2], guard->identifiers[3]);
}

TEST_F(VerifyHttpProofTest, RefusesAHostileHeader) {
  HttpRequest request = ReadHttpRequest("rsa");
  request.headers.emplace_back("X", std::string(16 << 20, 'x'));
  ExpectRefusal<InvalidMessageException>(request, "The header fields of the request have more than 1048576 octets");
  request.headers.back() = {"Signature-Input", "a=(" + std::string(500'000, ' ') + ")"};
  ExpectRefusal<InvalidMessageException>(request, "Signature-Input has the label a, which Signature does not have");
  const std::string key(500'000, 'k');
  const std::string quoted = std::string(1024, 'k') + "... (498976 more bytes)";
  request.headers.back() = {"Signature-Input", key + "=()"};
  ExpectRefusal<InvalidMessageException>(request,
                                         "Signature-Input has the label " + quoted + ", which Signature does not have");
  request.headers.back() = {"Signature-Input", "a=();" + key + ";" + key};
  ExpectRefusal<InvalidMessageException>(
      request,
      "The header field Signature-Input is malformed at character 1000199: the parameter " + quoted + " appears twice");
  request.headers.back() = {key, "\n"};
  ExpectRefusal<InvalidMessageException>(request, "The header field " + quoted + " contains a control character");
  request.headers.back() = {"Signature-Input", "a=\"" + std::string(500'000, '\\') + "\""};
  EXPECT_THROW(Verify(request), InvalidMessageException);
}

TEST_F(VerifyHttpProofTest, WorksOnManyThreads) {
  const HttpRequest request = ReadHttpRequest("p256");
  std::vector<std::thread> threads;
  for (int thread = 0; thread < 4; ++thread) {
    threads.emplace_back([&] {
      for (int round = 0; round < 10; ++round) {
        EXPECT_EQ(Verify(request).covered.size(), 4U);
      }
    });
  }
  for (std::thread &thread : threads) {
    thread.join();
  }
}

} // namespace
