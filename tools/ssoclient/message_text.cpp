// SPDX-License-Identifier: Apache-2.0
/// @file
/// The text of a checked message, for people.

#include "labelled_lines.h"
#include "message_view.h"
#include "time_text.h"

namespace SsoClient::Tool {
namespace {

void AddTime(const char *label, const boost::optional<Tarvel::System::DateTime> &time,
             const Tarvel::System::DateTime &now, LabelledLines &lines) {
  lines.Add(label, time ? UtcText(*time) + " (" + WhenText(*time, now) + ")" : "not stated");
}

void AddMessage(const AcceptedMessage &message, const Tarvel::System::DateTime &now, LabelledLines &lines) {
  lines.Add("Proof:", GetProofName(message.proof));
  lines.Add("Covered:", message.covered.empty() ? "nothing" : message.covered.front());
  for (std::size_t i = 1; i < message.covered.size(); ++i) {
    lines.Add("", message.covered[i]);
  }
  AddTime("Created:", message.created, now, lines);
  AddTime("Expires:", message.expires, now, lines);
  lines.Add("Replay:", ReplayText(message.replay));
}

} // namespace

std::string MessageText(const MessageView &view, const TextStyle &style) {
  LabelledLines lines;
  lines.Add("Verified:", view.accepted ? "yes" : "no");
  if (view.accepted) {
    AddMessage(*view.accepted, view.now, lines);
  }
  std::string text = lines.Get();
  if (view.accepted) {
    TokenView token = view.accepted->token;
    token.now = view.now;
    text += "\nToken\n" + TokenText(token, style);
  }
  if (view.report) {
    text += "\n" + WriteMessageReport(*view.report);
  }
  return text;
}

} // namespace SsoClient::Tool
