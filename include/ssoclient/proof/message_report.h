// SPDX-License-Identifier: Apache-2.0
/// @file
/// `MessageReport`, what each check of a message examined and found.

#pragma once

#include <ssoclient/export.h>
#include <ssoclient/token_report.h>

#include <boost/optional.hpp>

#include <cstdint>
#include <string>
#include <vector>

namespace SsoClient {

/// Why a message is accepted or refused: each check of `MessageVerifier::Verify` with its outcome. The texts are printable
/// like those of a `TokenReport`, except `refusal`.
struct MessageReport {
  /// The checks, in the order of the verification.
  enum class Check : std::int32_t {
    WELL_FORMED = 0, ///< the text is a well-formed XML document within the limits
    ENVELOPE,        ///< it is a SOAP 1.1 or 1.2 envelope with one body, after at most one header
    SECURITY_HEADER, ///< there is exactly one WS-Security header for the role
    TIMESTAMP,       ///< at most one timestamp, which can be read and whose time has come and has not passed
    TOKEN,           ///< there is exactly one token, and the `TokenVerifier` accepts it
    PROOF,           ///< the sender proved possession of the token's key, if it is a holder-of-key token
    PARTS            ///< each part that must be covered is there once, and is covered
  };

  /// One check.
  struct CheckResult {
    Check check = Check::WELL_FORMED;                              ///< which check
    TokenReport::Outcome outcome = TokenReport::Outcome::NOT_DONE; ///< its outcome
    std::string summary;                                           ///< what was checked and found, in one sentence
    std::vector<TokenReport::Finding> findings;                    ///< the reasons, if it failed
  };

  bool accepted = false;              ///< whether `Verify` would accept the message, apart from the replay guard
  std::string refusal;                ///< the text of the exception that `Verify` throws; empty if accepted
  std::vector<CheckResult> checks;    ///< all checks, in order
  boost::optional<TokenReport> token; ///< the report of the token, if there is one
  std::vector<std::string> covered;   ///< the paths of the elements that the proof covers
};

/// The name of a check in lower case with hyphens, such as "security-header".
SSOCLIENT_API const char *GetCheckName(MessageReport::Check check) noexcept;

/// `report` as text for a log or a person, in the form of `WriteTokenReport`.
SSOCLIENT_API std::string WriteMessageReport(const MessageReport &report);

} // namespace SsoClient
