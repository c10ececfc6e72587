// SPDX-License-Identifier: Apache-2.0
/// @file
/// `MessageReport`, what each check of a message examined and found.

#pragma once

#include <ssoclient/export.h>
#include <ssoclient/token_report.h>

#include <boost/optional.hpp>

#include <cstddef>
#include <cstdint>
#include <string>
#include <vector>

namespace SsoClient {

/// Why a message is accepted or refused: each check of `MessageVerifier::Verify` with its outcome. Every check is reported,
/// even if an earlier one failed. All texts except `refusal` and the claims of `token` are printable, and long values are
/// cut, as in a `TokenReport`. It contains names, but no secret and no token, and refers to nothing outside itself except
/// trusted certificates. **None of it may be trusted, even if the message is accepted**: use `MessageVerifier::Verify`.
struct MessageReport {
  /// The checks, in the order of the verification.
  enum class Check : std::int32_t {
    WELL_FORMED = 0, ///< the text is a well-formed XML document within the limits
    ENVELOPE,        ///< it is a SOAP 1.1 or 1.2 envelope with one body, after at most one header
    SECURITY_HEADER, ///< there is exactly one WS-Security header for the role
    TIMESTAMP,       ///< at most one timestamp, which can be read, is not in the future and has not expired
    TOKEN,           ///< there is exactly one token, and the `TokenVerifier` accepts it
    PROOF,           ///< the sender proved possession of the token's key, if it is a holder-of-key token
    PARTS            ///< each part that must be covered is there once, and is covered
  };

  /// One check.
  struct CheckResult {
    Check check = Check::WELL_FORMED;                              ///< which check
    TokenReport::Outcome outcome = TokenReport::Outcome::NOT_DONE; ///< its outcome
    std::string summary;                                           ///< what was checked and found, in one sentence
    std::vector<TokenReport::Finding> findings; ///< the reasons, in the order of the verification; empty unless FAILED
    std::size_t unlistedFindings = 0;           ///< further findings, left out because of `TokenReport::MAX_FINDINGS`
  };

  bool accepted = false; ///< whether `Verify` would accept the message, apart from the replay guard
  /// The exact text of the exception that `Verify` throws. It may contain control characters. Empty if accepted.
  std::string refusal;
  std::vector<CheckResult> checks;    ///< all checks, in order
  boost::optional<TokenReport> token; ///< the report of the first token in the security header, if there is one
  std::vector<std::string> covered;   ///< the paths of the elements that the signature covers, in document order
};

/// The name of a check in lower case with hyphens, such as "security-header".
SSOCLIENT_API const char *GetCheckName(MessageReport::Check check) noexcept;

/// `report` as text for a log or a person, in the form of `WriteTokenReport`: a line with the verdict, a line for each check,
/// and below it a few lines for each finding. If there is a token, its report follows.
SSOCLIENT_API std::string WriteMessageReport(const MessageReport &report);

} // namespace SsoClient
