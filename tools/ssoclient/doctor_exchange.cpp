// SPDX-License-Identifier: Apache-2.0

#include "doctor_exchange.h"

#include "doctor_namespaces.h"

#include <ssoclient/connection_spec.h>
#include <ssoclient/create_saml_token.h>
#include <tarvel/core/exception.h>
#include <tarvel/http/cookie_store.h>
#include <tarvel/http/http_date.h>
#include <tarvel/http/user_agent.h>

#include <chrono>
#include <cstdlib>

namespace SsoClient::Tool {
namespace {

using Json = nlohmann::ordered_json;
using Tarvel::Ref;
using Tarvel::System::DateTime;
using Tarvel::System::MICROSECONDS_PER_SECOND;

constexpr int OK = 200;
constexpr int INTERNAL_SERVER_ERROR = 500;
/// Clocks that differ by more are worth a warning.
constexpr std::int64_t NOTABLE_SECONDS = 60;

constexpr const char *WRONG_PATH = "Correct the host, port and path in --sts.";

/// What a status means for a token service. The other statuses get a general description.
struct StatusRow {
  int status;
  const char *text;
  const char *advice;
};

constexpr StatusRow STATUSES[] = {
    {401, "The server, or a proxy, asks for credentials of HTTP, which this client does not send.",
     "Have the service's address exempted from HTTP authentication."},
    {403, "The server, or a proxy, forbids the request.", "Have requests from this machine permitted."},
    {404, "There is nothing at this path.", "Correct the path in --sts."},
    {405, "The server does not take POST requests at this path.", "Correct the path in --sts."},
    {407, "A proxy asks for credentials of HTTP, which this client does not send.",
     "Have connections to the service exempted from the proxy."},
    {502, "A gateway answers, which gets no answer from the service.", "Look into the log of the gateway."},
    {503, "The service, or a gateway before it, is not available.", "Start the service, or look into its log."},
    {504, "A gateway answers, which gets no answer from the service.", "Look into the log of the gateway."},
};

std::string HeaderOf(const Tarvel::Http::ClientResponse &response, const char *name) {
  std::string value;
  response.GetHeader(name, value);
  return value;
}

Ref<Tarvel::Http::ConnectionSpec> SpecOf(const DoctorTarget &target, const Ref<Tarvel::Ssl::SSLContext> &context,
                                         const std::string &thumbprint) {
  return context ? CreateSsoSSLConnectionSpec(target.host, target.port, context, thumbprint, false)
                 : CreateSsoConnectionSpec(target.host, target.port, false);
}

Ref<Tarvel::Http::ClientResponse> Send(const DoctorTarget &target, const Ref<Tarvel::Ssl::SSLContext> &context,
                                       const std::string &thumbprint, std::int64_t timeoutMicroseconds) {
  Ref<Tarvel::Http::CookieStore> cookies;
  Tarvel::Http::CreateCookieStore("", cookies);
  const auto userAgent = Tarvel::Http::CreateHttpUserAgent(SpecOf(target, context, thumbprint), cookies);
  const Ref<Tarvel::Http::ClientRequest> request = Tarvel::Http::CreateHttpRequest("POST", target.path);
  request->SetHeader("Content-Type", "text/xml");
  request->SetHeader("SOAPAction", PROBE_ACTION);
  request->WriteBody(PROBE_MESSAGE);
  Ref<Tarvel::Http::PendingRequestItem> pending;
  userAgent->StartRequest(
      request, [](const auto *, const auto &, const auto &) {}, pending);
  Ref<Tarvel::Http::ClientResponse> response;
  userAgent->WaitForRequest(pending, timeoutMicroseconds, response);
  return response;
}

void ReadResponse(Tarvel::Http::ClientResponse &response, DoctorExchange &exchange) {
  exchange.status = response.GetStatusCode();
  exchange.reason = response.GetReasonPhrase();
  exchange.contentType = HeaderOf(response, "Content-Type");
  exchange.server = HeaderOf(response, "Server");
  exchange.location = HeaderOf(response, "Location");
  exchange.date = HeaderOf(response, "Date");
  exchange.statedLength = HeaderOf(response, "Content-Length");
  exchange.hasBody = exchange.status / 100 * 100 == OK || exchange.status == INTERNAL_SERVER_ERROR;
  if (exchange.hasBody) {
    const std::string body = response.ReadToEnd(2 * Tarvel::Http::MAX_BODY_BYTES); // recoding may double it
    exchange.octets = body.size();
    exchange.answer = ReadAnswer(body, exchange.contentType);
  }
}

/// Whether the exception reports that the connection ended before the response was complete.
bool IsCutShort(const Tarvel::Http::HttpException &failure) {
  return std::string_view(failure.what()).find("the connection ended ") != std::string_view::npos;
}

std::string SizeText(const DoctorExchange &exchange) {
  if (exchange.hasBody) {
    return Count(static_cast<std::int64_t>(exchange.octets), "octet");
  }
  return exchange.statedLength.empty() ? "" : Shown(exchange.statedLength) + " octets";
}

std::string Summary(const DoctorExchange &exchange) {
  std::vector<std::string> parts = {std::to_string(exchange.status) +
                                    (exchange.reason.empty() ? "" : " " + Shown(exchange.reason))};
  if (!exchange.contentType.empty()) {
    parts.push_back(Shown(exchange.contentType));
  }
  if (const std::string size = SizeText(exchange); !size.empty()) {
    parts.push_back(size);
  }
  if (!exchange.server.empty()) {
    parts.push_back("server " + Shown(exchange.server));
  }
  return JoinTexts(parts) + " " + DurationText(exchange.durationMicroseconds) + ".";
}

Json TextOrNull(const std::string &text) {
  return text.empty() ? Json(nullptr) : Json(Shown(text));
}

Json FactsOf(const DoctorExchange &exchange) {
  return {{"status", exchange.status},
          {"reason", TextOrNull(exchange.reason)},
          {"contentType", TextOrNull(exchange.contentType)},
          {"server", TextOrNull(exchange.server)},
          {"location", TextOrNull(exchange.location)},
          {"octets", exchange.hasBody ? Json(exchange.octets) : Json(nullptr)},
          {"answer", exchange.hasBody ? Json(NameOf(exchange.answer.kind)) : Json(nullptr)},
          {"durationMs", Milliseconds(exchange.durationMicroseconds)}};
}

void DescribeRedirect(const DoctorExchange &exchange, DoctorCheck &check) {
  check.found.push_back("The server redirects to " +
                        (exchange.location.empty() ? "no address" : Shown(exchange.location)) +
                        "; this client does not follow.");
  check.Fail(ExitCode::SERVICE_FAULT,
             "If that is the token service, and not a page to log in, give its address in --sts.");
}

void DescribeStatus(const DoctorExchange &exchange, DoctorCheck &check) {
  constexpr int REDIRECTION = 300;
  if (exchange.status / 100 * 100 == REDIRECTION) {
    DescribeRedirect(exchange, check);
    return;
  }
  for (const StatusRow &row : STATUSES) {
    if (row.status == exchange.status) {
      check.found.emplace_back(row.text);
      check.Fail(ExitCode::SERVICE_FAULT, row.advice);
      return;
    }
  }
  check.found.emplace_back("A token service answers with 200 or 500.");
  check.Fail(ExitCode::SERVICE_FAULT, WRONG_PATH);
}

void DescribeBody(const DoctorExchange &exchange, DoctorCheck &check) {
  if (exchange.answer.kind == ServiceAnswer::Kind::HTML) {
    check.found.emplace_back("An HTML page answers: a proxy, a page to log in, or another web server.");
    check.Fail(ExitCode::SERVICE_FAULT, WRONG_PATH);
    return;
  }
  check.found.push_back(std::string("The answer is ") + DescriptionOf(exchange.answer.kind) + ".");
}

/// By how many microseconds this machine's clock is ahead of `date`, which counts as the middle of the exchange.
std::int64_t LeadOf(const DoctorExchange &exchange, const DateTime &date) {
  return exchange.receivedAt.PlusMicroseconds(-exchange.durationMicroseconds / 2).MicrosecondsSince(date);
}

std::string DescribeLead(std::int64_t seconds) {
  if (seconds == 0) {
    return "The clocks agree.";
  }
  return "This machine's clock is " + Count(std::abs(seconds), "second") + (seconds > 0 ? " ahead of" : " behind") +
         " the service's.";
}

} // namespace

DoctorExchange Exchange(const DoctorTarget &target, const Ref<Tarvel::Ssl::SSLContext> &context,
                        const std::string &thumbprint, std::int64_t timeoutMicroseconds) {
  DoctorExchange exchange;
  const auto start = std::chrono::steady_clock::now();
  const auto end = [&] {
    exchange.durationMicroseconds =
        std::chrono::duration_cast<std::chrono::microseconds>(std::chrono::steady_clock::now() - start).count();
    exchange.receivedAt = Tarvel::System::GetUtcDateTime();
  };
  try {
    const Ref<Tarvel::Http::ClientResponse> response = Send(target, context, thumbprint, timeoutMicroseconds);
    end();
    ReadResponse(*response, exchange);
  } catch (const Tarvel::Http::HttpException &failure) {
    end();
    exchange.failure = failure.what();
    exchange.hasOtherProtocol = !IsCutShort(failure);
  } catch (const Tarvel::System::NetworkException &failure) {
    end();
    exchange.failure = failure.what();
  }
  return exchange;
}

DoctorCheck CheckHttp(const DoctorExchange *exchange, const std::string &reason) {
  DoctorCheck check("http");
  if (!exchange) {
    check.Skip(reason);
    return check;
  }
  check.facts = FactsOf(*exchange);
  if (!exchange->failure.empty()) {
    check.found.push_back(Sentence(exchange->failure));
    if (exchange->hasOtherProtocol) {
      check.Fail(ExitCode::SERVICE_FAULT,
                 "What answers is not a web server that this client understands. " + std::string(WRONG_PATH));
    } else {
      check.Fail(ExitCode::COMMUNICATION, "Look into the service's log, correct --sts, or raise --timeout.");
    }
    return check;
  }
  check.found.push_back(Summary(*exchange));
  if (exchange->hasBody) {
    DescribeBody(*exchange, check);
  } else {
    DescribeStatus(*exchange, check);
  }
  return check;
}

DoctorCheck CheckClock(const DoctorExchange *exchange) {
  DoctorCheck check("clock");
  if (!exchange || exchange->date.empty()) {
    check.Skip(exchange && exchange->failure.empty() ? "The answer has no header Date."
                                                     : "There is no answer with a date.");
    return check;
  }
  const boost::optional<DateTime> date = Tarvel::Http::ParseHttpDate(exchange->date);
  if (!date) {
    check.Skip("The header Date of the answer is not a date: " + Shown(exchange->date) + ".");
    return check;
  }
  const std::int64_t seconds = LeadOf(*exchange, *date) / MICROSECONDS_PER_SECOND; // headers have whole seconds
  check.facts = {{"serviceDate", date->ToString()}, {"differenceSeconds", seconds}};
  check.found.push_back(DescribeLead(seconds));
  const std::string advice = "Set this machine's clock, or have the service's set.";
  if (std::abs(seconds) > DEFAULT_CLOCK_TOLERANCE_SEC) {
    check.Fail(ExitCode::TOKEN_INVALID, advice + " More than " + std::to_string(DEFAULT_CLOCK_TOLERANCE_SEC) +
                                            " seconds make tokens and requests invalid.");
  } else if (std::abs(seconds) > NOTABLE_SECONDS) {
    check.Warn(advice);
  }
  return check;
}

} // namespace SsoClient::Tool
