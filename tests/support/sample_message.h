// SPDX-License-Identifier: Apache-2.0
/// @file
/// Messages of a program, tokens and keys, with which tests attach tokens and sign messages.

#pragma once

#include "support/data_file.h"

#include <ssoclient/token_verifier.h>
#include <tarvel/crypto/private_key.h>

#include <memory>
#include <string>

namespace Testing {

inline const std::string SOAP11 = "http://schemas.xmlsoap.org/soap/envelope/";
inline const std::string SOAP12 = "http://www.w3.org/2003/05/soap-envelope";
inline const std::string WSSE = "http://docs.oasis-open.org/wss/2004/01/oasis-200401-wss-wssecurity-secext-1.0.xsd";
inline const std::string WSU = "http://docs.oasis-open.org/wss/2004/01/oasis-200401-wss-wssecurity-utility-1.0.xsd";
inline const std::string DS = "http://www.w3.org/2000/09/xmldsig#";

/// The token in tests/data/`name`.xml, verified in the profile SAML2.
inline std::shared_ptr<const SsoClient::SamlToken> SampleToken(const std::string &name) {
  SsoClient::VerifyOptions options;
  options.profile = SsoClient::TokenProfile::SAML2;
  Tarvel::Crypto::CertificateList trusted;
  for (const char *const issuer : {"sts-rsa", "sts-ec256", "sts-ec521"}) {
    trusted.push_back(Tarvel::Crypto::CreateCertificateFromPem(ReadDataFile(std::string("tokens/") + issuer + ".crt")));
  }
  return SsoClient::TokenVerifier(trusted, options).Verify(ReadDataFile(name + ".xml"));
}

/// The private key in tests/data/tokens/`name`.key.
inline Tarvel::Ref<const Tarvel::Crypto::PrivateKey> SampleKey(const std::string &name) {
  return Tarvel::Crypto::CreatePrivateKey(ReadDataFile("tokens/" + name + ".key"));
}

/// An envelope with the prefix "s" and the content `content`.
inline std::string SampleEnvelope(const std::string &content, const std::string &soap = SOAP11) {
  return "<s:Envelope xmlns:s=\"" + soap + "\">" + content + "</s:Envelope>";
}

/// An envelope with a header that has the content `header`, and a body with one element.
inline std::string SampleMessage(const std::string &header, const std::string &soap = SOAP11) {
  return SampleEnvelope("<s:Header>" + header + "</s:Header><s:Body><m:Pay xmlns:m=\"urn:m\">7</m:Pay></s:Body>", soap);
}

/// A security header with these attributes and this content. It declares the prefixes "o" and "u".
inline std::string SampleSecurity(const std::string &content, const std::string &attributes = "") {
  return "<o:Security xmlns:o=\"" + WSSE + "\" xmlns:u=\"" + WSU + "\"" + attributes + ">" + content + "</o:Security>";
}

} // namespace Testing
