// SPDX-License-Identifier: Apache-2.0

#include "notes.h"

#include <ssoclient/exceptions.h>
#include <ssoclient/proof/exceptions.h>
#include <ssoclient/proof/replay_guard.h>

#include <tarvel/core/exception.h>
#include <tarvel/core/string_util.h>
#include <tarvel/xml/parser.h>

#include <boost/beast/http/field.hpp>
#include <boost/beast/http/status.hpp>

#include <exception>
#include <iostream>

namespace Example {

namespace {

namespace http = boost::beast::http;

SsoClient::VerifyOptions TokenOptions(const std::string &audience) {
  SsoClient::VerifyOptions options;
  options.acceptedAudiences = {audience};
  options.acceptUnrestrictedAudience = false; // a token for all services would be accepted everywhere
  options.requiredConfirmation = SsoClient::SamlToken::HOLDER_OF_KEY;
  return options;
}

SsoClient::HttpProofOptions ProofOptions(std::size_t remembered) {
  SsoClient::HttpProofOptions options;        // requires that method, target, token and the body's digest are signed
  options.requiredHeaders = {"content-type"}; // this service reads it, so it must be signed, too
  options.replayGuard = SsoClient::CreateMemoryReplayGuard(remembered);
  return options;
}

Response MakeResponse(http::status status, const std::string &text) {
  Response response(status, 11);
  response.set(http::field::content_type, "text/plain; charset=utf-8");
  response.body() = text + '\n';
  response.prepare_payload();
  return response;
}

/// The sender learns what kind of failure it is. The reason is for our own log.
Response Refuse(http::status status, const std::string &text, const std::exception &reason) {
  std::clog << Tarvel::StringUtil::Shorten(Tarvel::StringUtil::Printable(text + ": " + reason.what())) + '\n';
  Response response = MakeResponse(status, text);
  if (status == http::status::unauthorized) {
    response.set(http::field::www_authenticate, "SAML");
  }
  return response;
}

} // namespace

Notes::Notes(const Tarvel::Crypto::CertificateList &trusted, const std::string &origin, std::size_t remembered)
    : m_origin(origin), m_tokens(trusted, TokenOptions(origin)), m_options(ProofOptions(remembered)) {}

/// What the library verifies. The address is that of the configuration, because the sender writes the header `Host`.
SsoClient::HttpRequest Notes::ToProve(const Request &request) const {
  SsoClient::HttpRequest result;
  result.method = std::string(request.method_string());
  result.targetUri = m_origin + std::string(request.target());
  for (const auto &field : request) {
    result.headers.emplace_back(std::string(field.name_string()), std::string(field.value()));
  }
  if (request.has_content_length() || request.chunked()) {
    result.body = request.body();
  }
  return result;
}

Response Notes::Answer(const Request &request) const {
  if (request.method() != http::verb::put || request[http::field::content_type] != "text/plain") {
    return MakeResponse(http::status::bad_request, "a note is sent by PUT, as text/plain");
  }
  try {
    const SsoClient::VerifiedHttpRequest verified = SsoClient::VerifyHttpProof(ToProve(request), m_tokens, m_options);
    const SsoClient::PrincipalId &caller = verified.token->GetSubject();
    return MakeResponse(http::status::ok, caller.name + " of " + caller.domain + " wrote " +
                                              std::to_string(request.body().size()) + " octets to " +
                                              std::string(request.target()));
  } catch (const SsoClient::StaleMessageException &error) {
    return Refuse(http::status::unauthorized, "the request is too old, or our clocks differ", error);
  } catch (const SsoClient::RepeatedMessageException &error) {
    return Refuse(http::status::unauthorized, "the request was received before", error);
  } catch (const SsoClient::InvalidProofException &error) {
    return Refuse(http::status::unauthorized, "the signature does not prove the key of the token", error);
  } catch (const SsoClient::InvalidMessageException &error) {
    return Refuse(http::status::unauthorized, "the request does not have one token and its proof", error);
  } catch (const SsoClient::InvalidTokenException &error) {
    return Refuse(http::status::unauthorized, "the token is not accepted", error);
  } catch (const Tarvel::Xml::XMLParseException &error) {
    return Refuse(http::status::unauthorized, "this is not a token", error);
  } catch (const SsoClient::ReplayGuardException &error) {
    return Refuse(http::status::service_unavailable, "busy; try again later", error); // not a verdict on the request
  } catch (const std::exception &error) {
    return Refuse(http::status::internal_server_error, "failed", error); // not a verdict on the request
  }
}

} // namespace Example
