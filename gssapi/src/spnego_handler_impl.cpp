// SPDX-License-Identifier: Apache-2.0

#include "spnego_handler_impl.h"

#include "gss_name.h"

#include <ssoclient/gssapi/exceptions.h>
#include <ssoclient/logger.h>

#include <gssapi/gssapi_ext.h>

#include <algorithm>
#include <cstdint>
#include <cstring>
#include <string>
#include <utility>

namespace SsoClient::Gssapi {

namespace {

constexpr std::int64_t MAX_TIME_LIMIT_SEC = std::int64_t{365} * 24 * 3600; // so that no conversion overflows

void RequireText(const std::string &text) {
  if (text.find('\0') != std::string::npos) {
    throw Tarvel::InvalidArgumentException("A GSS setting contains a null character");
  }
}

void ValidateSettings(const SpnegoSettings &settings) {
  RequireText(settings.service);
  RequireText(settings.client);
  RequireText(settings.credentialCache);
  RequireText(settings.clientKeytab);
  if (settings.maximumLegs < 1) {
    throw Tarvel::InvalidArgumentException("The limit on legs must be positive");
  }
  if (settings.timeLimitSec < 1) {
    throw Tarvel::InvalidArgumentException("The time limit must be positive");
  }
}

void WriteObserverFailure(const char *function, const char *text) noexcept {
  try {
    LogInternal(getLogger(), LOG_LEVEL_CONTRACT_WARNING, "The negotiation observer's %1 threw: %2",
                std::string(function), std::string(text));
  } catch (...) {
    // Without memory the line is lost, but the negotiation continues. NOLINT(bugprone-empty-catch)
  }
}

bool IsKerberos(gss_OID mechanism) noexcept {
  const gss_OID kerberos = KerberosMechanism();
  return mechanism != GSS_C_NO_OID && mechanism->length == kerberos->length &&
         std::memcmp(mechanism->elements, kerberos->elements, kerberos->length) == 0;
}

/// Logs the exception that is being handled.
void LogObserverFailure(const char *function) noexcept {
  try {
    throw;
  } catch (const std::exception &exception) {
    WriteObserverFailure(function, exception.what());
  } catch (...) {
    WriteObserverFailure(function, "an exception that is not a std::exception");
  }
}

} // namespace

std::shared_ptr<SpnegoHandler> CreateSpnegoHandler(const SpnegoSettings &settings) {
  return std::make_shared<SpnegoHandlerImpl>(settings);
}

SpnegoHandlerImpl::SpnegoHandlerImpl(const SpnegoSettings &settings, Clock clock)
    : m_settings(settings), m_clock(std::move(clock)) {
  ValidateSettings(m_settings);
  ImportServiceName(m_settings.service, m_service);
}

std::shared_ptr<std::vector<std::uint8_t>>
SpnegoHandlerImpl::NegotiateLeg(const std::vector<std::uint8_t> &serviceLeg) {
  const int number = m_legs + 1;
  const auto start = m_settings.observer ? m_clock() : std::chrono::steady_clock::time_point();
  try {
    auto leg = std::make_shared<std::vector<std::uint8_t>>(MakeLeg(serviceLeg));
    if (m_settings.observer) {
      const auto duration = std::chrono::duration_cast<std::chrono::microseconds>(m_clock() - start);
      ReportLeg({number, serviceLeg.size(), leg->size(), "", m_state == State::COMPLETE, IsMutuallyAuthenticated(),
                 duration.count()});
    }
    return leg;
  } catch (const std::exception &failure) {
    m_state = State::FAILED;
    ReportFailure(number, failure);
    throw;
  } catch (...) {
    m_state = State::FAILED;
    throw;
  }
}

void SpnegoHandlerImpl::RequireMutualAuthentication() const {
  if (!IsMutuallyAuthenticated()) {
    throw GssNegotiationException("The service " + m_settings.service +
                                  " was not authenticated: the negotiation is not complete");
  }
}

std::vector<std::uint8_t> SpnegoHandlerImpl::MakeLeg(const std::vector<std::uint8_t> &serviceLeg) {
  CheckServiceLeg(serviceLeg);
  if (m_state == State::NEW) {
    m_start = m_clock();
  }
  CountLeg();
  CheckTime();
  if (m_state == State::COMPLETE) {
    return {};
  }
  if (m_state == State::NEW) {
    m_credential = std::make_unique<const ClientCredential>(m_settings);
  }
  std::vector<std::uint8_t> leg = AdvanceContext(serviceLeg);
  CheckTime();
  return leg;
}

void SpnegoHandlerImpl::CheckServiceLeg(const std::vector<std::uint8_t> &serviceLeg) const {
  switch (m_state) {
  case State::NEW:
    if (!serviceLeg.empty()) {
      throw Tarvel::InvalidArgumentException("The first leg is the client's");
    }
    return;
  case State::STARTED:
    if (serviceLeg.empty()) {
      throw GssNegotiationException("The service " + m_settings.service +
                                    " sent no leg, but the negotiation is not complete");
    }
    return;
  case State::COMPLETE:
    if (!serviceLeg.empty()) {
      throw GssNegotiationException("The service " + m_settings.service +
                                    " sent a further leg, but the negotiation is complete");
    }
    return;
  case State::FAILED:
    throw Tarvel::InvalidStateException("The negotiation with " + m_settings.service + " has already failed");
  }
}

std::vector<std::uint8_t> SpnegoHandlerImpl::AdvanceContext(const std::vector<std::uint8_t> &serviceLeg) {
  std::vector<std::uint8_t> input = serviceLeg; // a copy, because the GSSAPI's declarations do not use const
  gss_buffer_desc inputBuffer = {input.size(), input.data()};
  const OM_uint32 wanted =
      GSS_C_MUTUAL_FLAG | GSS_C_INTEG_FLAG | (m_settings.dceStyle ? OM_uint32{GSS_C_DCE_STYLE} : 0);
  GssOctets leg;
  OM_uint32 flags = 0;
  gss_OID mechanism = GSS_C_NO_OID;
  GssStatus status;
  status.major =
      gss_init_sec_context(&status.minor, m_credential->Get(), m_context.Slot(), m_service.Get(), SpnegoMechanism(),
                           wanted, GSS_C_INDEFINITE, GSS_C_NO_CHANNEL_BINDINGS,
                           input.empty() ? GSS_C_NO_BUFFER : &inputBuffer, &mechanism, leg.Slot(), &flags, nullptr);
  if (status.IsError()) {
    // A leg with which the GSSAPI reports the failure to the service is not sent: the operation ends here.
    throw GssNegotiationException("The negotiation with " + m_settings.service +
                                  " failed: " + DescribeStatus(status, SpnegoMechanism()));
  }
  m_isKerberos = IsKerberos(mechanism);
  if ((status.major & GSS_S_CONTINUE_NEEDED) == 0) {
    CompleteWith(flags);
  } else {
    m_state = State::STARTED;
  }
  return {leg.begin(), leg.end()};
}

void SpnegoHandlerImpl::CompleteWith(OM_uint32 contextFlags) {
  if ((contextFlags & GSS_C_MUTUAL_FLAG) == 0) {
    throw GssNegotiationException("The service " + m_settings.service +
                                  " was not authenticated: the mechanism does not support it");
  }
  m_state = State::COMPLETE;
}

void SpnegoHandlerImpl::ReportLeg(NegotiationLegEvent event) const noexcept {
  try {
    event.mechanism = m_isKerberos ? "Kerberos 5" : "";
    m_settings.observer->OnLeg(event);
  } catch (...) {
    LogObserverFailure("OnLeg");
  }
}

void SpnegoHandlerImpl::ReportFailure(int leg, const std::exception &failure) const noexcept {
  if (!m_settings.observer) {
    return;
  }
  try {
    m_settings.observer->OnFailed(leg, failure);
  } catch (...) {
    LogObserverFailure("OnFailed");
  }
}

void SpnegoHandlerImpl::CountLeg() {
  if (m_legs == m_settings.maximumLegs) {
    throw GssLimitException("The negotiation with " + m_settings.service +
                            " reached its limit on legs: " + std::to_string(m_settings.maximumLegs));
  }
  ++m_legs;
}

void SpnegoHandlerImpl::CheckTime() const {
  if (m_clock() - m_start > std::chrono::seconds(std::min(m_settings.timeLimitSec, MAX_TIME_LIMIT_SEC))) {
    throw GssLimitException("The negotiation with " + m_settings.service +
                            " reached its time limit: " + std::to_string(m_settings.timeLimitSec) + " s");
  }
}

} // namespace SsoClient::Gssapi
