// SPDX-License-Identifier: Apache-2.0
/// @file
/// `MessageView`, what the tool shows of a checked message, and its written forms.

#pragma once

#include "output.h"
#include "token_view.h"

#include <ssoclient/proof/message_report.h>
#include <ssoclient/proof/message_verifier.h>
#include <tarvel/system/date_time.h>

#include <boost/optional.hpp>

#include <string>
#include <vector>

namespace SsoClient::Tool {

/// What is shown of an accepted message.
struct AcceptedMessage {
  ProofKind proof = ProofKind::BEARER;
  std::vector<std::string> covered; ///< paths of the elements that the proof covers
  boost::optional<Tarvel::System::DateTime> created;
  boost::optional<Tarvel::System::DateTime> expires;
  ReplayProtection replay = ReplayProtection::NOT_GUARDED;
  TokenView token;
};

/// What is shown of a message.
struct MessageView {
  boost::optional<AcceptedMessage> accepted; ///< `boost::none` for a message that was refused
  boost::optional<MessageReport> report;     ///< `boost::none` if none was asked for
  /// The text shows how far times are from this moment.
  Tarvel::System::DateTime now = Tarvel::System::GetUtcDateTime();
};

AcceptedMessage ViewOf(const VerifiedMessage &message);

/// "guarded" or "not-guarded".
const char *ReplayText(ReplayProtection replay) noexcept;

/// `view` as one JSON object in ASCII.
std::string MessageJson(const MessageView &view);

/// `view` as lines of text.
std::string MessageText(const MessageView &view, const TextStyle &style);

/// `view` in `format`, text or JSON, ending in a line end.
std::string Render(const MessageView &view, Format format);

} // namespace SsoClient::Tool
