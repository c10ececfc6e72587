// SPDX-License-Identifier: Apache-2.0
/// @file
/// Arbitrary bytes as a signed HTTP request: only the documented exceptions are thrown, and an accepted request has the method,
/// target, token, content and covered fields of one of the requests that were signed. The same bytes as a structured field:
/// what is read is written in one way only, and read again as the same.

#include "proof/content_digest.h"
#include "proof/structured_fields.h"
#include "support/data_file.h"
#include "support/http_request_text.h"

#include <ssoclient/proof/http_proof.h>
#include <tarvel/core/environment.h>
#include <tarvel/crypto/certificate.h>
#include <tarvel/xml/parser.h>

#include <algorithm>
#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <set>
#include <string>

namespace {

using namespace SsoClient;

void Require(bool condition) {
  if (!condition) {
    std::abort();
  }
}

bool IsCovered(const VerifiedHttpRequest &verified, const std::string &name) {
  return std::find(verified.covered.begin(), verified.covered.end(), name) != verified.covered.end();
}

/// What the values of all fields "X-Part" consist of, without white space.
std::string PartOf(const HttpRequest &request) {
  std::string text;
  for (const auto &[name, value] : request.headers) {
    if (name.size() == 6 && (name[0] | 0x20) == 'x' && (name[2] | 0x20) == 'p') {
      std::copy_if(value.begin(), value.end(), std::back_inserter(text),
                   [](char c) { return c != ' ' && c != '\t' && c != '\r' && c != '\n'; });
      text += ',';
    }
  }
  return text;
}

/// What an attacker must not change.
std::string FactsOf(const HttpRequest &request, const VerifiedHttpRequest &verified) {
  std::string facts = request.method + '\n' + verified.token->ToXml() + '\n' + verified.created.ToString() + '\n' +
                      request.body.value_or("") + '\n';
  for (const std::string &name : verified.covered) {
    facts += name + ' ';
  }
  if (IsCovered(verified, "@target-uri")) {
    facts += request.targetUri;
  }
  return facts + (IsCovered(verified, "x-part") ? PartOf(request) : "");
}

struct Service {
  Service() : tokens(Tarvel::Crypto::LoadCertificates(Testing::DataPath("tokens/sts-rsa.crt")), Options()) {
    for (const char *const name : {"rsa", "p256", "p384", "key-value", "get", "parts-of-target", "request-target"}) {
      const HttpRequest request =
          Testing::ParseHttpRequest(Testing::ReadDataFile("http/" + std::string(name) + ".http"));
      genuine.insert(FactsOf(request, VerifyHttpProof(request, tokens)));
    }
  }

  static VerifyOptions Options() {
    VerifyOptions options;
    options.profile = TokenProfile::SAML2;
    return options;
  }

  TokenVerifier tokens;
  std::set<std::string> genuine;
};

void VerifyRequest(const std::string &text, const Service &service) {
  const HttpRequest request = Testing::ParseHttpRequest(text);
  try {
    const VerifiedHttpRequest verified = VerifyHttpProof(request, service.tokens);
    Require(service.genuine.count(FactsOf(request, verified)) == 1);
  } catch (const InvalidMessageException &) { // also of a proof and a time
  } catch (const InvalidTokenException &) {
  } catch (const Tarvel::Xml::XMLParseException &) {
  }
}

void ReadField(const std::string &text) {
  try {
    for (const StructuredMember &member : ReadDictionary("F", text)) {
      if (const auto *const list = std::get_if<StructuredInnerList>(&member.value)) {
        const std::string written = WriteStructured(*list);
        const auto again = ReadDictionary("F", "a=" + written);
        Require(WriteStructured(std::get<StructuredInnerList>(again.at(0).value)) == written);
      }
    }
    CheckContentDigest(text, "content");
  } catch (const InvalidMessageException &) {
  }
}

} // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t *data, std::size_t size) {
  static const Tarvel::ScopedEnvironment clock({[] { return std::int64_t{1'767'323'045'006'000}; }, {}});
  static const Service service;
  const std::string text(reinterpret_cast<const char *>(data), size);
  VerifyRequest(text, service);
  ReadField(text);
  return 0;
}
