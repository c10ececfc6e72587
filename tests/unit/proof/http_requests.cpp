// SPDX-License-Identifier: Apache-2.0

#include "unit/proof/http_requests.h"

#include "support/data_file.h"
#include "support/http_request_text.h"

#include <tarvel/core/string_util.h>
#include <tarvel/crypto/certificate.h>
#include <tarvel/crypto/detached_signature.h>

#include <sstream>
#include <stdexcept>

namespace Testing {

using SsoClient::HttpRequest;

const char *const HOLDER_THUMBPRINT = "4c983db50c7461335ac220c650af674cc8c1678a71ceb5e57c627783f369a4ce";

HttpRequest ReadHttpRequest(const std::string &name) {
  return ParseHttpRequest(ReadDataFile("http/" + name + ".http"));
}

SsoClient::TokenVerifier HttpTokenVerifier(SsoClient::TokenProfile profile) {
  SsoClient::VerifyOptions options;
  options.profile = profile;
  return SsoClient::TokenVerifier(Tarvel::Crypto::LoadCertificates(DataPath("tokens/sts-rsa.crt")), options);
}

std::string TokenField(const std::string &file) {
  const std::string xml = ReadDataFile(file);
  return "SAML " + Tarvel::StringUtil::Base64Encode(reinterpret_cast<const std::uint8_t *>(xml.data()), xml.size());
}

std::string &FieldOf(HttpRequest &request, const std::string &name) {
  for (auto &[field, value] : request.headers) {
    if (field == name) {
      return value;
    }
  }
  throw std::invalid_argument("there is no field " + name);
}

UnsignedRequest::UnsignedRequest()
    : request{"POST",
              "https://service.example/pay?to=bob",
              {{"Authorization", TokenField("tokens/holder-of-key.xml")},
               {"Content-Digest", "sha-256=:rCn5jU+6Rc/A9NciVbN04ZsEhp79DdojzWFvbSEC8pU=:"}},
              std::string("{\"amount\": 12}")},
      components("\"@method\" \"@target-uri\" \"authorization\" \"content-digest\""),
      parameters(";created=1767323045;keyid=\"" + std::string(HOLDER_THUMBPRINT) + '"') {}

std::string UnsignedRequest::Base() const {
  std::map<std::string, std::string> known{{"\"@method\"", request.method}, {"\"@target-uri\"", request.targetUri}};
  for (const auto &[name, value] : request.headers) {
    known['"' + Tarvel::StringUtil::ToLower(name) + '"'] = value;
  }
  for (const auto &[name, value] : values) {
    known[name] = value;
  }
  std::istringstream names(components);
  std::string base;
  for (std::string name; names >> name;) {
    base.append(name).append(": ").append(known[name]).append("\n");
  }
  return base + "\"@signature-params\": (" + components + ")" + parameters;
}

HttpRequest UnsignedRequest::Sign() const {
  const auto signature = Tarvel::Crypto::SignOctets(*Tarvel::Crypto::CreatePrivateKey(ReadDataFile(key)), hash, Base());
  HttpRequest result = request;
  result.headers.emplace_back("Signature-Input", label + "=(" + components + ")" + parameters);
  result.headers.emplace_back("Signature", label + "=:" + Tarvel::StringUtil::Base64Encode(signature) + ":");
  return result;
}

} // namespace Testing
