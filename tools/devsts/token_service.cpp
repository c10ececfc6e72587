// SPDX-License-Identifier: Apache-2.0

#include "token_service.h"

#include "base64.h"
#include "responses.h"
#include "token_issuer.h"
#include "token_reader.h"

#include <algorithm>
#include <cctype>

namespace DevSts {

namespace {

constexpr std::uint64_t RENEWALS = 10;
constexpr std::uint64_t DELEGATIONS = 10;

/// The form that a group has in tokens: "corp.example\admins" for "admins@corp.example".
std::string GroupText(const std::string &group) {
  const std::size_t at = group.rfind('@');
  return group.substr(at + 1) + "\\" + group.substr(0, at);
}

void SetLife(TokenFacts &facts, std::chrono::milliseconds lifetime) {
  facts.notBefore = Now();
  facts.notOnOrAfter = facts.notBefore + lifetime;
}

/// The certificate for a holder-of-key token, which is bound to the key that has signed the request.
std::string ProofCertificate(const CheckedMessage &message, const TrustRequest &request) {
  if (!request.wantsHolderOfKey) {
    return {};
  }
  if (!message.signer) {
    throw Refusal(Code::INVALID_REQUEST, "the request asks for a holder-of-key token without proof of a key");
  }
  if (request.useKey && *request.useKey != message.signatureId) {
    throw Refusal(Code::INVALID_REQUEST, "wst:UseKey does not refer to the message's signature");
  }
  std::string signer = EncodeCertificate(*message.signer);
  if (request.useKeyCertificate) {
    const Certificate given = DecodeCertificate(*request.useKeyCertificate);
    if (!given || EncodeCertificate(*given) != signer) {
      throw Refusal(Code::INVALID_REQUEST, "wst:UseKey does not contain the certificate of the message's signature");
    }
  }
  return signer;
}

void ApplyDelegation(TokenFacts &facts, const TrustRequest &request, const CheckedMessage &message) {
  std::uint64_t allowed = DELEGATIONS;
  if (message.presentedToken) {
    allowed = message.presentedToken->delegations;
    if (request.delegateTo && allowed == 0) {
      throw Refusal(Code::REQUEST_FAILED, "the presented token may not be delegated");
    }
    allowed -= request.delegateTo ? 1U : 0U;
  }
  if (request.delegateTo) {
    facts.delegation.push_back({*request.delegateTo, Now()});
  }
  facts.delegations = request.delegable ? allowed : 0;
}

void RequireAction(std::string_view action, const TrustRequest &request) {
  const std::string expected = std::string(Ns::WST.uri) + "/RST/" + RequestTypeName(request.type);
  if (action != expected) {
    throw Refusal(Code::INVALID_REQUEST, "the SOAPAction does not match the message");
  }
}

/// Sets all facts that the request asks for; the subject is set elsewhere.
void ApplyRequest(TokenFacts &facts, const CheckedMessage &message, const TrustRequest &request) {
  facts.certificate = ProofCertificate(message, request);
  facts.audience = request.audience;
  facts.advice = request.advice;
  facts.renewals = request.renewable ? RENEWALS : 0;
  ApplyDelegation(facts, request, message);
}

void SetUser(TokenFacts &facts, const User &user, const char *context) {
  facts.subject = user.name;
  facts.groups.clear();
  facts.authenticated = Now();
  facts.context = context;
  facts.first = user.first;
  facts.last = user.last;
  std::transform(user.groups.begin(), user.groups.end(), std::back_inserter(facts.groups), GroupText);
}

/// The user's name for a principal: "alice@corp.example" for "alice@CORP.EXAMPLE".
std::string UserOf(std::string principal) {
  const std::size_t at = std::min(principal.rfind('@'), principal.size());
  std::transform(principal.begin() + static_cast<std::ptrdiff_t>(at), principal.end(),
                 principal.begin() + static_cast<std::ptrdiff_t>(at),
                 [](unsigned char c) { return static_cast<char>(std::tolower(c)); });
  return principal;
}

std::string ReadContext(const xmlNode &request) {
  const std::optional<std::string> context = AttributeOf(request, "Context");
  if (!context || context->empty()) {
    throw Refusal(Code::INVALID_REQUEST, "a leg of a negotiation must have a context");
  }
  return *context;
}

std::vector<unsigned char> ReadLeg(const xmlNode &exchange) {
  if (AttributeOf(exchange, "ValueType").value_or("") != SPNEGO_VALUE_TYPE ||
      AttributeOf(exchange, "EncodingType").value_or("") != BASE64_ENCODING) {
    throw Refusal(Code::INVALID_REQUEST, "a binary exchange must be SPNEGO in Base64");
  }
  const std::string text = TextOf(exchange);
  std::vector<unsigned char> leg = DecodeBase64(text);
  if (leg.empty() && !text.empty()) {
    throw Refusal(Code::INVALID_REQUEST, "the binary exchange is not Base64");
  }
  return leg;
}

std::string Summary(const char *what, const TokenFacts &facts, const xmlDoc &token) {
  return std::string(what) + " " + TokenId(token) + " for " + facts.subject +
         (facts.certificate.empty() ? " (bearer)" : " (holder-of-key)");
}

} // namespace

TokenService::TokenService(const StateFolder &state, Users users, std::chrono::seconds tolerance,
                           std::unique_ptr<const GssAcceptor> acceptor)
    : m_state(state), m_users(std::move(users)), m_signer(LoadSigningKey(state.signing)),
      m_foreignSigner(LoadSigningKey(state.foreign)),
      m_verifier(PublicKeyOf(*state.signing.certificate)), m_policy{tolerance, &m_verifier},
      m_negotiations(acceptor ? std::make_unique<Negotiations>(std::move(acceptor)) : nullptr) {}

SoapAnswer TokenService::Answer(std::string_view action, std::string_view message, const Fault &fault) const {
  SoapAnswer answer;
  try {
    const Document response = Process(action, message, fault, answer.log);
    if (fault.document == DocumentFault::SOAP_FAULT) {
      throw Refusal(fault.code, "a fault was asked for");
    }
    if (fault.document == DocumentFault::SOAP_FAULT_WITHOUT_CODE) {
      return {500, Serialise(*FaultResponse(nullptr, "a fault was asked for")), "fault without code"};
    }
    if (fault.document == DocumentFault::SOAP_FAULT_WITHOUT_TEXT) {
      throw Refusal(Code::FAILED_AUTHENTICATION, "");
    }
    answer.body = CorruptResponse(*response, fault.document);
  } catch (const Refusal &refusal) {
    const FaultCode &code = refusal.GetCode();
    answer.status = 500;
    answer.body = Serialise(*FaultResponse(&code, refusal.what()));
    answer.log = std::string("refused, ") + code.ns.prefix + ":" + code.name + ": " + refusal.what();
  }
  return answer;
}

Document TokenService::Process(std::string_view action, std::string_view message, const Fault &fault,
                               std::string &log) const {
  const CheckedMessage checked = CheckMessage(message, m_policy);
  if (IsElement(*checked.request, Ns::WST, "RequestSecurityTokenResponse")) {
    return ContinueNegotiation(action, checked, fault, log);
  }
  const TrustRequest request = ReadTrustRequest(*checked.request);
  RequireAction(action, request);
  switch (request.type) {
  case RequestType::RENEW:
    return Renew(checked, request, fault, log);
  case RequestType::VALIDATE:
    return Validate(checked, request, log);
  case RequestType::ISSUE:
    break;
  }
  return Issue(checked, request, fault, log);
}

Document TokenService::Issue(const CheckedMessage &message, const TrustRequest &request, const Fault &fault,
                             std::string &log) const {
  if (request.binaryExchange) {
    return BeginNegotiation(message, request, fault, log);
  }
  TokenFacts facts = Authenticate(message);
  if (request.onBehalfOf) {
    facts = TokenFacts();
    SetParty(facts, *request.onBehalfOf);
  }
  ApplyRequest(facts, message, request);
  SetLife(facts, request.lifetime);
  const Document token = MakeToken(facts, fault.token);
  log = Summary(message.presentedToken ? "exchanged, issued" : "issued", facts, *token);
  return IssueResponse(*token, request.tokenType);
}

Document TokenService::BeginNegotiation(const CheckedMessage &message, const TrustRequest &request, const Fault &fault,
                                        std::string &log) const {
  if (message.presentedToken || message.credentials) {
    throw Refusal(Code::INVALID_SECURITY, "the message negotiates and also presents a token or a password");
  }
  const std::string context = ReadContext(*message.request);
  NegotiatedRequest negotiated;
  ApplyRequest(negotiated.facts, message, request);
  negotiated.lifetime = request.lifetime;
  negotiated.tokenType = request.tokenType;
  negotiated.onBehalfOf = request.onBehalfOf;
  const std::vector<unsigned char> leg = ReadLeg(*request.binaryExchange);
  return AnswerLeg(context, RequireNegotiations().Begin(context, leg, std::move(negotiated)), fault, log);
}

Document TokenService::ContinueNegotiation(std::string_view action, const CheckedMessage &message, const Fault &fault,
                                           std::string &log) const {
  if (action != std::string(Ns::WST.uri) + "/RSTR/Issue") {
    throw Refusal(Code::INVALID_REQUEST, "the SOAPAction does not match the message");
  }
  const std::string context = ReadContext(*message.request);
  const std::vector<unsigned char> leg = ReadLeg(RequireChild(*message.request, Ns::WST, "BinaryExchange"));
  return AnswerLeg(context, RequireNegotiations().Continue(context, leg), fault, log);
}

Document TokenService::AnswerLeg(const std::string &context, NegotiationStep step, const Fault &fault,
                                 std::string &log) const {
  if (!step.leg.client) {
    log = "negotiating";
    return LegResponse(context, step.leg.answer);
  }
  TokenFacts &facts = step.request.facts;
  SetClient(facts, *step.leg.client);
  if (step.request.onBehalfOf) {
    SetParty(facts, *step.request.onBehalfOf);
  }
  SetLife(facts, step.request.lifetime);
  const Document token = MakeToken(facts, fault.token);
  log = Summary("negotiated, issued", facts, *token);
  return NegotiatedResponse(context, step.leg.answer, *token, step.request.tokenType);
}

Negotiations &TokenService::RequireNegotiations() const {
  if (!m_negotiations) {
    throw Refusal(Code::REQUEST_FAILED, "the service was started without a keytab and does not negotiate");
  }
  return *m_negotiations;
}

Document TokenService::Renew(const CheckedMessage &message, const TrustRequest &request, const Fault &fault,
                             std::string &log) const {
  if (!message.signer) {
    throw Refusal(Code::INVALID_SECURITY, "a renewal must be signed");
  }
  TokenFacts facts = ReadIssuedToken(*request.target, message.identifiers, m_verifier, Code::INVALID_TARGET);
  if (facts.certificate != EncodeCertificate(*message.signer)) {
    throw Refusal(Code::FAILED_AUTHENTICATION, "the renewal is not signed by the holder of the token's key");
  }
  if (facts.renewals == 0) {
    throw Refusal(Code::UNABLE_TO_RENEW, "the token is not renewable");
  }
  RequireCurrent(facts, m_policy.tolerance, Code::UNABLE_TO_RENEW);
  --facts.renewals;
  SetLife(facts, request.lifetime);
  const Document token = MakeToken(facts, fault.token);
  log = Summary("renewed, issued", facts, *token);
  return RenewResponse(*token, request.tokenType);
}

Document TokenService::Validate(const CheckedMessage &message, const TrustRequest &request, std::string &log) const {
  try {
    const FaultCode &code = Code::INVALID_TARGET;
    RequireCurrent(ReadIssuedToken(*request.target, message.identifiers, m_verifier, code), m_policy.tolerance, code);
    log = "valid";
    return ValidateResponse(true);
  } catch (const Refusal &refusal) {
    log = std::string("not valid: ") + refusal.what();
    return ValidateResponse(false);
  }
}

TokenFacts TokenService::Authenticate(const CheckedMessage &message) const {
  if (message.presentedToken && message.credentials) {
    throw Refusal(Code::INVALID_SECURITY, "the message presents both a token and a password");
  }
  if (message.presentedToken) {
    return *message.presentedToken;
  }
  if (message.credentials) {
    return FactsOfUser(*message.credentials);
  }
  if (message.signer) {
    return FactsOfCertificate(*message.signer);
  }
  throw Refusal(Code::FAILED_AUTHENTICATION, "the message does not say who sent it");
}

TokenFacts TokenService::FactsOfUser(const PasswordCredentials &credentials) const {
  const User *const user = m_users.Authenticate(credentials.name, credentials.password);
  if (!user) {
    throw Refusal(Code::FAILED_AUTHENTICATION, "unknown user or wrong password");
  }
  TokenFacts facts;
  SetUser(facts, *user, PASSWORD_CONTEXT);
  return facts;
}

void TokenService::SetClient(TokenFacts &facts, const std::string &principal) const {
  const User *const user = m_users.Find(UserOf(principal));
  if (!user) {
    throw Refusal(Code::FAILED_AUTHENTICATION, "unknown user " + principal);
  }
  SetUser(facts, *user, KERBEROS_CONTEXT);
}

void TokenService::SetParty(TokenFacts &facts, const std::string &name) const {
  const User *const user = m_users.Find(name);
  if (!user) {
    throw Refusal(Code::REQUEST_FAILED, "unknown user " + name + " in wst:OnBehalfOf");
  }
  SetUser(facts, *user, UNSPECIFIED_CONTEXT);
}

TokenFacts TokenService::FactsOfCertificate(X509 &certificate) const {
  const std::string principal = PrincipalOf(certificate);
  if (principal.empty() || !IsClientOf(certificate, *m_state.authority.certificate)) {
    throw Refusal(Code::FAILED_AUTHENTICATION,
                  "the certificate is not a client certificate of the service's authority");
  }
  TokenFacts facts;
  facts.subject = principal;
  facts.authenticated = Now();
  facts.context = CERTIFICATE_CONTEXT;
  facts.isSolution = true;
  return facts;
}

Document TokenService::MakeToken(TokenFacts facts, TokenFault fault) const {
  CorruptFacts(facts, fault);
  Document token = BuildToken(facts);
  CorruptToken(*token, fault);
  if (fault != TokenFault::UNSIGNED) {
    SignToken(*token, fault == TokenFault::WRONG_SIGNER ? m_foreignSigner : m_signer);
  }
  if (fault == TokenFault::TAMPERED) {
    TamperWith(*token);
  }
  return token;
}

} // namespace DevSts
