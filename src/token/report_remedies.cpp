// SPDX-License-Identifier: Apache-2.0

#include "token/report_remedies.h"

#include "token/token_signature.h"

#include <algorithm>

namespace SsoClient {

namespace {

using Check = TokenReport::Check;
using Finding = TokenReport::Finding;
using NamedCertificate = TokenReport::NamedCertificate;

std::string ForForm(const Finding &finding) {
  if (finding.wanted == "element ds:Signature") {
    return "Ask the service's operator to sign the assertion, with the Signature element after the Issuer.";
  }
  if (finding.message == TOKEN_NOT_COVERED) {
    return "Ask the service's operator to sign the whole assertion.";
  }
  return "Ask the service's operator to issue tokens of the accepted form, and make sure that nothing changes them on "
         "their way.";
}

std::string ForIdentifiers(const Finding &finding) {
  return finding.attribute == "Version" ? "Ask the service's operator to issue SAML 2.0 tokens."
                                        : "Ask the service's operator to issue tokens whose ID begins with \"_\".";
}

/// The clock is wrong by at least `missedBySec`, because a difference within the tolerance is not noticed.
std::string ForValidity(const Finding &finding) {
  if (finding.missedBySec == 0) {
    return "Ask the service's operator to issue tokens whose NotBefore is before their NotOnOrAfter.";
  }
  const std::string seconds = std::to_string(finding.missedBySec);
  if (finding.attribute == "NotBefore" || finding.attribute == "IssueInstant") {
    return "Synchronise this machine's clock (it seems at least " + seconds + " s behind), or the service's.";
  }
  return "Get a new token. If this one is new, synchronise this machine's clock (it seems at least " + seconds +
         " s ahead), or the service's.";
}

/// What to do if the confirmation states something other than `VerifyOptions` require.
std::string ForStatedConfirmation(const Finding &finding) {
  if (finding.attribute == "Recipient") {
    return "Ask the service for a token whose recipient is one of " + finding.wanted +
           "; or accept the token's recipient, if it is an address of this program.";
  }
  if (finding.attribute == "InResponseTo") {
    return "Use the token that answers the request " + finding.wanted + ". One that answers another may be replayed.";
  }
  if (finding.attribute == "Address") {
    return "Accept the token only from the sender to whom it was issued.";
  }
  return "Ask the service for a bearer or a holder-of-key token.";
}

std::string ForConfirmation(const Finding &finding) {
  if (finding.missedBySec != 0) {
    return finding.attribute == "SessionNotOnOrAfter" ? "Authenticate again, and get a new token."
                                                      : ForValidity(finding);
  }
  if (finding.message == "Invalid token subject validity") {
    return "Ask the service's operator to let the confirmation of bearer tokens last as long as the token.";
  }
  if (finding.wanted == "a certificate or an RSA or EC public key") {
    return "Ask the service's operator to put the certificate or the public key of the holder into the confirmation.";
  }
  if (finding.wanted == "no key") {
    return "Ask the service's operator to issue bearer confirmations without a key, or holder-of-key confirmations.";
  }
  if (finding.attribute.empty() || finding.attribute == "SessionNotOnOrAfter") {
    return "Ask the service's operator to issue tokens whose confirmation and session can be used while they are "
           "valid.";
  }
  return ForStatedConfirmation(finding);
}

const NamedCertificate *FindStranger(const TokenReport &report) {
  const auto stranger = std::find_if(report.namedCertificates.begin(), report.namedCertificates.end(),
                                     [](const NamedCertificate &named) { return !named.isTrusted; });
  return stranger == report.namedCertificates.end() ? nullptr : &*stranger;
}

/// Asks for the issuer's certificate. A certificate in the signature is only a hint, because any sender can add one.
std::string ForMissingKey(const TokenReport &report) {
  const NamedCertificate *const stranger = FindStranger(report);
  std::string remedy = "Give the certificate of the service that issued the token";
  if (!stranger) {
    return remedy + ".";
  }
  remedy += stranger->thumbprint.empty()
                ? "; the signature names one that cannot be read."
                : "; the signature names " + stranger->subject + " (SHA-256 " + stranger->thumbprint +
                      "). Compare it with what the service's operator says before you trust it.";
  return remedy;
}

std::string ForKeys(const TokenReport &report) {
  if (report.trustedKeys.empty()) {
    return ForMissingKey(report);
  }
  return "Trust a certificate whose key fits the signature's algorithm: RSA of at least 2048 bits, or P-256, P-384 or "
         "P-521 for ECDSA.";
}

std::string ForSignature(const TokenReport &report) {
  const auto &keys = report.trustedKeys;
  if (std::any_of(keys.begin(), keys.end(), [](const TokenReport::TrustedKey &key) { return key.madeSignature; })) {
    return "Ask the service's operator to put the certificate of the key that signs into KeyInfo.";
  }
  const bool isNamed =
      std::any_of(keys.begin(), keys.end(), [](const TokenReport::TrustedKey &key) { return key.isNamed; });
  if (isNamed && !FindStranger(report)) {
    return "Use the token exactly as the service sent it. If it is unchanged, it may be forged: it names a trusted "
           "certificate whose key did not make its signature.";
  }
  return ForMissingKey(report) +
         " If it is given already, the token was changed: use it exactly as the service sent it.";
}

std::string ForAudience(const Finding &finding) {
  const std::string wanted =
      finding.wanted.empty() ? "an accepted audience" : "one of these audiences: " + finding.wanted;
  return "Ask the service for a token for " + wanted + "; or accept the token's audience, if it means this program.";
}

std::string ForRequiredConfirmation(const Finding &finding) {
  return "Ask the service for a " + finding.wanted + " token.";
}

} // namespace

std::string RemedyFor(const TokenReport &report, Check check, const Finding &finding) {
  switch (check) {
  case Check::WELL_FORMED:
    return "Use the whole token exactly as the service sent it, as XML in UTF-8.";
  case Check::FORM:
    return ForForm(finding);
  case Check::IDENTIFIERS:
    return ForIdentifiers(finding);
  case Check::VALIDITY:
    return ForValidity(finding);
  case Check::CONFIRMATION:
    return ForConfirmation(finding);
  case Check::DELEGATION:
    return "Ask the service's operator to issue delegated tokens whose confirmation names the last delegate.";
  case Check::ALGORITHMS:
    return "Ask the service's operator to sign with accepted algorithms, such as RSA with SHA-256, digests with "
           "SHA-256 "
           "and exclusive canonicalization.";
  case Check::KEYS:
    return ForKeys(report);
  case Check::REFERENCES:
    return "Ask the service's operator to sign the assertion by its ID, and use the token in a document where no other "
           "element has that ID.";
  case Check::SIGNATURE:
    return ForSignature(report);
  case Check::DIGESTS:
    return "Use the token exactly as the service sent it: not even its layout may change.";
  case Check::NAMES:
    return "Ask the service's operator to issue names of the form name@domain, groups of the form domain\\group, and "
           "at "
           "most one solution attribute with one value.";
  case Check::AUDIENCE:
    return ForAudience(finding);
  case Check::REQUIRED_CONFIRMATION:
    return ForRequiredConfirmation(finding);
  }
  return std::string();
}

std::string RemedyForOtherForm() {
  return "Verify the token with the profile SAML2, which reads it, or ask the service's operator to issue tokens of "
         "the accepted form.";
}

std::string RemedyForSurroundings(bool hasSaml2) {
  return hasSaml2 ? "Give only the Assertion element, with the namespace declarations that it needs."
                  : "Give a SAML 2.0 assertion: there is none in this document.";
}

} // namespace SsoClient
