// SPDX-License-Identifier: Apache-2.0

#include "orders.h"

#include <ssoclient/exceptions.h>
#include <ssoclient/proof/exceptions.h>
#include <ssoclient/proof/replay_guard.h>

#include <tarvel/core/exception.h>
#include <tarvel/core/string_util.h>
#include <tarvel/io/writer.h>
#include <tarvel/xml/node.h>
#include <tarvel/xml/parser.h>

#include <exception>
#include <iostream>
#include <stdexcept>
#include <string_view>

namespace Example {

namespace {

using Tarvel::Xml::ElementNode;

constexpr std::string_view SOAP = "http://schemas.xmlsoap.org/soap/envelope/";
constexpr std::string_view WSSE = "http://docs.oasis-open.org/wss/2004/01/oasis-200401-wss-wssecurity-secext-1.0.xsd";
constexpr std::string_view WSU = "http://docs.oasis-open.org/wss/2004/01/oasis-200401-wss-wssecurity-utility-1.0.xsd";
constexpr std::string_view ORDERS = "urn:example:orders";

/// A message that is proven, and is not an order.
class BadOrder : public std::runtime_error {
public:
  using std::runtime_error::runtime_error;
};

SsoClient::TokenVerifier MakeTokenVerifier(const Tarvel::Crypto::CertificateList &trusted,
                                           const std::string &audience) {
  SsoClient::VerifyOptions options;
  options.acceptedAudiences = {audience};
  options.acceptUnrestrictedAudience = false; // a token for all services would be accepted everywhere
  options.requiredConfirmation = SsoClient::SamlToken::HOLDER_OF_KEY;
  return SsoClient::TokenVerifier(trusted, options);
}

SsoClient::MessageVerifierOptions MakeOptions(std::size_t remembered) {
  SsoClient::MessageVerifierOptions options; // requires a timestamp, and that body and timestamp are signed
  options.requireTokenCovered = true;        // our clients sign it, as `SignMessage` does
  options.replayGuard = SsoClient::CreateMemoryReplayGuard(remembered);
  return options;
}

/// The text of a child element. A comment may divide a text without breaking the signature, so more than one piece is refused.
std::string TextOf(const ElementNode &parent, std::string_view name) {
  const ElementNode *const element =
      parent.FindChildElement(Tarvel::Xml::QName(std::string(ORDERS), std::string(name)));
  const Tarvel::Xml::Node *const child = element ? element->GetFirstChild() : nullptr;
  if (!child || child->GetKind() != Tarvel::Xml::NodeKind::TEXT || child->GetNextSibling()) {
    throw BadOrder("an order needs one " + std::string(name) + ", which is a text");
  }
  return std::string(static_cast<const Tarvel::Xml::TextNode *>(child)->GetValue());
}

/// An envelope; `body` points to its body.
Tarvel::Ref<ElementNode> MakeEnvelope(ElementNode *&body) {
  Tarvel::Ref<ElementNode> envelope;
  Tarvel::Xml::CreateElementNode("soap", "Envelope", envelope);
  envelope->DefineAttribute("xmlns:soap", SOAP);
  body = envelope->AppendElement("soap", "Body");
  return envelope;
}

std::string ToText(const ElementNode &envelope) {
  const auto writer = Tarvel::CreateStringWriter();
  envelope.WriteTo(*writer);
  return writer->TakeText();
}

/// A SOAP fault. The sender learns what kind of failure it is. The reason is for our own log.
Reply MakeFault(std::string_view codeNamespace, std::string_view code, const std::string &text,
                const std::exception &reason) {
  std::clog << Tarvel::StringUtil::Shorten(Tarvel::StringUtil::Printable(text + ": " + reason.what())) + '\n';
  ElementNode *body = nullptr;
  const auto envelope = MakeEnvelope(body);
  ElementNode *const fault = body->AppendElement("soap", "Fault");
  fault->DefineAttribute("xmlns:code", codeNamespace);
  fault->AppendElement("", "faultcode")->AppendText("code:" + std::string(code));
  fault->AppendElement("", "faultstring")->AppendText(text);
  return {500, ToText(*envelope)}; // the status of each fault in SOAP 1.1
}

} // namespace

Orders::Orders(const Tarvel::Crypto::CertificateList &trusted, const std::string &audience, std::size_t remembered)
    : m_verifier(MakeTokenVerifier(trusted, audience), MakeOptions(remembered)) {}

/// Reads only `message.body`, because that is the element whose signature was checked.
Reply Orders::Place(const SsoClient::VerifiedMessage &message) const {
  if (!message.document->GetDocumentElement()->HasQName(SOAP, "Envelope")) {
    throw BadOrder("this service uses SOAP 1.1");
  }
  const ElementNode *const order = message.body->FindChildElement(Tarvel::Xml::QName(std::string(ORDERS), "Order"));
  if (!order) {
    throw BadOrder("the body has no order");
  }
  const SsoClient::PrincipalId &caller = message.token->GetSubject();
  ElementNode *body = nullptr;
  const auto envelope = MakeEnvelope(body);
  ElementNode *const placed = body->AppendElement("order", "Placed");
  placed->DefineAttribute("xmlns:order", ORDERS);
  placed->AppendText(TextOf(*order, "Quantity") + " of " + TextOf(*order, "Article") + " for " + caller.name + " of " +
                     caller.domain);
  return {200, ToText(*envelope)};
}

Reply Orders::Answer(const std::string &message) const {
  try {
    return Place(m_verifier.Verify(message));
  } catch (const SsoClient::StaleMessageException &error) {
    return MakeFault(WSU, "MessageExpired", "The message is too old, or our clocks differ", error);
  } catch (const SsoClient::RepeatedMessageException &error) {
    return MakeFault(SOAP, "Client", "The message was received before", error);
  } catch (const SsoClient::InvalidProofException &error) {
    return MakeFault(WSSE, "FailedCheck", "The signature does not prove the key of the token", error);
  } catch (const SsoClient::InvalidMessageException &error) {
    return MakeFault(WSSE, "InvalidSecurity", "The security header is not accepted", error);
  } catch (const SsoClient::InvalidTokenException &error) {
    return MakeFault(WSSE, "InvalidSecurityToken", "The token is not accepted", error);
  } catch (const Tarvel::Xml::XMLParseException &error) {
    return MakeFault(SOAP, "Client", "This is not XML", error);
  } catch (const BadOrder &error) {
    return MakeFault(SOAP, "Client", error.what(), error);
  } catch (const SsoClient::ReplayGuardException &error) {
    return MakeFault(SOAP, "Server", "The service is busy; try again later", error); // not a verdict on the message
  } catch (const std::exception &error) {
    return MakeFault(SOAP, "Server", "The service failed", error); // not a verdict on the message
  }
}

} // namespace Example
