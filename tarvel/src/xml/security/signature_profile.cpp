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
using Refusal = SignatureReport::Refusal;

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

constexpr std::string_view CANONICALIZATION_URIS[] = {
    CanonicalizationUri::INCLUSIVE,
    CanonicalizationUri::INCLUSIVE_WITH_COMMENTS,
    CanonicalizationUri::EXCLUSIVE,
    CanonicalizationUri::EXCLUSIVE_WITH_COMMENTS,
};

std::string_view UriOf(std::string_view uri) {
  return uri;
}

template <typename NamedAlgorithm>
std::string_view UriOf(const NamedAlgorithm &named) {
  return named.uri;
}

/// The URIs of a table, for a report.
template <typename Table>
std::string ListUris(const Table &table) {
  std::string list;
  for (const auto &entry : table) {
    list.append(list.empty() ? "" : ", ").append(UriOf(entry));
  }
  return list;
}

Refusal &Refuse(RefusalSink &sink, const std::string &message, const ElementNode *element, std::string_view found) {
  Refusal &refusal = sink.Add(SignatureRule::PROFILE, message, element);
  refusal.found = StringUtil::Shorten(found);
  return refusal;
}

Refusal &RefuseAlgorithm(RefusalSink &sink, const char *kind, const AlgorithmSyntax &syntax) {
  return Refuse(sink,
                std::string("The ") + kind + " algorithm \"" + StringUtil::Shorten(syntax.uri) + "\" is not accepted",
                syntax.element, syntax.uri);
}

void RefuseParameter(RefusalSink &sink, const AlgorithmSyntax &syntax, std::string_view parameter) {
  Refuse(sink,
         "The parameter \"" + StringUtil::Shorten(parameter) + "\" of the algorithm \"" +
             StringUtil::Shorten(syntax.uri) + "\" is not accepted",
         syntax.element, parameter)
      .wanted = "no such parameter";
}

// The following functions return true, or the algorithm, only if they did not refuse anything.

bool RequireNoOtherParameter(const AlgorithmSyntax &syntax, RefusalSink &sink) {
  if (syntax.otherParameter.empty()) {
    return true;
  }
  RefuseParameter(sink, syntax, syntax.otherParameter);
  return false;
}

bool RequireNoPrefixList(const AlgorithmSyntax &syntax, RefusalSink &sink) {
  if (!syntax.prefixList) {
    return true;
  }
  RefuseParameter(sink, syntax, "InclusiveNamespaces");
  return false;
}

bool RequireNoParameters(const AlgorithmSyntax &syntax, RefusalSink &sink) {
  const bool hasNoOther = RequireNoOtherParameter(syntax, sink);
  return RequireNoPrefixList(syntax, sink) && hasNoOther;
}

/// The prefixes of a list separated by white space. A list of too many is refused before all of them are stored.
std::optional<std::vector<std::string>> RequirePrefixes(const AlgorithmSyntax &syntax, RefusalSink &sink) {
  const std::string_view list = *syntax.prefixList;
  std::vector<std::string> prefixes;
  for (std::size_t begin = list.find_first_not_of(WHITE_SPACE); begin != std::string_view::npos;) {
    if (prefixes.size() == MAX_INCLUSIVE_PREFIXES) {
      const std::string most = std::to_string(MAX_INCLUSIVE_PREFIXES) + " prefixes";
      Refusal &refusal = Refuse(
          sink, "The PrefixList of the algorithm \"" + StringUtil::Shorten(syntax.uri) + "\" has more than " + most,
          syntax.element, list);
      refusal.wanted = "at most " + most;
      return std::nullopt;
    }
    const std::size_t end = std::min(list.find_first_of(WHITE_SPACE, begin), list.size());
    prefixes.emplace_back(list.substr(begin, end - begin));
    begin = list.find_first_not_of(WHITE_SPACE, end);
  }
  return prefixes;
}

bool SetParameters(CanonicalizationMethod &method, const AlgorithmSyntax &syntax, RefusalSink &sink) {
  if (!method.isExclusive) {
    return RequireNoParameters(syntax, sink);
  }
  const bool hasNoOther = RequireNoOtherParameter(syntax, sink);
  if (!syntax.prefixList) {
    return hasNoOther;
  }
  std::optional<std::vector<std::string>> prefixes = RequirePrefixes(syntax, sink);
  if (!prefixes) {
    return false;
  }
  SetInclusivePrefixes(method, *std::move(prefixes));
  return hasNoOther;
}

std::optional<CanonicalizationMethod> RequireCanonicalizationMethod(const AlgorithmSyntax &syntax, RefusalSink &sink) {
  CanonicalizationMethod method;
  if (!FindCanonicalizationMethod(syntax.uri, method)) {
    Refusal &refusal = RefuseAlgorithm(sink, "canonicalization", syntax);
    refusal.wanted = ListUris(CANONICALIZATION_URIS);
    return std::nullopt;
  }
  return SetParameters(method, syntax, sink) ? std::optional(std::move(method)) : std::nullopt;
}

std::optional<SignatureAlgorithm> RequireSignatureAlgorithm(const AlgorithmSyntax &syntax, RefusalSink &sink) {
  const std::optional<SignatureAlgorithm> algorithm = FindSignatureAlgorithm(syntax.uri);
  if (!algorithm) {
    Refusal &refusal = RefuseAlgorithm(sink, "signature", syntax);
    refusal.wanted = ListUris(SIGNATURE_ALGORITHMS);
    return std::nullopt;
  }
  return RequireNoParameters(syntax, sink) ? algorithm : std::nullopt;
}

std::optional<DigestAlgorithm> RequireDigestAlgorithm(const AlgorithmSyntax &syntax, RefusalSink &sink) {
  const std::optional<DigestAlgorithm> algorithm = FindDigestAlgorithm(syntax.uri);
  if (!algorithm) {
    Refusal &refusal = RefuseAlgorithm(sink, "digest", syntax);
    refusal.wanted = ListUris(DIGEST_ALGORITHMS);
    return std::nullopt;
  }
  return RequireNoParameters(syntax, sink) ? algorithm : std::nullopt;
}

void RequireFewTransforms(const std::vector<AlgorithmSyntax> &transforms, ReferencePlan &plan, RefusalSink &sink) {
  if (transforms.size() > MAX_TRANSFORMS) {
    const std::string count = std::to_string(transforms.size()) + " transforms";
    const std::string most = "at most " + std::to_string(MAX_TRANSFORMS);
    Refuse(sink, "A reference has " + count + "; " + most + " are accepted", transforms[MAX_TRANSFORMS].element, count)
        .wanted = most;
    plan.isComputable = false;
  }
}

/// Adds a transform that is allowed at its position. @return whether it is a canonicalisation, which must be the last.
bool PlanTransform(const AlgorithmSyntax &transform, ReferencePlan &plan, RefusalSink &sink) {
  if (transform.uri == SignatureUri::ENVELOPED_SIGNATURE) {
    plan.isComputable = RequireNoParameters(transform, sink) && plan.isComputable;
    plan.omitsSignature = true;
    return false;
  }
  if (!FindCanonicalizationMethod(transform.uri, plan.method)) {
    Refusal &refusal = RefuseAlgorithm(sink, "transform", transform);
    refusal.wanted = std::string(SignatureUri::ENVELOPED_SIGNATURE) + ", " + ListUris(CANONICALIZATION_URIS);
    plan.isComputable = false;
    return false;
  }
  plan.isComputable = SetParameters(plan.method, transform, sink) && plan.isComputable;
  return true;
}

/// Accepts the enveloped-signature transform, then one canonicalisation, each at most once: a transform after the
/// canonicalisation would have to parse octets again.
void PlanTransforms(const std::vector<AlgorithmSyntax> &transforms, ReferencePlan &plan, RefusalSink &sink) {
  RequireFewTransforms(transforms, plan, sink);
  bool isCanonical = false;
  for (std::size_t index = 0; index < std::min(transforms.size(), MAX_TRANSFORMS); ++index) {
    const AlgorithmSyntax &transform = transforms[index];
    const bool isSecondEnveloped = plan.omitsSignature && transform.uri == SignatureUri::ENVELOPED_SIGNATURE;
    if (isCanonical || isSecondEnveloped) {
      Refuse(sink,
             "The transform \"" + StringUtil::Shorten(transform.uri) + "\" is not accepted after \"" +
                 StringUtil::Shorten(transforms.front().uri) + "\"",
             transform.element, transform.uri)
          .wanted = "the enveloped-signature transform, then one canonicalization, each at most once";
      plan.isComputable = false;
      continue;
    }
    isCanonical = PlanTransform(transform, plan, sink);
  }
}

ReferencePlan PlanReference(const ReferenceSyntax &syntax, RefusalSink &sink) {
  if (syntax.type) {
    Refuse(sink, "A reference of the type \"" + StringUtil::Shorten(*syntax.type) + "\" is not accepted",
           syntax.element, *syntax.type)
        .wanted = "no Type";
  }
  ReferencePlan plan;
  PlanTransforms(syntax.transforms, plan, sink);
  // XML Signature, sections 4.4.3.2 and 4.4.3.3: "" and "#x" select a node set without comments, whatever the transforms.
  plan.method.withComments = false;
  const std::optional<DigestAlgorithm> digest = RequireDigestAlgorithm(syntax.digestMethod, sink);
  plan.digest = digest.value_or(plan.digest);
  plan.isComputable = plan.isComputable && digest;
  return plan;
}

void RequireAcceptedParts(const SignatureSyntax &syntax, RefusalSink &sink) {
  if (syntax.object) {
    Refuse(sink, "A signature with ds:Object is not accepted", syntax.object, syntax.object->GetName()).wanted =
        "no ds:Object";
  }
  if (syntax.references.empty()) {
    Refuse(sink, "The signature has no reference", syntax.signedInfo, "").wanted = "a reference";
  }
  if (syntax.references.size() > MAX_REFERENCES) {
    const std::string count = std::to_string(syntax.references.size()) + " references";
    const std::string most = "at most " + std::to_string(MAX_REFERENCES);
    Refuse(sink, "The signature has " + count + "; " + most + " are accepted",
           syntax.references[MAX_REFERENCES].element, count)
        .wanted = most;
  }
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

SignaturePlan RequireProfile(const SignatureSyntax &syntax, RefusalSink &sink) {
  RequireAcceptedParts(syntax, sink);
  SignaturePlan plan;
  plan.signedInfoMethod = RequireCanonicalizationMethod(syntax.canonicalizationMethod, sink);
  plan.algorithm = RequireSignatureAlgorithm(syntax.signatureMethod, sink);
  const std::size_t examined = std::min(syntax.references.size(), MAX_REFERENCES);
  plan.references.reserve(examined);
  for (std::size_t index = 0; index < examined; ++index) {
    plan.references.push_back(PlanReference(syntax.references[index], sink));
  }
  return plan;
}

} // namespace Tarvel::Xml::Security
