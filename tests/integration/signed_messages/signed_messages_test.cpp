// SPDX-License-Identifier: Apache-2.0
// xmlsec1 verifies every signature in a message that was signed: the proof, the token's own, and those that the message had
// before. It refuses the message after a change to anything that is signed.
#include "integration/signed_requests/foreign_document.h"
#include "support/sample_message.h"

#include <ssoclient/proof/sign_message.h>

#include <gtest/gtest.h>

#include <ostream>

namespace SsoClient {
namespace {

using namespace Testing;

/// A token, and the names of its holder's key and of its issuer's key under tests/data/tokens.
struct Holder {
  const char *token;
  const char *key;
  const char *issuer;
};

const Holder HOLDERS[] = {
    {"tokens/holder-of-key", "holder", "sts-rsa"},
    {"saml2/holder-certificate", "holder", "sts-rsa"},
    {"saml2/holder-rsa-value", "holder", "sts-rsa"},
    {"saml2/holder-ec-value", "sts-ec256", "sts-rsa"},
    {"saml2/holder-ec384-value", "sts-ec384", "sts-rsa"},
    {"saml2/holder-ec-certificate", "sts-ec521", "sts-rsa"},
    {"tokens/c14n-inclusive-prefixes", "holder", "sts-rsa"},
    {"tokens/c14n-exclusive-with-comments", "holder", "sts-rsa"},
    {"tokens/style-default-namespace", "holder", "sts-rsa"},
};

/// A message of a program.
struct Form {
  const char *name;
  std::string message;
  std::vector<MessagePart> parts;
};

std::ostream &operator<<(std::ostream &out, const Form &form) {
  return out << form.name;
}

const std::string BODY =
    "<s:Body xmlns:x=\"urn:x\">\n <x:y a=\"&#9;1\">\xC3\xBC<![CDATA[<&>]]></x:y><?p i?><!--c--></s:Body>";

std::vector<Form> Forms() {
  const std::string block = "<a:To xmlns:a=\"urn:a\">you</a:To>";
  const std::string timestamp = "<u:Timestamp u:Id=\"ts\"><u:Created>2026-01-02T03:04:05Z</u:Created></u:Timestamp>";
  std::vector<Form> forms;
  for (const std::string &soap : {SOAP11, SOAP12}) {
    const bool isSoap11 = soap == SOAP11;
    forms.push_back({isSoap11 ? "Soap11WithoutHeader" : "Soap12WithoutHeader", SampleEnvelope(BODY, soap), {}});
    forms.push_back({isSoap11 ? "Soap11WithPart" : "Soap12WithPart",
                     SampleEnvelope("<s:Header>" + block + "</s:Header>" + BODY, soap),
                     {{"urn:a", "To"}}});
    forms.push_back({isSoap11 ? "Soap11WithSecurityHeader" : "Soap12WithSecurityHeader",
                     SampleMessage(SampleSecurity(timestamp + "<o:X/>"), soap),
                     {}});
  }
  forms.push_back({"DefaultNamespace",
                   "<Envelope xmlns=\"" + SOAP12 + "\"><Body><pay xmlns=\"\"><x/></pay></Body></Envelope>",
                   {}});
  forms.push_back(
      {"TakenPrefixes",
       "<ds:Envelope xmlns:ds=\"" + SOAP11 +
           "\" xmlns:wsse=\"urn:1\" xmlns:wsu=\"urn:2\" xmlns:saml=\"urn:3\"><ds:Header wsu:Id=\"x\"/><ds:Body "
           "wsu:Id=\"y\"><wsse:z wsu:a=\"b\"/></ds:Body></ds:Envelope>",
       {}});
  forms.push_back({"BodyWithIdentifier", SampleEnvelope("<s:Body Id=\"b\"><x/></s:Body>"), {}});
  forms.push_back({"DeclarationsAround",
                   "<s:Envelope xmlns:s=\"" + SOAP11 + "\" xmlns:u=\"" + WSU +
                       "\" xmlns:xsi=\"http://www.w3.org/2001/XMLSchema-instance\" xml:lang=\"en\">" + BODY +
                       "</s:Envelope>",
                   {}});
  return forms;
}

std::string ReadKey(const std::string &name, const std::string &ending) {
  return ReadDataFile("tokens/" + name + ending);
}

/// The certificate whose key `holder` has.
std::string CertificateOf(const Holder &holder) {
  return ReadKey(holder.key, ".crt");
}

std::string Sign(const Form &form, const Holder &holder) {
  return SignMessage(form.message, *SampleToken(holder.token), *SampleKey(holder.key), form.parts);
}

/// The proof signature: the child of the first security header.
xmlNodePtr Proof(const ForeignDocument &message) {
  return Child(Find(message.Root(), "Security"), "Signature");
}

class SignedMessage : public testing::TestWithParam<Form> {};

TEST_P(SignedMessage, IsValidForXmlSecWithEveryKindOfKey) {
  for (const Holder &holder : HOLDERS) {
    const ForeignDocument message(Sign(GetParam(), holder));
    EXPECT_TRUE(IsValidSignature(Proof(message), CertificateOf(holder))) << holder.token;
    const xmlNodePtr assertion = Child(Find(message.Root(), "Security"), "Assertion");
    EXPECT_TRUE(IsValidSignature(Child(assertion, "Signature"), ReadKey(holder.issuer, ".crt"))) << holder.token;
  }
}

TEST_P(SignedMessage, IsNotValidWithAnotherKey) {
  const ForeignDocument message(Sign(GetParam(), HOLDERS[0]));
  EXPECT_FALSE(IsValidSignature(Proof(message), ReadKey("other", ".crt")));
}

TEST_P(SignedMessage, IsNotValidAfterAChangeOfAnElementThatIsSigned) {
  const std::string text = Sign(GetParam(), HOLDERS[0]);
  const ForeignDocument original(text);
  std::vector<std::string> parts = {"Body", "Timestamp", "Assertion"};
  for (const MessagePart &part : GetParam().parts) {
    parts.push_back(part.localName);
  }
  for (const std::string &part : parts) {
    const std::size_t count = Elements(Find(original.Root(), part)).size();
    for (std::size_t index = 0; index < count; ++index) {
      const ForeignDocument changed(text);
      xmlNewProp(Elements(Find(changed.Root(), part))[index], reinterpret_cast<const xmlChar *>("extra"),
                 reinterpret_cast<const xmlChar *>("1"));
      const ForeignDocument read(changed.Serialise());
      EXPECT_FALSE(IsValidSignature(Proof(read), CertificateOf(HOLDERS[0]))) << part << ", element " << index;
    }
  }
}

TEST_P(SignedMessage, CanGetABearerTokenThatStaysValid) {
  SecurityHeaderOptions options;
  options.role = "urn:role";
  for (const char *const name :
       {"tokens/bearer", "tokens/bearer-5k", "tokens/rsa-sha512", "saml2/name-email", "saml2/attributes-known"}) {
    const ForeignDocument message(AttachToken(GetParam().message, *SampleToken(name), options));
    const xmlNodePtr assertion = Find(message.Root(), "Assertion");
    EXPECT_TRUE(IsValidSignature(Child(assertion, "Signature"), ReadKey("sts-rsa", ".crt"))) << name;
  }
}

INSTANTIATE_TEST_SUITE_P(EveryForm, SignedMessage, testing::ValuesIn(Forms()),
                         [](const auto &form) { return std::string(form.param.name); });

const std::string EXCLUSIVE = "http://www.w3.org/2001/10/xml-exc-c14n#";
const std::string INCLUSIVE = "http://www.w3.org/TR/2001/REC-xml-c14n-20010315";

/// An empty signature over the elements with these identifiers, with the canonicalisation `method`.
std::string Template(const std::vector<std::string> &identifiers, const std::string &method) {
  std::string references;
  for (const std::string &identifier : identifiers) {
    references += "<d:Reference URI=\"#" + identifier + "\"><d:Transforms><d:Transform Algorithm=\"" + method +
                  "\"/></d:Transforms><d:DigestMethod Algorithm=\"http://www.w3.org/2001/04/xmlenc#sha256\"/>"
                  "<d:DigestValue/></d:Reference>";
  }
  return "<d:Signature xmlns:d=\"" + DS + "\"><d:SignedInfo><d:CanonicalizationMethod Algorithm=\"" + method +
         "\"/><d:SignatureMethod Algorithm=\"http://www.w3.org/2001/04/xmldsig-more#rsa-sha256\"/>" + references +
         "</d:SignedInfo><d:SignatureValue/></d:Signature>";
}

/// Signs `message`, which has a template, with the key "other"; then signs it with a token, and checks all signatures.
void ExpectThatAllSignaturesAreValid(const std::string &message, const std::vector<MessagePart> &parts = {}) {
  const std::string signedByOther = SignTemplate(message, ReadKey("other", ".key"));
  const std::string text =
      SignMessage(signedByOther, *SampleToken(HOLDERS[0].token), *SampleKey(HOLDERS[0].key), parts);
  const ForeignDocument read(text);
  std::size_t others = 0;
  for (const xmlNodePtr signature : FindAll(read.Root(), "Signature")) {
    if (reinterpret_cast<const char *>(signature->ns->prefix) == std::string("d")) {
      ++others;
      EXPECT_TRUE(IsValidSignature(signature, ReadKey("other", ".crt"))) << text;
    }
  }
  EXPECT_EQ(others, 1u);
  EXPECT_TRUE(IsValidSignature(Proof(read), CertificateOf(HOLDERS[0]))) << text;
  const xmlNodePtr assertion = Find(read.Root(), "Assertion");
  EXPECT_TRUE(IsValidSignature(Child(assertion, "Signature"), ReadKey(HOLDERS[0].issuer, ".crt"))) << text;
}

TEST(SignMessage, LeavesSignaturesInTheSecurityHeaderValid) {
  for (const std::string &method : {EXCLUSIVE, INCLUSIVE}) {
    const std::string timestamp = "<u:Timestamp u:Id=\"ts\"><u:Created>2026-01-02T03:04:05Z</u:Created></u:Timestamp>";
    ExpectThatAllSignaturesAreValid(SampleEnvelope(
        "<s:Header>" + SampleSecurity(timestamp + Template({"ts", "b", "h"}, method)) +
        "<x xmlns=\"urn:x\" Id=\"h\">1</x></s:Header><s:Body Id=\"b\"><m:Pay xmlns:m=\"urn:m\">7</m:Pay></s:Body>"));
  }
}

TEST(SignMessage, LeavesSignaturesInTheBodyValid) {
  ExpectThatAllSignaturesAreValid(
      SampleEnvelope("<s:Body><x Id=\"d\">1</x>" + Template({"d"}, EXCLUSIVE) + "</s:Body>"));
  ExpectThatAllSignaturesAreValid(
      SampleEnvelope("<s:Body Id=\"b\"><x Id=\"d\">1</x>" + Template({"d"}, INCLUSIVE) + "</s:Body>"));
}

TEST(SignMessage, LeavesSignaturesForAnotherRoleValid) {
  for (const std::string &method : {EXCLUSIVE, INCLUSIVE}) {
    const std::string other = SampleSecurity(Template({"b", "h"}, method) + "<u:X Id=\"h\"/>",
                                             " s:actor=\"urn:other\" s:mustUnderstand=\"1\"");
    const std::string signedByOther =
        SignTemplate(SampleEnvelope("<s:Header>" + other + "</s:Header><s:Body Id=\"b\"/>"), ReadKey("other", ".key"));
    const ForeignDocument read(SignMessage(signedByOther, *SampleToken(HOLDERS[0].token), *SampleKey(HOLDERS[0].key)));
    EXPECT_TRUE(IsValidSignature(Child(FindAll(read.Root(), "Security")[1], "Signature"), ReadKey("other", ".crt")));
    EXPECT_TRUE(IsValidSignature(Proof(read), CertificateOf(HOLDERS[0])));
  }
}

TEST(SignMessage, LeavesTheSignaturesOfEarlierCallsValid) {
  SecurityHeaderOptions options;
  const std::string first =
      SignMessage(SampleMessage(""), *SampleToken("saml2/holder-ec-value"), *SampleKey("sts-ec256"));
  const std::string second =
      SignMessage(first, *SampleToken("tokens/holder-of-key"), *SampleKey("holder"), {}, options);
  options.role = "urn:role";
  const ForeignDocument read(
      SignMessage(second, *SampleToken("saml2/holder-rsa-value"), *SampleKey("holder"), {}, options));
  const std::vector<xmlNodePtr> headers = FindAll(read.Root(), "Security");
  ASSERT_EQ(headers.size(), 2u);
  EXPECT_TRUE(IsValidSignature(Child(headers[0], "Signature"), ReadKey("holder", ".crt")));
  std::vector<std::string> certificates = {"holder", "sts-ec256"};
  std::size_t index = 0;
  for (xmlNodePtr child = headers[1]->children; child; child = child->next) {
    if (reinterpret_cast<const char *>(child->name) == std::string("Signature")) {
      ASSERT_LT(index, certificates.size());
      EXPECT_TRUE(IsValidSignature(child, ReadKey(certificates[index++], ".crt")));
    }
  }
  EXPECT_EQ(index, 2u);
}

} // namespace
} // namespace SsoClient
