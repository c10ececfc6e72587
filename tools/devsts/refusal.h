// SPDX-License-Identifier: Apache-2.0
/// @file
/// The exception for a message that the service refuses, and the fault codes of the standards.

#pragma once

#include "names.h"

#include <stdexcept>
#include <string>

namespace DevSts {

struct FaultCode {
  Namespace ns;
  const char *name;
};

namespace Code {
// SOAP 1.1
constexpr FaultCode CLIENT{Ns::SOAPENV, "Client"};
constexpr FaultCode SERVER{Ns::SOAPENV, "Server"};
constexpr FaultCode MUST_UNDERSTAND{Ns::SOAPENV, "MustUnderstand"};
// Web Services Security 1.1
constexpr FaultCode UNSUPPORTED_TOKEN{Ns::WSSE, "UnsupportedSecurityToken"};
constexpr FaultCode UNSUPPORTED_ALGORITHM{Ns::WSSE, "UnsupportedAlgorithm"};
constexpr FaultCode INVALID_SECURITY{Ns::WSSE, "InvalidSecurity"};
constexpr FaultCode INVALID_TOKEN{Ns::WSSE, "InvalidSecurityToken"};
constexpr FaultCode FAILED_CHECK{Ns::WSSE, "FailedCheck"};
constexpr FaultCode TOKEN_UNAVAILABLE{Ns::WSSE, "SecurityTokenUnavailable"};
constexpr FaultCode MESSAGE_EXPIRED{Ns::WSU, "MessageExpired"};
// WS-Trust 1.3
constexpr FaultCode INVALID_REQUEST{Ns::WST, "InvalidRequest"};
constexpr FaultCode FAILED_AUTHENTICATION{Ns::WST, "FailedAuthentication"};
constexpr FaultCode REQUEST_FAILED{Ns::WST, "RequestFailed"};
constexpr FaultCode INVALID_TARGET{Ns::WST, "InvalidSecurityToken"};
constexpr FaultCode INVALID_TIME_RANGE{Ns::WST, "InvalidTimeRange"};
constexpr FaultCode UNABLE_TO_RENEW{Ns::WST, "UnableToRenew"};
} // namespace Code

/// Thrown when a message is refused. The service answers with a SOAP fault.
class Refusal : public std::runtime_error {
public:
  Refusal(const FaultCode &code, const std::string &reason) : std::runtime_error(reason), m_code(code) {}
  const FaultCode &GetCode() const noexcept { return m_code; }

private:
  FaultCode m_code;
};

} // namespace DevSts
