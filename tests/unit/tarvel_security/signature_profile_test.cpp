// SPDX-License-Identifier: Apache-2.0
// What `Verify` refuses because it is outside the profile, although its syntax is right.

#include "genuine_token.h"

#include <tarvel/xml/security/signature.h>

#include <gtest/gtest.h>

#include <string>

namespace {

namespace Uri = Tarvel::Xml::Security::SignatureUri;
using Testing::GenuineToken;
using Testing::Refusal;
using Testing::RefusalOf;
using Testing::Replaced;

const std::string EXCLUSIVE_TRANSFORM = R"(<ds:Transform Algorithm="http://www.w3.org/2001/10/xml-exc-c14n#"/>)";

TEST(Verify, RefusesAndNamesEveryOtherSignatureAlgorithm) {
  for (const std::string uri :
       {"http://www.w3.org/2000/09/xmldsig#rsa-sha1", "http://www.w3.org/2000/09/xmldsig#dsa-sha1",
        "http://www.w3.org/2000/09/xmldsig#hmac-sha1", "http://www.w3.org/2001/04/xmldsig-more#hmac-sha256",
        "http://www.w3.org/2001/04/xmldsig-more#rsa-md5", "http://www.w3.org/2001/04/xmldsig-more#rsa-sha224",
        "http://www.w3.org/2001/04/xmldsig-more#rsa-ripemd160", "http://www.w3.org/2001/04/xmldsig-more#ecdsa-sha1",
        "http://www.w3.org/2007/05/xmldsig-more#rsa-pss", "http://www.w3.org/2007/05/xmldsig-more#sha1-rsa-MGF1",
        "http://www.w3.org/2001/04/xmldsig-more#RSA-SHA256", "urn:unknown", ""}) {
    EXPECT_EQ("The signature algorithm \"" + uri + "\" is not accepted", Refusal(Uri::RSA_SHA256, uri));
  }
}

TEST(Verify, RefusesAndNamesEveryOtherDigestAlgorithm) {
  for (const std::string uri :
       {"http://www.w3.org/2000/09/xmldsig#sha1", "http://www.w3.org/2001/04/xmldsig-more#md5",
        "http://www.w3.org/2001/04/xmldsig-more#sha224", "http://www.w3.org/2001/04/xmlenc#ripemd160", "urn:unknown"}) {
    EXPECT_EQ("The digest algorithm \"" + uri + "\" is not accepted", Refusal(Uri::DIGEST_SHA256, uri));
  }
}

TEST(Verify, RefusesAndNamesEveryOtherTransform) {
  for (const std::string uri :
       {"http://www.w3.org/TR/1999/REC-xpath-19991116", "http://www.w3.org/2002/06/xmldsig-filter2",
        "http://www.w3.org/TR/1999/REC-xslt-19991116", "http://www.w3.org/2000/09/xmldsig#base64",
        "http://www.w3.org/2006/12/xml-c14n11", "http://www.w3.org/2002/07/decrypt#XML", "urn:unknown"}) {
    EXPECT_EQ("The transform algorithm \"" + uri + "\" is not accepted", Refusal(Uri::ENVELOPED_SIGNATURE, uri));
  }
}

TEST(Verify, RefusesAndNamesEveryOtherCanonicalizationAlgorithm) {
  for (const std::string uri : {"http://www.w3.org/2006/12/xml-c14n11", "http://www.w3.org/2000/09/xmldsig#minimal"}) {
    EXPECT_EQ("The canonicalization algorithm \"" + uri + "\" is not accepted",
              Refusal("http://www.w3.org/2001/10/xml-exc-c14n#", uri));
  }
}

TEST(Verify, RefusesParametersOfAlgorithms) {
  const std::string method = "<ds:SignatureMethod Algorithm=\"" + std::string(Uri::RSA_SHA256) + "\"";
  EXPECT_EQ("The parameter \"ds:HMACOutputLength\" of the algorithm \"" + std::string(Uri::RSA_SHA256) +
                "\" is not accepted",
            Refusal(method + "/>", method + "><ds:HMACOutputLength>8</ds:HMACOutputLength></ds:SignatureMethod>"));
  EXPECT_EQ("The parameter \"x\" of the algorithm \"http://www.w3.org/2001/10/xml-exc-c14n#\" is not accepted",
            Refusal(EXCLUSIVE_TRANSFORM, Replaced(EXCLUSIVE_TRANSFORM, "/>", "><x xmlns=\"urn:x\"/></ds:Transform>")));
  const std::string enveloped = "<ds:Transform Algorithm=\"" + std::string(Uri::ENVELOPED_SIGNATURE) + "\"";
  EXPECT_EQ("The parameter \"ds:XPath\" of the algorithm \"" + std::string(Uri::ENVELOPED_SIGNATURE) +
                "\" is not accepted",
            Refusal(enveloped + "/>", enveloped + "><ds:XPath>1</ds:XPath></ds:Transform>"));
}

TEST(Verify, RefusesInclusiveNamespacesOfAnInclusiveCanonicalization) {
  EXPECT_EQ(
      "The parameter \"InclusiveNamespaces\" of the algorithm \"http://www.w3.org/TR/2001/REC-xml-c14n-20010315\" "
      "is not accepted",
      Refusal(EXCLUSIVE_TRANSFORM,
              "<ds:Transform Algorithm=\"http://www.w3.org/TR/2001/REC-xml-c14n-20010315\"><InclusiveNamespaces "
              "PrefixList=\"a\" xmlns=\"http://www.w3.org/2001/10/xml-exc-c14n#\"/></ds:Transform>"));
}

TEST(Verify, RefusesMoreThanTwoTransforms) {
  EXPECT_EQ("A reference has 3 transforms; at most 2 are accepted",
            Refusal(EXCLUSIVE_TRANSFORM, EXCLUSIVE_TRANSFORM + EXCLUSIVE_TRANSFORM));
}

TEST(Verify, RefusesATransformAfterACanonicalization) {
  EXPECT_EQ("The transform \"http://www.w3.org/2001/10/xml-exc-c14n#\" is not accepted after "
            "\"http://www.w3.org/2001/10/xml-exc-c14n#\"",
            Refusal(Uri::ENVELOPED_SIGNATURE, "http://www.w3.org/2001/10/xml-exc-c14n#"));
  const std::string swapped =
      Replaced(Replaced(GenuineToken(), EXCLUSIVE_TRANSFORM,
                        "<ds:Transform Algorithm=\"" + std::string(Uri::ENVELOPED_SIGNATURE) + "\"/>"),
               Uri::ENVELOPED_SIGNATURE, "http://www.w3.org/2001/10/xml-exc-c14n#");
  EXPECT_EQ("The transform \"http://www.w3.org/2000/09/xmldsig#enveloped-signature\" is not accepted after "
            "\"http://www.w3.org/2001/10/xml-exc-c14n#\"",
            RefusalOf(swapped));
}

TEST(Verify, RefusesASignatureWithoutReferences) {
  std::string text = GenuineToken();
  const std::size_t begin = text.find("<ds:Reference");
  text.erase(begin, text.find("</ds:SignedInfo>") - begin);
  EXPECT_EQ("The signature has no reference", RefusalOf(text));
}

TEST(Verify, RefusesMoreThanTenReferences) {
  std::string text = GenuineToken();
  const std::size_t begin = text.find("<ds:Reference");
  const std::size_t end = text.find("</ds:SignedInfo>");
  const std::string reference = text.substr(begin, end - begin);
  for (int count = 0; count < 10; ++count) {
    text.insert(end, reference);
  }
  EXPECT_EQ("The signature has 11 references; at most 10 are accepted", RefusalOf(text));
}

TEST(Verify, RefusesObjects) {
  EXPECT_EQ("A signature with ds:Object is not accepted", Refusal("</ds:Signature>", "<ds:Object/></ds:Signature>"));
}

TEST(Verify, RefusesManifestsAndEveryOtherTypeOfReference) {
  EXPECT_EQ("A reference of the type \"http://www.w3.org/2000/09/xmldsig#Manifest\" is not accepted",
            Refusal("<ds:Reference ", "<ds:Reference Type=\"http://www.w3.org/2000/09/xmldsig#Manifest\" "));
}

/// The result for the genuine token if its canonicalisation lists that many prefixes.
std::string VerifyWithPrefixes(std::size_t count, const std::string &separator) {
  std::string list;
  for (std::size_t number = 0; number < count; ++number) {
    list += separator + "p" + std::to_string(number);
  }
  return Refusal(
      EXCLUSIVE_TRANSFORM,
      "<ds:Transform Algorithm=\"http://www.w3.org/2001/10/xml-exc-c14n#\"><InclusiveNamespaces PrefixList=\"" + list +
          "\" xmlns=\"http://www.w3.org/2001/10/xml-exc-c14n#\"/></ds:Transform>");
}

TEST(Verify, AcceptsAtMost256InclusivePrefixes) {
  const std::string refusal =
      "The PrefixList of the algorithm \"http://www.w3.org/2001/10/xml-exc-c14n#\" has more than 256 prefixes";
  EXPECT_EQ("wrong", VerifyWithPrefixes(256, " ")); // accepted as an algorithm, but not what was signed
  EXPECT_EQ("wrong", VerifyWithPrefixes(256, "&#9; &#13;&#10;"));
  EXPECT_EQ(refusal, VerifyWithPrefixes(257, " "));
  EXPECT_EQ(refusal, VerifyWithPrefixes(1000, "&#10;"));
}

} // namespace
