// SPDX-License-Identifier: Apache-2.0

#include "message_check.h"

#include "security_header.h"
#include "token_reader.h"

namespace DevSts {

namespace {

constexpr const char *COVERAGE =
    "the signature must cover the body and the timestamp, and nothing else but headers of WS-Addressing";
constexpr const char *HEADERS = "the message must have one security header and no other";

struct Envelope {
  xmlNode *body = nullptr;
  std::vector<const xmlNode *> addressing; ///< the header elements of WS-Addressing, whose content is not examined
  SecurityHeader security;
};

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

PasswordCredentials ReadCredentials(const xmlNode &usernameToken) {
  const xmlNode &password = RequireChild(usernameToken, Ns::WSSE, "Password");
  if (AttributeOf(password, "Type").value_or(PASSWORD_TEXT_TYPE) != PASSWORD_TEXT_TYPE) {
    throw Refusal(Code::UNSUPPORTED_TOKEN, "a password must be given as text");
  }
  return {TextOf(RequireChild(usernameToken, Ns::WSSE, "Username")), TextOf(password)};
}

/// The signature must cover the body and the timestamp of this envelope, each once. It may also cover the header
/// elements of WS-Addressing, each once, but nothing else.
void CheckCoverage(const Envelope &envelope, const Identifiers &identifiers) {
  RequireCoverage(*envelope.security.signature, identifiers,
                  {{envelope.body, envelope.security.timestamp},
                   {envelope.addressing.begin(), envelope.addressing.end()},
                   COVERAGE});
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
  if (!message.presentedToken || !Identifies(keyIdentifier, *envelope.security.assertion)) {
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
  CheckCoverage(envelope, message.identifiers);
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
