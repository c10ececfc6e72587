// SPDX-License-Identifier: Apache-2.0
/// @file
/// `SpnegoHandlerImpl`, the implementation of `SpnegoHandler`.

#pragma once

#include "client_credential.h"
#include "gss_handles.h"
#include "gss_status.h"

#include <ssoclient/gssapi/spnego_handler.h>

#include <chrono>
#include <cstdint>
#include <exception>
#include <functional>
#include <memory>
#include <optional>
#include <vector>

namespace SsoClient::Gssapi {

class SpnegoHandlerImpl final : public SpnegoHandler {
public:
  using Clock = std::function<std::chrono::steady_clock::time_point()>;

  /// @throws Tarvel::InvalidArgumentException as `CreateSpnegoHandler` does.
  explicit SpnegoHandlerImpl(const SpnegoSettings &settings, Clock clock = std::chrono::steady_clock::now);

  std::shared_ptr<std::vector<std::uint8_t>> NegotiateLeg(const std::vector<std::uint8_t> &serviceLeg) override;
  bool IsMutuallyAuthenticated() const noexcept override { return m_state == State::COMPLETE; }
  void RequireMutualAuthentication() const override;

private:
  enum class State {
    NEW,      ///< no leg has been made yet
    STARTED,  ///< the client waits for the service's leg
    COMPLETE, ///< each side has authenticated the other
    FAILED    ///< every further call fails too
  };

  std::vector<std::uint8_t> MakeLeg(const std::vector<std::uint8_t> &serviceLeg);
  void CheckServiceLeg(const std::vector<std::uint8_t> &serviceLeg) const;
  std::vector<std::uint8_t> AdvanceContext(const std::vector<std::uint8_t> &serviceLeg);
  void CompleteWith(OM_uint32 contextFlags);
  void CountLeg();
  void ReportLeg(NegotiationLegEvent event) const noexcept;
  void ReportFailure(int leg, const std::exception &failure) const noexcept;
  void CheckTime() const;

  const SpnegoSettings m_settings;
  const Clock m_clock;
  NameHandle m_service;
  State m_state = State::NEW;
  int m_legs = 0;
  std::chrono::steady_clock::time_point m_start;        // of the first leg
  std::unique_ptr<const ClientCredential> m_credential; // null until the first leg
  ContextHandle m_context;
  bool m_isKerberos = false; // whether Kerberos has been chosen
};

} // namespace SsoClient::Gssapi
