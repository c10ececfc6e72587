// SPDX-License-Identifier: Apache-2.0

#include <ssoclient/proof/sign_http_request.h>

#include "support/data_file.h"
#include "support/fixed_environment.h"
#include "support/http_request_text.h"
#include "support/throws_message.h"
#include "support/token_stand_in.h"
#include "support/work_folder.h"
#include "unit/proof/http_requests.h"

#include <tarvel/core/exception.h>
#include <tarvel/core/string_util.h>

#include <gtest/gtest.h>

#include <cstdlib>
#include <string>

namespace {

using namespace SsoClient;
using Tarvel::InvalidArgumentException;
using Testing::DataPath;
using Testing::ReadDataFile;
using Testing::TokenStandIn;

using Fields = std::vector<std::pair<std::string, std::string>>;

const HttpRequest POST_REQUEST{
    "POST", "https://service.example/pay?to=bob", {{"Host", "service.example"}}, std::string("{\"amount\": 12}")};

TokenStandIn HolderToken(const std::string &certificate = "tokens/holder",
                         SamlToken::ConfirmationType confirmation = SamlToken::HOLDER_OF_KEY) {
  return TokenStandIn("_id", "<token/>", confirmation,
                      Tarvel::Crypto::LoadCertificates(DataPath(certificate + ".crt")).front());
}

Tarvel::Ref<const Tarvel::Crypto::PrivateKey> Key(const std::string &name = "tokens/holder") {
  return Tarvel::Crypto::CreatePrivateKey(ReadDataFile(name + ".key"));
}

HttpRequest With(HttpRequest request, const Fields &fields) {
  request.headers.insert(request.headers.end(), fields.begin(), fields.end());
  return request;
}

TEST(SignHttpRequest, WritesTheFieldsInAFixedOrder) {
  const Testing::FixedEnvironment environment;
  const Fields fields = SignHttpRequest(POST_REQUEST, HolderToken(), *Key());
  ASSERT_EQ(fields.size(), 4U);
  EXPECT_EQ(fields[0], (std::pair<std::string, std::string>("Authorization", "SAML PHRva2VuLz4=")));
  EXPECT_EQ(fields[1], (std::pair<std::string, std::string>("Content-Digest",
                                                            "sha-256=:rCn5jU+6Rc/A9NciVbN04ZsEhp79DdojzWFvbSEC8pU=:")));
  EXPECT_EQ(fields[2].first, "Signature-Input");
  EXPECT_EQ(fields[2].second,
            std::string("sso=(\"@method\" \"@target-uri\" \"authorization\" \"content-digest\");"
                        "created=1767323045;nonce=\"00000000-0000-4000-8000-000000000001\";keyid=\"") +
                Testing::HOLDER_THUMBPRINT + "\";alg=\"rsa-v1_5-sha256\"");
  EXPECT_EQ(fields[3].first, "Signature");
  EXPECT_EQ(fields[3].second.substr(0, 5), "sso=:");
}

TEST(SignHttpRequest, SignsTheSameOctetsAsSimpleCode) {
  const Testing::FixedEnvironment environment;
  Testing::UnsignedRequest recipe;
  HttpSigningOptions options;
  options.nonce = "n";
  const auto token = Testing::HttpTokenVerifier().Verify(ReadDataFile("tokens/holder-of-key.xml"));
  const Fields fields = SignHttpRequest(POST_REQUEST, *token, *Key(), options);
  recipe.label = "sso";
  recipe.parameters = std::string(";created=1767323045;nonce=\"n\";keyid=\"") + Testing::HOLDER_THUMBPRINT +
                      "\";alg=\"rsa-v1_5-sha256\"";
  const HttpRequest expected = recipe.Sign(); // PKCS#1 v1.5 has no random part
  EXPECT_EQ(fields, expected.headers);
}

TEST(SignHttpRequest, HasTheFormOfTheOptions) {
  HttpSigningOptions options;
  options.tokenHeader = {"X-Token", "<", ">", TokenHeader::Encoding::BASE64URL};
  options.coveredHeaders = {"HOST"};
  options.label = "*a";
  options.nonce = "say \"a\\b\"";
  HttpRequest request = POST_REQUEST;
  request.body = boost::none;
  const Fields fields = SignHttpRequest(request, HolderToken("crypto/p384"), *Key("crypto/p384"), options);
  ASSERT_EQ(fields.size(), 3U);
  EXPECT_EQ(fields[0], (std::pair<std::string, std::string>("X-Token", "<PHRva2VuLz4>")));
  EXPECT_EQ(fields[1].second.find("*a=(\"@method\" \"@target-uri\" \"x-token\" \"host\");created="), 0U);
  EXPECT_NE(fields[1].second.find(";nonce=\"say \\\"a\\\\b\\\"\";"), std::string::npos);
  EXPECT_NE(fields[1].second.find(";alg=\"ecdsa-p384-sha384\""), std::string::npos);
}

TEST(SignHttpRequest, SignsTheDigestOfEmptyContent) {
  HttpRequest request = POST_REQUEST;
  request.body = "";
  const Fields fields = SignHttpRequest(request, HolderToken(), *Key());
  EXPECT_EQ(fields.at(1), (std::pair<std::string, std::string>(
                              "Content-Digest", "sha-256=:47DEQpj8HBSa+/TImW+5JCeuQeRkm5NMpJWZG3hSuFU=:")));
}

TEST(SignHttpRequest, UsesANewNonceEachTime) {
  EXPECT_NE(SignHttpRequest(POST_REQUEST, HolderToken(), *Key())[2],
            SignHttpRequest(POST_REQUEST, HolderToken(), *Key())[2]);
}

struct Holder {
  const char *key;
  const char *token;
};

constexpr Holder HOLDERS[] = {{"tokens/holder", "tokens/holder-of-key"},
                              {"crypto/p256", "http/holder-p256"},
                              {"crypto/p384", "http/holder-p384"}};

TEST(SignHttpRequest, IsVerifiedByAProgramThatSharesNothingWithIt) {
  for (const Holder &holder : HOLDERS) {
    const std::string tokenFile = std::string(holder.token) + ".xml";
    const auto token = Testing::HttpTokenVerifier().Verify(ReadDataFile(tokenFile));
    HttpSigningOptions options;
    options.coveredHeaders = {"host"};
    const HttpRequest request = With(POST_REQUEST, SignHttpRequest(POST_REQUEST, *token, *Key(holder.key), options));
    HttpRequest changed = request;
    changed.method = "PUT";
    const Testing::WorkFolder folder;
    const auto verify = [&](const std::string &text) {
      const std::string command = "openssl pkey -pubout -in " + DataPath(std::string(holder.key) + ".key") + " -out " +
                                  folder / "key" + " && python3 -B " + DataPath("http/verify.py") + " " +
                                  folder.Write("request", text) + " " + folder / "key" + " " + DataPath(tokenFile) +
                                  " >" + folder / "log" + " 2>&1";
      return std::system(command.c_str()) == 0;
    };
    EXPECT_TRUE(verify(Testing::WriteHttpRequest(request))) << folder.Read("log");
    EXPECT_FALSE(verify(Testing::WriteHttpRequest(changed)));
    EXPECT_NE(folder.Read("log").find("wrong signature"), std::string::npos) << folder.Read("log");
  }
}

TEST(SignHttpRequest, IsAcceptedByVerifyHttpProof) {
  for (const Holder &holder : HOLDERS) {
    const TokenVerifier verifier = Testing::HttpTokenVerifier();
    const auto token = verifier.Verify(ReadDataFile(std::string(holder.token) + ".xml"));
    for (const boost::optional<std::string> &body :
         {boost::optional<std::string>(), boost::optional<std::string>("")}) {
      HttpRequest request{"PUT", "http://[::1]:8080", {}, body};
      request = With(request, SignHttpRequest(request, *token, *Key(holder.key)));
      EXPECT_EQ(VerifyHttpProof(request, verifier).token->GetId(), token->GetId()) << holder.key;
    }
  }
}

void ExpectRefusal(const HttpRequest &request, const std::string &message, const HttpSigningOptions &options = {}) {
  EXPECT_THROWS_MESSAGE(SignHttpRequest(request, HolderToken(), *Key(), options), InvalidArgumentException,
                        "Invalid argument : " + message);
}

TEST(SignHttpRequest, RefusesAnotherKey) {
  EXPECT_THROWS_MESSAGE(SignHttpRequest(POST_REQUEST, HolderToken(), *Key("tokens/other")),
                        Tarvel::Crypto::KeyMismatchException, "The private key is not the key of the token _id");
  EXPECT_THROWS_MESSAGE(SignHttpRequest(POST_REQUEST, HolderToken(), *Key("crypto/p256")),
                        Tarvel::Crypto::KeyMismatchException, "The private key is not the key of the token _id");
}

TEST(SignHttpRequest, RefusesTokensAndKeysThatProveNothing) {
  EXPECT_THROWS_MESSAGE(
      SignHttpRequest(POST_REQUEST, HolderToken("tokens/holder", SamlToken::BEARER), *Key()), InvalidArgumentException,
      "Invalid argument : A bearer token has no key to sign with; MakeTokenHeader writes it into a header field");
  EXPECT_THROWS_MESSAGE(SignHttpRequest(POST_REQUEST, TokenStandIn("_", "<a/>", SamlToken::HOLDER_OF_KEY), *Key()),
                        InvalidArgumentException, "Invalid argument : The token has no key that can be used");
  EXPECT_THROWS_MESSAGE(
      SignHttpRequest(POST_REQUEST, HolderToken("crypto/p521"), *Key("crypto/p521")), InvalidArgumentException,
      "Invalid argument : The token's key cannot sign a request: there is no HTTP signature algorithm for "
      "keys on the curve P-521");
  EXPECT_THROWS_MESSAGE(
      SignHttpRequest(POST_REQUEST, HolderToken("crypto/rsa1024"), *Key("crypto/rsa1024")), InvalidArgumentException,
      "Invalid argument : The token's key cannot sign a request: the RSA key has only 1024 bits; 2048 are "
      "the minimum");
}

TEST(SignHttpRequest, RefusesRequestsThatCannotBeSent) {
  HttpRequest request = POST_REQUEST;
  request.targetUri = "/pay";
  ExpectRefusal(request,
                "The target of the request is not valid: Malformed URL \"/pay\": the scheme is not http or https");
  request.targetUri = "https://a/\r\nb";
  ExpectRefusal(request,
                "The target of the request is not valid: Malformed URL \"https://a/??b\": it contains a character "
                "that is not allowed in a URL");
  request = POST_REQUEST;
  request.method = "A B";
  ExpectRefusal(request, "The method of the request is not valid: \"A B\"");
  for (const char *const value : {"a\nb", "a\r\n b", "\x01"}) {
    request = POST_REQUEST;
    request.headers.emplace_back("X-Y", value);
    ExpectRefusal(request, "The header field X-Y contains a control character");
  }
  request.headers = {{"a b", "x"}};
  ExpectRefusal(request, "The request has a header field whose name is not valid: \"a b\"");
}

TEST(SignHttpRequest, RefusesFieldsThatAreThereAlready) {
  for (const std::string name : {"Authorization", "Content-Digest", "Signature-Input", "Signature"}) {
    HttpRequest request = POST_REQUEST;
    request.headers.emplace_back(Tarvel::StringUtil::ToUpper(name), "x");
    ExpectRefusal(request, "The request has the header field " + name + " already");
  }
}

TEST(SignHttpRequest, RefusesFieldsThatCannotBeCovered) {
  HttpRequest request = POST_REQUEST;
  request.headers.emplace_back("host", "b");
  request.headers.emplace_back("Name", "\xC3\xA4");
  HttpSigningOptions options;
  options.coveredHeaders = {"Host"};
  ExpectRefusal(request, "The request has more than one header field Host, which must be covered", options);
  options.coveredHeaders = {"X"};
  ExpectRefusal(request, "The request has no header field X, which must be covered", options);
  options.coveredHeaders = {"Name"};
  ExpectRefusal(request, "The signature covers the component \"name\", which is not ASCII", options);
  for (const char *const name : {"authorization", "Content-Digest"}) {
    options.coveredHeaders = {name};
    ExpectRefusal(request, std::string("The header field ") + name + " would be covered twice", options);
  }
  options.coveredHeaders = {"host", "HOST"};
  ExpectRefusal(POST_REQUEST, "The header field HOST would be covered twice", options);
}

TEST(SignHttpRequest, RefusesOptionsThatAreNotValid) {
  HttpSigningOptions options;
  options.label = "A";
  ExpectRefusal(POST_REQUEST,
                "HttpSigningOptions::label must begin with a lower-case letter or '*', and may also contain digits and "
                "\"_-.\"",
                options);
  options = {};
  options.nonce = "a\n";
  ExpectRefusal(POST_REQUEST, "HttpSigningOptions::nonce must be printable ASCII", options);
  options = {};
  options.tokenHeader.name = "a b";
  ExpectRefusal(POST_REQUEST, "TokenHeader::name is not the name of a header field", options);
}

TEST(SignHttpRequest, RefusesATokenThatIsTooLongForAHeader) {
  const TokenStandIn token("_id", std::string(MAX_HTTP_HEADER_OCTETS, 'x'), SamlToken::HOLDER_OF_KEY,
                           Tarvel::Crypto::LoadCertificates(DataPath("tokens/holder.crt")).front());
  EXPECT_THROWS_MESSAGE(SignHttpRequest(POST_REQUEST, token, *Key()), InvalidArgumentException,
                        "Invalid argument : The header fields of the request have more than 1048576 octets");
}

TEST(MakeTokenHeader, WritesABearerToken) {
  const TokenStandIn token("_id", "<token/>", SamlToken::BEARER);
  EXPECT_EQ(MakeTokenHeader(token), (std::pair<std::string, std::string>("Authorization", "SAML PHRva2VuLz4=")));
  const TokenHeader form{"X", "a=", ";", TokenHeader::Encoding::BASE64URL};
  EXPECT_EQ(MakeTokenHeader(token, form), (std::pair<std::string, std::string>("X", "a=PHRva2VuLz4;")));
}

TEST(MakeTokenHeader, RefusesAHolderOfKeyTokenAndAnInvalidForm) {
  EXPECT_THROWS_MESSAGE(
      MakeTokenHeader(HolderToken()), InvalidArgumentException,
      "Invalid argument : A holder-of-key token is worth nothing without a proof; SignHttpRequest writes both");
  TokenHeader form;
  form.after = "\xC3";
  EXPECT_THROWS_MESSAGE(MakeTokenHeader(TokenStandIn("_", "<a/>", SamlToken::BEARER), form), InvalidArgumentException,
                        "Invalid argument : TokenHeader::before and TokenHeader::after must be printable ASCII");
}

} // namespace
