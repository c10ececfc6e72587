// SPDX-License-Identifier: Apache-2.0

#include "token/saml2_key_info.h"

#include "unit/token/saml2_refusals.h"

#include <tarvel/core/string_util.h>
#include <tarvel/crypto/subject_public_key.h>

#include <gtest/gtest.h>

#include <cstdint>
#include <string>
#include <vector>

namespace {

using namespace SsoClient;
using namespace Testing;
using Octets = std::vector<std::uint8_t>;
using Tarvel::StringUtil;

constexpr std::ptrdiff_t EXPONENT_END = 5; // the last octets of a key with the exponent 65537: 02 03 01 00 01

Tarvel::Ref<const Tarvel::Crypto::Certificate> CertificateIn(const std::string &name) {
  return Tarvel::Crypto::CreateCertificateFromPem(ReadDataFile(name));
}

Octets KeyOf(const std::string &certificate) {
  return Tarvel::Crypto::GetSubjectPublicKey(*CertificateIn(certificate));
}

std::string X509Data(const std::string &certificate) {
  return "<ds:X509Data><ds:X509Certificate>" + StringUtil::Base64Encode(CertificateIn(certificate)->GetDer()) +
         "</ds:X509Certificate></ds:X509Data>";
}

/// The key value with this modulus and this exponent in Base64.
std::string RsaKeyValue(const std::string &modulus, const std::string &exponent) {
  return "<ds:KeyValue><ds:RSAKeyValue><ds:Modulus>" + modulus + "</ds:Modulus><ds:Exponent>" + exponent +
         "</ds:Exponent></ds:RSAKeyValue></ds:KeyValue>";
}

/// The key value of a certificate whose modulus has that many octets.
std::string RsaKeyValueOf(const std::string &certificate, std::ptrdiff_t octets = 256) {
  const Octets key = KeyOf(certificate);
  return RsaKeyValue(StringUtil::Base64Encode({key.end() - EXPONENT_END - octets, key.end() - EXPONENT_END}), "AQAB");
}

std::string EcKeyValue(const std::string &parameters, const std::string &point) {
  return "<ds:KeyValue><k:ECKeyValue xmlns:k='http://www.w3.org/2009/xmldsig11#'>" + parameters + "<k:PublicKey>" +
         point + "</k:PublicKey></k:ECKeyValue></ds:KeyValue>";
}

std::string NamedCurve(const std::string &uri) {
  return "<k:NamedCurve URI='" + uri + "'/>";
}

/// The key value of a certificate whose point has that many octets.
std::string EcKeyValueOf(const std::string &certificate, const std::string &curve, std::ptrdiff_t octets) {
  const Octets key = KeyOf(certificate);
  return EcKeyValue(NamedCurve(curve), StringUtil::Base64Encode({key.end() - octets, key.end()}));
}

const std::string P256 = "urn:oid:1.2.840.10045.3.1.7";
const std::string HOLDER = "tokens/holder.crt";

std::string KeyInfo(const std::string &content) {
  return "<ds:KeyInfo>" + content + "</ds:KeyInfo>";
}

/// An assertion whose only confirmation has this data.
std::string HeldBy(const std::string &data) {
  return AssertionConfirmedBy(Piece::Confirmation("holder-of-key", "<saml:SubjectConfirmationData>" + data +
                                                                       "</saml:SubjectConfirmationData>"));
}

ConfirmationDetails Read(const std::string &data) {
  return AcceptedSaml2(HeldBy(data)).details.confirmations.at(0);
}

/// Expects that the confirmation is read, but has no key that can be used.
void ExpectNoKey(const std::string &data) {
  const ConfirmationDetails details = Read(data);
  EXPECT_TRUE(details.publicKey.empty()) << data;
  EXPECT_FALSE(details.certificate) << data;
}

TEST(ParseKeyInfo, ReadsTheKeyOfACertificate) {
  const ConfirmationDetails details = Read(KeyInfo(X509Data(HOLDER)));
  ASSERT_TRUE(details.certificate);
  EXPECT_EQ("CN=holder,O=Example", details.certificate->GetSubject());
  EXPECT_EQ(KeyOf(HOLDER), details.publicKey);
}

TEST(ParseKeyInfo, AcceptsTheTypeAndTheOtherAttributesOfTheDataWithAKey) {
  const Accepted read = AcceptedSaml2(AssertionConfirmedBy(Piece::Confirmation(
      "holder-of-key", "<saml:SubjectConfirmationData xsi:type='saml:KeyInfoConfirmationDataType' Recipient='r' "
                       "NotOnOrAfter='2026-01-01T08:00:00Z'><ds:KeyInfo Id='k'>" +
                           X509Data(HOLDER) + "</ds:KeyInfo></saml:SubjectConfirmationData>")));
  EXPECT_EQ(KeyOf(HOLDER), read.details.confirmations.at(0).publicKey);
  EXPECT_EQ("r", read.details.confirmations.at(0).recipient.value());
}

TEST(ParseKeyInfo, ReadsACertificateWithAKeyOfAnyKindAndSize) {
  for (const char *const name : {"crypto/rsa1024.crt", "crypto/ed25519.crt", "crypto/p224.crt"}) {
    EXPECT_EQ(KeyOf(name), Read(KeyInfo(X509Data(name))).publicKey) << name;
  }
}

TEST(ParseKeyInfo, ReadsAnRsaKeyValue) {
  const ConfirmationDetails details = Read(KeyInfo(RsaKeyValueOf(HOLDER)));
  EXPECT_EQ(KeyOf(HOLDER), details.publicKey);
  EXPECT_FALSE(details.certificate);
}

TEST(ParseKeyInfo, ReadsEcKeyValuesOnNamedCurves) {
  EXPECT_EQ(KeyOf("crypto/p256.crt"), Read(KeyInfo(EcKeyValueOf("crypto/p256.crt", P256, 65))).publicKey);
  EXPECT_EQ(KeyOf("crypto/p384.crt"),
            Read(KeyInfo(EcKeyValueOf("crypto/p384.crt", "urn:oid:1.3.132.0.34", 97))).publicKey);
  EXPECT_EQ(KeyOf("crypto/p521.crt"),
            Read(KeyInfo(EcKeyValueOf("crypto/p521.crt", "urn:oid:1.3.132.0.35", 133))).publicKey);
}

TEST(ParseKeyInfo, ReadsACertificateAndAKeyValueOfTheSameKey) {
  for (const std::string &content :
       {X509Data(HOLDER) + RsaKeyValueOf(HOLDER), RsaKeyValueOf(HOLDER) + X509Data(HOLDER)}) {
    const ConfirmationDetails details = Read(KeyInfo(content));
    EXPECT_TRUE(details.certificate);
    EXPECT_EQ(KeyOf(HOLDER), details.publicKey);
  }
}

TEST(ParseKeyInfo, RefusesACertificateAndAKeyValueOfDifferentKeys) {
  const Deviations different{{"The certificate and the key value of a confirmation are different keys", "ds:KeyInfo",
                              "", "one key", "two keys"}};
  EXPECT_EQ(different, In(HeldBy(KeyInfo(X509Data(HOLDER) + RsaKeyValueOf("crypto/rsa2048.crt")))));
  EXPECT_EQ(different, In(HeldBy(KeyInfo(X509Data(HOLDER) + EcKeyValueOf("crypto/p256.crt", P256, 65)))));
  EXPECT_EQ(different, In(HeldBy(KeyInfo(X509Data(HOLDER) + RsaKeyValueOf("crypto/rsa1024.crt", 128)))));
}

TEST(ParseKeyInfo, UsesTheFirstOfSeveralKeys) {
  EXPECT_EQ(KeyOf(HOLDER), Read(KeyInfo(X509Data(HOLDER) + X509Data("crypto/p256.crt"))).publicKey);
  EXPECT_EQ(KeyOf(HOLDER), Read(KeyInfo(RsaKeyValueOf(HOLDER) + RsaKeyValueOf("crypto/rsa2048.crt"))).publicKey);
  EXPECT_EQ(KeyOf(HOLDER), Read(KeyInfo(X509Data(HOLDER)) + KeyInfo(X509Data("crypto/p256.crt"))).publicKey);
  EXPECT_EQ(KeyOf(HOLDER), Read(KeyInfo("<ds:KeyName>n</ds:KeyName>") + KeyInfo(RsaKeyValueOf(HOLDER))).publicKey);
}

TEST(ParseKeyInfo, IgnoresFurtherKeysEvenIfTheFirstCannotBeUsed) {
  const std::string weak = RsaKeyValueOf("crypto/rsa1024.crt", 128);
  ExpectNoKey(KeyInfo(weak + RsaKeyValueOf(HOLDER)));
  ExpectNoKey(KeyInfo(weak) + KeyInfo(X509Data(HOLDER)));
  const std::string malformed = KeyInfo("<ds:X509Data><ds:X509Certificate>A</ds:X509Certificate></ds:X509Data>");
  EXPECT_EQ(1u, In(HeldBy(malformed + malformed)).size());
}

TEST(ParseKeyInfo, SkipsKeyValuesOfAnotherKind) {
  const std::string dsa = "<ds:KeyValue><ds:DSAKeyValue/></ds:KeyValue>";
  EXPECT_EQ(KeyOf(HOLDER), Read(KeyInfo(dsa + RsaKeyValueOf(HOLDER))).publicKey);
  EXPECT_EQ(KeyOf(HOLDER), Read(KeyInfo(dsa) + KeyInfo(RsaKeyValueOf(HOLDER))).publicKey);
}

TEST(ParseKeyInfo, IgnoresWhatIsNotAKey) {
  const std::string names =
      "<ds:KeyName>n</ds:KeyName>text<x/><ds:X509Data><ds:X509SubjectName>CN=n</ds:X509SubjectName>"
      "</ds:X509Data>";
  const ConfirmationDetails details = Read("text<other/>" + KeyInfo(names + X509Data(HOLDER) + names));
  EXPECT_EQ(KeyOf(HOLDER), details.publicKey);
  const std::string certificate = X509Data(HOLDER);
  const std::string withSerial =
      ReplaceOnce(certificate, "<ds:X509Data>", "<ds:X509Data><ds:X509SKI>AA==</ds:X509SKI>");
  EXPECT_EQ(KeyOf(HOLDER), Read(KeyInfo(withSerial)).publicKey);
}

TEST(ParseKeyInfo, HasNoKeyIfNoneCanBeUsed) {
  ExpectNoKey("");
  ExpectNoKey(KeyInfo(""));
  ExpectNoKey(KeyInfo("<ds:X509Data/><ds:KeyValue/>"));
  ExpectNoKey(KeyInfo("<ds:KeyName>n</ds:KeyName>"));
  ExpectNoKey(KeyInfo("<ds:KeyValue><ds:DSAKeyValue><ds:P>AA==</ds:P></ds:DSAKeyValue></ds:KeyValue>"));
  ExpectNoKey(KeyInfo("<ds:KeyValue><x:RSAKeyValue xmlns:x='urn:x'/></ds:KeyValue>"));
  ExpectNoKey(KeyInfo(EcKeyValue(NamedCurve("urn:oid:1.3.132.0.33"), "AA==")));
  ExpectNoKey(KeyInfo(EcKeyValue("<k:ECParameters/>", "AA==")));
  ExpectNoKey(KeyInfo(RsaKeyValueOf("crypto/rsa1024.crt", 128)));
  ExpectNoKey(KeyInfo(RsaKeyValue(StringUtil::Base64Encode(Octets(2049, 255)), "AQAB")));
  ExpectNoKey(KeyInfo(RsaKeyValue(StringUtil::Base64Encode(Octets(256, 255)), "AQ==")));
  EXPECT_FALSE(AcceptedSaml2(AssertionConfirmedBy(Piece::Confirmation("holder-of-key", ""))).confirmations.empty());
}

TEST(ParseKeyInfo, UsesACertificateWithAKeyValueOfAnotherKind) {
  EXPECT_EQ(KeyOf(HOLDER), Read(KeyInfo(X509Data(HOLDER) + "<ds:KeyValue><ds:DSAKeyValue/></ds:KeyValue>")).publicKey);
}

TEST(ParseKeyInfo, RefusesMalformedCertificates) {
  const auto certificate = [](const std::string &content) {
    return In(HeldBy(KeyInfo("<ds:X509Data><ds:X509Certificate>" + content + "</ds:X509Certificate></ds:X509Data>")));
  };
  const std::string allowed = "an X.509 certificate in DER, in Base64";
  EXPECT_EQ(
      (Deviations{{"X509Certificate does not decode: Base64 text: a last group without its padding at character 4",
                   "ds:X509Certificate", "", allowed, ""}}),
      certificate("AAA"));
  EXPECT_EQ((Deviations{{OnlyText("ds:X509Certificate"), "ds:X509Certificate", "", "one text", ""}}), certificate(""));
  ASSERT_EQ(1u, certificate("AAAA").size());
  EXPECT_EQ(allowed, certificate("AAAA").front().allowed);
}

TEST(ParseKeyInfo, RefusesMalformedRsaKeyValues) {
  EXPECT_EQ((Deviations{{"Modulus does not decode: Base64 text: a last group without its padding at character 4",
                         "ds:Modulus", "", "Base64", ""}}),
            In(HeldBy(KeyInfo(RsaKeyValue("AAA", "AQAB")))));
  EXPECT_EQ((Deviations{{"Exponent does not decode: Base64 text: a last group without its padding at character 2",
                         "ds:Exponent", "", "Base64", ""}}),
            In(HeldBy(KeyInfo(RsaKeyValue("AAAA", "A")))));
  const std::string empty = "<ds:KeyValue><ds:RSAKeyValue/></ds:KeyValue>";
  EXPECT_EQ((Deviations{{NotFound("Modulus"), "ds:RSAKeyValue", "", "element ds:Modulus", ""},
                        {NotFound("Exponent"), "ds:RSAKeyValue", "", "element ds:Exponent", ""}}),
            In(HeldBy(KeyInfo(empty))));
  EXPECT_EQ((Deviations{{Content("ds:RSAKeyValue", "element x"), "x", "", "no further element", "element x"}}),
            In(HeldBy(KeyInfo(ReplaceOnce(RsaKeyValueOf(HOLDER), "</ds:RSAKeyValue>", "<x/></ds:RSAKeyValue>")))));
}

TEST(ParseKeyInfo, RefusesMalformedEcKeyValues) {
  const std::string curve = NamedCurve(P256);
  EXPECT_EQ((Deviations{{"PublicKey does not decode: Base64 text: a last group without its padding at character 2",
                         "k:PublicKey", "", "Base64", ""}}),
            In(HeldBy(KeyInfo(EcKeyValue(curve, "A")))));
  EXPECT_EQ((Deviations{{"PublicKey does not decode: The 3 bytes are not an uncompressed point on P-256", "k:PublicKey",
                         "", "an uncompressed point of the curve, in Base64", ""}}),
            In(HeldBy(KeyInfo(EcKeyValue(curve, "AAAA")))));
  EXPECT_EQ((Deviations{{OnlyText("k:PublicKey"), "k:PublicKey", "", "one text", ""}}),
            In(HeldBy(KeyInfo(EcKeyValue(curve, "")))));
}

TEST(ParseKeyInfo, RefusesUnknownAttributes) {
  EXPECT_EQ((Deviations{{Unexpected("a", "ds:KeyInfo"), "ds:KeyInfo", "a", "Id (optional)", ""}}),
            In(HeldBy("<ds:KeyInfo a=''>" + X509Data(HOLDER) + "</ds:KeyInfo>")));
}

} // namespace
