// SPDX-License-Identifier: Apache-2.0

#include "unit/token/signed_assertion.h"

#include "crypto/public_key.h"
#include "support/data_file.h"
#include "support/parsed_document.h"

#include <tarvel/core/string_util.h>
#include <tarvel/crypto/private_key.h>
#include <tarvel/xml/security/canonicalizer.h>
#include <tarvel/xml/security/signature.h>

#include <array>
#include <stdexcept>

namespace Testing {

namespace {

using Tarvel::StringUtil;
using Tarvel::Crypto::Digest;
using Tarvel::Crypto::DigestAlgorithm;
using Tarvel::Xml::Security::SignatureUri::NAMESPACE;

using Sha256 = std::array<std::uint8_t, Tarvel::Crypto::DigestBytes(DigestAlgorithm::SHA256)>;

constexpr const char *END_OF_SIGNATURE = "</ds:Signature>";

Sha256 CanonicalDigest(const std::string &document) {
  const Tarvel::Ref<Tarvel::StringWriter> writer = Tarvel::CreateStringWriter();
  Tarvel::Xml::Security::CreateCanonicalizer(Tarvel::Xml::Security::CanonicalizationUri::EXCLUSIVE)
      ->Canonicalize(ParsedDocument(document).Root(), *writer);
  Sha256 value{};
  Digest digest(DigestAlgorithm::SHA256);
  digest.Update(writer->TakeText());
  digest.Finish(value.data());
  return value;
}

std::string Element(const std::string &name, const std::string &attributes, const std::string &content) {
  return "<ds:" + name + attributes + ">" + content + "</ds:" + name + ">";
}

std::string Algorithm(const std::string &name, std::string_view uri) {
  return Element(name, " Algorithm=\"" + std::string(uri) + "\"", "");
}

std::string SignedInfo(const std::string &reference, const std::string &digest) {
  using namespace Tarvel::Xml::Security;
  const std::string transforms = Element("Transforms", "",
                                         Algorithm("Transform", SignatureUri::ENVELOPED_SIGNATURE) +
                                             Algorithm("Transform", CanonicalizationUri::EXCLUSIVE));
  return Element("SignedInfo", "",
                 Algorithm("CanonicalizationMethod", CanonicalizationUri::EXCLUSIVE) +
                     Algorithm("SignatureMethod", SignatureUri::RSA_SHA256) +
                     Element("Reference", " URI=\"" + reference + "\"",
                             transforms + Algorithm("DigestMethod", SignatureUri::DIGEST_SHA256) +
                                 Element("DigestValue", "", digest)));
}

} // namespace

std::string SignAgain(const std::string &token, const SigningChoices &choices) {
  const std::size_t begin = token.find("<ds:Signature");
  const std::size_t end = token.find(END_OF_SIGNATURE);
  if (begin == std::string::npos || end == std::string::npos) {
    throw std::logic_error("the token has no signature");
  }
  const std::string before = token.substr(0, begin);
  const std::string after = token.substr(end + std::string(END_OF_SIGNATURE).size());
  const std::string rest = before + after;
  const std::string id(ParsedDocument(rest).Root().FindAttribute("", "ID")->GetValue());
  const Sha256 digest = CanonicalDigest(rest);
  const std::string signedInfo =
      SignedInfo(choices.reference.empty() ? "#" + id : choices.reference,
                 choices.digest.empty() ? StringUtil::Base64Encode(digest.data(), digest.size()) : choices.digest);
  const std::string declaration = " xmlns:ds=\"" + std::string(NAMESPACE) + "\"";
  const std::string standalone =
      "<ds:SignedInfo" + declaration + signedInfo.substr(std::string("<ds:SignedInfo").size());
  const auto key = Tarvel::Crypto::CreatePrivateKey(ReadDataFile("tokens/" + choices.key + ".key"));
  const auto value = Tarvel::Crypto::SignDigest(*key, Tarvel::Crypto::SignatureScheme::RSA_PKCS1,
                                                DigestAlgorithm::SHA256, CanonicalDigest(standalone).data());
  return before +
         Element("Signature", declaration,
                 signedInfo + Element("SignatureValue", "", StringUtil::Base64Encode(value)) + choices.keyInfo) +
         after;
}

std::string TokenFixture(const std::string &name) {
  return ReadDataFile("tokens/" + name + ".xml");
}

Tarvel::Crypto::CertificateList TokenCertificates(const std::vector<std::string> &names) {
  Tarvel::Crypto::CertificateList certificates;
  for (const std::string &name : names) {
    certificates.push_back(Tarvel::Crypto::LoadCertificates(DataPath("tokens/" + name + ".crt")).front());
  }
  return certificates;
}

std::string KeyInfoOf(const std::vector<std::string> &certificates) {
  std::string elements;
  for (const auto &certificate : TokenCertificates(certificates)) {
    elements += Element("X509Certificate", "", StringUtil::Base64Encode(certificate->GetDer()));
  }
  return Element("KeyInfo", "", Element("X509Data", "", elements));
}

} // namespace Testing
