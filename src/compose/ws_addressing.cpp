// SPDX-License-Identifier: Apache-2.0

#include "compose/ws_addressing.h"

#include "compose/wire_names.h"
#include "model/namespaces.h"

#include <tarvel/core/string_util.h>

namespace SsoClient {

namespace {

XMLAttributes WsaDeclaration() {
  return {{"xmlns:wsa", std::string(Namespaces::WSA)}};
}

XMLBuilderPtr WsaReplyToBuilder() {
  auto replyTo = std::make_shared<XMLCompositeBuilder>(ElementBuilder("wsa", "ReplyTo", WsaDeclaration()));
  replyTo->Add(TextElementBuilder("wsa", "Address", std::string(WireNames::ANONYMOUS)));
  return replyTo;
}

} // namespace

std::vector<XMLBuilderPtr> WsAddressingHeaderBuilders(const std::string &to, const std::string &action) {
  return {
      TextElementBuilder("wsa", "To", WsaDeclaration(), to),
      TextElementBuilder("wsa", "Action", WsaDeclaration(), action),
      TextElementBuilder("wsa", "MessageID", WsaDeclaration(), "urn:uuid:" + Tarvel::StringUtil::GenerateUuid()),
      WsaReplyToBuilder(),
  };
}

} // namespace SsoClient
