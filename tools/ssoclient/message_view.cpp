// SPDX-License-Identifier: Apache-2.0

#include "message_view.h"

#include <unistd.h>

namespace SsoClient::Tool {

AcceptedMessage ViewOf(const VerifiedMessage &message) {
  AcceptedMessage accepted;
  accepted.proof = message.proof;
  for (const VerifiedMessage::CoveredElement &covered : message.covered) {
    accepted.covered.push_back(covered.path);
  }
  accepted.created = message.created;
  accepted.expires = message.expires;
  accepted.replay = message.replay;
  accepted.token = ViewOf(*message.token);
  return accepted;
}

const char *ReplayText(ReplayProtection replay) noexcept {
  return replay == ReplayProtection::GUARDED ? "guarded" : "not-guarded";
}

std::string Render(const MessageView &view, Format format) {
  std::string text = format == Format::JSON ? MessageJson(view) : MessageText(view, StyleOf(STDOUT_FILENO));
  if (text.back() != '\n') {
    text += '\n';
  }
  return text;
}

} // namespace SsoClient::Tool
