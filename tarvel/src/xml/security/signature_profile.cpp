// SPDX-License-Identifier: Apache-2.0

#include "xml/security/signature_profile.h"

#include <tarvel/core/string_util.h>
#include <tarvel/xml/security/canonicalizer.h>
#include <tarvel/xml/security/exceptions.h>
#include <tarvel/xml/security/signature.h>

#include <algorithm>
#include <string>
#include <utility>

namespace Tarvel::Xml::Security {

namespace {

using Crypto::DigestAlgorithm;
using Crypto::SignatureScheme;

constexpr std::size_t MAX_REFERENCES = 10;
constexpr std::size_t MAX_TRANSFORMS = 2; // of one reference
constexpr std::size_t MAX_INCLUSIVE_PREFIXES = 256;

constexpr std::string_view WHITE_SPACE = " \t\r\n";

struct NamedSignatureAlgorithm {
  std::string_view uri;
  SignatureAlgorithm algorithm;
};

constexpr NamedSignatureAlgorithm SIGNATURE_ALGORITHMS[] = {
    {SignatureUri::RSA_SHA256, {SignatureScheme::RSA_PKCS1, DigestAlgorithm::SHA256}},
    {SignatureUri::RSA_SHA384, {SignatureScheme::RSA_PKCS1, DigestAlgorithm::SHA384}},
    {SignatureUri::RSA_SHA512, {SignatureScheme::RSA_PKCS1, DigestAlgorithm::SHA512}},
    {SignatureUri::RSA_PSS_SHA256, {SignatureScheme::RSA_PSS, DigestAlgorithm::SHA256}},
    {SignatureUri::RSA_PSS_SHA384, {SignatureScheme::RSA_PSS, DigestAlgorithm::SHA384}},
    {SignatureUri::RSA_PSS_SHA512, {SignatureScheme::RSA_PSS, DigestAlgorithm::SHA512}},
    {SignatureUri::ECDSA_SHA256, {SignatureScheme::ECDSA, DigestAlgorithm::SHA256}},
    {SignatureUri::ECDSA_SHA384, {SignatureScheme::ECDSA, DigestAlgorithm::SHA384}},
    {SignatureUri::ECDSA_SHA512, {SignatureScheme::ECDSA, DigestAlgorithm::SHA512}},
};

struct NamedDigestAlgorithm {
  std::string_view uri;
  DigestAlgorithm algorithm;
};

constexpr NamedDigestAlgorithm DIGEST_ALGORITHMS[] = {
    {SignatureUri::DIGEST_SHA256, DigestAlgorithm::SHA256},
    {SignatureUri::DIGEST_SHA384, DigestAlgorithm::SHA384},
    {SignatureUri::DIGEST_SHA512, DigestAlgorithm::SHA512},
};

[[noreturn]] void RefuseAlgorithm(const char *kind, std::string_view uri) {
  throw XmlSecurityException(std::string("The ") + kind + " algorithm \"" + StringUtil::Shorten(uri) +
                             "\" is not accepted");
}

[[noreturn]] void RefuseParameter(std::string_view parameter, std::string_view uri) {
  throw XmlSecurityException("The parameter \"" + StringUtil::Shorten(parameter) + "\" of the algorithm \"" +
                             StringUtil::Shorten(uri) + "\" is not accepted");
}

void RequireNoParameters(const AlgorithmSyntax &syntax) {
  if (!syntax.otherParameter.empty()) {
    RefuseParameter(syntax.otherParameter, syntax.uri);
  }
  if (syntax.prefixList) {
    RefuseParameter("InclusiveNamespaces", syntax.uri);
  }
}

/// The prefixes of a list separated by white space. A list of too many is refused before all of them are stored.
std::vector<std::string> RequirePrefixes(std::string_view list, std::string_view uri) {
  std::vector<std::string> prefixes;
  for (std::size_t begin = list.find_first_not_of(WHITE_SPACE); begin != std::string_view::npos;) {
    if (prefixes.size() == MAX_INCLUSIVE_PREFIXES) {
      throw XmlSecurityException("The PrefixList of the algorithm \"" + StringUtil::Shorten(uri) + "\" has more than " +
                                 std::to_string(MAX_INCLUSIVE_PREFIXES) + " prefixes");
    }
    const std::size_t end = std::min(list.find_first_of(WHITE_SPACE, begin), list.size());
    prefixes.emplace_back(list.substr(begin, end - begin));
    begin = list.find_first_not_of(WHITE_SPACE, end);
  }
  return prefixes;
}

CanonicalizationMethod RequireCanonicalMethod(const char *kind, const AlgorithmSyntax &syntax) {
  CanonicalizationMethod method;
  if (!FindCanonicalizationMethod(syntax.uri, method)) {
    RefuseAlgorithm(kind, syntax.uri);
  }
  if (!method.isExclusive || !syntax.otherParameter.empty()) {
    RequireNoParameters(syntax);
  }
  if (syntax.prefixList) {
    SetInclusivePrefixes(method, RequirePrefixes(*syntax.prefixList, syntax.uri));
  }
  return method;
}

SignatureAlgorithm RequireSignatureAlgorithm(const AlgorithmSyntax &syntax) {
  const std::optional<SignatureAlgorithm> algorithm = FindSignatureAlgorithm(syntax.uri);
  if (!algorithm) {
    RefuseAlgorithm("signature", syntax.uri);
  }
  RequireNoParameters(syntax);
  return *algorithm;
}

DigestAlgorithm RequireDigestAlgorithm(const AlgorithmSyntax &syntax) {
  const std::optional<DigestAlgorithm> algorithm = FindDigestAlgorithm(syntax.uri);
  if (!algorithm) {
    RefuseAlgorithm("digest", syntax.uri);
  }
  RequireNoParameters(syntax);
  return *algorithm;
}

/// Accepts the enveloped-signature transform, then one canonicalisation, each at most once: a transform after the
/// canonicalisation would have to parse octets again.
void PlanTransforms(const std::vector<AlgorithmSyntax> &transforms, ReferencePlan &plan) {
  if (transforms.size() > MAX_TRANSFORMS) {
    throw XmlSecurityException("A reference has " + std::to_string(transforms.size()) + " transforms; at most " +
                               std::to_string(MAX_TRANSFORMS) + " are accepted");
  }
  bool isCanonical = false;
  for (const AlgorithmSyntax &transform : transforms) {
    const bool isEnveloped = transform.uri == SignatureUri::ENVELOPED_SIGNATURE;
    if (isCanonical || (isEnveloped && plan.omitsSignature)) {
      throw XmlSecurityException("The transform \"" + StringUtil::Shorten(transform.uri) +
                                 "\" is not accepted after \"" + StringUtil::Shorten(transforms.front().uri) + "\"");
    }
    if (isEnveloped) {
      RequireNoParameters(transform);
      plan.omitsSignature = true;
      continue;
    }
    plan.method = RequireCanonicalMethod("transform", transform);
    isCanonical = true;
  }
}

ReferencePlan PlanReference(const ReferenceSyntax &syntax) {
  if (syntax.type) {
    throw XmlSecurityException("A reference of the type \"" + StringUtil::Shorten(*syntax.type) + "\" is not accepted");
  }
  ReferencePlan plan;
  PlanTransforms(syntax.transforms, plan);
  // XML Signature, sections 4.4.3.2 and 4.4.3.3: "" and "#x" select a node set without comments, whatever the transforms.
  plan.method.withComments = false;
  plan.digest = RequireDigestAlgorithm(syntax.digestMethod);
  return plan;
}

} // namespace

std::optional<SignatureAlgorithm> FindSignatureAlgorithm(std::string_view uri) {
  for (const NamedSignatureAlgorithm &named : SIGNATURE_ALGORITHMS) {
    if (named.uri == uri) {
      return named.algorithm;
    }
  }
  return std::nullopt;
}

std::optional<Crypto::DigestAlgorithm> FindDigestAlgorithm(std::string_view uri) {
  for (const NamedDigestAlgorithm &named : DIGEST_ALGORITHMS) {
    if (named.uri == uri) {
      return named.algorithm;
    }
  }
  return std::nullopt;
}

SignaturePlan RequireProfile(const SignatureSyntax &syntax) {
  if (syntax.hasObject) {
    throw XmlSecurityException("A signature with ds:Object is not accepted");
  }
  if (syntax.references.empty()) {
    throw XmlSecurityException("The signature has no reference");
  }
  if (syntax.references.size() > MAX_REFERENCES) {
    throw XmlSecurityException("The signature has " + std::to_string(syntax.references.size()) +
                               " references; at most " + std::to_string(MAX_REFERENCES) + " are accepted");
  }
  SignaturePlan plan{RequireCanonicalMethod("canonicalization", syntax.canonicalizationMethod),
                     RequireSignatureAlgorithm(syntax.signatureMethod),
                     {}};
  plan.references.reserve(syntax.references.size());
  for (const ReferenceSyntax &reference : syntax.references) {
    plan.references.push_back(PlanReference(reference));
  }
  return plan;
}

} // namespace Tarvel::Xml::Security
