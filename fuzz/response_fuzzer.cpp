// SPDX-License-Identifier: Apache-2.0
/// @file
/// Responses: on any bytes, each operation ends in a result, or in a documented exception that leaves the caller's
/// record unchanged.

#include "exchange/response_handler_impl.h"

#include <ssoclient/exceptions.h>
#include <tarvel/core/ref.h>
#include <tarvel/io/reader.h>
#include <tarvel/xml/security/exceptions.h>

#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <string>

namespace {

using SsoClient::ResponseHandlerImpl;

void Require(bool condition) {
  if (!condition) {
    std::abort();
  }
}

/// Whether `operation` returned; an exception that is not documented ends the program.
template <typename Operation>
bool Succeeds(const Operation &operation, const std::string &response) {
  try {
    operation(Tarvel::CreateStringReader(response).get());
    return true;
  } catch (const SsoClient::SsoException &) {
  } catch (const Tarvel::Xml::Security::XmlSecurityException &) {
  }
  return false;
}

using TokenHandler = void (ResponseHandlerImpl::*)(Tarvel::Reader *, std::string &) const;

/// The token that `handler` finds; empty if it refuses the response.
std::string TokenOf(const ResponseHandlerImpl &handler, TokenHandler handle, const std::string &response) {
  std::string token = "before";
  const bool hasToken = Succeeds([&](Tarvel::Reader *reader) { (handler.*handle)(reader, token); }, response);
  Require(hasToken ? token.front() == '<' && token.back() == '>' : token == "before");
  return hasToken ? token : std::string();
}

/// A handler that accepts the response anywhere finds each token that the other one finds.
void CheckToken(const ResponseHandlerImpl &anywhere, TokenHandler handle, const std::string &response) {
  const std::string token = TokenOf(ResponseHandlerImpl(), handle, response);
  const std::string tokenAnywhere = TokenOf(anywhere, handle, response);
  Require(token.empty() || token == tokenAnywhere);
}

void CheckLeg(const ResponseHandlerImpl &handler, const std::string &response) {
  SsoClient::SPNegoResponse leg{"before", {1, 2, 3}, "before"};
  const bool hasLeg = Succeeds([&](Tarvel::Reader *reader) { handler.HandleSPNegoResponse(reader, leg); }, response);
  if (!hasLeg) {
    Require(leg.contextId == "before" && leg.leg.size() == 3 && leg.tokenXml == "before");
    return;
  }
  Require(leg.tokenXml.empty() || leg.tokenXml.front() == '<');
}

} // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t *data, std::size_t size) {
  const std::string response(reinterpret_cast<const char *>(data), size);
  SsoClient::ServiceDialect dialect;
  dialect.acceptsAnyResponse = true;
  const ResponseHandlerImpl anywhere(dialect);
  CheckToken(anywhere, &ResponseHandlerImpl::HandleAcquireTokenResponse, response);
  CheckToken(anywhere, &ResponseHandlerImpl::HandleRenewTokenResponse, response);
  for (const ResponseHandlerImpl &handler : {ResponseHandlerImpl(), anywhere}) {
    Succeeds([&](Tarvel::Reader *reader) { handler.HandleValidateSubjectResponse(reader); }, response);
    CheckLeg(handler, response);
  }
  return 0;
}
