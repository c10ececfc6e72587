// SPDX-License-Identifier: Apache-2.0

#include "proof/http_signature_checks.h"

#include "unit/proof/http_proof_fixture.h"

#include <gtest/gtest.h>

#include <cstdint>
#include <string>

namespace {

using namespace SsoClient;
using Testing::FieldOf;
using Testing::NOT_GENUINE;
using Testing::ReadHttpRequest;
using Testing::UnsignedRequest;
using Testing::VerifyHttpProofTest;

TEST_F(VerifyHttpProofTest, RefusesASignatureThatDoesNotCoverWhatItMust) {
  UnsignedRequest request;
  const auto expectRefusal = [&](const std::string &components, const std::string &what) {
    request.components = components;
    ExpectRefusal<InvalidMessageException>(request.Sign(), "The signature does not cover " + what);
  };
  const std::string target =
      "the target: neither @target-uri, nor @scheme with @authority and either @request-target or "
      "@path with @query";
  request.values = {{"\"@scheme\"", "https"},
                    {"\"@authority\"", "service.example"},
                    {"\"@path\"", "/pay"},
                    {"\"@query\"", "?to=bob"},
                    {"\"@request-target\"", "/pay?to=bob"}};
  expectRefusal("\"@target-uri\" \"authorization\" \"content-digest\"", "@method");
  expectRefusal("\"@method\" \"authorization\" \"content-digest\"", target);
  expectRefusal("\"@method\" \"@authority\" \"@request-target\" \"authorization\" \"content-digest\"", target);
  expectRefusal("\"@method\" \"@scheme\" \"@request-target\" \"authorization\" \"content-digest\"", target);
  expectRefusal("\"@method\" \"@scheme\" \"@authority\" \"@path\" \"authorization\" \"content-digest\"", target);
  expectRefusal("\"@method\" \"@scheme\" \"@authority\" \"@query\" \"authorization\" \"content-digest\"", target);
  expectRefusal("\"@method\" \"@target-uri\" \"content-digest\"", "the token's header field Authorization");
  expectRefusal("\"@method\" \"@target-uri\" \"authorization\"", "the content: Content-Digest is not covered");
  expectRefusal("", "@method");
  options.requiredHeaders = {"Content-Digest", "X-Other"};
  expectRefusal("\"@method\" \"@target-uri\" \"authorization\" \"content-digest\"", "the header field X-Other");
  request.components =
      "\"@method\" \"@scheme\" \"@authority\" \"@path\" \"@query\" \"authorization\" \"content-digest\"";
  options.requiredHeaders = {"Content-Digest"};
  EXPECT_NO_THROW(Verify(request.Sign()));
}

TEST_F(VerifyHttpProofTest, RefusesComponentsThatCannotBeTrusted) {
  UnsignedRequest request;
  const std::string usual = request.components;
  const auto expectRefusal = [&](const std::string &more, const std::string &message) {
    request.components = usual + ' ' + more;
    ExpectRefusal<InvalidMessageException>(request.Sign(), "The signature covers " + message);
  };
  expectRefusal("\"Host\"", "\"Host\", which is not the name of a header field in lower case");
  expectRefusal("\"@status\"", "the unknown component \"@status\"");
  expectRefusal("\"content-digest\";sf",
                "the component \"content-digest\" with the parameter sf, which is not supported");
  expectRefusal("\"@method\"", "the component \"@method\" twice");
  expectRefusal("\"x-part\"", "the header field \"x-part\", which the request does not have");
}

TEST_F(VerifyHttpProofTest, ReadsFoldedLinesAsOne) {
  UnsignedRequest request;
  request.components += " \"x-part\"";
  request.values["\"x-part\""] = "one two";
  request.request.headers.emplace_back("X-Part", " one \r\n\t two ");
  EXPECT_NO_THROW(Verify(request.Sign()));
}

TEST_F(VerifyHttpProofTest, RefusesAlgorithmsThatAreNotTheKeys) {
  UnsignedRequest request;
  const std::string usual = request.parameters;
  for (const std::string name : {"rsa-pss-sha512", "hmac-sha256", "ecdsa-p256-sha256", "RSA-V1_5-SHA256", ""}) {
    request.parameters = usual + ";alg=\"" + name + '"';
    ExpectRefusal<InvalidProofException>(request.Sign(), "The signature has the algorithm \"" + name +
                                                             "\", but that of the token's key is rsa-v1_5-sha256");
  }
  request.parameters = usual + ";alg=\"rsa-v1_5-sha256\"";
  EXPECT_NO_THROW(Verify(request.Sign()));
  request.parameters = usual;
  request.hash = Tarvel::Crypto::HashAlgorithm::SHA512;
  ExpectRefusal<InvalidProofException>(request.Sign(), NOT_GENUINE);
}

TEST_F(VerifyHttpProofTest, RefusesParametersOfAnotherType) {
  UnsignedRequest request;
  const std::string usual = request.parameters;
  const auto expectRefusal = [&](const std::string &parameters, const std::string &message) {
    request.parameters = parameters;
    ExpectRefusal<InvalidMessageException>(request.Sign(), message);
  };
  expectRefusal("", "The signature does not have the parameter created");
  expectRefusal(";created=1767323045.0", "The parameter created of the signature is not an integer");
  expectRefusal(";created=\"1767323045\"", "The parameter created of the signature is not an integer");
  expectRefusal(";created", "The parameter created of the signature is not an integer");
  expectRefusal(usual + ";expires=1.5", "The parameter expires of the signature is not an integer");
  expectRefusal(usual + ";nonce=12", "The parameter nonce of the signature is not a string");
  expectRefusal(usual + ";alg=rsa-v1_5-sha256", "The parameter alg of the signature is not a string");
  expectRefusal(";created=1767323045;keyid=abc", "The parameter keyid of the signature is not a string");
}

TEST_F(VerifyHttpProofTest, IgnoresUnknownParametersWhichAreSigned) {
  UnsignedRequest request;
  request.parameters += ";tag=\"a\";x=1.5;y=?0;z=:AQ==:;w=tok";
  HttpRequest signedRequest = request.Sign();
  EXPECT_NO_THROW(Verify(signedRequest));
  std::string &input = FieldOf(signedRequest, "Signature-Input");
  input.replace(input.find("1.5"), 3, "1.6");
  ExpectRefusal<InvalidProofException>(signedRequest, NOT_GENUINE);
}

TEST_F(VerifyHttpProofTest, RefusesARequestOutsideItsTime) {
  UnsignedRequest request;
  const auto at = [&](std::int64_t created, const std::string &more = {}) {
    request.parameters = ";created=" + std::to_string(created) + more;
    return request.Sign();
  };
  constexpr std::int64_t NOW = 1767323045;
  EXPECT_NO_THROW(Verify(at(NOW + 60)));
  ExpectRefusal<StaleMessageException>(at(NOW + 61), "The message was created in the future: 2026-01-02T03:05:06.000Z");
  EXPECT_NO_THROW(Verify(at(NOW - 359)));
  ExpectRefusal<StaleMessageException>(at(NOW - 360),
                                       "The message is too old. It was created at: 2026-01-02T02:58:05.000Z");
  EXPECT_NO_THROW(Verify(at(NOW, ";expires=" + std::to_string(NOW - 59))));
  ExpectRefusal<StaleMessageException>(at(NOW, ";expires=" + std::to_string(NOW - 60)),
                                       "The message has expired at: 2026-01-02T03:03:05.000Z");
  ExpectRefusal<StaleMessageException>(at(999999999999999),
                                       "The message was created in the future: 9999-12-31T23:59:59.999Z");
  ExpectRefusal<StaleMessageException>(at(-999999999999999),
                                       "The message is too old. It was created at: 0001-01-01T00:00:00.000Z");
  options.clockToleranceSec = 0;
  options.maxAgeSec = 1;
  EXPECT_NO_THROW(Verify(at(NOW)));
  ExpectRefusal<StaleMessageException>(at(NOW - 1),
                                       "The message is too old. It was created at: 2026-01-02T03:04:04.000Z");
}

TEST_F(VerifyHttpProofTest, SelectsTheSignatureByTheKeysThumbprint) {
  const UnsignedRequest recipe;
  HttpRequest request = recipe.Sign();
  request.headers.emplace_back("Signature-Input", "proxy=(\"@foo\";sf);keyid=\"other\", none=()");
  request.headers.emplace_back("Signature", "none=:AQ==:, proxy=:AQ==:");
  EXPECT_EQ(Verify(request).covered.size(), 4U);
}

TEST_F(VerifyHttpProofTest, RefusesWhenNoSignatureOrSeveralAreSelected) {
  UnsignedRequest request;
  const std::string usual = request.parameters;
  const std::string noSignature = "No signature of the request has the keyid of the token's key, which is " +
                                  std::string(Testing::HOLDER_THUMBPRINT);
  request.parameters = ";created=1767323045";
  HttpRequest two = request.Sign();
  EXPECT_NO_THROW(Verify(two));
  two.headers.emplace_back("Signature-Input", "other=()");
  two.headers.emplace_back("Signature", "other=:AQ==:");
  ExpectRefusal<InvalidProofException>(two, noSignature);
  request.parameters = ";created=1767323045;keyid=\"other\"";
  ExpectRefusal<InvalidProofException>(request.Sign(), noSignature);
  request.parameters = usual;
  HttpRequest twice = request.Sign();
  twice.headers.emplace_back("Signature-Input", "other=();keyid=\"" + std::string(Testing::HOLDER_THUMBPRINT) + '"');
  twice.headers.emplace_back("Signature", "other=:AQ==:");
  ExpectRefusal<InvalidMessageException>(
      twice, "The request has more than one signature whose keyid is that of the token's key");
}

TEST_F(VerifyHttpProofTest, RefusesARequestWithoutASignature) {
  HttpRequest request = UnsignedRequest().request;
  const std::string message = "The request has no signature, so the sender did not prove that it has the token's key";
  ExpectRefusal<InvalidProofException>(request, message);
  request.headers.emplace_back("Signature-Input", "");
  ExpectRefusal<InvalidProofException>(request, message);
}

TEST_F(VerifyHttpProofTest, RefusesSignaturesOfOtherKeysAndLengths) {
  UnsignedRequest request;
  request.key = "tokens/other.key";
  ExpectRefusal<InvalidProofException>(request.Sign(), NOT_GENUINE);
  request.key = "crypto/p256.key";
  ExpectRefusal<InvalidProofException>(request.Sign(), NOT_GENUINE);
  HttpRequest other = ReadHttpRequest("rsa");
  for (const std::string value : {"proof=::", "proof=:AQ==:"}) {
    FieldOf(other, "Signature") = value;
    ExpectRefusal<InvalidProofException>(other, NOT_GENUINE);
  }
}

} // namespace
