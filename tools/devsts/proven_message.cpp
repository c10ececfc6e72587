// SPDX-License-Identifier: Apache-2.0

#include "proven_message.h"

#include "digest.h"
#include "message_check.h"
#include "security_header.h"
#include "token_reader.h"

#include <algorithm>
#include <vector>

namespace DevSts {

namespace {

constexpr const char *COVERAGE = "the signature must cover the body and the timestamp, and nothing else but header "
                                 "blocks and the token";
constexpr const char *NO_PROOF =
    "the sender does not prove that it has the token's key: the message is not signed with "
    "it, and the connection has no client certificate with it";
constexpr const char *NOT_THE_TOKEN = "the signature's key reference does not refer to the token";

/// Whether the header block is for the last receiver, which is this service.
bool IsForThisService(const xmlNode &block, const SoapVersion &version) {
  const std::string role = AttributeOf(block, version.ns, version.roleAttribute).value_or("");
  return role.empty() || role == ULTIMATE_RECEIVER;
}

bool MustUnderstand(const xmlNode &block, const SoapVersion &version) {
  const std::string text = AttributeOf(block, version.ns, "mustUnderstand").value_or("");
  return text == "1" || text == "true";
}

/// The one security header for this service. @throws Refusal also for another block that this service must understand
xmlNode &RequireSecurityHeader(const xmlNode &header, const SoapVersion &version) {
  xmlNode *security = nullptr;
  for (xmlNode *block : ChildElements(header)) {
    if (!IsForThisService(*block, version)) {
      continue;
    }
    if (!IsElement(*block, Ns::WSSE, "Security")) {
      if (MustUnderstand(*block, version)) {
        throw Refusal(Code::MUST_UNDERSTAND,
                      "unknown header '" + std::string(reinterpret_cast<const char *>(block->name)) + "'");
      }
      continue;
    }
    if (security) {
      RefuseSecurity("the message has several security headers for this service");
    }
    security = block;
  }
  if (!security) {
    RefuseSecurity("the message has no security header for this service");
  }
  return *security;
}

void ReadEnvelope(const SoapVersion &version, ProvenMessage &message) {
  const xmlNode &root = *xmlDocGetRootElement(message.document.get());
  if (!IsElement(root, version.ns, "Envelope")) {
    throw Refusal(Code::CLIENT, std::string("not a ") + version.name + " envelope");
  }
  const std::vector<xmlNode *> parts = ChildElements(root);
  if (parts.size() != 2 || !IsElement(*parts[0], version.ns, "Header") || !IsElement(*parts[1], version.ns, "Body")) {
    throw Refusal(Code::CLIENT, "an envelope must contain one header and one body");
  }
  message.header = parts[0];
  message.body = parts[1];
}

/// @throws Refusal unless the reference is to `assertion`, by its identifier
void RequireReferenceTo(const xmlNode &assertion, const xmlNode &reference) {
  const std::string type = AttributeOf(reference, Ns::WSSE11, "TokenType").value_or(SAML_PROFILE_TOKEN_TYPE);
  const std::vector<xmlNode *> pointers = ChildElements(reference);
  const bool isKnownType = type == SAML_PROFILE_TOKEN_TYPE || type == ESTABLISHED_TOKEN_TYPE;
  const bool isByIdentifier =
      pointers.size() == 1 && IsElement(*pointers[0], Ns::WSSE, "KeyIdentifier") && Identifies(*pointers[0], assertion);
  const bool isByUri = pointers.size() == 1 && IsElement(*pointers[0], Ns::WSSE, "Reference") &&
                       AttributeOf(*pointers[0], "URI") == "#" + AttributeOf(assertion, "ID").value_or("");
  if (!isKnownType || (!isByIdentifier && !isByUri)) {
    throw Refusal(Code::TOKEN_UNAVAILABLE, NOT_THE_TOKEN);
  }
}

/// The key is always that of the token. @throws Refusal unless `ds:KeyInfo` refers to the token or its certificate
void CheckKeyInfo(const SecurityHeader &security, const X509 &holder) {
  const std::vector<xmlNode *> hints = ChildElements(RequireChild(*security.signature, Ns::DS, "KeyInfo"));
  if (hints.size() == 1 && IsElement(*hints[0], Ns::WSSE, "SecurityTokenReference")) {
    RequireReferenceTo(*security.assertion, *hints[0]);
    return;
  }
  if (hints.size() == 1 && IsElement(*hints[0], Ns::DS, "X509Data")) {
    const Certificate given = DecodeCertificate(TextOf(RequireChild(*hints[0], Ns::DS, "X509Certificate")));
    if (given && ThumbprintOf(*given) == ThumbprintOf(holder)) {
      return;
    }
  }
  throw Refusal(Code::TOKEN_UNAVAILABLE, NOT_THE_TOKEN);
}

/// Checks the signature of the message. It must be by the key of the token.
void CheckSignature(const SecurityHeader &security, const Identifiers &identifiers, const X509 &holder,
                    ProvenMessage &message) {
  CoverageRule rule{{message.body, security.timestamp}, {security.assertion}, COVERAGE};
  for (const xmlNode *block : ChildElements(*message.header)) {
    if (block != security.signature->parent) {
      rule.optional.insert(block);
    }
  }
  RequireCoverage(*security.signature, identifiers, std::move(rule));
  CheckKeyInfo(security, holder);
  std::optional<std::vector<unsigned char>> signedInfo = VerifiedSignedInfo(*security.signature, PublicKeyOf(holder));
  if (!signedInfo) {
    throw Refusal(Code::FAILED_CHECK, "the message's signature is wrong, or made with another key than the token's");
  }
  const std::string key = KeyThumbprintOf(holder);
  signedInfo->insert(signedInfo->end(), key.begin(), key.end());
  message.identifier = Sha256Text(*signedInfo);
  message.proof = Proof::MESSAGE_SIGNATURE;
}

void CheckBearer(const SecurityHeader &security, const ProofPolicy &policy) {
  if (!policy.acceptsBearer) {
    throw Refusal(Code::INVALID_TOKEN, "this service accepts no bearer token");
  }
  if (security.signature) {
    throw Refusal(Code::TOKEN_UNAVAILABLE, "a bearer token has no key that could have signed the message");
  }
}

void CheckProof(const SecurityHeader &security, const Identifiers &identifiers, const X509 *peerCertificate,
                const ProofPolicy &policy, ProvenMessage &message) {
  if (message.token.certificate.empty()) {
    CheckBearer(security, policy);
    return;
  }
  const Certificate holder = DecodeCertificate(message.token.certificate);
  if (!holder || !HasStrongKey(*holder)) {
    throw Refusal(Code::INVALID_TOKEN, "the token's certificate must have an RSA key of at least 2048 bits");
  }
  if (security.signature) {
    CheckSignature(security, identifiers, *holder, message);
    return;
  }
  if (!peerCertificate || KeyThumbprintOf(*peerCertificate) != KeyThumbprintOf(*holder)) {
    throw Refusal(Code::FAILED_CHECK, NO_PROOF);
  }
  message.proof = Proof::TLS_CERTIFICATE;
}

void CheckToken(const SecurityHeader &security, const Identifiers &identifiers, const ProofPolicy &policy,
                ProvenMessage &message) {
  if (!security.assertion) {
    RefuseSecurity("the message has no token");
  }
  if (security.usernameToken || security.binaryToken) {
    throw Refusal(Code::UNSUPPORTED_TOKEN, "the message has credentials other than its token");
  }
  message.token = ReadIssuedToken(*security.assertion, identifiers, *policy.tokenSigner, Code::INVALID_TOKEN);
  message.tokenId = AttributeOf(*security.assertion, "ID").value_or("");
  RequireCurrent(message.token, policy.tolerance, Code::INVALID_TOKEN);
  const std::vector<std::string> &audience = message.token.audience;
  if (!audience.empty() && std::find(audience.begin(), audience.end(), ECHO_AUDIENCE) == audience.end()) {
    throw Refusal(Code::INVALID_TOKEN, "the token is for another audience");
  }
}

} // namespace

const char *ProofName(Proof proof) {
  switch (proof) {
  case Proof::MESSAGE_SIGNATURE:
    return "message-signature";
  case Proof::TLS_CERTIFICATE:
    return "tls-certificate";
  case Proof::BEARER:
    break;
  }
  return "bearer";
}

ProvenMessage CheckProvenMessage(std::string_view xml, const SoapVersion &version, const X509 *peerCertificate,
                                 const ProofPolicy &policy) {
  ProvenMessage message;
  message.document = ParseMessage(xml);
  const Identifiers identifiers = RegisterIdentifiers(*message.document);
  ReadEnvelope(version, message);
  try {
    const SecurityHeader security = ReadSecurityHeader(RequireSecurityHeader(*message.header, version));
    message.expires = CheckTimestamp(*security.timestamp, policy.tolerance);
    CheckToken(security, identifiers, policy, message);
    CheckProof(security, identifiers, peerCertificate, policy, message);
  } catch (const Refusal &refusal) {
    // Codes of WS-Trust are for requests to the token service.
    const bool isOfTrust = std::string_view(refusal.GetCode().ns.uri) == Ns::WST.uri;
    throw isOfTrust ? Refusal(Code::INVALID_SECURITY, refusal.what()) : refusal;
  }
  return message;
}

} // namespace DevSts
