// SPDX-License-Identifier: Apache-2.0
/// @file
/// The ways in which the service misbehaves on request.

#pragma once

#include "refusal.h"
#include "token_facts.h"
#include "xml_tree.h"

#include <optional>
#include <string>
#include <string_view>

namespace DevSts {

/// What is wrong with the token.
enum class TokenFault {
  NONE,
  EXPIRED,
  EARLY,
  TAMPERED,
  WRONG_SIGNER,
  UNSIGNED,
  WRONG_AUDIENCE,
  BEARER,
  NO_SUBJECT,
  UNKNOWN_ELEMENT,
  WRONG_VERSION,
  PLAIN,
  SHORT_LIVED,
};

/// What is wrong with the document of the answer.
enum class DocumentFault {
  NONE,
  NO_TOKEN,
  WRONG_ROOT,
  WRONG_ELEMENT,
  WRONG_WRAPPER,
  WRONG_STATUS,
  NO_LEG,
  GARBAGE_LEG,
  NO_CONTEXT,
  OTHER_CONTEXT,
  GARBLED_XML,
  NOT_SOAP,
  EMPTY_BODY,
  SOAP_FAULT,
  SOAP_FAULT_WITHOUT_CODE,
  SOAP_FAULT_WITHOUT_TEXT,
  DOCTYPE,
  TOO_DEEP,
};

/// What is wrong on the wire.
enum class DeliveryFault {
  NONE,
  STALL,
  DELAY,
  DRIP,
  RESET,
  RESET_IN_HEADER,
  RESET_IN_BODY,
  TRUNCATE,
  OVERSIZE,
  BAD_STATUS,
  BAD_CONTENT_LENGTH,
  GARBAGE,
};

/// At most one of the three is not NONE.
struct Fault {
  TokenFault token = TokenFault::NONE;
  DocumentFault document = DocumentFault::NONE;
  DeliveryFault delivery = DeliveryFault::NONE;
  int number = 0;         ///< seconds of DELAY and DRIP, status of BAD_STATUS
  FaultCode code{{}, ""}; ///< of SOAP_FAULT
};

/// Returns none for an unknown name.
std::optional<Fault> ParseFault(std::string_view name);

/// All names, for the help text: wrapped lines, each indented.
std::string FaultHelp();

/// Applies the fault to the facts, before the token is built.
void CorruptFacts(TokenFacts &facts, TokenFault fault);

/// Applies the fault to the token, before it is signed.
void CorruptToken(xmlDoc &token, TokenFault fault);

/// Changes the subject of a token that is already signed.
void TamperWith(xmlDoc &token);

/// Applies the fault to a response. Returns the text to send.
std::string CorruptResponse(xmlDoc &response, DocumentFault fault);

} // namespace DevSts
