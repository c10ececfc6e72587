// SPDX-License-Identifier: Apache-2.0

#include "message_check.h"

#include "token_reader.h"

#include <algorithm>
#include <set>

namespace DevSts {

namespace {

constexpr std::chrono::hours LONGEST_MESSAGE_LIFE(24);
constexpr const char *COVERAGE =
    "the signature must cover the body and the timestamp, and nothing else but headers of WS-Addressing";
constexpr const char *HEADERS = "the message must have one security header and no other";

/// The elements that the security header may have, each at most once.
struct SecurityHeader {
  xmlNode *timestamp = nullptr;
  xmlNode *usernameToken = nullptr;
  xmlNode *binaryToken = nullptr;
  xmlNode *assertion = nullptr;
  xmlNode *signature = nullptr;
};

struct Envelope {
  xmlNode *body = nullptr;
  std::vector<const xmlNode *> addressing; ///< the header elements of WS-Addressing, whose content is not examined
  SecurityHeader security;
};

[[noreturn]] void RefuseSecurity(const std::string &reason) {
  throw Refusal(Code::INVALID_SECURITY, reason);
}

SecurityHeader ReadSecurityHeader(const xmlNode &security) {
  SecurityHeader header;
  const struct {
    Namespace ns;
    const char *name;
    xmlNode *SecurityHeader::*place;
  } parts[] = {{Ns::WSU, "Timestamp", &SecurityHeader::timestamp},
               {Ns::WSSE, "UsernameToken", &SecurityHeader::usernameToken},
               {Ns::WSSE, "BinarySecurityToken", &SecurityHeader::binaryToken},
               {Ns::SAML, "Assertion", &SecurityHeader::assertion},
               {Ns::DS, "Signature", &SecurityHeader::signature}};
  for (xmlNode *child : ChildElements(security)) {
    const auto *const part = std::find_if(std::begin(parts), std::end(parts),
                                          [&](const auto &known) { return IsElement(*child, known.ns, known.name); });
    if (part == std::end(parts)) {
      throw Refusal(Code::UNSUPPORTED_TOKEN, "unknown element in the security header: '" +
                                                 std::string(reinterpret_cast<const char *>(child->name)) + "'");
    }
    if (header.*part->place) {
      RefuseSecurity(std::string("several ") + part->name + " in the security header");
    }
    header.*part->place = child;
  }
  if (!header.timestamp) {
    RefuseSecurity("no timestamp");
  }
  return header;
}

Envelope ReadEnvelope(const xmlDoc &document) {
  const xmlNode &root = *xmlDocGetRootElement(&document);
  if (!IsElement(root, Ns::SOAPENV, "Envelope")) {
    throw Refusal(Code::CLIENT, "not a SOAP 1.1 envelope");
  }
  const std::vector<xmlNode *> parts = ChildElements(root);
  if (parts.size() != 2 || !IsElement(*parts[0], Ns::SOAPENV, "Header") || !IsElement(*parts[1], Ns::SOAPENV, "Body")) {
    throw Refusal(Code::CLIENT, "an envelope must contain one header and one body");
  }
  Envelope envelope;
  envelope.body = parts[1];
  const xmlNode *security = nullptr;
  for (const xmlNode *header : ChildElements(*parts[0])) {
    if (IsOf(*header, Ns::WSA)) {
      envelope.addressing.push_back(header);
    } else if (IsElement(*header, Ns::WSSE, "Security") && !security) {
      security = header;
    } else {
      RefuseSecurity(HEADERS);
    }
  }
  if (!security) {
    RefuseSecurity(HEADERS);
  }
  if (ChildElements(*envelope.body).size() != 1) {
    throw Refusal(Code::INVALID_REQUEST, "the body must contain one element");
  }
  envelope.security = ReadSecurityHeader(*security);
  return envelope;
}

Time ReadTime(const xmlNode &timestamp, const char *name) {
  const std::optional<Time> time = ParseTime(TextOf(RequireChild(timestamp, Ns::WSU, name)));
  if (!time) {
    RefuseSecurity(std::string(name) + " of the timestamp is not a UTC date");
  }
  return *time;
}

void CheckTimestamp(const xmlNode &timestamp, std::chrono::seconds tolerance) {
  const Time created = ReadTime(timestamp, "Created");
  const Time expires = ReadTime(timestamp, "Expires");
  const Time now = Now();
  if (expires <= created || expires - created > LONGEST_MESSAGE_LIFE) {
    RefuseSecurity("the timestamp's period is empty or too long");
  }
  if (created > now + tolerance) {
    RefuseSecurity("the timestamp is in the future");
  }
  if (expires + tolerance <= now) {
    throw Refusal(Code::MESSAGE_EXPIRED, "the message has expired");
  }
}

PasswordCredentials ReadCredentials(const xmlNode &usernameToken) {
  const xmlNode &password = RequireChild(usernameToken, Ns::WSSE, "Password");
  if (AttributeOf(password, "Type").value_or(PASSWORD_TEXT_TYPE) != PASSWORD_TEXT_TYPE) {
    throw Refusal(Code::UNSUPPORTED_TOKEN, "a password must be given as text");
  }
  return {TextOf(RequireChild(usernameToken, Ns::WSSE, "Username")), TextOf(password)};
}

/// The signature must cover the body and the timestamp of this envelope, each once. It may also cover the header
/// elements of WS-Addressing, each once, but nothing else.
void RequireCoverage(const Envelope &envelope, const Identifiers &identifiers) {
  std::set<const xmlNode *> uncovered = {envelope.body, envelope.security.timestamp};
  std::set<const xmlNode *> optional(envelope.addressing.begin(), envelope.addressing.end());
  for (const SignatureReference &reference : ReadReferences(*envelope.security.signature)) {
    const auto found = identifiers.find(reference.id);
    if (reference.isEnveloped || found == identifiers.end()) {
      RefuseSecurity("the signature refers to an element that does not exist");
    }
    if (uncovered.erase(found->second) + optional.erase(found->second) == 0) {
      RefuseSecurity(COVERAGE);
    }
  }
  if (!uncovered.empty()) {
    RefuseSecurity(COVERAGE);
  }
}

/// The certificate in the binary token, to which `reference` must refer.
Certificate BinaryTokenCertificate(const Envelope &envelope, const Identifiers &identifiers, const xmlNode &reference) {
  const xmlNode *const token = envelope.security.binaryToken;
  const std::string uri = AttributeOf(reference, "URI").value_or("");
  const auto found = identifiers.find(uri.substr(uri.empty() ? 0 : 1));
  if (!token || uri.rfind('#', 0) != 0 || found == identifiers.end() || found->second != token) {
    throw Refusal(Code::TOKEN_UNAVAILABLE, "the signature's key reference does not refer to a binary security token");
  }
  if (AttributeOf(*token, "ValueType").value_or("") != X509_VALUE_TYPE ||
      AttributeOf(*token, "EncodingType").value_or(BASE64_ENCODING) != BASE64_ENCODING) {
    throw Refusal(Code::UNSUPPORTED_TOKEN, "a binary security token must be an X.509 certificate in Base64");
  }
  return DecodeCertificate(TextOf(*token));
}

/// The certificate of the key that the presented assertion is bound to.
Certificate HolderCertificate(const Envelope &envelope, const CheckedMessage &message, const xmlNode &keyIdentifier) {
  if (!message.presentedToken || AttributeOf(keyIdentifier, "ValueType").value_or("") != SAML_ID_VALUE_TYPE ||
      TextOf(keyIdentifier) != AttributeOf(*envelope.security.assertion, "ID")) {
    throw Refusal(Code::TOKEN_UNAVAILABLE, "the signature's key reference does not refer to a token of the message");
  }
  if (message.presentedToken->certificate.empty()) {
    throw Refusal(Code::TOKEN_UNAVAILABLE, "a bearer token has no key that could have signed the message");
  }
  return DecodeCertificate(message.presentedToken->certificate);
}

Certificate SignerCertificate(const Envelope &envelope, const CheckedMessage &message) {
  const xmlNode &keyInfo = RequireChild(*envelope.security.signature, Ns::DS, "KeyInfo");
  const xmlNode &reference = RequireChild(keyInfo, Ns::WSSE, "SecurityTokenReference");
  const std::vector<xmlNode *> pointers = ChildElements(reference);
  Certificate certificate;
  if (pointers.size() == 1 && IsElement(*pointers[0], Ns::WSSE, "Reference")) {
    certificate = BinaryTokenCertificate(envelope, message.identifiers, *pointers[0]);
  } else if (pointers.size() == 1 && IsElement(*pointers[0], Ns::WSSE, "KeyIdentifier")) {
    certificate = HolderCertificate(envelope, message, *pointers[0]);
  } else {
    throw Refusal(Code::TOKEN_UNAVAILABLE, "unsupported key reference");
  }
  if (!certificate || !HasStrongKey(*certificate)) {
    throw Refusal(Code::INVALID_TOKEN, "the signer's certificate must have an RSA key of at least 2048 bits");
  }
  return certificate;
}

void CheckSignature(const Envelope &envelope, CheckedMessage &message) {
  RequireCoverage(envelope, message.identifiers);
  Certificate signer = SignerCertificate(envelope, message);
  if (!VerifiesWith(*envelope.security.signature, PublicKeyOf(*signer))) {
    throw Refusal(Code::FAILED_CHECK, "the message's signature is wrong");
  }
  message.signer = std::move(signer);
  message.signatureId = AttributeOf(*envelope.security.signature, "Id").value_or("");
}

/// A token or certificate in the header counts only together with the proof that the sender has its key.
void RequireSignatureWhereNeeded(const SecurityHeader &security) {
  if (!security.signature && (security.assertion || security.binaryToken)) {
    RefuseSecurity("the message presents a token or certificate and is not signed");
  }
}

} // namespace

void RequireCurrent(const TokenFacts &token, std::chrono::seconds tolerance, const FaultCode &code) {
  const Time now = Now();
  if (now + tolerance < token.notBefore) {
    throw Refusal(code, "the token is not valid yet");
  }
  if (now >= token.notOnOrAfter + tolerance) {
    throw Refusal(code, "the token has expired");
  }
}

CheckedMessage CheckMessage(std::string_view xml, const MessagePolicy &policy) {
  CheckedMessage message;
  message.document = ParseMessage(xml);
  message.identifiers = RegisterIdentifiers(*message.document);
  const Envelope envelope = ReadEnvelope(*message.document);
  message.request = ChildElements(*envelope.body).front();

  const SecurityHeader &security = envelope.security;
  CheckTimestamp(*security.timestamp, policy.tolerance);
  RequireSignatureWhereNeeded(security);
  if (security.usernameToken) {
    message.credentials = ReadCredentials(*security.usernameToken);
  }
  if (security.assertion) {
    message.presentedToken =
        ReadIssuedToken(*security.assertion, message.identifiers, *policy.tokenSigner, Code::INVALID_TOKEN);
    RequireCurrent(*message.presentedToken, policy.tolerance, Code::INVALID_TOKEN);
  }
  if (security.signature) {
    CheckSignature(envelope, message);
  }
  return message;
}

} // namespace DevSts
