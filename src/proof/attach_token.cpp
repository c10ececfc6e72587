// SPDX-License-Identifier: Apache-2.0

#include "proof/message_text.h"
#include "proof/token_attachment.h"
#include "xml/xml_text.h"

#include <ssoclient/proof/sign_message.h>
#include <tarvel/core/exception.h>

namespace SsoClient {

std::string AttachToken(const std::string &envelope, const SamlToken &token, const SecurityHeaderOptions &options) {
  Tarvel::Ref<Tarvel::Xml::Document> document;
  ParseXML(envelope, document);
  AttachToken(*document, token, options);
  return WriteMessage(*document);
}

void AttachToken(Tarvel::Xml::Document &envelope, const SamlToken &token, const SecurityHeaderOptions &options) {
  if (token.GetConfirmationMethod() != SamlToken::BEARER) {
    throw Tarvel::InvalidArgumentException("a holder-of-key token needs a proof of its key: use SignMessage");
  }
  TokenAttachment attachment(envelope, token, options);
  attachment.Prepare();
  attachment.Finish({});
}

} // namespace SsoClient
