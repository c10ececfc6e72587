// SPDX-License-Identifier: Apache-2.0
/// @file
/// The SOAP messages that the service answers with.

#pragma once

#include "proven_message.h"
#include "refusal.h"
#include "soap_version.h"
#include "xml_tree.h"

#include <string>
#include <vector>

namespace DevSts {

/// The answer to an issue request: the token, which has the type that was asked for, in a response in a collection.
Document IssueResponse(const xmlDoc &token, const std::string &tokenType);

/// The answer to a leg of an unfinished negotiation: the service's leg.
Document LegResponse(const std::string &context, const std::vector<unsigned char> &leg);

/// The answer to the last leg: the token, and the service's leg unless it is empty.
Document NegotiatedResponse(const std::string &context, const std::vector<unsigned char> &leg, const xmlDoc &token,
                            const std::string &tokenType);

/// The answer to a renew request: the token in a response.
Document RenewResponse(const xmlDoc &token, const std::string &tokenType);

/// The answer to a validate request.
Document ValidateResponse(bool isValid);

/// A SOAP fault. If `code` is null, the fault has no faultcode element.
Document FaultResponse(const FaultCode *code, const std::string &reason);

/// Whether the fault says that the message, and not the service, is the cause.
bool IsFaultOfSender(const FaultCode &code);

/// A fault of that version of SOAP. In SOAP 1.2, a code that is not SOAP's own is the subcode.
Document VersionedFaultResponse(const SoapVersion &version, const FaultCode &code, const std::string &reason);

/// The message itself, with one header block that states whose token it has and what its sender proved.
Document EchoResponse(ProvenMessage message);

} // namespace DevSts
