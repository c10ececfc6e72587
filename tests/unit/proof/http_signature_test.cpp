// SPDX-License-Identifier: Apache-2.0

#include "proof/http_signature.h"

#include "support/data_file.h"
#include "support/throws_message.h"

#include <ssoclient/proof/exceptions.h>
#include <tarvel/core/string_util.h>
#include <tarvel/crypto/detached_signature.h>

#include <gtest/gtest.h>

#include <string>

namespace {

using namespace SsoClient;
using Tarvel::Crypto::HashAlgorithm;

/// The request of RFC 9421, appendix B.2.
HttpRequest RequestOfTheStandard() {
  return {
      "POST",
      "https://example.com/foo?param=Value&Pet=dog",
      {{"Host", "example.com"},
       {"Date", "Tue, 20 Apr 2021 02:07:55 GMT"},
       {"Content-Type", "application/json"},
       {"Content-Digest", "sha-512=:WZDPaVn/7XgHaAy8pmojAkGWoRx2UFChF41A2svX+TaPm+AbwAgBWnrIiYllu7BNNyealdVLvRwEmTHW"
                          "XvJwew==:"},
       {"Content-Length", "18"}},
      std::string("{\"hello\": \"world\"}")};
}

StructuredInnerList InputOf(const std::string &list) {
  return std::get<StructuredInnerList>(ReadDictionary("F", "a=" + list).at(0).value);
}

std::string BaseOf(const HttpRequest &request, const std::string &list) {
  const StructuredInnerList input = InputOf(list);
  return MakeSignatureBase(HttpComponents(request), ReadComponentNames(input), input);
}

std::string BaseOfTheStandard(const std::string &list) {
  return BaseOf(RequestOfTheStandard(), list);
}

// openssl verifies these bases with the signatures of the standard: see check.sh in the folder.
TEST(MakeSignatureBase, AgreesWithTheTestCasesOfTheStandard) {
  EXPECT_EQ(
      BaseOfTheStandard("(\"date\" \"@method\" \"@path\" \"@query\" \"@authority\" \"content-type\" \"content-digest\" "
                        "\"content-length\");created=1618884473;keyid=\"test-key-rsa-pss\""),
      Testing::ReadDataFile("http/rfc9421/b23.base"));
  EXPECT_EQ(BaseOfTheStandard("(\"date\" \"@method\" \"@path\" \"@authority\" \"content-type\" \"content-length\");"
                              "created=1618884473;keyid=\"test-key-ed25519\""),
            Testing::ReadDataFile("http/rfc9421/b26.base"));
  EXPECT_EQ(BaseOfTheStandard("();created=1618884473;keyid=\"test-key-rsa-pss\";nonce=\"b3k2pp5k7z-50gnwp.yemd\""),
            "\"@signature-params\": ();created=1618884473;keyid=\"test-key-rsa-pss\";nonce=\"b3k2pp5k7z-50gnwp.yemd\"");
}

TEST(VerifyOctets, AcceptsTheEcdsaTestCaseOfTheStandard) {
  std::string pem = Testing::ReadDataFile("http/rfc9421/ecc-p256.pub.pem");
  pem = pem.substr(pem.find('\n'));
  const auto key = Tarvel::Crypto::CreateVerifyingKey(Tarvel::StringUtil::Base64Decode(pem.substr(0, pem.find('-'))));
  const HttpSignatureAlgorithm algorithm = GetHttpSignatureAlgorithm(*key);
  EXPECT_STREQ(algorithm.name, "ecdsa-p256-sha256");
  const std::string value = Testing::ReadDataFile("http/rfc9421/b24.sig");
  EXPECT_TRUE(
      VerifyOctets(*key, algorithm.hash, Testing::ReadDataFile("http/rfc9421/b24.base"), {value.begin(), value.end()}));
}

TEST(MakeSignatureBase, WritesTheParametersInTheirOnlySerialisation) {
  EXPECT_EQ(BaseOfTheStandard("(  \"@method\" ); created=01;x=?1"),
            "\"@method\": POST\n\"@signature-params\": (\"@method\");created=1;x");
}

void ExpectRefusal(const std::string &list, const std::string &message) {
  EXPECT_THROWS_MESSAGE(BaseOfTheStandard(list), InvalidMessageException, message);
}

TEST(MakeSignatureBase, RefusesComponentsThatItDoesNotKnow) {
  for (const std::string name : {"@status", "@query-param", "@signature-params", "@", "@METHOD"}) {
    ExpectRefusal("(\"" + name + "\")", "The signature covers the unknown component \"" + name + "\"");
  }
}

TEST(MakeSignatureBase, RefusesFieldsThatAreNotThereOrNotNamedInLowerCase) {
  ExpectRefusal("(\"x-part\")", "The signature covers the header field \"x-part\", which the request does not have");
  for (const std::string name : {"Date", "", "da te", "date:"}) {
    ExpectRefusal("(\"" + name + "\")",
                  "The signature covers \"" + name + "\", which is not the name of a header field in lower case");
  }
}

TEST(MakeSignatureBase, RefusesValuesBeyondAscii) {
  HttpRequest request = RequestOfTheStandard();
  request.headers.emplace_back("Name", "\xC3\xA4");
  EXPECT_NO_THROW(BaseOf(request, "(\"date\")"));
  EXPECT_THROWS_MESSAGE(BaseOf(request, "(\"name\")"), InvalidMessageException,
                        "The signature covers the component \"name\", which is not ASCII");
}

TEST(ReadComponentNames, RefusesParametersOtherTypesAndRepetitions) {
  for (const std::string parameter : {"sf", "bs", "key", "req", "tr", "name", "x"}) {
    ExpectRefusal("(\"date\";" + parameter + "=\"a\")",
                  "The signature covers the component \"date\" with the parameter " + parameter +
                      ", which is not supported");
  }
  ExpectRefusal("(date)", "The signature covers a component whose name is not a string");
  ExpectRefusal("(1)", "The signature covers a component whose name is not a string");
  ExpectRefusal("(\"date\" \"@method\" \"date\")", "The signature covers the component \"date\" twice");
}

std::vector<HttpSignature> SignaturesOf(std::vector<std::pair<std::string, std::string>> headers) {
  const HttpRequest request{"GET", "http://a/", std::move(headers), {}};
  return ReadHttpSignatures(HttpComponents(request));
}

TEST(ReadHttpSignatures, JoinsTheTwoFieldsByLabel) {
  EXPECT_TRUE(SignaturesOf({}).empty());
  EXPECT_TRUE(SignaturesOf({{"Signature", ""}, {"Signature-Input", " "}}).empty());
  const auto signatures = SignaturesOf({{"Signature", "b=:AQ==:"},
                                        {"Signature-Input", "a=(\"x\")"},
                                        {"signature-input", "b=();created=1"},
                                        {"signature", "a=:Ag==:;ignored"}});
  ASSERT_EQ(signatures.size(), 2U);
  EXPECT_EQ(signatures[0].label, "a");
  EXPECT_EQ(signatures[0].value, std::vector<std::uint8_t>{2});
  EXPECT_EQ(ReadComponentNames(signatures[0].input), std::vector<std::string>{"x"});
  EXPECT_EQ(signatures[1].label, "b");
  EXPECT_EQ(signatures[1].value, std::vector<std::uint8_t>{1});
}

TEST(ReadHttpSignatures, RefusesFieldsThatDoNotMatch) {
  const auto expectRefusal = [](const std::string &input, const std::string &value, const std::string &message) {
    EXPECT_THROWS_MESSAGE(SignaturesOf({{"Signature-Input", input}, {"Signature", value}}), InvalidMessageException,
                          message);
  };
  expectRefusal("a=()", "", "Signature-Input has the label a, which Signature does not have");
  expectRefusal("", "a=::", "Signature has the label a, which Signature-Input does not have");
  expectRefusal("a=()", "a=::,b=::", "Signature has the label b, which Signature-Input does not have");
  expectRefusal("a", "a=::", "Signature-Input has no list for the label a");
  expectRefusal("a=\"x\"", "a=::", "Signature-Input has no list for the label a");
  expectRefusal("a=()", "a=\"AQ==\"", "Signature has no octets for the label a");
  expectRefusal("a=()", "a=()", "Signature has no octets for the label a");
  expectRefusal("a=(", "a=::", "The header field Signature-Input is malformed at character 4: a value was expected");
  expectRefusal("a=()",
                "a=:", "The header field Signature is malformed at character 4: octets do not end with a colon");
}

TEST(GetHttpSignatureAlgorithm, IsFixedByTheKey) {
  const auto algorithmOf = [](const std::string &name) {
    const auto certificate = Tarvel::Crypto::LoadCertificates(Testing::DataPath("crypto/" + name + ".crt")).front();
    return GetHttpSignatureAlgorithm(*Tarvel::Crypto::CreateVerifyingKey(certificate));
  };
  EXPECT_STREQ(algorithmOf("rsa2048").name, "rsa-v1_5-sha256");
  EXPECT_STREQ(algorithmOf("rsa3072").name, "rsa-v1_5-sha256");
  EXPECT_STREQ(algorithmOf("p384").name, "ecdsa-p384-sha384");
  EXPECT_EQ(algorithmOf("p384").hash, HashAlgorithm::SHA384);
  EXPECT_EQ(algorithmOf("p521").name, nullptr);
  EXPECT_EQ(algorithmOf("p521").refusal, "there is no HTTP signature algorithm for keys on the curve P-521");
  EXPECT_EQ(algorithmOf("rsa1024").name, nullptr);
  EXPECT_EQ(algorithmOf("rsa1024").refusal, "the RSA key has only 1024 bits; 2048 are the minimum");
  EXPECT_EQ(algorithmOf("ed25519").refusal, "the key is neither RSA nor on the curves P-256, P-384 and P-521");
}

} // namespace
